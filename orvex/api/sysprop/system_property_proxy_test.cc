#include "orvex/api/sysprop/system_property_proxy.h"

#include <cutils/properties.h>

#include <string>

#include "gmock/gmock.h"
#include "gtest/gtest.h"

namespace orvex {
namespace {

constexpr char kFatpEnable[] = "persist.vendor.camera.fatp.enable";

TEST(SystemPropertyProxyTest, GetReadsPlatformAndTreatsEmptyAsMissing) {
  SystemPropertyProxy proxy;
  std::string value = "untouched";
  EXPECT_EQ(proxy.SystemPropertyGet("test.proxy.unset", value), -1);
  EXPECT_EQ(proxy.SystemPropertyGet("test.proxy.unset", "", value), -1);
  EXPECT_EQ(value, "untouched");
  EXPECT_EQ(proxy.SystemPropertyGet("test.proxy.unset", "dflt", value), 0);
  EXPECT_EQ(value, "dflt");

  ASSERT_EQ(property_set("test.proxy.value", "abc"), 0);
  EXPECT_EQ(proxy.SystemPropertyGet("test.proxy.value", value), 0);
  EXPECT_EQ(value, "abc");
  EXPECT_EQ(proxy.SystemPropertyGet("test.proxy.value", "dflt", value), 0);
  EXPECT_EQ(value, "abc");

  ASSERT_EQ(property_set("test.proxy.value", ""), 0);
  EXPECT_EQ(proxy.SystemPropertyGet("test.proxy.value", value), -1);
  EXPECT_EQ(proxy.SystemPropertyGet("test.proxy.value", "", value), -1);

  const std::string longest(PROPERTY_VALUE_MAX - 1, 'q');
  ASSERT_EQ(property_set("test.proxy.value", longest.c_str()), 0);
  EXPECT_EQ(proxy.SystemPropertyGet("test.proxy.value", value), 0);
  EXPECT_EQ(value, longest);
  // A key with an embedded NUL never aliases its prefix.
  EXPECT_EQ(proxy.SystemPropertyGet(std::string("test.proxy.value\0x", 18), value), -1);
}

TEST(SystemPropertyProxyTest, SetNeedsFactoryTestExceptForTwoDebugKeys) {
  SystemPropertyProxy proxy;
  ASSERT_EQ(property_set(kFatpEnable, "0"), 0);
  for (const char* key : {"vendor.camera.debug.force_dpm_mif_clock_war",
                          "vendor.camera.debug.vrix_io_entry_debug_mode_enable"}) {
    SCOPED_TRACE(key);
    EXPECT_EQ(proxy.SystemPropertySet(key, "1"), 0);
    std::string value;
    EXPECT_EQ(proxy.SystemPropertyGet(key, value), 0);
    EXPECT_EQ(value, "1");
  }

  ASSERT_EQ(property_set(kFatpEnable, "true"), 0);
  EXPECT_EQ(proxy.SystemPropertySet("vendor.camera.fatp.rtele.sn", "SN42"), 0);
  std::string value;
  EXPECT_EQ(proxy.SystemPropertyGet("vendor.camera.fatp.rtele.sn", value), 0);
  EXPECT_EQ(value, "SN42");
  // The platform refuses what it cannot hold, and the refusal comes back.
  EXPECT_NE(proxy.SystemPropertySet("test.proxy.long", std::string(PROPERTY_VALUE_MAX, 'x')), 0);
  EXPECT_NE(proxy.SystemPropertySet("test.proxy.nul", std::string("a\0b", 3)), 0);
  EXPECT_NE(proxy.SystemPropertySet("bad..key", "1"), 0);
  ASSERT_EQ(property_set(kFatpEnable, "0"), 0);
}

TEST(SystemPropertyProxyDeathTest, SetOutsideFactoryTestIsFatal) {
  ASSERT_EQ(property_set(kFatpEnable, "0"), 0);
  SystemPropertyProxy proxy;
  EXPECT_DEATH(
      proxy.SystemPropertySet("vendor.camera.fatp.rtele.sn", "SN42"),
      "Check failed: is_fatp_enable \\|\\| "
      "!key\\.compare\\(\"vendor\\.camera\\.debug\\.force_dpm_mif_clock_war\"\\) \\|\\| "
      "!key\\.compare\\(\"vendor\\.camera\\.debug\\.vrix_io_entry_debug_mode_enable\"\\) "
      "PropertySet can slow down program significantly, please refrain from calling this!");
}

TEST(FakePropertyProxyTest, KeepsEmptyAndLongValuesAndAppliesDefaults) {
  FakePropertyProxy proxy;
  std::string value = "untouched";
  EXPECT_EQ(proxy.SystemPropertyGet("k", value), -1);
  EXPECT_EQ(proxy.SystemPropertyGet("k", "", value), -1);
  EXPECT_EQ(value, "untouched");
  EXPECT_EQ(proxy.SystemPropertyGet("k", "d", value), 0);
  EXPECT_EQ(value, "d");

  // No factory-test check, no key rules, no length limit.
  const std::string long_value(300, 'L');
  EXPECT_EQ(proxy.SystemPropertySet("any key at all", long_value), 0);
  EXPECT_EQ(proxy.SystemPropertyGet("any key at all", value), 0);
  EXPECT_EQ(value, long_value);

  EXPECT_EQ(proxy.SystemPropertySet("k", ""), 0);
  EXPECT_EQ(proxy.SystemPropertyGet("k", value), 0);
  EXPECT_EQ(value, "");
  EXPECT_EQ(proxy.SystemPropertyGet("k", "d", value), 0);
  EXPECT_EQ(value, "");
  EXPECT_EQ(proxy.SystemPropertySet("k", "v2"), 0);
  EXPECT_EQ(proxy.SystemPropertyGet("k", "d", value), 0);
  EXPECT_EQ(value, "v2");
}

}  // namespace
}  // namespace orvex
