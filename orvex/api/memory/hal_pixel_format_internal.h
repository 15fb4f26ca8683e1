#ifndef ORVEX_API_MEMORY_HAL_PIXEL_FORMAT_INTERNAL_H_
#define ORVEX_API_MEMORY_HAL_PIXEL_FORMAT_INTERNAL_H_

// The per-format table behind hal_pixel_format.h and ImageFormat: one row per
// HalPixelFormat holds everything the library knows about the format, from
// its name to the layout ImageFormat::Make gives it and the rules
// ImageFormat::ConformsTo checks against it. Not exported.
//
// Thread safety: the table is constant.

#include <cstdint>
#include <string_view>

#include "orvex/api/memory/buffer_attributes.h"
#include "orvex/api/memory/hal_pixel_format.h"

namespace orvex {
namespace hal_pixel_format_internal {

// How ImageFormat::Make lays a format out. kNone: Make refuses the format
// (or, for the two IMPLEMENTATION_DEFINED codes, substitutes another first).
enum class Layout : uint8_t {
  kNone,
  kSemiPlanar420,
  kYv12,
  kInterleaved422,
  kMonochrome,
  kRawBayer,
  kBlob,
  kSbwcBayerLossless,
  kSbwcBayerLossy,
  kSbwcYuvLossless,
  kSbwcYuvLossy,
  kAfbcWideBlock,
  kAfbcExtraWideBlock,
};

// Which rules ImageFormat::ConformsTo checks for a target format. kNone:
// the target cannot be checked (UNIMPLEMENTED).
enum class Rules : uint8_t {
  kNone,
  kImplementationDefined,
  kBlob,
  kRaw,
  kMonochrome,
  kSemiPlanar420,
  kYv12,
  kInterleaved422,
  kSbwcBayerLossless,
  kSbwcBayerLossy,
  kSbwcYuvLossless,
  kSbwcYuvLossy,
  kAfbcWideBlock,
  kAfbcExtraWideBlock,
};

// Chroma order Make records when it is given none. kNone: the format has no
// interleaved chroma and Make refuses an order for it.
enum class ChromaOrder : uint8_t { kNone, kCbCr, kCrCb };

struct FormatTraits {
  std::string_view name;
  int bits_per_pixel;  // of one stored sample
  BufferCompression compression;
  bool aligned_64;              // Is64ByteAlignedPixelFormat
  HalPixelFormat uncompressed;  // CompressedFormatToNonCompressedFormat
  Layout layout;
  Rules rules;
  ChromaOrder chroma_order;
  // The power of 2 Make aligns to: row strides of uncompressed layouts (1:
  // packed), header strides of lossless SBWC YUV, payload blocks of lossy
  // SBWC and lossless SBWC Bayer.
  int alignment;
  // The multiple ConformsTo requires of row strides; 0: not checked.
  int stride_multiple;
  int compression_ratio;  // lossy SBWC: percent of the uncompressed size
  bool single_buffer;     // semi-planar: chroma follows luma in buffer 0
};

// The row of `format`; nullptr for a value that is no enumerator.
const FormatTraits* FindFormatTraits(HalPixelFormat format);

}  // namespace hal_pixel_format_internal
}  // namespace orvex

#endif  // ORVEX_API_MEMORY_HAL_PIXEL_FORMAT_INTERNAL_H_
