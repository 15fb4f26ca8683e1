#include "orvex/api/camera/vendor_tags.h"

#include <set>
#include <string>
#include <tuple>
#include <vector>

#include "gtest/gtest.h"

namespace android {
namespace nuvora_camera_hal {
namespace {

using Row = std::tuple<std::string, uint32_t, std::string, VendorTagType>;

std::vector<Row> Flatten() {
  std::vector<Row> rows;
  for (const VendorTagSection& section : kVendorTagSections) {
    for (const VendorTag& tag : section.tags) {
      rows.emplace_back(section.section_name, tag.tag_id, tag.tag_name, tag.tag_type);
    }
  }
  return rows;
}

TEST(VendorTagsTest, TableInRegistrationOrder) {
  constexpr auto kByte = VendorTagType::kByte;
  constexpr auto kInt32 = VendorTagType::kInt32;
  const std::string internal = "com.nuvora.internal";
  const std::vector<Row> want = {
      {"com.nuvora.hal.logicalcamera", 0x84000000, "DefaultPhysicalCamId", kInt32},
      {"com.nuvora.kaldo.experimental2016", 0x84000001, "3a.hybrid_ae_enable", kInt32},
      {"com.nuvora.kaldo.experimental2017", 0x84000002, "request.disable_brevano", kByte},
      {"com.nuvora.kaldo.experimental2019", 0x84000009, "SensorModeFullFov", kByte},
      {internal, 0x84000003, "brevano.PayloadFrames", kInt32},
      {internal, 0x84000004, "ProcessingMode", kByte},
      {internal, 0x84000005, "thermal_throttling", kByte},
      {internal, 0x84000006, "OutputIntent", kByte},
      {internal, 0x84000007, "AvailableNonWarpedYuvSizes", kInt32},
      {internal, 0x84000008, "NonWarpedYuvStreamId", kInt32},
      {internal, 0x8400000A, "NonWarpedCropRegion", kInt32},
      {internal, 0x8400000B, "hdr.UsageMode", kByte},
      {internal, 0x8400000C, "SwDenoiseEnabled", kByte},
      {internal, 0x8400000D, "VideoSwDenoiseEnabled", kByte},
  };
  EXPECT_EQ(Flatten(), want);

  ASSERT_EQ(kVendorTagSections.size(), 5u);
  const std::vector<size_t> sizes = {1, 1, 1, 1, 10};
  for (size_t i = 0; i < sizes.size(); ++i) {
    SCOPED_TRACE(kVendorTagSections[i].section_name);
    EXPECT_EQ(kVendorTagSections[i].tags.size(), sizes[i]);
  }
  // The value types are the Android metadata type codes.
  EXPECT_EQ(static_cast<int32_t>(kByte), 0);
  EXPECT_EQ(static_cast<int32_t>(kInt32), 1);
}

TEST(VendorTagsTest, IdentifiersAndSectionNamesAreUnique) {
  std::set<uint32_t> ids;
  std::set<std::string> sections;
  std::set<std::string> full_names;
  for (const VendorTagSection& section : kVendorTagSections) {
    EXPECT_TRUE(sections.insert(section.section_name).second) << section.section_name;
    for (const VendorTag& tag : section.tags) {
      SCOPED_TRACE(tag.tag_name);
      EXPECT_TRUE(ids.insert(tag.tag_id).second);
      EXPECT_TRUE(full_names.insert(section.section_name + "." + tag.tag_name).second);
      EXPECT_GE(tag.tag_id, kVendorTagStart);
      EXPECT_LT(tag.tag_id, kVendorTagStart + 0x10000);
    }
  }
  EXPECT_EQ(ids.size(), 14u);
}

}  // namespace
}  // namespace nuvora_camera_hal
}  // namespace android
