#ifndef ORVEX_API_SYSPROP_FATP_PROPERTY_KEYS_H_
#define ORVEX_API_SYSPROP_FATP_PROPERTY_KEYS_H_

// Factory-test (final assembly, test and pack) property keys.
//
// Each FatpTag value 1..65 names one "vendor.camera.fatp." property that the
// camera stack publishes during factory test (module serial numbers,
// barcodes, firmware versions, autofocus and stabiliser calibration, flash
// settings). Value 0 and values above 65 have no key.
//
//   ORVEX_RETURN_IF_ERROR(orvex::SetFatpSystemProperty(orvex::FatpTag::kRteleSn, serial));
//
// Writing through the system proxy is allowed only while
// "persist.vendor.camera.fatp.enable" is true (see system_property_proxy.h).
//
// Thread safety: the key table is constant; lookups may run from any thread.

#include <cstdint>
#include <string>
#include <string_view>

#include "orvex/base/export.h"
#include "orvex/status/status.h"
#include "orvex/status/statusor.h"

namespace orvex {

enum class FatpTag : int32_t {
  kSensorProbeStatus = 1,
  kFlashLedDeviceId = 2,
  kDisableFlashLed1 = 3,
  kDisableFlashLed2 = 4,
  kFlashLedTorchBrightness = 5,
  kFlashLedFlashBrightness = 6,
  kRwfovSn = 7,
  kRwfovBarcode = 8,
  kRwideOisFwVer = 9,
  kRwideAfFwVer = 10,
  kRwideAfHallMax = 11,
  kRwideAfHallMin = 12,
  kRwideAfPositionFaceUpInf = 13,
  kRwideAfPositionFaceUpMac = 14,
  kRwideAfPositionFaceForwardInf = 15,
  kRwideAfPositionFaceForwardMac = 16,
  kRwideAfPositionFaceDownInf = 17,
  kRwideAfPositionFaceDownMac = 18,
  kRwideAfSensitivity = 19,
  kRwideOisSensitivityX = 20,
  kRwideOisSensitivityY = 21,
  kRwideOisDacStepX = 22,
  kRwideOisDacStepY = 23,
  kRwideOisLnPos4X = 24,
  kRwideOisLnPos5X = 25,
  kRwideOisLnPos4Y = 26,
  kRwideOisLnPos5Y = 27,
  kRwideOisHallXMax = 28,
  kRwideOisHallXMin = 29,
  kRwideOisHallYMax = 30,
  kRwideOisHallYMin = 31,
  kRteleSn = 32,
  kRteleBarcode = 33,
  kRteleOisFwVer = 34,
  kRteleAfFwVer = 35,
  kRteleAfPositionFaceUpInf = 36,
  kRteleAfPositionFaceUpMac = 37,
  kRteleAfPositionFaceForwardInf = 38,
  kRteleAfPositionFaceForwardMac = 39,
  kRteleAfPositionFaceDownInf = 40,
  kRteleAfPositionFaceDownMac = 41,
  kRultrawideSn = 42,
  kRultrawideBarcode = 43,
  kRultrawideAfFwVer = 44,
  kRultrawideAfHallMax = 45,
  kRultrawideAfHallMin = 46,
  kRultrawideAfPositionFaceUpInf = 47,
  kRultrawideAfPositionFaceUpMac = 48,
  kRultrawideAfPositionFaceForwardInf = 49,
  kRultrawideAfPositionFaceForwardMac = 50,
  kRultrawideAfPositionFaceDownInf = 51,
  kRultrawideAfPositionFaceDownMac = 52,
  kRultrawideAfSensitivity = 53,
  kRearBarcode = 54,
  kRearRevision = 55,
  kFrontSn = 56,
  kFrontBarcode = 57,
  kFrontRevision = 58,
  kFrontInnerSn = 59,
  kFrontInnerBarcode = 60,
  kFrontInnerRevision = 61,
  kFrontOuterSn = 62,
  kFrontOuterBarcode = 63,
  kFrontOuterRevision = 64,
  kAfPosDac = 65,
};

// The property key of `tag`, or NOT_FOUND "Tag <value> system property not
// found".
ORVEX_EXPORT StatusOr<std::string> GetFatpSystemPropertyKey(FatpTag tag);

// The property key of `tag`. Precondition: `tag` has a key (1..65);
// otherwise the process ends with "Check failed: property_or.ok() " and the
// NOT_FOUND status text.
ORVEX_EXPORT std::string GetFatpSystemPropertyKeyOrDie(FatpTag tag);

// Writes `value` to the property of `tag` through SystemProperties; the
// NOT_FOUND error of GetFatpSystemPropertyKey (and no write) for a tag
// without a key.
ORVEX_EXPORT Status SetFatpSystemProperty(FatpTag tag, std::string_view value);

}  // namespace orvex

#endif  // ORVEX_API_SYSPROP_FATP_PROPERTY_KEYS_H_
