#include "orvex/api/sysprop/fatp_property_keys.h"

#include <cutils/properties.h>

#include <cstdint>
#include <iterator>
#include <limits>
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

// The keys in tag order, from tag 1.
constexpr const char* kExpectedKeys[] = {
    "vendor.camera.fatp.sensor_probe_status",
    "vendor.camera.fatp.flash_led_device_id",
    "vendor.camera.fatp.disable_flash_led_1",
    "vendor.camera.fatp.disable_flash_led_2",
    "vendor.camera.fatp.flash_led_torch_brightness",
    "vendor.camera.fatp.flash_led_flash_brightness",
    "vendor.camera.fatp.rwfov.sn",
    "vendor.camera.fatp.rwfov.barcode",
    "vendor.camera.fatp.rwide.ois_fw_ver",
    "vendor.camera.fatp.rwide.af_fw_ver",
    "vendor.camera.fatp.rwide.af.hall_max",
    "vendor.camera.fatp.rwide.af.hall_min",
    "vendor.camera.fatp.rwide.af.position_face_up_inf",
    "vendor.camera.fatp.rwide.af.position_face_up_mac",
    "vendor.camera.fatp.rwide.af.position_face_forward_inf",
    "vendor.camera.fatp.rwide.af.position_face_forward_mac",
    "vendor.camera.fatp.rwide.af.position_face_down_inf",
    "vendor.camera.fatp.rwide.af.position_face_down_mac",
    "vendor.camera.fatp.rwide.af.sensitivity",
    "vendor.camera.fatp.rwide.ois.sensitivity_x",
    "vendor.camera.fatp.rwide.ois.sensitivity_y",
    "vendor.camera.fatp.rwide.ois.dac_step_x",
    "vendor.camera.fatp.rwide.ois.dac_step_y",
    "vendor.camera.fatp.rwide.ois.ln_pos_4_x",
    "vendor.camera.fatp.rwide.ois.ln_pos_5_x",
    "vendor.camera.fatp.rwide.ois.ln_pos_4_y",
    "vendor.camera.fatp.rwide.ois.ln_pos_5_y",
    "vendor.camera.fatp.rwide.ois.hall_x_max",
    "vendor.camera.fatp.rwide.ois.hall_x_min",
    "vendor.camera.fatp.rwide.ois.hall_y_max",
    "vendor.camera.fatp.rwide.ois.hall_y_min",
    "vendor.camera.fatp.rtele.sn",
    "vendor.camera.fatp.rtele.barcode",
    "vendor.camera.fatp.rtele.ois_fw_ver",
    "vendor.camera.fatp.rtele.af_fw_ver",
    "vendor.camera.fatp.rtele.af.position_face_up_inf",
    "vendor.camera.fatp.rtele.af.position_face_up_mac",
    "vendor.camera.fatp.rtele.af.position_face_forward_inf",
    "vendor.camera.fatp.rtele.af.position_face_forward_mac",
    "vendor.camera.fatp.rtele.af.position_face_down_inf",
    "vendor.camera.fatp.rtele.af.position_face_down_mac",
    "vendor.camera.fatp.rultrawide.sn",
    "vendor.camera.fatp.rultrawide.barcode",
    "vendor.camera.fatp.rultrawide.af_fw_ver",
    "vendor.camera.fatp.rultrawide.af.hall_max",
    "vendor.camera.fatp.rultrawide.af.hall_min",
    "vendor.camera.fatp.rultrawide.af.position_face_up_inf",
    "vendor.camera.fatp.rultrawide.af.position_face_up_mac",
    "vendor.camera.fatp.rultrawide.af.position_face_forward_inf",
    "vendor.camera.fatp.rultrawide.af.position_face_forward_mac",
    "vendor.camera.fatp.rultrawide.af.position_face_down_inf",
    "vendor.camera.fatp.rultrawide.af.position_face_down_mac",
    "vendor.camera.fatp.rultrawide.af.sensitivity",
    "vendor.camera.fatp.rear.barcode",
    "vendor.camera.fatp.rear.revision",
    "vendor.camera.fatp.front.sn",
    "vendor.camera.fatp.front.barcode",
    "vendor.camera.fatp.front.revision",
    "vendor.camera.fatp.front.inner.sn",
    "vendor.camera.fatp.front.inner.barcode",
    "vendor.camera.fatp.front.inner.revision",
    "vendor.camera.fatp.front.outer.sn",
    "vendor.camera.fatp.front.outer.barcode",
    "vendor.camera.fatp.front.outer.revision",
    "vendor.camera.fatp.af.pos_dac",
};

TEST(FatpPropertyKeysTest, EveryTagHasItsKey) {
  static_assert(std::size(kExpectedKeys) == 65);
  for (int value = 1; value <= 65; ++value) {
    SCOPED_TRACE(value);
    const FatpTag tag = static_cast<FatpTag>(value);
    EXPECT_THAT(GetFatpSystemPropertyKey(tag), IsOkAndHolds(kExpectedKeys[value - 1]));
    EXPECT_EQ(GetFatpSystemPropertyKeyOrDie(tag), kExpectedKeys[value - 1]);
  }
  EXPECT_EQ(GetFatpSystemPropertyKeyOrDie(FatpTag::kRwideOisLnPos4Y),
            "vendor.camera.fatp.rwide.ois.ln_pos_4_y");
  EXPECT_EQ(GetFatpSystemPropertyKeyOrDie(FatpTag::kAfPosDac), "vendor.camera.fatp.af.pos_dac");
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
