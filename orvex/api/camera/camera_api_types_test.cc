#include "orvex/api/camera/camera_api_types.h"

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "absl/strings/str_split.h"
#include "gtest/gtest.h"

namespace orvex_api {
namespace {

template <typename E>
E As(int64_t v) {
  return static_cast<E>(v);
}

// Checks that value first + i prints the i-th of the '|'-separated names,
// and that the values just outside the table print empty.
template <typename E, typename F>
void ExpectTable(F to_string, const char* joined, int first = 0) {
  const std::vector<std::string> names = absl::StrSplit(joined, '|');
  for (size_t i = 0; i < names.size(); ++i) {
    SCOPED_TRACE(names[i]);
    EXPECT_EQ(to_string(As<E>(first + static_cast<int>(i))), names[i]);
  }
  const int64_t outside[] = {first - 1, first + static_cast<int64_t>(names.size()), INT32_MIN,
                             INT32_MAX};
  for (int64_t v : outside) {
    SCOPED_TRACE(v);
    EXPECT_EQ(to_string(As<E>(v)), "");
  }
}

TEST(CameraApiTypesTest, SingleComparisonNames) {
  const struct {
    std::string_view got;
    std::string_view want;
  } cases[] = {
      {ToString(StreamType::kInput), "Input"},
      {ToString(StreamType::kOutput), "Output"},
      {ToString(As<StreamType>(2)), "Input"},
      {ToString(FrameStatus::kOk), "OK"},
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
  };
  for (const auto& c : cases) EXPECT_EQ(c.got, c.want);
}

// Every table name once; the lookups are bounds-checked, and the sanitizer
// build catches any read past a table.
TEST(CameraApiTypesTest, TableNames) {
  auto to_string = [](auto v) { return ToString(v); };
  ExpectTable<PixelFormat>(
      to_string,
      "Raw10|Raw12|Raw16|YCBCR_420_888|YCBCR_420_888_64|YCBCR_420_Custom|YCBCR_420_Custom_64|"
      "YCBCR_420_10B|Jpeg|Hardware_Dependent_YUV|Hardware_Dependent_YUV_64|YCBCR_P010|"
      "YCBCR_P010_M|YCBCR_P010_M_64|YCBCR_420_888_SBWC|YCRCB_420_888_SBWC|"
      "YCBCR_420_888_SBWC_L50|YCBCR_420_888_SBWC_L75|YCBCR_420_SP_M_S10B_SBWC|"
      "YCBCR_420_SP_M_S10B_SBWC_L40|YCBCR_420_SP_M_S10B_SBWC_L60|YCBCR_420_SP_M_S10B_SBWC_L80");
  ExpectTable<Rotation>(to_string, "CCW_0|CCW_90|CCW_180|CCW_270");
  ExpectTable<RequestTemplate>(
      to_string, "Preview|Capture|Video|Video snapshot|Zero shutter lag|Manual", /*first=*/1);
  ExpectTable<TorchModeStatus>(to_string, "Not available|Available off|Available on");
  ExpectTable<CustomDataSpace>(
      to_string, "Unknown|Arbitrary|Depth|Sensor|Dynamic depth|JPEG APP segments|HEIF|Unspecified");
  auto color = [](auto v) { return ColorSpace::ToString(v); };
  ExpectTable<ColorSpace::Standard>(
      color,
      "Unspecified|BT709|BT601_625|BT601_625_Unadjusted|BT601_525|BT601_525_Unadjusted|BT2020|"
      "BT2020_Constant_Luminance|BT470M|Film|DCI_P3|Adobe_RGB");
  ExpectTable<ColorSpace::Transfer>(
      color, "Unspecified|Linear|RGB|SMPTE_170M|Gamma2.2|Gamma2.6|Gamma2.8|ST2084|HLG");
  ExpectTable<ColorSpace::Range>(color, "Unspecified|Full|Limited|Extended");
}

TEST(CameraApiTypesTest, IsRawFormat) {
  for (int64_t v : {int64_t{INT32_MIN}, int64_t{-1}, int64_t{0}, int64_t{1}, int64_t{2}, int64_t{3},
                    int64_t{21}, int64_t{INT32_MAX}}) {
    SCOPED_TRACE(v);
    EXPECT_EQ(IsRawFormat(As<PixelFormat>(v)), v >= 0 && v < 3);
  }
}

TEST(CameraApiTypesTest, DataSpaceText) {
  EXPECT_EQ(
      ToString(DataSpace(ColorSpace{ColorSpace::Standard::kBt2020, ColorSpace::Transfer::kSrgb,
                                    ColorSpace::Range::kLimited})),
      "DataSpace(Color)::(Standard: BT2020, Transfer: RGB, Range: Limited)");
  EXPECT_EQ(ToString(DataSpace(CustomDataSpace::kJpegAppSegments)),
            "DataSpace(Custom)::JPEG APP segments");
}

TEST(CameraApiTypesTest, UsageText) {
  const std::string all =
      "[HwTexture|HwComposer|Protected|HwVideoEncoder|HwCameraWrite|HwCameraRead|HwCameraZsl|"
      "KvuInput]";
  const struct {
    uint64_t usage;
    std::string want;
  } cases[] = {
      {0, "[]"},
      {0x28, "[HwComposer|HwVideoEncoder]"},
      {0x1 | 0x10 | 0x20000000, "[Protected|KvuInput]"},
      {0x1 | 0x4 | 0x200 | (uint64_t{1} << 63), "[]"},
      {0x2 | 0x8 | 0x10 | 0x20 | 0x40 | 0x80 | 0x100 | 0x20000000, all},
      {~uint64_t{0}, all},
      {0x100 | 0x2, "[HwTexture|HwCameraZsl]"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.usage);
    EXPECT_EQ(ToString(c.usage), c.want);
  }
}

}  // namespace
}  // namespace orvex_api
