#include "orvex/api/sysprop/system_properties.h"

#include <cutils/properties.h>

#include <cmath>
#include <limits>
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

// A proxy whose results are chosen by the test.
class ScriptedProxy final : public orvex_api::PropertyProxy {
 public:
  int SystemPropertyGet(const std::string&, std::string& value) const override {
    value = "scripted";
    return result;
  }
  int SystemPropertyGet(const std::string&, const std::string&, std::string& value) const override {
    value = "scripted";
    return result;
  }
  int SystemPropertySet(const std::string&, const std::string&) override { return result; }
  int result = 0;
};

class SystemPropertiesTest : public ::testing::Test {
 protected:
  void TearDown() override { props_.SetFake(false); }
  SystemProperties& props_ = SystemProperties::GetInstance();
};

TEST_F(SystemPropertiesTest, SystemProxyReadsAndErrors) {
  EXPECT_EQ(&props_, &SystemProperties::GetInstance());
  EXPECT_THAT(props_.Get("test.sp.unset"),
              StatusIs(StatusCode::kInternal,
                       "API PropertyProxy returned error: -1 trying to get property with key: "
                       "test.sp.unset"));
  EXPECT_EQ(props_.Get("test.sp.unset", "dflt"), "dflt");
  EXPECT_EQ(props_.Get("test.sp.unset", ""), "");

  ASSERT_EQ(property_set("test.sp.value", "hello"), 0);
  EXPECT_THAT(props_.Get("test.sp.value"), IsOkAndHolds("hello"));
  EXPECT_EQ(props_.Get("test.sp.value", "dflt"), "hello");
  ASSERT_EQ(property_set("test.sp.value", ""), 0);
  EXPECT_THAT(props_.Get("test.sp.value"), StatusIs(StatusCode::kInternal));
  EXPECT_EQ(props_.Get("test.sp.value", "dflt"), "dflt");

  // GetAs passes Get's error through unchanged, whatever the type.
  EXPECT_THAT(props_.GetAs<float>("test.sp.unset"),
              StatusIs(StatusCode::kInternal, ::testing::HasSubstr("key: test.sp.unset")));
  EXPECT_THAT(props_.GetAs<int>("test.sp.unset"), StatusIs(StatusCode::kInternal));
  EXPECT_THAT(props_.GetAs<bool>("test.sp.unset"), StatusIs(StatusCode::kInternal));
}

// Writes the platform refuses come back as errors and leave the stored value
// as it was.
TEST_F(SystemPropertiesTest, SystemProxyWritesInFactoryTest) {
  ASSERT_EQ(property_set("persist.vendor.camera.fatp.enable", "1"), 0);
  EXPECT_THAT(props_.Set("test.sp.written", "42"), IsOk());
  EXPECT_THAT(props_.GetAs<int>("test.sp.written"), IsOkAndHolds(42));
  EXPECT_THAT(props_.Set("ro.test.sp.once", "first"), IsOk());
  struct Case {
    std::string key;
    std::string value;
    std::string kept;  // what the key reads afterwards; empty: unset
  };
  const std::vector<Case> refused = {
      {"test.sp.written", std::string(PROPERTY_VALUE_MAX, 'x'), "42"},
      {"test.sp.written",
       std::string("4\0"
                   "3",
                   3),
       "42"},
      {"ro.test.sp.once", "second", "first"},
      {"test..sp.bad", "1", ""},
  };
  for (const Case& c : refused) {
    SCOPED_TRACE(c.key);
    EXPECT_THAT(props_.Set(c.key, c.value),
                StatusIs(StatusCode::kInternal,
                         "API PropertyProxy returned error: -1 trying to set property with key: " +
                             c.key + ", and value: " + c.value));
    if (c.kept.empty()) {
      EXPECT_THAT(props_.Get(c.key), StatusIs(StatusCode::kInternal));
    } else {
      EXPECT_THAT(props_.Get(c.key), IsOkAndHolds(c.kept));
    }
  }
  ASSERT_EQ(property_set("persist.vendor.camera.fatp.enable", "0"), 0);
}

TEST_F(SystemPropertiesTest, FakeKeepsValuesAcrossSwitches) {
  props_.SetFake(true);
  EXPECT_THAT(props_.Set("any.key", "v1"), IsOk());
  EXPECT_THAT(props_.Set("empty.key", ""), IsOk());
  EXPECT_THAT(props_.Get("any.key"), IsOkAndHolds("v1"));
  EXPECT_THAT(props_.Get("empty.key"), IsOkAndHolds(""));
  EXPECT_EQ(props_.Get("empty.key", "dflt"), "");
  EXPECT_EQ(props_.Get("missing.key", "dflt"), "dflt");

  props_.SetFake(false);
  EXPECT_THAT(props_.Get("any.key"), StatusIs(StatusCode::kInternal));
  props_.SetFake(true);
  EXPECT_THAT(props_.Get("any.key"), IsOkAndHolds("v1"));
}

TEST_F(SystemPropertiesTest, ProxyErrorsAndMissingProxy) {
  ScriptedProxy proxy;
  props_.SetProxy(&proxy);
  proxy.result = -5;
  EXPECT_THAT(props_.Get("k"),
              StatusIs(StatusCode::kInternal,
                       "API PropertyProxy returned error: -5 trying to get property with key: k"));
  EXPECT_EQ(props_.Get("k", "dflt"), "dflt");
  EXPECT_THAT(props_.Set("k", "v"),
              StatusIs(StatusCode::kInternal,
                       "API PropertyProxy returned error: -5 trying to set property with key: k, "
                       "and value: v"));
  proxy.result = 0;
  EXPECT_THAT(props_.Get("k"), IsOkAndHolds("scripted"));
  EXPECT_EQ(props_.Get("k", "dflt"), "scripted");

  props_.SetProxy(nullptr);
  EXPECT_THAT(props_.Get("k"), StatusIs(StatusCode::kUnavailable, "API PropertyProxy unset"));
  EXPECT_THAT(props_.Set("k", "v"), StatusIs(StatusCode::kUnavailable, "API PropertyProxy unset"));
  EXPECT_THAT(props_.GetAs<bool>("k"), StatusIs(StatusCode::kUnavailable));
  EXPECT_EQ(props_.Get("k", "dflt"), "dflt");
}

TEST_F(SystemPropertiesTest, GetAsInt) {
  props_.SetFake(true);
  constexpr int kMin = std::numeric_limits<int>::min();
  // clang-format off
  const std::pair<const char*, int> parsed[] = {
      {"0", 0}, {"42", 42}, {"  42\t\n", 42}, {"+7", 7}, {"-7", -7}, {"0x10", 16}, {"0X1f", 31},
      {"-0x10", -16}, {"010", 8}, {"-010", -8}, {"0b101", 5}, {"0b0", 0},
      {"2147483647", 2147483647}, {"-2147483648", kMin}, {"0x7fffffff", 2147483647},
      {"-0x80000000", kMin}, {"0b1111111111111111111111111111111", 2147483647}};
  // clang-format on
  for (const auto& [value, expected] : parsed) {
    SCOPED_TRACE(std::string("value \"") + value + "\"");
    ASSERT_THAT(props_.Set("int.key", value), IsOk());
    EXPECT_THAT(props_.GetAs<int>("int.key"), IsOkAndHolds(expected));
  }
  const char* const rejected[] = {"",
                                  " ",
                                  "abc",
                                  "12abc",
                                  "1 2",
                                  "--5",
                                  "+",
                                  "0x",
                                  "08",
                                  "0b",
                                  "0b2",
                                  "0B101",
                                  " 0b101",
                                  "2147483648",
                                  "-2147483649",
                                  "0x80000000",
                                  "99999999999999999999999",
                                  "0b11111111111111111111111111111111",
                                  "4.5"};
  for (const char* value : rejected) {
    SCOPED_TRACE(std::string("value \"") + value + "\"");
    ASSERT_THAT(props_.Set("int.key", value), IsOk());
    EXPECT_THAT(props_.GetAs<int>("int.key"),
                StatusIs(StatusCode::kInvalidArgument, std::string("system property value: ") +
                                                           value + " not convertible to int"));
  }
}

TEST_F(SystemPropertiesTest, GetAsFloat) {
  props_.SetFake(true);
  struct Case {
    const char* value;
    bool ok;
    float expected;
  };
  const float inf = std::numeric_limits<float>::infinity();
  const Case cases[] = {{"1.5", true, 1.5f},    {" 2 ", true, 2.0f},   {"-0.25", true, -0.25f},
                        {"1e3", true, 1000.0f}, {"+3", true, 3.0f},    {"inf", true, inf},
                        {"1e99", true, inf},    {"-1e99", true, -inf}, {"", false, 0},
                        {"abc", false, 0},      {"1.5x", false, 0},    {"1,5", false, 0},
                        {"+-1", false, 0}};
  for (const Case& c : cases) {
    SCOPED_TRACE(std::string("value \"") + c.value + "\"");
    ASSERT_THAT(props_.Set("float.key", c.value), IsOk());
    if (c.ok) {
      EXPECT_THAT(props_.GetAs<float>("float.key"), IsOkAndHolds(c.expected));
    } else {
      EXPECT_THAT(
          props_.GetAs<float>("float.key"),
          StatusIs(StatusCode::kInvalidArgument,
                   std::string("system property value: ") + c.value + " not convertible to float"));
    }
  }
  ASSERT_THAT(props_.Set("float.key", "nan"), IsOk());
  StatusOr<float> nan = props_.GetAs<float>("float.key");
  ASSERT_THAT(nan, IsOk());
  EXPECT_TRUE(std::isnan(*nan));
}

TEST_F(SystemPropertiesTest, GetAsBool) {
  props_.SetFake(true);
  for (const char* yes : {"1", "true", "yes", "y", "on"}) {
    SCOPED_TRACE(yes);
    ASSERT_THAT(props_.Set("bool.key", yes), IsOk());
    EXPECT_THAT(props_.GetAs<bool>("bool.key"), IsOkAndHolds(true));
  }
  for (const char* no : {"0", "false", "no", "n", "off"}) {
    SCOPED_TRACE(no);
    ASSERT_THAT(props_.Set("bool.key", no), IsOk());
    EXPECT_THAT(props_.GetAs<bool>("bool.key"), IsOkAndHolds(false));
  }
  for (const char* other : {"TRUE", "Yes", "On", "", " 1", "1 ", "2", "truee", "of"}) {
    SCOPED_TRACE(other);
    ASSERT_THAT(props_.Set("bool.key", other), IsOk());
    EXPECT_THAT(props_.GetAs<bool>("bool.key"),
                StatusIs(StatusCode::kInvalidArgument, std::string("system property value: ") +
                                                           other + " not convertible to bool"));
  }
}

}  // namespace
}  // namespace orvex
