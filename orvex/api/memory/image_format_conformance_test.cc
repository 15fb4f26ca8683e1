#include <algorithm>
#include <functional>
#include <set>
#include <string>
#include <vector>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/memory/image_format.h"
#include "orvex/status/status_matchers.h"

namespace orvex {

// Builds layouts that Make would not produce.
class ImageFormatTestPeer {
 public:
  static ImageFormat With(const ImageFormat& f, std::vector<ImageFormat::Component> components) {
    return ImageFormat(f.format(), f.width(), f.height(), f.buffer_sizes(), std::move(components),
                       f.chroma_subsampling(), f.interleaved_chroma_order());
  }
  static ImageFormat WithOrder(const ImageFormat& f,
                               std::optional<ImageFormat::InterleavedChromaOrder> order) {
    return ImageFormat(f.format(), f.width(), f.height(), f.buffer_sizes(), f.components(),
                       f.chroma_subsampling(), order);
  }
  static ImageFormat WithSubsampling(const ImageFormat& f,
                                     std::optional<ImageFormat::ChromaSubsampling> subsampling) {
    return ImageFormat(f.format(), f.width(), f.height(), f.buffer_sizes(), f.components(),
                       subsampling, f.interleaved_chroma_order());
  }
};

namespace {

using ::orvex::testing::StatusIs;
using C = ImageFormat::Component;
using CC = ImageFormat::ComponentContent;
using F = HalPixelFormat;
using Order = ImageFormat::InterleavedChromaOrder;
using Sub = ImageFormat::ChromaSubsampling;
using Peer = ImageFormatTestPeer;

ImageFormat MakeOrDie(int w, int h, F f, std::optional<Order> order = std::nullopt) {
  StatusOr<ImageFormat> made = ImageFormat::Make(w, h, f, order);
  EXPECT_TRUE(made.ok()) << made.status();
  return *std::move(made);
}

// The same layout with one field of component `index` changed.
ImageFormat Mutate(const ImageFormat& f, size_t index, const std::function<void(C&)>& change) {
  std::vector<C> components = f.components();
  change(components[index]);
  return Peer::With(f, std::move(components));
}

TEST(ImageFormatConformanceTest, ComponentLookup) {
  const ImageFormat blob = MakeOrDie(100, 100, F::BLOB);
  EXPECT_THAT(blob.GetComponentFor(CC::kLuma, true).status(),
              StatusIs(StatusCode::kFailedPrecondition,
                       "Failed to find component with Luma in {type: ImageFormat, "
                       "HalPixelFormat: BLOB, Width: 100, Height: 100}"));
  EXPECT_THAT(blob.GetComponentFor(CC::kLuma, false).status(),
              StatusIs(StatusCode::kFailedPrecondition, ""));
  EXPECT_FALSE(blob.GetComponentForInternal(CC::kLuma).has_value());
  // The first match in vector order wins.
  const ImageFormat yuv = MakeOrDie(64, 32, F::YCBCR_420_888);
  std::vector<C> components = yuv.components();
  components.push_back({CC::kLuma, 7, 0, 1, 1, 1});
  const ImageFormat doubled = Peer::With(yuv, components);
  const StatusOr<C> luma = doubled.GetComponentFor(CC::kLuma, true);
  ASSERT_TRUE(luma.ok());
  EXPECT_EQ(luma->buffer_index, 0);
}

// Failure texts of IsYuv and IsRaw are checked through ConformsTo below.
TEST(ImageFormatConformanceTest, Classification) {
  EXPECT_TRUE(MakeOrDie(64, 32, F::YCBCR_420_SP_M_SBWC_L50).IsYuv(true).ok());
  EXPECT_TRUE(MakeOrDie(64, 32, F::YCBCR_420_888_I_AFBC_WIDEBLK).IsYuv(true).ok());
  EXPECT_TRUE(MakeOrDie(64, 32, F::RAW16_BAYER_SBWC_L50).IsRaw(true).ok());
  EXPECT_THAT(MakeOrDie(64, 32, F::RAW16_BAYER_SBWC).IsYuv(false),
              StatusIs(StatusCode::kInvalidArgument, ""));
  EXPECT_THAT(MakeOrDie(64, 32, F::Y8).IsRaw(false), StatusIs(StatusCode::kInvalidArgument, ""));
}

// A failing conformance check: the layout, the target (or subsampling) and
// the expected result.
struct FailureCase {
  const char* label;
  ImageFormat format;
  std::function<Status(const ImageFormat&, bool)> check;
  StatusCode code;
  std::string message;
};

std::function<Status(const ImageFormat&, bool)> To(F target) {
  return [target](const ImageFormat& f, bool verbose) { return f.ConformsTo(target, verbose); };
}
std::function<Status(const ImageFormat&, bool)> To(Sub expected) {
  return [expected](const ImageFormat& f, bool verbose) { return f.ConformsTo(expected, verbose); };
}

std::string Prefix(const std::string& name) {
  return "ImageFormat does not conform to " + name + ". ";
}

std::vector<FailureCase> FailureCases() {
  const ImageFormat yuv = MakeOrDie(1920, 1080, F::YCBCR_420_888);
  const ImageFormat p010 = MakeOrDie(1920, 1080, F::YCBCR_P010);
  const ImageFormat p010m = MakeOrDie(1920, 1080, F::YCBCR_P010_M);
  const ImageFormat yv12 = MakeOrDie(64, 32, F::YV12);
  const ImageFormat i422 = MakeOrDie(64, 32, F::YCBCR_422_I);
  const ImageFormat raw10 = MakeOrDie(4000, 3000, F::RAW10);
  const ImageFormat raw16 = MakeOrDie(4000, 3000, F::RAW16);
  const ImageFormat aligned = MakeOrDie(1000, 8, F::YCBCR_420_888);  // stride 1008
  const std::string p420 = Prefix("YCBCR_420_888");
  const std::string in420 = "; " + p420;
  return {
      {"bits first", raw10, To(F::YCBCR_420_888), StatusCode::kInvalidArgument,
       "component bits per pixel: 10 != expected bits per pixel: 8" + in420},
      {"no rule set", yuv, To(F::YCBCR_420_SP_M), StatusCode::kUnimplemented,
       "Unable to check if conforms to YCBCR_420_SP_M"},
      {"implementation defined", yuv, To(F::IMPLEMENTATION_DEFINED), StatusCode::kInvalidArgument,
       Prefix("IMPLEMENTATION_DEFINED") +
           "There is no sensibe way to say if a format conforms to IMPLEMENTATION_DEFINED"},
      {"blob", yuv, To(F::BLOB), StatusCode::kInvalidArgument,
       Prefix("BLOB") + "BLOB should have at least 1 unspecified component"},
      {"raw", MakeOrDie(64, 32, F::Y16), To(F::RAW16), StatusCode::kInvalidArgument,
       "Imageformat does not have required components for either compressed or uncompressed "
       "raw; " +
           Prefix("RAW16")},
      {"monochrome without luma", raw16, To(F::Y16), StatusCode::kInvalidArgument,
       "Failed to find component with Luma in {type: ImageFormat, HalPixelFormat: RAW16, Width: "
       "4000, Height: 3000}; " +
           Prefix("Y16")},
      {"Y10 stride", MakeOrDie(2, 2, F::Y10), To(F::Y10), StatusCode::kInvalidArgument,
       Prefix("Y10") + "stride must be multiple of 10"},
      {"not yuv", MakeOrDie(100, 100, F::BLOB), To(F::YCBCR_420_888), StatusCode::kInvalidArgument,
       "Imageformat does not have required components for either compressed or uncompressed "
       "YUV" +
           in420},
      {"subsampling unset", Peer::WithSubsampling(yuv, std::nullopt), To(F::YCBCR_420_888),
       StatusCode::kInvalidArgument,
       "ImageFormat does not contain valid YUV components. chroma_subsampling is un-set" + in420},
      {"422 is not 420", MakeOrDie(1920, 1080, F::YCBCR_422_I), To(F::YCBCR_420_888),
       StatusCode::kInvalidArgument,
       Prefix("420") + "ImageFormat's chroma subsampling reports: 422" + in420},
      {"ChromaB width", Mutate(yuv, 1, [](C& c) { c.width = 961; }), To(F::YCBCR_420_888),
       StatusCode::kInvalidArgument,
       Prefix("420") + "ChromaB component width: 961 != expected width: 960" + in420},
      {"ChromaR width", Mutate(yuv, 2, [](C& c) { c.width = 959; }), To(Sub::k420),
       StatusCode::kInvalidArgument,
       Prefix("420") + "ChromaR component width: 959 != expected width: 960"},
      {"ChromaB height", Mutate(yuv, 1, [](C& c) { c.height = 1080; }), To(Sub::k420),
       StatusCode::kInvalidArgument,
       Prefix("420") + "ChromaB component height: 1080 != expected height: 540"},
      {"odd luma", Mutate(yuv, 0, [](C& c) { c.width = 1921; }), To(F::YCBCR_420_888),
       StatusCode::kInvalidArgument, "image width should be a multiple of 2, 1921 % 2 = 1" + in420},
      {"chroma buffers", Mutate(yuv, 1, [](C& c) { c.buffer_index = 0; }), To(F::YCBCR_420_888),
       StatusCode::kInvalidArgument, p420 + "chroma components should be in the same buffer"},
      {"chroma offsets", Mutate(yuv, 2, [](C& c) { c.offset_bytes = 64; }), To(F::YCBCR_420_888),
       StatusCode::kInvalidArgument, p420 + "chroma components should start at the same offset"},
      {"P010 luma buffer", Mutate(p010, 0, [](C& c) { c.buffer_index = 1; }), To(F::YCBCR_P010),
       StatusCode::kInvalidArgument,
       Prefix("YCBCR_P010") + "all components should be in the same buffer"},
      {"P010 two buffers", p010m, To(F::YCBCR_P010), StatusCode::kInvalidArgument,
       Prefix("YCBCR_P010") + "all components should be in the same buffer"},
      {"P010 chroma after luma", Mutate(p010, 0, [](C& c) { c.offset_bytes = 16; }),
       To(F::YCBCR_P010), StatusCode::kInvalidArgument,
       Prefix("YCBCR_P010") +
           "chroma red component should come right after luma component in buffer"},
      {"swapped phases",
       Mutate(Mutate(MakeOrDie(64, 32, F::YCBCR_420_888, Order::kCbCr), 1,
                     [](C& c) { c.pixel_phase = 1; }),
              2, [](C& c) { c.pixel_phase = 0; }),
       To(F::YCBCR_420_888), StatusCode::kInvalidArgument,
       p420 + "pixel interleaving not as expected"},
      {"different strides", Mutate(p010m, 1, [](C& c) { c.row_stride_bytes = 3872; }),
       To(F::YCBCR_P010_M), StatusCode::kInvalidArgument,
       Prefix("YCBCR_P010_M") + "components have different row strides, y: 3840, u: 3872, v: 3840"},
      {"stride not aligned to 64", aligned, To(F::YCBCR_420_888_STRIDE_ALIGNED_64),
       StatusCode::kInvalidArgument,
       Prefix("YCBCR_420_888_STRIDE_ALIGNED_64") + "row stride is not aligned to 64 bytes: 1008"},
      {"stride not aligned to 32",
       Mutate(Mutate(Mutate(p010m, 0, [](C& c) { c.row_stride_bytes = 3856; }), 1,
                     [](C& c) { c.row_stride_bytes = 3856; }),
              2, [](C& c) { c.row_stride_bytes = 3856; }),
       To(F::YCBCR_P010_M), StatusCode::kInvalidArgument,
       Prefix("YCBCR_P010_M") + "row stride is not aligned to 32 bytes: 3856"},
      {"YV12 dimensions", Mutate(yv12, 0, [](C& c) { c.width = 65; }), To(F::YV12),
       StatusCode::kInvalidArgument,
       "image width should be a multiple of 4, 65 % 4 = 1; " + Prefix("YV12")},
      {"YV12 strides", Mutate(yv12, 1, [](C& c) { c.row_stride_bytes = 40; }), To(F::YV12),
       StatusCode::kInvalidArgument,
       Prefix("YV12") + "component strides must all be multiples of 16"},
      {"YV12 red placement", Mutate(yv12, 1, [](C& c) { c.offset_bytes = 2064; }), To(F::YV12),
       StatusCode::kInvalidArgument,
       Prefix("YV12") + "chroma red component should come right after luma component in buffer"},
      {"YV12 blue placement", Mutate(yv12, 2, [](C& c) { c.offset_bytes = 2048; }), To(F::YV12),
       StatusCode::kInvalidArgument,
       Prefix("YV12") +
           "chroma blue component should come right after chroma red component in buffer"},
      {"YV12 interleaved", Mutate(yv12, 2, [](C& c) { c.pixel_phase = 1; }), To(F::YV12),
       StatusCode::kInvalidArgument, Prefix("YV12") + "there should be no pixel interleaving"},
      {"422 buffers", Mutate(i422, 1, [](C& c) { c.buffer_index = 1; }), To(F::YCBCR_422_I),
       StatusCode::kInvalidArgument,
       Prefix("YCBCR_422_I") + "All components should be in the same buffer"},
      {"422 offsets", Mutate(i422, 0, [](C& c) { c.offset_bytes = 1; }), To(F::YCBCR_422_I),
       StatusCode::kInvalidArgument,
       Prefix("YCBCR_422_I") + "All components should have the same offset"},
      {"422 interleaving", Mutate(i422, 2, [](C& c) { c.pixel_phase = 1; }), To(F::YCBCR_422_I),
       StatusCode::kInvalidArgument, Prefix("YCBCR_422_I") + "pixel interleaving not as expected"},
      {"SBWC Bayer header", MakeOrDie(64, 32, F::RAW16_BAYER_SBWC_L50), To(F::RAW16_BAYER_SBWC),
       StatusCode::kInvalidArgument,
       "Failed to find component with CompressedBayerHeader in {type: ImageFormat, "
       "HalPixelFormat: RAW16_BAYER_SBWC_L50, Width: 64, Height: 32}; " +
           Prefix("RAW16_BAYER_SBWC")},
      {"SBWC lossy Bayer stride",
       Mutate(MakeOrDie(64, 32, F::RAW16_BAYER_SBWC_L75), 0,
              [](C& c) { c.row_stride_bytes = 784; }),
       To(F::RAW16_BAYER_SBWC_L75), StatusCode::kInvalidArgument,
       Prefix("RAW16_BAYER_SBWC_L75") +
           "row stride is not aligned to 32 bytes: 784 for CompressedBayerPayload"},
      {"SBWC lossless header stride",
       Mutate(MakeOrDie(64, 32, F::YCBCR_420_SP_M_SBWC), 0, [](C& c) { c.row_stride_bytes = 40; }),
       To(F::YCBCR_420_SP_M_SBWC), StatusCode::kInvalidArgument,
       Prefix("YCBCR_420_SP_M_SBWC") +
           "row stride is not aligned to 16 bytes: 40 for CompressedLumaHeader"},
      {"SBWC lossy aligned 64", MakeOrDie(1952, 1080, F::YCBCR_420_SP_M_SBWC_L75),
       To(F::YCBCR_420_SP_M_SBWC_L50_STRIDE_ALIGNED_64), StatusCode::kInvalidArgument,
       Prefix("YCBCR_420_SP_M_SBWC_L50_STRIDE_ALIGNED_64") +
           "row stride is not aligned to 64 bytes: 5856 for CompressedLumaPayload"},
      {"SBWC lossy chroma stride",
       Mutate(MakeOrDie(64, 32, F::YCBCR_420_SP_M_S10B_SBWC_L40), 1,
              [](C& c) { c.row_stride_bytes = 144; }),
       To(F::YCBCR_420_SP_M_S10B_SBWC_L40), StatusCode::kInvalidArgument,
       Prefix("YCBCR_420_SP_M_S10B_SBWC_L40") +
           "row stride is not aligned to 32 bytes: 144 for CompressedChromaPayload"},
      {"AFBC chroma header",
       Mutate(MakeOrDie(1920, 1080, F::YCBCR_420_888_AFBC_EXTRAWIDEBLK), 2,
              [](C& c) { c.row_stride_bytes = 512; }),
       To(F::YCBCR_420_888_AFBC_EXTRAWIDEBLK), StatusCode::kInvalidArgument,
       Prefix("YCBCR_420_888_AFBC_EXTRAWIDEBLK") +
           "row stride is not conformed to YCBCR_420_888_AFBC_EXTRAWIDEBLK for "
           "CompressedChromaHeader, value: 512, expected: 256"},
      {"AFBC other geometry", MakeOrDie(1920, 1080, F::YCBCR_420_888_AFBC_EXTRAWIDEBLK),
       To(F::YCBCR_420_888_I_AFBC_WIDEBLK), StatusCode::kInvalidArgument,
       Prefix("YCBCR_420_888_I_AFBC_WIDEBLK") +
           "row stride is not conformed to YCBCR_420_888_I_AFBC_WIDEBLK for "
           "CompressedLumaHeader, value: 512, expected: 960"},
  };
}

TEST(ImageFormatConformanceTest, FailuresNameTheFirstBrokenRule) {
  for (const FailureCase& c : FailureCases()) {
    SCOPED_TRACE(c.label);
    EXPECT_THAT(c.check(c.format, true), StatusIs(c.code, c.message));
    // Quiet checks give the same code and no text at all.
    EXPECT_THAT(c.check(c.format, false), StatusIs(c.code, ""));
  }
}

TEST(ImageFormatConformanceTest, LayoutsThatConform) {
  // Stride 1008: no stride rule for this code.
  EXPECT_TRUE(
      MakeOrDie(1000, 8, F::YCBCR_420_888).ConformsTo(F::YCBCR_420_SP_M_STRIDE_ALIGNED_64).ok());
  EXPECT_TRUE(MakeOrDie(64, 32, F::YCBCR_420_888, Order::kCbCr).ConformsTo(F::YCBCR_420_888).ok());
  EXPECT_TRUE(MakeOrDie(1920, 1080, F::Y10).ConformsTo(F::Y10).ok());
  // Chroma phases follow the recorded order; without one Cr comes first.
  const ImageFormat cbcr = MakeOrDie(64, 32, F::YCBCR_420_888, Order::kCbCr);
  const ImageFormat no_order = ImageFormatTestPeer::WithOrder(
      Mutate(cbcr, 1, [](C& c) { c.pixel_phase = 1; }), std::nullopt);
  EXPECT_TRUE(
      Mutate(no_order, 2, [](C& c) { c.pixel_phase = 0; }).ConformsTo(F::YCBCR_420_888).ok());
  // Compressed layouts are not measured against their subsampling.
  EXPECT_TRUE(Mutate(MakeOrDie(64, 32, F::YCBCR_420_SP_M_SBWC), 3, [](C& c) { c.width = 1; })
                  .ConformsTo(Sub::k420)
                  .ok());
  // 4:2:2 phases are fixed whatever the order.
  EXPECT_TRUE(MakeOrDie(64, 32, F::YCBCR_422_I, Order::kCrCb).ConformsTo(F::YCBCR_422_I).ok());
}

// Every format Make lays out (IMPLEMENTATION_DEFINED codes included, which
// Make substitutes).
std::vector<F> MadeFormats() {
  std::vector<F> formats;
  for (uint32_t code :
       {0x14u,  0x20u,  0x21u,  0x22u,    0x23u,     0x25u,       0x26u,       0x36u,
        0x105u, 0x125u, 0x127u, 0x130u,   0x132u,    0x134u,      0x140u,      0x141u,
        0x160u, 0x161u, 0x162u, 0x50208u, 0x190023u, 0x20203859u, 0x20363159u, 0x32315659u}) {
    formats.push_back(static_cast<F>(code));
  }
  for (uint32_t code = 0x40000000u; code <= 0x4000000fu; ++code) {
    formats.push_back(static_cast<F>(code));
  }
  return formats;
}

// Made layouts conform to the format they record, with the documented
// exceptions: packed Y10 rows whose stride is no multiple of 10 (widths that
// are no multiple of 8) and YCBCR_420_SP_M, for which there are no rules.
// Conformance to the requested code differs only for the two
// IMPLEMENTATION_DEFINED codes.
TEST(ImageFormatConformanceTest, MadeLayoutsConformToTheirFormat) {
  const std::vector<int> widths = {0,    2,    4,    6,    8,    10,   12,   14,   16,  30,
                                   32,   62,   64,   66,   126,  250,  256,  258,  510, 1000,
                                   1920, 1922, 1924, 1952, 4000, 4002, 4032, 4036, 8190};
  const std::vector<int> heights = {0, 1, 2, 4, 6, 8, 14, 16, 18, 30, 1080, 1081, 3000, 3024, 3026};
  std::set<std::string> exceptions;
  int made_count = 0;
  for (const F format : MadeFormats()) {
    for (const int w : widths) {
      for (const int h : heights) {
        const StatusOr<ImageFormat> made = ImageFormat::Make(w, h, format);
        if (!made.ok()) {
          ASSERT_EQ(made.status().code(), StatusCode::kInvalidArgument) << made.status();
          continue;
        }
        ++made_count;
        SCOPED_TRACE(made->DebugStr());
        const Status own = made->ConformsTo(made->format(), true);
        const Status quiet = made->ConformsTo(made->format(), false);
        EXPECT_EQ(own.code(), quiet.code());
        EXPECT_TRUE(quiet.message().empty());
        if (!own.ok()) {
          exceptions.insert(FormatToString(made->format()) + " " + StatusCodeToString(own.code()) +
                            " " + std::string(own.message()));
          if (made->format() == F::Y10) {
            EXPECT_NE(w % 8, 0);
          }
        } else if (made->format() == F::Y10) {
          EXPECT_EQ(w % 8, 0);
        }
        if (made->chroma_subsampling().has_value()) {
          EXPECT_TRUE(made->ConformsTo(*made->chroma_subsampling(), false).ok());
          EXPECT_TRUE(made->IsYuv(false).ok());
        }
        if (format != made->format()) {
          const Status requested = made->ConformsTo(format, true);
          exceptions.insert("requested " + FormatToString(format) + " " +
                            StatusCodeToString(requested.code()) + " " +
                            std::string(requested.message()));
        }
      }
    }
  }
  EXPECT_GT(made_count, 1000);
  EXPECT_THAT(exceptions,
              ::testing::UnorderedElementsAre(
                  "Y10 INVALID_ARGUMENT ImageFormat does not conform to Y10. stride must be "
                  "multiple of 10",
                  "YCBCR_420_SP_M UNIMPLEMENTED Unable to check if conforms to YCBCR_420_SP_M",
                  "requested IMPLEMENTATION_DEFINED INVALID_ARGUMENT ImageFormat does not conform "
                  "to IMPLEMENTATION_DEFINED. There is no sensibe way to say if a format "
                  "conforms to IMPLEMENTATION_DEFINED",
                  "requested IMPLEMENTATION_DEFINED_64 UNIMPLEMENTED Unable to check if conforms "
                  "to IMPLEMENTATION_DEFINED_64"));
}

enum class Field {
  kContent,
  kBufferIndex,
  kOffset,
  kWidth,
  kHeight,
  kStride,
  kBitsPerPixel,
  kPixelStride,
  kPixelPhase,
};

void Bump(C& c, Field field) {
  switch (field) {
    case Field::kContent:
      c.content = static_cast<CC>(static_cast<int>(c.content) + 1);
      break;
    case Field::kBufferIndex:
      ++c.buffer_index;
      break;
    case Field::kOffset:
      ++c.offset_bytes;
      break;
    case Field::kWidth:
      ++c.width;
      break;
    case Field::kHeight:
      ++c.height;
      break;
    case Field::kStride:
      ++c.row_stride_bytes;
      break;
    case Field::kBitsPerPixel:
      ++c.bits_per_pixel;
      break;
    case Field::kPixelStride:
      ++c.pixel_stride;
      break;
    case Field::kPixelPhase:
      ++c.pixel_phase;
      break;
  }
}

bool IsIn(F f, std::initializer_list<F> set) {
  return std::find(set.begin(), set.end(), f) != set.end();
}

// Whether the rules of `target` constrain `field` of a component holding
// `content`.
bool RulesConstrain(F target, CC content, Field field) {
  if (field == Field::kContent || field == Field::kBitsPerPixel) return true;
  const bool luma = content == CC::kLuma;
  switch (target) {
    case F::YCBCR_420_888:
    case F::YCBCR_P010:
    case F::YCBCR_420_SP_M_S10B:
    case F::YCBCR_P010_M:
    case F::YCBCR_420_888_SINGLE_BUFFER:
    case F::YCBCR_420_888_STRIDE_ALIGNED_64:
    case F::YCBCR_420_SP_M_STRIDE_ALIGNED_64:
    case F::YCBCR_420_SP_M_S10B_STRIDE_ALIGNED_64:
    case F::YCBCR_420_888_SINGLE_BUFFER_STRIDE_ALIGNED_64:
    case F::YCBCR_P010_M_STRIDE_ALIGNED_64:
      if (field == Field::kStride) {
        // Single-buffer chroma must start right after the luma rows.
        if (luma && IsIn(target, {F::YCBCR_P010, F::YCBCR_420_888_SINGLE_BUFFER,
                                  F::YCBCR_420_888_SINGLE_BUFFER_STRIDE_ALIGNED_64})) {
          return true;
        }
        return IsIn(target, {F::YCBCR_P010_M, F::YCBCR_420_888_STRIDE_ALIGNED_64,
                             F::YCBCR_420_SP_M_S10B_STRIDE_ALIGNED_64,
                             F::YCBCR_420_888_SINGLE_BUFFER_STRIDE_ALIGNED_64,
                             F::YCBCR_P010_M_STRIDE_ALIGNED_64});
      }
      if (luma && (field == Field::kBufferIndex || field == Field::kOffset)) {
        return IsIn(target, {F::YCBCR_P010, F::YCBCR_420_888_SINGLE_BUFFER,
                             F::YCBCR_420_888_SINGLE_BUFFER_STRIDE_ALIGNED_64});
      }
      return true;
    case F::YV12:
      return true;
    case F::YCBCR_422_I:
      return field != Field::kStride;
    case F::Y8:
    case F::Y16:
    case F::Y10:
      return field == Field::kWidth || field == Field::kHeight || field == Field::kStride;
    case F::RAW16_BAYER_SBWC_L50:
    case F::RAW16_BAYER_SBWC_L75:
    case F::YCBCR_420_SP_M_SBWC:
    case F::YCBCR_420_SP_M_S10B_SBWC:
    case F::YCRCB_420_SP_M_SBWC:
    case F::YCBCR_420_SP_M_SBWC_L50:
    case F::YCBCR_420_SP_M_SBWC_L75:
    case F::YCBCR_420_SP_M_S10B_SBWC_L40:
    case F::YCBCR_420_SP_M_S10B_SBWC_L60:
    case F::YCBCR_420_SP_M_S10B_SBWC_L80:
    case F::YCBCR_420_SP_M_SBWC_STRIDE_ALIGNED_64:
    case F::YCBCR_420_SP_M_SBWC_L50_STRIDE_ALIGNED_64:
    case F::YCBCR_420_SP_M_S10B_SBWC_STRIDE_ALIGNED_64:
    case F::YCBCR_420_SP_M_S10B_SBWC_L40_STRIDE_ALIGNED_64:
    case F::YCBCR_420_SP_M_S10B_SBWC_L80_STRIDE_ALIGNED_64:
    case F::YCBCR_420_888_I_AFBC_WIDEBLK:
    case F::YCBCR_420_888_AFBC_EXTRAWIDEBLK:
      return field == Field::kStride;
    default:  // raw, BLOB and lossless SBWC Bayer: only presence and bits
      return false;
  }
}

// Changing any single field of a made layout is caught exactly where the
// rules of its format look at that field.
TEST(ImageFormatConformanceTest, SingleFieldChangesAreCaughtWhereRulesLook) {
  constexpr Field kFields[] = {Field::kContent,      Field::kBufferIndex, Field::kOffset,
                               Field::kWidth,        Field::kHeight,      Field::kStride,
                               Field::kBitsPerPixel, Field::kPixelStride, Field::kPixelPhase};
  for (const F format : MadeFormats()) {
    for (const auto& [w, h] : {std::pair{1920, 1080}, std::pair{4000, 3000}}) {
      const ImageFormat made = MakeOrDie(w, h, format);
      if (made.format() != format || format == F::YCBCR_420_SP_M) continue;
      if (format == F::Y10 && w % 8 != 0) continue;
      ASSERT_TRUE(made.ConformsTo(format).ok());
      for (size_t i = 0; i < made.components().size(); ++i) {
        for (const Field field : kFields) {
          SCOPED_TRACE(::testing::Message() << made.DebugStr() << " component " << i << " field "
                                            << static_cast<int>(field));
          const CC content = made.components()[i].content;
          const ImageFormat changed = Mutate(made, i, [field](C& c) { Bump(c, field); });
          const Status status = changed.ConformsTo(format, false);
          if (RulesConstrain(format, content, field)) {
            EXPECT_EQ(status.code(), StatusCode::kInvalidArgument);
            EXPECT_TRUE(status.message().empty());
          } else {
            EXPECT_TRUE(status.ok()) << status;
          }
        }
      }
    }
  }
}

}  // namespace
}  // namespace orvex
