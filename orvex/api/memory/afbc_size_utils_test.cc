#include "orvex/api/memory/afbc_size_utils.h"

#include <vector>

#include "gtest/gtest.h"

namespace orvex::afbc_size_utils {
namespace {

constexpr HalPixelFormat kExtraWideTiled = HalPixelFormat::YCBCR_420_888_AFBC_EXTRAWIDEBLK;

HalPixelFormat Code(uint32_t code) { return static_cast<HalPixelFormat>(code); }

// Geometry of each combination of modifier bits (wide wins over extra-wide).
TEST(AfbcSizeUtilsTest, GeometryFollowsModifierBits) {
  struct Case {
    HalPixelFormat format;
    int width, height, payload_width, payload_height, header_width, header_height;
    size_t aligned_1;
  };
  const std::vector<Case> cases = {
      {kExtraWideTiled, 1920, 1080, 2048, 1088, 32, 272, 4096},
      {Code(0x110023), 100, 4, 128, 4, 2, 1, 1024},
      {Code(0x150023), 100, 6, 128, 16, 4, 2, 1024},
      {HalPixelFormat::YCBCR_420_888_I_AFBC_WIDEBLK, 1930, 1, 1952, 16, 61, 2, 1024},
      {Code(0xd0023), 100, 100, 256, 128, 8, 16, 4096},
      {Code(0x10023), 1920, 1080, 1920, 1088, 120, 68, 1024},
      {Code(0x90023), 1921, 1080, 2048, 1152, 128, 72, 4096},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(testing::Message() << std::hex << static_cast<uint32_t>(c.format));
    EXPECT_EQ(GetPayloadWidth(c.format, c.width), c.payload_width);
    EXPECT_EQ(GetPayloadHeight(c.format, c.height), c.payload_height);
    EXPECT_EQ(GetHeaderWidth(c.format, c.width), c.header_width);
    EXPECT_EQ(GetHeaderHeight(c.format, c.height), c.header_height);
    EXPECT_EQ(AlignBufferSize(c.format, 1), c.aligned_1);
  }
  EXPECT_EQ(GetHeaderStride(32), 512);
  EXPECT_EQ(GetPayloadStride(1920, 12), 2880);
  EXPECT_EQ(AlignBufferSize(kExtraWideTiled, 4096), 4096u);
  // The 64-bit forms are exact where the int results would not be.
  EXPECT_EQ(detail::PayloadWidth(kExtraWideTiled, INT32_MAX), int64_t{1} << 31);
}

TEST(AfbcSizeUtilsDeathTest, NonAfbcFormatsAreFatal) {
  constexpr char kText[] = "Check failed: IsAfbcFormat\\(format\\) ";
  constexpr HalPixelFormat kRaw16 = HalPixelFormat::RAW16;
  EXPECT_DEATH((void)GetPayloadWidth(kRaw16, 64), kText);
  EXPECT_DEATH((void)GetPayloadHeight(kRaw16, 64), kText);
  EXPECT_DEATH((void)GetHeaderWidth(kRaw16, 64), kText);
  EXPECT_DEATH((void)GetHeaderHeight(kRaw16, 64), kText);
  EXPECT_DEATH((void)AlignBufferSize(kRaw16, 64), kText);
}

}  // namespace
}  // namespace orvex::afbc_size_utils
