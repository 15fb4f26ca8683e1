#include "orvex/api/sysprop/system_properties.h"

#include <cstdint>

#include "absl/strings/numbers.h"
#include "absl/strings/string_view.h"
#include "orvex/status/status_builder.h"

namespace orvex {
namespace {

SystemPropertyProxy* ProcessSystemProxy() {
  static SystemPropertyProxy* const proxy = new SystemPropertyProxy();
  return proxy;
}

FakePropertyProxy* ProcessFakeProxy() {
  static FakePropertyProxy* const proxy = new FakePropertyProxy();
  return proxy;
}

bool IsSpace(char c) {
  return c == ' ' || c == '\t' || c == '\n' || c == '\v' || c == '\f' || c == '\r';
}

int DigitValue(char c) {
  if (c >= '0' && c <= '9') return c - '0';
  if (c >= 'a' && c <= 'z') return c - 'a' + 10;
  if (c >= 'A' && c <= 'Z') return c - 'A' + 10;
  return 99;
}

// Reads all of `text` as a signed 32-bit integer in `base` (2 to 16, or 0
// to pick 16, 8 or 10 from a "0x" or "0" prefix as strtol does). Surrounding
// whitespace and one sign are allowed; out-of-range values fail.
bool ParseInt32(std::string_view text, int base, int32_t* out) {
  while (!text.empty() && IsSpace(text.front())) text.remove_prefix(1);
  while (!text.empty() && IsSpace(text.back())) text.remove_suffix(1);
  bool negative = false;
  if (!text.empty() && (text.front() == '-' || text.front() == '+')) {
    negative = text.front() == '-';
    text.remove_prefix(1);
  }
  const bool hex_prefix = text.size() >= 2 && text[0] == '0' && (text[1] == 'x' || text[1] == 'X');
  if (base == 0) base = hex_prefix ? 16 : (!text.empty() && text[0] == '0') ? 8 : 10;
  if (base == 16 && hex_prefix) text.remove_prefix(2);
  if (text.empty()) return false;
  // Magnitude limit: 2^31 - 1 for positive values, 2^31 for negative ones.
  const uint64_t limit = negative ? uint64_t{1} << 31 : (uint64_t{1} << 31) - 1;
  uint64_t magnitude = 0;
  for (char c : text) {
    const int digit = DigitValue(c);
    if (digit >= base) return false;
    magnitude = magnitude * static_cast<uint64_t>(base) + static_cast<uint64_t>(digit);
    if (magnitude > limit) return false;
  }
  *out = negative ? static_cast<int32_t>(-static_cast<int64_t>(magnitude))
                  : static_cast<int32_t>(magnitude);
  return true;
}

bool ParseBool(std::string_view text, bool* out) {
  for (std::string_view yes : {"1", "true", "yes", "y", "on"}) {
    if (text == yes) {
      *out = true;
      return true;
    }
  }
  for (std::string_view no : {"0", "false", "no", "n", "off"}) {
    if (text == no) {
      *out = false;
      return true;
    }
  }
  return false;
}

Status NotConvertible(const std::string& value, std::string_view type) {
  return InvalidArgumentErrorBuilder(ORVEX_LOC)
         << "system property value: " << value << " not convertible to " << type;
}

}  // namespace

SystemProperties::SystemProperties() : proxy_(ProcessSystemProxy()) {}

SystemProperties& SystemProperties::GetInstance() {
  static SystemProperties* const instance = new SystemProperties();
  return *instance;
}

void SystemProperties::SetFake(bool fake) {
  if (fake) {
    proxy_.store(ProcessFakeProxy(), std::memory_order_release);
  } else {
    proxy_.store(ProcessSystemProxy(), std::memory_order_release);
  }
}

void SystemProperties::SetProxy(orvex_api::PropertyProxy* proxy) {
  proxy_.store(proxy, std::memory_order_release);
}

StatusOr<std::string> SystemProperties::Get(std::string_view key) const {
  const orvex_api::PropertyProxy* proxy = proxy_.load(std::memory_order_acquire);
  if (proxy == nullptr) return UnavailableError("API PropertyProxy unset");
  std::string value;
  const int result = proxy->SystemPropertyGet(std::string(key), value);
  if (result != 0) {
    return InternalErrorBuilder(ORVEX_LOC) << "API PropertyProxy returned error: " << result
                                           << " trying to get property with key: " << key;
  }
  return value;
}

std::string SystemProperties::Get(std::string_view key, std::string_view default_value) const {
  const orvex_api::PropertyProxy* proxy = proxy_.load(std::memory_order_acquire);
  if (proxy == nullptr) return std::string(default_value);
  std::string value;
  if (proxy->SystemPropertyGet(std::string(key), std::string(default_value), value) != 0) {
    return std::string(default_value);
  }
  return value;
}

Status SystemProperties::Set(std::string_view key, std::string_view value) {
  orvex_api::PropertyProxy* proxy = proxy_.load(std::memory_order_acquire);
  if (proxy == nullptr) return UnavailableError("API PropertyProxy unset");
  const int result = proxy->SystemPropertySet(std::string(key), std::string(value));
  if (result != 0) {
    return InternalErrorBuilder(ORVEX_LOC)
           << "API PropertyProxy returned error: " << result
           << " trying to set property with key: " << key << ", and value: " << value;
  }
  return OkStatus();
}

template <>
StatusOr<int> SystemProperties::GetAs<int>(std::string_view key) const {
  StatusOr<std::string> value = Get(key);
  if (!value.ok()) return value.status();
  int32_t parsed = 0;
  if (ParseInt32(*value, 0, &parsed)) return parsed;
  if (value->size() >= 3 && value->compare(0, 2, "0b") == 0 &&
      ParseInt32(std::string_view(*value).substr(2), 2, &parsed)) {
    return parsed;
  }
  return NotConvertible(*value, "int");
}

template <>
StatusOr<float> SystemProperties::GetAs<float>(std::string_view key) const {
  StatusOr<std::string> value = Get(key);
  if (!value.ok()) return value.status();
  float parsed = 0;
  if (absl::SimpleAtof(absl::string_view(value->data(), value->size()), &parsed)) return parsed;
  return NotConvertible(*value, "float");
}

template <>
StatusOr<bool> SystemProperties::GetAs<bool>(std::string_view key) const {
  StatusOr<std::string> value = Get(key);
  if (!value.ok()) return value.status();
  bool parsed = false;
  if (ParseBool(*value, &parsed)) return parsed;
  return NotConvertible(*value, "bool");
}

}  // namespace orvex
