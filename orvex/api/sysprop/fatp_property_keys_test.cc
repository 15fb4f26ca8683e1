#include "orvex/api/sysprop/fatp_property_keys.h"

#include <cutils/properties.h>

#include <cstdint>
#include <iterator>
#include <limits>
#include <set>
#include <string>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/sysprop/system_properties.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::IsOk;
using ::orvex::testing::IsOkAndHolds;
using ::orvex::testing::StatusIs;

TEST(FatpPropertyKeysTest, EveryTagHasItsOwnKey) {
  std::set<std::string> keys;
  for (int value = 1; value <= 65; ++value) {
    SCOPED_TRACE(value);
    const StatusOr<std::string> key = GetFatpSystemPropertyKey(static_cast<FatpTag>(value));
    ASSERT_THAT(key, IsOk());
    EXPECT_THAT(*key, ::testing::StartsWith("vendor.camera.fatp."));
    EXPECT_EQ(property_set(key->c_str(), "probe"), 0) << "not a valid property key";
    EXPECT_EQ(GetFatpSystemPropertyKeyOrDie(static_cast<FatpTag>(value)), *key);
    keys.insert(*key);
  }
  EXPECT_EQ(keys.size(), 65u);
  const std::pair<int, const char*> spot_checks[] = {
      {1, "vendor.camera.fatp.sensor_probe_status"},
      {4, "vendor.camera.fatp.disable_flash_led_2"},
      {7, "vendor.camera.fatp.rwfov.sn"},
      {26, "vendor.camera.fatp.rwide.ois.ln_pos_4_y"},
      {31, "vendor.camera.fatp.rwide.ois.hall_y_min"},
      {32, "vendor.camera.fatp.rtele.sn"},
      {53, "vendor.camera.fatp.rultrawide.af.sensitivity"},
      {59, "vendor.camera.fatp.front.inner.sn"},
      {65, "vendor.camera.fatp.af.pos_dac"}};
  for (const auto& [value, key] : spot_checks) {
    EXPECT_EQ(GetFatpSystemPropertyKeyOrDie(static_cast<FatpTag>(value)), key);
  }
  EXPECT_EQ(static_cast<int>(FatpTag::kRwideOisLnPos4Y), 26);
  EXPECT_EQ(static_cast<int>(FatpTag::kAfPosDac), 65);
}

TEST(FatpPropertyKeysTest, TagsWithoutKey) {
  for (int value : {0, 66, -1, 1000, std::numeric_limits<int32_t>::min()}) {
    SCOPED_TRACE(value);
    const std::string message = "Tag " + std::to_string(value) + " system property not found";
    EXPECT_THAT(GetFatpSystemPropertyKey(static_cast<FatpTag>(value)),
                StatusIs(StatusCode::kNotFound, message));
    EXPECT_THAT(SetFatpSystemProperty(static_cast<FatpTag>(value), "x"),
                StatusIs(StatusCode::kNotFound, message));
  }
}

TEST(FatpPropertyKeysDeathTest, OrDieWithoutKeyIsFatal) {
  EXPECT_DEATH(GetFatpSystemPropertyKeyOrDie(static_cast<FatpTag>(0)),
               "Check failed: property_or\\.ok\\(\\) NOT_FOUND: Tag 0 system property not found");
  EXPECT_DEATH(GetFatpSystemPropertyKeyOrDie(static_cast<FatpTag>(66)),
               "Check failed: property_or\\.ok\\(\\) NOT_FOUND: Tag 66 system property not found");
}

TEST(FatpPropertyKeysTest, SetWritesThroughSystemProperties) {
  SystemProperties& props = SystemProperties::GetInstance();
  props.SetFake(true);
  EXPECT_THAT(SetFatpSystemProperty(FatpTag::kRteleBarcode, "BC-123"), IsOk());
  EXPECT_THAT(props.Get("vendor.camera.fatp.rtele.barcode"), IsOkAndHolds("BC-123"));

  // Through the platform, with factory test enabled.
  props.SetFake(false);
  ASSERT_EQ(property_set("persist.vendor.camera.fatp.enable", "1"), 0);
  EXPECT_THAT(SetFatpSystemProperty(FatpTag::kFrontOuterRevision, "rev7"), IsOk());
  char value[PROPERTY_VALUE_MAX];
  property_get("vendor.camera.fatp.front.outer.revision", value, nullptr);
  EXPECT_STREQ(value, "rev7");
  ASSERT_EQ(property_set("persist.vendor.camera.fatp.enable", "0"), 0);

  props.SetProxy(nullptr);
  EXPECT_THAT(SetFatpSystemProperty(FatpTag::kRteleSn, "x"),
              StatusIs(StatusCode::kUnavailable, "API PropertyProxy unset"));
  props.SetFake(false);
}

}  // namespace
}  // namespace orvex
