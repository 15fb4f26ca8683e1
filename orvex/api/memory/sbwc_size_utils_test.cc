#include "orvex/api/memory/sbwc_size_utils.h"

#include <climits>
#include <functional>
#include <vector>

#include "gtest/gtest.h"

namespace orvex::sbwc_size_utils {
namespace {

TEST(SbwcSizeUtilsTest, PayloadStridesAndHeaderSizes) {
  // Lossless: started 256-pixel groups, samples rounded up to an even number of bits.
  EXPECT_EQ((GetPayloadStride<256, 1>(4000, 16, 64)), 16u * 512);
  EXPECT_EQ((GetPayloadStride<256, 1>(257, 8, 64)), 512u);
  EXPECT_EQ((GetPayloadStride<256, 1>(256, 9, 32)), 320u);  // 2304 bits round up to 2560
  EXPECT_EQ((GetPayloadStride<256, 1>(INT_MAX, 16, 64)), size_t{8388608} * 512);
  // Lossy: 32-pixel blocks, each aligned; the product is not.
  struct Case {
    bool bayer;
    int width, bpp, alignment, ratio, want;
  };
  const std::vector<Case> cases = {
      {true, 4000, 16, 32, 75, 125 * 384},  {true, 4001, 16, 64, 50, 126 * 256},
      {true, 4000, 16, 256, 75, 125 * 512}, {false, 1920, 8, 64, 75, 60 * 128},
      {false, 1920, 8, 32, 75, 60 * 96},    {false, 33, 8, 32, 50, 2 * 64},
      {false, 1920, 10, 32, 40, 60 * 64},   {false, 1920, 10, 64, 60, 60 * 128},
      {false, 1920, 10, 32, 80, 60 * 128},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(testing::Message()
                 << c.width << ' ' << c.bpp << ' ' << c.alignment << ' ' << c.ratio);
    EXPECT_EQ(c.bayer ? GetLossyBayerPayloadStride(c.width, c.bpp, c.alignment, c.ratio)
                      : GetLossyYuvPayloadStride(c.width, c.bpp, c.alignment, c.ratio),
              c.want);
  }
  // Exact in 64 bits even where the int result would not hold it.
  EXPECT_EQ(detail::LossyBayerPayloadStride(INT_MAX, 16, 32, 75), int64_t{67108864} * 384);
  // Header sizes, 1920x1080: stride AlignUp(30, 16) = 32 (or 64), 1088 rows.
  EXPECT_EQ(GetYHeaderSize(1920, 1080, 16), 32 * 272 + 256);
  EXPECT_EQ(GetUVHeaderSize(1920, 1080, 16), 32 * 136 + 128);
  EXPECT_EQ(GetYHeaderSize(1920, 1080, 64), 64 * 272 + 256);
  EXPECT_EQ(GetUVHeaderSize(0, 0, 64), 128);
  // 4000 wide: 63 header bytes per row, aligned to 64.
  EXPECT_EQ(GetYHeaderSize(4000, 3000, 16), 64 * 752 + 256);
}

TEST(SbwcSizeUtilsDeathTest, PreconditionsAreFatalWithTheirTexts) {
  const std::vector<std::pair<std::function<void()>, const char*>> cases = {
      {[] { GetPayloadStride<256, 1>(64, 8, 16); },
       "payload_stride_alignment == 32 \\|\\| payload_stride_alignment == 64 value: 16"},
      {[] { GetLossyBayerPayloadStride(64, 10, 32, 50); },
       "bits_per_pixel == 16 SBWC lossy bayer formats don't support bits_per_pixel: 10"},
      {[] { GetLossyBayerPayloadStride(64, 16, 32, 60); },
       "compression_ratio == 50 \\|\\| compression_ratio == 75 SBWC lossy bayer 16bit formats "
       "don't support compression_ratio: 60"},
      {[] { GetLossyYuvPayloadStride(64, 16, 32, 50); },
       "bits_per_pixel == 8 \\|\\| bits_per_pixel == 10 SBWC lossy YUV formats don't support "
       "bits_per_pixel: 16"},
      {[] { GetLossyYuvPayloadStride(64, 8, 32, 40); },
       "compression_ratio == 50 \\|\\| compression_ratio == 75 SBWC lossy YUV 8bit formats don't "
       "support compression_ratio: 40"},
      {[] { GetLossyYuvPayloadStride(64, 10, 32, 50); },
       "compression_ratio == 40 \\|\\| compression_ratio == 60 \\|\\| compression_ratio == 80 "
       "SBWC lossy YUV 10bit formats don't support compression_ratio: 50"},
      {[] { GetYHeaderSize(64, 64, 32); },
       "header_stride_alignment == 16 \\|\\| header_stride_alignment == 64 value: 32"},
  };
  for (const auto& [call, text] : cases) {
    SCOPED_TRACE(text);
    EXPECT_DEATH(call(), std::string("Check failed: ") + text);
  }
}

}  // namespace
}  // namespace orvex::sbwc_size_utils
