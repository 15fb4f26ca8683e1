#include "orvex/api/camera/vendor_tags.h"

namespace android {
namespace nuvora_camera_hal {

// Built by static initialisation, before any code of a dependent library
// runs; destroyed at exit.
const std::vector<VendorTagSection> kVendorTagSections = {
    {"com.nuvora.hal.logicalcamera",
     {{kDefaultPhysicalCamIdTag, "DefaultPhysicalCamId", VendorTagType::kInt32}}},
    {"com.nuvora.kaldo.experimental2016",
     {{kHybridAeEnableTag, "3a.hybrid_ae_enable", VendorTagType::kInt32}}},
    {"com.nuvora.kaldo.experimental2017",
     {{kDisableBrevanoTag, "request.disable_brevano", VendorTagType::kByte}}},
    {"com.nuvora.kaldo.experimental2019",
     {{kSensorModeFullFovTag, "SensorModeFullFov", VendorTagType::kByte}}},
    {"com.nuvora.internal",
     {
         {kBrevanoPayloadFramesTag, "brevano.PayloadFrames", VendorTagType::kInt32},
         {kProcessingModeTag, "ProcessingMode", VendorTagType::kByte},
         {kThermalThrottlingTag, "thermal_throttling", VendorTagType::kByte},
         {kOutputIntentTag, "OutputIntent", VendorTagType::kByte},
         {kAvailableNonWarpedYuvSizesTag, "AvailableNonWarpedYuvSizes", VendorTagType::kInt32},
         {kNonWarpedYuvStreamIdTag, "NonWarpedYuvStreamId", VendorTagType::kInt32},
         {kNonWarpedCropRegionTag, "NonWarpedCropRegion", VendorTagType::kInt32},
         {kHdrUsageModeTag, "hdr.UsageMode", VendorTagType::kByte},
         {kSwDenoiseEnabledTag, "SwDenoiseEnabled", VendorTagType::kByte},
         {kVideoSwDenoiseEnabledTag, "VideoSwDenoiseEnabled", VendorTagType::kByte},
     }},
};

}  // namespace nuvora_camera_hal
}  // namespace android
