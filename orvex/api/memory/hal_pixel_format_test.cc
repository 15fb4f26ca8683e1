#include "orvex/api/memory/hal_pixel_format.h"

#include <cstdint>
#include <utility>
#include <vector>

#include "gtest/gtest.h"

namespace orvex {
namespace {

using BC = BufferCompression;
constexpr BC N = BC::kNone, S = BC::kSbwc, A = BC::kAfbc, Lo = BC::kSbwcLossyLow,
             Me = BC::kSbwcLossyMedium, Hi = BC::kSbwcLossyHigh;

// The published code table, written with raw numbers so that a wrong
// enumerator value is caught as well as a wrong property.
struct Row {
  uint32_t code;
  const char* name;
  int bpp;
  BC compression;
  int aligned_64;
  uint32_t uncompressed;  // 0 means the format itself
};

constexpr Row kRows[] = {
    {0x3, "RGB_888", 8, N, 0, 0},
    {0x14, "YCBCR_422_I", 8, N, 0, 0},
    {0x20, "RAW16", 16, N, 0, 0},
    {0x21, "BLOB", 8, N, 0, 0},
    {0x22, "IMPLEMENTATION_DEFINED", 8, N, 0, 0},
    {0x23, "YCBCR_420_888", 8, N, 0, 0},
    {0x25, "RAW10", 10, N, 0, 0},
    {0x26, "RAW12", 12, N, 0, 0},
    {0x36, "YCBCR_P010", 16, N, 0, 0},
    {0x105, "YCBCR_420_SP_M", 8, N, 0, 0},
    {0x125, "YCBCR_420_SP_M_S10B", 10, N, 0, 0},
    {0x127, "YCBCR_P010_M", 16, N, 0, 0},
    {0x130, "YCBCR_420_SP_M_SBWC", 8, S, 1, 0x23},
    {0x132, "YCBCR_420_SP_M_S10B_SBWC", 10, S, 1, 0x125},
    {0x134, "YCRCB_420_SP_M_SBWC", 8, N, 1, 0},
    {0x140, "YCBCR_420_SP_M_SBWC_L50", 8, Me, 0, 0x23},
    {0x141, "YCBCR_420_SP_M_SBWC_L75", 8, Lo, 0, 0x23},
    {0x160, "YCBCR_420_SP_M_S10B_SBWC_L40", 10, Hi, 0, 0x125},
    {0x161, "YCBCR_420_SP_M_S10B_SBWC_L60", 10, Me, 0, 0x125},
    {0x162, "YCBCR_420_SP_M_S10B_SBWC_L80", 10, Lo, 0, 0x125},
    {0x50208, "YCBCR_420_888_I_AFBC_WIDEBLK", 8, A, 0, 0},
    {0x190023, "YCBCR_420_888_AFBC_EXTRAWIDEBLK", 8, A, 0, 0},
    {0x20203859, "Y8", 8, N, 0, 0},
    {0x20363159, "Y16", 16, N, 0, 0},
    {0x32315659, "YV12", 8, N, 0, 0},
    {0x40000000, "RAW16_BAYER_SBWC", 16, S, 1, 0x20},
    {0x40000001, "RAW16_BAYER_SBWC_L50", 16, Me, 0, 0x20},
    {0x40000002, "RAW16_BAYER_SBWC_L75", 16, Lo, 0, 0x20},
    {0x40000003, "IMPLEMENTATION_DEFINED_64", 8, N, 1, 0},
    {0x40000004, "YCBCR_420_888_SINGLE_BUFFER", 8, N, 0, 0},
    {0x40000005, "Y10", 10, N, 0, 0},
    {0x40000006, "YCBCR_420_888_STRIDE_ALIGNED_64", 8, N, 1, 0},
    {0x40000007, "YCBCR_420_SP_M_STRIDE_ALIGNED_64", 8, N, 1, 0},
    {0x40000008, "YCBCR_420_SP_M_SBWC_STRIDE_ALIGNED_64", 8, S, 1, 0x40000006},
    {0x40000009, "YCBCR_420_SP_M_SBWC_L50_STRIDE_ALIGNED_64", 8, Me, 1, 0x40000006},
    {0x4000000a, "YCBCR_420_SP_M_S10B_STRIDE_ALIGNED_64", 10, N, 1, 0},
    {0x4000000b, "YCBCR_420_SP_M_S10B_SBWC_STRIDE_ALIGNED_64", 10, S, 1, 0x4000000a},
    {0x4000000c, "YCBCR_420_SP_M_S10B_SBWC_L40_STRIDE_ALIGNED_64", 10, Hi, 1, 0x4000000a},
    {0x4000000d, "YCBCR_420_SP_M_S10B_SBWC_L80_STRIDE_ALIGNED_64", 10, Lo, 1, 0x4000000a},
    {0x4000000e, "YCBCR_420_888_SINGLE_BUFFER_STRIDE_ALIGNED_64", 8, N, 1, 0},
    {0x4000000f, "YCBCR_P010_M_STRIDE_ALIGNED_64", 16, N, 1, 0},
};

HalPixelFormat F(uint32_t code) { return static_cast<HalPixelFormat>(code); }

TEST(HalPixelFormatTest, EveryCodeHasItsTableProperties) {
  for (const Row& row : kRows) {
    SCOPED_TRACE(row.name);
    const HalPixelFormat f = F(row.code);
    EXPECT_EQ(FormatToString(f), row.name);
    EXPECT_EQ(BitsPerPixel(f), row.bpp);
    EXPECT_EQ(HalPixelFormatToBufferCompression(f), row.compression);
    EXPECT_EQ(Is64ByteAlignedPixelFormat(f), row.aligned_64 != 0);
    EXPECT_EQ(static_cast<uint32_t>(CompressedFormatToNonCompressedFormat(f)),
              row.uncompressed == 0 ? row.code : row.uncompressed);
    EXPECT_EQ(IsAfbcFormat(f), row.compression == BC::kAfbc);
  }
  // The list of every format is this table, in the same (ascending) order.
  std::vector<uint32_t> listed;
  for (HalPixelFormat f : AllHalPixelFormats()) listed.push_back(static_cast<uint32_t>(f));
  std::vector<uint32_t> codes;
  for (const Row& row : kRows) codes.push_back(row.code);
  EXPECT_EQ(listed, codes);
}

TEST(HalPixelFormatTest, ValuesThatAreNoEnumeratorFallBack) {
  for (const auto& [code, name] :
       {std::pair{0x7u, "UnknownFormat_0x7"}, std::pair{0x40000010u, "UnknownFormat_0x40000010"},
        std::pair{0xffffffffu, "UnknownFormat_0xffffffff"}}) {
    const HalPixelFormat f = F(code);
    EXPECT_EQ(FormatToString(f), name);
    EXPECT_EQ(BitsPerPixel(f), 8);
    EXPECT_FALSE(Is64ByteAlignedPixelFormat(f));
    EXPECT_EQ(HalPixelFormatToBufferCompression(f), BC::kNone);
    EXPECT_EQ(CompressedFormatToNonCompressedFormat(f), f);
  }
  // Only bit 16 makes a code AFBC, enumerator or not; YV12's FourCC code
  // carries it by accident.
  EXPECT_TRUE(IsAfbcFormat(F(0x10000)));
  EXPECT_FALSE(IsAfbcFormat(F(0x40000)));
  EXPECT_FALSE(IsAfbcFormat(HalPixelFormat::YV12));
}

TEST(HalPixelFormatTest, ColorFilterArrangementTexts) {
  const char* const texts[] = {"Bggr", "Gbrg", "Grbg", "Rggb", "RGB", "Mono", "Nir", ""};
  for (int i = 0; i < 8; ++i) {
    EXPECT_EQ(ColorFilterArrangementToString(static_cast<ColorFilterArrangement>(i)), texts[i]);
  }
}

}  // namespace
}  // namespace orvex
