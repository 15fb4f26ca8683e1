#include "orvex/api/sysprop/system_properties.h"

#include <cutils/properties.h>

#include <cstdint>
#include <optional>
#include <string>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::IsOk;
using ::orvex::testing::IsOkAndHolds;
using ::orvex::testing::StatusIs;

class SystemPropertiesTest : public ::testing::Test {
 protected:
  void TearDown() override { props_.SetFake(false); }
  SystemProperties& props_ = SystemProperties::GetInstance();
};

// The platform reads an empty property as missing and refuses what it cannot hold.
TEST_F(SystemPropertiesTest, SystemProxy) {
  ASSERT_EQ(property_set("test.sp.value", ""), 0);
  EXPECT_THAT(props_.Get("test.sp.value"),
              StatusIs(StatusCode::kInternal,
                       "API PropertyProxy returned error: -1 trying to get property with key: "
                       "test.sp.value"));
  EXPECT_EQ(props_.Get("test.sp.value", "dflt"), "dflt");
  EXPECT_EQ(props_.Get("test.sp.value", ""), "");
  EXPECT_THAT(props_.GetAs<float>("test.sp.value"), StatusIs(StatusCode::kInternal));
  EXPECT_THAT(props_.GetAs<int>("test.sp.value"), StatusIs(StatusCode::kInternal));
  EXPECT_THAT(props_.GetAs<bool>("test.sp.value"), StatusIs(StatusCode::kInternal));
  ASSERT_EQ(property_set("persist.vendor.camera.fatp.enable", "1"), 0);
  EXPECT_THAT(props_.Set("test.sp.value", "hello"), IsOk());
  EXPECT_EQ(props_.Get("test.sp.value", "dflt"), "hello");
  const std::string long_value(PROPERTY_VALUE_MAX, 'x');
  EXPECT_THAT(props_.Set("test.sp.value", long_value),
              StatusIs(StatusCode::kInternal,
                       "API PropertyProxy returned error: -1 trying to set property with key: "
                       "test.sp.value, and value: " +
                           long_value));
  ASSERT_EQ(property_set("persist.vendor.camera.fatp.enable", "0"), 0);
}

TEST_F(SystemPropertiesTest, FakeAndMissingProxies) {
  props_.SetFake(true);
  EXPECT_THAT(props_.Set("empty.key", ""), IsOk());
  EXPECT_THAT(props_.Get("empty.key"), IsOkAndHolds(""));
  props_.SetFake(false);
  EXPECT_THAT(props_.Get("empty.key"), StatusIs(StatusCode::kInternal));
  props_.SetFake(true);
  EXPECT_THAT(props_.Get("empty.key"), IsOkAndHolds(""));
  props_.SetProxy(nullptr);
  EXPECT_THAT(props_.Get("k"), StatusIs(StatusCode::kUnavailable, "API PropertyProxy unset"));
  EXPECT_THAT(props_.Set("k", "v"), StatusIs(StatusCode::kUnavailable, "API PropertyProxy unset"));
  EXPECT_EQ(props_.Get("k", "dflt"), "dflt");
}

// GetAs<T> of `value` stored in the fake; nullopt after checking the conversion error.
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

constexpr std::nullopt_t kNo = std::nullopt;

TEST_F(SystemPropertiesTest, GetAs) {
  props_.SetFake(true);
  // clang-format off
  const std::pair<const char*, std::optional<int>> ints[] = {
      {"0", 0}, {"\v\f\r 49\t\n", 49}, {"+7", 7}, {"-7", -7}, {"0x10", 16}, {"0XaA", 170},
      {"010", 8}, {"-010", -8}, {"0b101", 5}, {"0b0", 0}, {"2147483647", INT32_MAX},
      {"-2147483648", INT32_MIN}, {"0x7fffffff", INT32_MAX}, {"-0x80000000", INT32_MIN},
      {"0b1111111111111111111111111111111", INT32_MAX}, {"", kNo}, {" ", kNo}, {"12abc", kNo},
      {"1 2", kNo}, {"--5", kNo}, {"+", kNo}, {"0x", kNo}, {"08", kNo}, {"0b", kNo}, {"0b2", kNo},
      {"0B101", kNo}, {" 0b101", kNo}, {"0b0x1", kNo}, {"2147483648", kNo}, {"-2147483649", kNo},
      {"0x80000000", kNo}, {"0b11111111111111111111111111111111", kNo}};
  const std::pair<const char*, std::optional<bool>> bools[] = {
      {"1", true}, {"true", true}, {"yes", true}, {"y", true}, {"on", true}, {"0", false},
      {"false", false}, {"no", false}, {"n", false}, {"off", false}, {"TRUE", kNo}, {"Yes", kNo},
      {"", kNo}, {" 1", kNo}, {"1 ", kNo}, {"2", kNo}, {"truee", kNo}, {"of", kNo}};
  // clang-format on
  for (const auto& [value, want] : ints) EXPECT_EQ(Parsed<int>(value, "int"), want) << value;
  for (const auto& [value, want] : bools) EXPECT_EQ(Parsed<bool>(value, "bool"), want) << value;
  EXPECT_EQ(Parsed<float>(" -0.25 ", "float"), -0.25f);
  EXPECT_EQ(Parsed<float>("1,5", "float"), kNo);
}

}  // namespace
}  // namespace orvex
