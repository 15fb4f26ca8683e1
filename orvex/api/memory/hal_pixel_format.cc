#include "orvex/api/memory/hal_pixel_format.h"

#include <optional>
#include <string_view>

#include "fmt/format.h"

namespace orvex {
namespace {

struct FormatInfo {
  std::string_view name;
  int bits_per_pixel;
  BufferCompression compression;
  bool aligned_64;
  HalPixelFormat uncompressed;
};

// name, bits per sample, compression, 64-byte aligned, uncompressed format.
#define ORVEX_HAL_PIXEL_FORMATS(X)                                                                 \
  X(RGB_888, 8, kNone, false, RGB_888)                                                             \
  X(YCBCR_422_I, 8, kNone, false, YCBCR_422_I)                                                     \
  X(RAW16, 16, kNone, false, RAW16)                                                                \
  X(BLOB, 8, kNone, false, BLOB)                                                                   \
  X(IMPLEMENTATION_DEFINED, 8, kNone, false, IMPLEMENTATION_DEFINED)                               \
  X(YCBCR_420_888, 8, kNone, false, YCBCR_420_888)                                                 \
  X(RAW10, 10, kNone, false, RAW10)                                                                \
  X(RAW12, 12, kNone, false, RAW12)                                                                \
  X(YCBCR_P010, 16, kNone, false, YCBCR_P010)                                                      \
  X(YCBCR_420_SP_M, 8, kNone, false, YCBCR_420_SP_M)                                               \
  X(YCBCR_420_SP_M_S10B, 10, kNone, false, YCBCR_420_SP_M_S10B)                                    \
  X(YCBCR_P010_M, 16, kNone, false, YCBCR_P010_M)                                                  \
  X(YCBCR_420_SP_M_SBWC, 8, kSbwc, true, YCBCR_420_888)                                            \
  X(YCBCR_420_SP_M_S10B_SBWC, 10, kSbwc, true, YCBCR_420_SP_M_S10B)                                \
  X(YCRCB_420_SP_M_SBWC, 8, kNone, true, YCRCB_420_SP_M_SBWC)                                      \
  X(YCBCR_420_SP_M_SBWC_L50, 8, kSbwcLossyMedium, false, YCBCR_420_888)                            \
  X(YCBCR_420_SP_M_SBWC_L75, 8, kSbwcLossyLow, false, YCBCR_420_888)                               \
  X(YCBCR_420_SP_M_S10B_SBWC_L40, 10, kSbwcLossyHigh, false, YCBCR_420_SP_M_S10B)                  \
  X(YCBCR_420_SP_M_S10B_SBWC_L60, 10, kSbwcLossyMedium, false, YCBCR_420_SP_M_S10B)                \
  X(YCBCR_420_SP_M_S10B_SBWC_L80, 10, kSbwcLossyLow, false, YCBCR_420_SP_M_S10B)                   \
  X(YCBCR_420_888_I_AFBC_WIDEBLK, 8, kAfbc, false, YCBCR_420_888_I_AFBC_WIDEBLK)                   \
  X(YCBCR_420_888_AFBC_EXTRAWIDEBLK, 8, kAfbc, false, YCBCR_420_888_AFBC_EXTRAWIDEBLK)             \
  X(Y8, 8, kNone, false, Y8)                                                                       \
  X(Y16, 16, kNone, false, Y16)                                                                    \
  X(YV12, 8, kNone, false, YV12)                                                                   \
  X(RAW16_BAYER_SBWC, 16, kSbwc, true, RAW16)                                                      \
  X(RAW16_BAYER_SBWC_L50, 16, kSbwcLossyMedium, false, RAW16)                                      \
  X(RAW16_BAYER_SBWC_L75, 16, kSbwcLossyLow, false, RAW16)                                         \
  X(IMPLEMENTATION_DEFINED_64, 8, kNone, true, IMPLEMENTATION_DEFINED_64)                          \
  X(YCBCR_420_888_SINGLE_BUFFER, 8, kNone, false, YCBCR_420_888_SINGLE_BUFFER)                     \
  X(Y10, 10, kNone, false, Y10)                                                                    \
  X(YCBCR_420_888_STRIDE_ALIGNED_64, 8, kNone, true, YCBCR_420_888_STRIDE_ALIGNED_64)              \
  X(YCBCR_420_SP_M_STRIDE_ALIGNED_64, 8, kNone, true, YCBCR_420_SP_M_STRIDE_ALIGNED_64)            \
  X(YCBCR_420_SP_M_SBWC_STRIDE_ALIGNED_64, 8, kSbwc, true, YCBCR_420_888_STRIDE_ALIGNED_64)        \
  X(YCBCR_420_SP_M_SBWC_L50_STRIDE_ALIGNED_64, 8, kSbwcLossyMedium, true,                          \
    YCBCR_420_888_STRIDE_ALIGNED_64)                                                               \
  X(YCBCR_420_SP_M_S10B_STRIDE_ALIGNED_64, 10, kNone, true, YCBCR_420_SP_M_S10B_STRIDE_ALIGNED_64) \
  X(YCBCR_420_SP_M_S10B_SBWC_STRIDE_ALIGNED_64, 10, kSbwc, true,                                   \
    YCBCR_420_SP_M_S10B_STRIDE_ALIGNED_64)                                                         \
  X(YCBCR_420_SP_M_S10B_SBWC_L40_STRIDE_ALIGNED_64, 10, kSbwcLossyHigh, true,                      \
    YCBCR_420_SP_M_S10B_STRIDE_ALIGNED_64)                                                         \
  X(YCBCR_420_SP_M_S10B_SBWC_L80_STRIDE_ALIGNED_64, 10, kSbwcLossyLow, true,                       \
    YCBCR_420_SP_M_S10B_STRIDE_ALIGNED_64)                                                         \
  X(YCBCR_420_888_SINGLE_BUFFER_STRIDE_ALIGNED_64, 8, kNone, true,                                 \
    YCBCR_420_888_SINGLE_BUFFER_STRIDE_ALIGNED_64)                                                 \
  X(YCBCR_P010_M_STRIDE_ALIGNED_64, 16, kNone, true, YCBCR_P010_M_STRIDE_ALIGNED_64)

std::optional<FormatInfo> FindFormat(HalPixelFormat format) {
  switch (format) {
#define ORVEX_FORMAT_CASE(name, bpp, compression, aligned, uncompressed)   \
  case HalPixelFormat::name:                                               \
    return FormatInfo{#name, bpp, BufferCompression::compression, aligned, \
                      HalPixelFormat::uncompressed};
    ORVEX_HAL_PIXEL_FORMATS(ORVEX_FORMAT_CASE)
#undef ORVEX_FORMAT_CASE
  }
  return std::nullopt;
}

}  // namespace

std::string FormatToString(HalPixelFormat format) {
  if (const auto info = FindFormat(format)) return std::string(info->name);
  return fmt::format("UnknownFormat_0x{:x}", static_cast<uint32_t>(format));
}

int BitsPerPixel(HalPixelFormat format) {
  const auto info = FindFormat(format);
  return info ? info->bits_per_pixel : 8;
}

bool Is64ByteAlignedPixelFormat(HalPixelFormat format) {
  const auto info = FindFormat(format);
  return info ? info->aligned_64 : false;
}

BufferCompression HalPixelFormatToBufferCompression(HalPixelFormat format) {
  const auto info = FindFormat(format);
  return info ? info->compression : BufferCompression::kNone;
}

HalPixelFormat CompressedFormatToNonCompressedFormat(HalPixelFormat format) {
  const auto info = FindFormat(format);
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
