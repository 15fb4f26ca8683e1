#ifndef ORVEX_API_MEMORY_AFBC_SIZE_UTILS_H_
#define ORVEX_API_MEMORY_AFBC_SIZE_UTILS_H_

// Sizes of AFBC (Arm frame buffer compression) layouts, shared with the
// graphics allocator and the hardware codecs. The superblock geometry is read
// from the format code's modifier bits: 32x8 when the wide bit is set, else
// 64x4 when the extra-wide bit is set, else 16x16; with tiled headers the
// superblocks are grouped in 8x8 tiles and buffers aligned to 4096 bytes
// (1024 otherwise).
//
// Every function that takes a format requires IsAfbcFormat(format) (fatal
// otherwise). The int-returning functions compute in 64 bits and narrow
// modulo 2^32; the `detail` forms return the exact value so that layout code
// can refuse sizes that do not fit.
//
// Thread safety: pure functions.

#include <cstddef>
#include <cstdint>

#include "orvex/api/memory/hal_pixel_format.h"
#include "orvex/base/export.h"

namespace orvex::afbc_size_utils {

// Width padded to whole superblocks (and tiles).
ORVEX_EXPORT int GetPayloadWidth(HalPixelFormat format, int width);
// Height padded to whole superblocks (and tiles); untiled wide blocks pad to
// 16 rows.
ORVEX_EXPORT int GetPayloadHeight(HalPixelFormat format, int height);
// Payload row stride in bytes.
ORVEX_EXPORT int GetPayloadStride(int payload_width, int bits_per_pixel);
// Superblock columns.
ORVEX_EXPORT int GetHeaderWidth(HalPixelFormat format, int width);
// Superblock rows (of the padded payload height).
ORVEX_EXPORT int GetHeaderHeight(HalPixelFormat format, int height);
// Header row stride in bytes: 16 bytes per superblock.
ORVEX_EXPORT int GetHeaderStride(int header_width);
// `size` rounded up to the format's buffer alignment.
ORVEX_EXPORT size_t AlignBufferSize(HalPixelFormat format, size_t size);

namespace detail {

ORVEX_EXPORT int64_t PayloadWidth(HalPixelFormat format, int64_t width);
ORVEX_EXPORT int64_t PayloadHeight(HalPixelFormat format, int64_t height);
ORVEX_EXPORT int64_t HeaderWidth(HalPixelFormat format, int64_t width);
ORVEX_EXPORT int64_t HeaderHeight(HalPixelFormat format, int64_t height);
inline int64_t PayloadStride(int64_t payload_width, int64_t bits_per_pixel) {
  return (payload_width * bits_per_pixel) / 8;
}
inline int64_t HeaderStride(int64_t header_width) { return header_width * 16; }

}  // namespace detail
}  // namespace orvex::afbc_size_utils

#endif  // ORVEX_API_MEMORY_AFBC_SIZE_UTILS_H_
