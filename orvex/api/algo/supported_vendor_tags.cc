#include "orvex/api/algo/supported_vendor_tags.h"

#include <array>

#include "orvex/api/camera/vendor_tags.h"

namespace orvex_api {

using android::nuvora_camera_hal::kDisableBrevanoTag;
using android::nuvora_camera_hal::kHybridAeEnableTag;

namespace {

// Each list is sized by its initialiser and checked against its class's
// count, so a missing or extra entry fails to build.
constexpr auto kAeTags = std::to_array<uint32_t>(
    {0x8300007E, kHybridAeEnableTag, 0x8300002F, 0x83000089, 0x83000030, 0x83000033,
     0x83000031, kDisableBrevanoTag, 0x83000006, 0x83000011, 0x83000012, 0x8300004B,
     0x8300004F, 0x8300004C,         0x83000047, 0x83000048, 0x83000081, 0x83000001,
     0x83000057, 0x8300003C,         0x8300003D, 0x8300000D, 0x8300000E, 0x8300000F,
     0x83000010, 0x83000097,         0x83000036, 0x83000045, 0x83000046, 0x830000A6,
     0x830000A7});
static_assert(kAeTags.size() == AeVendorTagsV1::kCount);

constexpr auto kAfTags = std::to_array<uint32_t>(
    {0x83000007, 0x8300007C, 0x8300007E, 0x83000076, 0x83000074, 0x83000075, 0x8300007D,
     0x83000001, 0x83000099, 0x8300009A, 0x83000011, 0x83000015, 0x83000013, 0x83000035,
     0x83000031, 0x83000047, 0x8300004B, 0x83000049, 0x8300004D, 0x83000038, 0x83000037,
     0x83000051, 0x83000055, 0x8300009E, 0x8300009D, 0x83000094, 0x83000095, 0x83000096,
     0x83000098, 0x8300009B, 0x8300004F, 0x83000081, 0x830000A5, 0x8300005D});
static_assert(kAfTags.size() == AfVendorTagsV1::kCount);

constexpr auto kAwbTags = std::to_array<uint32_t>(
    {0x83000008, 0x83000011, 0x83000014, 0x8300004A, 0x8300004E, 0x8300004B, 0x8300004F,
     0x83000047, 0x83000034, 0x8300007E, 0x83000062, 0x8300009B, 0x83000031, 0x83000051,
     0x83000081, 0x8300001D, 0x8300001E, 0x83000001, 0x83000053, 0x83000054, 0x83000038,
     0x83000037, 0x83000084, 0x830000AB, 0x83000035, 0x83000057, 0x8300008F});
static_assert(kAwbTags.size() == AwbVendorTagsV1::kCount);

}  // namespace

SupportedVendorTagSet::~SupportedVendorTagSet() = default;

AeVendorTagsV1::AeVendorTagsV1() : FixedVendorTagSet(kAeTags) {}
AeVendorTagsV1::~AeVendorTagsV1() = default;

AfVendorTagsV1::AfVendorTagsV1() : FixedVendorTagSet(kAfTags) {}
AfVendorTagsV1::~AfVendorTagsV1() = default;

AwbVendorTagsV1::AwbVendorTagsV1() : FixedVendorTagSet(kAwbTags) {}
AwbVendorTagsV1::~AwbVendorTagsV1() = default;

}  // namespace orvex_api
