#include "orvex/api/memory/afbc_size_utils.h"

#include "orvex/api/math/size_utils.h"
#include "orvex/status/log.h"

namespace orvex::afbc_size_utils {
namespace {

struct Geometry {
  int64_t block_width;
  int64_t block_height;
  int64_t tile;  // superblocks per tile side
  bool wide;
  bool tiled;
};

Geometry GetGeometry(HalPixelFormat format) {
  ORVEX_CHECK(IsAfbcFormat(format));
  const auto code = static_cast<uint32_t>(format);
  const bool wide = (code & kAfbcWideBlockBit) != 0;
  const bool extra_wide = (code & kAfbcExtraWideBlockBit) != 0;
  const bool tiled = (code & kAfbcTiledHeaderBit) != 0;
  Geometry g{16, 16, tiled ? 8 : 1, wide, tiled};
  if (wide) {
    g.block_width = 32;
    g.block_height = 8;
  } else if (extra_wide) {
    g.block_width = 64;
    g.block_height = 4;
  }
  return g;
}

}  // namespace

namespace detail {

int64_t PayloadWidth(HalPixelFormat format, int64_t width) {
  const Geometry g = GetGeometry(format);
  return AlignToPower2Signed(width, static_cast<size_t>(g.block_width * g.tile));
}

int64_t PayloadHeight(HalPixelFormat format, int64_t height) {
  const Geometry g = GetGeometry(format);
  // Untiled wide blocks are stored as pairs of block rows.
  const int64_t rows = (g.wide && !g.tiled) ? 2 * g.block_height : g.block_height;
  return AlignToPower2Signed(height, static_cast<size_t>(rows * g.tile));
}

int64_t HeaderWidth(HalPixelFormat format, int64_t width) {
  const Geometry g = GetGeometry(format);
  return CeilDiv(PayloadWidth(format, width), g.block_width);
}

int64_t HeaderHeight(HalPixelFormat format, int64_t height) {
  const Geometry g = GetGeometry(format);
  return CeilDiv(PayloadHeight(format, height), g.block_height);
}

}  // namespace detail

int GetPayloadWidth(HalPixelFormat format, int width) {
  return static_cast<int>(detail::PayloadWidth(format, width));
}

int GetPayloadHeight(HalPixelFormat format, int height) {
  return static_cast<int>(detail::PayloadHeight(format, height));
}

int GetPayloadStride(int payload_width, int bits_per_pixel) {
  return static_cast<int>(detail::PayloadStride(payload_width, bits_per_pixel));
}

int GetHeaderWidth(HalPixelFormat format, int width) {
  return static_cast<int>(detail::HeaderWidth(format, width));
}

int GetHeaderHeight(HalPixelFormat format, int height) {
  return static_cast<int>(detail::HeaderHeight(format, height));
}

int GetHeaderStride(int header_width) {
  return static_cast<int>(detail::HeaderStride(header_width));
}

size_t AlignBufferSize(HalPixelFormat format, size_t size) {
  const Geometry g = GetGeometry(format);
  return AlignToPower2(size, g.tiled ? 4096 : 1024);
}

}  // namespace orvex::afbc_size_utils
