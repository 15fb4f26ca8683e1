#include "orvex/api/sysprop/system_properties.h"

#include <cutils/properties.h>

#include <cmath>
#include <limits>
#include <optional>
#include <string>
#include <vector>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::IsOk;
using ::orvex::testing::IsOkAndHolds;
using ::orvex::testing::StatusIs;

constexpr char kGetError[] =
    "API PropertyProxy returned error: -1 trying to get property with key: ";

class SystemPropertiesTest : public ::testing::Test {
 protected:
  void TearDown() override { props_.SetFake(false); }
  SystemProperties& props_ = SystemProperties::GetInstance();
};

TEST_F(SystemPropertiesTest, SystemProxy) {
  EXPECT_THAT(props_.Get("test.sp.unset"),
              StatusIs(StatusCode::kInternal, std::string(kGetError) + "test.sp.unset"));
  EXPECT_EQ(props_.Get("test.sp.unset", "dflt"), "dflt");
  // GetAs passes Get's error through unchanged, whatever the type.
  EXPECT_THAT(props_.GetAs<float>("test.sp.unset"), StatusIs(StatusCode::kInternal));
  EXPECT_THAT(props_.GetAs<int>("test.sp.unset"), StatusIs(StatusCode::kInternal));
  EXPECT_THAT(props_.GetAs<bool>("test.sp.unset"), StatusIs(StatusCode::kInternal));
  ASSERT_EQ(property_set("test.sp.value", "hello"), 0);
  EXPECT_THAT(props_.Get("test.sp.value"), IsOkAndHolds("hello"));
  EXPECT_EQ(props_.Get("test.sp.value", "dflt"), "hello");
  ASSERT_EQ(property_set("test.sp.value", ""), 0);  // Empty reads as missing.
  EXPECT_THAT(props_.Get("test.sp.value"), StatusIs(StatusCode::kInternal));
  EXPECT_EQ(props_.Get("test.sp.value", "dflt"), "dflt");

  // Writes the platform refuses come back as errors and leave the stored
  // value as it was.
  ASSERT_EQ(property_set("persist.vendor.camera.fatp.enable", "1"), 0);
  EXPECT_THAT(props_.Set("test.sp.written", "42"), IsOk());
  EXPECT_THAT(props_.GetAs<int>("test.sp.written"), IsOkAndHolds(42));
  for (const std::string& value : {std::string(PROPERTY_VALUE_MAX, 'x'), std::string("4\0z", 3)}) {
    EXPECT_THAT(props_.Set("test.sp.written", value),
                StatusIs(StatusCode::kInternal,
                         "API PropertyProxy returned error: -1 trying to set property with key: "
                         "test.sp.written, and value: " +
                             value));
    EXPECT_THAT(props_.Get("test.sp.written"), IsOkAndHolds("42"));
  }
  ASSERT_EQ(property_set("persist.vendor.camera.fatp.enable", "0"), 0);
}

// A proxy whose every call fails with -5.
struct FailingProxy final : orvex_api::PropertyProxy {
  int SystemPropertyGet(const std::string&, std::string&) const override { return -5; }
  int SystemPropertyGet(const std::string&, const std::string&, std::string&) const override {
    return -5;
  }
  int SystemPropertySet(const std::string&, const std::string&) override { return -5; }
};

TEST_F(SystemPropertiesTest, FakeFailingAndMissingProxies) {
  props_.SetFake(true);
  EXPECT_THAT(props_.Set("empty.key", ""), IsOk());
  EXPECT_THAT(props_.Get("empty.key"), IsOkAndHolds(""));
  EXPECT_EQ(props_.Get("empty.key", "dflt"), "");
  EXPECT_EQ(props_.Get("missing.key", "dflt"), "dflt");
  props_.SetFake(false);
  EXPECT_THAT(props_.Get("empty.key"), StatusIs(StatusCode::kInternal));
  props_.SetFake(true);  // The fake keeps its values across switches.
  EXPECT_THAT(props_.Get("empty.key"), IsOkAndHolds(""));

  FailingProxy proxy;
  props_.SetProxy(&proxy);
  EXPECT_THAT(props_.Get("k"),
              StatusIs(StatusCode::kInternal,
                       "API PropertyProxy returned error: -5 trying to get property with key: k"));
  EXPECT_EQ(props_.Get("k", "dflt"), "dflt");
  EXPECT_THAT(props_.Set("k", "v"),
              StatusIs(StatusCode::kInternal,
                       "API PropertyProxy returned error: -5 trying to set property with key: k, "
                       "and value: v"));

  props_.SetProxy(nullptr);
  EXPECT_THAT(props_.Get("k"), StatusIs(StatusCode::kUnavailable, "API PropertyProxy unset"));
  EXPECT_THAT(props_.Set("k", "v"), StatusIs(StatusCode::kUnavailable, "API PropertyProxy unset"));
  EXPECT_EQ(props_.Get("k", "dflt"), "dflt");
}

// Sets `value` in the fake and returns GetAs<T>: the parse result, or
// INVALID_ARGUMENT with the conversion message checked here.
template <typename T>
std::optional<T> Parsed(const std::string& value, const char* type) {
  SystemProperties& props = SystemProperties::GetInstance();
  EXPECT_THAT(props.Set("typed.key", value), IsOk());
  StatusOr<T> result = props.GetAs<T>("typed.key");
  if (result.ok()) return *result;
  EXPECT_THAT(result, StatusIs(StatusCode::kInvalidArgument,
                               "system property value: " + value + " not convertible to " + type));
  return std::nullopt;
}

TEST_F(SystemPropertiesTest, GetAsInt) {
  props_.SetFake(true);
  constexpr int kMin = std::numeric_limits<int>::min();
  // clang-format off
  const std::pair<const char*, int> parsed[] = {
      {"0", 0}, {"\v\f\r 49\t\n", 49}, {"+7", 7}, {"-7", -7}, {"0x10", 16}, {"0XaF", 175},
      {"-0x10", -16}, {"010", 8}, {"-010", -8}, {"0b101", 5}, {"0b0", 0},
      {"2147483647", 2147483647}, {"-2147483648", kMin}, {"0x7fffffff", 2147483647},
      {"-0x80000000", kMin}, {"0b1111111111111111111111111111111", 2147483647}};
  // clang-format on
  for (const auto& [value, expected] : parsed) {
    EXPECT_EQ(Parsed<int>(value, "int"), expected) << value;
  }
  for (const char* value :
       {"", " ", "abc", "12abc", "1 2", "--5", "+", "0x", "08", "0b", "0b2", "0B101", " 0b101",
        "2147483648", "-2147483649", "0x80000000", "99999999999999999999999",
        "0b11111111111111111111111111111111", "4.5"}) {
    EXPECT_EQ(Parsed<int>(value, "int"), std::nullopt) << value;
  }
}

TEST_F(SystemPropertiesTest, GetAsFloatAndBool) {
  props_.SetFake(true);
  const float inf = std::numeric_limits<float>::infinity();
  const std::pair<const char*, float> parsed[] = {
      {"1.5", 1.5f}, {" 2 ", 2.0f}, {"-0.25", -0.25f}, {"1e3", 1000.0f},
      {"+3", 3.0f},  {"inf", inf},  {"1e99", inf},     {"-1e99", -inf}};
  for (const auto& [value, expected] : parsed) {
    EXPECT_EQ(Parsed<float>(value, "float"), expected) << value;
  }
  for (const char* value : {"", "abc", "1.5x", "1,5", "+-1"}) {
    EXPECT_EQ(Parsed<float>(value, "float"), std::nullopt) << value;
  }
  EXPECT_TRUE(std::isnan(Parsed<float>("nan", "float").value_or(0)));
  for (const char* yes : {"1", "true", "yes", "y", "on"})
    EXPECT_EQ(Parsed<bool>(yes, "bool"), true);
  for (const char* no : {"0", "false", "no", "n", "off"})
    EXPECT_EQ(Parsed<bool>(no, "bool"), false);
  for (const char* other : {"TRUE", "Yes", "On", "", " 1", "1 ", "2", "truee", "of"}) {
    EXPECT_EQ(Parsed<bool>(other, "bool"), std::nullopt) << other;
  }
}

}  // namespace
}  // namespace orvex
