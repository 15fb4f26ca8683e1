#include <cstdint>
#include <vector>

#include "camera/CameraMetadata.h"
#include "gtest/gtest.h"

namespace android {
namespace nuvora_camera_hal {
namespace {

template <typename T>
std::vector<T> Values(const MetadataEntryView<T>& view) {
  return std::vector<T>(view.begin(), view.end());
}

TEST(InMemoryCameraMetadataTest, TypedLookups) {
  InMemoryCameraMetadata metadata;
  metadata.SetUint8(0x1000D, {4, 9});
  metadata.SetInt32(0x84000000, {-3});
  metadata.SetUint8(0x10007, {});

  EXPECT_EQ(Values(metadata.GetUint8Entry(0x1000D)), (std::vector<uint8_t>{4, 9}));
  EXPECT_EQ(Values(metadata.GetInt32Entry(0x84000000)), (std::vector<int32_t>{-3}));
  EXPECT_TRUE(metadata.GetInt32Entry(0x1000D).empty());
  // Absent tags, empty entries and entries of the other type read as empty.
  const struct {
    uint32_t tag;
    bool contained;
  } empty_u8[] = {{0x10007, true}, {0x84000000, true}, {0x1, false}};
  for (const auto& c : empty_u8) {
    SCOPED_TRACE(c.tag);
    EXPECT_EQ(metadata.GetUint8Entry(c.tag).size(), 0u);
    EXPECT_EQ(metadata.Contains(c.tag), c.contained);
  }
  EXPECT_EQ(metadata.size(), 3u);
}

TEST(InMemoryCameraMetadataTest, ViewsOutliveChangesAndOwner) {
  MetadataEntryView<uint8_t> before;
  {
    InMemoryCameraMetadata metadata;
    metadata.SetUint8(7, {1, 2, 3});
    before = metadata.GetUint8Entry(7);
    metadata.SetInt32(7, {5});  // Replaces the entry with another type.
    EXPECT_TRUE(metadata.GetUint8Entry(7).empty());

    InMemoryCameraMetadata copy = metadata;
    EXPECT_TRUE(metadata.Erase(7));
    EXPECT_FALSE(metadata.Erase(7));
    EXPECT_EQ(Values(copy.GetInt32Entry(7)), (std::vector<int32_t>{5}));
  }
  // The metadata is gone; the view still owns the old values.
  EXPECT_EQ(Values(before), (std::vector<uint8_t>{1, 2, 3}));
}

}  // namespace
}  // namespace nuvora_camera_hal
}  // namespace android
