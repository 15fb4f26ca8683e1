#include "orvex/api/camera/use_case.h"

#include <optional>
#include <string>

#include "gtest/gtest.h"

namespace orvex_api {
namespace {

using android::nuvora_camera_hal::InMemoryCameraMetadata;
using enum StreamMode;
using enum StreamUseCase;

TEST(StreamModeTest, ModesAndPredicates) {
  constexpr std::optional<uint8_t> kNo = std::nullopt;
  // clang-format off
  const struct {  // blob: a BLOB stream beside the YCBCR_420_888 one
    StreamUseCaseSet use_cases; bool blob; uint64_t usage; std::optional<uint8_t> intent, af_mode;
    StreamMode want;
  } cases[] = {
      {{}, true, 0x10, 2, kNo, kProtected}, {{}, true, 0, kNo, kNo, kStillSnapshot},
      {{}, true, 0, kNo, 3, kVideoLiveshot}, {{}, false, 0, 2, kNo, kStillSnapshot},
      {{}, false, 0x20, 1, 3, kStillPreview}, {{}, false, 0x20, kNo, 4, kStillPreview},
      {{kVideoCall}, false, 0, 3, kNo, kVideoRecording}, {{}, true, 0, 2, 3, kStillSnapshot},
      {{kPreviewVideoStill}, false, 0, 3, kNo, kVideoRecording},
      {{kVideoRecord}, false, 0, kNo, 3, kVideoRecording}, {{}, false, 0, 4, kNo, kVideoLiveshot},
      {{kStillCapture}, false, 0, 3, kNo, kVideoPreview},
      {{}, false, 0x20, 3, kNo, kVideoRecording}};
  const struct { uint32_t use_case; uint64_t usage; bool preview, video; } predicates[] = {
      {0, 0, false, false}, {0, 0x2, true, false}, {0, 0x8, true, false}, {0, 0x20, false, true},
      {1, 0x20, true, false}, {2, 0x2A, false, false}, {3, 0, false, true}, {4, 0x2, false, true},
      {5, 0, false, true}, {0xFFFFFFFF, 0x2A, false, false}};
  // clang-format on
  for (const auto& c : predicates) {
    const auto use_case = static_cast<StreamUseCase>(c.use_case);
    EXPECT_EQ(IsPreviewUseCase(use_case, c.usage), c.preview) << c.use_case << " " << c.usage;
    EXPECT_EQ(IsVideoUseCase(use_case, c.usage), c.video) << c.use_case << " " << c.usage;
  }
  for (const auto& c : cases) {
    SCOPED_TRACE(&c - cases);
    HalPixelFormatSet formats = {orvex::HalPixelFormat::YCBCR_420_888};
    if (c.blob) formats.insert(orvex::HalPixelFormat::BLOB);
    EXPECT_EQ(GetStreamMode(c.use_cases, formats, c.usage, c.intent, c.af_mode), c.want);
    InMemoryCameraMetadata request;
    if (c.intent) request.SetUint8(kCaptureIntentTag, {*c.intent, 2});
    if (c.af_mode) request.SetUint8(kAfModeTag, {*c.af_mode});
    EXPECT_EQ(GetStreamMode(c.use_cases, formats, c.usage, request), c.want);
  }
  // An entry with no values counts as absent.
  InMemoryCameraMetadata request;
  request.SetUint8(kCaptureIntentTag, {});
  request.SetUint8(kAfModeTag, {3});
  EXPECT_EQ(GetStreamMode({kVideoRecord}, {}, 0, request), kVideoRecording);
}

TEST(UseCaseTest, DebugStr) {
  const UseCase use_case(kVideoLiveshot, true, false, true, false,
                         ColorSpace{ColorSpace::Standard::kBt709, ColorSpace::Transfer::kSrgb,
                                    ColorSpace::Range::kFull},
                         static_cast<DynamicRangeProfile>(0));
  EXPECT_EQ(use_case.DebugStr(),
            "{type: UseCase, mode: kVideoLiveshot, torch_enabled: true, hdrnet_enabled: false, "
            "lowlux_enabled: true, camera_app_1p_enabled: false, color_space standard: BT709, "
            "color_space transfer: RGB, color_space range: Full, dynamic_range_profile: HLG10}");
  std::string names;
  for (uint32_t m = 0; m <= 6; ++m)
    names += std::string(ToString(static_cast<StreamMode>(m))) + "|";
  EXPECT_EQ(names,
            "kStillPreview|kStillSnapshot|kVideoPreview|kVideoRecording|kVideoLiveshot|"
            "kProtected||");
}

}  // namespace
}  // namespace orvex_api
