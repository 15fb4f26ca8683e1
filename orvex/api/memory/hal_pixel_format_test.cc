#include "orvex/api/memory/hal_pixel_format.h"

#include <cstdint>
#include <iterator>
#include <span>

#include "gtest/gtest.h"

namespace orvex {
namespace {

using BC = BufferCompression;
constexpr BC N = BC::kNone, S = BC::kSbwc, A = BC::kAfbc, Lo = BC::kSbwcLossyLow,
             Me = BC::kSbwcLossyMedium, Hi = BC::kSbwcLossyHigh;

// The code table in raw numbers, to catch wrong enumerator values too.
struct Row {
  uint32_t code;
  const char* name;
  int bpp, aligned_64;
  BC compression;
  uint32_t uncompressed;  // 0: the format itself
};

constexpr Row kRows[] = {
    {0x3, "RGB_888", 8, 0, N, 0},
    {0x14, "YCBCR_422_I", 8, 0, N, 0},
    {0x20, "RAW16", 16, 0, N, 0},
    {0x21, "BLOB", 8, 0, N, 0},
    {0x22, "IMPLEMENTATION_DEFINED", 8, 0, N, 0},
    {0x23, "YCBCR_420_888", 8, 0, N, 0},
    {0x25, "RAW10", 10, 0, N, 0},
    {0x26, "RAW12", 12, 0, N, 0},
    {0x36, "YCBCR_P010", 16, 0, N, 0},
    {0x105, "YCBCR_420_SP_M", 8, 0, N, 0},
    {0x125, "YCBCR_420_SP_M_S10B", 10, 0, N, 0},
    {0x127, "YCBCR_P010_M", 16, 0, N, 0},
    {0x130, "YCBCR_420_SP_M_SBWC", 8, 1, S, 0x23},
    {0x132, "YCBCR_420_SP_M_S10B_SBWC", 10, 1, S, 0x125},
    {0x134, "YCRCB_420_SP_M_SBWC", 8, 1, N, 0},
    {0x140, "YCBCR_420_SP_M_SBWC_L50", 8, 0, Me, 0x23},
    {0x141, "YCBCR_420_SP_M_SBWC_L75", 8, 0, Lo, 0x23},
    {0x160, "YCBCR_420_SP_M_S10B_SBWC_L40", 10, 0, Hi, 0x125},
    {0x161, "YCBCR_420_SP_M_S10B_SBWC_L60", 10, 0, Me, 0x125},
    {0x162, "YCBCR_420_SP_M_S10B_SBWC_L80", 10, 0, Lo, 0x125},
    {0x50208, "YCBCR_420_888_I_AFBC_WIDEBLK", 8, 0, A, 0},
    {0x190023, "YCBCR_420_888_AFBC_EXTRAWIDEBLK", 8, 0, A, 0},
    {0x20203859, "Y8", 8, 0, N, 0},
    {0x20363159, "Y16", 16, 0, N, 0},
    {0x32315659, "YV12", 8, 0, N, 0},
    {0x40000000, "RAW16_BAYER_SBWC", 16, 1, S, 0x20},
    {0x40000001, "RAW16_BAYER_SBWC_L50", 16, 0, Me, 0x20},
    {0x40000002, "RAW16_BAYER_SBWC_L75", 16, 0, Lo, 0x20},
    {0x40000003, "IMPLEMENTATION_DEFINED_64", 8, 1, N, 0},
    {0x40000004, "YCBCR_420_888_SINGLE_BUFFER", 8, 0, N, 0},
    {0x40000005, "Y10", 10, 0, N, 0},
    {0x40000006, "YCBCR_420_888_STRIDE_ALIGNED_64", 8, 1, N, 0},
    {0x40000007, "YCBCR_420_SP_M_STRIDE_ALIGNED_64", 8, 1, N, 0},
    {0x40000008, "YCBCR_420_SP_M_SBWC_STRIDE_ALIGNED_64", 8, 1, S, 0x40000006},
    {0x40000009, "YCBCR_420_SP_M_SBWC_L50_STRIDE_ALIGNED_64", 8, 1, Me, 0x40000006},
    {0x4000000a, "YCBCR_420_SP_M_S10B_STRIDE_ALIGNED_64", 10, 1, N, 0},
    {0x4000000b, "YCBCR_420_SP_M_S10B_SBWC_STRIDE_ALIGNED_64", 10, 1, S, 0x4000000a},
    {0x4000000c, "YCBCR_420_SP_M_S10B_SBWC_L40_STRIDE_ALIGNED_64", 10, 1, Hi, 0x4000000a},
    {0x4000000d, "YCBCR_420_SP_M_S10B_SBWC_L80_STRIDE_ALIGNED_64", 10, 1, Lo, 0x4000000a},
    {0x4000000e, "YCBCR_420_888_SINGLE_BUFFER_STRIDE_ALIGNED_64", 8, 1, N, 0},
    {0x4000000f, "YCBCR_P010_M_STRIDE_ALIGNED_64", 16, 1, N, 0},
    // Values that are no enumerator fall back.
    {0x40000010, "UnknownFormat_0x40000010", 8, 0, N, 0},
    {0x80000000, "UnknownFormat_0x80000000", 8, 0, N, 0},
};

HalPixelFormat F(uint32_t code) { return static_cast<HalPixelFormat>(code); }

// AllHalPixelFormats lists exactly the table's enumerators, in its order.
TEST(HalPixelFormatTest, PropertiesAndTexts) {
  const std::span<const HalPixelFormat> all = AllHalPixelFormats();
  ASSERT_EQ(all.size() + 2, std::size(kRows));
  for (size_t i = 0; i < std::size(kRows); ++i) {
    const Row& row = kRows[i];
    SCOPED_TRACE(row.name);
    const HalPixelFormat f = F(row.code);
    EXPECT_EQ(i < all.size() ? all[i] : f, f);
    EXPECT_EQ(FormatToString(f), row.name);
    EXPECT_EQ(BitsPerPixel(f), row.bpp);
    EXPECT_EQ(HalPixelFormatToBufferCompression(f), row.compression);
    EXPECT_EQ(Is64ByteAlignedPixelFormat(f), row.aligned_64 != 0);
    EXPECT_EQ(CompressedFormatToNonCompressedFormat(f),
              F(row.uncompressed ? row.uncompressed : row.code));
    EXPECT_EQ(IsAfbcFormat(f), row.compression == BC::kAfbc);
  }
  EXPECT_TRUE(IsAfbcFormat(F(0x10000)));
  EXPECT_FALSE(IsAfbcFormat(F(0x40000)));
  const char* const texts[] = {"Bggr", "Gbrg", "Grbg", "Rggb", "RGB", "Mono", "Nir", ""};
  for (int i = 0; i < 8; ++i) {
    EXPECT_EQ(ColorFilterArrangementToString(static_cast<ColorFilterArrangement>(i)), texts[i]);
  }
}

}  // namespace
}  // namespace orvex
