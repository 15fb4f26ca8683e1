#ifndef ORVEX_TOOLS_ORVEX_RENDER_H_
#define ORVEX_TOOLS_ORVEX_RENDER_H_

// Turning buffer contents into pictures and back, for `orvex render` and the
// demo's frames. Where every sample lies comes from the ImageFormat's
// components (buffer, offset, row stride, pixel stride and phase, width and
// height); this file only knows how a sample is stored:
//   8 bits   one byte;
//   16 bits  a little-endian word whose top 8 bits are shown (P010 keeps its
//            10 bits at the top of the word);
//   10 bits  packed, 4 samples in 5 bytes: bytes 0..3 hold the top 8 bits of
//            samples 0..3, byte 4 their low 2 bits (sample 0 in bits 0-1);
//   12 bits  packed, 2 samples in 3 bytes: bytes 0..1 hold the top 8 bits,
//            byte 2 the low 4 bits (sample 0 in bits 0-3).
// Every sample is shown by its top 8 bits.
//
// What can be shown: YUV layouts (luma and two chroma components at any
// subsampling the components describe), single-component grey layouts, and
// Bayer mosaics (as grey, or demosaiced to half size). Compressed layouts and
// BLOB are refused: their bytes are no samples.
//
// Thread safety: plain functions over the caller's data.

#include <cstdint>
#include <functional>
#include <span>
#include <string>
#include <vector>

#include "orvex/api/memory/hal_pixel_format.h"
#include "orvex/api/memory/image_format.h"
#include "orvex/status/status.h"
#include "orvex/status/statusor.h"

namespace orvex_tool {

enum class YuvRange { kFull, kLimited };  // 0..255, or 16..235 luma and 16..240 chroma
enum class YuvMatrix { kBt601, kBt709 };

struct RenderOptions {
  YuvRange range = YuvRange::kFull;
  YuvMatrix matrix = YuvMatrix::kBt601;
  // Bayer layouts: one colour pixel per 2x2 cell instead of the grey mosaic.
  bool demosaic = false;
  // The colour of each site of the top-left 2x2 cell.
  orvex::ColorFilterArrangement cfa = orvex::ColorFilterArrangement::kRggb;
};

// An 8-bit picture, rows packed: `channels` is 1 (grey) or 3 (RGB).
struct Picture {
  int width = 0;
  int height = 0;
  int channels = 3;
  std::vector<uint8_t> pixels;
};

struct Rgb {
  uint8_t r, g, b;
  friend bool operator==(const Rgb&, const Rgb&) = default;
};

// OK when RenderPicture can show `format`. Otherwise UNIMPLEMENTED naming what
// is missing (a decoder for the compressed payload, samples in a BLOB, a
// sample width other than 8, 10, 12 or 16 bits) or INVALID_ARGUMENT for a
// component that does not fit its buffer.
orvex::Status CheckRenderable(const orvex::ImageFormat& format);

// The picture held by `buffers` (buffer i is at least buffer_sizes()[i]
// bytes). YUV becomes RGB with the options' range and matrix; grey and Bayer
// layouts become grey pictures unless `demosaic`. Errors: those of
// CheckRenderable; INVALID_ARGUMENT for a buffer too short or a demosaic of a
// layout that is no mosaic.
orvex::StatusOr<Picture> RenderPicture(const orvex::ImageFormat& format,
                                       std::span<const std::span<const uint8_t>> buffers,
                                       const RenderOptions& options = {});

// Fills `row` (one entry per pixel of the image's width) with the colours of
// image row `y`.
using RowColors = std::function<void(int y, std::span<Rgb> row)>;

// Writes the colours of image rows [first_row, end_row) into the layout, the
// inverse of RenderPicture with the default options (full-range BT.601;
// Bayer sites take their channel by `cfa`). Chroma samples take the colour of
// the first pixel they cover. A row equal to the one before it is copied,
// which makes pictures with repeating rows cheap. Requires CheckRenderable
// (format) to be OK and buffers of the sizes the format gives; bytes outside
// the samples' rows are left alone.
void DrawPicture(const orvex::ImageFormat& format, std::span<const std::span<uint8_t>> buffers,
                 const RowColors& colors, int first_row, int end_row,
                 orvex::ColorFilterArrangement cfa = orvex::ColorFilterArrangement::kRggb);

// The PNG file bytes of `picture`; INTERNAL with the encoder's message when
// it fails.
orvex::StatusOr<std::string> EncodePng(const Picture& picture);

}  // namespace orvex_tool

#endif  // ORVEX_TOOLS_ORVEX_RENDER_H_
