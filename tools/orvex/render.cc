#include "tools/orvex/render.h"

#include <png.h>

#include <algorithm>
#include <cmath>
#include <cstring>
#include <optional>

#include "fmt/format.h"

namespace orvex_tool {
namespace {

using orvex::ImageFormat;
using Component = ImageFormat::Component;
using Content = ImageFormat::ComponentContent;

bool KnownSampleWidth(int bits) { return bits == 8 || bits == 10 || bits == 12 || bits == 16; }

// Byte of a row that holds the top 8 bits of sample `i`.
uint64_t TopByte(int bits, uint64_t i) {
  switch (bits) {
    case 8:
      return i;
    case 16:
      return 2 * i + 1;
    case 10:
      return i / 4 * 5 + i % 4;
    default:  // 12
      return i / 2 * 3 + i % 2;
  }
}

// The samples of one component inside its buffer. CheckRenderable has made
// sure that every sample's top byte lies inside the buffer.
template <typename Byte>
class Samples {
 public:
  Samples(const Component& c, std::span<Byte> buffer) : c_(c), buffer_(buffer) {}

  int width() const { return c_.width; }
  int height() const { return c_.height; }

  uint8_t Get(int x, int y) const { return buffer_[Position(x, y)]; }

  // Copies the bytes of row `from`'s samples onto row `to` (other bytes
  // inside that span, such as interleaved samples of another component, come
  // along).
  void CopyRow(int from, int to) const {
    const uint64_t last = SampleIndex(c_.width - 1);
    uint64_t begin = SampleIndex(0);
    uint64_t end = TopByte(c_.bits_per_pixel, last) + 1;
    switch (c_.bits_per_pixel) {
      case 16:
        begin *= 2;
        break;
      case 10:
        begin = begin / 4 * 5;
        end = last / 4 * 5 + 5;
        break;
      case 12:
        begin = begin / 2 * 3;
        end = last / 2 * 3 + 3;
        break;
      default:
        break;
    }
    end = std::min<uint64_t>(
        {end, static_cast<uint64_t>(c_.row_stride_bytes), buffer_.size() - RowStart(to)});
    if (end > begin) {
      std::memcpy(&buffer_[RowStart(to) + begin], &buffer_[RowStart(from) + begin], end - begin);
    }
  }

  // Stores `value` so that its top 8 bits read back as `value`; the low bits
  // of a wider sample repeat its top bits, so that 255 is full scale.
  void Set(int x, int y, uint8_t value) const {
    const uint64_t at = Position(x, y);
    buffer_[at] = value;
    const uint64_t i = SampleIndex(x);
    const uint64_t row = RowStart(y);
    auto set_low_bits = [&](uint64_t byte, int shift, int bits) {
      // A packed row may end before its last group's low-bits byte.
      if (byte >= static_cast<uint64_t>(c_.row_stride_bytes) || row + byte >= buffer_.size()) {
        return;
      }
      const int mask = ((1 << bits) - 1) << shift;
      const int low = (value >> (8 - bits)) << shift;
      buffer_[row + byte] = static_cast<uint8_t>((buffer_[row + byte] & ~mask) | low);
    };
    switch (c_.bits_per_pixel) {
      case 16:
        buffer_[at - 1] = value;
        break;
      case 10:
        set_low_bits(i / 4 * 5 + 4, static_cast<int>(i % 4) * 2, 2);
        break;
      case 12:
        set_low_bits(i / 2 * 3 + 2, static_cast<int>(i % 2) * 4, 4);
        break;
      default:
        break;
    }
  }

 private:
  uint64_t SampleIndex(int x) const {
    return static_cast<uint64_t>(x) * static_cast<uint64_t>(c_.pixel_stride) +
           static_cast<uint64_t>(c_.pixel_phase);
  }
  uint64_t RowStart(int y) const {
    return c_.offset_bytes + static_cast<uint64_t>(y) * static_cast<uint64_t>(c_.row_stride_bytes);
  }
  uint64_t Position(int x, int y) const {
    return RowStart(y) + TopByte(c_.bits_per_pixel, SampleIndex(x));
  }

  Component c_;
  std::span<Byte> buffer_;
};

enum class Kind { kYuv, kGrey, kBayer };

struct Layout {
  Kind kind;
  const Component* luma = nullptr;  // luma, or the mosaic
  const Component* cb = nullptr;
  const Component* cr = nullptr;
};

const Component* Find(const ImageFormat& format, Content content) {
  for (const Component& c : format.components()) {
    if (c.content == content) return &c;
  }
  return nullptr;
}

orvex::StatusOr<Layout> Classify(const ImageFormat& format) {
  const std::string name = orvex::FormatToString(format.format());
  for (const Component& c : format.components()) {
    if (c.content >= Content::kCompressedLumaHeader &&
        c.content <= Content::kCompressedBayerPayload) {
      const orvex::HalPixelFormat plain =
          orvex::CompressedFormatToNonCompressedFormat(format.format());
      return orvex::UnimplementedError(fmt::format(
          "{} is an {}-compressed layout and render has no {} decoder for its payload{}", name,
          name.find("AFBC") != std::string::npos ? "AFBC" : "SBWC",
          name.find("AFBC") != std::string::npos ? "AFBC" : "SBWC",
          plain == format.format()
              ? ""
              : fmt::format("; dump the image uncompressed ({}) and render that",
                            orvex::FormatToString(plain))));
    }
  }
  Layout layout{Kind::kGrey, Find(format, Content::kLuma), Find(format, Content::kChromaB),
                Find(format, Content::kChromaR)};
  if (layout.luma != nullptr && layout.cb != nullptr && layout.cr != nullptr) {
    layout.kind = Kind::kYuv;
  } else if (layout.luma != nullptr && layout.cb == nullptr && layout.cr == nullptr) {
    layout.kind = Kind::kGrey;
  } else if ((layout.luma = Find(format, Content::kBayer)) != nullptr) {
    layout.kind = Kind::kBayer;
  } else {
    return orvex::UnimplementedError(fmt::format(
        "{} holds no samples render can show (it needs luma and chroma, luma alone, or a "
        "Bayer mosaic){}",
        name,
        Find(format, Content::kUnspecified) != nullptr ? ": a BLOB is encoded data, not samples"
                                                       : ""));
  }
  return layout;
}

orvex::Status CheckComponent(const ImageFormat& format, const Component& c) {
  const std::string what =
      fmt::format("{} component of {}", ImageFormat::ComponentContentToString(c.content),
                  orvex::FormatToString(format.format()));
  if (!KnownSampleWidth(c.bits_per_pixel)) {
    return orvex::UnimplementedError(
        fmt::format("{} has {}-bit samples; render reads 8, 10, 12 and 16-bit samples", what,
                    c.bits_per_pixel));
  }
  const std::vector<size_t>& sizes = format.buffer_sizes();
  if (c.width <= 0 || c.height <= 0 || c.row_stride_bytes <= 0 || c.pixel_stride <= 0 ||
      c.pixel_phase < 0 || c.buffer_index < 0 ||
      static_cast<size_t>(c.buffer_index) >= sizes.size()) {
    return orvex::InvalidArgumentError(fmt::format("{} is not a plane of samples", what));
  }
  const uint64_t last_sample =
      static_cast<uint64_t>(c.width - 1) * static_cast<uint64_t>(c.pixel_stride) +
      static_cast<uint64_t>(c.pixel_phase);
  const uint64_t end =
      c.offset_bytes +
      static_cast<uint64_t>(c.height - 1) * static_cast<uint64_t>(c.row_stride_bytes) +
      TopByte(c.bits_per_pixel, last_sample) + 1;
  if (TopByte(c.bits_per_pixel, last_sample) >= static_cast<uint64_t>(c.row_stride_bytes)) {
    return orvex::InvalidArgumentError(
        fmt::format("{}: a row of {} samples does not fit its row stride of {} bytes", what,
                    c.width, c.row_stride_bytes));
  }
  if (end > sizes[static_cast<size_t>(c.buffer_index)]) {
    return orvex::InvalidArgumentError(
        fmt::format("{} reaches byte {} of buffer {}, which has {} bytes", what, end,
                    c.buffer_index, sizes[static_cast<size_t>(c.buffer_index)]));
  }
  return orvex::OkStatus();
}

orvex::StatusOr<Layout> CheckedLayout(const ImageFormat& format) {
  auto layout = Classify(format);
  if (!layout.ok()) return layout.status();
  for (const Component* c : {layout->luma, layout->cb, layout->cr}) {
    if (c == nullptr) continue;
    if (orvex::Status status = CheckComponent(format, *c); !status.ok()) return status;
  }
  return layout;
}

uint8_t ToByte(float value) {
  return static_cast<uint8_t>(std::clamp(std::lround(value), 0L, 255L));
}

// Luma weights of red and blue; green's is what remains.
struct Weights {
  float kr;
  float kb;
};

Weights WeightsOf(YuvMatrix matrix) {
  return matrix == YuvMatrix::kBt709 ? Weights{0.2126f, 0.0722f} : Weights{0.299f, 0.114f};
}

Rgb YuvToRgb(uint8_t y, uint8_t cb, uint8_t cr, const RenderOptions& options) {
  const auto [kr, kb] = WeightsOf(options.matrix);
  const bool full = options.range == YuvRange::kFull;
  const float luma = full ? y : (static_cast<float>(y) - 16.0f) * (255.0f / 219.0f);
  const float scale = full ? 1.0f : 255.0f / 224.0f;
  const float u = (static_cast<float>(cb) - 128.0f) * scale;
  const float v = (static_cast<float>(cr) - 128.0f) * scale;
  const float r = luma + 2.0f * (1.0f - kr) * v;
  const float b = luma + 2.0f * (1.0f - kb) * u;
  const float g = (luma - kr * r - kb * b) / (1.0f - kr - kb);
  return {ToByte(r), ToByte(g), ToByte(b)};
}

struct Yuv {
  uint8_t y, cb, cr;
};

Yuv RgbToYuv(Rgb rgb) {
  const auto [kr, kb] = WeightsOf(YuvMatrix::kBt601);
  const float y = kr * rgb.r + (1.0f - kr - kb) * rgb.g + kb * rgb.b;
  return {ToByte(y), ToByte(128.0f + (rgb.b - y) / (2.0f * (1.0f - kb))),
          ToByte(128.0f + (rgb.r - y) / (2.0f * (1.0f - kr)))};
}

// The colours of the sites of a 2x2 Bayer cell in row order, or null.
const char* CfaSites(orvex::ColorFilterArrangement cfa) {
  switch (cfa) {
    case orvex::ColorFilterArrangement::kRggb:
      return "RGGB";
    case orvex::ColorFilterArrangement::kGrbg:
      return "GRBG";
    case orvex::ColorFilterArrangement::kGbrg:
      return "GBRG";
    case orvex::ColorFilterArrangement::kBggr:
      return "BGGR";
    default:
      return nullptr;
  }
}

// Maps a coordinate of the full picture onto a component of `size` samples
// across `full` pixels.
int Scale(int coordinate, int size, int full) {
  return static_cast<int>(static_cast<int64_t>(coordinate) * size / full);
}

}  // namespace

orvex::Status CheckRenderable(const ImageFormat& format) { return CheckedLayout(format).status(); }

orvex::StatusOr<Picture> RenderPicture(const ImageFormat& format,
                                       std::span<const std::span<const uint8_t>> buffers,
                                       const RenderOptions& options) {
  auto layout = CheckedLayout(format);
  if (!layout.ok()) return layout.status();
  const std::vector<size_t>& sizes = format.buffer_sizes();
  if (buffers.size() != sizes.size()) {
    return orvex::InvalidArgumentError(fmt::format("{} has {} buffers, got {}",
                                                   orvex::FormatToString(format.format()),
                                                   sizes.size(), buffers.size()));
  }
  for (size_t i = 0; i < sizes.size(); ++i) {
    if (buffers[i].size() < sizes[i]) {
      return orvex::InvalidArgumentError(fmt::format(
          "buffer {} holds {} bytes, the layout needs {}", i, buffers[i].size(), sizes[i]));
    }
  }
  auto samples = [&](const Component* c) {
    return Samples<const uint8_t>(*c, buffers[static_cast<size_t>(c->buffer_index)]);
  };
  const Samples<const uint8_t> luma = samples(layout->luma);
  const int width = luma.width();
  const int height = luma.height();
  Picture picture;
  if (layout->kind == Kind::kBayer && options.demosaic) {
    const char* sites = CfaSites(options.cfa);
    if (sites == nullptr) {
      return orvex::InvalidArgumentError(fmt::format(
          "cannot demosaic a {} arrangement", orvex::ColorFilterArrangementToString(options.cfa)));
    }
    picture = {width / 2, height / 2, 3, {}};
    picture.pixels.reserve(static_cast<size_t>(picture.width) * picture.height * 3);
    for (int y = 0; y + 1 < height; y += 2) {
      for (int x = 0; x + 1 < width; x += 2) {
        int r = 0, g = 0, b = 0;
        for (int site = 0; site < 4; ++site) {
          const int value = luma.Get(x + site % 2, y + site / 2);
          (sites[site] == 'R' ? r : sites[site] == 'B' ? b : g) += value;
        }
        picture.pixels.insert(
            picture.pixels.end(),
            {static_cast<uint8_t>(r), static_cast<uint8_t>((g + 1) / 2), static_cast<uint8_t>(b)});
      }
    }
    return picture;
  }
  if (options.demosaic) {
    return orvex::InvalidArgumentError(fmt::format("--demosaic needs a Bayer layout; {} is none",
                                                   orvex::FormatToString(format.format())));
  }
  picture = {width, height, layout->kind == Kind::kYuv ? 3 : 1, {}};
  picture.pixels.reserve(static_cast<size_t>(width) * height * picture.channels);
  if (layout->kind != Kind::kYuv) {
    for (int y = 0; y < height; ++y) {
      for (int x = 0; x < width; ++x) picture.pixels.push_back(luma.Get(x, y));
    }
    return picture;
  }
  const Samples<const uint8_t> cb = samples(layout->cb);
  const Samples<const uint8_t> cr = samples(layout->cr);
  for (int y = 0; y < height; ++y) {
    const int cb_y = Scale(y, cb.height(), height);
    const int cr_y = Scale(y, cr.height(), height);
    for (int x = 0; x < width; ++x) {
      const Rgb rgb = YuvToRgb(luma.Get(x, y), cb.Get(Scale(x, cb.width(), width), cb_y),
                               cr.Get(Scale(x, cr.width(), width), cr_y), options);
      picture.pixels.insert(picture.pixels.end(), {rgb.r, rgb.g, rgb.b});
    }
  }
  return picture;
}

void DrawPicture(const ImageFormat& format, std::span<const std::span<uint8_t>> buffers,
                 const RowColors& colors, int first_row, int end_row,
                 orvex::ColorFilterArrangement cfa) {
  auto layout = CheckedLayout(format);
  if (!layout.ok()) return;
  const int width = layout->luma->width;
  const int height = layout->luma->height;
  first_row = std::clamp(first_row, 0, height);
  end_row = std::clamp(end_row, first_row, height);
  auto samples = [&](const Component* c) {
    return Samples<uint8_t>(*c, buffers[static_cast<size_t>(c->buffer_index)]);
  };
  const Samples<uint8_t> luma = samples(layout->luma);
  const char* sites = layout->kind == Kind::kBayer ? CfaSites(cfa) : nullptr;
  // A chroma component, and the colours of the image row its last drawn row
  // was taken from.
  struct Chroma {
    const Component* component;
    Samples<uint8_t> samples;
    std::vector<Rgb> drawn_from;
    int drawn = -1;
  };
  std::vector<Chroma> chroma;
  if (layout->kind == Kind::kYuv) {
    for (const Component* c : {layout->cb, layout->cr}) chroma.push_back({c, samples(c), {}, -1});
  }
  // Pictures repeat rows: a row whose colours equal those of the row drawn
  // before it (two before, in a mosaic, whose rows alternate) is copied.
  // Components sharing bytes make the same choice for a row, so a copy never
  // undoes another component's drawing.
  const int repeat = sites == nullptr ? 1 : 2;
  std::vector<Rgb> row(static_cast<size_t>(width));
  std::vector<Rgb> back1;  // colours of row y - 1, when drawn here
  std::vector<Rgb> back2;  // colours of row y - 2, when drawn here
  for (int y = first_row; y < end_row; ++y) {
    colors(y, row);
    if (y - first_row >= repeat && row == (repeat == 1 ? back1 : back2)) {
      luma.CopyRow(y - repeat, y);
    } else {
      for (int x = 0; x < width; ++x) {
        const Rgb rgb = row[static_cast<size_t>(x)];
        uint8_t value = RgbToYuv(rgb).y;
        if (sites != nullptr) {
          const char site = sites[(y % 2) * 2 + x % 2];
          value = site == 'R' ? rgb.r : site == 'B' ? rgb.b : rgb.g;
        }
        luma.Set(x, y, value);
      }
    }
    for (Chroma& c : chroma) {
      // The chroma row whose first image row is y, if any.
      const int cy = Scale(y, c.component->height, height);
      if (Scale(cy, height, c.component->height) != y || cy == c.drawn) continue;
      if (c.drawn == cy - 1 && row == c.drawn_from) {
        c.samples.CopyRow(cy - 1, cy);
      } else {
        for (int cx = 0; cx < c.component->width; ++cx) {
          const Yuv yuv = RgbToYuv(row[static_cast<size_t>(Scale(cx, width, c.component->width))]);
          c.samples.Set(cx, cy, c.component == layout->cb ? yuv.cb : yuv.cr);
        }
        c.drawn_from = row;
      }
      c.drawn = cy;
    }
    back2 = std::move(back1);
    back1 = row;
  }
}

orvex::StatusOr<std::string> EncodePng(const Picture& picture) {
  png_image image = {};
  image.version = PNG_IMAGE_VERSION;
  image.width = static_cast<png_uint_32>(picture.width);
  image.height = static_cast<png_uint_32>(picture.height);
  image.format = picture.channels == 1 ? PNG_FORMAT_GRAY : PNG_FORMAT_RGB;
  std::string bytes(PNG_IMAGE_PNG_SIZE_MAX(image), '\0');
  png_alloc_size_t size = bytes.size();
  if (png_image_write_to_memory(&image, bytes.data(), &size, /*convert_to_8_bit=*/0,
                                picture.pixels.data(), /*row_stride=*/0,
                                /*colormap=*/nullptr) == 0) {
    const std::string message = image.message;
    png_image_free(&image);
    return orvex::InternalError(fmt::format("cannot encode the PNG: {}", message));
  }
  bytes.resize(size);
  return bytes;
}

}  // namespace orvex_tool
