#include "orvex/api/memory/image_format.h"

#include <array>
#include <climits>
#include <string_view>
#include <utility>

#include "orvex/api/math/size_utils.h"
#include "orvex/api/memory/afbc_size_utils.h"
#include "orvex/api/memory/hal_pixel_format_internal.h"
#include "orvex/api/memory/sbwc_size_utils.h"
#include "orvex/status/status_builder.h"

namespace orvex {
namespace {

using Content = ImageFormat::ComponentContent;
using Subsampling = ImageFormat::ChromaSubsampling;
using Order = ImageFormat::InterleavedChromaOrder;
using F = HalPixelFormat;
using hal_pixel_format_internal::ChromaOrder;
using hal_pixel_format_internal::FindFormatTraits;
using hal_pixel_format_internal::FormatTraits;
using hal_pixel_format_internal::Layout;
using hal_pixel_format_internal::Rules;

struct DimensionMultiples {
  int width;
  int height;
};

DimensionMultiples DimensionMultiplesOf(Layout layout, int bpp) {
  switch (layout) {
    case Layout::kYv12:
      return {4, 2};
    case Layout::kInterleaved422:
      return {2, 1};
    case Layout::kRawBayer:
      // Packed RAW10 and RAW12 rows hold whole groups of four samples.
      return {bpp == 16 ? 2 : 4, 1};
    case Layout::kBlob:  // any size
      return {1, 1};
    default:
      return {2, 2};
  }
}

std::string DimensionMessage(Layout layout, HalPixelFormat format, int bpp) {
  switch (layout) {
    case Layout::kSemiPlanar420:
      return "YCBCR_420_888 dimension requirements not met";
    case Layout::kYv12:
      return "YV12 dimension requirements not met";
    case Layout::kInterleaved422:
      return "YCBCR_422_I dimension requirements not met";
    case Layout::kMonochrome:
      return "Monochrome format dimension requirements not met";
    case Layout::kRawBayer:
      return "Dimension requirements not met for RAW" + std::to_string(bpp);
    case Layout::kSbwcBayerLossless:
      return "RAW16_BAYER_SBWC dimension requirements not met";
    case Layout::kSbwcYuvLossless:
      return "YCBCR_420_SP_M_SBWC dimension requirements not met";
    case Layout::kSbwcBayerLossy:
    case Layout::kSbwcYuvLossy:
      return FormatToString(format) + " dimension requirements not met";
    case Layout::kAfbcWideBlock:
      return "YCBCR_420_888_I_AFBC dimension requirements not met";
    case Layout::kAfbcExtraWideBlock:
      return "YCBCR_420_888_AFBC dimension requirements not met";
    case Layout::kNone:
    case Layout::kBlob:  // takes any size
      break;
  }
  return "";
}

// `value` - (value / multiple) * multiple with truncating division; a zero
// multiple counts as quotient 0.
int64_t Remainder(int value, int multiple) {
  const int64_t quotient = multiple == 0 ? 0 : int64_t{value} / multiple;
  return int64_t{value} - quotient * multiple;
}

// OK when width and height are multiples of the given numbers; otherwise
// INVALID_ARGUMENT naming each failing dimension (no separator between the
// two texts).
Status CheckDimensionsValid(int width, int height, int width_multiple, int height_multiple,
                            bool verbose) {
  const int64_t width_remainder = Remainder(width, width_multiple);
  const int64_t height_remainder = Remainder(height, height_multiple);
  if (width_remainder == 0 && height_remainder == 0) return OkStatus();
  StatusBuilder builder = InvalidArgumentErrorBuilder(ORVEX_LOC);
  if (verbose && width_remainder != 0) {
    builder << "image width should be a multiple of " << width_multiple << ", " << width << " % "
            << width_multiple << " = " << width_remainder;
  }
  if (verbose && height_remainder != 0) {
    builder << "image height should be a multiple of " << height_multiple << ", " << height << " % "
            << height_multiple << " = " << height_remainder;
  }
  return builder;
}

// A component under construction, with 64-bit fields so that sizes that do
// not fit the component's int fields are detected instead of wrapped.
struct DraftComponent {
  Content content;
  int buffer_index;
  uint64_t offset_bytes;
  int64_t width;
  int64_t height;
  int64_t row_stride_bytes;
  int bits_per_pixel;
  int pixel_stride = 1;
  int pixel_phase = 0;
};

struct Draft {
  std::array<uint64_t, 2> buffer_sizes{};
  int buffer_count = 0;
  std::array<DraftComponent, 4> components{};
  int component_count = 0;
  std::optional<Subsampling> chroma_subsampling;

  void AddBuffer(uint64_t size) { buffer_sizes[static_cast<size_t>(buffer_count++)] = size; }
  void Add(const DraftComponent& c) { components[static_cast<size_t>(component_count++)] = c; }
};

constexpr uint64_t U(int64_t v) { return static_cast<uint64_t>(v); }

int64_t AlignUp(int64_t value, size_t alignment) { return AlignToPower2Signed(value, alignment); }

// Row stride of an uncompressed plane: `bpp` bits per sample, padded to
// `alignment` bytes (1: packed rows, which skip the call).
int64_t RowStride(int64_t w, int bpp, int alignment) {
  const int64_t bytes = (bpp * w) / 8;
  return alignment == 1 ? bytes : AlignUp(bytes, static_cast<size_t>(alignment));
}

void LayOutSemiPlanar420(const FormatTraits& t, int64_t w, int64_t h, int bpp, Draft& d) {
  const int64_t stride = RowStride(w, bpp, t.alignment);
  const uint64_t luma_size = U(h) * U(stride);
  const uint64_t chroma_size = luma_size / 2;
  int chroma_buffer = 1;
  uint64_t chroma_offset = 0;
  if (t.single_buffer) {
    d.AddBuffer(luma_size + chroma_size);
    chroma_buffer = 0;
    chroma_offset = luma_size;
  } else {
    d.AddBuffer(luma_size);
    d.AddBuffer(chroma_size);
  }
  d.Add({Content::kLuma, 0, 0, w, h, stride, bpp, 1, 0});
  // Phases are fixed in Make once the order is known.
  d.Add({Content::kChromaB, chroma_buffer, chroma_offset, w / 2, h / 2, stride, bpp, 2, 0});
  d.Add({Content::kChromaR, chroma_buffer, chroma_offset, w / 2, h / 2, stride, bpp, 2, 0});
  d.chroma_subsampling = Subsampling::k420;
}

void LayOutYv12(const FormatTraits& t, int64_t w, int64_t h, int bpp, Draft& d) {
  const int64_t luma_stride = RowStride(w, bpp, t.alignment);
  const int64_t chroma_stride = AlignUp(luma_stride / 2, static_cast<size_t>(t.alignment));
  const uint64_t luma_size = U(h) * U(luma_stride);
  const uint64_t chroma_size = (U(h) * U(chroma_stride)) / 2;
  d.AddBuffer(luma_size + 2 * chroma_size);
  d.Add({Content::kLuma, 0, 0, w, h, luma_stride, bpp});
  d.Add({Content::kChromaR, 0, luma_size, w / 2, h / 2, chroma_stride, bpp});
  d.Add({Content::kChromaB, 0, luma_size + chroma_size, w / 2, h / 2, chroma_stride, bpp});
  d.chroma_subsampling = Subsampling::k420;
}

// Y0 Cb Y1 Cr: two samples per pixel.
void LayOutInterleaved422(const FormatTraits& t, int64_t w, int64_t h, int bpp, Draft& d) {
  const int64_t stride = RowStride(2 * w, bpp, t.alignment);
  d.AddBuffer(U(h) * U(stride));
  d.Add({Content::kLuma, 0, 0, w, h, stride, bpp, 2, 0});
  d.Add({Content::kChromaB, 0, 0, w / 2, h, stride, bpp, 4, 1});
  d.Add({Content::kChromaR, 0, 0, w / 2, h, stride, bpp, 4, 3});
  d.chroma_subsampling = Subsampling::k422;
}

// Monochrome and raw Bayer: one plane of one component.
void LayOutSinglePlane(const FormatTraits& t, Content content, int64_t w, int64_t h, int bpp,
                       Draft& d) {
  const int64_t stride = RowStride(w, bpp, t.alignment);
  d.AddBuffer(U(h) * U(stride));
  d.Add({content, 0, 0, w, h, stride, bpp, 1, 0});
}

void LayOutBlob(int64_t w, int64_t h, Draft& d) {
  d.AddBuffer(U(w) * U(h));
  d.Add({Content::kUnspecified, 0, 0, w, h, w, 8, 1, 0});
}

void LayOutSbwcBayerLossless(const FormatTraits& t, int width, int64_t h, int bpp, Draft& d) {
  const auto alignment = static_cast<size_t>(t.alignment);
  const int64_t blocks = CeilDiv(width, 256);
  // Half a byte of header per 256x1 block, rows padded to the alignment.
  const int64_t header_stride = AlignUp(CeilDiv(blocks, 2), alignment);
  const uint64_t header_size = U(header_stride) * U(h);
  const auto payload_stride =
      static_cast<int64_t>(sbwc_size_utils::GetPayloadStride<256, 1>(width, bpp, t.alignment));
  d.AddBuffer(header_size + U(payload_stride) * U(h));
  d.Add({Content::kCompressedBayerHeader, 0, 0, header_stride, h, header_stride, bpp});
  d.Add({Content::kCompressedBayerPayload, 0, header_size, payload_stride, h, payload_stride, bpp});
}

void LayOutSbwcBayerLossy(const FormatTraits& t, int width, int64_t h, int bpp, Draft& d) {
  const int64_t stride = sbwc_size_utils::detail::LossyBayerPayloadStride(width, bpp, t.alignment,
                                                                          t.compression_ratio);
  d.AddBuffer(U(stride) * U(h));
  d.Add({Content::kCompressedBayerPayload, 0, 0, stride, h, stride, bpp});
}

void LayOutSbwcYuvLossless(const FormatTraits& t, int width, int height, int bpp, Draft& d) {
  const int64_t w = width;
  const int64_t h = height;
  const int header_alignment = t.alignment;
  const bool ten_bit = bpp == 10;
  // Blocks of 32x4 luma samples.
  const int64_t header_stride = AlignUp(CeilDiv(w, 64), static_cast<size_t>(header_alignment));
  const int64_t payload_stride = CeilDiv(w, 32) * (ten_bit ? 192 : 128);
  const int64_t rows = AlignUp(h, ten_bit ? 8 : 16);
  const uint64_t luma_payload = U(payload_stride) * U(rows / 4) + 64;
  const auto luma_header = U(sbwc_size_utils::detail::YHeaderSize(width, height, header_alignment));
  const uint64_t chroma_payload = U(payload_stride) * U(rows / 8) + 64;
  const auto chroma_header =
      U(sbwc_size_utils::detail::UVHeaderSize(width, height, header_alignment));
  d.AddBuffer(luma_payload + luma_header);
  d.AddBuffer(chroma_payload + chroma_header);
  const int64_t luma_rows = CeilDiv(h, 4);
  const int64_t chroma_rows = CeilDiv(h / 2, 4);
  d.Add({Content::kCompressedLumaHeader, 0, luma_payload, header_stride, luma_rows, header_stride,
         bpp});
  d.Add({Content::kCompressedLumaPayload, 0, 0, payload_stride, luma_rows, payload_stride, bpp});
  d.Add({Content::kCompressedChromaHeader, 1, chroma_payload, header_stride, chroma_rows,
         header_stride, bpp});
  d.Add(
      {Content::kCompressedChromaPayload, 1, 0, payload_stride, chroma_rows, payload_stride, bpp});
  d.chroma_subsampling = Subsampling::k420;
}

void LayOutSbwcYuvLossy(const FormatTraits& t, int width, int64_t h, int bpp, Draft& d) {
  const int64_t stride =
      sbwc_size_utils::detail::LossyYuvPayloadStride(width, bpp, t.alignment, t.compression_ratio);
  const int64_t rows = AlignUp(h, 16);
  d.AddBuffer(U(stride) * U(rows / 4) + 64);
  d.AddBuffer(U(stride) * U(rows / 8) + 64);
  d.Add({Content::kCompressedLumaPayload, 0, 0, stride, CeilDiv(h, 4), stride, bpp});
  d.Add({Content::kCompressedChromaPayload, 1, 0, stride, CeilDiv(h / 2, 4), stride, bpp});
  d.chroma_subsampling = Subsampling::k420;
}

// Header and payload geometry of one AFBC plane.
struct AfbcPlane {
  int64_t header_width;
  int64_t header_stride;
  int64_t header_height;
  uint64_t header_size;
  int64_t payload_width;
  int64_t payload_stride;
  int64_t payload_height;
};

AfbcPlane LayOutAfbcPlane(HalPixelFormat format, int64_t w, int64_t h, int64_t payload_bits) {
  namespace afbc = afbc_size_utils::detail;
  AfbcPlane p{};
  p.header_width = afbc::HeaderWidth(format, w);
  p.header_stride = afbc::HeaderStride(p.header_width);
  p.header_height = afbc::HeaderHeight(format, h);
  p.header_size = afbc_size_utils::AlignBufferSize(format, U(p.header_height) * U(p.header_stride));
  p.payload_width = afbc::PayloadWidth(format, w);
  p.payload_stride = afbc::PayloadStride(p.payload_width, payload_bits);
  p.payload_height = afbc::PayloadHeight(format, h);
  return p;
}

// Luma and chroma share the superblocks: one header area, one payload area.
void LayOutAfbcWideBlock(HalPixelFormat format, int64_t w, int64_t h, int bpp, Draft& d) {
  const AfbcPlane p = LayOutAfbcPlane(format, w, h, (bpp * 3) / 2);
  d.AddBuffer(p.header_size + U(p.payload_height) * U(p.payload_stride));
  d.Add({Content::kCompressedLumaHeader, 0, 0, p.header_width, p.header_height, p.header_stride,
         bpp});
  d.Add({Content::kCompressedLumaPayload, 0, p.header_size, p.payload_width, p.payload_height,
         p.payload_stride, bpp});
  d.Add({Content::kCompressedChromaHeader, 0, 0, p.header_width, p.header_height, p.header_stride,
         bpp});
  d.Add({Content::kCompressedChromaPayload, 0, p.header_size, p.payload_width / 2,
         p.payload_height / 2, p.payload_stride, bpp});
  d.chroma_subsampling = Subsampling::k420;
}

// Luma plane in buffer 0, interleaved chroma plane (a Cb-Cr pair counts as
// one sample of twice the bits) in buffer 1, each header then payload.
void LayOutAfbcExtraWideBlock(HalPixelFormat format, int64_t w, int64_t h, int bpp, Draft& d) {
  const AfbcPlane luma = LayOutAfbcPlane(format, w, h, bpp);
  const AfbcPlane chroma = LayOutAfbcPlane(format, w / 2, h / 2, 2 * int64_t{bpp});
  for (const AfbcPlane* p : {&luma, &chroma}) {
    const uint64_t payload_size =
        afbc_size_utils::AlignBufferSize(format, U(p->payload_height) * U(p->payload_stride));
    d.AddBuffer(p->header_size + payload_size);
  }
  d.Add({Content::kCompressedLumaHeader, 0, 0, luma.header_width, luma.header_height,
         luma.header_stride, bpp});
  d.Add({Content::kCompressedLumaPayload, 0, luma.header_size, luma.payload_width,
         luma.payload_height, luma.payload_stride, bpp});
  d.Add({Content::kCompressedChromaHeader, 1, 0, chroma.header_width, chroma.header_height,
         chroma.header_stride, bpp});
  d.Add({Content::kCompressedChromaPayload, 1, chroma.header_size, chroma.payload_width,
         chroma.payload_height, chroma.payload_stride, bpp});
  d.chroma_subsampling = Subsampling::k420;
}

bool FitsInt(int64_t v) { return v >= INT_MIN && v <= INT_MAX; }

}  // namespace

ImageFormat::ImageFormat(HalPixelFormat format, int width, int height,
                         std::vector<size_t> buffer_sizes, std::vector<Component> components,
                         std::optional<ChromaSubsampling> chroma_subsampling,
                         std::optional<InterleavedChromaOrder> interleaved_chroma_order)
    : format_(format),
      width_(width),
      height_(height),
      buffer_sizes_(std::move(buffer_sizes)),
      components_(std::move(components)),
      chroma_subsampling_(chroma_subsampling),
      interleaved_chroma_order_(interleaved_chroma_order) {}

StatusOr<ImageFormat> ImageFormat::Make(
    int width, int height, HalPixelFormat format,
    std::optional<InterleavedChromaOrder> interleaved_chroma_order) {
  if (format == F::IMPLEMENTATION_DEFINED) {
    format = F::YCBCR_420_888;
  } else if (format == F::IMPLEMENTATION_DEFINED_64) {
    format = F::YCBCR_420_888_STRIDE_ALIGNED_64;
  }
  const FormatTraits* traits = FindFormatTraits(format);
  if (traits == nullptr || traits->layout == Layout::kNone) {
    return UnimplementedErrorBuilder(ORVEX_LOC)
           << "Unsupported HalPixelFormat: " << FormatToString(format)
           << ", unable to make ImageFormat.";
  }
  const FormatTraits& t = *traits;
  const int bpp = t.bits_per_pixel;
  if (t.layout == Layout::kInterleaved422 && interleaved_chroma_order.has_value() &&
      *interleaved_chroma_order != Order::kCrCb) {
    return UnimplementedErrorBuilder(ORVEX_LOC)
           << "Unsupported interleaved chroma order: "
           << InterleavedChromaOrderToString(*interleaved_chroma_order)
           << " for HalPixelFormat: YCBCR_422_I, unable to make ImageFormat.";
  }
  const DimensionMultiples multiples = DimensionMultiplesOf(t.layout, bpp);
  Status dimensions =
      CheckDimensionsValid(width, height, multiples.width, multiples.height, /*verbose=*/true);
  if (!dimensions.ok()) {
    return StatusBuilder(std::move(dimensions), ORVEX_LOC)
           << DimensionMessage(t.layout, format, bpp);
  }
  // Negative sizes would give negative strides and wrapped buffer sizes.
  if (width < 0 || height < 0) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC)
           << "Invalid image size " << width << "x" << height
           << " for HalPixelFormat: " << FormatToString(format)
           << ", width and height must not be negative";
  }

  Draft d;
  const int64_t w = width;
  const int64_t h = height;
  switch (t.layout) {
    case Layout::kNone:  // refused above
      break;
    case Layout::kSemiPlanar420:
      LayOutSemiPlanar420(t, w, h, bpp, d);
      break;
    case Layout::kYv12:
      LayOutYv12(t, w, h, bpp, d);
      break;
    case Layout::kInterleaved422:
      LayOutInterleaved422(t, w, h, bpp, d);
      break;
    case Layout::kMonochrome:
    case Layout::kRawBayer:
      LayOutSinglePlane(t, t.layout == Layout::kRawBayer ? Content::kBayer : Content::kLuma, w, h,
                        bpp, d);
      break;
    case Layout::kBlob:
      LayOutBlob(w, h, d);
      break;
    case Layout::kSbwcBayerLossless:
      LayOutSbwcBayerLossless(t, width, h, bpp, d);
      break;
    case Layout::kSbwcBayerLossy:
      LayOutSbwcBayerLossy(t, width, h, bpp, d);
      break;
    case Layout::kSbwcYuvLossless:
      LayOutSbwcYuvLossless(t, width, height, bpp, d);
      break;
    case Layout::kSbwcYuvLossy:
      LayOutSbwcYuvLossy(t, width, h, bpp, d);
      break;
    case Layout::kAfbcWideBlock:
      LayOutAfbcWideBlock(format, w, h, bpp, d);
      break;
    case Layout::kAfbcExtraWideBlock:
      LayOutAfbcExtraWideBlock(format, w, h, bpp, d);
      break;
  }

  // Every stride and extent must fit the component's int fields; when they
  // do, the 64-bit buffer sizes computed from them are exact.
  std::vector<Component> components;
  components.reserve(static_cast<size_t>(d.component_count));
  for (int i = 0; i < d.component_count; ++i) {
    const DraftComponent& c = d.components[static_cast<size_t>(i)];
    if (!FitsInt(c.width) || !FitsInt(c.height) || !FitsInt(c.row_stride_bytes)) {
      return InvalidArgumentErrorBuilder(ORVEX_LOC)
             << "Image size " << width << "x" << height
             << " is too large for HalPixelFormat: " << FormatToString(format)
             << ", its row stride or extent does not fit in 32 bits";
    }
    components.push_back(Component{c.content, c.buffer_index, c.offset_bytes,
                                   static_cast<int>(c.width), static_cast<int>(c.height),
                                   static_cast<int>(c.row_stride_bytes), c.bits_per_pixel,
                                   c.pixel_stride, c.pixel_phase});
  }

  std::optional<Order> order;
  if (t.chroma_order != ChromaOrder::kNone) {
    order = interleaved_chroma_order.has_value()
                ? *interleaved_chroma_order
                : (t.chroma_order == ChromaOrder::kCbCr ? Order::kCbCr : Order::kCrCb);
  } else if (interleaved_chroma_order.has_value()) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC)
           << "Specifying interleaved pixel order for format: " << FormatToString(format)
           << " is not supported";
  }
  if (t.layout == Layout::kSemiPlanar420) {
    // An order value that is no enumerator counts as kCrCb, as it does for
    // its text and for the conformance check.
    const bool cb_first = order == Order::kCbCr;
    components[1].pixel_phase = cb_first ? 0 : 1;  // kChromaB
    components[2].pixel_phase = cb_first ? 1 : 0;  // kChromaR
  }

  std::vector<size_t> buffer_sizes(d.buffer_sizes.begin(), d.buffer_sizes.begin() + d.buffer_count);
  return ImageFormat(format, width, height, std::move(buffer_sizes), std::move(components),
                     d.chroma_subsampling, order);
}

std::string ImageFormat::DebugStr() const {
  return BuildOrvexDebugStrWithStrings("ImageFormat", {{"HalPixelFormat", FormatToString(format_)},
                                                       {"Width", std::to_string(width_)},
                                                       {"Height", std::to_string(height_)}});
}

std::string ImageFormat::DebugStrVerbose() const {
  return BuildOrvexDebugStrWithStrings(
      "ImageFormat",
      {{"HalPixelFormat", FormatToString(format_)},
       {"Width", std::to_string(width_)},
       {"Height", std::to_string(height_)},
       {"BufferSizes",
        ContainerDebugStr(buffer_sizes_, [](size_t size) { return std::to_string(size); })},
       {"Components", ContainerDebugStr(components_, &ImageFormat::ComponentToString)},
       {"ChromaSubsampling", OptionalChromaSubsamplingToString(chroma_subsampling_)},
       {"InterleavedChromaOrder",
        OptionalInterleavedChromaOrderToString(interleaved_chroma_order_)}});
}

std::string ImageFormat::ComponentToString(const Component& component) {
  return BuildOrvexDebugStrWithStrings(
      "Component", {{"Content", ComponentContentToString(component.content)},
                    {"BufferIndex", std::to_string(component.buffer_index)},
                    {"OffsetBytes", std::to_string(component.offset_bytes)},
                    {"Width", std::to_string(component.width)},
                    {"Height", std::to_string(component.height)},
                    {"RowStrideBytes", std::to_string(component.row_stride_bytes)},
                    {"BitsPerPixel", std::to_string(component.bits_per_pixel)},
                    {"PixelStride", std::to_string(component.pixel_stride)},
                    {"PixelPhase", std::to_string(component.pixel_phase)}});
}

std::string ImageFormat::ComponentContentToString(ComponentContent content) {
  static constexpr std::array<std::string_view, 15> kNames = {
      "Unspecified",
      "Bayer",
      "Rgb",
      "Red",
      "Green",
      "Blue",
      "Luma",
      "ChromaB",
      "ChromaR",
      "CompressedLumaHeader",
      "CompressedLumaPayload",
      "CompressedChromaHeader",
      "CompressedChromaPayload",
      "CompressedBayerHeader",
      "CompressedBayerPayload",
  };
  const auto index = static_cast<uint32_t>(content);
  return index < kNames.size() ? std::string(kNames[index]) : "Unknown";
}

std::string ImageFormat::ChromaSubsamplingToString(ChromaSubsampling subsampling) {
  switch (subsampling) {
    case ChromaSubsampling::k420:
      return "420";
    case ChromaSubsampling::k422:
      return "422";
    default:
      return "444";
  }
}

std::string ImageFormat::InterleavedChromaOrderToString(InterleavedChromaOrder order) {
  return order == InterleavedChromaOrder::kCbCr ? "CbCr" : "CrCb";
}

std::string OptionalChromaSubsamplingToString(
    const std::optional<ImageFormat::ChromaSubsampling>& subsampling) {
  return subsampling.has_value() ? ImageFormat::ChromaSubsamplingToString(*subsampling) : "n/a";
}

std::string OptionalInterleavedChromaOrderToString(
    const std::optional<ImageFormat::InterleavedChromaOrder>& order) {
  return order.has_value() ? ImageFormat::InterleavedChromaOrderToString(*order) : "n/a";
}

// ---------------------------------------------------------------------------
// Conformance and lookup.

namespace {

// Failure composition of one ConformsTo call. Rules that fail inside the
// member give "<prefix><detail>"; failures of a called check give
// "<callee message>; <prefix>", re-coded INVALID_ARGUMENT. Nothing is
// composed when quiet.
class Conformance {
 public:
  Conformance(bool verbose, std::string_view subject) : verbose_(verbose), subject_(subject) {}

  template <typename... Pieces>
  Status Fail(const Pieces&... pieces) const {
    StatusBuilder builder = InvalidArgumentErrorBuilder(ORVEX_LOC);
    if (verbose_) {
      builder << "ImageFormat does not conform to " << subject_ << ". ";
      (builder << ... << pieces);
    }
    return builder;
  }

  Status Wrap(const Status& callee) const {
    StatusBuilder builder(Status(StatusCode::kInvalidArgument, callee.message()), ORVEX_LOC);
    if (verbose_) builder << "ImageFormat does not conform to " << subject_ << ". ";
    return builder;
  }

 private:
  bool verbose_;
  std::string_view subject_;
};

bool IsAlignedTo(int64_t value, size_t alignment) { return AlignUp(value, alignment) == value; }

const ImageFormat::Component* FindComponent(const std::vector<ImageFormat::Component>& components,
                                            ImageFormat::ComponentContent content) {
  for (const ImageFormat::Component& c : components) {
    if (c.content == content) return &c;
  }
  return nullptr;
}

}  // namespace

// Fetches a component for a conformance rule or returns the wrapped failure.
#define ORVEX_CONFORMANCE_GET(var, content)                                \
  const Component* var##_ptr = FindComponent(components_, (content));      \
  if (var##_ptr == nullptr) {                                              \
    return conformance.Wrap(GetComponentFor((content), verbose).status()); \
  }                                                                        \
  const Component& var = *var##_ptr

// Returns the wrapped failure of a called check.
#define ORVEX_CONFORMANCE_CALL(expr)                \
  do {                                              \
    const Status orvex_callee_status = (expr);      \
    if (!orvex_callee_status.ok()) {                \
      return conformance.Wrap(orvex_callee_status); \
    }                                               \
  } while (false)

std::optional<ImageFormat::Component> ImageFormat::GetComponentForInternal(
    ComponentContent content) const {
  if (const Component* c = FindComponent(components_, content)) return *c;
  return std::nullopt;
}

StatusOr<ImageFormat::Component> ImageFormat::GetComponentFor(ComponentContent content,
                                                              bool verbose) const {
  if (const Component* c = FindComponent(components_, content)) return *c;
  StatusBuilder builder = FailedPreconditionErrorBuilder(ORVEX_LOC);
  if (verbose) {
    builder << "Failed to find component with " << ComponentContentToString(content) << " in "
            << DebugStr();
  }
  return builder;
}

Status ImageFormat::IsYuv(bool verbose) const {
  const auto has = [this](ComponentContent content) {
    return FindComponent(components_, content) != nullptr;
  };
  const bool uncompressed = has(ComponentContent::kLuma) && has(ComponentContent::kChromaB) &&
                            has(ComponentContent::kChromaR);
  const bool compressed = has(ComponentContent::kCompressedLumaPayload) &&
                          has(ComponentContent::kCompressedChromaPayload);
  if (!uncompressed && !compressed) {
    StatusBuilder builder = InvalidArgumentErrorBuilder(ORVEX_LOC);
    if (verbose) {
      builder << "Imageformat does not have required components for either compressed or "
                 "uncompressed YUV";
    }
    return builder;
  }
  if (!chroma_subsampling_.has_value()) {
    StatusBuilder builder = InvalidArgumentErrorBuilder(ORVEX_LOC);
    if (verbose) {
      builder << "ImageFormat does not contain valid YUV components. chroma_subsampling is un-set";
    }
    return builder;
  }
  return OkStatus();
}

Status ImageFormat::IsRaw(bool verbose) const {
  for (const Component& c : components_) {
    if (c.content == ComponentContent::kBayer ||
        c.content == ComponentContent::kCompressedBayerPayload) {
      return OkStatus();
    }
  }
  StatusBuilder builder = InvalidArgumentErrorBuilder(ORVEX_LOC);
  if (verbose) {
    builder << "Imageformat does not have required components for either compressed or "
               "uncompressed raw";
  }
  return builder;
}

Status ImageFormat::ConformsTo(ChromaSubsampling expected, bool verbose) const {
  const std::string subject = verbose ? ChromaSubsamplingToString(expected) : std::string();
  const Conformance conformance(verbose, subject);
  if (!chroma_subsampling_.has_value() || *chroma_subsampling_ != expected) {
    return conformance.Fail("ImageFormat's chroma subsampling reports: ",
                            OptionalChromaSubsamplingToString(chroma_subsampling_));
  }
  // Compressed layouts are not measured.
  if (FindComponent(components_, ComponentContent::kCompressedLumaPayload) != nullptr &&
      FindComponent(components_, ComponentContent::kCompressedChromaPayload) != nullptr) {
    return OkStatus();
  }
  ORVEX_CONFORMANCE_GET(luma, ComponentContent::kLuma);
  ORVEX_CONFORMANCE_GET(cb, ComponentContent::kChromaB);
  ORVEX_CONFORMANCE_GET(cr, ComponentContent::kChromaR);
  int expected_width = luma.width;
  int expected_height = luma.height;
  if (expected == ChromaSubsampling::k422) {
    expected_width >>= 1;
  } else if (expected == ChromaSubsampling::k420) {
    expected_width >>= 1;
    expected_height >>= 1;
  }
  if (cb.width != expected_width) {
    return conformance.Fail("ChromaB component width: ", cb.width,
                            " != expected width: ", expected_width);
  }
  if (cr.width != expected_width) {
    return conformance.Fail("ChromaR component width: ", cr.width,
                            " != expected width: ", expected_width);
  }
  if (cb.height != expected_height) {
    return conformance.Fail("ChromaB component height: ", cb.height,
                            " != expected height: ", expected_height);
  }
  if (cr.height != expected_height) {
    return conformance.Fail("ChromaR component height: ", cr.height,
                            " != expected height: ", expected_height);
  }
  return OkStatus();
}

Status ImageFormat::ConformsTo(HalPixelFormat target, bool verbose) const {
  const std::string subject = verbose ? FormatToString(target) : std::string();
  const Conformance conformance(verbose, subject);
  const FormatTraits* traits = FindFormatTraits(target);
  const int bpp = traits != nullptr ? traits->bits_per_pixel : 8;
  for (const Component& c : components_) {
    if (c.bits_per_pixel != bpp) {
      StatusBuilder builder = InvalidArgumentErrorBuilder(ORVEX_LOC);
      if (verbose) {
        builder << "component bits per pixel: " << c.bits_per_pixel
                << " != expected bits per pixel: " << bpp;
      }
      return conformance.Wrap(builder);
    }
  }

  using CC = ComponentContent;
  const Rules rules = traits != nullptr ? traits->rules : Rules::kNone;
  switch (rules) {
    case Rules::kNone: {
      StatusBuilder builder = UnimplementedErrorBuilder(ORVEX_LOC);
      if (verbose) builder << "Unable to check if conforms to " << subject;
      return builder;
    }
    case Rules::kImplementationDefined:
      return conformance.Fail(
          "There is no sensibe way to say if a format conforms to IMPLEMENTATION_DEFINED");
    case Rules::kBlob:
      if (FindComponent(components_, CC::kUnspecified) != nullptr) return OkStatus();
      return conformance.Fail("BLOB should have at least 1 unspecified component");
    case Rules::kRaw:
      ORVEX_CONFORMANCE_CALL(IsRaw(verbose));
      return OkStatus();
    case Rules::kMonochrome: {
      ORVEX_CONFORMANCE_GET(luma, CC::kLuma);
      ORVEX_CONFORMANCE_CALL(CheckDimensionsValid(luma.width, luma.height, 2, 2, verbose));
      const int multiple = traits->stride_multiple;
      if (luma.row_stride_bytes % multiple != 0) {
        return conformance.Fail("stride must be multiple of ", multiple);
      }
      return OkStatus();
    }
    case Rules::kSemiPlanar420: {
      ORVEX_CONFORMANCE_CALL(IsYuv(verbose));
      ORVEX_CONFORMANCE_CALL(ConformsTo(ChromaSubsampling::k420, verbose));
      ORVEX_CONFORMANCE_GET(luma, CC::kLuma);
      ORVEX_CONFORMANCE_GET(cb, CC::kChromaB);
      ORVEX_CONFORMANCE_GET(cr, CC::kChromaR);
      ORVEX_CONFORMANCE_CALL(CheckDimensionsValid(luma.width, luma.height, 2, 2, verbose));
      if (cb.buffer_index != cr.buffer_index) {
        return conformance.Fail("chroma components should be in the same buffer");
      }
      if (cb.offset_bytes != cr.offset_bytes) {
        return conformance.Fail("chroma components should start at the same offset");
      }
      if (traits->single_buffer) {
        if (luma.buffer_index != cb.buffer_index) {
          return conformance.Fail("all components should be in the same buffer");
        }
        const uint64_t luma_end =
            luma.offset_bytes + U(int64_t{luma.height} * luma.row_stride_bytes);
        if (cb.offset_bytes != luma_end) {
          return conformance.Fail(
              "chroma red component should come right after luma component in buffer");
        }
      }
      const bool cb_first = interleaved_chroma_order_ == InterleavedChromaOrder::kCbCr;
      const int cb_phase = cb_first ? 0 : 1;
      const int cr_phase = cb_first ? 1 : 0;
      if (luma.pixel_stride != 1 || luma.pixel_phase != 0 || cb.pixel_stride != 2 ||
          cb.pixel_phase != cb_phase || cr.pixel_stride != 2 || cr.pixel_phase != cr_phase) {
        return conformance.Fail("pixel interleaving not as expected");
      }
      const auto alignment = static_cast<size_t>(traits->stride_multiple);
      if (alignment == 0) return OkStatus();
      if (luma.row_stride_bytes != cb.row_stride_bytes ||
          luma.row_stride_bytes != cr.row_stride_bytes) {
        return conformance.Fail("components have different row strides, y: ", luma.row_stride_bytes,
                                ", u: ", cb.row_stride_bytes, ", v: ", cr.row_stride_bytes);
      }
      if (!IsAlignedTo(luma.row_stride_bytes, alignment)) {
        return conformance.Fail("row stride is not aligned to ", alignment,
                                " bytes: ", luma.row_stride_bytes);
      }
      return OkStatus();
    }
    case Rules::kYv12: {
      ORVEX_CONFORMANCE_CALL(IsYuv(verbose));
      ORVEX_CONFORMANCE_CALL(ConformsTo(ChromaSubsampling::k420, verbose));
      ORVEX_CONFORMANCE_GET(luma, CC::kLuma);
      ORVEX_CONFORMANCE_GET(cb, CC::kChromaB);
      ORVEX_CONFORMANCE_GET(cr, CC::kChromaR);
      ORVEX_CONFORMANCE_CALL(CheckDimensionsValid(luma.width, luma.height, 4, 2, verbose));
      const int multiple = traits->stride_multiple;
      if (luma.row_stride_bytes % multiple != 0 || cb.row_stride_bytes % multiple != 0 ||
          cr.row_stride_bytes % multiple != 0) {
        return conformance.Fail("component strides must all be multiples of ", multiple);
      }
      if (luma.buffer_index != cb.buffer_index || luma.buffer_index != cr.buffer_index) {
        return conformance.Fail("All components should be in the same buffer");
      }
      if (cr.offset_bytes != luma.offset_bytes + U(int64_t{luma.row_stride_bytes} * luma.height)) {
        return conformance.Fail(
            "chroma red component should come right after luma component in buffer");
      }
      if (cb.offset_bytes != cr.offset_bytes + U(int64_t{cr.row_stride_bytes} * cr.height)) {
        return conformance.Fail(
            "chroma blue component should come right after chroma red component in buffer");
      }
      for (const Component& c : components_) {
        if (c.pixel_stride != 1 || c.pixel_phase != 0) {
          return conformance.Fail("there should be no pixel interleaving");
        }
      }
      return OkStatus();
    }
    case Rules::kInterleaved422: {
      ORVEX_CONFORMANCE_CALL(IsYuv(verbose));
      ORVEX_CONFORMANCE_CALL(ConformsTo(ChromaSubsampling::k422, verbose));
      ORVEX_CONFORMANCE_GET(luma, CC::kLuma);
      ORVEX_CONFORMANCE_GET(cb, CC::kChromaB);
      ORVEX_CONFORMANCE_GET(cr, CC::kChromaR);
      ORVEX_CONFORMANCE_CALL(CheckDimensionsValid(luma.width, luma.height, 2, 1, verbose));
      if (luma.buffer_index != cb.buffer_index || luma.buffer_index != cr.buffer_index) {
        return conformance.Fail("All components should be in the same buffer");
      }
      if (luma.offset_bytes != cb.offset_bytes || luma.offset_bytes != cr.offset_bytes) {
        return conformance.Fail("All components should have the same offset");
      }
      if (luma.pixel_stride != 2 || luma.pixel_phase != 0 || cb.pixel_stride != 4 ||
          cb.pixel_phase != 1 || cr.pixel_stride != 4 || cr.pixel_phase != 3) {
        return conformance.Fail("pixel interleaving not as expected");
      }
      return OkStatus();
    }
    case Rules::kSbwcBayerLossless: {
      ORVEX_CONFORMANCE_GET(header, CC::kCompressedBayerHeader);
      ORVEX_CONFORMANCE_GET(payload, CC::kCompressedBayerPayload);
      (void)header;
      (void)payload;
      return OkStatus();
    }
    case Rules::kSbwcBayerLossy: {
      ORVEX_CONFORMANCE_GET(payload, CC::kCompressedBayerPayload);
      const auto alignment = static_cast<size_t>(traits->stride_multiple);
      if (!IsAlignedTo(payload.row_stride_bytes, alignment)) {
        return conformance.Fail("row stride is not aligned to ", alignment,
                                " bytes: ", payload.row_stride_bytes, " for ",
                                ComponentContentToString(payload.content));
      }
      return OkStatus();
    }
    case Rules::kSbwcYuvLossless:
    case Rules::kSbwcYuvLossy: {
      const bool lossless = rules == Rules::kSbwcYuvLossless;
      const auto alignment = static_cast<size_t>(traits->stride_multiple);
      static constexpr std::array<CC, 4> kLosslessContents = {
          CC::kCompressedLumaHeader, CC::kCompressedLumaPayload, CC::kCompressedChromaHeader,
          CC::kCompressedChromaPayload};
      static constexpr std::array<CC, 2> kLossyContents = {CC::kCompressedLumaPayload,
                                                           CC::kCompressedChromaPayload};
      const CC* begin = lossless ? kLosslessContents.data() : kLossyContents.data();
      const CC* end = begin + (lossless ? kLosslessContents.size() : kLossyContents.size());
      for (const CC* content = begin; content != end; ++content) {
        ORVEX_CONFORMANCE_GET(c, *content);
        if (!IsAlignedTo(c.row_stride_bytes, alignment)) {
          return conformance.Fail("row stride is not aligned to ", alignment,
                                  " bytes: ", c.row_stride_bytes, " for ",
                                  ComponentContentToString(c.content));
        }
      }
      return OkStatus();
    }
    case Rules::kAfbcExtraWideBlock:
    case Rules::kAfbcWideBlock: {
      namespace afbc = afbc_size_utils::detail;
      const bool extra_wide = rules == Rules::kAfbcExtraWideBlock;
      const int64_t w = width_;
      const int64_t luma_header = afbc::HeaderStride(afbc::HeaderWidth(target, w));
      const std::array<std::pair<CC, int64_t>, 4> expected = {{
          {CC::kCompressedLumaHeader, luma_header},
          {CC::kCompressedLumaPayload,
           afbc::PayloadStride(afbc::PayloadWidth(target, w), extra_wide ? bpp : (3 * bpp) / 2)},
          {CC::kCompressedChromaHeader,
           extra_wide ? afbc::HeaderStride(afbc::HeaderWidth(target, w / 2)) : luma_header},
          {CC::kCompressedChromaPayload,
           extra_wide ? afbc::PayloadStride(afbc::PayloadWidth(target, w / 2), 2 * int64_t{bpp})
                      : afbc::PayloadStride(afbc::PayloadWidth(target, w), (3 * bpp) / 2)},
      }};
      for (const auto& [content, stride] : expected) {
        ORVEX_CONFORMANCE_GET(c, content);
        if (c.row_stride_bytes != stride) {
          return conformance.Fail("row stride is not conformed to ", subject, " for ",
                                  ComponentContentToString(content),
                                  ", value: ", c.row_stride_bytes, ", expected: ", stride);
        }
      }
      return OkStatus();
    }
  }
  return OkStatus();
}

#undef ORVEX_CONFORMANCE_GET
#undef ORVEX_CONFORMANCE_CALL

bool ImageFormat::Is64ByteAligned() const { return Is64ByteAlignedPixelFormat(format_); }

}  // namespace orvex
