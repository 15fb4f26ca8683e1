// orvex formats and orvex layout.

#include <algorithm>
#include <limits>
#include <optional>
#include <ostream>
#include <string>

#include "fmt/format.h"
#include "orvex/api/memory/buffer_attributes.h"
#include "orvex/api/memory/hal_pixel_format.h"
#include "orvex/api/memory/image_format.h"
#include "tools/orvex/format_names.h"
#include "tools/orvex/json.h"
#include "tools/orvex/layout_svg.h"
#include "tools/orvex/output.h"
#include "tools/orvex/table.h"
#include "tools/orvex/tool.h"

namespace orvex_tool {
namespace {

using orvex::HalPixelFormat;
using orvex::ImageFormat;

int RunFormats(const ParsedArgs& args, CommandContext& context) {
  if (args.Has("json")) {
    Json formats = Json::MakeArray();
    for (HalPixelFormat format : orvex::AllHalPixelFormats()) {
      formats.Append(
          Json::MakeObject()
              .Set("name", orvex::FormatToString(format))
              .Set("code", uint64_t{static_cast<uint32_t>(format)})
              .Set("hex", HexCode(format))
              .Set("bits_per_sample", orvex::BitsPerPixel(format))
              .Set("compression", std::string(orvex::CompressionToString(
                                      orvex::HalPixelFormatToBufferCompression(format))))
              .Set("aligned_64", orvex::Is64ByteAlignedPixelFormat(format))
              .Set("uncompressed",
                   orvex::FormatToString(orvex::CompressedFormatToNonCompressedFormat(format))));
    }
    context.out() << Json::MakeObject().Set("formats", std::move(formats)).Dump();
    return kExitOk;
  }
  using Align = TextTable::Align;
  TextTable table({{"HEX", Align::kRight},
                   {"DECIMAL", Align::kRight},
                   {"NAME"},
                   {"BPP", Align::kRight},
                   {"COMPRESSION"},
                   {"64B"},
                   {"UNCOMPRESSED"}});
  for (HalPixelFormat format : orvex::AllHalPixelFormats()) {
    const HalPixelFormat uncompressed = orvex::CompressedFormatToNonCompressedFormat(format);
    table.AddRow(
        {HexCode(format), fmt::format("{}", static_cast<uint32_t>(format)),
         orvex::FormatToString(format), fmt::format("{}", orvex::BitsPerPixel(format)),
         std::string(orvex::CompressionToString(orvex::HalPixelFormatToBufferCompression(format))),
         orvex::Is64ByteAlignedPixelFormat(format) ? "yes" : "no",
         uncompressed == format ? "same" : orvex::FormatToString(uncompressed)});
  }
  context.out() << table.Render();
  return kExitOk;
}

Json LayoutJson(const ImageFormat& format) {
  Json sizes = Json::MakeArray();
  for (size_t size : format.buffer_sizes()) sizes.Append(uint64_t{size});
  Json components = Json::MakeArray();
  for (const ImageFormat::Component& c : format.components()) {
    components.Append(Json::MakeObject()
                          .Set("content", ImageFormat::ComponentContentToString(c.content))
                          .Set("buffer_index", c.buffer_index)
                          .Set("offset_bytes", uint64_t{c.offset_bytes})
                          .Set("width", c.width)
                          .Set("height", c.height)
                          .Set("row_stride_bytes", c.row_stride_bytes)
                          .Set("bits_per_pixel", c.bits_per_pixel)
                          .Set("pixel_stride", c.pixel_stride)
                          .Set("pixel_phase", c.pixel_phase));
  }
  Json subsampling;
  if (format.chroma_subsampling().has_value()) {
    subsampling = ImageFormat::ChromaSubsamplingToString(*format.chroma_subsampling());
  }
  Json order;
  if (format.interleaved_chroma_order().has_value()) {
    order = ImageFormat::InterleavedChromaOrderToString(*format.interleaved_chroma_order());
  }
  return Json::MakeObject()
      .Set("format", orvex::FormatToString(format.format()))
      .Set("code", uint64_t{static_cast<uint32_t>(format.format())})
      .Set("width", format.width())
      .Set("height", format.height())
      .Set("buffer_sizes", std::move(sizes))
      .Set("components", std::move(components))
      .Set("chroma_subsampling", std::move(subsampling))
      .Set("interleaved_chroma_order", std::move(order));
}

std::string LayoutText(const ImageFormat& format) {
  std::string text = fmt::format("{} ({} = {}), {} x {}\n", orvex::FormatToString(format.format()),
                                 HexCode(format.format()), static_cast<uint32_t>(format.format()),
                                 format.width(), format.height());
  text +=
      fmt::format("chroma subsampling: {}, interleaved chroma order: {}\n",
                  orvex::OptionalChromaSubsamplingToString(format.chroma_subsampling()),
                  orvex::OptionalInterleavedChromaOrderToString(format.interleaved_chroma_order()));
  uint64_t total = 0;
  for (size_t i = 0; i < format.buffer_sizes().size(); ++i) {
    text += fmt::format("buffer {}: {} bytes\n", i, format.buffer_sizes()[i]);
    total += format.buffer_sizes()[i];
  }
  text += fmt::format("total: {} bytes in {} buffer{}\n\n", total, format.buffer_sizes().size(),
                      format.buffer_sizes().size() == 1 ? "" : "s");
  using Align = TextTable::Align;
  TextTable table({{"CONTENT"},
                   {"BUFFER", Align::kRight},
                   {"OFFSET", Align::kRight},
                   {"WIDTH", Align::kRight},
                   {"HEIGHT", Align::kRight},
                   {"ROW STRIDE", Align::kRight},
                   {"BPP", Align::kRight},
                   {"PIXEL STRIDE", Align::kRight},
                   {"PHASE", Align::kRight}});
  for (const ImageFormat::Component& c : format.components()) {
    table.AddRow({ImageFormat::ComponentContentToString(c.content),
                  fmt::format("{}", c.buffer_index), fmt::format("{}", c.offset_bytes),
                  fmt::format("{}", c.width), fmt::format("{}", c.height),
                  fmt::format("{}", c.row_stride_bytes), fmt::format("{}", c.bits_per_pixel),
                  fmt::format("{}", c.pixel_stride), fmt::format("{}", c.pixel_phase)});
  }
  return text + table.Render();
}

int RunLayout(const ParsedArgs& args, CommandContext& context) {
  auto layout = ParseLayoutArgs(args);
  if (!layout.ok()) return context.UsageError(layout.status().message());
  std::optional<HalPixelFormat> target;
  if (auto text = args.Get("conform")) {
    auto parsed = ParseHalPixelFormat(*text, "--conform TARGET");
    if (!parsed.ok()) return context.UsageError(parsed.status().message());
    target = *parsed;
  }

  auto format = ImageFormat::Make(layout->width, layout->height, layout->format, layout->order);
  if (!format.ok()) return context.Error(format.status());

  // INVALID_ARGUMENT is the answer "does not conform"; a target that cannot
  // be checked (UNIMPLEMENTED, a code that names no format) is an error.
  orvex::Status conformance = orvex::OkStatus();
  if (target.has_value()) {
    const auto known = orvex::AllHalPixelFormats();
    conformance = std::find(known.begin(), known.end(), *target) == known.end()
                      ? orvex::UnimplementedError(fmt::format("Unable to check if conforms to {}",
                                                              orvex::FormatToString(*target)))
                      : format->ConformsTo(*target, /*verbose=*/true);
    if (!conformance.ok() && !orvex::IsInvalidArgument(conformance)) {
      return context.Error(conformance);
    }
  }

  if (auto svg_path = args.Get("svg")) {
    const orvex::Status written = WriteFileAtomically(*svg_path, LayoutSvg(*format));
    if (!written.ok()) return context.Error(written);
  }
  const bool json = args.Has("json");
  context.out() << (json ? LayoutJson(*format).Dump() : LayoutText(*format));
  if (!target.has_value()) return kExitOk;

  const std::string verdict = fmt::format("conformance to {}: {}\n", orvex::FormatToString(*target),
                                          conformance.ok() ? "conforms" : conformance.ToString());
  // With --json stdout holds only the object; the verdict goes to stderr.
  (json ? context.err() : context.out()) << (json ? "" : "\n") << verdict;
  return conformance.ok() ? kExitOk : kExitNegative;
}

}  // namespace

const Command& FormatsCommand() {
  static const Command command = {
      {.name = "formats",
       .positionals = "",
       .positional_count = 0,
       .summary = "list every HAL pixel format with its code and properties",
       .details = "Columns: code in hexadecimal and decimal, name, bits per stored sample,\n"
                  "the buffer compression the format implies, whether row strides are\n"
                  "64-byte aligned, and the uncompressed counterpart of a compressed format.",
       .flags = {{"json", "", "print {\"formats\": [...]} as JSON instead of a table"}}},
      RunFormats};
  return command;
}

const Command& LayoutCommand() {
  static const Command command = {
      {.name = "layout",
       .positionals = "WIDTH HEIGHT FORMAT",
       .positional_count = 3,
       .summary = "print the buffer sizes and components of an image layout",
       .details = "FORMAT is a name from 'orvex formats' (any letter case) or a numeric code,\n"
                  "decimal or 0x-hexadecimal. With --conform the exit status is 1 when the\n"
                  "layout does not conform and 2 when TARGET cannot be checked; with --json\n"
                  "the verdict goes to stderr so that stdout holds only the JSON object.\n"
                  "Library errors print the status text on stderr and exit 2.\n\n"
                  "example: orvex layout 4000 3000 YCBCR_420_888 --conform YCBCR_420_888",
       .flags = {{"order", "CbCr|CrCb", "interleaved chroma order (default: the format's)"},
                 {"conform", "TARGET", "also check that the layout conforms to TARGET"},
                 {"json", "", "print the layout as a JSON object"},
                 {"svg", "FILE", "draw the buffers to scale into an SVG file"}}},
      RunLayout};
  return command;
}

}  // namespace orvex_tool
