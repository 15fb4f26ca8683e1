#include "orvex/api/camera/camera_api_types.h"

#include <string>
#include <string_view>
#include <vector>

#include "gtest/gtest.h"

namespace orvex_api {
namespace {

struct NameCase {
  std::string_view got;
  std::string_view want;
};

void ExpectNames(const std::vector<NameCase>& cases) {
  for (size_t i = 0; i < cases.size(); ++i) {
    SCOPED_TRACE(testing::Message() << "case " << i << " want \"" << cases[i].want << "\"");
    EXPECT_EQ(cases[i].got, cases[i].want);
  }
}

template <typename E>
E As(int32_t v) {
  return static_cast<E>(v);
}

TEST(CameraApiTypesTest, SingleComparisonNames) {
  ExpectNames({
      {ToString(StreamType::kInput), "Input"},
      {ToString(StreamType::kOutput), "Output"},
      {ToString(As<StreamType>(2)), "Input"},
      {ToString(FrameStatus::kOk), "OK"},
      {ToString(FrameStatus::kError), "Error"},
      {ToString(As<FrameStatus>(-1)), "Error"},
      {ToString(TorchMode::kOff), "Off"},
      {ToString(As<TorchMode>(9)), "On"},
      {ToString(CameraDeviceStatus::kNotPresent), "Not present"},
      {ToString(As<CameraDeviceStatus>(3)), "Present"},
      {ToString(StreamConfigurationMode::kNormal), "Normal"},
      {ToString(As<StreamConfigurationMode>(0x8000)), "Constrained high speed"},
      {ToString(DynamicRangeProfile::kStandard), "Standard"},
      {ToString(DynamicRangeProfile::kHlg10), "HLG10"},
      {ToString(As<DynamicRangeProfile>(0)), "HLG10"},
  });
}

TEST(CameraApiTypesTest, TableNames) {
  const std::vector<std::string_view> pixel_formats = {
      "Raw10",
      "Raw12",
      "Raw16",
      "YCBCR_420_888",
      "YCBCR_420_888_64",
      "YCBCR_420_Custom",
      "YCBCR_420_Custom_64",
      "YCBCR_420_10B",
      "Jpeg",
      "Hardware_Dependent_YUV",
      "Hardware_Dependent_YUV_64",
      "YCBCR_P010",
      "YCBCR_P010_M",
      "YCBCR_P010_M_64",
      "YCBCR_420_888_SBWC",
      "YCRCB_420_888_SBWC",
      "YCBCR_420_888_SBWC_L50",
      "YCBCR_420_888_SBWC_L75",
      "YCBCR_420_SP_M_S10B_SBWC",
      "YCBCR_420_SP_M_S10B_SBWC_L40",
      "YCBCR_420_SP_M_S10B_SBWC_L60",
      "YCBCR_420_SP_M_S10B_SBWC_L80",
  };
  for (int32_t v = 0; v < static_cast<int32_t>(pixel_formats.size()); ++v) {
    SCOPED_TRACE(v);
    EXPECT_EQ(ToString(As<PixelFormat>(v)), pixel_formats[v]);
    EXPECT_EQ(IsRawFormat(As<PixelFormat>(v)), v < 3);
  }
  EXPECT_EQ(ToString(PixelFormat::kYcbcr420SpMS10bSbwcL80), "YCBCR_420_SP_M_S10B_SBWC_L80");

  ExpectNames({
      {ToString(Rotation::kCcw0), "CCW_0"},
      {ToString(Rotation::kCcw90), "CCW_90"},
      {ToString(Rotation::kCcw180), "CCW_180"},
      {ToString(Rotation::kCcw270), "CCW_270"},
      {ToString(RequestTemplate::kPreview), "Preview"},
      {ToString(RequestTemplate::kCapture), "Capture"},
      {ToString(RequestTemplate::kVideo), "Video"},
      {ToString(RequestTemplate::kVideoSnapshot), "Video snapshot"},
      {ToString(RequestTemplate::kZeroShutterLag), "Zero shutter lag"},
      {ToString(RequestTemplate::kManual), "Manual"},
      {ToString(TorchModeStatus::kNotAvailable), "Not available"},
      {ToString(TorchModeStatus::kAvailableOff), "Available off"},
      {ToString(TorchModeStatus::kAvailableOn), "Available on"},
      {ToString(CustomDataSpace::kUnknown), "Unknown"},
      {ToString(CustomDataSpace::kArbitrary), "Arbitrary"},
      {ToString(CustomDataSpace::kDepth), "Depth"},
      {ToString(CustomDataSpace::kSensor), "Sensor"},
      {ToString(CustomDataSpace::kDynamicDepth), "Dynamic depth"},
      {ToString(CustomDataSpace::kJpegAppSegments), "JPEG APP segments"},
      {ToString(CustomDataSpace::kHeif), "HEIF"},
      {ToString(CustomDataSpace::kUnspecified), "Unspecified"},
  });
}

TEST(CameraApiTypesTest, ColorSpaceNames) {
  const std::vector<std::string_view> standards = {
      "Unspecified", "BT709",
      "BT601_625",   "BT601_625_Unadjusted",
      "BT601_525",   "BT601_525_Unadjusted",
      "BT2020",      "BT2020_Constant_Luminance",
      "BT470M",      "Film",
      "DCI_P3",      "Adobe_RGB",
  };
  const std::vector<std::string_view> transfers = {
      "Unspecified", "Linear",   "RGB",    "SMPTE_170M", "Gamma2.2",
      "Gamma2.6",    "Gamma2.8", "ST2084", "HLG",
  };
  const std::vector<std::string_view> ranges = {"Unspecified", "Full", "Limited", "Extended"};
  for (size_t i = 0; i < standards.size(); ++i) {
    SCOPED_TRACE(i);
    EXPECT_EQ(ColorSpace::ToString(static_cast<ColorSpace::Standard>(i)), standards[i]);
    if (i < transfers.size()) {
      EXPECT_EQ(ColorSpace::ToString(static_cast<ColorSpace::Transfer>(i)), transfers[i]);
    }
    if (i < ranges.size()) {
      EXPECT_EQ(ColorSpace::ToString(static_cast<ColorSpace::Range>(i)), ranges[i]);
    }
  }
}

// Values outside a table must miss cleanly (the lookups are bounds-checked;
// the sanitizer build catches any read past a table).
TEST(CameraApiTypesTest, OutOfTableValuesPrintEmpty) {
  for (int32_t v : {-2147483647 - 1, -1, 22, 100, 2147483647}) {
    SCOPED_TRACE(v);
    EXPECT_EQ(ToString(As<PixelFormat>(v)), "");
    EXPECT_FALSE(IsRawFormat(As<PixelFormat>(v)));
    EXPECT_EQ(ToString(As<Rotation>(v)), "");
    EXPECT_EQ(ToString(As<TorchModeStatus>(v)), "");
    EXPECT_EQ(ToString(As<CustomDataSpace>(v)), "");
    EXPECT_EQ(ColorSpace::ToString(As<ColorSpace::Standard>(v)), "");
    EXPECT_EQ(ColorSpace::ToString(As<ColorSpace::Transfer>(v)), "");
    EXPECT_EQ(ColorSpace::ToString(As<ColorSpace::Range>(v)), "");
  }
  // Request templates start at 1: 0 and 7 are both outside.
  EXPECT_EQ(ToString(As<RequestTemplate>(0)), "");
  EXPECT_EQ(ToString(As<RequestTemplate>(7)), "");
  EXPECT_EQ(ToString(As<RequestTemplate>(-2147483647 - 1)), "");
  EXPECT_EQ(ColorSpace::ToString(As<ColorSpace::Transfer>(9)), "");
  EXPECT_EQ(ColorSpace::ToString(As<ColorSpace::Range>(4)), "");
}

TEST(CameraApiTypesTest, DataSpaceText) {
  EXPECT_EQ(
      ToString(DataSpace(ColorSpace{ColorSpace::Standard::kBt2020, ColorSpace::Transfer::kSrgb,
                                    ColorSpace::Range::kLimited})),
      "DataSpace(Color)::(Standard: BT2020, Transfer: RGB, Range: Limited)");
  EXPECT_EQ(ToString(DataSpace(ColorSpace{})),
            "DataSpace(Color)::(Standard: Unspecified, Transfer: Unspecified, Range: Unspecified)");
  EXPECT_EQ(ToString(DataSpace(CustomDataSpace::kJpegAppSegments)),
            "DataSpace(Custom)::JPEG APP segments");
}

TEST(CameraApiTypesTest, UsageText) {
  const struct {
    uint64_t usage;
    std::string_view want;
  } cases[] = {
      {0, "[]"},
      {0x28, "[HwComposer|HwVideoEncoder]"},
      {0x1 | 0x10 | 0x20000000, "[Protected|KvuInput]"},
      {0x1 | 0x4 | 0x200 | (uint64_t{1} << 63), "[]"},
      {0x2 | 0x8 | 0x10 | 0x20 | 0x40 | 0x80 | 0x100 | 0x20000000,
       "[HwTexture|HwComposer|Protected|HwVideoEncoder|HwCameraWrite|HwCameraRead|HwCameraZsl|"
       "KvuInput]"},
      {~uint64_t{0},
       "[HwTexture|HwComposer|Protected|HwVideoEncoder|HwCameraWrite|HwCameraRead|HwCameraZsl|"
       "KvuInput]"},
      {0x100 | 0x2, "[HwTexture|HwCameraZsl]"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.usage);
    EXPECT_EQ(ToString(c.usage), c.want);
  }
}

}  // namespace
}  // namespace orvex_api
