#include "orvex/api/sysprop/fatp_property_keys.h"

#include <array>
#include <utility>

#include "orvex/api/sysprop/system_properties.h"
#include "orvex/status/log.h"
#include "orvex/status/status_builder.h"

namespace orvex {
namespace {

// Constant data, so there is nothing to build or tear down and lookups are
// valid at any time, static initialisation of other units included. Entry
// i holds tag i + 1 (checked below).
constexpr std::array<std::pair<FatpTag, std::string_view>, 65> kFatpKeys = {{
    {FatpTag::kSensorProbeStatus, "vendor.camera.fatp.sensor_probe_status"},
    {FatpTag::kFlashLedDeviceId, "vendor.camera.fatp.flash_led_device_id"},
    {FatpTag::kDisableFlashLed1, "vendor.camera.fatp.disable_flash_led_1"},
    {FatpTag::kDisableFlashLed2, "vendor.camera.fatp.disable_flash_led_2"},
    {FatpTag::kFlashLedTorchBrightness, "vendor.camera.fatp.flash_led_torch_brightness"},
    {FatpTag::kFlashLedFlashBrightness, "vendor.camera.fatp.flash_led_flash_brightness"},
    {FatpTag::kRwfovSn, "vendor.camera.fatp.rwfov.sn"},
    {FatpTag::kRwfovBarcode, "vendor.camera.fatp.rwfov.barcode"},
    {FatpTag::kRwideOisFwVer, "vendor.camera.fatp.rwide.ois_fw_ver"},
    {FatpTag::kRwideAfFwVer, "vendor.camera.fatp.rwide.af_fw_ver"},
    {FatpTag::kRwideAfHallMax, "vendor.camera.fatp.rwide.af.hall_max"},
    {FatpTag::kRwideAfHallMin, "vendor.camera.fatp.rwide.af.hall_min"},
    {FatpTag::kRwideAfPositionFaceUpInf, "vendor.camera.fatp.rwide.af.position_face_up_inf"},
    {FatpTag::kRwideAfPositionFaceUpMac, "vendor.camera.fatp.rwide.af.position_face_up_mac"},
    {FatpTag::kRwideAfPositionFaceForwardInf,
     "vendor.camera.fatp.rwide.af.position_face_forward_inf"},
    {FatpTag::kRwideAfPositionFaceForwardMac,
     "vendor.camera.fatp.rwide.af.position_face_forward_mac"},
    {FatpTag::kRwideAfPositionFaceDownInf, "vendor.camera.fatp.rwide.af.position_face_down_inf"},
    {FatpTag::kRwideAfPositionFaceDownMac, "vendor.camera.fatp.rwide.af.position_face_down_mac"},
    {FatpTag::kRwideAfSensitivity, "vendor.camera.fatp.rwide.af.sensitivity"},
    {FatpTag::kRwideOisSensitivityX, "vendor.camera.fatp.rwide.ois.sensitivity_x"},
    {FatpTag::kRwideOisSensitivityY, "vendor.camera.fatp.rwide.ois.sensitivity_y"},
    {FatpTag::kRwideOisDacStepX, "vendor.camera.fatp.rwide.ois.dac_step_x"},
    {FatpTag::kRwideOisDacStepY, "vendor.camera.fatp.rwide.ois.dac_step_y"},
    {FatpTag::kRwideOisLnPos4X, "vendor.camera.fatp.rwide.ois.ln_pos_4_x"},
    {FatpTag::kRwideOisLnPos5X, "vendor.camera.fatp.rwide.ois.ln_pos_5_x"},
    {FatpTag::kRwideOisLnPos4Y, "vendor.camera.fatp.rwide.ois.ln_pos_4_y"},
    {FatpTag::kRwideOisLnPos5Y, "vendor.camera.fatp.rwide.ois.ln_pos_5_y"},
    {FatpTag::kRwideOisHallXMax, "vendor.camera.fatp.rwide.ois.hall_x_max"},
    {FatpTag::kRwideOisHallXMin, "vendor.camera.fatp.rwide.ois.hall_x_min"},
    {FatpTag::kRwideOisHallYMax, "vendor.camera.fatp.rwide.ois.hall_y_max"},
    {FatpTag::kRwideOisHallYMin, "vendor.camera.fatp.rwide.ois.hall_y_min"},
    {FatpTag::kRteleSn, "vendor.camera.fatp.rtele.sn"},
    {FatpTag::kRteleBarcode, "vendor.camera.fatp.rtele.barcode"},
    {FatpTag::kRteleOisFwVer, "vendor.camera.fatp.rtele.ois_fw_ver"},
    {FatpTag::kRteleAfFwVer, "vendor.camera.fatp.rtele.af_fw_ver"},
    {FatpTag::kRteleAfPositionFaceUpInf, "vendor.camera.fatp.rtele.af.position_face_up_inf"},
    {FatpTag::kRteleAfPositionFaceUpMac, "vendor.camera.fatp.rtele.af.position_face_up_mac"},
    {FatpTag::kRteleAfPositionFaceForwardInf,
     "vendor.camera.fatp.rtele.af.position_face_forward_inf"},
    {FatpTag::kRteleAfPositionFaceForwardMac,
     "vendor.camera.fatp.rtele.af.position_face_forward_mac"},
    {FatpTag::kRteleAfPositionFaceDownInf, "vendor.camera.fatp.rtele.af.position_face_down_inf"},
    {FatpTag::kRteleAfPositionFaceDownMac, "vendor.camera.fatp.rtele.af.position_face_down_mac"},
    {FatpTag::kRultrawideSn, "vendor.camera.fatp.rultrawide.sn"},
    {FatpTag::kRultrawideBarcode, "vendor.camera.fatp.rultrawide.barcode"},
    {FatpTag::kRultrawideAfFwVer, "vendor.camera.fatp.rultrawide.af_fw_ver"},
    {FatpTag::kRultrawideAfHallMax, "vendor.camera.fatp.rultrawide.af.hall_max"},
    {FatpTag::kRultrawideAfHallMin, "vendor.camera.fatp.rultrawide.af.hall_min"},
    {FatpTag::kRultrawideAfPositionFaceUpInf,
     "vendor.camera.fatp.rultrawide.af.position_face_up_inf"},
    {FatpTag::kRultrawideAfPositionFaceUpMac,
     "vendor.camera.fatp.rultrawide.af.position_face_up_mac"},
    {FatpTag::kRultrawideAfPositionFaceForwardInf,
     "vendor.camera.fatp.rultrawide.af.position_face_forward_inf"},
    {FatpTag::kRultrawideAfPositionFaceForwardMac,
     "vendor.camera.fatp.rultrawide.af.position_face_forward_mac"},
    {FatpTag::kRultrawideAfPositionFaceDownInf,
     "vendor.camera.fatp.rultrawide.af.position_face_down_inf"},
    {FatpTag::kRultrawideAfPositionFaceDownMac,
     "vendor.camera.fatp.rultrawide.af.position_face_down_mac"},
    {FatpTag::kRultrawideAfSensitivity, "vendor.camera.fatp.rultrawide.af.sensitivity"},
    {FatpTag::kRearBarcode, "vendor.camera.fatp.rear.barcode"},
    {FatpTag::kRearRevision, "vendor.camera.fatp.rear.revision"},
    {FatpTag::kFrontSn, "vendor.camera.fatp.front.sn"},
    {FatpTag::kFrontBarcode, "vendor.camera.fatp.front.barcode"},
    {FatpTag::kFrontRevision, "vendor.camera.fatp.front.revision"},
    {FatpTag::kFrontInnerSn, "vendor.camera.fatp.front.inner.sn"},
    {FatpTag::kFrontInnerBarcode, "vendor.camera.fatp.front.inner.barcode"},
    {FatpTag::kFrontInnerRevision, "vendor.camera.fatp.front.inner.revision"},
    {FatpTag::kFrontOuterSn, "vendor.camera.fatp.front.outer.sn"},
    {FatpTag::kFrontOuterBarcode, "vendor.camera.fatp.front.outer.barcode"},
    {FatpTag::kFrontOuterRevision, "vendor.camera.fatp.front.outer.revision"},
    {FatpTag::kAfPosDac, "vendor.camera.fatp.af.pos_dac"},
}};

constexpr bool TableIsIndexedByTag() {
  for (size_t i = 0; i < kFatpKeys.size(); ++i) {
    if (static_cast<size_t>(kFatpKeys[i].first) != i + 1) return false;
  }
  return true;
}
static_assert(TableIsIndexedByTag(), "factory-test keys must be listed in tag order");

}  // namespace

StatusOr<std::string> GetFatpSystemPropertyKey(FatpTag tag) {
  const int32_t value = static_cast<int32_t>(tag);
  if (value < 1 || static_cast<size_t>(value) > kFatpKeys.size()) {
    return NotFoundErrorBuilder(ORVEX_LOC) << "Tag " << value << " system property not found";
  }
  return std::string(kFatpKeys[static_cast<size_t>(value) - 1].second);
}

std::string GetFatpSystemPropertyKeyOrDie(FatpTag tag) {
  StatusOr<std::string> property_or = GetFatpSystemPropertyKey(tag);
  ORVEX_CHECK(property_or.ok()) << property_or.status();
  return *std::move(property_or);
}

Status SetFatpSystemProperty(FatpTag tag, std::string_view value) {
  StatusOr<std::string> key = GetFatpSystemPropertyKey(tag);
  if (!key.ok()) return key.status();
  return SystemProperties::GetInstance().Set(*key, value);
}

}  // namespace orvex
