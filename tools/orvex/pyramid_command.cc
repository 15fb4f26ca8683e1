// orvex pyramid: level sizes and buffer sizes of an image pyramid.

#include <limits>
#include <ostream>

#include "fmt/format.h"
#include "orvex/api/memory/image_pyramid_utils.h"
#include "tools/orvex/json.h"
#include "tools/orvex/table.h"
#include "tools/orvex/tool.h"

namespace orvex_tool {
namespace {

namespace pyramid = orvex::image_pyramid_utils;

int RunPyramid(const ParsedArgs& args, CommandContext& context) {
  constexpr int64_t kIntMax = std::numeric_limits<int>::max();
  constexpr int64_t kIntMin = std::numeric_limits<int>::min();
  auto width = ParseInteger(args.positionals[0], "WIDTH", 1, kIntMax);
  if (!width.ok()) return context.UsageError(width.status().message());
  auto height = ParseInteger(args.positionals[1], "HEIGHT", 1, kIntMax);
  if (!height.ok()) return context.UsageError(height.status().message());
  const auto levels_text = args.Get("levels");
  const auto alignment_text = args.Get("alignment");
  const auto bpp_text = args.Get("bpp");
  if (!levels_text || !alignment_text || !bpp_text) {
    return context.UsageError("--levels, --alignment and --bpp are required");
  }
  auto levels = ParseLevelRange(*levels_text, pyramid::kMaxLevel);
  if (!levels.ok()) return context.UsageError(levels.status().message());
  // Alignment and bits per pixel go to the library as given; its checked
  // forms say what they refuse.
  auto alignment = ParseInteger(*alignment_text, "--alignment", kIntMin, kIntMax);
  if (!alignment.ok()) return context.UsageError(alignment.status().message());
  auto bpp = ParseInteger(*bpp_text, "--bpp", kIntMin, kIntMax);
  if (!bpp.ok()) return context.UsageError(bpp.status().message());

  const orvex::GenericSize<int> size{static_cast<int>(*width), static_cast<int>(*height)};
  auto total = pyramid::CheckedGetTotalBufferSize(size, *levels, static_cast<int>(*alignment),
                                                  static_cast<int>(*bpp));
  if (!total.ok()) return context.Error(total.status());

  using Align = TextTable::Align;
  TextTable table({{"LEVEL", Align::kRight},
                   {"WIDTH", Align::kRight},
                   {"HEIGHT", Align::kRight},
                   {"BYTES", Align::kRight}});
  Json json_levels = Json::MakeArray();
  for (int level = levels->lower; level <= levels->upper; ++level) {
    const orvex::GenericSize<int> level_size = pyramid::GetSizeForLevel(size, level);
    // The total fits, so every level does.
    const int bytes = pyramid::GetBufferSizeForLevel(size, level, static_cast<int>(*alignment),
                                                     static_cast<int>(*bpp));
    table.AddRow({fmt::format("{}", level), fmt::format("{}", level_size.width),
                  fmt::format("{}", level_size.height), fmt::format("{}", bytes)});
    json_levels.Append(Json::MakeObject()
                           .Set("level", level)
                           .Set("width", level_size.width)
                           .Set("height", level_size.height)
                           .Set("bytes", bytes));
  }
  if (args.Has("json")) {
    context.out() << Json::MakeObject()
                         .Set("levels", std::move(json_levels))
                         .Set("total_bytes", *total)
                         .Dump();
  } else {
    context.out() << table.Render() << fmt::format("total: {} bytes\n", *total);
  }
  return kExitOk;
}

}  // namespace

const Command& PyramidCommand() {
  static const Command command = {
      {.name = "pyramid",
       .positionals = "WIDTH HEIGHT",
       .positional_count = 2,
       .summary = "print the level sizes and buffer sizes of an image pyramid",
       .details = "Level L is the full size divided by 2^L, rounded up. A level's buffer holds\n"
                  "rows of ceil(width x bpp / 8) bytes padded to a multiple of the alignment.\n"
                  "The total is the parent buffer size that holds levels LOW to HIGH.\n\n"
                  "example: orvex pyramid 4000 3000 --levels 0:2 --alignment 64 --bpp 10",
       .flags = {{"levels", "LOW:HIGH", "first and last level, 0 to 31 (required)"},
                 {"alignment", "A", "row stride alignment in bytes, 1 or more (required)"},
                 {"bpp", "B", "bits per pixel (required)"},
                 {"json", "", "print the levels and total as a JSON object"}}},
      RunPyramid};
  return command;
}

}  // namespace orvex_tool
