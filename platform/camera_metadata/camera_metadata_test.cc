#include <algorithm>
#include <cstdint>
#include <vector>

#include "camera/CameraMetadata.h"
#include "gtest/gtest.h"

namespace android {
namespace nuvora_camera_hal {
namespace {

// Absent, empty and other-typed entries read as empty; copies and views keep their values.
TEST(InMemoryCameraMetadataTest, TypedEntriesOwnTheirValues) {
  MetadataEntryView<uint8_t> before;
  {
    InMemoryCameraMetadata metadata;
    metadata.SetUint8(7, {1, 2, 3});
    metadata.SetUint8(8, {});
    before = metadata.GetUint8Entry(7);
    EXPECT_TRUE(metadata.GetInt32Entry(7).empty());
    EXPECT_TRUE(metadata.GetUint8Entry(8).empty() && metadata.Contains(8));
    EXPECT_TRUE(metadata.GetUint8Entry(9).empty() && !metadata.Contains(9));
    metadata.SetInt32(7, {-3});
    EXPECT_TRUE(metadata.GetUint8Entry(7).empty());
    InMemoryCameraMetadata copy = metadata;
    EXPECT_TRUE(metadata.Erase(7));
    EXPECT_FALSE(metadata.Erase(7));
    EXPECT_EQ(metadata.size(), 1u);
    EXPECT_TRUE(std::ranges::equal(copy.GetInt32Entry(7).span(), std::vector<int32_t>{-3}));
  }
  EXPECT_TRUE(std::ranges::equal(before.span(), std::vector<uint8_t>{1, 2, 3}));
}

}  // namespace
}  // namespace nuvora_camera_hal
}  // namespace android
