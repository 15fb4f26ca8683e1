#include "orvex/api/memory/sbwc_size_utils.h"

#include "orvex/api/math/size_utils.h"
#include "orvex/status/log.h"

namespace orvex::sbwc_size_utils {
namespace {

// One header byte per 64 pixels of a block row, the row padded to the
// alignment (16 or 64).
int64_t HeaderStride(int width, int header_stride_alignment) {
  ORVEX_CHECK(header_stride_alignment == 16 || header_stride_alignment == 64)
      << "value: " << header_stride_alignment;
  return AlignToPower2Signed(CeilDiv(width, 64), static_cast<size_t>(header_stride_alignment));
}

}  // namespace

template <>
size_t GetPayloadStride<256, 1>(int width, int bits_per_pixel, int payload_stride_alignment) {
  ORVEX_CHECK(payload_stride_alignment == 32 || payload_stride_alignment == 64)
      << "value: " << payload_stride_alignment;
  const auto alignment = static_cast<size_t>(payload_stride_alignment);
  // 256 samples rounded up to an even number of bits per sample.
  const size_t block_bits = AlignToPower2(static_cast<size_t>(int64_t{256} * bits_per_pixel), 512);
  const size_t block_bytes = AlignToPower2(block_bits / 8, alignment);
  const auto blocks = static_cast<size_t>(CeilDiv(width, 256));
  return AlignToPower2(blocks * block_bytes, alignment);
}

namespace detail {

int64_t LossyBayerPayloadStride(int width, int bits_per_pixel, int payload_stride_alignment,
                                int compression_ratio) {
  ORVEX_CHECK(bits_per_pixel == 16)
      << "SBWC lossy bayer formats don't support bits_per_pixel: " << bits_per_pixel;
  ORVEX_CHECK(compression_ratio == 50 || compression_ratio == 75)
      << "SBWC lossy bayer 16bit formats don't support compression_ratio: " << compression_ratio;
  const int64_t block_bytes = (int64_t{bits_per_pixel} * compression_ratio * 32) / 100;
  return CeilDiv(width, 32) *
         AlignToPower2Signed(block_bytes, static_cast<size_t>(int64_t{payload_stride_alignment}));
}

int64_t LossyYuvPayloadStride(int width, int bits_per_pixel, int payload_stride_alignment,
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

int64_t YHeaderSize(int width, int height, int header_stride_alignment) {
  const int64_t stride = HeaderStride(width, header_stride_alignment);
  return stride * (AlignToPower2Signed(height, 16) / 4) + 256;
}

int64_t UVHeaderSize(int width, int height, int header_stride_alignment) {
  const int64_t stride = HeaderStride(width, header_stride_alignment);
  return stride * (AlignToPower2Signed(height, 16) / 8) + 128;
}

}  // namespace detail

// The int forms narrow modulo 2^32.
int GetLossyBayerPayloadStride(int width, int bits_per_pixel, int payload_stride_alignment,
                               int compression_ratio) {
  return static_cast<int>(detail::LossyBayerPayloadStride(
      width, bits_per_pixel, payload_stride_alignment, compression_ratio));
}

int GetLossyYuvPayloadStride(int width, int bits_per_pixel, int payload_stride_alignment,
                             int compression_ratio) {
  return static_cast<int>(detail::LossyYuvPayloadStride(
      width, bits_per_pixel, payload_stride_alignment, compression_ratio));
}

int GetYHeaderSize(int width, int height, int header_stride_alignment) {
  return static_cast<int>(detail::YHeaderSize(width, height, header_stride_alignment));
}

int GetUVHeaderSize(int width, int height, int header_stride_alignment) {
  return static_cast<int>(detail::UVHeaderSize(width, height, header_stride_alignment));
}

}  // namespace orvex::sbwc_size_utils
