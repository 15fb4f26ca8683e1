#include "orvex/api/memory/image_format.h"

#include <climits>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>
#include <variant>
#include <vector>

#include "absl/strings/str_cat.h"
#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/status/status_matchers.h"

namespace orvex {

// Builds layouts that Make would not produce.
class ImageFormatTestPeer {
 public:
  static ImageFormat With(const ImageFormat& f, std::vector<ImageFormat::Component> components,
                          std::optional<ImageFormat::ChromaSubsampling> subsampling,
                          std::optional<ImageFormat::InterleavedChromaOrder> order) {
    return ImageFormat(f.format(), f.width(), f.height(), f.buffer_sizes(), std::move(components),
                       subsampling, order);
  }
};

namespace {

using ::orvex::testing::StatusIs;
using C = ImageFormat::Component;
using CC = ImageFormat::ComponentContent;
using F = HalPixelFormat;
using Order = ImageFormat::InterleavedChromaOrder;
using Sub = ImageFormat::ChromaSubsampling;
constexpr std::nullopt_t kNone = std::nullopt;
constexpr Order kCbCr = Order::kCbCr, kCrCb = Order::kCrCb;
constexpr Sub k420 = Sub::k420;
constexpr StatusCode kInvalid = StatusCode::kInvalidArgument;
constexpr StatusCode kUnimplemented = StatusCode::kUnimplemented;

ImageFormat MakeOrDie(int w, int h, F f, std::optional<Order> order = std::nullopt) {
  StatusOr<ImageFormat> made = ImageFormat::Make(w, h, f, order);
  EXPECT_TRUE(made.ok()) << made.status();
  return *std::move(made);
}

// The same layout with its components changed by `change`.
template <typename Change>
ImageFormat Mutate(const ImageFormat& f, Change change) {
  std::vector<C> components = f.components();
  change(components);
  return ImageFormatTestPeer::With(f, std::move(components), f.chroma_subsampling(),
                                   f.interleaved_chroma_order());
}

// The same layout with one field of component `index` set to `value`.
template <typename T>
ImageFormat Set(const ImageFormat& f, size_t index, T C::*field, std::type_identity_t<T> value) {
  return Mutate(f, [&](std::vector<C>& c) { c[index].*field = value; });
}

struct LayoutCase {
  F format;
  int width, height;
  std::optional<Order> order;
  std::vector<size_t> buffer_sizes;
  std::vector<C> components;
  std::optional<Sub> subsampling = kNone;
  std::optional<Order> made_order = kNone;
};

// Semi-planar 4:2:0: luma, then interleaved Cb and Cr in buffer 1 or after the luma rows.
LayoutCase Sp420(F f, int w, int h, std::optional<Order> order, int s, int bpp,
                 std::vector<size_t> sizes, Order made) {
  const int b = sizes.size() == 1 ? 0 : 1, cb = made == kCbCr ? 0 : 1;
  const size_t at = b == 0 ? static_cast<size_t>(h * s) : 0;
  std::vector<C> components = {{CC::kLuma, 0, 0, w, h, s, bpp, 1, 0},
                               {CC::kChromaB, b, at, w / 2, h / 2, s, bpp, 2, cb},
                               {CC::kChromaR, b, at, w / 2, h / 2, s, bpp, 2, 1 - cb}};
  return {f, w, h, order, std::move(sizes), std::move(components), k420, made};
}

TEST(ImageFormatTest, Layouts) {
  constexpr CC kLuma = CC::kLuma, kBayer = CC::kBayer, kLH = CC::kCompressedLumaHeader,
               kLP = CC::kCompressedLumaPayload, kCH = CC::kCompressedChromaHeader,
               kCP = CC::kCompressedChromaPayload, kBH = CC::kCompressedBayerHeader,
               kBP = CC::kCompressedBayerPayload;
  // clang-format off
  const std::vector<LayoutCase> cases = {
      Sp420(F::YCBCR_420_888, 1920, 1080, kNone, 1920, 8, {2073600, 1036800}, kCrCb),
      Sp420(F::YCBCR_420_888, 0, 0, kNone, 0, 8, {0, 0}, kCrCb),
      Sp420(F::YCBCR_P010, 1920, 1080, kNone, 3840, 16, {6220800}, kCbCr),
      Sp420(F::YCBCR_P010, 64, 2, Order{7}, 128, 16, {384}, Order{7}),  // fuzzed: as CrCb
      Sp420(F::YCBCR_420_SP_M, 1922, 1080, kCrCb, 1936, 8, {2090880, 1045440}, kCrCb),
      Sp420(F::YCBCR_420_SP_M_S10B, 4000, 3000, kNone, 5008, 10, {15024000, 7512000}, kCrCb),
      Sp420(F::YCBCR_P010_M, 4040, 3024, kNone, 8096, 16, {24482304, 12241152}, kCbCr),
      Sp420(F::YCBCR_420_888_STRIDE_ALIGNED_64, 1000, 8, kNone, 1024, 8, {8192, 4096}, kCrCb),
      Sp420(F::YCBCR_420_888, 1 << 30, 1 << 30, kNone, 1 << 30, 8, {1ul << 60, 1ul << 59}, kCrCb),
      {F::YV12, 1924, 1080, kNone, {3144960}, {{kLuma, 0, 0, 1924, 1080, 1936},
       {CC::kChromaR, 0, 2090880, 962, 540, 976}, {CC::kChromaB, 0, 2617920, 962, 540, 976}}, k420},
      {F::YCBCR_422_I, 1922, 1081, kCrCb, {4168336}, {{kLuma, 0, 0, 1922, 1081, 3856, 8, 2, 0},
       {CC::kChromaB, 0, 0, 961, 1081, 3856, 8, 4, 1},
       {CC::kChromaR, 0, 0, 961, 1081, 3856, 8, 4, 3}}, Sub::k422, kCrCb},
      {F::Y16, 1922, 1080, kNone, {4181760}, {{kLuma, 0, 0, 1922, 1080, 3872, 16}}},
      {F::Y10, 1920, 1080, kNone, {2592000}, {{kLuma, 0, 0, 1920, 1080, 2400, 10}}},
      {F::RAW10, 4000, 3000, kNone, {15000000}, {{kBayer, 0, 0, 4000, 3000, 5000, 10}}},
      {F::RAW16, 4002, 3001, kNone, {24020004}, {{kBayer, 0, 0, 4002, 3001, 8004, 16}}},
      {F::BLOB, INT_MAX, INT_MAX, kNone, {size_t{INT_MAX} * INT_MAX},
       {{CC::kUnspecified, 0, 0, INT_MAX, INT_MAX, INT_MAX}}},
      {F::RAW16_BAYER_SBWC, 33000, 2, kNone, {256 + 2 * 66048},
       {{kBH, 0, 0, 128, 2, 128, 16}, {kBP, 0, 256, 66048, 2, 66048, 16}}},
      {F::RAW16_BAYER_SBWC_L75, 4000, 30, kNone, {1440000}, {{kBP, 0, 0, 48000, 30, 48000, 16}}},
      {F::YCBCR_420_SP_M_SBWC, 1920, 1080, kNone, {2097984, 1049024},
       {{kLH, 0, 2089024, 32, 270, 32, 8}, {kLP, 0, 0, 7680, 270, 7680, 8},
        {kCH, 1, 1044544, 32, 135, 32, 8}, {kCP, 1, 0, 7680, 135, 7680, 8}}, k420, kCbCr},
      {F::YCBCR_420_SP_M_S10B_SBWC, 1920, 1080, kCrCb, {3119424, 1559744},
       {{kLH, 0, 3110464, 32, 270, 32, 10}, {kLP, 0, 0, 11520, 270, 11520, 10},
        {kCH, 1, 1555264, 32, 135, 32, 10}, {kCP, 1, 0, 11520, 135, 11520, 10}}, k420, kCrCb},
      {F::YCBCR_420_SP_M_S10B_SBWC_L60, 4000, 3002, kNone, {12000 * 752 + 64, 12000 * 376 + 64},
       {{kLP, 0, 0, 12000, 751, 12000, 10}, {kCP, 1, 0, 12000, 376, 12000, 10}}, k420, kCbCr},
      {F::YCBCR_420_888_AFBC_EXTRAWIDEBLK, 1920, 1080, kNone, {2367488, 1150976},
       {{kLH, 0, 0, 32, 272, 512, 8}, {kLP, 0, 139264, 2048, 1088, 2048, 8},
        {kCH, 1, 0, 16, 136, 256, 8}, {kCP, 1, 36864, 1024, 544, 2048, 8}}, k420, kCrCb},
      {F::YCBCR_420_888_I_AFBC_WIDEBLK, 1920, 1080, kCbCr, {3264512},
       {{kLH, 0, 0, 60, 136, 960, 8}, {kLP, 0, 131072, 1920, 1088, 2880, 8},
        {kCH, 0, 0, 60, 136, 960, 8}, {kCP, 0, 131072, 960, 544, 2880, 8}}, k420, kCbCr},
  };
  // clang-format on
  for (const LayoutCase& c : cases) {
    SCOPED_TRACE(absl::StrCat(FormatToString(c.format), " ", c.width, "x", c.height));
    const StatusOr<ImageFormat> made = ImageFormat::Make(c.width, c.height, c.format, c.order);
    ASSERT_TRUE(made.ok()) << made.status();
    EXPECT_EQ(made->format(), c.format);
    EXPECT_EQ(made->buffer_sizes(), c.buffer_sizes);
    EXPECT_EQ(made->components(), c.components);
    EXPECT_EQ(made->chroma_subsampling(), c.subsampling);
    EXPECT_EQ(made->interleaved_chroma_order(), c.made_order);
  }
  // Stand-ins: IMPLEMENTATION_DEFINED codes, and YCrCb SBWC (recording CbCr).
  EXPECT_EQ(MakeOrDie(1000, 8, F::IMPLEMENTATION_DEFINED), MakeOrDie(1000, 8, F::YCBCR_420_888));
  EXPECT_EQ(MakeOrDie(1000, 8, F::IMPLEMENTATION_DEFINED_64),
            MakeOrDie(1000, 8, F::YCBCR_420_888_STRIDE_ALIGNED_64));
  const ImageFormat ycrcb = MakeOrDie(64, 32, F::YCRCB_420_SP_M_SBWC);
  EXPECT_EQ(ycrcb.components(), MakeOrDie(64, 32, F::YCBCR_420_SP_M_SBWC).components());
  EXPECT_EQ(ycrcb.interleaved_chroma_order(), kCbCr);
}

// The dimension check's text for a width or height `v` no multiple of `m`.
std::string Dim(const char* what, int v, int m) {
  return absl::StrCat("image ", what, " should be a multiple of ", m, ", ", v, " % ", m, " = ",
                      v % m);
}

TEST(ImageFormatTest, MakeFailures) {
  struct Case {
    int width, height;
    F format;
    std::optional<Order> order;
    std::string message;
    StatusCode code = kInvalid;
  };
  const auto dims = [](const std::string& text, const std::string& family) {
    return text + "; " + family + " dimension requirements not met";
  };
  const auto too_large = [](const char* size, const char* format) {
    return absl::StrCat("Image size ", size, " is too large for HalPixelFormat: ", format,
                        ", its row stride or extent does not fit in 32 bits");
  };
  const std::string kRaw10 = "; Dimension requirements not met for RAW10", kYuv = "YCBCR_420_888";
  const std::string kOddHeight = Dim("height", 1, 2);
  const std::string kNegative = ", width and height must not be negative";
  // clang-format off
  const std::vector<Case> cases = {
      {30, 32, F::YV12, kNone, dims("image width should be a multiple of 4, 30 % 4 = 2", "YV12")},
      {3, 5, F::YCBCR_420_888, kNone, dims(Dim("width", 3, 2) + Dim("height", 5, 2), kYuv)},
      {3, 2, F::YCBCR_422_I, kNone, dims(Dim("width", 3, 2), "YCBCR_422_I")},
      {4, 3, F::Y16, kNone, dims(Dim("height", 3, 2), "Monochrome format")},
      // A wrong size is reported before a refused order, but a 4:2:2 order first.
      {3, 1, F::RAW10, kCbCr, Dim("width", 3, 4) + kRaw10},
      {8, 2, F::RAW12, kCbCr,
       "Specifying interleaved pixel order for format: RAW12 is not supported"},
      {3, 1, F::YCBCR_422_I, kCbCr, "Unsupported interleaved chroma order: CbCr for "
       "HalPixelFormat: YCBCR_422_I, unable to make ImageFormat.", kUnimplemented},
      {64, 64, static_cast<F>(0x7), kNone, "Unsupported HalPixelFormat: UnknownFormat_0x7, unable "
       "to make ImageFormat.", kUnimplemented},
      // Negative and oversized images are refused instead of wrapping.
      {-2, 4, F::YCBCR_420_888, kNone,
       "Invalid image size -2x4 for HalPixelFormat: " + kYuv + kNegative},
      {-3, 4, F::YCBCR_420_888, kNone, dims(Dim("width", -3, 2), kYuv)},
      {5, -1, F::BLOB, kNone, "Invalid image size 5x-1 for HalPixelFormat: BLOB" + kNegative},
      {INT_MAX - 1, 2, F::Y16, kNone, too_large("2147483646x2", "Y16")},
      {1 << 28, 2, F::RAW16_BAYER_SBWC_L75, kNone,
       too_large("268435456x2", "RAW16_BAYER_SBWC_L75")},
      {2, INT_MAX - 1, F::YCBCR_420_888_AFBC_EXTRAWIDEBLK, kNone,
       too_large("2x2147483646", "YCBCR_420_888_AFBC_EXTRAWIDEBLK")},
      // Semi-planar and lossless SBWC YUV formats share one family message.
      {2, 1, F::YCBCR_P010_M_STRIDE_ALIGNED_64, kNone, dims(kOddHeight, kYuv)},
      {2, 1, F::RAW16_BAYER_SBWC, kNone, dims(kOddHeight, "RAW16_BAYER_SBWC")},
      {2, 1, F::YCRCB_420_SP_M_SBWC, kNone, dims(kOddHeight, "YCBCR_420_SP_M_SBWC")},
      {2, 1, F::YCBCR_420_SP_M_S10B_SBWC_L40, kNone,
       dims(kOddHeight, "YCBCR_420_SP_M_S10B_SBWC_L40")},
      {2, 1, F::YCBCR_420_888_I_AFBC_WIDEBLK, kNone, dims(kOddHeight, "YCBCR_420_888_I_AFBC")},
      {2, 1, F::YCBCR_420_888_AFBC_EXTRAWIDEBLK, kNone, dims(kOddHeight, "YCBCR_420_888_AFBC")},
  };
  // clang-format on
  for (const Case& c : cases) {
    SCOPED_TRACE(absl::StrCat(FormatToString(c.format), " ", c.width, "x", c.height));
    EXPECT_THAT(ImageFormat::Make(c.width, c.height, c.format, c.order).status(),
                StatusIs(c.code, c.message));
  }
}

TEST(ImageFormatTest, Texts) {
  EXPECT_EQ(
      MakeOrDie(100, 100, F::BLOB).DebugStrVerbose(),
      "{type: ImageFormat, HalPixelFormat: BLOB, Width: 100, Height: 100, BufferSizes: "
      "{10000}, Components: {{type: Component, Content: Unspecified, BufferIndex: 0, "
      "OffsetBytes: 0, Width: 100, Height: 100, RowStrideBytes: 100, BitsPerPixel: 8, "
      "PixelStride: 1, PixelPhase: 0}}, ChromaSubsampling: n/a, InterleavedChromaOrder: n/a}");
  EXPECT_THAT(MakeOrDie(4, 2, F::YCBCR_420_888).DebugStrVerbose(),
              ::testing::EndsWith("}}, ChromaSubsampling: 420, InterleavedChromaOrder: CrCb}"));
  // clang-format off
  const std::vector<std::string> contents = {
      "Unspecified", "Bayer", "Rgb", "Red", "Green", "Blue", "Luma", "ChromaB", "ChromaR",
      "CompressedLumaHeader", "CompressedLumaPayload", "CompressedChromaHeader",
      "CompressedChromaPayload", "CompressedBayerHeader", "CompressedBayerPayload", "Unknown"};
  // clang-format on
  for (int i = -1; i < 16; ++i) {
    EXPECT_EQ(ImageFormat::ComponentContentToString(static_cast<CC>(i)), contents[i < 0 ? 15 : i]);
  }
  EXPECT_EQ(ImageFormat::ChromaSubsamplingToString(static_cast<Sub>(9)), "444");
  EXPECT_EQ(ImageFormat::InterleavedChromaOrderToString(kCbCr), "CbCr");
  EXPECT_EQ(OptionalInterleavedChromaOrderToString(static_cast<Order>(5)), "CrCb");
}

// Lookups find the first component in vector order.
TEST(ImageFormatTest, ComponentLookup) {
  const ImageFormat blob = MakeOrDie(8, 8, F::BLOB);
  EXPECT_EQ(blob.GetComponentFor(CC::kLuma).status().code(), StatusCode::kFailedPrecondition);
  EXPECT_FALSE(blob.GetComponentForInternal(CC::kLuma).has_value());
  const ImageFormat doubled = Mutate(MakeOrDie(64, 32, F::YCBCR_420_888), [](auto& c) {
    c.push_back({CC::kLuma, 7, 0, 1, 1, 1});
  });
  EXPECT_EQ(doubled.GetComponentFor(CC::kLuma)->buffer_index, 0);
}

std::string Prefix(const std::string& name) {
  return "ImageFormat does not conform to " + name + ". ";
}
std::string Name(F f) { return FormatToString(f); }
std::string Name(Sub s) { return ImageFormat::ChromaSubsamplingToString(s); }

// Each check fails at its first broken rule; quiet checks give the same code
// and no text at all.
TEST(ImageFormatTest, Conformance) {
  const ImageFormat yuv = MakeOrDie(1920, 1080, F::YCBCR_420_888);
  constexpr F k888 = F::YCBCR_420_888;
  // Texts: prefix and rule text, called check's text and prefix, or text alone.
  enum Shape { kOwn, kCallee, kUnchecked, kOk };
  struct Case {
    ImageFormat format;
    std::variant<F, Sub> target;
    std::string text;
    Shape shape = kOwn;
  };
  // clang-format off
  const std::vector<Case> cases = {
      {MakeOrDie(64, 32, F::RAW10), k888,
       "component bits per pixel: 10 != expected bits per pixel: 8", kCallee},
      {yuv, static_cast<F>(0x7), "Unable to check if conforms to UnknownFormat_0x7", kUnchecked},
      {yuv, F::IMPLEMENTATION_DEFINED,
       "There is no sensibe way to say if a format conforms to IMPLEMENTATION_DEFINED"},
      {MakeOrDie(64, 32, F::RAW16_BAYER_SBWC_L50), F::RAW16, "", kOk},
      {MakeOrDie(64, 32, F::RAW16), F::Y16, "Failed to find component with Luma in {type: "
       "ImageFormat, HalPixelFormat: RAW16, Width: 64, Height: 32}", kCallee},
      // Luma, Cb and a compressed luma payload: neither kind of YUV layout.
      {Set(yuv, 2, &C::content, CC::kCompressedLumaPayload), k888, "Imageformat does not have "
       "required components for either compressed or uncompressed YUV", kCallee},
      {ImageFormatTestPeer::With(yuv, yuv.components(), kNone, kCrCb), k888,
       "ImageFormat does not contain valid YUV components. chroma_subsampling is un-set", kCallee},
      {MakeOrDie(64, 32, F::YCBCR_422_I), k420, "ImageFormat's chroma subsampling reports: 422"},
      {Set(yuv, 1, &C::width, 961), k420, "ChromaB component width: 961 != expected width: 960"},
      // Compressed layouts are not measured against their subsampling.
      {Set(MakeOrDie(64, 32, F::YCBCR_420_SP_M_SBWC), 3, &C::width, 1), k420, "", kOk},
      // Chroma phases follow the recorded order; without one Cr comes first.
      {ImageFormatTestPeer::With(yuv, yuv.components(), k420, kNone), k888, "", kOk},
      {MakeOrDie(64, 2, F::YCBCR_P010, Order{7}), F::YCBCR_P010, "", kOk},
      {Set(MakeOrDie(1920, 2, F::YCBCR_P010_M), 1, &C::row_stride_bytes, 3872), F::YCBCR_P010_M,
       "components have different row strides, y: 3840, u: 3872, v: 3840"},
      {MakeOrDie(1000, 8, k888), F::YCBCR_420_888_STRIDE_ALIGNED_64,
       "row stride is not aligned to 64 bytes: 1008"},
      {MakeOrDie(1000, 8, k888), F::YCBCR_420_SP_M_STRIDE_ALIGNED_64, "", kOk},
      {Set(MakeOrDie(64, 32, F::YV12), 0, &C::width, 65), F::YV12, Dim("width", 65, 4), kCallee},
      {MakeOrDie(1952, 2, F::YCBCR_420_SP_M_SBWC_L75), F::YCBCR_420_SP_M_SBWC_L50_STRIDE_ALIGNED_64,
       "row stride is not aligned to 64 bytes: 5856 for CompressedLumaPayload"},
      {Set(MakeOrDie(1920, 2, F::YCBCR_420_888_AFBC_EXTRAWIDEBLK), 2, &C::row_stride_bytes, 512),
       F::YCBCR_420_888_AFBC_EXTRAWIDEBLK, "row stride is not conformed to "
       "YCBCR_420_888_AFBC_EXTRAWIDEBLK for CompressedChromaHeader, value: 512, expected: 256"},
  };
  // clang-format on
  for (const Case& c : cases) {
    const std::string prefix = Prefix(std::visit([](auto t) { return Name(t); }, c.target));
    const std::string message = c.shape == kOwn      ? prefix + c.text
                                : c.shape == kCallee ? c.text + "; " + prefix
                                                     : c.text;
    const StatusCode code = c.shape == kOk          ? StatusCode::kOk
                            : c.shape == kUnchecked ? kUnimplemented
                                                    : kInvalid;
    SCOPED_TRACE(message.empty() ? c.format.DebugStr() : message);
    for (const bool verbose : {true, false}) {
      EXPECT_THAT(std::visit([&](auto t) { return c.format.ConformsTo(t, verbose); }, c.target),
                  StatusIs(code, verbose ? message : ""));
    }
  }
  // No luma and no compressed payload either: not YUV, whatever the subsampling says.
  EXPECT_FALSE(Set(yuv, 0, &C::content, CC::kBayer).IsYuv(false).ok());
}

// Whether the rules of `target` look at `field` of a `content` component of
// a layout made for `target`. All find components by content and check bits.
bool RulesConstrain(F target, CC content, std::string_view field) {
  if (field == "content" || field == "bits") return true;
  // Compressed layouts: row strides only; lossless SBWC Bayer: nothing.
  if (content >= CC::kCompressedLumaHeader) {
    return field == "stride" && target != F::RAW16_BAYER_SBWC;
  }
  if (content == CC::kBayer || content == CC::kUnspecified) return false;
  if (target == F::Y8 || target == F::Y16 || target == F::Y10) {
    return field == "width" || field == "height" || field == "stride";
  }
  if (target == F::YV12) return true;
  if (target == F::YCBCR_422_I) return field != "stride";
  // Semi-planar 4:2:0: single-buffer chroma starts right after the luma rows;
  // P010_M and the 64-byte aligned codes but one require aligned strides.
  const bool single = target == F::YCBCR_P010 || target == F::YCBCR_420_888_SINGLE_BUFFER ||
                      target == F::YCBCR_420_888_SINGLE_BUFFER_STRIDE_ALIGNED_64;
  const bool luma = content == CC::kLuma;
  if (field == "stride") {
    return (luma && single) || target == F::YCBCR_P010_M ||
           (Is64ByteAlignedPixelFormat(target) && target != F::YCBCR_420_SP_M_STRIDE_ALIGNED_64);
  }
  return !(luma && (field == "buffer" || field == "offset")) || single;
}

// Made layouts conform to their format and subsampling (but packed Y10 rows
// of widths no multiple of 8, and YCBCR_420_SP_M, which has no rules), take an
// order if they record one, and fail exactly where their rules look at a field.
TEST(ImageFormatTest, MadeLayoutsConform) {
  const std::pair<std::string_view, void (*)(C&)> changes[] = {
      {"content", [](C& c) { c.content = static_cast<CC>(static_cast<int>(c.content) + 1); }},
      {"buffer", [](C& c) { ++c.buffer_index; }},
      {"offset", [](C& c) { ++c.offset_bytes; }},
      {"width", [](C& c) { ++c.width; }},
      {"height", [](C& c) { ++c.height; }},
      {"stride", [](C& c) { ++c.row_stride_bytes; }},
      {"bits", [](C& c) { ++c.bits_per_pixel; }},
      {"pixel stride", [](C& c) { ++c.pixel_stride; }},
      {"pixel phase", [](C& c) { ++c.pixel_phase; }}};
  int made_count = 0;
  for (const F format : AllHalPixelFormats()) {
    for (const int w :
         {0,   2,   4,   6,   8,    10,   12,   14,   16,   30,   32,   62,   64,   66,  126,
          250, 256, 258, 510, 1000, 1920, 1922, 1924, 1952, 4000, 4002, 4032, 4036, 8190}) {
      for (const int h : {0, 1, 2, 4, 6, 8, 14, 16, 18, 30, 1080, 1081, 3000, 3024, 3026}) {
        const StatusOr<ImageFormat> made = ImageFormat::Make(w, h, format);
        if (!made.ok()) {
          ASSERT_EQ(made.status().code(), format == F::RGB_888 ? kUnimplemented : kInvalid);
          continue;
        }
        ++made_count;
        SCOPED_TRACE(made->DebugStr());
        const F f = made->format();
        EXPECT_EQ(made->Is64ByteAligned(), Is64ByteAlignedPixelFormat(f));
        EXPECT_EQ(ImageFormat::Make(w, h, format, kCrCb).ok(),
                  made->interleaved_chroma_order().has_value());
        const Status own = made->ConformsTo(f, true);
        EXPECT_EQ(own.code(), made->ConformsTo(f, false).code());
        if (made->chroma_subsampling().has_value()) {
          EXPECT_TRUE(made->ConformsTo(*made->chroma_subsampling(), false).ok());
          EXPECT_TRUE(made->IsYuv(false).ok());
        }
        if (f == F::Y10 && w % 8 != 0) {
          EXPECT_THAT(own, StatusIs(kInvalid, Prefix("Y10") + "stride must be multiple of 10"));
        } else if (f == F::YCBCR_420_SP_M) {
          EXPECT_EQ(own.code(), kUnimplemented);
        } else {
          EXPECT_TRUE(own.ok()) << own;
        }
        if (!own.ok() || ((w != 1920 || h != 1080) && (w != 4000 || h != 3000))) continue;
        for (size_t i = 0; i < made->components().size(); ++i) {
          for (const auto& [field, change] : changes) {
            SCOPED_TRACE(::testing::Message() << "component " << i << " " << field);
            const ImageFormat changed = Mutate(*made, [&](auto& c) { change(c[i]); });
            const Status quiet = changed.ConformsTo(f, false);
            if (RulesConstrain(f, made->components()[i].content, field)) {
              EXPECT_THAT(quiet, StatusIs(kInvalid, ""));
              EXPECT_THAT(changed.ConformsTo(f, true),
                          StatusIs(kInvalid, ::testing::HasSubstr(Prefix(FormatToString(f)))));
            } else {
              EXPECT_TRUE(quiet.ok()) << quiet;
            }
          }
        }
      }
    }
  }
  EXPECT_GT(made_count, 1000);
}

}  // namespace
}  // namespace orvex
