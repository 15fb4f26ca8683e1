#ifndef ORVEX_API_CAMERA_VENDOR_TAGS_H_
#define ORVEX_API_CAMERA_VENDOR_TAGS_H_

// The HAL's vendor tag table: its sections and tags with their identifiers,
// names and value types. The camera HAL registers this table with the camera
// framework, and every component uses the identifiers defined here.
//
// The table is built during the library's static initialisation and released
// at process exit; nothing changes it in between, so it may be read from any
// thread without locking. Code that runs during static initialisation of
// another library linked against this one may read it too (a shared library
// is initialised before the libraries that depend on it).

#include <cstdint>
#include <string>
#include <vector>

#include "orvex/base/export.h"

namespace android {
namespace nuvora_camera_hal {

// The Android camera metadata type of a tag's values.
enum class VendorTagType : int32_t {
  kByte = 0,
  kInt32 = 1,
};

struct VendorTag {
  uint32_t tag_id = 0;
  std::string tag_name;
  VendorTagType tag_type = VendorTagType::kByte;
};

struct VendorTagSection {
  std::string section_name;
  std::vector<VendorTag> tags;
};

// The identifiers of this library's vendor tags start here.
inline constexpr uint32_t kVendorTagStart = 0x84000000;

// Tag identifiers, grouped by section in table order.
// "com.nuvora.hal.logicalcamera"
inline constexpr uint32_t kDefaultPhysicalCamIdTag = 0x84000000;
// "com.nuvora.kaldo.experimental2016"
inline constexpr uint32_t kHybridAeEnableTag = 0x84000001;
// "com.nuvora.kaldo.experimental2017"
inline constexpr uint32_t kDisableBrevanoTag = 0x84000002;
// "com.nuvora.kaldo.experimental2019"
inline constexpr uint32_t kSensorModeFullFovTag = 0x84000009;
// "com.nuvora.internal"
inline constexpr uint32_t kBrevanoPayloadFramesTag = 0x84000003;
inline constexpr uint32_t kProcessingModeTag = 0x84000004;
inline constexpr uint32_t kThermalThrottlingTag = 0x84000005;
inline constexpr uint32_t kOutputIntentTag = 0x84000006;
inline constexpr uint32_t kAvailableNonWarpedYuvSizesTag = 0x84000007;
inline constexpr uint32_t kNonWarpedYuvStreamIdTag = 0x84000008;
inline constexpr uint32_t kNonWarpedCropRegionTag = 0x8400000A;
inline constexpr uint32_t kHdrUsageModeTag = 0x8400000B;
inline constexpr uint32_t kSwDenoiseEnabledTag = 0x8400000C;
inline constexpr uint32_t kVideoSwDenoiseEnabledTag = 0x8400000D;

// The process-wide table: five sections in registration order, tags within
// a section in registration order. Read-only.
ORVEX_EXPORT extern const std::vector<VendorTagSection> kVendorTagSections;

}  // namespace nuvora_camera_hal
}  // namespace android

#endif  // ORVEX_API_CAMERA_VENDOR_TAGS_H_
