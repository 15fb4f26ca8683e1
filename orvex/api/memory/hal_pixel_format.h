#ifndef ORVEX_API_MEMORY_HAL_PIXEL_FORMAT_H_
#define ORVEX_API_MEMORY_HAL_PIXEL_FORMAT_H_

// HAL pixel formats: the closed set of 32-bit sample-layout codes that the
// camera stack tags its images with, and the per-format properties (name,
// bits per stored sample, implied buffer compression, 64-byte stride
// alignment, uncompressed counterpart). Also the colour-filter arrangement of
// raw sensors.
//
// The numeric values are shared with the graphics allocator and the camera
// HAL and must never change. Codes from 0x40000000 on belong to this library.
//
// Every function is a pure function of its argument and may be called from
// any thread. Values that are no enumerator are accepted everywhere: names
// fall back to "UnknownFormat_0x<hex>", properties to 8 bits, not aligned,
// no compression, and the value itself as its uncompressed counterpart.

#include <cstdint>
#include <span>
#include <string>

#include "orvex/api/memory/buffer_attributes.h"
#include "orvex/base/export.h"

namespace orvex {

// Enumerator names are the formats' printed names.
enum class HalPixelFormat : int32_t {
  RGB_888 = 0x3,
  YCBCR_422_I = 0x14,
  RAW16 = 0x20,
  BLOB = 0x21,
  IMPLEMENTATION_DEFINED = 0x22,
  YCBCR_420_888 = 0x23,
  RAW10 = 0x25,
  RAW12 = 0x26,
  YCBCR_P010 = 0x36,
  YCBCR_420_SP_M = 0x105,
  YCBCR_420_SP_M_S10B = 0x125,
  YCBCR_P010_M = 0x127,
  YCBCR_420_SP_M_SBWC = 0x130,
  YCBCR_420_SP_M_S10B_SBWC = 0x132,
  YCRCB_420_SP_M_SBWC = 0x134,
  YCBCR_420_SP_M_SBWC_L50 = 0x140,
  YCBCR_420_SP_M_SBWC_L75 = 0x141,
  YCBCR_420_SP_M_S10B_SBWC_L40 = 0x160,
  YCBCR_420_SP_M_S10B_SBWC_L60 = 0x161,
  YCBCR_420_SP_M_S10B_SBWC_L80 = 0x162,
  // AFBC codes: base code plus modifier bits (see IsAfbcFormat).
  YCBCR_420_888_I_AFBC_WIDEBLK = 0x50208,
  YCBCR_420_888_AFBC_EXTRAWIDEBLK = 0x190023,
  Y8 = 0x20203859,
  Y16 = 0x20363159,
  YV12 = 0x32315659,
  // Library codes.
  RAW16_BAYER_SBWC = 0x40000000,
  RAW16_BAYER_SBWC_L50 = 0x40000001,
  RAW16_BAYER_SBWC_L75 = 0x40000002,
  IMPLEMENTATION_DEFINED_64 = 0x40000003,
  YCBCR_420_888_SINGLE_BUFFER = 0x40000004,
  Y10 = 0x40000005,
  YCBCR_420_888_STRIDE_ALIGNED_64 = 0x40000006,
  YCBCR_420_SP_M_STRIDE_ALIGNED_64 = 0x40000007,
  YCBCR_420_SP_M_SBWC_STRIDE_ALIGNED_64 = 0x40000008,
  YCBCR_420_SP_M_SBWC_L50_STRIDE_ALIGNED_64 = 0x40000009,
  YCBCR_420_SP_M_S10B_STRIDE_ALIGNED_64 = 0x4000000a,
  YCBCR_420_SP_M_S10B_SBWC_STRIDE_ALIGNED_64 = 0x4000000b,
  YCBCR_420_SP_M_S10B_SBWC_L40_STRIDE_ALIGNED_64 = 0x4000000c,
  YCBCR_420_SP_M_S10B_SBWC_L80_STRIDE_ALIGNED_64 = 0x4000000d,
  YCBCR_420_888_SINGLE_BUFFER_STRIDE_ALIGNED_64 = 0x4000000e,
  YCBCR_P010_M_STRIDE_ALIGNED_64 = 0x4000000f,
};

// AFBC modifier bits carried above the base code of an AFBC format.
inline constexpr uint32_t kAfbcFormatBit = 1u << 16;
inline constexpr uint32_t kAfbcWideBlockBit = 1u << 18;       // 32x8 superblocks
inline constexpr uint32_t kAfbcTiledHeaderBit = 1u << 19;     // 8x8 tiles, 4096-byte buffers
inline constexpr uint32_t kAfbcExtraWideBlockBit = 1u << 20;  // 64x4 unless wide is set

// True when the AFBC bit (bit 16) of the code is set. YV12 is excluded: its
// FourCC code ('Y' 'V' '1' '2') happens to carry bit 16 but it is a plain
// planar format.
constexpr bool IsAfbcFormat(HalPixelFormat format) {
  return (static_cast<uint32_t>(format) & kAfbcFormatBit) != 0 && format != HalPixelFormat::YV12;
}

// Every named format, in ascending order of code: the one list of formats
// for tools and tests that go through them all.
ORVEX_EXPORT std::span<const HalPixelFormat> AllHalPixelFormats();

// The enumerator's name, or "UnknownFormat_0x<lower-case hex>" of the value
// read as unsigned 32-bit.
ORVEX_EXPORT std::string FormatToString(HalPixelFormat format);

// Bits of one stored sample (its container width): 8 for 8-bit YUV and RGB,
// 10/12 for packed RAW10/RAW12/Y10 and 10-bit YUV, 16 for RAW16, Y16 and
// P010 formats.
ORVEX_EXPORT int BitsPerPixel(HalPixelFormat format);

// True for the formats whose row strides are aligned to 64 bytes.
ORVEX_EXPORT bool Is64ByteAlignedPixelFormat(HalPixelFormat format);

// The buffer compression the format implies (kNone for everything that is
// not an SBWC or AFBC code; YCRCB_420_SP_M_SBWC gives kNone).
ORVEX_EXPORT BufferCompression HalPixelFormatToBufferCompression(HalPixelFormat format);

// The uncompressed format an SBWC format stands for; every other value
// (AFBC codes included) is returned unchanged.
ORVEX_EXPORT HalPixelFormat CompressedFormatToNonCompressedFormat(HalPixelFormat format);

// Colour-filter pattern of a raw image, read in row order from the top-left
// 2x2 cell.
enum class ColorFilterArrangement : int32_t {
  kBggr = 0,
  kGbrg = 1,
  kGrbg = 2,
  kRggb = 3,
  kRgb = 4,
  kMono = 5,
  kNir = 6,
};

// "Bggr", "Gbrg", "Grbg", "Rggb", "RGB", "Mono", "Nir"; empty for a value
// that is no enumerator.
ORVEX_EXPORT std::string ColorFilterArrangementToString(ColorFilterArrangement arrangement);

}  // namespace orvex

#endif  // ORVEX_API_MEMORY_HAL_PIXEL_FORMAT_H_
