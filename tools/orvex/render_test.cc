// orvex render: pictures written into layouts come back from the PNG, known
// sample bytes decode to known colours, and bad input leaves no PNG.

#include <png.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>
#include <vector>

#include "absl/strings/ascii.h"
#include "absl/strings/str_split.h"
#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/memory/image_format.h"
#include "tools/orvex/render.h"
#include "tools/orvex/tool.h"

namespace orvex_tool {
namespace {

using orvex::HalPixelFormat;
using ::testing::HasSubstr;

struct Scratch {
  Scratch() {
    char pattern[] = "/tmp/orvex_render_test.XXXXXX";
    const char* made = mkdtemp(pattern);
    EXPECT_NE(made, nullptr);
    path = made == nullptr ? "" : made;
  }
  ~Scratch() {
    std::error_code ignored;
    std::filesystem::remove_all(path, ignored);
  }
  std::string File(const std::string& name) const { return path + "/" + name; }
  std::string path;
};

int RunOrvex(const std::vector<std::string>& args, std::string* out = nullptr,
             std::string* err = nullptr) {
  std::ostringstream out_stream, err_stream;
  const int code = RunTool(args, out_stream, err_stream);
  if (out != nullptr) *out = out_stream.str();
  if (err != nullptr) *err = err_stream.str();
  return code;
}

void WriteFile(const std::string& path, const std::string& bytes) {
  std::ofstream(path, std::ios::binary) << bytes;
}

// The PNG at `path` as RGB; an empty picture when it does not read.
Picture ReadPng(const std::string& path) {
  png_image image = {};
  image.version = PNG_IMAGE_VERSION;
  Picture picture;
  if (png_image_begin_read_from_file(&image, path.c_str()) == 0) return picture;
  image.format = PNG_FORMAT_RGB;
  picture.pixels.resize(PNG_IMAGE_SIZE(image));
  if (png_image_finish_read(&image, nullptr, picture.pixels.data(), 0, nullptr) == 0) {
    return {};
  }
  picture.width = static_cast<int>(image.width);
  picture.height = static_cast<int>(image.height);
  return picture;
}

Rgb At(const Picture& p, int x, int y) {
  const size_t i = (static_cast<size_t>(y) * p.width + x) * 3;
  return {p.pixels[i], p.pixels[i + 1], p.pixels[i + 2]};
}

bool Near(Rgb a, Rgb b, int tolerance) {
  return std::abs(a.r - b.r) <= tolerance && std::abs(a.g - b.g) <= tolerance &&
         std::abs(a.b - b.b) <= tolerance;
}

struct Pixel {
  int x, y;
  Rgb rgb;
};

// Colours constant over 2x2 blocks, so that subsampled chroma keeps them.
Rgb BlockColor(int x, int y) {
  static constexpr Rgb kPalette[] = {{200, 30, 40}, {20, 180, 60},   {30, 50, 210}, {240, 240, 20},
                                     {90, 90, 90},  {250, 250, 250}, {10, 10, 10},  {120, 40, 200}};
  return kPalette[(x / 2 + 3 * (y / 2)) % 8];
}

// Writes `buffers` as the dump files: one per buffer, or back to back in one.
std::vector<std::string> WriteDump(const Scratch& scratch, const std::vector<std::string>& buffers,
                                   bool one_file) {
  if (one_file) {
    std::string all;
    for (const std::string& b : buffers) all += b;
    WriteFile(scratch.File("dump.raw"), all);
    return {scratch.File("dump.raw")};
  }
  std::vector<std::string> files;
  for (size_t i = 0; i < buffers.size(); ++i) {
    files.push_back(scratch.File("buffer" + std::to_string(i) + ".raw"));
    WriteFile(files.back(), buffers[i]);
  }
  return files;
}

// Renders `buffers` with `flags`; the picture read back from the PNG.
Picture Render(const Scratch& scratch, const orvex::ImageFormat& format,
               const std::vector<std::string>& buffers, const std::vector<std::string>& flags,
               bool one_file) {
  std::vector<std::string> args = {"render", std::to_string(format.width()),
                                   std::to_string(format.height()),
                                   orvex::FormatToString(format.format())};
  for (const std::string& file : WriteDump(scratch, buffers, one_file)) args.push_back(file);
  args.insert(args.end(), {"-o", scratch.File("out.png")});
  args.insert(args.end(), flags.begin(), flags.end());
  std::string err;
  EXPECT_EQ(RunOrvex(args, nullptr, &err), kExitOk) << err;
  return ReadPng(scratch.File("out.png"));
}

TEST(RenderTest, PicturesRoundTripThroughEveryFamily) {
  using orvex::ColorFilterArrangement;
  enum class Shows { kColor, kLuma, kMosaic, kDemosaic };
  struct Case {
    HalPixelFormat format;
    int width, height;
    Shows shows;
    std::vector<std::string> flags = {};
    ColorFilterArrangement cfa = ColorFilterArrangement::kRggb;
  };
  const Case cases[] = {
      {HalPixelFormat::YCBCR_420_888, 6, 6, Shows::kColor},  // chroma 3x3
      {HalPixelFormat::YCBCR_420_888, 8, 4, Shows::kColor, {"--order", "CbCr"}},
      {HalPixelFormat::YCBCR_420_888_STRIDE_ALIGNED_64, 20, 4, Shows::kColor},  // row padding
      {HalPixelFormat::YCBCR_P010, 8, 4, Shows::kColor},
      {HalPixelFormat::YCBCR_420_SP_M_S10B, 12, 4, Shows::kColor},
      {HalPixelFormat::YV12, 8, 6, Shows::kColor},
      {HalPixelFormat::YCBCR_422_I, 6, 5, Shows::kColor},  // odd height
      {HalPixelFormat::Y8, 6, 4, Shows::kLuma},
      {HalPixelFormat::Y16, 6, 4, Shows::kLuma},
      {HalPixelFormat::Y10, 6, 4, Shows::kLuma},  // a row ends inside a packed group
      {HalPixelFormat::RAW10, 8, 3, Shows::kMosaic},
      {HalPixelFormat::RAW12, 8, 2, Shows::kMosaic},
      {HalPixelFormat::RAW16, 6, 4, Shows::kMosaic, {}, ColorFilterArrangement::kBggr},
      {HalPixelFormat::RAW10,
       8,
       5,
       Shows::kDemosaic,
       {"--demosaic", "--cfa", "grbg"},
       ColorFilterArrangement::kGrbg},
  };
  int run = 0;
  for (const Case& c : cases) {
    SCOPED_TRACE(orvex::FormatToString(c.format) + " " + std::to_string(c.width) + "x" +
                 std::to_string(c.height));
    using Order = orvex::ImageFormat::InterleavedChromaOrder;
    const bool cbcr = !c.flags.empty() && c.flags[0] == "--order";
    auto format = orvex::ImageFormat::Make(c.width, c.height, c.format,
                                           cbcr ? std::optional(Order::kCbCr) : std::nullopt);
    ASSERT_TRUE(format.ok()) << format.status();
    // Bytes outside the samples hold garbage that must not show.
    std::vector<std::string> buffers;
    std::vector<std::span<uint8_t>> spans;
    for (size_t size : format->buffer_sizes()) buffers.emplace_back(size, '\x5a');
    for (std::string& b : buffers)
      spans.emplace_back(reinterpret_cast<uint8_t*>(b.data()), b.size());
    DrawPicture(
        *format, spans,
        [](int y, std::span<Rgb> row) {
          for (size_t x = 0; x < row.size(); ++x) row[x] = BlockColor(static_cast<int>(x), y);
        },
        0, c.height, c.cfa);
    Scratch scratch;
    const Picture picture = Render(scratch, *format, buffers, c.flags, ++run % 2 == 0);
    const bool half = c.shows == Shows::kDemosaic;
    ASSERT_EQ(picture.width, half ? c.width / 2 : c.width);
    ASSERT_EQ(picture.height, half ? c.height / 2 : c.height);
    const std::string sites = absl::AsciiStrToUpper(orvex::ColorFilterArrangementToString(c.cfa));
    int wrong = 0;
    for (int y = 0; y < picture.height; ++y) {
      for (int x = 0; x < picture.width; ++x) {
        Rgb want = BlockColor(half ? 2 * x : x, half ? 2 * y : y);
        int tolerance = 0;
        if (c.shows == Shows::kColor) tolerance = 3;  // 8-bit YUV rounding
        if (c.shows == Shows::kLuma) {
          const auto luma =
              static_cast<uint8_t>(std::lround(0.299 * want.r + 0.587 * want.g + 0.114 * want.b));
          want = {luma, luma, luma};
          tolerance = 1;
        }
        if (c.shows == Shows::kMosaic) {
          const char site = sites[(y % 2) * 2 + x % 2];
          const uint8_t v = site == 'R' ? want.r : site == 'B' ? want.b : want.g;
          want = {v, v, v};
        }
        const Rgb got = At(picture, x, y);
        if (!Near(got, want, tolerance) && wrong++ == 0) {
          ADD_FAILURE() << "pixel " << x << "," << y << ": got " << int{got.r} << " " << int{got.g}
                        << " " << int{got.b} << ", want " << int{want.r} << " " << int{want.g}
                        << " " << int{want.b};
        }
      }
    }
    EXPECT_EQ(wrong, 0);
  }
}

// Bytes written by hand: sample packing, byte order, chroma order, range and
// matrix, independent of the picture writer.
TEST(RenderTest, KnownBytesGiveKnownColours) {
  struct Patch {
    size_t buffer;
    size_t offset;
    std::string bytes;
  };
  struct Case {
    std::string name;
    HalPixelFormat format;
    int width, height;
    std::vector<std::string> flags;
    std::vector<Patch> patches;
    std::vector<Pixel> want;
  };
  const std::string y76 = "\x4c\x4c";
  const Case cases[] = {
      {"NV21 red",
       HalPixelFormat::YCBCR_420_888,
       2,
       2,
       {},
       {{0, 0, y76}, {0, 16, y76}, {1, 0, "\xff\x55"}},
       {{1, 1, {254, 0, 0}}}},
      {"CbCr order",
       HalPixelFormat::YCBCR_420_888,
       2,
       2,
       {"--order", "cbcr"},
       {{0, 0, y76}, {0, 16, y76}, {1, 0, "\xff\x55"}},
       {{0, 0, {16, 63, 255}}}},
      {"limited range",
       HalPixelFormat::YCBCR_420_888,
       2,
       2,
       {"--range", "limited"},
       {{0, 0, "\xeb\x10"}, {1, 0, "\x80\x80"}},
       {{0, 0, {255, 255, 255}}, {1, 0, {0, 0, 0}}}},
      {"BT.709",
       HalPixelFormat::YCBCR_420_888,
       2,
       2,
       {"--matrix", "BT709"},
       {{0, 0, "\x80"}, {1, 0, "\xc8\x80"}},
       {{0, 0, {241, 94, 128}}}},
      {"P010 words",
       HalPixelFormat::YCBCR_P010,
       2,
       2,
       {},
       {{0, 0, "\xc0\xff"}, {0, 32, std::string("\x00\x80\x00\x80", 4)}},
       {{0, 0, {255, 255, 255}}}},
      {"Y16 word",
       HalPixelFormat::Y16,
       2,
       2,
       {},
       {{0, 0, std::string("\xff\x80", 2)}},
       {{0, 0, {128, 128, 128}}}},
      {"RAW10 group",
       HalPixelFormat::RAW10,
       4,
       1,
       {},
       {{0, 0, "\x10\x20\x30\x40\xff"}},
       {{0, 0, {16, 16, 16}}, {3, 0, {64, 64, 64}}}},
      {"RAW12 groups",
       HalPixelFormat::RAW12,
       4,
       1,
       {},
       {{0, 0, "\x10\x20\xff\x30\x40\xff"}},
       {{2, 0, {48, 48, 48}}, {3, 0, {64, 64, 64}}}},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.name);
    auto format = orvex::ImageFormat::Make(c.width, c.height, c.format);
    ASSERT_TRUE(format.ok()) << format.status();
    std::vector<std::string> buffers;
    for (size_t size : format->buffer_sizes()) buffers.emplace_back(size, '\0');
    for (const Patch& p : c.patches) buffers[p.buffer].replace(p.offset, p.bytes.size(), p.bytes);
    Scratch scratch;
    const Picture picture = Render(scratch, *format, buffers, c.flags, false);
    ASSERT_EQ(picture.width, c.width);
    for (const Pixel& p : c.want) {
      const Rgb got = At(picture, p.x, p.y);
      EXPECT_TRUE(Near(got, p.rgb, 1))
          << p.x << "," << p.y << ": " << int{got.r} << " " << int{got.g} << " " << int{got.b};
    }
  }
}

TEST(RenderTest, RefusesBadInputAndLeavesNoPng) {
  Scratch scratch;
  const std::string short_dump = scratch.File("short.raw");
  const std::string long_dump = scratch.File("long.raw");
  WriteFile(short_dump, std::string(3000, '\0'));
  WriteFile(long_dump, std::string(3073, '\0'));
  const std::string dump = scratch.File("ok.raw");  // YV12 or YCBCR_420_888 64x32
  WriteFile(dump, std::string(3072, '\0'));
  const std::string out = scratch.File("out.png");
  const std::string usage = "\nRun 'orvex render --help' for usage.\n";
  struct Case {
    std::vector<std::string> args;
    std::string err;
  };
  const Case cases[] = {
      {{"64", "32", "YV12", short_dump, "-o", out},
       "INVALID_ARGUMENT: " + short_dump +
           ": expected 3072 bytes (buffer 0 of YV12 64x32), found 3000\n"},
      {{"64", "32", "YCBCR_420_888", long_dump, "-o", out},
       "INVALID_ARGUMENT: " + long_dump +
           ": expected 3072 bytes (the 2 buffers of YCBCR_420_888 64x32 back to back: 2048 + "
           "1024), found 3073\n"},
      {{"64", "32", "YCBCR_420_888", "/dev/zero", "-o", out},
       "INVALID_ARGUMENT: /dev/zero: expected 3072 bytes (the 2 buffers of YCBCR_420_888 64x32 "
       "back to back: 2048 + 1024), found more\n"},
      {{"64", "32", "YCBCR_420_888", short_dump, short_dump, short_dump, "-o", out},
       "INVALID_ARGUMENT: YCBCR_420_888 64x32 has 2 buffers: give one file per buffer, or one "
       "file with the buffers back to back; got 3 files\n"},
      {{"64", "32", "Y8", scratch.File("none.raw"), "-o", out},
       "NOT_FOUND: cannot open " + scratch.File("none.raw") + ": No such file or directory\n"},
      {{"64", "32", "YCBCR_420_SP_M_SBWC", short_dump, "-o", out},
       "UNIMPLEMENTED: YCBCR_420_SP_M_SBWC is an SBWC-compressed layout and render has no SBWC "
       "decoder for its payload; dump the image uncompressed (YCBCR_420_888) and render that\n"},
      {{"64", "32", "YCBCR_420_888_AFBC_EXTRAWIDEBLK", short_dump, "-o", out},
       "UNIMPLEMENTED: YCBCR_420_888_AFBC_EXTRAWIDEBLK is an AFBC-compressed layout and render "
       "has no AFBC decoder for its payload\n"},
      {{"64", "32", "BLOB", short_dump, "-o", out},
       "UNIMPLEMENTED: BLOB holds no samples render can show (it needs luma and chroma, luma "
       "alone, or a Bayer mosaic): a BLOB is encoded data, not samples\n"},
      {{"64", "32", "RGB_888", short_dump, "-o", out},
       "UNIMPLEMENTED: Unsupported HalPixelFormat: RGB_888, unable to make ImageFormat.\n"},
      {{"64", "32", "YV12", dump, "-o", out, "--demosaic"},
       "INVALID_ARGUMENT: --demosaic needs a Bayer layout; YV12 is none\n"},
      {{"64", "32", "YV12", dump, "-o", scratch.File("no/out.png")},
       "NOT_FOUND: cannot write " + scratch.File("no/out.png") + ": No such file or directory\n"},
      {{"64", "32", "YV12", long_dump}, "orvex render: -o OUT.png is required" + usage},
      {{"64", "32", "YV12", long_dump, "-o", out, "--range", "tv"},
       "orvex render: --range must be full or limited, got 'tv'" + usage},
      {{"64", "32", "YV12", "-o", out},
       "orvex render: expected at least 4 arguments (WIDTH HEIGHT FORMAT FILE...), got 3" + usage},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(::testing::PrintToString(c.args));
    std::vector<std::string> args = {"render"};
    args.insert(args.end(), c.args.begin(), c.args.end());
    std::string err;
    EXPECT_EQ(RunOrvex(args, nullptr, &err), kExitError);
    EXPECT_EQ(err, c.err);
  }
  // Nothing but the inputs is left: no PNG, no temporary file.
  std::vector<std::string> left;
  for (const auto& entry : std::filesystem::directory_iterator(scratch.path)) {
    left.push_back(entry.path().filename().string());
  }
  EXPECT_THAT(left, ::testing::UnorderedElementsAre("short.raw", "long.raw", "ok.raw"));
}

TEST(RenderTest, DemoFrameRendersAsColourBars) {
  Scratch scratch;
  std::string out, err;
  ASSERT_EQ(RunOrvex({"demo", "--size", "64x32", "--frames", "2", "--out", scratch.path, "--dump",
                      scratch.File("dump")},
                     &out, &err),
            kExitOk)
      << err;
  const std::string marker = "render it with: orvex ";
  const size_t at = out.find(marker);
  ASSERT_NE(at, std::string::npos) << out;
  std::vector<std::string> args =
      absl::StrSplit(out.substr(at + marker.size(), out.find('\n', at) - at - marker.size()), ' ');
  ASSERT_EQ(RunOrvex(args, nullptr, &err), kExitOk) << err;
  const Picture picture = ReadPng(args.back());
  ASSERT_EQ(picture.width, 64);
  ASSERT_EQ(picture.height, 32);
  const Pixel want[] = {{0, 0, {235, 235, 235}},     // white bar
                        {44, 10, {235, 16, 16}},     // red bar
                        {63, 31, {235, 235, 235}}};  // progress bar, last frame: full
  for (const auto& [x, y, rgb] : want) {
    EXPECT_TRUE(Near(At(picture, x, y), rgb, 3)) << x << "," << y;
  }
}

}  // namespace
}  // namespace orvex_tool
