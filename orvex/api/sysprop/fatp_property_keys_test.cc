#include "orvex/api/sysprop/fatp_property_keys.h"

#include <cutils/properties.h>

#include <cstdint>
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
  // The ends of the table and of some of its groups.
  for (const auto& [tag, key] : {std::pair{FatpTag::kSensorProbeStatus, "sensor_probe_status"},
                                 {FatpTag::kRwfovSn, "rwfov.sn"},
                                 {FatpTag::kRwideOisLnPos4Y, "rwide.ois.ln_pos_4_y"},
                                 {FatpTag::kRteleSn, "rtele.sn"},
                                 {FatpTag::kFrontInnerSn, "front.inner.sn"},
                                 {FatpTag::kAfPosDac, "af.pos_dac"}}) {
    EXPECT_EQ(GetFatpSystemPropertyKeyOrDie(tag), std::string("vendor.camera.fatp.") + key);
  }
  EXPECT_EQ(static_cast<int>(FatpTag::kAfPosDac), 65);

  for (int value : {0, 66, -1, std::numeric_limits<int32_t>::min()}) {
    SCOPED_TRACE(value);
    const std::string message = "Tag " + std::to_string(value) + " system property not found";
    EXPECT_THAT(GetFatpSystemPropertyKey(static_cast<FatpTag>(value)),
                StatusIs(StatusCode::kNotFound, message));
    EXPECT_THAT(SetFatpSystemProperty(static_cast<FatpTag>(value), "x"),
                StatusIs(StatusCode::kNotFound, message));
  }
}

TEST(FatpPropertyKeysDeathTest, OrDieWithoutKeyIsFatal) {
  EXPECT_DEATH(GetFatpSystemPropertyKeyOrDie(static_cast<FatpTag>(66)),
               "Check failed: property_or\\.ok\\(\\) NOT_FOUND: Tag 66 system property not found");
}

TEST(FatpPropertyKeysTest, SetWritesThroughSystemProperties) {
  SystemProperties& props = SystemProperties::GetInstance();
  props.SetFake(true);
  EXPECT_THAT(SetFatpSystemProperty(FatpTag::kRteleBarcode, "BC-123"), IsOk());
  EXPECT_THAT(props.Get("vendor.camera.fatp.rtele.barcode"), IsOkAndHolds("BC-123"));
  props.SetProxy(nullptr);
  EXPECT_THAT(SetFatpSystemProperty(FatpTag::kRteleSn, "x"),
              StatusIs(StatusCode::kUnavailable, "API PropertyProxy unset"));
  props.SetFake(false);
}

}  // namespace
}  // namespace orvex
