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

// A table of `count` names from value `first`: its ends, and empty outside it.
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

TEST(CameraApiTypesTest, Names) {
  std::string out;
  for (std::string_view name :
       {ToString(As<StreamType>(0)), ToString(As<StreamType>(2)), ToString(StreamType::kOutput),
        ToString(FrameStatus::kOk), ToString(As<FrameStatus>(-1)), ToString(TorchMode::kOff),
        ToString(As<TorchMode>(9)), ToString(CameraDeviceStatus::kNotPresent),
        ToString(As<CameraDeviceStatus>(3)), ToString(StreamConfigurationMode::kNormal),
        ToString(As<StreamConfigurationMode>(0x8000)), ToString(DynamicRangeProfile::kStandard),
        ToString(As<DynamicRangeProfile>(0))}) {
    out += std::string(name) + "|";
  }
  EXPECT_EQ(out,
            "Input|Input|Output|OK|Error|Off|On|Not present|Present|Normal|Constrained high "
            "speed|Standard|HLG10|");
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
  std::string raw;
  for (int v : {INT32_MIN, -1, 0, 2, 3}) raw += IsRawFormat(As<PixelFormat>(v)) ? '1' : '0';
  EXPECT_EQ(raw, "00110");
}

TEST(CameraApiTypesTest, DataSpaceAndUsageTexts) {
  EXPECT_EQ(
      ToString(DataSpace(ColorSpace{ColorSpace::Standard::kBt2020, ColorSpace::Transfer::kSrgb,
                                    ColorSpace::Range::kLimited})),
      "DataSpace(Color)::(Standard: BT2020, Transfer: RGB, Range: Limited)");
  EXPECT_EQ(ToString(DataSpace(CustomDataSpace::kJpegAppSegments)),
            "DataSpace(Custom)::JPEG APP segments");
  // clang-format off
  const std::pair<uint64_t, std::string> cases[] = {
      {0, "[]"}, {0x1 | 0x10 | 0x20000000, "[Protected|KvuInput]"},
      {0x4 | 0x200 | 1ull << 63, "[]"},
      {0x1EA, "[HwTexture|HwComposer|HwVideoEncoder|HwCameraWrite|HwCameraRead|HwCameraZsl]"}};
  // clang-format on
  for (const auto& [usage, want] : cases) EXPECT_EQ(ToString(usage), want) << usage;
}

}  // namespace
}  // namespace orvex_api
