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

#include "orvex/api/math/size_utils.h"
#include "orvex/status/log.h"

namespace orvex::sbwc_size_utils {

// Row stride of a lossless payload built of kBlockWidth x kBlockHeight
// blocks: whole blocks per started group of kBlockWidth pixels, each block
// an even number of bits per sample, aligned to payload_stride_alignment
// (32 or 64). Only <256, 1> is used.
template <int kBlockWidth, int kBlockHeight>
size_t GetPayloadStride(int width, int bits_per_pixel, int payload_stride_alignment) {
  static_assert(kBlockWidth == 256 && kBlockHeight == 1, "only 256x1 blocks are laid out");
  ORVEX_CHECK(payload_stride_alignment == 32 || payload_stride_alignment == 64)
      << "value: " << payload_stride_alignment;
  const int64_t block_samples = int64_t{kBlockWidth} * kBlockHeight;
  const size_t block_bits = AlignToPower2(static_cast<size_t>(block_samples * bits_per_pixel),
                                          static_cast<size_t>(2 * block_samples));
  const size_t block_bytes =
      AlignToPower2(block_bits / 8, static_cast<size_t>(payload_stride_alignment));
  const auto blocks = static_cast<size_t>(CeilDiv(width, kBlockWidth));
  return AlignToPower2(blocks * block_bytes, static_cast<size_t>(payload_stride_alignment));
}

namespace detail {

inline int64_t LossyBayerPayloadStride(int width, int bits_per_pixel, int payload_stride_alignment,
                                       int compression_ratio) {
  ORVEX_CHECK(bits_per_pixel == 16)
      << "SBWC lossy bayer formats don't support bits_per_pixel: " << bits_per_pixel;
  ORVEX_CHECK(compression_ratio == 50 || compression_ratio == 75)
      << "SBWC lossy bayer 16bit formats don't support compression_ratio: " << compression_ratio;
  const int64_t block_bytes = (int64_t{bits_per_pixel} * compression_ratio * 32) / 100;
  return CeilDiv(width, 32) *
         AlignToPower2Signed(block_bytes, static_cast<size_t>(int64_t{payload_stride_alignment}));
}

inline int64_t LossyYuvPayloadStride(int width, int bits_per_pixel, int payload_stride_alignment,
                                     int compression_ratio) {
  ORVEX_CHECK(bits_per_pixel == 8 || bits_per_pixel == 10)
      << "SBWC lossy YUV formats don't support bits_per_pixel: " << bits_per_pixel;
  if (bits_per_pixel == 8) {
    ORVEX_CHECK(compression_ratio == 50 || compression_ratio == 75)
        << "SBWC lossy YUV 8bit formats don't support compression_ratio: " << compression_ratio;
  } else {
    ORVEX_CHECK(compression_ratio == 40 || compression_ratio == 60 || compression_ratio == 80)
        << "SBWC lossy YUV 10bit formats don't support compression_ratio: " << compression_ratio;
  }
  // One block is 32 x 4 samples.
  const int64_t block_bytes = (int64_t{bits_per_pixel} * compression_ratio * 16) / 100;
  return CeilDiv(width, 32) *
         AlignToPower2Signed(block_bytes, static_cast<size_t>(int64_t{payload_stride_alignment}));
}

// One header byte per 64 pixels of a block row, the row padded to the
// alignment (16 or 64).
inline int64_t HeaderStride(int width, int header_stride_alignment) {
  ORVEX_CHECK(header_stride_alignment == 16 || header_stride_alignment == 64)
      << "value: " << header_stride_alignment;
  return AlignToPower2Signed(CeilDiv(width, 64), static_cast<size_t>(header_stride_alignment));
}

inline int64_t YHeaderSize(int width, int height, int header_stride_alignment) {
  const int64_t stride = HeaderStride(width, header_stride_alignment);
  return stride * (AlignToPower2Signed(height, 16) / 4) + 256;
}

inline int64_t UVHeaderSize(int width, int height, int header_stride_alignment) {
  const int64_t stride = HeaderStride(width, header_stride_alignment);
  return stride * (AlignToPower2Signed(height, 16) / 8) + 128;
}

}  // namespace detail

// Row stride of a lossy Bayer payload: bits_per_pixel must be 16 and the
// ratio 50 or 75; 32-pixel blocks of 256 or 384 bytes, each aligned.
inline int GetLossyBayerPayloadStride(int width, int bits_per_pixel, int payload_stride_alignment,
                                      int compression_ratio) {
  return static_cast<int>(detail::LossyBayerPayloadStride(
      width, bits_per_pixel, payload_stride_alignment, compression_ratio));
}

// Row stride of a lossy luma or chroma payload: 8 bits with ratio 50 or 75,
// or 10 bits with ratio 40, 60 or 80; 32-pixel blocks, each aligned.
inline int GetLossyYuvPayloadStride(int width, int bits_per_pixel, int payload_stride_alignment,
                                    int compression_ratio) {
  return static_cast<int>(detail::LossyYuvPayloadStride(
      width, bits_per_pixel, payload_stride_alignment, compression_ratio));
}

// Header area of a lossless luma plane (alignment 16 or 64).
inline int GetYHeaderSize(int width, int height, int header_stride_alignment) {
  return static_cast<int>(detail::YHeaderSize(width, height, header_stride_alignment));
}

// Header area of a lossless interleaved-chroma plane (alignment 16 or 64).
inline int GetUVHeaderSize(int width, int height, int header_stride_alignment) {
  return static_cast<int>(detail::UVHeaderSize(width, height, header_stride_alignment));
}

}  // namespace orvex::sbwc_size_utils

#endif  // ORVEX_API_MEMORY_SBWC_SIZE_UTILS_H_
