#include "orvex/api/sysprop/system_property_proxy.h"

#include <cutils/properties.h>

#include <string>

#include "gmock/gmock.h"
#include "gtest/gtest.h"

namespace orvex {
namespace {

constexpr char kFatpEnable[] = "persist.vendor.camera.fatp.enable";
using Result = std::pair<int, std::string>;

// A read's result and the value it left ("untouched" when none).
template <typename... Default>
Result Read(const orvex_api::PropertyProxy& proxy, const std::string& key,
            const Default&... default_value) {
  std::string value = "untouched";
  const int result = proxy.SystemPropertyGet(key, std::string(default_value)..., value);
  return {result, value};
}

// Both proxies read a missing value alike; the platform's empty value is missing.
TEST(PropertyProxyTest, Reads) {
  ASSERT_EQ(property_set("test.proxy.value", ""), 0);
  SystemPropertyProxy system;
  FakePropertyProxy fake;
  const orvex_api::PropertyProxy* proxies[] = {&system, &fake};
  for (const orvex_api::PropertyProxy* proxy : proxies) {
    EXPECT_EQ(Read(*proxy, "test.proxy.value"), Result(-1, "untouched"));
    EXPECT_EQ(Read(*proxy, "test.proxy.value", ""), Result(-1, "untouched"));
    EXPECT_EQ(Read(*proxy, "test.proxy.value", "dflt"), Result(0, "dflt"));
  }
  const std::string longest(PROPERTY_VALUE_MAX - 1, 'q');
  ASSERT_EQ(property_set("test.proxy.value", longest.c_str()), 0);
  EXPECT_EQ(Read(system, "test.proxy.value", "dflt"), Result(0, longest));
  // A key with an embedded NUL never aliases its prefix.
  EXPECT_EQ(Read(system, std::string("test.proxy.value\0x", 18)).first, -1);
  // The fake has no key rules or length limit, and a stored empty value stands.
  EXPECT_EQ(fake.SystemPropertySet("any key at all", std::string(300, 'L')), 0);
  EXPECT_EQ(Read(fake, "any key at all"), Result(0, std::string(300, 'L')));
  EXPECT_EQ(fake.SystemPropertySet("k", ""), 0);
  EXPECT_EQ(Read(fake, "k", "d"), Result(0, ""));
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
  // A NUL byte in a key or value is refused, not cut short.
  EXPECT_NE(proxy.SystemPropertySet("test.proxy.nul", std::string("a\0b", 3)), 0);
  EXPECT_NE(proxy.SystemPropertySet(std::string("test.proxy\0b", 12), "1"), 0);
  ASSERT_EQ(property_set(kFatpEnable, "0"), 0);
}

TEST(SystemPropertyProxyDeathTest, SetOutsideFactoryTestIsFatal) {
  ASSERT_EQ(property_set(kFatpEnable, "0"), 0);
  EXPECT_DEATH(
      SystemPropertyProxy().SystemPropertySet("vendor.camera.fatp.rtele.sn", "SN42"),
      "Check failed: is_fatp_enable \\|\\| "
      "!key\\.compare\\(\"vendor\\.camera\\.debug\\.force_dpm_mif_clock_war\"\\) \\|\\| "
      "!key\\.compare\\(\"vendor\\.camera\\.debug\\.vrix_io_entry_debug_mode_enable\"\\) "
      "PropertySet can slow down program significantly, please refrain from calling this!");
}

}  // namespace
}  // namespace orvex
