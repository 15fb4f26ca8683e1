#include "orvex/api/memory/image_format.h"

#include <climits>
#include <functional>
#include <ostream>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>
#include <variant>
#include <vector>

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

void PrintTo(const ImageFormat::Component& c, std::ostream* os) {
  *os << ImageFormat::ComponentToString(c);
}

namespace {

using ::orvex::testing::StatusIs;
using C = ImageFormat::Component;
using CC = ImageFormat::ComponentContent;
using F = HalPixelFormat;
using Order = ImageFormat::InterleavedChromaOrder;
using Sub = ImageFormat::ChromaSubsampling;
using Peer = ImageFormatTestPeer;
constexpr std::nullopt_t kNone = std::nullopt;
constexpr Order kCbCr = Order::kCbCr, kCrCb = Order::kCrCb;
constexpr Sub k420 = Sub::k420;
constexpr StatusCode kUnimplemented = StatusCode::kUnimplemented;

ImageFormat MakeOrDie(int w, int h, F f, std::optional<Order> order = std::nullopt) {
  StatusOr<ImageFormat> made = ImageFormat::Make(w, h, f, order);
  EXPECT_TRUE(made.ok()) << made.status();
  return *std::move(made);
}

// The same layout with its components changed by `change`.
ImageFormat Mutate(const ImageFormat& f, const std::function<void(std::vector<C>&)>& change) {
  std::vector<C> components = f.components();
  change(components);
  return Peer::With(f, std::move(components), f.chroma_subsampling(), f.interleaved_chroma_order());
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

void ExpectLayout(const LayoutCase& c) {
  SCOPED_TRACE(::testing::Message()
               << FormatToString(c.format) << " " << c.width << "x" << c.height);
  const StatusOr<ImageFormat> made = ImageFormat::Make(c.width, c.height, c.format, c.order);
  ASSERT_TRUE(made.ok()) << made.status();
  EXPECT_EQ(made->format(), c.format);
  EXPECT_EQ(std::pair(made->width(), made->height()), std::pair(c.width, c.height));
  EXPECT_EQ(made->buffer_sizes(), c.buffer_sizes);
  EXPECT_EQ(made->components(), c.components);
  EXPECT_EQ(made->chroma_subsampling(), c.subsampling);
  EXPECT_EQ(made->interleaved_chroma_order(), c.made_order);
}

TEST(ImageFormatTest, SemiPlanar420Layouts) {
  struct Case {
    F format;
    int w, h;
    std::optional<Order> order;
    int stride, bpp;
    std::vector<size_t> sizes;
    int chroma_buffer;
    size_t chroma_offset;
    Order made_order;
  };
  // clang-format off
  const std::vector<Case> cases = {
      {F::YCBCR_420_888, 1920, 1080, kNone, 1920, 8, {2073600, 1036800}, 1, 0, kCrCb},
      {F::YCBCR_420_888, 64, 2, kCbCr, 64, 8, {128, 64}, 1, 0, kCbCr},
      {F::YCBCR_420_888, 0, 0, kNone, 0, 8, {0, 0}, 1, 0, kCrCb},
      {F::YCBCR_P010, 1920, 1080, kNone, 3840, 16, {6220800}, 0, 4147200, kCbCr},
      {F::YCBCR_420_SP_M, 1922, 1080, kNone, 1936, 8, {2090880, 1045440}, 1, 0, kCbCr},
      {F::YCBCR_420_SP_M_S10B, 4000, 3000, kNone, 5008, 10, {15024000, 7512000}, 1, 0, kCrCb},
      {F::YCBCR_P010_M, 4040, 3024, kNone, 8096, 16, {24482304, 12241152}, 1, 0, kCbCr},
      {F::YCBCR_420_888_SINGLE_BUFFER, 1922, 2, kNone, 1936, 8, {5808}, 0, 3872, kCrCb},
      {F::YCBCR_420_888_STRIDE_ALIGNED_64, 1000, 8, kNone, 1024, 8, {8192, 4096}, 1, 0, kCrCb},
      {F::YCBCR_420_SP_M_STRIDE_ALIGNED_64, 1000, 8, kNone, 1024, 8, {8192, 4096}, 1, 0, kCbCr},
      {F::YCBCR_420_SP_M_S10B_STRIDE_ALIGNED_64, 1000, 8, kNone, 1280, 10, {10240, 5120}, 1, 0,
       kCrCb},
      {F::YCBCR_420_888_SINGLE_BUFFER_STRIDE_ALIGNED_64, 1000, 8, kNone, 1024, 8, {12288}, 0, 8192,
       kCrCb},
      {F::YCBCR_P010_M_STRIDE_ALIGNED_64, 1922, 2, kNone, 3904, 16, {7808, 3904}, 1, 0, kCbCr},
  };
  // clang-format on
  for (const Case& c : cases) {
    // Luma plane plus interleaved chroma at half size sharing the stride.
    const int cb = c.made_order == kCrCb ? 1 : 0;
    const int w = c.w, h = c.h, s = c.stride, b = c.chroma_buffer;
    const std::vector<C> components = {
        {CC::kLuma, 0, 0, w, h, s, c.bpp, 1, 0},
        {CC::kChromaB, b, c.chroma_offset, w / 2, h / 2, s, c.bpp, 2, cb},
        {CC::kChromaR, b, c.chroma_offset, w / 2, h / 2, s, c.bpp, 2, 1 - cb}};
    ExpectLayout({c.format, w, h, c.order, c.sizes, components, k420, c.made_order});
  }
  // The two IMPLEMENTATION_DEFINED codes are laid out (and recorded) as
  // their stand-ins.
  EXPECT_EQ(*ImageFormat::Make(4000, 3000, F::IMPLEMENTATION_DEFINED),
            *ImageFormat::Make(4000, 3000, F::YCBCR_420_888));
  EXPECT_EQ(*ImageFormat::Make(1000, 8, F::IMPLEMENTATION_DEFINED_64),
            *ImageFormat::Make(1000, 8, F::YCBCR_420_888_STRIDE_ALIGNED_64));
}

// Found by fuzzing: an order value that is no enumerator was laid out Cb
// first while its text and the conformance check read it as CrCb.
TEST(ImageFormatTest, OrderThatIsNoEnumeratorIsLaidOutAsCrCb) {
  const StatusOr<ImageFormat> made = ImageFormat::Make(64, 2, F::YCBCR_P010, static_cast<Order>(7));
  ASSERT_TRUE(made.ok()) << made.status();
  EXPECT_EQ(made->components()[1].pixel_phase, 1);  // kChromaB
  EXPECT_TRUE(made->ConformsTo(F::YCBCR_P010).ok());
}

TEST(ImageFormatTest, OtherLayouts) {
  constexpr CC kLuma = CC::kLuma, kBayer = CC::kBayer, kLH = CC::kCompressedLumaHeader,
               kLP = CC::kCompressedLumaPayload, kCH = CC::kCompressedChromaHeader,
               kCP = CC::kCompressedChromaPayload, kBH = CC::kCompressedBayerHeader,
               kBP = CC::kCompressedBayerPayload;
  // clang-format off
  const std::vector<LayoutCase> cases = {
      {F::YV12, 64, 32, kNone, {3072},
       {{kLuma, 0, 0, 64, 32, 64}, {CC::kChromaR, 0, 2048, 32, 16, 32},
        {CC::kChromaB, 0, 2560, 32, 16, 32}}, k420, kNone},
      {F::YV12, 1924, 1080, kNone, {3144960},
       {{kLuma, 0, 0, 1924, 1080, 1936}, {CC::kChromaR, 0, 2090880, 962, 540, 976},
        {CC::kChromaB, 0, 2617920, 962, 540, 976}}, k420, kNone},
      {F::YCBCR_422_I, 1922, 1081, kCrCb, {4168336},
       {{kLuma, 0, 0, 1922, 1081, 3856, 8, 2, 0}, {CC::kChromaB, 0, 0, 961, 1081, 3856, 8, 4, 1},
        {CC::kChromaR, 0, 0, 961, 1081, 3856, 8, 4, 3}}, Sub::k422, kCrCb},
      {F::Y8, 1922, 1080, kNone, {2090880}, {{kLuma, 0, 0, 1922, 1080, 1936, 8}}},
      {F::Y16, 1922, 1080, kNone, {4181760}, {{kLuma, 0, 0, 1922, 1080, 3872, 16}}},
      {F::Y10, 1920, 1080, kNone, {2592000}, {{kLuma, 0, 0, 1920, 1080, 2400, 10}}},
      {F::Y10, 2, 2, kNone, {4}, {{kLuma, 0, 0, 2, 2, 2, 10}}},
      {F::RAW10, 4000, 3000, kNone, {15000000}, {{kBayer, 0, 0, 4000, 3000, 5000, 10}}},
      {F::RAW12, 4032, 3023, kNone, {18283104}, {{kBayer, 0, 0, 4032, 3023, 6048, 12}}},
      {F::RAW16, 4002, 3001, kNone, {24020004}, {{kBayer, 0, 0, 4002, 3001, 8004, 16}}},
      {F::BLOB, 7, 3, kNone, {21}, {{CC::kUnspecified, 0, 0, 7, 3, 7}}},
      {F::RAW16_BAYER_SBWC, 4000, 3000, kNone, {24768000},
       {{kBH, 0, 0, 64, 3000, 64, 16}, {kBP, 0, 192000, 8192, 3000, 8192, 16}}},
      {F::RAW16_BAYER_SBWC, 33000, 2, kNone, {256 + 2 * 66048},
       {{kBH, 0, 0, 128, 2, 128, 16}, {kBP, 0, 256, 66048, 2, 66048, 16}}},
      {F::RAW16_BAYER_SBWC_L75, 4000, 3000, kNone, {144000000},
       {{kBP, 0, 0, 48000, 3000, 48000, 16}}},
      {F::RAW16_BAYER_SBWC_L50, 4000, 3000, kNone, {96000000},
       {{kBP, 0, 0, 32000, 3000, 32000, 16}}},
      {F::YCBCR_420_SP_M_SBWC, 1920, 1080, kNone, {2097984, 1049024},
       {{kLH, 0, 2089024, 32, 270, 32, 8}, {kLP, 0, 0, 7680, 270, 7680, 8},
        {kCH, 1, 1044544, 32, 135, 32, 8}, {kCP, 1, 0, 7680, 135, 7680, 8}}, k420, kCbCr},
      {F::YCBCR_420_SP_M_S10B_SBWC, 1920, 1080, kCrCb, {3119424, 1559744},
       {{kLH, 0, 3110464, 32, 270, 32, 10}, {kLP, 0, 0, 11520, 270, 11520, 10},
        {kCH, 1, 1555264, 32, 135, 32, 10}, {kCP, 1, 0, 11520, 135, 11520, 10}}, k420, kCrCb},
      {F::YCBCR_420_SP_M_SBWC_STRIDE_ALIGNED_64, 4000, 3000, kNone, {12080448, 6040256},
       {{kLH, 0, 12032064, 64, 750, 64, 8}, {kLP, 0, 0, 16000, 750, 16000, 8},
        {kCH, 1, 6016064, 64, 375, 64, 8}, {kCP, 1, 0, 16000, 375, 16000, 8}}, k420, kCbCr},
      {F::YCBCR_420_SP_M_SBWC_L75, 1920, 1080, kNone, {1566784, 783424},
       {{kLP, 0, 0, 5760, 270, 5760, 8}, {kCP, 1, 0, 5760, 135, 5760, 8}}, k420, kCbCr},
      {F::YCBCR_420_SP_M_SBWC_L50_STRIDE_ALIGNED_64, 1920, 1080, kNone, {1044544, 522304},
       {{kLP, 0, 0, 3840, 270, 3840, 8}, {kCP, 1, 0, 3840, 135, 3840, 8}}, k420, kCbCr},
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
  for (const LayoutCase& c : cases) ExpectLayout(c);
  // YCrCb lossless SBWC is laid out like YCbCr and also records CbCr.
  const ImageFormat ycrcb = *ImageFormat::Make(1920, 1080, F::YCRCB_420_SP_M_SBWC);
  EXPECT_EQ(ycrcb.components(),
            ImageFormat::Make(1920, 1080, F::YCBCR_420_SP_M_SBWC)->components());
  EXPECT_EQ(ycrcb.interleaved_chroma_order(), kCbCr);
}

TEST(ImageFormatTest, MakeFailures) {
  struct Case {
    int width, height;
    F format;
    std::optional<Order> order;
    std::string message;
    StatusCode code = StatusCode::kInvalidArgument;
  };
  const auto dims = [](const char* text, const std::string& family) {
    return std::string(text) + "; " + family + " dimension requirements not met";
  };
  std::vector<Case> cases = {
      {30, 32, F::YV12, kNone, dims("image width should be a multiple of 4, 30 % 4 = 2", "YV12")},
      // Both texts, without a separator.
      {3, 5, F::YCBCR_420_888, kNone,
       dims("image width should be a multiple of 2, 3 % 2 = 1image height should be a multiple of "
            "2, 5 % 2 = 1",
            "YCBCR_420_888")},
      {3, 2, F::YCBCR_422_I, kNone,
       dims("image width should be a multiple of 2, 3 % 2 = 1", "YCBCR_422_I")},
      {4, 3, F::Y16, kNone,
       dims("image height should be a multiple of 2, 3 % 2 = 1", "Monochrome format")},
      {4002, 3000, F::RAW10, kNone,
       "image width should be a multiple of 4, 4002 % 4 = 2; Dimension requirements not met for "
       "RAW10"},
      {4001, 3000, F::RAW16, kNone,
       "image width should be a multiple of 2, 4001 % 2 = 1; Dimension requirements not met for "
       "RAW16"},
      // A wrong size is reported before an order the format cannot take.
      {3, 1, F::RAW10, kCbCr,
       "image width should be a multiple of 4, 3 % 4 = 3; Dimension requirements not met for "
       "RAW10"},
      // The 4:2:2 order is checked before the size.
      {3, 1, F::YCBCR_422_I, kCbCr,
       "Unsupported interleaved chroma order: CbCr for HalPixelFormat: YCBCR_422_I, unable to "
       "make ImageFormat.",
       kUnimplemented},
      {64, 64, F::RGB_888, kNone,
       "Unsupported HalPixelFormat: RGB_888, unable to make ImageFormat.", kUnimplemented},
      {64, 64, static_cast<F>(0x7), kNone,
       "Unsupported HalPixelFormat: UnknownFormat_0x7, unable to make ImageFormat.",
       kUnimplemented},
      // Negative and oversized images are refused instead of wrapping.
      {-2, 4, F::YCBCR_420_888, kNone,
       "Invalid image size -2x4 for HalPixelFormat: YCBCR_420_888, width and height must not be "
       "negative"},
      {-3, 4, F::YCBCR_420_888, kNone,
       dims("image width should be a multiple of 2, -3 % 2 = -1", "YCBCR_420_888")},
      {5, -1, F::BLOB, kNone,
       "Invalid image size 5x-1 for HalPixelFormat: BLOB, width and height must not be negative"},
      {INT_MAX - 1, 2, F::Y16, kNone,
       "Image size 2147483646x2 is too large for HalPixelFormat: Y16, its row stride or extent "
       "does not fit in 32 bits"},
      {1 << 28, 2, F::RAW16_BAYER_SBWC_L75, kNone,
       "Image size 268435456x2 is too large for HalPixelFormat: RAW16_BAYER_SBWC_L75, its row "
       "stride or extent does not fit in 32 bits"},
      {2, INT_MAX - 1, F::YCBCR_420_888_AFBC_EXTRAWIDEBLK, kNone,
       "Image size 2x2147483646 is too large for HalPixelFormat: YCBCR_420_888_AFBC_EXTRAWIDEBLK, "
       "its row stride or extent does not fit in 32 bits"},
  };
  // An odd height names the family: semi-planar and lossless SBWC YUV formats
  // share one message whatever their names, lossy SBWC formats use their own.
  for (const auto& [f, family] : std::initializer_list<std::pair<F, const char*>>{
           {F::YCBCR_P010_M_STRIDE_ALIGNED_64, "YCBCR_420_888"},
           {F::RAW16_BAYER_SBWC, "RAW16_BAYER_SBWC"},
           {F::RAW16_BAYER_SBWC_L50, "RAW16_BAYER_SBWC_L50"},
           {F::YCRCB_420_SP_M_SBWC, "YCBCR_420_SP_M_SBWC"},
           {F::YCBCR_420_SP_M_S10B_SBWC_L40, "YCBCR_420_SP_M_S10B_SBWC_L40"},
           {F::YCBCR_420_888_I_AFBC_WIDEBLK, "YCBCR_420_888_I_AFBC"},
           {F::YCBCR_420_888_AFBC_EXTRAWIDEBLK, "YCBCR_420_888_AFBC"}}) {
    cases.push_back({1920, 1081, f, kNone,
                     dims("image height should be a multiple of 2, 1081 % 2 = 1", family)});
  }
  // Formats without interleaved chroma refuse an order.
  for (const F f : {F::YV12, F::Y8, F::Y16, F::Y10, F::RAW10, F::RAW12, F::RAW16, F::BLOB,
                    F::RAW16_BAYER_SBWC, F::RAW16_BAYER_SBWC_L50, F::RAW16_BAYER_SBWC_L75}) {
    cases.push_back({64, 32, f, kCrCb,
                     "Specifying interleaved pixel order for format: " + FormatToString(f) +
                         " is not supported"});
  }
  for (const Case& c : cases) {
    SCOPED_TRACE(::testing::Message()
                 << FormatToString(c.format) << " " << c.width << "x" << c.height);
    EXPECT_THAT(ImageFormat::Make(c.width, c.height, c.format, c.order).status(),
                StatusIs(c.code, c.message));
  }
}

// Sizes near the int limits that still fit are laid out exactly.
TEST(ImageFormatTest, LargeSizesAreExact) {
  const StatusOr<ImageFormat> huge = ImageFormat::Make(1 << 30, 1 << 30, F::YCBCR_420_888);
  ASSERT_TRUE(huge.ok()) << huge.status();
  EXPECT_EQ(huge->buffer_sizes(), (std::vector<size_t>{size_t{1} << 60, size_t{1} << 59}));
  const StatusOr<ImageFormat> blob = ImageFormat::Make(INT_MAX, INT_MAX, F::BLOB);
  ASSERT_TRUE(blob.ok()) << blob.status();
  EXPECT_EQ(blob->buffer_sizes()[0], size_t{INT_MAX} * size_t{INT_MAX});
}

TEST(ImageFormatTest, Texts) {
  const ImageFormat yv12 = *ImageFormat::Make(64, 32, F::YV12);
  EXPECT_EQ(yv12.DebugStr(), "{type: ImageFormat, HalPixelFormat: YV12, Width: 64, Height: 32}");
  EXPECT_EQ(
      ImageFormat::Make(100, 100, F::BLOB)->DebugStrVerbose(),
      "{type: ImageFormat, HalPixelFormat: BLOB, Width: 100, Height: 100, BufferSizes: "
      "{10000}, Components: {{type: Component, Content: Unspecified, BufferIndex: 0, "
      "OffsetBytes: 0, Width: 100, Height: 100, RowStrideBytes: 100, BitsPerPixel: 8, "
      "PixelStride: 1, PixelPhase: 0}}, ChromaSubsampling: n/a, InterleavedChromaOrder: n/a}");
  const std::string verbose = ImageFormat::Make(4, 2, F::YCBCR_420_888)->DebugStrVerbose();
  EXPECT_THAT(verbose, ::testing::HasSubstr("BufferSizes: {32, 16}, Components: {{type: "
                                            "Component, Content: Luma, "));
  EXPECT_THAT(verbose, ::testing::HasSubstr("PixelPhase: 0}, {type: Component, Content: ChromaB"));
  EXPECT_THAT(verbose, ::testing::EndsWith("PixelPhase: 0}}, ChromaSubsampling: 420, "
                                           "InterleavedChromaOrder: CrCb}"));
  // clang-format off
  const std::vector<std::string> contents = {
      "Unspecified", "Bayer", "Rgb", "Red", "Green", "Blue", "Luma", "ChromaB", "ChromaR",
      "CompressedLumaHeader", "CompressedLumaPayload", "CompressedChromaHeader",
      "CompressedChromaPayload", "CompressedBayerHeader", "CompressedBayerPayload", "Unknown"};
  // clang-format on
  for (int i = -1; i < 16; ++i) {
    EXPECT_EQ(ImageFormat::ComponentContentToString(static_cast<CC>(i)), contents[i < 0 ? 15 : i]);
  }
  EXPECT_EQ(ImageFormat::ChromaSubsamplingToString(Sub::k444), "444");
  EXPECT_EQ(ImageFormat::ChromaSubsamplingToString(static_cast<Sub>(9)), "444");
  EXPECT_EQ(OptionalChromaSubsamplingToString(Sub::k422), "422");
  EXPECT_EQ(OptionalChromaSubsamplingToString(kNone), "n/a");
  EXPECT_EQ(ImageFormat::InterleavedChromaOrderToString(kCbCr), "CbCr");
  EXPECT_EQ(OptionalInterleavedChromaOrderToString(static_cast<Order>(5)), "CrCb");
  EXPECT_EQ(OptionalInterleavedChromaOrderToString(kNone), "n/a");
}

// Lookups find the first component in vector order; failures to find one
// are FAILED_PRECONDITION (their text is checked through ConformsTo below).
TEST(ImageFormatTest, ComponentLookup) {
  const ImageFormat blob = MakeOrDie(100, 100, F::BLOB);
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

// Each check fails at its first broken rule; quiet checks give the same code
// and no text at all.
TEST(ImageFormatTest, FailuresNameTheFirstBrokenRule) {
  const ImageFormat yuv = MakeOrDie(1920, 1080, F::YCBCR_420_888);
  const ImageFormat p010 = MakeOrDie(1920, 1080, F::YCBCR_P010);
  const ImageFormat p010m = MakeOrDie(1920, 1080, F::YCBCR_P010_M);
  const ImageFormat yv12 = MakeOrDie(64, 32, F::YV12);
  const ImageFormat i422 = MakeOrDie(64, 32, F::YCBCR_422_I);
  const std::string p420 = Prefix("YCBCR_420_888"), in420 = "; " + p420, s420 = Prefix("420");
  const std::string pyv12 = Prefix("YV12"), p422 = Prefix("YCBCR_422_I");
  struct Case {
    ImageFormat format;
    std::variant<F, Sub> target;
    std::string message;
    StatusCode code = StatusCode::kInvalidArgument;
  };
  const std::vector<Case> cases = {
      {MakeOrDie(4000, 3000, F::RAW10), F::YCBCR_420_888,
       "component bits per pixel: 10 != expected bits per pixel: 8" + in420},
      {yuv, F::YCBCR_420_SP_M, "Unable to check if conforms to YCBCR_420_SP_M", kUnimplemented},
      {yuv, F::IMPLEMENTATION_DEFINED_64,
       "Unable to check if conforms to IMPLEMENTATION_DEFINED_64", kUnimplemented},
      {yuv, static_cast<F>(0x7), "Unable to check if conforms to UnknownFormat_0x7",
       kUnimplemented},
      {yuv, F::IMPLEMENTATION_DEFINED,
       Prefix("IMPLEMENTATION_DEFINED") +
           "There is no sensibe way to say if a format conforms to IMPLEMENTATION_DEFINED"},
      {yuv, F::BLOB, Prefix("BLOB") + "BLOB should have at least 1 unspecified component"},
      {MakeOrDie(64, 32, F::Y16), F::RAW16,
       "Imageformat does not have required components for either compressed or uncompressed "
       "raw; " +
           Prefix("RAW16")},
      {MakeOrDie(64, 32, F::RAW16), F::Y16,
       "Failed to find component with Luma in {type: ImageFormat, HalPixelFormat: RAW16, Width: "
       "64, Height: 32}; " +
           Prefix("Y16")},
      {MakeOrDie(2, 2, F::Y10), F::Y10, Prefix("Y10") + "stride must be multiple of 10"},
      // Luma, Cb and a compressed luma payload: neither kind of YUV layout.
      {Set(yuv, 2, &C::content, CC::kCompressedLumaPayload), F::YCBCR_420_888,
       "Imageformat does not have required components for either compressed or uncompressed "
       "YUV" +
           in420},
      {Peer::With(yuv, yuv.components(), std::nullopt, kCrCb), F::YCBCR_420_888,
       "ImageFormat does not contain valid YUV components. chroma_subsampling is un-set" + in420},
      {i422, F::YCBCR_420_888, s420 + "ImageFormat's chroma subsampling reports: 422" + in420},
      {Set(yuv, 1, &C::width, 961), F::YCBCR_420_888,
       s420 + "ChromaB component width: 961 != expected width: 960" + in420},
      {Set(yuv, 2, &C::width, 959), k420,
       s420 + "ChromaR component width: 959 != expected width: 960"},
      {Set(yuv, 1, &C::height, 1080), k420,
       s420 + "ChromaB component height: 1080 != expected height: 540"},
      {Set(i422, 2, &C::height, 16), Sub::k422,
       Prefix("422") + "ChromaR component height: 16 != expected height: 32"},
      {Set(yuv, 0, &C::width, 1921), F::YCBCR_420_888,
       "image width should be a multiple of 2, 1921 % 2 = 1" + in420},
      {Set(yuv, 1, &C::buffer_index, 0), F::YCBCR_420_888,
       p420 + "chroma components should be in the same buffer"},
      {Set(yuv, 2, &C::offset_bytes, 64), F::YCBCR_420_888,
       p420 + "chroma components should start at the same offset"},
      {Set(p010, 0, &C::buffer_index, 1), F::YCBCR_P010,
       Prefix("YCBCR_P010") + "all components should be in the same buffer"},
      {Set(p010, 0, &C::offset_bytes, 16), F::YCBCR_P010,
       Prefix("YCBCR_P010") +
           "chroma red component should come right after luma component in buffer"},
      {Set(yuv, 1, &C::pixel_phase, 0), F::YCBCR_420_888,
       p420 + "pixel interleaving not as expected"},
      {Set(p010m, 1, &C::row_stride_bytes, 3872), F::YCBCR_P010_M,
       Prefix("YCBCR_P010_M") + "components have different row strides, y: 3840, u: 3872, v: 3840"},
      {MakeOrDie(1000, 8, F::YCBCR_420_888), F::YCBCR_420_888_STRIDE_ALIGNED_64,
       Prefix("YCBCR_420_888_STRIDE_ALIGNED_64") + "row stride is not aligned to 64 bytes: 1008"},
      {Set(Set(Set(p010m, 0, &C::row_stride_bytes, 3856), 1, &C::row_stride_bytes, 3856), 2,
           &C::row_stride_bytes, 3856),
       F::YCBCR_P010_M, Prefix("YCBCR_P010_M") + "row stride is not aligned to 32 bytes: 3856"},
      {Set(yv12, 0, &C::width, 65), F::YV12,
       "image width should be a multiple of 4, 65 % 4 = 1; " + pyv12},
      {Set(yv12, 1, &C::row_stride_bytes, 40), F::YV12,
       pyv12 + "component strides must all be multiples of 16"},
      {Set(yv12, 1, &C::offset_bytes, 2064), F::YV12,
       pyv12 + "chroma red component should come right after luma component in buffer"},
      {Set(yv12, 2, &C::offset_bytes, 2048), F::YV12,
       pyv12 + "chroma blue component should come right after chroma red component in buffer"},
      {Set(yv12, 2, &C::pixel_phase, 1), F::YV12, pyv12 + "there should be no pixel interleaving"},
      {Set(i422, 1, &C::buffer_index, 1), F::YCBCR_422_I,
       p422 + "All components should be in the same buffer"},
      {Set(i422, 0, &C::offset_bytes, 1), F::YCBCR_422_I,
       p422 + "All components should have the same offset"},
      {Set(i422, 2, &C::pixel_phase, 1), F::YCBCR_422_I,
       p422 + "pixel interleaving not as expected"},
      {MakeOrDie(64, 32, F::RAW16_BAYER_SBWC_L50), F::RAW16_BAYER_SBWC,
       "Failed to find component with CompressedBayerHeader in {type: ImageFormat, HalPixelFormat: "
       "RAW16_BAYER_SBWC_L50, Width: 64, Height: 32}; " +
           Prefix("RAW16_BAYER_SBWC")},
      {Set(MakeOrDie(64, 32, F::RAW16_BAYER_SBWC_L75), 0, &C::row_stride_bytes, 784),
       F::RAW16_BAYER_SBWC_L75,
       Prefix("RAW16_BAYER_SBWC_L75") +
           "row stride is not aligned to 32 bytes: 784 for CompressedBayerPayload"},
      {MakeOrDie(1952, 1080, F::YCBCR_420_SP_M_SBWC_L75),
       F::YCBCR_420_SP_M_SBWC_L50_STRIDE_ALIGNED_64,
       Prefix("YCBCR_420_SP_M_SBWC_L50_STRIDE_ALIGNED_64") +
           "row stride is not aligned to 64 bytes: 5856 for CompressedLumaPayload"},
      {Set(MakeOrDie(1920, 1080, F::YCBCR_420_888_AFBC_EXTRAWIDEBLK), 2, &C::row_stride_bytes, 512),
       F::YCBCR_420_888_AFBC_EXTRAWIDEBLK,
       Prefix("YCBCR_420_888_AFBC_EXTRAWIDEBLK") +
           "row stride is not conformed to YCBCR_420_888_AFBC_EXTRAWIDEBLK for "
           "CompressedChromaHeader, value: 512, expected: 256"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.message);
    for (const bool verbose : {true, false}) {
      EXPECT_THAT(
          std::visit([&](auto target) { return c.format.ConformsTo(target, verbose); }, c.target),
          StatusIs(c.code, verbose ? c.message : ""));
    }
  }
}

TEST(ImageFormatTest, LayoutsThatConform) {
  // Stride 1008: no stride rule for this code.
  EXPECT_TRUE(
      MakeOrDie(1000, 8, F::YCBCR_420_888).ConformsTo(F::YCBCR_420_SP_M_STRIDE_ALIGNED_64).ok());
  // Compressed Bayer counts as raw.
  EXPECT_TRUE(MakeOrDie(64, 32, F::RAW16_BAYER_SBWC_L50).ConformsTo(F::RAW16).ok());
  // Chroma phases follow the recorded order; without one Cr comes first.
  const ImageFormat crcb = MakeOrDie(64, 32, F::YCBCR_420_888, kCrCb);
  EXPECT_TRUE(
      Peer::With(crcb, crcb.components(), k420, std::nullopt).ConformsTo(F::YCBCR_420_888).ok());
  // Compressed layouts are not measured against their subsampling.
  EXPECT_TRUE(Mutate(MakeOrDie(64, 32, F::YCBCR_420_SP_M_SBWC), [](auto& c) { c[3].width = 1; })
                  .ConformsTo(k420)
                  .ok());
}

// A change of one component field by one, by field name.
const std::pair<std::string_view, void (*)(C&)> kFieldChanges[] = {
    {"content", [](C& c) { c.content = static_cast<CC>(static_cast<int>(c.content) + 1); }},
    {"buffer", [](C& c) { ++c.buffer_index; }},
    {"offset", [](C& c) { ++c.offset_bytes; }},
    {"width", [](C& c) { ++c.width; }},
    {"height", [](C& c) { ++c.height; }},
    {"stride", [](C& c) { ++c.row_stride_bytes; }},
    {"bits", [](C& c) { ++c.bits_per_pixel; }},
    {"pixel stride", [](C& c) { ++c.pixel_stride; }},
    {"pixel phase", [](C& c) { ++c.pixel_phase; }},
};

// Whether the rules of `target` look at `field` of a component holding
// `content` (of a layout Make made for `target`).
bool RulesConstrain(F target, CC content, std::string_view field) {
  // Every rule set finds its components by content and checks their bits.
  if (field == "content" || field == "bits") return true;
  if (content >= CC::kCompressedLumaHeader) {
    // Compressed layouts: row strides only; lossless SBWC Bayer: nothing.
    return field == "stride" && target != F::RAW16_BAYER_SBWC;
  }
  if (content == CC::kBayer || content == CC::kUnspecified) return false;
  if (target == F::Y8 || target == F::Y16 || target == F::Y10) {
    return field == "width" || field == "height" || field == "stride";
  }
  if (target == F::YV12) return true;
  if (target == F::YCBCR_422_I) return field != "stride";
  // Semi-planar 4:2:0: single-buffer chroma must start right after the luma
  // rows; P010_M and the 64-byte aligned codes but one require aligned
  // strides.
  const bool single = target == F::YCBCR_P010 || target == F::YCBCR_420_888_SINGLE_BUFFER ||
                      target == F::YCBCR_420_888_SINGLE_BUFFER_STRIDE_ALIGNED_64;
  const bool luma = content == CC::kLuma;
  if (field == "stride") {
    return (luma && single) || target == F::YCBCR_P010_M ||
           (Is64ByteAlignedPixelFormat(target) && target != F::YCBCR_420_SP_M_STRIDE_ALIGNED_64);
  }
  if (luma && (field == "buffer" || field == "offset")) return single;
  return true;
}

void ExpectFieldChangesCaughtWhereRulesLook(const ImageFormat& made) {
  for (size_t i = 0; i < made.components().size(); ++i) {
    for (const auto& [field, change] : kFieldChanges) {
      SCOPED_TRACE(::testing::Message() << "component " << i << " " << field);
      const Status status =
          Mutate(made, [&](auto& c) { change(c[i]); }).ConformsTo(made.format(), false);
      if (RulesConstrain(made.format(), made.components()[i].content, field)) {
        EXPECT_THAT(status, StatusIs(StatusCode::kInvalidArgument, ""));
      } else {
        EXPECT_TRUE(status.ok()) << status;
      }
    }
  }
}

// Made layouts conform to the format they record and to their subsampling,
// except packed Y10 rows whose stride is no multiple of 10 (widths that are
// no multiple of 8) and YCBCR_420_SP_M, which has no rules. Changing a single
// field of a layout is caught exactly where the rules of its format look.
TEST(ImageFormatTest, MadeLayoutsConform) {
  std::vector<F> formats;  // every format Make lays out
  for (uint32_t code :
       {0x14u,  0x20u,  0x21u,  0x22u,    0x23u,     0x25u,       0x26u,       0x36u,
        0x105u, 0x125u, 0x127u, 0x130u,   0x132u,    0x134u,      0x140u,      0x141u,
        0x160u, 0x161u, 0x162u, 0x50208u, 0x190023u, 0x20203859u, 0x20363159u, 0x32315659u}) {
    formats.push_back(static_cast<F>(code));
  }
  for (uint32_t code = 0x40000000u; code <= 0x4000000fu; ++code) {
    formats.push_back(static_cast<F>(code));
  }
  int made_count = 0;
  for (const F format : formats) {
    for (const int w :
         {0,   2,   4,   6,   8,    10,   12,   14,   16,   30,   32,   62,   64,   66,  126,
          250, 256, 258, 510, 1000, 1920, 1922, 1924, 1952, 4000, 4002, 4032, 4036, 8190}) {
      for (const int h : {0, 1, 2, 4, 6, 8, 14, 16, 18, 30, 1080, 1081, 3000, 3024, 3026}) {
        const StatusOr<ImageFormat> made = ImageFormat::Make(w, h, format);
        if (!made.ok()) {
          ASSERT_EQ(made.status().code(), StatusCode::kInvalidArgument) << made.status();
          continue;
        }
        ++made_count;
        SCOPED_TRACE(made->DebugStr());
        const F f = made->format();
        EXPECT_EQ(made->Is64ByteAligned(), Is64ByteAlignedPixelFormat(f));
        const Status own = made->ConformsTo(f, true);
        EXPECT_EQ(own.code(), made->ConformsTo(f, false).code());
        if (f == F::Y10 && w % 8 != 0) {
          EXPECT_THAT(own, StatusIs(StatusCode::kInvalidArgument,
                                    Prefix("Y10") + "stride must be multiple of 10"));
        } else if (f == F::YCBCR_420_SP_M) {
          EXPECT_EQ(own.code(), StatusCode::kUnimplemented);
        } else {
          EXPECT_TRUE(own.ok()) << own;
          if ((w == 1920 && h == 1080) || (w == 4000 && h == 3000)) {
            ExpectFieldChangesCaughtWhereRulesLook(*made);
          }
        }
        if (made->chroma_subsampling().has_value()) {
          EXPECT_TRUE(made->ConformsTo(*made->chroma_subsampling(), false).ok());
          EXPECT_TRUE(made->IsYuv(false).ok());
        }
      }
    }
  }
  EXPECT_GT(made_count, 1000);
}

}  // namespace
}  // namespace orvex
