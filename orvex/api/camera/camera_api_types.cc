#include "orvex/api/camera/camera_api_types.h"

#include <array>
#include <cstddef>
#include <type_traits>
#include <utility>

namespace orvex_api {
namespace {

using namespace std::string_view_literals;

// The name of `value` in a dense table starting at `first`; empty outside
// the table. The comparison is done on the unsigned distance from `first`,
// so negative and large values both miss without reading out of bounds.
template <typename E, size_t N>
std::string_view TableName(const std::array<std::string_view, N>& names, E value,
                           int64_t first = 0) {
  const int64_t raw = static_cast<int64_t>(static_cast<std::underlying_type_t<E>>(value));
  const uint64_t index = static_cast<uint64_t>(raw - first);
  return index < N ? names[index] : std::string_view();
}

constexpr std::array kPixelFormatNames = {
    "Raw10"sv,
    "Raw12"sv,
    "Raw16"sv,
    "YCBCR_420_888"sv,
    "YCBCR_420_888_64"sv,
    "YCBCR_420_Custom"sv,
    "YCBCR_420_Custom_64"sv,
    "YCBCR_420_10B"sv,
    "Jpeg"sv,
    "Hardware_Dependent_YUV"sv,
    "Hardware_Dependent_YUV_64"sv,
    "YCBCR_P010"sv,
    "YCBCR_P010_M"sv,
    "YCBCR_P010_M_64"sv,
    "YCBCR_420_888_SBWC"sv,
    "YCRCB_420_888_SBWC"sv,
    "YCBCR_420_888_SBWC_L50"sv,
    "YCBCR_420_888_SBWC_L75"sv,
    "YCBCR_420_SP_M_S10B_SBWC"sv,
    "YCBCR_420_SP_M_S10B_SBWC_L40"sv,
    "YCBCR_420_SP_M_S10B_SBWC_L60"sv,
    "YCBCR_420_SP_M_S10B_SBWC_L80"sv,
};

constexpr std::array kRotationNames = {"CCW_0"sv, "CCW_90"sv, "CCW_180"sv, "CCW_270"sv};

constexpr std::array kRequestTemplateNames = {
    "Preview"sv, "Capture"sv, "Video"sv, "Video snapshot"sv, "Zero shutter lag"sv, "Manual"sv,
};

constexpr std::array kTorchModeStatusNames = {"Not available"sv, "Available off"sv,
                                              "Available on"sv};

constexpr std::array kCustomDataSpaceNames = {
    "Unknown"sv,       "Arbitrary"sv,         "Depth"sv, "Sensor"sv,
    "Dynamic depth"sv, "JPEG APP segments"sv, "HEIF"sv,  "Unspecified"sv,
};

constexpr std::array kStandardNames = {
    "Unspecified"sv, "BT709"sv,
    "BT601_625"sv,   "BT601_625_Unadjusted"sv,
    "BT601_525"sv,   "BT601_525_Unadjusted"sv,
    "BT2020"sv,      "BT2020_Constant_Luminance"sv,
    "BT470M"sv,      "Film"sv,
    "DCI_P3"sv,      "Adobe_RGB"sv,
};

constexpr std::array kTransferNames = {
    "Unspecified"sv, "Linear"sv,   "RGB"sv,    "SMPTE_170M"sv, "Gamma2.2"sv,
    "Gamma2.6"sv,    "Gamma2.8"sv, "ST2084"sv, "HLG"sv,
};

constexpr std::array kRangeNames = {"Unspecified"sv, "Full"sv, "Limited"sv, "Extended"sv};

constexpr std::array<std::pair<uint64_t, std::string_view>, 8> kUsageNames = {{
    {kUsageHwTexture, "HwTexture"},
    {kUsageHwComposer, "HwComposer"},
    {kUsageProtected, "Protected"},
    {kUsageHwVideoEncoder, "HwVideoEncoder"},
    {kUsageHwCameraWrite, "HwCameraWrite"},
    {kUsageHwCameraRead, "HwCameraRead"},
    {kUsageHwCameraZsl, "HwCameraZsl"},
    {kUsageKvuInput, "KvuInput"},
}};

}  // namespace

std::string_view ColorSpace::ToString(Standard standard) {
  return TableName(kStandardNames, standard);
}

std::string_view ColorSpace::ToString(Transfer transfer) {
  return TableName(kTransferNames, transfer);
}

std::string_view ColorSpace::ToString(Range range) { return TableName(kRangeNames, range); }

std::string_view ToString(StreamType type) {
  return type == StreamType::kOutput ? "Output" : "Input";
}

std::string_view ToString(PixelFormat format) { return TableName(kPixelFormatNames, format); }

std::string_view ToString(Rotation rotation) { return TableName(kRotationNames, rotation); }

std::string_view ToString(FrameStatus status) {
  return status == FrameStatus::kOk ? "OK" : "Error";
}

std::string_view ToString(RequestTemplate request_template) {
  return TableName(kRequestTemplateNames, request_template, /*first=*/1);
}

std::string_view ToString(TorchMode mode) { return mode == TorchMode::kOff ? "Off" : "On"; }

std::string_view ToString(TorchModeStatus status) {
  return TableName(kTorchModeStatusNames, status);
}

std::string_view ToString(CameraDeviceStatus status) {
  return status == CameraDeviceStatus::kNotPresent ? "Not present" : "Present";
}

std::string_view ToString(CustomDataSpace data_space) {
  return TableName(kCustomDataSpaceNames, data_space);
}

std::string_view ToString(StreamConfigurationMode mode) {
  return mode == StreamConfigurationMode::kNormal ? "Normal" : "Constrained high speed";
}

std::string_view ToString(DynamicRangeProfile profile) {
  return profile == DynamicRangeProfile::kStandard ? "Standard" : "HLG10";
}

bool IsRawFormat(PixelFormat format) {
  const auto raw = static_cast<int32_t>(format);
  return raw >= 0 && raw < static_cast<int32_t>(PixelFormat::kYcbcr420_888);
}

std::string ToString(const DataSpace& data_space) {
  std::string out;
  if (const auto* color = std::get_if<ColorSpace>(&data_space)) {
    out = "DataSpace(Color)::(Standard: ";
    out += ColorSpace::ToString(color->standard);
    out += ", Transfer: ";
    out += ColorSpace::ToString(color->transfer);
    out += ", Range: ";
    out += ColorSpace::ToString(color->range);
    out += ')';
  } else {
    out = "DataSpace(Custom)::";
    out += ToString(std::get<CustomDataSpace>(data_space));
  }
  return out;
}

std::string ToString(uint64_t usage) {
  std::string out = "[";
  bool first = true;
  for (const auto& [bit, name] : kUsageNames) {
    if ((usage & bit) == 0) continue;
    if (!first) out += '|';
    first = false;
    out += name;
  }
  out += ']';
  return out;
}

}  // namespace orvex_api
