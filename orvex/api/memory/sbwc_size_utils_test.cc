#include "orvex/api/memory/sbwc_size_utils.h"

#include <climits>
#include <vector>

#include "gtest/gtest.h"

namespace orvex::sbwc_size_utils {
namespace {

TEST(SbwcSizeUtilsTest, LosslessPayloadStride) {
  struct Case {
    int width, bpp, alignment;
    size_t want;
  };
  const std::vector<Case> cases = {
      {4000, 16, 64, 16 * 512},  // 16 started groups of 256 pixels, 512 bytes each
      {4000, 16, 32, 16 * 512}, {256, 8, 32, 256},        // 2048 bits per block
      {257, 8, 64, 512},        {1920, 10, 32, 8 * 320},  // 2560 bits per block
      {1920, 10, 64, 8 * 320},  {256, 9, 32, 320},        // 2304 bits round up to 2560
      {1, 12, 64, 384},         {0, 16, 64, 0},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(testing::Message() << c.width << " " << c.bpp << " " << c.alignment);
    EXPECT_EQ((GetPayloadStride<256, 1>(c.width, c.bpp, c.alignment)), c.want);
  }
  // The widest int width does not overflow the block count.
  EXPECT_EQ((GetPayloadStride<256, 1>(INT_MAX, 16, 64)), size_t{8388608} * 512);
}

TEST(SbwcSizeUtilsTest, LossyPayloadStrides) {
  struct Case {
    bool bayer;
    int width, bpp, alignment, ratio;
    int want;
  };
  const std::vector<Case> cases = {
      {true, 4000, 16, 32, 75, 125 * 384},
      {true, 4000, 16, 32, 50, 125 * 256},
      {true, 4001, 16, 64, 75, 126 * 384},
      {true, 4000, 16, 256, 75, 125 * 512},  // blocks are aligned, the product is not
      {false, 1920, 8, 64, 75, 60 * 128},
      {false, 1920, 8, 32, 75, 60 * 96},
      {false, 1920, 8, 64, 50, 60 * 64},
      {false, 1920, 10, 32, 40, 60 * 64},
      {false, 1920, 10, 32, 60, 60 * 96},
      {false, 1920, 10, 64, 60, 60 * 128},
      {false, 1920, 10, 32, 80, 60 * 128},
      {false, 33, 8, 32, 50, 2 * 64},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(testing::Message() << c.bayer << " " << c.width << " " << c.bpp << " "
                                    << c.alignment << " " << c.ratio);
    EXPECT_EQ(c.bayer ? GetLossyBayerPayloadStride(c.width, c.bpp, c.alignment, c.ratio)
                      : GetLossyYuvPayloadStride(c.width, c.bpp, c.alignment, c.ratio),
              c.want);
  }
  // Exact in 64 bits even where the int result would not hold it.
  EXPECT_EQ(detail::LossyBayerPayloadStride(INT_MAX, 16, 32, 75), int64_t{67108864} * 384);
}

TEST(SbwcSizeUtilsTest, HeaderSizes) {
  // 1920x1080: stride AlignUp(30, 16) = 32, 1088 rows.
  EXPECT_EQ(GetYHeaderSize(1920, 1080, 16), 32 * 272 + 256);
  EXPECT_EQ(GetUVHeaderSize(1920, 1080, 16), 32 * 136 + 128);
  EXPECT_EQ(GetYHeaderSize(1920, 1080, 64), 64 * 272 + 256);
  EXPECT_EQ(GetUVHeaderSize(1920, 1080, 64), 64 * 136 + 128);
  // 4000 wide: 63 header bytes per row, aligned to 64.
  EXPECT_EQ(GetYHeaderSize(4000, 3000, 16), 64 * 752 + 256);
  EXPECT_EQ(GetYHeaderSize(0, 0, 16), 256);
  EXPECT_EQ(GetUVHeaderSize(0, 0, 64), 128);
}

TEST(SbwcSizeUtilsDeathTest, PreconditionsAreFatalWithTheirTexts) {
  EXPECT_DEATH((void)(GetPayloadStride<256, 1>(64, 8, 16)),
               "Check failed: payload_stride_alignment == 32 \\|\\| payload_stride_alignment == "
               "64 value: 16");
  EXPECT_DEATH((void)GetLossyBayerPayloadStride(64, 10, 32, 50),
               "Check failed: bits_per_pixel == 16 SBWC lossy bayer formats don't support "
               "bits_per_pixel: 10");
  EXPECT_DEATH((void)GetLossyBayerPayloadStride(64, 16, 32, 60),
               "Check failed: compression_ratio == 50 \\|\\| compression_ratio == 75 SBWC lossy "
               "bayer 16bit formats don't support compression_ratio: 60");
  EXPECT_DEATH((void)GetLossyYuvPayloadStride(64, 16, 32, 50),
               "Check failed: bits_per_pixel == 8 \\|\\| bits_per_pixel == 10 SBWC lossy YUV "
               "formats don't support bits_per_pixel: 16");
  EXPECT_DEATH((void)GetLossyYuvPayloadStride(64, 8, 32, 40),
               "Check failed: compression_ratio == 50 \\|\\| compression_ratio == 75 SBWC lossy "
               "YUV 8bit formats don't support compression_ratio: 40");
  EXPECT_DEATH((void)GetLossyYuvPayloadStride(64, 10, 32, 50),
               "Check failed: compression_ratio == 40 \\|\\| compression_ratio == 60 \\|\\| "
               "compression_ratio == 80 SBWC lossy YUV 10bit formats don't support "
               "compression_ratio: 50");
  EXPECT_DEATH((void)GetYHeaderSize(64, 64, 32),
               "Check failed: header_stride_alignment == 16 \\|\\| header_stride_alignment == 64 "
               "value: 32");
  EXPECT_DEATH((void)GetUVHeaderSize(64, 64, 0),
               "Check failed: header_stride_alignment == 16 \\|\\| header_stride_alignment == 64 "
               "value: 0");
  // A lossy stride with an alignment that is no power of 2 stops in the
  // alignment check.
  EXPECT_DEATH((void)GetLossyYuvPayloadStride(64, 8, 48, 50),
               "alignment value: 48 is not a power of 2");
}

}  // namespace
}  // namespace orvex::sbwc_size_utils
