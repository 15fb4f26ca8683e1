#include "orvex/api/algo/data_types/algorithm_records.h"

#include <sstream>
#include <string>

#include "gmock/gmock.h"
#include "gtest/gtest.h"

namespace orvex_api {
namespace {

template <typename T>
std::string Text(const T& value) {
  std::ostringstream os;
  os << value;
  return os.str();
}

// The texts of the values `first` to `last` of E, each followed by "|".
template <typename E>
std::string Texts(int first, int last) {
  std::string out;
  for (int v = first; v <= last; ++v) out += Text(static_cast<E>(v)) + "|";
  return out;
}

TEST(AlgorithmRecordsTest, EnumerationAndConfigTexts) {
  EXPECT_EQ(Texts<PdafStatsProcessAlgorithmType>(0, 3),
            "one disparity|tile processing|two disparity|unknown pdaf stats process algorithm "
            "type|");
  EXPECT_EQ(Texts<PdafAutoFocusMode>(-1, 2),
            "unknown pdaf auto focus mode|photo preview|video preview|video recording|");
  EXPECT_EQ(Texts<PdafDisparityEstimationMode>(0, 2),
            "correlation|hybrid|unknown pdaf disparity estimation mode|");
  EXPECT_EQ(Texts<PdafSoftwareFeatureFlag>(0, 7),
            "none||dynamic downsample|dynamic downsample|, hot pixel suppression|, hot pixel "
            "suppression|dynamic downsample, hot pixel suppression|dynamic downsample, hot pixel "
            "suppression|");
  EXPECT_EQ(Text(static_cast<PdafSoftwareFeatureFlag>(0xFFF8)), "");
  // CSI codes 17 to 64 in order, "?" for those without a name.
  std::string csi;
  for (int code = 17; code <= 64; ++code) {
    const std::string text = Text(static_cast<CsiDataType>(code));
    csi += (text == "unknown_csi_data_type" ? "?" : text) + " ";
  }
  EXPECT_EQ(csi,
            "? 8_bit_data ? ? ? ? ? yuv_420_8_bit yuv_420_10_bit ? ? ? ? yuv_422_8_bit "
            "yuv_422_10_bit rgb_444 rgb_555 rgb_565 rgb_666 rgb_888 ? ? ? raw_6 raw_7 raw_8 "
            "raw_10 raw_12 raw_14 raw_16 raw_20 user_defined_0 user_defined_1 user_defined_2 "
            "user_defined_3 user_defined_4 user_defined_5 user_defined_6 user_defined_7 ? ? ? ? ? "
            "? ? undefined ? ");
  using Algorithm = PdafStatsProcessAlgorithmType;
  using Focus = PdafAutoFocusMode;
  using Estimation = PdafDisparityEstimationMode;
  // clang-format off
  PdafStatsConfigDualPdHardware::Setting s{Algorithm::kTileProcessing, Focus::kVideoPreview,
      Estimation::kHybrid, -8, 16, 2, true, 1, {{17, 13}, 4096, 64, -3, 5, true, false}, 256,
      {1, 2, 3, 900, 12}, {{-15}, 200}};
  const PdafStatsConfigDualPdSoftware::Setting software{Algorithm::kTwoDisparity,
      Focus::kPhotoPreview, static_cast<Estimation>(9), static_cast<PdafSoftwareFeatureFlag>(6),
      true, false, true};
  // clang-format on
  std::string coeffs = "0: -15";
  for (int i = 1; i < 31; ++i) coeffs += std::to_string(i) + ": 0";
  EXPECT_EQ(Text(s),
            "{algorithm type:tile processing, auto focus mode:video preview, estimation "
            "mode:hybrid, disparity range start:-8, disparity range extent:16, disparity range "
            "step:2, skip post processing:1, width downsample factor log2 minus one:1, pdaf lsc "
            "setting:{lsc_grid_size:{width: 17, height: 13}, lsc_normalize_factor:4096, "
            "lsc_black_level:64, lsc_offset_x:-3, lsc_offset_y:5, sobel_input_after_lsc:1, "
            "tile_sum_input_after_lsc:0}, black level global:256, spotlight "
            "setting:{over_exposure_filter_half_width:1, spotlight_filter_half_width:2, "
            "spotlight_filter_half_height:3, spotlight_threshold:900, "
            "spotlight_valid_pixel_count:12}, salience setting:{filter_coeffs: " +
                coeffs + ", filter_shift:200}}");
  EXPECT_EQ(Text(software),
            "{algorithm type:two disparity, auto focus mode:photo preview, estimation "
            "mode:unknown pdaf disparity estimation mode, software feature flag:6, use previous "
            "frame:1, use face detection roi:0, use ML inference:1}");
  EXPECT_EQ(Text(PdafStatsConfigSparsePd::Setting{.use_ml_inference = true}),
            "{algorithm type:one disparity, auto focus mode:photo preview, estimation "
            "mode:correlation, use ML inference:1}");
  SmartRoiConfigV1 roi;
  roi.reference_roi = {8, 6, 64, 48, 100, 200};
  roi.reference_elp[11] = 65535;
  EXPECT_EQ(Text(static_cast<const orvex::Printable&>(roi)),
            "{type: SmartRoiConfigV1, tracking_mode: 0, reference_depth: 0, reference_roi: "
            "start_x: 100 start_y: 200 grid_width: 8 grid_height: 6 cell_width: 64 cell_height: "
            "48, reference_elp: {0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 65535}}");
}

TEST(AlgorithmRecordsTest, SensorTexts) {
  EXPECT_EQ(Text(PerFrameRegisterSettings{3000, 4000, 256, 512, 2999, 12, 18446744073709551615u}),
            "{analog_gain: 256, digital_gain: 512, frame_length: 3000, coarse_integration_time: "
            "2999, fine_integration_time: 12, coarse_integration_time_lshift: "
            "18446744073709551615}");
  const NoiseProfile profile{{1, 2, 3, 4}, {}, {}, {1e-7, 0.5, -1, 1e9}};
  EXPECT_EQ(Text(profile),
            "{noise_coefficients_r: {gradient_slope: 1, offset_slope: 2, gradient_intercept: 3, "
            "offset_intercept: 4}, noise_coefficients_gr: {gradient_slope: 0, offset_slope: 0, "
            "gradient_intercept: 0, offset_intercept: 0}, noise_coefficients_gb: {gradient_slope: "
            "0, offset_slope: 0, gradient_intercept: 0, offset_intercept: 0}, "
            "noise_coefficients_b: {gradient_slope: 1e-07, offset_slope: 0.5, gradient_intercept: "
            "-1, offset_intercept: 1e+09}}");
  // clang-format off
  const SensorProperties properties{{4032, 3024}, {}, 2,
                                    {{1.0, 16.0}, {1.0, 4.5}, {4, 65531}, 7, 65535, 3100},
                                    {6.4f, 4.8f}, {1023, 64, 64.5, 63, 64.25}, 10};
  // clang-format on
  EXPECT_EQ(
      Text(properties),
      "{active_array_size: {width: 4032, height: 3024}, line_count_step: 2, settings_range: "
      "{analog_gain: [1, 16], digital_gain: [1, 4.5], exposure_time_linecount: [4, 65531], "
      "max_frame_time_linecount: 65535, max_linecount_normal: 3100}, physical_size: {width: "
      "6.4, height: 4.8}, color_level: {white_level: 1023, r_black_level: 64, "
      "gr_black_level: 64.5, b_black_level: 63, gb_black_level: 64.25}, pixel_bit_depth: 10}");

  SensorPerFrameProperties p;
  p.settings = {2.5, 1.0 / 3.0, absl::Milliseconds(33), absl::Microseconds(16500), {}, true};
  p.noise_coefficients = {1.5, 0.1234567, -2};
  p.ldc_data = {true, {9}, {0.1f, -0.02f, 1e-6f}, {2016.5f, 1512}, {}, {0, 4032}, {8, -8}};
  const std::string head =
      "{settings: {analog_gain: 2.5, digitial_gain: 0.333333, frame_time: 33ms, exposure_time: "
      "16.5ms, manual_mode: 1}, rolling_shutter_skew: 0, isp_gain: 1, noise_coefficients: "
      "{1.5,0.123457,-2}, green_split: 0, LDC data: {is_valid: 1, lens_distortion_high_quality: "
      "{0.1,-0.02,1e-06}, optical_center_high_quality: {2016.5,1512}, normalization_high_quality: "
      "{}, active_rectangle_high_quality: {0,4032}, valid_rectangle_high_quality: {8,-8}}, "
      "temp(C): ";
  EXPECT_EQ(Text(p), head + "N/A, effective frame: 0, dropped frames: 0}");
  p.temperature_celsius = -5;
  EXPECT_EQ(Text(p), head + "-5, effective frame: 0, dropped frames: 0}");

  SensorOutput output;
  output.image = {{4032, 3024}, 0, CsiDataType::kRaw10};
  const std::string image =
      "{image: {size: {width: 4032, height: 3024}, virtual_channel: 0, data_type: raw_10}";
  EXPECT_EQ(Text(output), image + ", pd: N/A, embedded: N/A}");
  output.pd = OutputFormat{{504, 756}, 1, static_cast<CsiDataType>(19)};
  output.embedded = OutputFormat{{4032, 2}, 2, CsiDataType::k8BitData};
  // clang-format off
  const SensorModeInfo mode{"main wide", 10, {4032, 3024}, output, {15.0f, 30.0f}, 40, 600000000,
                            {16, 8}, {2, 2}, absl::Nanoseconds(10400), 9000000000, {3, 4, true}, 5,
                            2.1e9, {24.0f, 29.97f}};
  // clang-format on
  EXPECT_EQ(
      Text(mode),
      "{sensor_name: main wide, pixel_bit_depth: 10, active_array_size: {width: 4032, "
      "height: 3024}, output: " +
          image +
          ", pd: {size: {width: 504, height: 756}, virtual_channel: 1, data_type: "
          "unknown_csi_data_type}, embedded: {size: {width: 4032, height: 2}, virtual_channel: "
          "2, data_type: 8_bit_data}}, frame_rate_range: [15, 30], min_vertical_blanking: 40, "
          "output_pixel_rate: 600000000, crop_offset: {x: 16, y: 8}, binning_factor: {x: 2, y: "
          "2}, line_time: 10.4us, min_required_frontend_pixel_rate: 9000000000, csi_info: "
          "{csi_channel: 3, num_lanes: 4, use_cphy: 1}, mode_index: 5, mipi_rate: 2.1e+09, "
          "requested_fps_range: [24, 29.97]}");
}

TEST(AlgorithmRecordsTest, CdafConfigText) {
  CdafStatsConfigV1 c;
  c.luma_coefficients = {0.299f, 0.587f, 0.1234567f, 0.114f};
  c.gamma_table[7] = 350;
  c.gamma_table[80] = 4000;
  c.horizontal_filter.mid_fir_coeff[8] = -8.0f;
  c.vertical_filter.hori_lp_coeff = {1, 4, 6, 255, 6, 4, 1};
  c.saturation_threshold = 0.95f;
  c.windows = {{0, 0, 100, 50}, {-4, 8, 12, 16}};
  std::string gamma = "    0, 0, 0, 0, 0, 0, 0, 350,\n";
  for (int i = 0; i < 9; ++i) gamma += "    0, 0, 0, 0, 0, 0, 0, 0,\n";
  EXPECT_EQ(c.DebugStr(),
            "  CDAF flags: \n    gamma_enabled: 0\n    vert_lp_subsample_factor: 0\n"
            "    hori_lp_high_enabled: 0\n    hori_lp_mid_enabled: 0\n"
            "    hori_high_fir_enabled: 0\n    hori_mid_fir_enabled: 0\n"
            "    hori_high_iir_enabled: 0\n    hori_mid_iir_enabled: 0\n    vert_lp_enabled: 0\n"
            "    hori_lp_subsample_factor: 0\n    vert_high_iir_enabled: 0\n"
            "    vert_mid_iir_enabled: 0\n  Luma coefficients: \n"
            "    0.299, 0.587, 0.123457, 0.114000\n  Gamma table: \n" +
                gamma +
                "    4000\n  Horizontal filter config: \n    high_fir_coeff:\n"
                "      0, 0, 0, 0, 0, 0, 0, 0, 0,\n      0, 0, 0, 0, 0, 0, 0, 0.000000\n"
                "    high_iir_coeff:\n      0, 0, 0, 0, 0, 0, 0, 0, 0, 0.000000\n"
                "    high_iir_input_shift: 0\n    high_coring_threshold: 0\n    mid_fir_coeff: \n"
                "      0, 0, 0, 0, 0, 0, 0, 0, -8,\n      0, 0, 0, 0, 0, 0, 0, 0.000000\n"
                "    mid_iir_coeff: \n      0, 0, 0, 0, 0, 0, 0, 0, 0, 0.000000\n"
                "    mid_iir_input_shift: 0\n    mid_coring_threshold: 0\n"
                "  Vertical filter config: \n    hori_lp_coeff: \n      1, 4, 6, 255, 6, 4, 1\n"
                "    high_iir_coeff: \n      0, 0, 0, 0, 0, 0, 0, 0, 0, 0.000000\n"
                "    high_iir_input_shift: 0\n    high_coring_threshold: 0\n    mid_iir_coeff:\n"
                "      0, 0, 0, 0, 0, 0, 0, 0, 0, 0.000000\n    mid_iir_input_shift: 0\n"
                "    mid_coring_threshold: 0\n  Saturation threshold: 0.95\n"
                " ROI windows config: \n  ROI grid:\n    grid_width: 0\n    grid_height: 0\n"
                "    cell_width: 0\n    cell_height: 0\n    start_x: 0\n    start_y: 0\n"
                "  Windows config: \n    window 0: {left: 0, top: 0, right: 100, bottom: 50}\n"
                "    window 1: {left: -4, top: 8, right: 12, bottom: 16}");
}

}  // namespace
}  // namespace orvex_api
