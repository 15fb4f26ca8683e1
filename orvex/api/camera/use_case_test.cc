#include "orvex/api/camera/use_case.h"

#include <optional>
#include <sstream>
#include <string>
#include <vector>

#include "absl/strings/str_split.h"
#include "gtest/gtest.h"

namespace orvex_api {
namespace {

using android::nuvora_camera_hal::InMemoryCameraMetadata;
using orvex::HalPixelFormat;

constexpr std::optional<uint8_t> kAbsent = std::nullopt;

struct ModeCase {
  const char* name;
  StreamUseCaseSet use_cases;
  HalPixelFormatSet formats;
  uint64_t usage;
  std::optional<uint8_t> intent;
  std::optional<uint8_t> af_mode;
  StreamMode want;
};

std::vector<ModeCase> ModeCases() {
  const HalPixelFormatSet blob = {HalPixelFormat::BLOB, HalPixelFormat::YCBCR_420_888};
  const HalPixelFormatSet yuv = {HalPixelFormat::YCBCR_420_888};
  return {
      {"protected usage wins", {}, blob, 0x10, 2, kAbsent, StreamMode::kProtected},
      {"protected with recording",
       {StreamUseCase::kVideoRecord},
       yuv,
       0x30,
       3,
       3,
       StreamMode::kProtected},
      {"blob alone", {}, blob, 0, kAbsent, kAbsent, StreamMode::kStillSnapshot},
      {"blob with continuous video", {}, blob, 0, kAbsent, 3, StreamMode::kVideoLiveshot},
      {"still intent without blob", {}, yuv, 0, 2, kAbsent, StreamMode::kStillSnapshot},
      {"intent hides af mode", {}, yuv, 0x20, 1, 3, StreamMode::kStillPreview},
      {"nothing", {}, yuv, 0, kAbsent, kAbsent, StreamMode::kStillPreview},
      {"af mode other than 3", {}, yuv, 0x20, kAbsent, 4, StreamMode::kStillPreview},
      {"video intent only",
       {StreamUseCase::kPreview},
       yuv,
       0x2,
       3,
       kAbsent,
       StreamMode::kVideoPreview},
      {"video intent with video call",
       {StreamUseCase::kVideoCall},
       yuv,
       0,
       3,
       kAbsent,
       StreamMode::kVideoRecording},
      {"video intent with use case 4",
       {StreamUseCase::kPreviewVideoStill},
       yuv,
       0,
       3,
       kAbsent,
       StreamMode::kVideoRecording},
      {"video intent with still capture use case",
       {StreamUseCase::kStillCapture},
       yuv,
       0,
       3,
       kAbsent,
       StreamMode::kVideoPreview},
      {"video intent with encoder usage", {}, yuv, 0x20, 3, kAbsent, StreamMode::kVideoRecording},
      {"af mode alone records",
       {StreamUseCase::kVideoRecord},
       yuv,
       0,
       kAbsent,
       3,
       StreamMode::kVideoRecording},
      {"intent 4 counts twice", {}, yuv, 0, 4, kAbsent, StreamMode::kVideoLiveshot},
      {"still intent with af mode hidden", {}, blob, 0, 2, 3, StreamMode::kStillSnapshot},
  };
}

TEST(StreamModeTest, FiveArgumentForm) {
  for (const ModeCase& c : ModeCases()) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(GetStreamMode(c.use_cases, c.formats, c.usage, c.intent, c.af_mode), c.want);
  }
}

// The metadata form must agree with the five-argument form on every case,
// and an entry with no values must count as absent.
TEST(StreamModeTest, MetadataForm) {
  for (const ModeCase& c : ModeCases()) {
    SCOPED_TRACE(c.name);
    InMemoryCameraMetadata request;
    if (c.intent) request.SetUint8(kCaptureIntentTag, {*c.intent, 2});
    if (c.af_mode) request.SetUint8(kAfModeTag, {*c.af_mode});
    EXPECT_EQ(GetStreamMode(c.use_cases, c.formats, c.usage, request), c.want);
  }
  const HalPixelFormatSet yuv = {HalPixelFormat::YCBCR_420_888};
  InMemoryCameraMetadata request;
  request.SetUint8(kCaptureIntentTag, {});  // Exists, no values: absent.
  request.SetUint8(kAfModeTag, {3});
  EXPECT_EQ(GetStreamMode({StreamUseCase::kVideoRecord}, yuv, 0, request),
            StreamMode::kVideoRecording);
  // An intent stored with another type is not an unsigned 8-bit entry.
  request.SetInt32(kCaptureIntentTag, {1});
  EXPECT_EQ(GetStreamMode({}, yuv, 0, request), StreamMode::kVideoPreview);
  request.SetUint8(kCaptureIntentTag, {1});
  EXPECT_EQ(GetStreamMode({}, yuv, 0, request), StreamMode::kStillPreview);
}

TEST(StreamModeTest, UseCasePredicates) {
  const struct {
    uint32_t use_case;
    uint64_t usage;
    bool preview;
    bool video;
  } cases[] = {
      {0, 0, false, false},    {0, 0x2, true, false},
      {0, 0x8, true, false},   {0, 0x20, false, true},
      {0, 0x2A, true, true},   {1, 0, true, false},
      {1, 0x20, true, false},  {2, 0x8, false, false},
      {2, 0x20, false, false}, {3, 0, false, true},
      {4, 0x2, false, true},   {5, 0, false, true},
      {6, 0x2A, false, false}, {0xFFFFFFFF, 0x2A, false, false},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(testing::Message() << "use case " << c.use_case << " usage " << c.usage);
    const auto use_case = static_cast<StreamUseCase>(c.use_case);
    EXPECT_EQ(IsPreviewUseCase(use_case, c.usage), c.preview);
    EXPECT_EQ(IsVideoUseCase(use_case, c.usage), c.video);
  }
}

TEST(UseCaseTest, DebugStr) {
  const UseCase use_case(StreamMode::kVideoLiveshot, true, false, true, false,
                         ColorSpace{ColorSpace::Standard::kBt709, ColorSpace::Transfer::kSrgb,
                                    ColorSpace::Range::kFull},
                         static_cast<DynamicRangeProfile>(0));
  EXPECT_EQ(use_case.DebugStr(),
            "{type: UseCase, mode: kVideoLiveshot, torch_enabled: true, hdrnet_enabled: false, "
            "lowlux_enabled: true, camera_app_1p_enabled: false, color_space standard: BT709, "
            "color_space transfer: RGB, color_space range: Full, dynamic_range_profile: HLG10}");
  // Streaming a Printable writes its DebugStr.
  std::ostringstream os;
  os << use_case;
  EXPECT_EQ(os.str(), use_case.DebugStr());
  const std::vector<std::string> names = absl::StrSplit(
      "kStillPreview|kStillSnapshot|kVideoPreview|kVideoRecording|kVideoLiveshot|kProtected", '|');
  for (uint32_t m = 0; m < names.size(); ++m) {
    EXPECT_EQ(ToString(static_cast<StreamMode>(m)), names[m]);
  }
  EXPECT_EQ(ToString(static_cast<StreamMode>(6)), "");
  EXPECT_EQ(ToString(static_cast<StreamMode>(0xFFFFFFFF)), "");
}

}  // namespace
}  // namespace orvex_api
