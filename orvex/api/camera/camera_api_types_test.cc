#include "orvex/api/camera/camera_api_types.h"

#include <cstdint>
#include <string>
#include <string_view>

#include "gtest/gtest.h"

namespace orvex_api {
namespace {

template <typename E>
E As(int64_t v) {
  return static_cast<E>(v);
}

template <typename... Names>
std::string Joined(Names... names) {
  std::string out;
  ((out += std::string(names) + "|"), ...);
  return out;
}

TEST(CameraApiTypesTest, TwoWayNames) {
  EXPECT_EQ(Joined(ToString(StreamType::kInput), ToString(As<StreamType>(2)),
                   ToString(StreamType::kOutput), ToString(FrameStatus::kOk),
                   ToString(As<FrameStatus>(-1)), ToString(TorchMode::kOff),
                   ToString(As<TorchMode>(9)), ToString(CameraDeviceStatus::kNotPresent),
                   ToString(As<CameraDeviceStatus>(3)), ToString(StreamConfigurationMode::kNormal),
                   ToString(As<StreamConfigurationMode>(0x8000)),
                   ToString(DynamicRangeProfile::kStandard), ToString(As<DynamicRangeProfile>(0))),
            "Input|Input|Output|OK|Error|Off|On|Not present|Present|Normal|Constrained high "
            "speed|Standard|HLG10|");
}

// A name table of `count` entries from value `first`: its two ends print
// their names, and the values just outside it (and the extremes) print empty.
// The sanitizer build catches any read past a table.
template <typename E, typename F>
void ExpectTable(F to_string, int count, const char* first_name, const char* last_name,
                 int first = 0) {
  SCOPED_TRACE(first_name);
  EXPECT_EQ(to_string(As<E>(first)), first_name);
  EXPECT_EQ(to_string(As<E>(first + count - 1)), last_name);
  for (int64_t v : {int64_t{first} - 1, int64_t{first} + count, int64_t{INT32_MIN}}) {
    EXPECT_EQ(to_string(As<E>(v)), "") << v;
  }
}

TEST(CameraApiTypesTest, TableNames) {
  auto to_string = [](auto v) { return ToString(v); };
  ExpectTable<PixelFormat>(to_string, 22, "Raw10", "YCBCR_420_SP_M_S10B_SBWC_L80");
  ExpectTable<Rotation>(to_string, 4, "CCW_0", "CCW_270");
  ExpectTable<RequestTemplate>(to_string, 6, "Preview", "Manual", /*first=*/1);
  ExpectTable<TorchModeStatus>(to_string, 3, "Not available", "Available on");
  ExpectTable<CustomDataSpace>(to_string, 8, "Unknown", "Unspecified");
  auto color = [](auto v) { return ColorSpace::ToString(v); };
  ExpectTable<ColorSpace::Standard>(color, 12, "Unspecified", "Adobe_RGB");
  ExpectTable<ColorSpace::Transfer>(color, 9, "Unspecified", "HLG");
  ExpectTable<ColorSpace::Range>(color, 4, "Unspecified", "Extended");
  for (int64_t v : {int64_t{INT32_MIN}, int64_t{-1}, int64_t{0}, int64_t{2}, int64_t{3}}) {
    EXPECT_EQ(IsRawFormat(As<PixelFormat>(v)), v >= 0 && v < 3) << v;
  }
}

TEST(CameraApiTypesTest, DataSpaceAndUsageTexts) {
  EXPECT_EQ(
      ToString(DataSpace(ColorSpace{ColorSpace::Standard::kBt2020, ColorSpace::Transfer::kSrgb,
                                    ColorSpace::Range::kLimited})),
      "DataSpace(Color)::(Standard: BT2020, Transfer: RGB, Range: Limited)");
  EXPECT_EQ(ToString(DataSpace(CustomDataSpace::kJpegAppSegments)),
            "DataSpace(Custom)::JPEG APP segments");
  const std::string all =
      "[HwTexture|HwComposer|Protected|HwVideoEncoder|HwCameraWrite|HwCameraRead|HwCameraZsl|"
      "KvuInput]";
  const std::pair<uint64_t, std::string> cases[] = {
      {0, "[]"},
      {0x28, "[HwComposer|HwVideoEncoder]"},
      {0x1 | 0x10 | 0x20000000, "[Protected|KvuInput]"},
      {0x1 | 0x4 | 0x200 | (uint64_t{1} << 63), "[]"},
      {0x2 | 0x8 | 0x10 | 0x20 | 0x40 | 0x80 | 0x100 | 0x20000000, all}};
  for (const auto& [usage, want] : cases) EXPECT_EQ(ToString(usage), want) << usage;
}

}  // namespace
}  // namespace orvex_api
