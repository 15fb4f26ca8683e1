#ifndef ORVEX_API_CAMERA_USE_CASE_H_
#define ORVEX_API_CAMERA_USE_CASE_H_

// The processing mode of a stream configuration, decided from the streams'
// use cases, pixel formats and usage flags and from two request settings,
// and the UseCase record that carries the mode with the configuration's
// feature switches and colour description.
//
//   StreamMode mode = GetStreamMode(use_cases, formats, usage, request);
//   UseCase use_case(mode, torch, hdrnet, lowlux, app_1p, color_space, profile);
//   ORVEX_LOG(INFO) << use_case;  // {type: UseCase, mode: kVideoPreview, ...}
//
// Request settings are optional unsigned 8-bit values: the capture intent
// (android.control.captureIntent, tag 0x1000D) and the auto-focus mode
// (android.control.afMode, tag 0x10007).
//
// Thread safety: everything here is stateless; UseCase is an immutable value.

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "absl/container/flat_hash_set.h"
#include "camera/CameraMetadata.h"
#include "orvex/api/camera/camera_api_types.h"
#include "orvex/api/memory/hal_pixel_format.h"
#include "orvex/base/export.h"
#include "orvex/status/printable.h"

namespace orvex_api {

enum class StreamMode : uint32_t {
  kStillPreview = 0,
  kStillSnapshot = 1,
  kVideoPreview = 2,
  kVideoRecording = 3,
  kVideoLiveshot = 4,
  kProtected = 5,
};

// Android stream use cases. Values 6 and above are valid inputs too.
enum class StreamUseCase : uint32_t {
  kDefault = 0,  // No use case declared.
  kPreview = 1,
  kStillCapture = 2,
  kVideoRecord = 3,
  kPreviewVideoStill = 4,
  kVideoCall = 5,
};

// Request setting tags and the values consulted here.
inline constexpr uint32_t kCaptureIntentTag = 0x1000D;
inline constexpr uint32_t kAfModeTag = 0x10007;
inline constexpr uint8_t kCaptureIntentStillCapture = 2;
inline constexpr uint8_t kCaptureIntentVideoRecord = 3;
inline constexpr uint8_t kCaptureIntentVideoSnapshot = 4;
inline constexpr uint8_t kAfModeContinuousVideo = 3;

using StreamUseCaseSet = absl::flat_hash_set<StreamUseCase>;
using HalPixelFormatSet = absl::flat_hash_set<orvex::HalPixelFormat>;

// The mode's enumerator name ("kStillPreview"...); empty outside 0 to 5.
ORVEX_EXPORT std::string_view ToString(StreamMode mode);

// kPreview: true; another declared use case: false; kDefault: true when the
// usage has HwTexture or HwComposer.
ORVEX_EXPORT bool IsPreviewUseCase(StreamUseCase use_case, uint64_t usage);

// kVideoRecord, kPreviewVideoStill, kVideoCall: true; another declared use
// case: false; kDefault: true when the usage has HwVideoEncoder.
ORVEX_EXPORT bool IsVideoUseCase(StreamUseCase use_case, uint64_t usage);

// A present capture intent decides alone (video record or video snapshot);
// otherwise the auto-focus mode must be continuous video.
ORVEX_EXPORT bool GetRecordingHint(std::optional<uint8_t> capture_intent,
                                   std::optional<uint8_t> af_mode);

// Still capture or video snapshot intent, or else a BLOB stream.
ORVEX_EXPORT bool GetSnapshotHint(const HalPixelFormatSet& formats,
                                  std::optional<uint8_t> capture_intent);

// The mode of a configuration: protected usage wins; then a snapshot is a
// liveshot when recording and a still snapshot otherwise; then no recording
// is still preview; then recording is video recording when a video use case
// is declared or the usage has HwVideoEncoder, and video preview otherwise.
// `usage` is the union of the streams' usage flags.
ORVEX_EXPORT StreamMode GetStreamMode(const StreamUseCaseSet& use_cases,
                                      const HalPixelFormatSet& formats, uint64_t usage,
                                      std::optional<uint8_t> capture_intent,
                                      std::optional<uint8_t> af_mode);

// As above, with the two settings read from `request`: a setting is present
// when its unsigned 8-bit entry holds at least one value, and is the first.
ORVEX_EXPORT StreamMode GetStreamMode(const StreamUseCaseSet& use_cases,
                                      const HalPixelFormatSet& formats, uint64_t usage,
                                      const android::nuvora_camera_hal::CameraMetadata& request);

class ORVEX_EXPORT UseCase : public orvex::Printable {
 public:
  UseCase(StreamMode mode, bool torch_enabled, bool hdrnet_enabled, bool lowlux_enabled,
          bool camera_app_1p_enabled, ColorSpace color_space,
          DynamicRangeProfile dynamic_range_profile);

  StreamMode mode() const { return mode_; }
  bool torch_enabled() const { return torch_enabled_; }
  bool hdrnet_enabled() const { return hdrnet_enabled_; }
  bool lowlux_enabled() const { return lowlux_enabled_; }
  bool camera_app_1p_enabled() const { return camera_app_1p_enabled_; }
  const ColorSpace& color_space() const { return color_space_; }
  DynamicRangeProfile dynamic_range_profile() const { return dynamic_range_profile_; }

  // "{type: UseCase, mode: <name>, torch_enabled: <bool>, hdrnet_enabled: ...,
  // lowlux_enabled: ..., camera_app_1p_enabled: ..., color_space standard: ...,
  // color_space transfer: ..., color_space range: ..., dynamic_range_profile: ...}".
  // A stored mode outside 0 to 5 prints an empty name.
  std::string DebugStr() const override;

 private:
  StreamMode mode_;
  bool torch_enabled_;
  bool hdrnet_enabled_;
  bool lowlux_enabled_;
  bool camera_app_1p_enabled_;
  ColorSpace color_space_;
  DynamicRangeProfile dynamic_range_profile_;
};

}  // namespace orvex_api

#endif  // ORVEX_API_CAMERA_USE_CASE_H_
