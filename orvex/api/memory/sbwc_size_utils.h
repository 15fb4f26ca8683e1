#ifndef ORVEX_API_MEMORY_SBWC_SIZE_UTILS_H_
#define ORVEX_API_MEMORY_SBWC_SIZE_UTILS_H_

// Row strides and area sizes of SBWC (bandwidth-compressed) layouts, shared
// with the graphics allocator and the hardware codecs.
//
// Lossless layouts store a payload of fixed-size blocks plus a header area;
// lossy layouts store only a payload whose block size follows from the
// compression ratio (percent of the uncompressed size). Widths and heights
// are pixels, results are bytes.
//
// Preconditions (fatal checks) restrict the alignments, bit depths and
// ratios to those the formats use. The int-returning functions compute in
// 64 bits and narrow modulo 2^32; the `detail` forms return the exact
// 64-bit value so that layout code can refuse sizes that do not fit.
//
// Thread safety: pure functions.

#include <cstddef>
#include <cstdint>

#include "orvex/base/export.h"

namespace orvex::sbwc_size_utils {

// Row stride of a lossless payload built of kBlockWidth x kBlockHeight
// blocks: whole blocks per started group of kBlockWidth pixels, each block
// an even number of bits per sample, aligned to payload_stride_alignment
// (32 or 64). Only <256, 1> is defined.
template <int kBlockWidth, int kBlockHeight>
size_t GetPayloadStride(int width, int bits_per_pixel, int payload_stride_alignment);
template <>
ORVEX_EXPORT size_t GetPayloadStride<256, 1>(int width, int bits_per_pixel,
                                             int payload_stride_alignment);

// Row stride of a lossy Bayer payload: bits_per_pixel must be 16 and the
// ratio 50 or 75; 32-pixel blocks of 256 or 384 bytes, each aligned.
ORVEX_EXPORT int GetLossyBayerPayloadStride(int width, int bits_per_pixel,
                                            int payload_stride_alignment, int compression_ratio);

// Row stride of a lossy luma or chroma payload: 8 bits with ratio 50 or 75,
// or 10 bits with ratio 40, 60 or 80; 32-pixel blocks, each aligned.
ORVEX_EXPORT int GetLossyYuvPayloadStride(int width, int bits_per_pixel,
                                          int payload_stride_alignment, int compression_ratio);

// Header area of a lossless luma plane (alignment 16 or 64).
ORVEX_EXPORT int GetYHeaderSize(int width, int height, int header_stride_alignment);

// Header area of a lossless interleaved-chroma plane (alignment 16 or 64).
ORVEX_EXPORT int GetUVHeaderSize(int width, int height, int header_stride_alignment);

namespace detail {

ORVEX_EXPORT int64_t LossyBayerPayloadStride(int width, int bits_per_pixel,
                                             int payload_stride_alignment, int compression_ratio);
ORVEX_EXPORT int64_t LossyYuvPayloadStride(int width, int bits_per_pixel,
                                           int payload_stride_alignment, int compression_ratio);
ORVEX_EXPORT int64_t YHeaderSize(int width, int height, int header_stride_alignment);
ORVEX_EXPORT int64_t UVHeaderSize(int width, int height, int header_stride_alignment);

}  // namespace detail
}  // namespace orvex::sbwc_size_utils

#endif  // ORVEX_API_MEMORY_SBWC_SIZE_UTILS_H_
