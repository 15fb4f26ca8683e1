#include "orvex/api/algo/data_types/algorithm_records.h"

#include <sstream>
#include <string_view>

#include "absl/strings/str_cat.h"
#include "absl/strings/str_join.h"

namespace orvex_api {
namespace {

template <typename T>
std::ostream& WriteSize(std::ostream& os, const orvex::GenericSize<T>& size) {
  return os << "{width: " << size.width << ", height: " << size.height << "}";
}

// Elements joined by "," without blanks, six significant digits.
template <typename T>
std::string JoinList(const std::vector<T>& values) {
  return absl::StrJoin(values, ",");
}

// Writes `count` entries separated by ", ", except that after every
// `per_line`-th entry the separator is ",\n" and `indent`. `text(i)` gives
// entry i's text.
template <typename TextOf>
void AppendWrappedList(std::string& out, size_t count, size_t per_line, std::string_view indent,
                       TextOf&& text) {
  out.append(indent);
  for (size_t i = 0; i < count; ++i) {
    if (i > 0) {
      if (i % per_line == 0) {
        absl::StrAppend(&out, ",\n", absl::string_view(indent.data(), indent.size()));
      } else {
        out.append(", ");
      }
    }
    out.append(text(i));
  }
}

// The coefficient list form: six significant digits for every entry but
// the last, which is written in fixed notation with six decimals.
template <size_t N>
void AppendCoefficients(std::string& out, const std::array<float, N>& values, size_t per_line,
                        std::string_view indent) {
  AppendWrappedList(out, N, per_line, indent, [&](size_t i) {
    return i + 1 == N ? std::to_string(values[i]) : absl::StrCat(values[i]);
  });
}

template <typename Setting>
void WriteModes(std::ostream& os, const Setting& s) {
  os << "{"
     << "algorithm type:" << s.algorithm_type << ", auto focus mode:" << s.auto_focus_mode
     << ", estimation mode:" << s.estimation_mode;
}

}  // namespace

// ---------------------------------------------------------------------------
// Enumerations.

std::string ToString(PdafStatsProcessAlgorithmType type) {
  switch (type) {
    case PdafStatsProcessAlgorithmType::kOneDisparity:
      return "one disparity";
    case PdafStatsProcessAlgorithmType::kTileProcessing:
      return "tile processing";
    case PdafStatsProcessAlgorithmType::kTwoDisparity:
      return "two disparity";
  }
  return "unknown pdaf stats process algorithm type";
}

std::string ToString(PdafAutoFocusMode mode) {
  switch (mode) {
    case PdafAutoFocusMode::kPhotoPreview:
      return "photo preview";
    case PdafAutoFocusMode::kVideoPreview:
      return "video preview";
    case PdafAutoFocusMode::kVideoRecording:
      return "video recording";
  }
  return "unknown pdaf auto focus mode";
}

std::string ToString(PdafDisparityEstimationMode mode) {
  switch (mode) {
    case PdafDisparityEstimationMode::kCorrelation:
      return "correlation";
    case PdafDisparityEstimationMode::kHybrid:
      return "hybrid";
  }
  return "unknown pdaf disparity estimation mode";
}

std::string ToString(PdafSoftwareFeatureFlag flags) {
  const auto bits = static_cast<uint16_t>(flags);
  if (bits == 0) return "none";
  std::string out;
  if ((bits & static_cast<uint16_t>(PdafSoftwareFeatureFlag::kDynamicDownsample)) != 0) {
    out += "dynamic downsample";
  }
  if ((bits & static_cast<uint16_t>(PdafSoftwareFeatureFlag::kHotPixelSuppression)) != 0) {
    out += ", hot pixel suppression";
  }
  return out;
}

std::string ToString(CsiDataType type) {
  const auto code = static_cast<int32_t>(type);
  const int32_t user_defined_0 = static_cast<int32_t>(CsiDataType::kUserDefined0);
  if (code >= user_defined_0 && code <= user_defined_0 + 7) {
    return absl::StrCat("user_defined_", code - user_defined_0);
  }
  switch (type) {
    case CsiDataType::k8BitData:
      return "8_bit_data";
    case CsiDataType::kYuv420_8Bit:
      return "yuv_420_8_bit";
    case CsiDataType::kYuv420_10Bit:
      return "yuv_420_10_bit";
    case CsiDataType::kYuv422_8Bit:
      return "yuv_422_8_bit";
    case CsiDataType::kYuv422_10Bit:
      return "yuv_422_10_bit";
    case CsiDataType::kRgb444:
      return "rgb_444";
    case CsiDataType::kRgb555:
      return "rgb_555";
    case CsiDataType::kRgb565:
      return "rgb_565";
    case CsiDataType::kRgb666:
      return "rgb_666";
    case CsiDataType::kRgb888:
      return "rgb_888";
    case CsiDataType::kRaw6:
      return "raw_6";
    case CsiDataType::kRaw7:
      return "raw_7";
    case CsiDataType::kRaw8:
      return "raw_8";
    case CsiDataType::kRaw10:
      return "raw_10";
    case CsiDataType::kRaw12:
      return "raw_12";
    case CsiDataType::kRaw14:
      return "raw_14";
    case CsiDataType::kRaw16:
      return "raw_16";
    case CsiDataType::kRaw20:
      return "raw_20";
    case CsiDataType::kUndefined:
      return "undefined";
    case CsiDataType::kUserDefined0:
      break;
  }
  return "unknown_csi_data_type";
}

std::ostream& operator<<(std::ostream& os, PdafStatsProcessAlgorithmType type) {
  return os << ToString(type);
}
std::ostream& operator<<(std::ostream& os, PdafAutoFocusMode mode) { return os << ToString(mode); }
std::ostream& operator<<(std::ostream& os, PdafDisparityEstimationMode mode) {
  return os << ToString(mode);
}
std::ostream& operator<<(std::ostream& os, PdafSoftwareFeatureFlag flags) {
  return os << ToString(flags);
}
std::ostream& operator<<(std::ostream& os, CsiDataType type) { return os << ToString(type); }

// ---------------------------------------------------------------------------
// Phase-detection autofocus configurations.

std::ostream& operator<<(std::ostream& os,
                         const PdafStatsConfigDualPdHardware::Setting::PdafLscSetting& s) {
  os << "{"
     << "lsc_grid_size:";
  WriteSize(os, s.lsc_grid_size);
  return os << ", lsc_normalize_factor:" << s.lsc_normalize_factor
            << ", lsc_black_level:" << s.lsc_black_level << ", lsc_offset_x:" << s.lsc_offset_x
            << ", lsc_offset_y:" << s.lsc_offset_y
            << ", sobel_input_after_lsc:" << s.sobel_input_after_lsc
            << ", tile_sum_input_after_lsc:" << s.tile_sum_input_after_lsc << "}";
}

std::ostream& operator<<(std::ostream& os,
                         const PdafStatsConfigDualPdHardware::Setting::SpotlightSetting& s) {
  return os << "{"
            << "over_exposure_filter_half_width:" << s.over_exposure_filter_half_width
            << ", spotlight_filter_half_width:" << s.spotlight_filter_half_width
            << ", spotlight_filter_half_height:" << s.spotlight_filter_half_height
            << ", spotlight_threshold:" << s.spotlight_threshold
            << ", spotlight_valid_pixel_count:" << s.spotlight_valid_pixel_count << "}";
}

std::ostream& operator<<(std::ostream& os,
                         const PdafStatsConfigDualPdHardware::Setting::SalienceFilterSetting& s) {
  os << "{filter_coeffs: ";
  for (size_t i = 0; i < s.filter_coeffs.size(); ++i) os << i << ": " << s.filter_coeffs[i];
  return os << ", filter_shift:" << static_cast<int>(s.filter_shift) << "}";
}

std::ostream& operator<<(std::ostream& os, const PdafStatsConfigDualPdHardware::Setting& s) {
  WriteModes(os, s);
  return os << ", disparity range start:" << s.disparity_range_start
            << ", disparity range extent:" << s.disparity_range_extent
            << ", disparity range step:" << s.disparity_range_step
            << ", skip post processing:" << s.skip_post_processing
            << ", width downsample factor log2 minus one:"
            << s.width_downsample_factor_log2_minus_one
            << ", pdaf lsc setting:" << s.pdaf_lsc_setting
            << ", black level global:" << s.black_level_global
            << ", spotlight setting:" << s.spotlight_setting
            << ", salience setting:" << s.salience_filter_setting << "}";
}

std::ostream& operator<<(std::ostream& os, const PdafStatsConfigDualPdSoftware::Setting& s) {
  WriteModes(os, s);
  return os << ", software feature flag:" << static_cast<uint16_t>(s.software_feature_flag)
            << ", use previous frame:" << s.use_previous_frame
            << ", use face detection roi:" << s.use_face_detection_roi
            << ", use ML inference:" << s.use_ml_inference << "}";
}

std::ostream& operator<<(std::ostream& os, const PdafStatsConfigSparsePd::Setting& s) {
  WriteModes(os, s);
  return os << ", use ML inference:" << s.use_ml_inference << "}";
}

std::string PdafTypedGrid::DebugString() const {
  return absl::StrCat("start_x: ", start_x, " start_y: ", start_y, " grid_width: ", grid_width,
                      " grid_height: ", grid_height, " cell_width: ", cell_width,
                      " cell_height: ", cell_height);
}

DisparityPostprocessingConfig::~DisparityPostprocessingConfig() = default;
DisparityPostprocessingResult::~DisparityPostprocessingResult() = default;

std::string SmartRoiConfigV1::DebugStr() const {
  return orvex::BuildOrvexDebugStrWithStrings(
      "SmartRoiConfigV1",
      {{"tracking_mode", std::to_string(tracking_mode)},
       {"reference_depth", std::to_string(reference_depth)},
       {"reference_roi", reference_roi.DebugString()},
       {"reference_elp",
        orvex::ContainerDebugStr(reference_elp, [](uint16_t v) { return std::to_string(v); })}});
}

// ---------------------------------------------------------------------------
// Sensor settings and properties.

std::ostream& operator<<(std::ostream& os, const PerFrameRegisterSettings& s) {
  return os << "{"
            << "analog_gain: " << s.analog_gain << ", digital_gain: " << s.digital_gain
            << ", frame_length: " << s.frame_length
            << ", coarse_integration_time: " << s.coarse_integration_time
            << ", fine_integration_time: " << s.fine_integration_time
            << ", coarse_integration_time_lshift: " << s.coarse_integration_time_lshift << "}";
}

// "digitial_gain" is the name log readers know.
std::ostream& operator<<(std::ostream& os, const SensorPerFrameSettings& s) {
  return os << "{"
            << "analog_gain: " << s.analog_gain << ", digitial_gain: " << s.digital_gain
            << ", frame_time: " << s.frame_time << ", exposure_time: " << s.exposure_time
            << ", manual_mode: " << s.manual_mode << "}";
}

std::ostream& operator<<(std::ostream& os, const NoiseCoefficients& c) {
  return os << "{"
            << "gradient_slope: " << c.gradient_slope << ", offset_slope: " << c.offset_slope
            << ", gradient_intercept: " << c.gradient_intercept
            << ", offset_intercept: " << c.offset_intercept << "}";
}

std::ostream& operator<<(std::ostream& os, const NoiseProfile& p) {
  return os << "{"
            << "noise_coefficients_r: " << p.noise_coefficients_r
            << ", noise_coefficients_gr: " << p.noise_coefficients_gr
            << ", noise_coefficients_gb: " << p.noise_coefficients_gb
            << ", noise_coefficients_b: " << p.noise_coefficients_b << "}";
}

std::ostream& operator<<(std::ostream& os, const ColorLevel& c) {
  return os << "{"
            << "white_level: " << c.white_level << ", r_black_level: " << c.r_black_level
            << ", gr_black_level: " << c.gr_black_level << ", b_black_level: " << c.b_black_level
            << ", gb_black_level: " << c.gb_black_level << "}";
}

std::ostream& operator<<(std::ostream& os, const SensorSettingsRange& r) {
  return os << "{"
            << "analog_gain: " << r.analog_gain << ", digital_gain: " << r.digital_gain
            << ", exposure_time_linecount: " << r.exposure_time_linecount
            << ", max_frame_time_linecount: " << r.max_frame_time_linecount
            << ", max_linecount_normal: " << r.max_linecount_normal << "}";
}

std::ostream& operator<<(std::ostream& os, const SensorProperties& p) {
  os << "{"
     << "active_array_size: ";
  WriteSize(os, p.active_array_size);
  os << ", line_count_step: " << p.line_count_step << ", settings_range: " << p.settings_range
     << ", physical_size: ";
  WriteSize(os, p.physical_size);
  return os << ", color_level: " << p.color_level << ", pixel_bit_depth: " << p.pixel_bit_depth
            << "}";
}

std::ostream& operator<<(std::ostream& os, const LdcData& d) {
  return os << "{"
            << "is_valid: " << d.is_valid << ", lens_distortion_high_quality: {"
            << JoinList(d.lens_distortion_high_quality) << "}, optical_center_high_quality: {"
            << JoinList(d.optical_center_high_quality) << "}, normalization_high_quality: {"
            << JoinList(d.normalization_high_quality) << "}, active_rectangle_high_quality: {"
            << JoinList(d.active_rectangle_high_quality) << "}, valid_rectangle_high_quality: {"
            << JoinList(d.valid_rectangle_high_quality) << "}"
            << "}";
}

SensorPerFrameProperties::~SensorPerFrameProperties() = default;

std::ostream& operator<<(std::ostream& os, const SensorPerFrameProperties& p) {
  os << "{"
     << "settings: " << p.settings << ", rolling_shutter_skew: " << p.rolling_shutter_skew
     << ", isp_gain: " << p.isp_gain << ", noise_coefficients: {" << JoinList(p.noise_coefficients)
     << "}, green_split: " << p.green_split << ", LDC data: " << p.ldc_data << ", temp(C): ";
  if (p.temperature_celsius.has_value()) {
    os << *p.temperature_celsius;
  } else {
    os << "N/A";
  }
  return os << ", effective frame: " << p.effective_frame
            << ", dropped frames: " << p.dropped_frames << "}";
}

// ---------------------------------------------------------------------------
// Sensor modes.

std::ostream& operator<<(std::ostream& os, const OutputFormat& f) {
  os << "{"
     << "size: ";
  WriteSize(os, f.size);
  return os << ", virtual_channel: " << f.virtual_channel << ", data_type: " << f.data_type << "}";
}

std::ostream& operator<<(std::ostream& os, const SensorOutput& o) {
  os << "{"
     << "image: " << o.image;
  if (o.pd.has_value()) {
    os << ", pd: " << *o.pd;
  } else {
    os << ", pd: N/A";
  }
  if (o.embedded.has_value()) {
    os << ", embedded: " << *o.embedded << "}";
  } else {
    os << ", embedded: N/A}";
  }
  return os;
}

std::ostream& operator<<(std::ostream& os, const SensorModeInfo& m) {
  os << "{"
     << "sensor_name: " << m.sensor_name << ", pixel_bit_depth: " << m.pixel_bit_depth
     << ", active_array_size: ";
  WriteSize(os, m.active_array_size);
  return os << ", output: " << m.output << ", frame_rate_range: " << m.frame_rate_range
            << ", min_vertical_blanking: " << m.min_vertical_blanking
            << ", output_pixel_rate: " << m.output_pixel_rate << ", crop_offset: "
            << "{x: " << m.crop_offset.x << ", y: " << m.crop_offset.y << "}"
            << ", binning_factor: "
            << "{x: " << m.binning_factor.x << ", y: " << m.binning_factor.y << "}"
            << ", line_time: " << m.line_time
            << ", min_required_frontend_pixel_rate: " << m.min_required_frontend_pixel_rate
            << ", csi_info: "
            << "{csi_channel: " << m.csi_info.csi_channel << ", num_lanes: " << m.csi_info.num_lanes
            << ", use_cphy: " << m.csi_info.use_cphy << "}"
            << ", mode_index: " << m.mode_index << ", mipi_rate: " << m.mipi_rate
            << ", requested_fps_range: " << m.requested_fps_range << "}";
}

// ---------------------------------------------------------------------------
// Contrast-detection autofocus configuration.

std::string CdafStatsConfigV1::DebugStr() const {
  // Coefficient lists sit on their own lines under their heading; the long
  // FIR lists wrap once, after nine entries.
  constexpr std::string_view kListIndent = "      ";
  constexpr size_t kFirPerLine = 9;
  constexpr size_t kIirPerLine = 10;
  std::ostringstream os;
  os << "  CDAF flags: \n"
     << "    gamma_enabled: " << gamma_enabled
     << "\n    vert_lp_subsample_factor: " << vert_lp_subsample_factor
     << "\n    hori_lp_high_enabled: " << hori_lp_high_enabled
     << "\n    hori_lp_mid_enabled: " << hori_lp_mid_enabled
     << "\n    hori_high_fir_enabled: " << hori_high_fir_enabled
     << "\n    hori_mid_fir_enabled: " << hori_mid_fir_enabled
     << "\n    hori_high_iir_enabled: " << hori_high_iir_enabled
     << "\n    hori_mid_iir_enabled: " << hori_mid_iir_enabled
     << "\n    vert_lp_enabled: " << vert_lp_enabled
     << "\n    hori_lp_subsample_factor: " << hori_lp_subsample_factor
     << "\n    vert_high_iir_enabled: " << vert_high_iir_enabled
     << "\n    vert_mid_iir_enabled: " << vert_mid_iir_enabled;
  std::string out = os.str();

  out += "\n  Luma coefficients: \n";
  AppendCoefficients(out, luma_coefficients, luma_coefficients.size(), "    ");
  out += "\n  Gamma table: \n";
  AppendWrappedList(out, gamma_table.size(), 8, "    ",
                    [&](size_t i) { return std::to_string(gamma_table[i]); });

  const HorizontalFilterConfig& h = horizontal_filter;
  out += "\n  Horizontal filter config: \n";
  out += "    high_fir_coeff:\n";
  AppendCoefficients(out, h.high_fir_coeff, kFirPerLine, kListIndent);
  out += "\n    high_iir_coeff:\n";
  AppendCoefficients(out, h.high_iir_coeff, kIirPerLine, kListIndent);
  absl::StrAppend(&out, "\n    high_iir_input_shift: ", h.high_iir_input_shift,
                  "\n    high_coring_threshold: ", h.high_coring_threshold);
  out += "\n    mid_fir_coeff: \n";
  AppendCoefficients(out, h.mid_fir_coeff, kFirPerLine, kListIndent);
  out += "\n    mid_iir_coeff: \n";
  AppendCoefficients(out, h.mid_iir_coeff, kIirPerLine, kListIndent);
  absl::StrAppend(&out, "\n    mid_iir_input_shift: ", h.mid_iir_input_shift,
                  "\n    mid_coring_threshold: ", h.mid_coring_threshold);

  const VerticalFilterConfig& v = vertical_filter;
  out += "\n  Vertical filter config: \n";
  out += "    hori_lp_coeff: \n";
  AppendWrappedList(out, v.hori_lp_coeff.size(), v.hori_lp_coeff.size(), kListIndent,
                    [&](size_t i) { return std::to_string(v.hori_lp_coeff[i]); });
  out += "\n    high_iir_coeff: \n";
  AppendCoefficients(out, v.high_iir_coeff, kIirPerLine, kListIndent);
  absl::StrAppend(&out, "\n    high_iir_input_shift: ", v.high_iir_input_shift,
                  "\n    high_coring_threshold: ", v.high_coring_threshold);
  out += "\n    mid_iir_coeff:\n";
  AppendCoefficients(out, v.mid_iir_coeff, kIirPerLine, kListIndent);
  absl::StrAppend(&out, "\n    mid_iir_input_shift: ", v.mid_iir_input_shift,
                  "\n    mid_coring_threshold: ", v.mid_coring_threshold);

  std::ostringstream tail;
  tail << "\n  Saturation threshold: " << saturation_threshold;
  out += tail.str();

  absl::StrAppend(
      &out, "\n ROI windows config: \n", "  ROI grid:", "\n    grid_width: ", roi_grid.grid_width,
      "\n    grid_height: ", roi_grid.grid_height, "\n    cell_width: ", roi_grid.cell_width,
      "\n    cell_height: ", roi_grid.cell_height, "\n    start_x: ", roi_grid.start_x,
      "\n    start_y: ", roi_grid.start_y);
  out += "\n  Windows config: ";
  for (size_t i = 0; i < windows.size(); ++i) {
    const orvex::GenericRoi<int>& w = windows[i];
    absl::StrAppend(&out, "\n    window ", i, ": ", "{left: ", w.left, ", top: ", w.top,
                    ", right: ", w.right, ", bottom: ", w.bottom, "}");
  }
  return out;
}

// ---------------------------------------------------------------------------
// Interfaces.

AwbFrameData::~AwbFrameData() = default;
FaceDetectData::~FaceDetectData() = default;
GyroSamplePacket::~GyroSamplePacket() = default;
GravitySamplePacket::~GravitySamplePacket() = default;
OisSamplePacket::~OisSamplePacket() = default;
SaliencyData::~SaliencyData() = default;
SaliencyConfig::~SaliencyConfig() = default;
SegmentationMaskView::~SegmentationMaskView() = default;

}  // namespace orvex_api
