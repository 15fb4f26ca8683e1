// orvex render: turns a raw buffer dump into a PNG.

#include <optional>
#include <ostream>
#include <string>
#include <vector>

#include "absl/strings/match.h"
#include "absl/strings/str_join.h"
#include "fmt/format.h"
#include "orvex/api/memory/image_format.h"
#include "tools/orvex/file_io.h"
#include "tools/orvex/format_names.h"
#include "tools/orvex/output.h"
#include "tools/orvex/render.h"
#include "tools/orvex/tool.h"

namespace orvex_tool {
namespace {

using orvex::ImageFormat;

// The largest dump render reads (all buffers of one image together) and the
// largest picture it makes (16384 x 16384).
constexpr uint64_t kMaxImageBytes = uint64_t{1} << 30;
constexpr uint64_t kMaxPixels = uint64_t{1} << 28;

// `text` (any letter case) among `names`; the index, or nullopt.
std::optional<size_t> Choose(std::string_view text, const std::vector<std::string_view>& names) {
  for (size_t i = 0; i < names.size(); ++i) {
    if (absl::EqualsIgnoreCase(absl::string_view(text.data(), text.size()),
                               absl::string_view(names[i].data(), names[i].size()))) {
      return i;
    }
  }
  return std::nullopt;
}

// The bytes of a dump and each buffer's place in them.
struct Dump {
  std::vector<std::string> files;
  std::vector<std::span<const uint8_t>> buffers;
};

std::span<const uint8_t> Bytes(const std::string& bytes, size_t offset, size_t size) {
  return {reinterpret_cast<const uint8_t*>(bytes.data()) + offset, size};
}

// Reads the dump files: one per buffer, or one with the buffers back to back.
orvex::StatusOr<Dump> ReadDump(const ImageFormat& format, const std::vector<std::string>& paths) {
  const std::vector<size_t>& sizes = format.buffer_sizes();
  const std::string image = fmt::format("{} {}x{}", orvex::FormatToString(format.format()),
                                        format.width(), format.height());
  Dump dump;
  if (paths.size() == sizes.size()) {
    for (size_t i = 0; i < paths.size(); ++i) {
      auto bytes = ReadFileOfSize(paths[i], sizes[i], fmt::format("buffer {} of {}", i, image));
      if (!bytes.ok()) return bytes.status();
      dump.files.push_back(*std::move(bytes));
    }
    for (size_t i = 0; i < sizes.size(); ++i)
      dump.buffers.push_back(Bytes(dump.files[i], 0, sizes[i]));
    return dump;
  }
  if (paths.size() != 1) {
    return orvex::InvalidArgumentError(fmt::format(
        "{} has {} buffers: give one file per buffer, or one file with the buffers back to "
        "back; got {} files",
        image, sizes.size(), paths.size()));
  }
  uint64_t total = 0;
  for (size_t size : sizes) total += size;
  auto bytes = ReadFileOfSize(paths[0], total,
                              fmt::format("the {} buffers of {} back to back: {}", sizes.size(),
                                          image, absl::StrJoin(sizes, " + ")));
  if (!bytes.ok()) return bytes.status();
  dump.files.push_back(*std::move(bytes));
  size_t at = 0;
  for (size_t size : sizes) {
    dump.buffers.push_back(Bytes(dump.files[0], at, size));
    at += size;
  }
  return dump;
}

int RunRender(const ParsedArgs& args, CommandContext& context) {
  auto layout = ParseLayoutArgs(args);
  if (!layout.ok()) return context.UsageError(layout.status().message());
  const std::optional<std::string> out = args.Get("out");
  if (!out.has_value() || out->empty()) return context.UsageError("-o OUT.png is required");
  RenderOptions options;
  options.demosaic = args.Has("demosaic");
  if (auto text = args.Get("range")) {
    auto choice = Choose(*text, {"full", "limited"});
    if (!choice)
      return context.UsageError(fmt::format("--range must be full or limited, got '{}'", *text));
    options.range = *choice == 0 ? YuvRange::kFull : YuvRange::kLimited;
  }
  if (auto text = args.Get("matrix")) {
    auto choice = Choose(*text, {"bt601", "bt709"});
    if (!choice)
      return context.UsageError(fmt::format("--matrix must be bt601 or bt709, got '{}'", *text));
    options.matrix = *choice == 0 ? YuvMatrix::kBt601 : YuvMatrix::kBt709;
  }
  if (auto text = args.Get("cfa")) {
    using orvex::ColorFilterArrangement;
    const std::vector<ColorFilterArrangement> patterns = {
        ColorFilterArrangement::kRggb, ColorFilterArrangement::kGrbg, ColorFilterArrangement::kGbrg,
        ColorFilterArrangement::kBggr};
    auto choice = Choose(*text, {"RGGB", "GRBG", "GBRG", "BGGR"});
    if (!choice) {
      return context.UsageError(
          fmt::format("--cfa must be RGGB, GRBG, GBRG or BGGR, got '{}'", *text));
    }
    options.cfa = patterns[*choice];
  }

  auto format = ImageFormat::Make(layout->width, layout->height, layout->format, layout->order);
  if (!format.ok()) return context.Error(format.status());
  if (orvex::Status renderable = CheckRenderable(*format); !renderable.ok()) {
    return context.Error(renderable);
  }
  uint64_t total = 0;
  for (size_t size : format->buffer_sizes()) total += size;
  if (total > kMaxImageBytes ||
      static_cast<uint64_t>(layout->width) * static_cast<uint64_t>(layout->height) > kMaxPixels) {
    return context.Error(orvex::ResourceExhaustedError(fmt::format(
        "a {}x{} {} image takes {} bytes; render reads at most {} bytes and makes pictures of at "
        "most {} pixels",
        layout->width, layout->height, orvex::FormatToString(format->format()), total,
        kMaxImageBytes, kMaxPixels)));
  }
  auto dump = ReadDump(
      *format, std::vector<std::string>(args.positionals.begin() + 3, args.positionals.end()));
  if (!dump.ok()) return context.Error(dump.status());
  auto picture = RenderPicture(*format, dump->buffers, options);
  if (!picture.ok()) return context.Error(picture.status());
  auto png = EncodePng(*picture);
  if (!png.ok()) return context.Error(png.status());
  if (orvex::Status written = WriteFileAtomically(*out, *png); !written.ok()) {
    return context.Error(written);
  }
  context.out() << fmt::format("{}: {}x{} {}\n", *out, picture->width, picture->height,
                               picture->channels == 1 ? "grey" : "RGB");
  return kExitOk;
}

}  // namespace

const Command& RenderCommand() {
  static const Command command = {
      {.name = "render",
       .positionals = "WIDTH HEIGHT FORMAT FILE...",
       .positional_count = 4,
       .more_positionals = true,
       .summary = "turn a raw buffer dump into a PNG",
       .details =
           "FILE is one file per buffer of the layout, or one file holding the buffers back to\n"
           "back; each must have exactly the size 'orvex layout' shows. The layout comes\n"
           "from ImageFormat::Make. YUV becomes RGB (full-range BT.601 unless told\n"
           "otherwise); grey and RAW layouts become grey pictures; samples wider than 8\n"
           "bits show their top 8 bits. Compressed layouts (SBWC, AFBC) and BLOB are\n"
           "refused. Errors exit 2 and leave no PNG behind.\n\n"
           "example: orvex render 1920 1080 YCBCR_420_888 y.raw uv.raw -o frame.png",
       .flags = {{"out", "OUT.png", "the PNG to write (required)", 'o'},
                 {"order", "CbCr|CrCb", "interleaved chroma order (default: the format's)"},
                 {"range", "full|limited", "YUV range (default full)"},
                 {"matrix", "bt601|bt709", "YUV to RGB matrix (default bt601)"},
                 {"demosaic", "", "RAW: one colour pixel per 2x2 cell (half size)"},
                 {"cfa", "RGGB|GRBG|GBRG|BGGR",
                  "RAW: colour filter of the top-left cell "
                  "(default RGGB)"}}},
      RunRender};
  return command;
}

}  // namespace orvex_tool
