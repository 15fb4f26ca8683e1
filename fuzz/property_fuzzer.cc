// SystemProperties::GetAs<int|float|bool> on arbitrary stored values, first
// through the fake proxy (no length limit), then through the system proxy
// over the host property store. Properties checked:
// - Get returns what Set stored (the system proxy: or refuses the write);
// - GetAs<int> agrees with strtoll in base 0 on the trimmed text, or with
//   base 2 after a leading "0b"; a parsed int and float read back the same
//   from their printed form; GetAs<float> agrees with strtof on plain
//   decimal texts; GetAs<bool> accepts exactly the ten words;
// - a refused value fails with INVALID_ARGUMENT and the exact message.

#include <fuzzer/FuzzedDataProvider.h>

#include <cerrno>
#include <cmath>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <optional>
#include <string>
#include <string_view>

#include "cutils/properties.h"
#include "fmt/format.h"
#include "orvex/api/sysprop/system_properties.h"
#include "orvex/status/log.h"

namespace {

using orvex::StatusCode;
using orvex::StatusOr;
using orvex::SystemProperties;

constexpr char kKey[] = "vendor.camera.debug.fuzz_value";
constexpr char kUnsetKey[] = "vendor.camera.debug.fuzz_unset";

bool IsSpace(char c) { return c == ' ' || (c >= '\t' && c <= '\r'); }

std::string_view Trim(std::string_view text) {
  while (!text.empty() && IsSpace(text.front())) text.remove_prefix(1);
  while (!text.empty() && IsSpace(text.back())) text.remove_suffix(1);
  return text;
}

// strtoll over all of `text` (trimmed) within 32 bits.
std::optional<int> ReferenceInt(std::string_view text, int base) {
  const std::string trimmed(Trim(text));
  if (trimmed.empty() || trimmed.find('\0') != std::string::npos) return std::nullopt;
  errno = 0;
  char* end = nullptr;
  const long long value = std::strtoll(trimmed.c_str(), &end, base);
  if (errno != 0 || end != trimmed.c_str() + trimmed.size()) return std::nullopt;
  if (value < INT32_MIN || value > INT32_MAX) return std::nullopt;
  return static_cast<int>(value);
}

void CheckRefused(const orvex::Status& status, const std::string& value, std::string_view type) {
  ORVEX_CHECK_EQ(status.code(), StatusCode::kInvalidArgument) << status;
  ORVEX_CHECK(status.message() ==
              "system property value: " + value + " not convertible to " + std::string(type))
      << status;
}

void CheckInt(SystemProperties& props, const std::string& value) {
  const StatusOr<int> parsed = props.GetAs<int>(kKey);
  std::optional<int> expected = ReferenceInt(value, 0);
  // Newer C libraries read "0b" in base 2 themselves; compare only the
  // unambiguous texts.
  const std::string_view rest = std::string_view(value).substr(value.size() >= 2 ? 2 : 0);
  const bool ambiguous = Trim(rest).find_first_of("bB") != std::string_view::npos;
  if (!expected.has_value() && value.size() >= 3 && value.starts_with("0b")) {
    expected = ReferenceInt(rest, 2);
  }
  if (!expected.has_value()) {
    if (ambiguous && parsed.ok()) return;
    CheckRefused(parsed.status(), value, "int");
    return;
  }
  ORVEX_CHECK(parsed.ok()) << "'" << value << "': " << parsed.status();
  ORVEX_CHECK_EQ(*parsed, *expected) << "'" << value << "'";
  // Round trip through the printed value.
  ORVEX_CHECK(props.Set(kKey, std::to_string(*parsed)).ok());
  const StatusOr<int> again = props.GetAs<int>(kKey);
  ORVEX_CHECK(again.ok() && *again == *parsed) << "'" << value << "'";
}

// strtof over all of a plain decimal or scientific text (trimmed); out of
// range values read as infinity or zero as the contract says.
std::optional<float> ReferenceFloat(std::string_view text) {
  const std::string trimmed(Trim(text));
  if (trimmed.empty() || trimmed.find_first_not_of("0123456789.eE+-") != std::string::npos) {
    return std::nullopt;
  }
  char* end = nullptr;
  const float value = std::strtof(trimmed.c_str(), &end);
  if (end != trimmed.c_str() + trimmed.size()) return std::nullopt;
  return value;
}

void CheckFloat(SystemProperties& props, const std::string& value) {
  const StatusOr<float> parsed = props.GetAs<float>(kKey);
  if (const std::optional<float> expected = ReferenceFloat(value); expected.has_value()) {
    ORVEX_CHECK(parsed.ok()) << "'" << value << "': " << parsed.status();
    ORVEX_CHECK(*parsed == *expected)
        << "'" << value << "' read " << *parsed << ", strtof " << *expected;
  }
  if (!parsed.ok()) {
    CheckRefused(parsed.status(), value, "float");
    return;
  }
  const std::string printed = fmt::format("{}", *parsed);  // shortest exact form
  ORVEX_CHECK(props.Set(kKey, printed).ok());
  const StatusOr<float> again = props.GetAs<float>(kKey);
  ORVEX_CHECK(again.ok()) << "'" << value << "' printed '" << printed << "': " << again.status();
  if (std::isnan(*parsed)) {
    ORVEX_CHECK(std::isnan(*again)) << "'" << value << "' printed '" << printed << "'";
  } else {
    ORVEX_CHECK(std::memcmp(&*again, &*parsed, sizeof(float)) == 0)
        << "'" << value << "' printed '" << printed << "' read " << *again;
  }
}

void CheckBool(SystemProperties& props, const std::string& value) {
  const StatusOr<bool> parsed = props.GetAs<bool>(kKey);
  const bool yes =
      value == "1" || value == "true" || value == "yes" || value == "y" || value == "on";
  const bool no =
      value == "0" || value == "false" || value == "no" || value == "n" || value == "off";
  if (!yes && !no) {
    CheckRefused(parsed.status(), value, "bool");
    return;
  }
  ORVEX_CHECK(parsed.ok() && *parsed == yes) << "'" << value << "'";
}

// Stores `value` and checks every typed read of it. Returns false when the
// proxy refused the write.
bool CheckValue(SystemProperties& props, const std::string& value) {
  const orvex::Status set = props.Set(kKey, value);
  if (!set.ok()) {
    ORVEX_CHECK_EQ(set.code(), StatusCode::kInternal) << set;
    return false;
  }
  const StatusOr<std::string> stored = props.Get(kKey);
  ORVEX_CHECK(stored.ok()) << stored.status();
  ORVEX_CHECK(*stored == value) << "stored '" << value << "', read '" << *stored << "'";
  CheckBool(props, value);
  CheckInt(props, value);
  ORVEX_CHECK(props.Set(kKey, value).ok());
  CheckFloat(props, value);
  return true;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  static const bool fatp_enabled = property_set("persist.vendor.camera.fatp.enable", "1") == 0;
  ORVEX_CHECK(fatp_enabled);
  const std::string value(reinterpret_cast<const char*>(data), size);
  SystemProperties& props = SystemProperties::GetInstance();

  props.SetFake(true);
  ORVEX_CHECK(CheckValue(props, value)) << "the fake proxy refused '" << value << "'";
  ORVEX_CHECK_EQ(props.GetAs<int>(kUnsetKey).status().code(), StatusCode::kInternal);
  ORVEX_CHECK(props.Get(kUnsetKey, value) == value);

  // The system proxy: values of more than 91 characters are refused; the
  // empty value reads as unset.
  props.SetFake(false);
  if (value.empty()) {
    ORVEX_CHECK(props.Set(kKey, value).ok());
    ORVEX_CHECK_EQ(props.Get(kKey).status().code(), StatusCode::kInternal);
  } else if (CheckValue(props, value)) {
    ORVEX_CHECK_LE(value.size(), size_t{91});
  }
  return 0;
}
