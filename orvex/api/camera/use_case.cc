#include "orvex/api/camera/use_case.h"

#include <array>

namespace orvex_api {
namespace {

using namespace std::string_view_literals;

constexpr std::array kStreamModeNames = {
    "kStillPreview"sv,   "kStillSnapshot"sv, "kVideoPreview"sv,
    "kVideoRecording"sv, "kVideoLiveshot"sv, "kProtected"sv,
};

std::optional<uint8_t> FirstValue(const android::nuvora_camera_hal::CameraMetadata& request,
                                  uint32_t tag) {
  const auto entry = request.GetUint8Entry(tag);
  if (entry.empty()) return std::nullopt;
  return entry[0];
}

std::string_view BoolText(bool value) { return value ? "true" : "false"; }

}  // namespace

std::string_view ToString(StreamMode mode) {
  const auto index = static_cast<uint32_t>(mode);
  return index < kStreamModeNames.size() ? kStreamModeNames[index] : std::string_view();
}

bool IsPreviewUseCase(StreamUseCase use_case, uint64_t usage) {
  if (use_case == StreamUseCase::kPreview) return true;
  if (use_case != StreamUseCase::kDefault) return false;
  return (usage & (kUsageHwTexture | kUsageHwComposer)) != 0;
}

bool IsVideoUseCase(StreamUseCase use_case, uint64_t usage) {
  switch (use_case) {
    case StreamUseCase::kVideoRecord:
    case StreamUseCase::kPreviewVideoStill:
    case StreamUseCase::kVideoCall:
      return true;
    case StreamUseCase::kDefault:
      return (usage & kUsageHwVideoEncoder) != 0;
    default:
      return false;
  }
}

bool GetRecordingHint(std::optional<uint8_t> capture_intent, std::optional<uint8_t> af_mode) {
  if (capture_intent.has_value()) {
    return *capture_intent == kCaptureIntentVideoRecord ||
           *capture_intent == kCaptureIntentVideoSnapshot;
  }
  return af_mode == kAfModeContinuousVideo;
}

bool GetSnapshotHint(const HalPixelFormatSet& formats, std::optional<uint8_t> capture_intent) {
  if (capture_intent == kCaptureIntentStillCapture ||
      capture_intent == kCaptureIntentVideoSnapshot) {
    return true;
  }
  return formats.contains(orvex::HalPixelFormat::BLOB);
}

StreamMode GetStreamMode(const StreamUseCaseSet& use_cases, const HalPixelFormatSet& formats,
                         uint64_t usage, std::optional<uint8_t> capture_intent,
                         std::optional<uint8_t> af_mode) {
  const bool recording = GetRecordingHint(capture_intent, af_mode);
  const bool snapshot = GetSnapshotHint(formats, capture_intent);
  if ((usage & kUsageProtected) != 0) return StreamMode::kProtected;
  if (snapshot) return recording ? StreamMode::kVideoLiveshot : StreamMode::kStillSnapshot;
  if (!recording) return StreamMode::kStillPreview;
  if (use_cases.contains(StreamUseCase::kVideoRecord) ||
      use_cases.contains(StreamUseCase::kPreviewVideoStill) ||
      use_cases.contains(StreamUseCase::kVideoCall)) {
    return StreamMode::kVideoRecording;
  }
  return (usage & kUsageHwVideoEncoder) != 0 ? StreamMode::kVideoRecording
                                             : StreamMode::kVideoPreview;
}

StreamMode GetStreamMode(const StreamUseCaseSet& use_cases, const HalPixelFormatSet& formats,
                         uint64_t usage,
                         const android::nuvora_camera_hal::CameraMetadata& request) {
  return GetStreamMode(use_cases, formats, usage, FirstValue(request, kCaptureIntentTag),
                       FirstValue(request, kAfModeTag));
}

UseCase::UseCase(StreamMode mode, bool torch_enabled, bool hdrnet_enabled, bool lowlux_enabled,
                 bool camera_app_1p_enabled, ColorSpace color_space,
                 DynamicRangeProfile dynamic_range_profile)
    : mode_(mode),
      torch_enabled_(torch_enabled),
      hdrnet_enabled_(hdrnet_enabled),
      lowlux_enabled_(lowlux_enabled),
      camera_app_1p_enabled_(camera_app_1p_enabled),
      color_space_(color_space),
      dynamic_range_profile_(dynamic_range_profile) {}

std::string UseCase::DebugStr() const {
  return orvex::BuildOrvexDebugStr(
      "UseCase", {
                     {"mode", ToString(mode_)},
                     {"torch_enabled", BoolText(torch_enabled_)},
                     {"hdrnet_enabled", BoolText(hdrnet_enabled_)},
                     {"lowlux_enabled", BoolText(lowlux_enabled_)},
                     {"camera_app_1p_enabled", BoolText(camera_app_1p_enabled_)},
                     {"color_space standard", ColorSpace::ToString(color_space_.standard)},
                     {"color_space transfer", ColorSpace::ToString(color_space_.transfer)},
                     {"color_space range", ColorSpace::ToString(color_space_.range)},
                     {"dynamic_range_profile", ToString(dynamic_range_profile_)},
                 });
}

}  // namespace orvex_api
