#include "orvex/api/sysprop/system_property_proxy.h"

#include <cutils/properties.h>

#include <string>

#include "gmock/gmock.h"
#include "gtest/gtest.h"

namespace orvex {
namespace {

constexpr char kFatpEnable[] = "persist.vendor.camera.fatp.enable";

// The result of a read, with or without a default, and the value it left
// ("untouched" when none).
template <typename... Default>
std::pair<int, std::string> Read(const orvex_api::PropertyProxy& proxy, const std::string& key,
                                 const Default&... default_value) {
  std::string value = "untouched";
  const int result = proxy.SystemPropertyGet(key, std::string(default_value)..., value);
  return {result, value};
}

using Result = std::pair<int, std::string>;

TEST(SystemPropertyProxyTest, GetReadsPlatformAndTreatsEmptyAsMissing) {
  SystemPropertyProxy proxy;
  EXPECT_EQ(Read(proxy, "test.proxy.unset"), Result(-1, "untouched"));
  EXPECT_EQ(Read(proxy, "test.proxy.unset", ""), Result(-1, "untouched"));
  EXPECT_EQ(Read(proxy, "test.proxy.unset", "dflt"), Result(0, "dflt"));
  ASSERT_EQ(property_set("test.proxy.value", "abc"), 0);
  EXPECT_EQ(Read(proxy, "test.proxy.value", "dflt"), Result(0, "abc"));
  // A key with an embedded NUL never aliases its prefix.
  EXPECT_EQ(Read(proxy, std::string("test.proxy.value\0x", 18)).first, -1);
  ASSERT_EQ(property_set("test.proxy.value", ""), 0);
  EXPECT_EQ(Read(proxy, "test.proxy.value").first, -1);
  const std::string longest(PROPERTY_VALUE_MAX - 1, 'q');
  ASSERT_EQ(property_set("test.proxy.value", longest.c_str()), 0);
  EXPECT_EQ(Read(proxy, "test.proxy.value"), Result(0, longest));
}

TEST(SystemPropertyProxyTest, SetNeedsFactoryTestExceptForTwoDebugKeys) {
  SystemPropertyProxy proxy;
  ASSERT_EQ(property_set(kFatpEnable, "0"), 0);
  for (const char* key : {"vendor.camera.debug.force_dpm_mif_clock_war",
                          "vendor.camera.debug.vrix_io_entry_debug_mode_enable"}) {
    EXPECT_EQ(proxy.SystemPropertySet(key, "1"), 0);
    EXPECT_EQ(Read(proxy, key), Result(0, "1"));
  }
  ASSERT_EQ(property_set(kFatpEnable, "true"), 0);
  EXPECT_EQ(proxy.SystemPropertySet("vendor.camera.fatp.rtele.sn", "SN42"), 0);
  EXPECT_EQ(Read(proxy, "vendor.camera.fatp.rtele.sn"), Result(0, "SN42"));
  // The platform refuses what it cannot hold, and the refusal comes back.
  EXPECT_NE(proxy.SystemPropertySet("test.proxy.long", std::string(PROPERTY_VALUE_MAX, 'x')), 0);
  EXPECT_NE(proxy.SystemPropertySet("test.proxy.nul", std::string("a\0b", 3)), 0);
  EXPECT_NE(proxy.SystemPropertySet(std::string("test.proxy\0b", 12), "1"), 0);
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
  EXPECT_EQ(Read(proxy, "k"), Result(-1, "untouched"));
  EXPECT_EQ(Read(proxy, "k", ""), Result(-1, "untouched"));
  EXPECT_EQ(Read(proxy, "k", "d"), Result(0, "d"));
  // No factory-test check, no key rules, no length limit.
  const std::string long_value(300, 'L');
  EXPECT_EQ(proxy.SystemPropertySet("any key at all", long_value), 0);
  EXPECT_EQ(Read(proxy, "any key at all"), Result(0, long_value));
  EXPECT_EQ(proxy.SystemPropertySet("k", ""), 0);
  EXPECT_EQ(Read(proxy, "k", "d"), Result(0, ""));
}

}  // namespace
}  // namespace orvex
