#include "orvex/api/memory/hal_pixel_format.h"

#include <cstdint>
#include <string>
#include <vector>

#include "gtest/gtest.h"

namespace orvex {
namespace {

using BC = BufferCompression;

// The published code table, written with raw numbers so that a wrong
// enumerator value is caught as well as a wrong property.
struct Row {
  uint32_t code;
  const char* name;
  int bpp;
  BC compression;
  bool aligned_64;
  uint32_t uncompressed;  // 0 means the format itself
};

const std::vector<Row>& CodeTable() {
  static const std::vector<Row> rows = {
      {0x3, "RGB_888", 8, BC::kNone, false, 0},
      {0x14, "YCBCR_422_I", 8, BC::kNone, false, 0},
      {0x20, "RAW16", 16, BC::kNone, false, 0},
      {0x21, "BLOB", 8, BC::kNone, false, 0},
      {0x22, "IMPLEMENTATION_DEFINED", 8, BC::kNone, false, 0},
      {0x23, "YCBCR_420_888", 8, BC::kNone, false, 0},
      {0x25, "RAW10", 10, BC::kNone, false, 0},
      {0x26, "RAW12", 12, BC::kNone, false, 0},
      {0x36, "YCBCR_P010", 16, BC::kNone, false, 0},
      {0x105, "YCBCR_420_SP_M", 8, BC::kNone, false, 0},
      {0x125, "YCBCR_420_SP_M_S10B", 10, BC::kNone, false, 0},
      {0x127, "YCBCR_P010_M", 16, BC::kNone, false, 0},
      {0x130, "YCBCR_420_SP_M_SBWC", 8, BC::kSbwc, true, 0x23},
      {0x132, "YCBCR_420_SP_M_S10B_SBWC", 10, BC::kSbwc, true, 0x125},
      {0x134, "YCRCB_420_SP_M_SBWC", 8, BC::kNone, true, 0},
      {0x140, "YCBCR_420_SP_M_SBWC_L50", 8, BC::kSbwcLossyMedium, false, 0x23},
      {0x141, "YCBCR_420_SP_M_SBWC_L75", 8, BC::kSbwcLossyLow, false, 0x23},
      {0x160, "YCBCR_420_SP_M_S10B_SBWC_L40", 10, BC::kSbwcLossyHigh, false, 0x125},
      {0x161, "YCBCR_420_SP_M_S10B_SBWC_L60", 10, BC::kSbwcLossyMedium, false, 0x125},
      {0x162, "YCBCR_420_SP_M_S10B_SBWC_L80", 10, BC::kSbwcLossyLow, false, 0x125},
      {0x50208, "YCBCR_420_888_I_AFBC_WIDEBLK", 8, BC::kAfbc, false, 0},
      {0x190023, "YCBCR_420_888_AFBC_EXTRAWIDEBLK", 8, BC::kAfbc, false, 0},
      {0x20203859, "Y8", 8, BC::kNone, false, 0},
      {0x20363159, "Y16", 16, BC::kNone, false, 0},
      {0x32315659, "YV12", 8, BC::kNone, false, 0},
      {0x40000000, "RAW16_BAYER_SBWC", 16, BC::kSbwc, true, 0x20},
      {0x40000001, "RAW16_BAYER_SBWC_L50", 16, BC::kSbwcLossyMedium, false, 0x20},
      {0x40000002, "RAW16_BAYER_SBWC_L75", 16, BC::kSbwcLossyLow, false, 0x20},
      {0x40000003, "IMPLEMENTATION_DEFINED_64", 8, BC::kNone, true, 0},
      {0x40000004, "YCBCR_420_888_SINGLE_BUFFER", 8, BC::kNone, false, 0},
      {0x40000005, "Y10", 10, BC::kNone, false, 0},
      {0x40000006, "YCBCR_420_888_STRIDE_ALIGNED_64", 8, BC::kNone, true, 0},
      {0x40000007, "YCBCR_420_SP_M_STRIDE_ALIGNED_64", 8, BC::kNone, true, 0},
      {0x40000008, "YCBCR_420_SP_M_SBWC_STRIDE_ALIGNED_64", 8, BC::kSbwc, true, 0x40000006},
      {0x40000009, "YCBCR_420_SP_M_SBWC_L50_STRIDE_ALIGNED_64", 8, BC::kSbwcLossyMedium, true,
       0x40000006},
      {0x4000000a, "YCBCR_420_SP_M_S10B_STRIDE_ALIGNED_64", 10, BC::kNone, true, 0},
      {0x4000000b, "YCBCR_420_SP_M_S10B_SBWC_STRIDE_ALIGNED_64", 10, BC::kSbwc, true, 0x4000000a},
      {0x4000000c, "YCBCR_420_SP_M_S10B_SBWC_L40_STRIDE_ALIGNED_64", 10, BC::kSbwcLossyHigh, true,
       0x4000000a},
      {0x4000000d, "YCBCR_420_SP_M_S10B_SBWC_L80_STRIDE_ALIGNED_64", 10, BC::kSbwcLossyLow, true,
       0x4000000a},
      {0x4000000e, "YCBCR_420_888_SINGLE_BUFFER_STRIDE_ALIGNED_64", 8, BC::kNone, true, 0},
      {0x4000000f, "YCBCR_P010_M_STRIDE_ALIGNED_64", 16, BC::kNone, true, 0},
  };
  return rows;
}

HalPixelFormat F(uint32_t code) { return static_cast<HalPixelFormat>(code); }

TEST(HalPixelFormatTest, EveryCodeHasItsTableProperties) {
  for (const Row& row : CodeTable()) {
    SCOPED_TRACE(row.name);
    const HalPixelFormat f = F(row.code);
    EXPECT_EQ(FormatToString(f), row.name);
    EXPECT_EQ(BitsPerPixel(f), row.bpp);
    EXPECT_EQ(HalPixelFormatToBufferCompression(f), row.compression);
    EXPECT_EQ(Is64ByteAlignedPixelFormat(f), row.aligned_64);
    EXPECT_EQ(static_cast<uint32_t>(CompressedFormatToNonCompressedFormat(f)),
              row.uncompressed == 0 ? row.code : row.uncompressed);
    EXPECT_EQ(IsAfbcFormat(f), row.compression == BC::kAfbc);
  }
  // The enumerators and the table name the same codes.
  EXPECT_EQ(static_cast<uint32_t>(HalPixelFormat::YCBCR_420_888_AFBC_EXTRAWIDEBLK), 0x190023u);
  EXPECT_EQ(static_cast<uint32_t>(HalPixelFormat::YCBCR_P010_M_STRIDE_ALIGNED_64), 0x4000000fu);
}

TEST(HalPixelFormatTest, ValuesThatAreNoEnumeratorFallBack) {
  const std::vector<std::pair<uint32_t, std::string>> cases = {
      {0x7, "UnknownFormat_0x7"},
      {0x1234, "UnknownFormat_0x1234"},
      {0x40000010, "UnknownFormat_0x40000010"},
      {0x0, "UnknownFormat_0x0"},
      {0xffffffff, "UnknownFormat_0xffffffff"},
      {0x10000, "UnknownFormat_0x10000"},
  };
  for (const auto& [code, name] : cases) {
    SCOPED_TRACE(name);
    const HalPixelFormat f = F(code);
    EXPECT_EQ(FormatToString(f), name);
    EXPECT_EQ(BitsPerPixel(f), 8);
    EXPECT_FALSE(Is64ByteAlignedPixelFormat(f));
    EXPECT_EQ(HalPixelFormatToBufferCompression(f), BC::kNone);
    EXPECT_EQ(CompressedFormatToNonCompressedFormat(f), f);
  }
  // Only bit 16 makes a code AFBC, enumerator or not.
  EXPECT_TRUE(IsAfbcFormat(F(0x10000)));
  EXPECT_FALSE(IsAfbcFormat(HalPixelFormat::RAW16_BAYER_SBWC));
  EXPECT_FALSE(IsAfbcFormat(F(0x40000)));
  // YV12's FourCC code carries bit 16 by accident; it is not compressed.
  EXPECT_NE(static_cast<uint32_t>(HalPixelFormat::YV12) & kAfbcFormatBit, 0u);
  EXPECT_FALSE(IsAfbcFormat(HalPixelFormat::YV12));
}

TEST(HalPixelFormatTest, ColorFilterArrangementTexts) {
  const std::vector<std::pair<ColorFilterArrangement, std::string>> cases = {
      {ColorFilterArrangement::kBggr, "Bggr"}, {ColorFilterArrangement::kGbrg, "Gbrg"},
      {ColorFilterArrangement::kGrbg, "Grbg"}, {ColorFilterArrangement::kRggb, "Rggb"},
      {ColorFilterArrangement::kRgb, "RGB"},   {ColorFilterArrangement::kMono, "Mono"},
      {ColorFilterArrangement::kNir, "Nir"},   {static_cast<ColorFilterArrangement>(7), ""},
  };
  for (const auto& [value, text] : cases) {
    SCOPED_TRACE(static_cast<int>(value));
    EXPECT_EQ(ColorFilterArrangementToString(value), text);
  }
}

}  // namespace
}  // namespace orvex
