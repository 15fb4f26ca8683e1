#include "orvex/api/memory/hal_pixel_format.h"

#include <string_view>

#include "fmt/format.h"
#include "orvex/api/memory/hal_pixel_format_internal.h"

namespace orvex {
namespace hal_pixel_format_internal {
namespace {

// One row per format:
//   name, bits per stored sample, buffer compression, 64-byte aligned,
//   uncompressed counterpart,
//     layout made by ImageFormat::Make, rules ConformsTo checks, chroma order
//     Make records by default, alignment, row-stride multiple ConformsTo
//     requires, lossy compression ratio, single buffer.
// See FormatTraits for what each column means.
#define ORVEX_HAL_PIXEL_FORMATS(X)                                                                 \
  X(RGB_888, 8, kNone, false, RGB_888, kNone, kNone, kNone, 0, 0, 0, false)                        \
  X(YCBCR_422_I, 8, kNone, false, YCBCR_422_I, kInterleaved422, kInterleaved422, kCrCb, 16, 0, 0,  \
    false)                                                                                         \
  X(RAW16, 16, kNone, false, RAW16, kRawBayer, kRaw, kNone, 1, 0, 0, false)                        \
  X(BLOB, 8, kNone, false, BLOB, kBlob, kBlob, kNone, 1, 0, 0, false)                              \
  X(IMPLEMENTATION_DEFINED, 8, kNone, false, IMPLEMENTATION_DEFINED, kNone,                        \
    kImplementationDefined, kNone, 0, 0, 0, false)                                                 \
  X(YCBCR_420_888, 8, kNone, false, YCBCR_420_888, kSemiPlanar420, kSemiPlanar420, kCrCb, 16, 0,   \
    0, false)                                                                                      \
  X(RAW10, 10, kNone, false, RAW10, kRawBayer, kRaw, kNone, 1, 0, 0, false)                        \
  X(RAW12, 12, kNone, false, RAW12, kRawBayer, kRaw, kNone, 1, 0, 0, false)                        \
  X(YCBCR_P010, 16, kNone, false, YCBCR_P010, kSemiPlanar420, kSemiPlanar420, kCbCr, 16, 0, 0,     \
    true)                                                                                          \
  X(YCBCR_420_SP_M, 8, kNone, false, YCBCR_420_SP_M, kSemiPlanar420, kNone, kCbCr, 16, 0, 0,       \
    false)                                                                                         \
  X(YCBCR_420_SP_M_S10B, 10, kNone, false, YCBCR_420_SP_M_S10B, kSemiPlanar420, kSemiPlanar420,    \
    kCrCb, 16, 0, 0, false)                                                                        \
  X(YCBCR_P010_M, 16, kNone, false, YCBCR_P010_M, kSemiPlanar420, kSemiPlanar420, kCbCr, 32, 32,   \
    0, false)                                                                                      \
  X(YCBCR_420_SP_M_SBWC, 8, kSbwc, true, YCBCR_420_888, kSbwcYuvLossless, kSbwcYuvLossless, kCbCr, \
    16, 16, 0, false)                                                                              \
  X(YCBCR_420_SP_M_S10B_SBWC, 10, kSbwc, true, YCBCR_420_SP_M_S10B, kSbwcYuvLossless,              \
    kSbwcYuvLossless, kCbCr, 16, 16, 0, false)                                                     \
  X(YCRCB_420_SP_M_SBWC, 8, kNone, true, YCRCB_420_SP_M_SBWC, kSbwcYuvLossless, kSbwcYuvLossless,  \
    kCbCr, 16, 16, 0, false)                                                                       \
  X(YCBCR_420_SP_M_SBWC_L50, 8, kSbwcLossyMedium, false, YCBCR_420_888, kSbwcYuvLossy,             \
    kSbwcYuvLossy, kCbCr, 32, 32, 50, false)                                                       \
  X(YCBCR_420_SP_M_SBWC_L75, 8, kSbwcLossyLow, false, YCBCR_420_888, kSbwcYuvLossy, kSbwcYuvLossy, \
    kCbCr, 32, 32, 75, false)                                                                      \
  X(YCBCR_420_SP_M_S10B_SBWC_L40, 10, kSbwcLossyHigh, false, YCBCR_420_SP_M_S10B, kSbwcYuvLossy,   \
    kSbwcYuvLossy, kCbCr, 32, 32, 40, false)                                                       \
  X(YCBCR_420_SP_M_S10B_SBWC_L60, 10, kSbwcLossyMedium, false, YCBCR_420_SP_M_S10B, kSbwcYuvLossy, \
    kSbwcYuvLossy, kCbCr, 32, 32, 60, false)                                                       \
  X(YCBCR_420_SP_M_S10B_SBWC_L80, 10, kSbwcLossyLow, false, YCBCR_420_SP_M_S10B, kSbwcYuvLossy,    \
    kSbwcYuvLossy, kCbCr, 32, 32, 80, false)                                                       \
  X(YCBCR_420_888_I_AFBC_WIDEBLK, 8, kAfbc, false, YCBCR_420_888_I_AFBC_WIDEBLK, kAfbcWideBlock,   \
    kAfbcWideBlock, kCrCb, 0, 0, 0, false)                                                         \
  X(YCBCR_420_888_AFBC_EXTRAWIDEBLK, 8, kAfbc, false, YCBCR_420_888_AFBC_EXTRAWIDEBLK,             \
    kAfbcExtraWideBlock, kAfbcExtraWideBlock, kCrCb, 0, 0, 0, false)                               \
  X(Y8, 8, kNone, false, Y8, kMonochrome, kMonochrome, kNone, 16, 16, 0, false)                    \
  X(Y16, 16, kNone, false, Y16, kMonochrome, kMonochrome, kNone, 32, 32, 0, false)                 \
  X(YV12, 8, kNone, false, YV12, kYv12, kYv12, kNone, 16, 16, 0, false)                            \
  X(RAW16_BAYER_SBWC, 16, kSbwc, true, RAW16, kSbwcBayerLossless, kSbwcBayerLossless, kNone, 64,   \
    0, 0, false)                                                                                   \
  X(RAW16_BAYER_SBWC_L50, 16, kSbwcLossyMedium, false, RAW16, kSbwcBayerLossy, kSbwcBayerLossy,    \
    kNone, 32, 32, 50, false)                                                                      \
  X(RAW16_BAYER_SBWC_L75, 16, kSbwcLossyLow, false, RAW16, kSbwcBayerLossy, kSbwcBayerLossy,       \
    kNone, 32, 32, 75, false)                                                                      \
  X(IMPLEMENTATION_DEFINED_64, 8, kNone, true, IMPLEMENTATION_DEFINED_64, kNone, kNone, kNone, 0,  \
    0, 0, false)                                                                                   \
  X(YCBCR_420_888_SINGLE_BUFFER, 8, kNone, false, YCBCR_420_888_SINGLE_BUFFER, kSemiPlanar420,     \
    kSemiPlanar420, kCrCb, 16, 0, 0, true)                                                         \
  X(Y10, 10, kNone, false, Y10, kMonochrome, kMonochrome, kNone, 1, 10, 0, false)                  \
  X(YCBCR_420_888_STRIDE_ALIGNED_64, 8, kNone, true, YCBCR_420_888_STRIDE_ALIGNED_64,              \
    kSemiPlanar420, kSemiPlanar420, kCrCb, 64, 64, 0, false)                                       \
  X(YCBCR_420_SP_M_STRIDE_ALIGNED_64, 8, kNone, true, YCBCR_420_SP_M_STRIDE_ALIGNED_64,            \
    kSemiPlanar420, kSemiPlanar420, kCbCr, 64, 0, 0, false)                                        \
  X(YCBCR_420_SP_M_SBWC_STRIDE_ALIGNED_64, 8, kSbwc, true, YCBCR_420_888_STRIDE_ALIGNED_64,        \
    kSbwcYuvLossless, kSbwcYuvLossless, kCbCr, 64, 64, 0, false)                                   \
  X(YCBCR_420_SP_M_SBWC_L50_STRIDE_ALIGNED_64, 8, kSbwcLossyMedium, true,                          \
    YCBCR_420_888_STRIDE_ALIGNED_64, kSbwcYuvLossy, kSbwcYuvLossy, kCbCr, 64, 64, 50, false)       \
  X(YCBCR_420_SP_M_S10B_STRIDE_ALIGNED_64, 10, kNone, true, YCBCR_420_SP_M_S10B_STRIDE_ALIGNED_64, \
    kSemiPlanar420, kSemiPlanar420, kCrCb, 64, 64, 0, false)                                       \
  X(YCBCR_420_SP_M_S10B_SBWC_STRIDE_ALIGNED_64, 10, kSbwc, true,                                   \
    YCBCR_420_SP_M_S10B_STRIDE_ALIGNED_64, kSbwcYuvLossless, kSbwcYuvLossless, kCbCr, 64, 64, 0,   \
    false)                                                                                         \
  X(YCBCR_420_SP_M_S10B_SBWC_L40_STRIDE_ALIGNED_64, 10, kSbwcLossyHigh, true,                      \
    YCBCR_420_SP_M_S10B_STRIDE_ALIGNED_64, kSbwcYuvLossy, kSbwcYuvLossy, kCbCr, 64, 64, 40, false) \
  X(YCBCR_420_SP_M_S10B_SBWC_L80_STRIDE_ALIGNED_64, 10, kSbwcLossyLow, true,                       \
    YCBCR_420_SP_M_S10B_STRIDE_ALIGNED_64, kSbwcYuvLossy, kSbwcYuvLossy, kCbCr, 64, 64, 80, false) \
  X(YCBCR_420_888_SINGLE_BUFFER_STRIDE_ALIGNED_64, 8, kNone, true,                                 \
    YCBCR_420_888_SINGLE_BUFFER_STRIDE_ALIGNED_64, kSemiPlanar420, kSemiPlanar420, kCrCb, 64, 64,  \
    0, true)                                                                                       \
  X(YCBCR_P010_M_STRIDE_ALIGNED_64, 16, kNone, true, YCBCR_P010_M_STRIDE_ALIGNED_64,               \
    kSemiPlanar420, kSemiPlanar420, kCbCr, 64, 64, 0, false)

}  // namespace

const FormatTraits* FindFormatTraits(HalPixelFormat format) {
  switch (format) {
#define ORVEX_FORMAT_CASE(name, bits, compression, aligned, uncompressed, layout, rules, order, \
                          alignment, multiple, ratio, single)                                   \
  case HalPixelFormat::name: {                                                                  \
    static constexpr FormatTraits kTraits{#name,                                                \
                                          bits,                                                 \
                                          BufferCompression::compression,                       \
                                          aligned,                                              \
                                          HalPixelFormat::uncompressed,                         \
                                          Layout::layout,                                       \
                                          Rules::rules,                                         \
                                          ChromaOrder::order,                                   \
                                          alignment,                                            \
                                          multiple,                                             \
                                          ratio,                                                \
                                          single};                                              \
    return &kTraits;                                                                            \
  }
    ORVEX_HAL_PIXEL_FORMATS(ORVEX_FORMAT_CASE)
#undef ORVEX_FORMAT_CASE
  }
  return nullptr;
}

}  // namespace hal_pixel_format_internal

using hal_pixel_format_internal::FindFormatTraits;

std::span<const HalPixelFormat> AllHalPixelFormats() {
  static constexpr HalPixelFormat kAll[] = {
#define ORVEX_FORMAT_ENUMERATOR(name, ...) HalPixelFormat::name,
      ORVEX_HAL_PIXEL_FORMATS(ORVEX_FORMAT_ENUMERATOR)
#undef ORVEX_FORMAT_ENUMERATOR
  };
  return kAll;
}

std::string FormatToString(HalPixelFormat format) {
  if (const auto* info = FindFormatTraits(format)) return std::string(info->name);
  return fmt::format("UnknownFormat_0x{:x}", static_cast<uint32_t>(format));
}

int BitsPerPixel(HalPixelFormat format) {
  const auto* info = FindFormatTraits(format);
  return info ? info->bits_per_pixel : 8;
}

bool Is64ByteAlignedPixelFormat(HalPixelFormat format) {
  const auto* info = FindFormatTraits(format);
  return info ? info->aligned_64 : false;
}

BufferCompression HalPixelFormatToBufferCompression(HalPixelFormat format) {
  const auto* info = FindFormatTraits(format);
  return info ? info->compression : BufferCompression::kNone;
}

HalPixelFormat CompressedFormatToNonCompressedFormat(HalPixelFormat format) {
  const auto* info = FindFormatTraits(format);
  return info ? info->uncompressed : format;
}

std::string ColorFilterArrangementToString(ColorFilterArrangement arrangement) {
  switch (arrangement) {
    case ColorFilterArrangement::kBggr:
      return "Bggr";
    case ColorFilterArrangement::kGbrg:
      return "Gbrg";
    case ColorFilterArrangement::kGrbg:
      return "Grbg";
    case ColorFilterArrangement::kRggb:
      return "Rggb";
    case ColorFilterArrangement::kRgb:
      return "RGB";
    case ColorFilterArrangement::kMono:
      return "Mono";
    case ColorFilterArrangement::kNir:
      return "Nir";
  }
  return "";
}

}  // namespace orvex
