#include "orvex/api/memory/image_format.h"

#include <climits>
#include <ostream>
#include <string>
#include <vector>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/status/status_matchers.h"

namespace orvex {

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

struct LayoutCase {
  const char* label;
  int width;
  int height;
  F format;
  std::optional<Order> order;
  F made_format;
  std::vector<size_t> buffer_sizes;
  std::vector<C> components;
  std::optional<Sub> subsampling;
  std::optional<Order> made_order;
};

void ExpectLayout(const LayoutCase& c) {
  SCOPED_TRACE(c.label);
  const StatusOr<ImageFormat> made = ImageFormat::Make(c.width, c.height, c.format, c.order);
  ASSERT_TRUE(made.ok()) << made.status();
  EXPECT_EQ(made->format(), c.made_format);
  EXPECT_EQ(made->width(), c.width);
  EXPECT_EQ(made->height(), c.height);
  EXPECT_EQ(made->buffer_sizes(), c.buffer_sizes);
  EXPECT_EQ(made->components(), c.components);
  EXPECT_EQ(made->chroma_subsampling(), c.subsampling);
  EXPECT_EQ(made->interleaved_chroma_order(), c.made_order);
}

// Luma plane plus interleaved chroma at half size sharing stride S.
std::vector<C> SemiPlanar(int w, int h, int s, int bpp, int chroma_buffer, size_t chroma_offset,
                          Order order) {
  const int cb_phase = order == Order::kCrCb ? 1 : 0;
  return {{CC::kLuma, 0, 0, w, h, s, bpp, 1, 0},
          {CC::kChromaB, chroma_buffer, chroma_offset, w / 2, h / 2, s, bpp, 2, cb_phase},
          {CC::kChromaR, chroma_buffer, chroma_offset, w / 2, h / 2, s, bpp, 2, 1 - cb_phase}};
}

TEST(ImageFormatTest, SemiPlanar420Layouts) {
  struct Case {
    F format;
    int w, h;
    std::optional<Order> order;
    F made;
    int stride, bpp;
    std::vector<size_t> sizes;
    int chroma_buffer;
    size_t chroma_offset;
    Order made_order;
  };
  // clang-format off
  const std::vector<Case> cases = {
      {F::YCBCR_420_888, 1920, 1080, {}, F::YCBCR_420_888, 1920, 8, {2073600, 1036800}, 1, 0,
       Order::kCrCb},
      {F::YCBCR_420_888, 4032, 3024, Order::kCbCr, F::YCBCR_420_888, 4032, 8,
       {12192768, 6096384}, 1, 0, Order::kCbCr},
      {F::IMPLEMENTATION_DEFINED, 4000, 3000, {}, F::YCBCR_420_888, 4000, 8,
       {12000000, 6000000}, 1, 0, Order::kCrCb},
      {F::YCBCR_P010, 1920, 1080, {}, F::YCBCR_P010, 3840, 16, {6220800}, 0, 4147200,
       Order::kCbCr},
      {F::YCBCR_420_SP_M, 1922, 1080, {}, F::YCBCR_420_SP_M, 1936, 8, {2090880, 1045440}, 1, 0,
       Order::kCbCr},
      {F::YCBCR_420_SP_M_S10B, 4000, 3000, {}, F::YCBCR_420_SP_M_S10B, 5008, 10,
       {15024000, 7512000}, 1, 0, Order::kCrCb},
      {F::YCBCR_P010_M, 4040, 3024, {}, F::YCBCR_P010_M, 8096, 16, {24482304, 12241152}, 1, 0,
       Order::kCbCr},
      {F::YCBCR_420_888_STRIDE_ALIGNED_64, 1000, 8, {}, F::YCBCR_420_888_STRIDE_ALIGNED_64, 1024,
       8, {8192, 4096}, 1, 0, Order::kCrCb},
      {F::IMPLEMENTATION_DEFINED_64, 1000, 8, {}, F::YCBCR_420_888_STRIDE_ALIGNED_64, 1024, 8,
       {8192, 4096}, 1, 0, Order::kCrCb},
      {F::YCBCR_420_SP_M_STRIDE_ALIGNED_64, 1000, 8, {}, F::YCBCR_420_SP_M_STRIDE_ALIGNED_64, 1024,
       8, {8192, 4096}, 1, 0, Order::kCbCr},
      {F::YCBCR_420_SP_M_S10B_STRIDE_ALIGNED_64, 1000, 8, {},
       F::YCBCR_420_SP_M_S10B_STRIDE_ALIGNED_64, 1280, 10, {10240, 5120}, 1, 0, Order::kCrCb},
      {F::YCBCR_420_888_SINGLE_BUFFER_STRIDE_ALIGNED_64, 1000, 8, {},
       F::YCBCR_420_888_SINGLE_BUFFER_STRIDE_ALIGNED_64, 1024, 8, {12288}, 0, 8192, Order::kCrCb},
      {F::YCBCR_420_888_SINGLE_BUFFER, 1922, 2, Order::kCbCr, F::YCBCR_420_888_SINGLE_BUFFER,
       1936, 8, {5808}, 0, 3872, Order::kCbCr},
      {F::YCBCR_P010_M_STRIDE_ALIGNED_64, 1922, 2, {}, F::YCBCR_P010_M_STRIDE_ALIGNED_64, 3904,
       16, {7808, 3904}, 1, 0, Order::kCbCr},
      {F::YCBCR_420_888, 0, 0, {}, F::YCBCR_420_888, 0, 8, {0, 0}, 1, 0, Order::kCrCb},
  };
  // clang-format on

  for (const Case& c : cases) {
    ExpectLayout(
        {FormatToString(c.format).c_str(), c.w, c.h, c.format, c.order, c.made, c.sizes,
         SemiPlanar(c.w, c.h, c.stride, c.bpp, c.chroma_buffer, c.chroma_offset, c.made_order),
         Sub::k420, c.made_order});
  }
}

// Found by fuzzing: an order value that is no enumerator was laid out Cb
// first while its text and the conformance check read it as CrCb, so the
// made format did not conform to its own format.
TEST(ImageFormatTest, OrderThatIsNoEnumeratorIsLaidOutAsCrCb) {
  const auto odd = static_cast<Order>(7);
  const StatusOr<ImageFormat> made = ImageFormat::Make(64, 2, F::YCBCR_P010, odd);
  ASSERT_TRUE(made.ok()) << made.status();
  EXPECT_EQ(made->components()[1].pixel_phase, 1);  // kChromaB
  EXPECT_EQ(made->components()[2].pixel_phase, 0);  // kChromaR
  EXPECT_TRUE(made->ConformsTo(F::YCBCR_P010).ok());
  EXPECT_THAT(made->DebugStrVerbose(), ::testing::EndsWith("InterleavedChromaOrder: CrCb}"));
}

TEST(ImageFormatTest, PlanarAndInterleavedLayouts) {
  // clang-format off
  const std::vector<LayoutCase> cases = {
      {"YV12 small", 64, 32, F::YV12, std::nullopt, F::YV12, {3072},
       {{CC::kLuma, 0, 0, 64, 32, 64}, {CC::kChromaR, 0, 2048, 32, 16, 32},
        {CC::kChromaB, 0, 2560, 32, 16, 32}}, Sub::k420, std::nullopt},
      {"YV12 padded strides", 1924, 1080, F::YV12, std::nullopt, F::YV12, {3144960},
       {{CC::kLuma, 0, 0, 1924, 1080, 1936}, {CC::kChromaR, 0, 2090880, 962, 540, 976},
        {CC::kChromaB, 0, 2617920, 962, 540, 976}}, Sub::k420, std::nullopt},
      {"422 odd height", 1922, 1081, F::YCBCR_422_I, Order::kCrCb, F::YCBCR_422_I, {4168336},
       {{CC::kLuma, 0, 0, 1922, 1081, 3856, 8, 2, 0},
        {CC::kChromaB, 0, 0, 961, 1081, 3856, 8, 4, 1},
        {CC::kChromaR, 0, 0, 961, 1081, 3856, 8, 4, 3}}, Sub::k422, Order::kCrCb},
  };
  // clang-format on
  for (const LayoutCase& c : cases) ExpectLayout(c);
}

// Formats with one component and no chroma.
TEST(ImageFormatTest, SingleComponentLayouts) {
  struct Case {
    F format;
    int w, h;
    CC content;
    int stride, bpp;
    size_t size;
  };
  const std::vector<Case> cases = {
      {F::Y8, 1922, 1080, CC::kLuma, 1936, 8, 2090880},
      {F::Y16, 1922, 1080, CC::kLuma, 3872, 16, 4181760},
      {F::Y10, 1920, 1080, CC::kLuma, 2400, 10, 2592000},
      {F::Y10, 2, 2, CC::kLuma, 2, 10, 4},
      {F::RAW10, 4000, 3000, CC::kBayer, 5000, 10, 15000000},
      {F::RAW12, 4032, 3023, CC::kBayer, 6048, 12, 18283104},
      {F::RAW16, 4002, 3001, CC::kBayer, 8004, 16, 24020004},
      {F::BLOB, 100, 100, CC::kUnspecified, 100, 8, 10000},
      {F::BLOB, 7, 3, CC::kUnspecified, 7, 8, 21},
  };
  for (const Case& c : cases) {
    ExpectLayout({FormatToString(c.format).c_str(),
                  c.w,
                  c.h,
                  c.format,
                  std::nullopt,
                  c.format,
                  {c.size},
                  {{c.content, 0, 0, c.w, c.h, c.stride, c.bpp, 1, 0}},
                  std::nullopt,
                  std::nullopt});
  }
}

TEST(ImageFormatTest, CompressedLayouts) {
  constexpr std::nullopt_t kNone = std::nullopt;
  // clang-format off
  const std::vector<LayoutCase> cases = {
      {"Bayer lossless", 4000, 3000, F::RAW16_BAYER_SBWC, kNone, F::RAW16_BAYER_SBWC, {24768000},
       {{CC::kCompressedBayerHeader, 0, 0, 64, 3000, 64, 16},
        {CC::kCompressedBayerPayload, 0, 192000, 8192, 3000, 8192, 16}}, kNone, kNone},
      {"Bayer lossless many blocks", 33000, 2, F::RAW16_BAYER_SBWC, kNone, F::RAW16_BAYER_SBWC,
       {256 + 2 * 66048},
       {{CC::kCompressedBayerHeader, 0, 0, 128, 2, 128, 16},
        {CC::kCompressedBayerPayload, 0, 256, 66048, 2, 66048, 16}}, kNone, kNone},
      {"Bayer L75", 4000, 3000, F::RAW16_BAYER_SBWC_L75, kNone, F::RAW16_BAYER_SBWC_L75,
       {144000000}, {{CC::kCompressedBayerPayload, 0, 0, 48000, 3000, 48000, 16}}, kNone, kNone},
      {"Bayer L50", 4000, 3000, F::RAW16_BAYER_SBWC_L50, kNone, F::RAW16_BAYER_SBWC_L50,
       {96000000}, {{CC::kCompressedBayerPayload, 0, 0, 32000, 3000, 32000, 16}}, kNone, kNone},
      {"YUV lossless 8 bit", 1920, 1080, F::YCBCR_420_SP_M_SBWC, kNone, F::YCBCR_420_SP_M_SBWC,
       {2097984, 1049024},
       {{CC::kCompressedLumaHeader, 0, 2089024, 32, 270, 32, 8},
        {CC::kCompressedLumaPayload, 0, 0, 7680, 270, 7680, 8},
        {CC::kCompressedChromaHeader, 1, 1044544, 32, 135, 32, 8},
        {CC::kCompressedChromaPayload, 1, 0, 7680, 135, 7680, 8}}, Sub::k420, Order::kCbCr},
      {"YUV lossless 10 bit rows of 8", 1920, 1080, F::YCBCR_420_SP_M_S10B_SBWC, Order::kCrCb,
       F::YCBCR_420_SP_M_S10B_SBWC, {3119424, 1559744},
       {{CC::kCompressedLumaHeader, 0, 3110464, 32, 270, 32, 10},
        {CC::kCompressedLumaPayload, 0, 0, 11520, 270, 11520, 10},
        {CC::kCompressedChromaHeader, 1, 1555264, 32, 135, 32, 10},
        {CC::kCompressedChromaPayload, 1, 0, 11520, 135, 11520, 10}}, Sub::k420, Order::kCrCb},
      {"YUV lossless aligned 64", 4000, 3000, F::YCBCR_420_SP_M_SBWC_STRIDE_ALIGNED_64, kNone,
       F::YCBCR_420_SP_M_SBWC_STRIDE_ALIGNED_64, {12080448, 6040256},
       {{CC::kCompressedLumaHeader, 0, 12032064, 64, 750, 64, 8},
        {CC::kCompressedLumaPayload, 0, 0, 16000, 750, 16000, 8},
        {CC::kCompressedChromaHeader, 1, 6016064, 64, 375, 64, 8},
        {CC::kCompressedChromaPayload, 1, 0, 16000, 375, 16000, 8}}, Sub::k420, Order::kCbCr},
      {"YUV L75", 1920, 1080, F::YCBCR_420_SP_M_SBWC_L75, kNone, F::YCBCR_420_SP_M_SBWC_L75,
       {1566784, 783424},
       {{CC::kCompressedLumaPayload, 0, 0, 5760, 270, 5760, 8},
        {CC::kCompressedChromaPayload, 1, 0, 5760, 135, 5760, 8}}, Sub::k420, Order::kCbCr},
      {"YUV L50 aligned 64", 1920, 1080, F::YCBCR_420_SP_M_SBWC_L50_STRIDE_ALIGNED_64, kNone,
       F::YCBCR_420_SP_M_SBWC_L50_STRIDE_ALIGNED_64, {1044544, 522304},
       {{CC::kCompressedLumaPayload, 0, 0, 3840, 270, 3840, 8},
        {CC::kCompressedChromaPayload, 1, 0, 3840, 135, 3840, 8}}, Sub::k420, Order::kCbCr},
      {"YUV 10 bit L60 odd block rows", 4000, 3002, F::YCBCR_420_SP_M_S10B_SBWC_L60, kNone,
       F::YCBCR_420_SP_M_S10B_SBWC_L60, {12000 * 752 + 64, 12000 * 376 + 64},
       {{CC::kCompressedLumaPayload, 0, 0, 12000, 751, 12000, 10},
        {CC::kCompressedChromaPayload, 1, 0, 12000, 376, 12000, 10}}, Sub::k420, Order::kCbCr},
      {"AFBC extra-wide", 1920, 1080, F::YCBCR_420_888_AFBC_EXTRAWIDEBLK, kNone,
       F::YCBCR_420_888_AFBC_EXTRAWIDEBLK, {2367488, 1150976},
       {{CC::kCompressedLumaHeader, 0, 0, 32, 272, 512, 8},
        {CC::kCompressedLumaPayload, 0, 139264, 2048, 1088, 2048, 8},
        {CC::kCompressedChromaHeader, 1, 0, 16, 136, 256, 8},
        {CC::kCompressedChromaPayload, 1, 36864, 1024, 544, 2048, 8}}, Sub::k420, Order::kCrCb},
      {"AFBC wide", 1920, 1080, F::YCBCR_420_888_I_AFBC_WIDEBLK, Order::kCbCr,
       F::YCBCR_420_888_I_AFBC_WIDEBLK, {3264512},
       {{CC::kCompressedLumaHeader, 0, 0, 60, 136, 960, 8},
        {CC::kCompressedLumaPayload, 0, 131072, 1920, 1088, 2880, 8},
        {CC::kCompressedChromaHeader, 0, 0, 60, 136, 960, 8},
        {CC::kCompressedChromaPayload, 0, 131072, 960, 544, 2880, 8}}, Sub::k420, Order::kCbCr},
  };
  // clang-format on
  for (const LayoutCase& c : cases) ExpectLayout(c);
  // YCrCb lossless SBWC is laid out like YCbCr and also records CbCr.
  const ImageFormat ycrcb = *ImageFormat::Make(1920, 1080, F::YCRCB_420_SP_M_SBWC);
  EXPECT_EQ(ycrcb.components(),
            ImageFormat::Make(1920, 1080, F::YCBCR_420_SP_M_SBWC)->components());
  EXPECT_EQ(ycrcb.interleaved_chroma_order(), Order::kCbCr);
}

// An odd height names the family: semi-planar and lossless SBWC YUV formats
// share one message whatever their names, lossy SBWC formats use their own.
TEST(ImageFormatTest, DimensionFailuresNameTheFamily) {
  const std::vector<std::pair<F, std::string>> cases = {
      {F::YCBCR_P010_M_STRIDE_ALIGNED_64, "YCBCR_420_888"},
      {F::RAW16_BAYER_SBWC, "RAW16_BAYER_SBWC"},
      {F::RAW16_BAYER_SBWC_L50, "RAW16_BAYER_SBWC_L50"},
      {F::YCRCB_420_SP_M_SBWC, "YCBCR_420_SP_M_SBWC"},
      {F::YCBCR_420_SP_M_S10B_SBWC_L40, "YCBCR_420_SP_M_S10B_SBWC_L40"},
      {F::YCBCR_420_888_I_AFBC_WIDEBLK, "YCBCR_420_888_I_AFBC"},
      {F::YCBCR_420_888_AFBC_EXTRAWIDEBLK, "YCBCR_420_888_AFBC"},
  };
  for (const auto& [format, family] : cases) {
    SCOPED_TRACE(FormatToString(format));
    EXPECT_THAT(ImageFormat::Make(1920, 1081, format).status(),
                StatusIs(StatusCode::kInvalidArgument,
                         "image height should be a multiple of 2, 1081 % 2 = 1; " + family +
                             " dimension requirements not met"));
  }
}

TEST(ImageFormatTest, MakeFailures) {
  struct Case {
    int width, height;
    F format;
    std::optional<Order> order;
    StatusCode code;
    std::string message;
  };
  const std::vector<Case> cases = {
      {30, 32, F::YV12, std::nullopt, StatusCode::kInvalidArgument,
       "image width should be a multiple of 4, 30 % 4 = 2; YV12 dimension requirements not met"},
      {3, 5, F::YCBCR_420_888, std::nullopt, StatusCode::kInvalidArgument,
       "image width should be a multiple of 2, 3 % 2 = 1image height should be a multiple of 2, "
       "5 % 2 = 1; YCBCR_420_888 dimension requirements not met"},
      {3, 2, F::YCBCR_422_I, std::nullopt, StatusCode::kInvalidArgument,
       "image width should be a multiple of 2, 3 % 2 = 1; YCBCR_422_I dimension requirements not "
       "met"},
      {4, 3, F::Y16, std::nullopt, StatusCode::kInvalidArgument,
       "image height should be a multiple of 2, 3 % 2 = 1; Monochrome format dimension "
       "requirements not met"},
      {4002, 3000, F::RAW10, std::nullopt, StatusCode::kInvalidArgument,
       "image width should be a multiple of 4, 4002 % 4 = 2; Dimension requirements not met for "
       "RAW10"},
      {4001, 3000, F::RAW16, std::nullopt, StatusCode::kInvalidArgument,
       "image width should be a multiple of 2, 4001 % 2 = 1; Dimension requirements not met for "
       "RAW16"},
      // Orders on formats without interleaved chroma; a wrong size is reported first.
      {4000, 3000, F::RAW10, Order::kCbCr, StatusCode::kInvalidArgument,
       "Specifying interleaved pixel order for format: RAW10 is not supported"},
      {3, 1, F::RAW10, Order::kCbCr, StatusCode::kInvalidArgument,
       "image width should be a multiple of 4, 3 % 4 = 3; Dimension requirements not met for "
       "RAW10"},
      {64, 32, F::YV12, Order::kCrCb, StatusCode::kInvalidArgument,
       "Specifying interleaved pixel order for format: YV12 is not supported"},
      {64, 32, F::Y8, Order::kCrCb, StatusCode::kInvalidArgument,
       "Specifying interleaved pixel order for format: Y8 is not supported"},
      {5, 3, F::BLOB, Order::kCbCr, StatusCode::kInvalidArgument,
       "Specifying interleaved pixel order for format: BLOB is not supported"},
      {64, 32, F::RAW16_BAYER_SBWC, Order::kCbCr, StatusCode::kInvalidArgument,
       "Specifying interleaved pixel order for format: RAW16_BAYER_SBWC is not supported"},
      {64, 32, F::RAW16_BAYER_SBWC_L75, Order::kCrCb, StatusCode::kInvalidArgument,
       "Specifying interleaved pixel order for format: RAW16_BAYER_SBWC_L75 is not supported"},
      // The 4:2:2 order is checked before the size.
      {1920, 1080, F::YCBCR_422_I, Order::kCbCr, StatusCode::kUnimplemented,
       "Unsupported interleaved chroma order: CbCr for HalPixelFormat: YCBCR_422_I, unable to "
       "make ImageFormat."},
      {3, 1, F::YCBCR_422_I, Order::kCbCr, StatusCode::kUnimplemented,
       "Unsupported interleaved chroma order: CbCr for HalPixelFormat: YCBCR_422_I, unable to "
       "make ImageFormat."},
      {64, 64, F::RGB_888, std::nullopt, StatusCode::kUnimplemented,
       "Unsupported HalPixelFormat: RGB_888, unable to make ImageFormat."},
      {64, 64, static_cast<F>(0x7), std::nullopt, StatusCode::kUnimplemented,
       "Unsupported HalPixelFormat: UnknownFormat_0x7, unable to make ImageFormat."},
      // Negative and oversized images are refused instead of wrapping.
      {-2, 4, F::YCBCR_420_888, std::nullopt, StatusCode::kInvalidArgument,
       "Invalid image size -2x4 for HalPixelFormat: YCBCR_420_888, width and height must not be "
       "negative"},
      {-3, 4, F::YCBCR_420_888, std::nullopt, StatusCode::kInvalidArgument,
       "image width should be a multiple of 2, -3 % 2 = -1; YCBCR_420_888 dimension requirements "
       "not met"},
      {5, -1, F::BLOB, std::nullopt, StatusCode::kInvalidArgument,
       "Invalid image size 5x-1 for HalPixelFormat: BLOB, width and height must not be negative"},
      {INT_MAX - 1, 2, F::Y16, std::nullopt, StatusCode::kInvalidArgument,
       "Image size 2147483646x2 is too large for HalPixelFormat: Y16, its row stride or extent "
       "does not fit in 32 bits"},
      {1 << 28, 2, F::RAW16_BAYER_SBWC_L75, std::nullopt, StatusCode::kInvalidArgument,
       "Image size 268435456x2 is too large for HalPixelFormat: RAW16_BAYER_SBWC_L75, its row "
       "stride or extent does not fit in 32 bits"},
      {2, INT_MAX - 1, F::YCBCR_420_888_AFBC_EXTRAWIDEBLK, std::nullopt,
       StatusCode::kInvalidArgument,
       "Image size 2x2147483646 is too large for HalPixelFormat: YCBCR_420_888_AFBC_EXTRAWIDEBLK, "
       "its row stride or extent does not fit in 32 bits"},
  };
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

TEST(ImageFormatTest, DebugTexts) {
  const ImageFormat yv12 = *ImageFormat::Make(64, 32, F::YV12);
  EXPECT_EQ(yv12.DebugStr(), "{type: ImageFormat, HalPixelFormat: YV12, Width: 64, Height: 32}");
  std::ostringstream os;
  os << yv12;
  EXPECT_EQ(os.str(), yv12.DebugStr());
  EXPECT_EQ(
      ImageFormat::Make(100, 100, F::BLOB)->DebugStrVerbose(),
      "{type: ImageFormat, HalPixelFormat: BLOB, Width: 100, Height: 100, BufferSizes: "
      "{10000}, Components: {{type: Component, Content: Unspecified, BufferIndex: 0, "
      "OffsetBytes: 0, Width: 100, Height: 100, RowStrideBytes: 100, BitsPerPixel: 8, "
      "PixelStride: 1, PixelPhase: 0}}, ChromaSubsampling: n/a, InterleavedChromaOrder: n/a}");
  const std::string verbose = ImageFormat::Make(4, 2, F::YCBCR_420_888)->DebugStrVerbose();
  EXPECT_THAT(verbose, ::testing::StartsWith("{type: ImageFormat, HalPixelFormat: YCBCR_420_888, "
                                             "Width: 4, Height: 2, BufferSizes: {32, 16}, "
                                             "Components: {{type: Component, Content: Luma, "));
  EXPECT_THAT(verbose, ::testing::HasSubstr("PixelPhase: 0}, {type: Component, Content: ChromaB"));
  EXPECT_THAT(verbose, ::testing::EndsWith("PixelPhase: 0}}, ChromaSubsampling: 420, "
                                           "InterleavedChromaOrder: CrCb}"));
}

TEST(ImageFormatTest, EnumerationTexts) {
  // clang-format off
  const std::vector<std::string> contents = {
      "Unspecified", "Bayer", "Rgb", "Red", "Green", "Blue", "Luma", "ChromaB", "ChromaR",
      "CompressedLumaHeader", "CompressedLumaPayload", "CompressedChromaHeader",
      "CompressedChromaPayload", "CompressedBayerHeader", "CompressedBayerPayload"};
  // clang-format on
  for (size_t i = 0; i < contents.size(); ++i) {
    EXPECT_EQ(ImageFormat::ComponentContentToString(static_cast<CC>(i)), contents[i]);
  }
  EXPECT_EQ(ImageFormat::ComponentContentToString(static_cast<CC>(15)), "Unknown");
  EXPECT_EQ(ImageFormat::ComponentContentToString(static_cast<CC>(-1)), "Unknown");
  EXPECT_EQ(ImageFormat::ChromaSubsamplingToString(Sub::k444), "444");
  EXPECT_EQ(ImageFormat::ChromaSubsamplingToString(Sub::k420), "420");
  EXPECT_EQ(ImageFormat::ChromaSubsamplingToString(Sub::k422), "422");
  EXPECT_EQ(ImageFormat::ChromaSubsamplingToString(static_cast<Sub>(9)), "444");
  EXPECT_EQ(ImageFormat::InterleavedChromaOrderToString(Order::kCbCr), "CbCr");
  EXPECT_EQ(ImageFormat::InterleavedChromaOrderToString(static_cast<Order>(5)), "CrCb");
  EXPECT_EQ(OptionalChromaSubsamplingToString(std::nullopt), "n/a");
  EXPECT_EQ(OptionalChromaSubsamplingToString(Sub::k422), "422");
  EXPECT_EQ(OptionalInterleavedChromaOrderToString(std::nullopt), "n/a");
  EXPECT_EQ(OptionalInterleavedChromaOrderToString(Order::kCrCb), "CrCb");
}

TEST(ImageFormatTest, Is64ByteAlignedFollowsTheRecordedFormat) {
  EXPECT_TRUE(ImageFormat::Make(64, 32, F::RAW16_BAYER_SBWC)->Is64ByteAligned());
  EXPECT_TRUE(ImageFormat::Make(64, 32, F::IMPLEMENTATION_DEFINED_64)->Is64ByteAligned());
  EXPECT_FALSE(ImageFormat::Make(64, 32, F::YCBCR_420_SP_M_SBWC_L50)->Is64ByteAligned());
}

}  // namespace
}  // namespace orvex
