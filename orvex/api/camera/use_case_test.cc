#include "orvex/api/camera/use_case.h"

#include <optional>
#include <sstream>
#include <string>

#include "gtest/gtest.h"

namespace orvex_api {
namespace {

using android::nuvora_camera_hal::InMemoryCameraMetadata;
using enum StreamMode;
using enum StreamUseCase;

constexpr std::optional<uint8_t> kAbsent = std::nullopt;

struct ModeCase {
  StreamUseCaseSet use_cases;
  bool blob;  // a BLOB stream beside the YCBCR_420_888 one
  uint64_t usage;
  std::optional<uint8_t> intent;
  std::optional<uint8_t> af_mode;
  StreamMode want;
};

const ModeCase kModeCases[] = {
    {{}, true, 0x10, 2, kAbsent, kProtected},  // Protected usage wins.
    {{kVideoRecord}, false, 0x30, 3, 3, kProtected},
    {{}, true, 0, kAbsent, kAbsent, kStillSnapshot},
    {{}, true, 0, kAbsent, 3, kVideoLiveshot},
    {{}, false, 0, 2, kAbsent, kStillSnapshot},
    {{}, false, 0x20, 1, 3, kStillPreview},  // A present intent hides the af mode.
    {{}, false, 0, kAbsent, kAbsent, kStillPreview},
    {{}, false, 0x20, kAbsent, 4, kStillPreview},
    {{kPreview}, false, 0x2, 3, kAbsent, kVideoPreview},
    {{kVideoCall}, false, 0, 3, kAbsent, kVideoRecording},
    {{kPreviewVideoStill}, false, 0, 3, kAbsent, kVideoRecording},
    {{kStillCapture}, false, 0, 3, kAbsent, kVideoPreview},
    {{}, false, 0x20, 3, kAbsent, kVideoRecording},
    {{kVideoRecord}, false, 0, kAbsent, 3, kVideoRecording},
    {{}, false, 0, 4, kAbsent, kVideoLiveshot},  // Intent 4 is recording and snapshot.
    {{}, true, 0, 2, 3, kStillSnapshot},
};

// The metadata form must agree with the five-argument form on every case.
TEST(StreamModeTest, BothForms) {
  for (size_t i = 0; i < std::size(kModeCases); ++i) {
    SCOPED_TRACE(i);
    const ModeCase& c = kModeCases[i];
    HalPixelFormatSet formats = {orvex::HalPixelFormat::YCBCR_420_888};
    if (c.blob) formats.insert(orvex::HalPixelFormat::BLOB);
    EXPECT_EQ(GetStreamMode(c.use_cases, formats, c.usage, c.intent, c.af_mode), c.want);
    InMemoryCameraMetadata request;
    if (c.intent) request.SetUint8(kCaptureIntentTag, {*c.intent, 2});
    if (c.af_mode) request.SetUint8(kAfModeTag, {*c.af_mode});
    EXPECT_EQ(GetStreamMode(c.use_cases, formats, c.usage, request), c.want);
  }
  // An entry with no values, or of another type, counts as absent.
  const HalPixelFormatSet yuv = {orvex::HalPixelFormat::YCBCR_420_888};
  InMemoryCameraMetadata request;
  request.SetUint8(kCaptureIntentTag, {});
  request.SetUint8(kAfModeTag, {3});
  EXPECT_EQ(GetStreamMode({kVideoRecord}, yuv, 0, request), kVideoRecording);
  request.SetInt32(kCaptureIntentTag, {1});
  EXPECT_EQ(GetStreamMode({}, yuv, 0, request), kVideoPreview);
}

TEST(StreamModeTest, UseCasePredicates) {
  const struct {
    uint32_t use_case;
    uint64_t usage;
    bool preview;
    bool video;
  } cases[] = {{0, 0, false, false},    {0, 0x2, true, false},           {0, 0x8, true, false},
               {0, 0x20, false, true},  {0, 0x2A, true, true},           {1, 0, true, false},
               {1, 0x20, true, false},  {2, 0x8, false, false},          {2, 0x20, false, false},
               {3, 0, false, true},     {4, 0x2, false, true},           {5, 0, false, true},
               {6, 0x2A, false, false}, {0xFFFFFFFF, 0x2A, false, false}};
  for (const auto& c : cases) {
    SCOPED_TRACE(testing::Message() << "use case " << c.use_case << " usage " << c.usage);
    EXPECT_EQ(IsPreviewUseCase(static_cast<StreamUseCase>(c.use_case), c.usage), c.preview);
    EXPECT_EQ(IsVideoUseCase(static_cast<StreamUseCase>(c.use_case), c.usage), c.video);
  }
}

TEST(UseCaseTest, DebugStr) {
  const UseCase use_case(kVideoLiveshot, true, false, true, false,
                         ColorSpace{ColorSpace::Standard::kBt709, ColorSpace::Transfer::kSrgb,
                                    ColorSpace::Range::kFull},
                         static_cast<DynamicRangeProfile>(0));
  std::ostringstream os;
  os << use_case;
  EXPECT_EQ(os.str(),
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
