#ifndef ORVEX_API_CAMERA_CAMERA_API_TYPES_H_
#define ORVEX_API_CAMERA_CAMERA_API_TYPES_H_

// The small enumerations of the camera API and the names that every layer
// prints for them, so that logs read the same everywhere.
//
// The ToString overloads return views of static text and never allocate.
// Enumerations whose text depends on one comparison (stream type, frame
// status, torch mode, device status, configuration mode, dynamic range
// profile) print their second name for every value but the tested one.
// Table-driven enumerations print an empty view for values outside their
// table; no lookup reads outside its table.
//
// Thread safety: pure functions and plain values.

#include <cstdint>
#include <string>
#include <string_view>
#include <variant>

#include "orvex/base/export.h"

namespace orvex_api {

// 0 is the input stream; every other value prints "Output" only when it is 1.
enum class StreamType : int32_t {
  kInput = 0,
  kOutput = 1,
};

// The API's own stream format list (not the HAL pixel format codes).
enum class PixelFormat : int32_t {
  kRaw10 = 0,
  kRaw12 = 1,
  kRaw16 = 2,
  kYcbcr420_888 = 3,
  kYcbcr420_888_64 = 4,
  kYcbcr420Custom = 5,
  kYcbcr420Custom64 = 6,
  kYcbcr420_10b = 7,
  kJpeg = 8,
  kHardwareDependentYuv = 9,
  kHardwareDependentYuv64 = 10,
  kYcbcrP010 = 11,
  kYcbcrP010M = 12,
  kYcbcrP010M64 = 13,
  kYcbcr420_888Sbwc = 14,
  kYcrcb420_888Sbwc = 15,
  kYcbcr420_888SbwcL50 = 16,
  kYcbcr420_888SbwcL75 = 17,
  kYcbcr420SpMS10bSbwc = 18,
  kYcbcr420SpMS10bSbwcL40 = 19,
  kYcbcr420SpMS10bSbwcL60 = 20,
  kYcbcr420SpMS10bSbwcL80 = 21,
};

// Counter-clockwise rotation of a stream.
enum class Rotation : int32_t {
  kCcw0 = 0,
  kCcw90 = 1,
  kCcw180 = 2,
  kCcw270 = 3,
};

enum class FrameStatus : int32_t {
  kOk = 0,
  kError = 1,
};

// Request templates are numbered from 1.
enum class RequestTemplate : int32_t {
  kPreview = 1,
  kCapture = 2,
  kVideo = 3,
  kVideoSnapshot = 4,
  kZeroShutterLag = 5,
  kManual = 6,
};

enum class TorchMode : int32_t {
  kOff = 0,
  kOn = 1,
};

enum class TorchModeStatus : int32_t {
  kNotAvailable = 0,
  kAvailableOff = 1,
  kAvailableOn = 2,
};

enum class CameraDeviceStatus : int32_t {
  kNotPresent = 0,
  kPresent = 1,
};

// Data spaces that are not described by a colour space.
enum class CustomDataSpace : int32_t {
  kUnknown = 0,
  kArbitrary = 1,
  kDepth = 2,
  kSensor = 3,
  kDynamicDepth = 4,
  kJpegAppSegments = 5,
  kHeif = 6,
  kUnspecified = 7,
};

enum class StreamConfigurationMode : int32_t {
  kNormal = 0,
  kConstrainedHighSpeed = 1,
};

// Only kStandard prints "Standard"; every other value prints "HLG10".
enum class DynamicRangeProfile : int32_t {
  kStandard = 1,
  kHlg10 = 2,
};

// The three parts of a colour data space, numbered densely from 0.
struct ColorSpace {
  enum class Standard : int32_t {
    kUnspecified = 0,
    kBt709 = 1,
    kBt601_625 = 2,
    kBt601_625Unadjusted = 3,
    kBt601_525 = 4,
    kBt601_525Unadjusted = 5,
    kBt2020 = 6,
    kBt2020ConstantLuminance = 7,
    kBt470M = 8,
    kFilm = 9,
    kDciP3 = 10,
    kAdobeRgb = 11,
  };
  enum class Transfer : int32_t {
    kUnspecified = 0,
    kLinear = 1,
    kSrgb = 2,  // Printed as "RGB".
    kSmpte170M = 3,
    kGamma2_2 = 4,
    kGamma2_6 = 5,
    kGamma2_8 = 6,
    kSt2084 = 7,
    kHlg = 8,
  };
  enum class Range : int32_t {
    kUnspecified = 0,
    kFull = 1,
    kLimited = 2,
    kExtended = 3,
  };

  Standard standard = Standard::kUnspecified;
  Transfer transfer = Transfer::kUnspecified;
  Range range = Range::kUnspecified;

  ORVEX_EXPORT static std::string_view ToString(Standard standard);
  ORVEX_EXPORT static std::string_view ToString(Transfer transfer);
  ORVEX_EXPORT static std::string_view ToString(Range range);

  friend bool operator==(const ColorSpace&, const ColorSpace&) = default;
};

// A stream's data space: a colour space or one of the custom data spaces.
using DataSpace = std::variant<ColorSpace, CustomDataSpace>;

// Buffer usage flags: an unsigned 64-bit bit set. The named bits, in the
// order in which ToString(uint64_t) prints them.
inline constexpr uint64_t kUsageHwTexture = 0x2;
inline constexpr uint64_t kUsageHwComposer = 0x8;
inline constexpr uint64_t kUsageProtected = 0x10;
inline constexpr uint64_t kUsageHwVideoEncoder = 0x20;
inline constexpr uint64_t kUsageHwCameraWrite = 0x40;
inline constexpr uint64_t kUsageHwCameraRead = 0x80;
inline constexpr uint64_t kUsageHwCameraZsl = 0x100;
inline constexpr uint64_t kUsageKvuInput = 0x20000000;

ORVEX_EXPORT std::string_view ToString(StreamType type);
ORVEX_EXPORT std::string_view ToString(PixelFormat format);
ORVEX_EXPORT std::string_view ToString(Rotation rotation);
ORVEX_EXPORT std::string_view ToString(FrameStatus status);
ORVEX_EXPORT std::string_view ToString(RequestTemplate request_template);
ORVEX_EXPORT std::string_view ToString(TorchMode mode);
ORVEX_EXPORT std::string_view ToString(TorchModeStatus status);
ORVEX_EXPORT std::string_view ToString(CameraDeviceStatus status);
ORVEX_EXPORT std::string_view ToString(CustomDataSpace data_space);
ORVEX_EXPORT std::string_view ToString(StreamConfigurationMode mode);
ORVEX_EXPORT std::string_view ToString(DynamicRangeProfile profile);

// True exactly for kRaw10, kRaw12 and kRaw16.
ORVEX_EXPORT bool IsRawFormat(PixelFormat format);

// "DataSpace(Color)::(Standard: <s>, Transfer: <t>, Range: <r>)" for a
// colour space, "DataSpace(Custom)::<name>" for a custom data space.
ORVEX_EXPORT std::string ToString(const DataSpace& data_space);

// The names of the set named bits, in table order, joined by "|" inside
// "[" and "]"; bits without a name are left out. 0 prints "[]".
ORVEX_EXPORT std::string ToString(uint64_t usage);

}  // namespace orvex_api

#endif  // ORVEX_API_CAMERA_CAMERA_API_TYPES_H_
