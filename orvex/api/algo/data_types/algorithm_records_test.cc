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

TEST(AlgorithmRecordsTest, EnumerationTexts) {
  const std::pair<std::string, std::string> cases[] = {
      {ToString(PdafStatsProcessAlgorithmType::kOneDisparity), "one disparity"},
      {ToString(PdafStatsProcessAlgorithmType::kTileProcessing), "tile processing"},
      {ToString(PdafStatsProcessAlgorithmType::kTwoDisparity), "two disparity"},
      {ToString(static_cast<PdafStatsProcessAlgorithmType>(3)),
       "unknown pdaf stats process algorithm type"},
      {ToString(PdafAutoFocusMode::kPhotoPreview), "photo preview"},
      {ToString(PdafAutoFocusMode::kVideoPreview), "video preview"},
      {ToString(PdafAutoFocusMode::kVideoRecording), "video recording"},
      {ToString(static_cast<PdafAutoFocusMode>(-1)), "unknown pdaf auto focus mode"},
      {ToString(PdafDisparityEstimationMode::kCorrelation), "correlation"},
      {ToString(PdafDisparityEstimationMode::kHybrid), "hybrid"},
      {ToString(static_cast<PdafDisparityEstimationMode>(2)),
       "unknown pdaf disparity estimation mode"},
      {ToString(PdafSoftwareFeatureFlag::kNone), "none"},
      {ToString(static_cast<PdafSoftwareFeatureFlag>(1)), ""},
      {ToString(static_cast<PdafSoftwareFeatureFlag>(2)), "dynamic downsample"},
      {ToString(static_cast<PdafSoftwareFeatureFlag>(4)), ", hot pixel suppression"},
      {Text(static_cast<PdafSoftwareFeatureFlag>(6)), "dynamic downsample, hot pixel suppression"},
      {ToString(static_cast<PdafSoftwareFeatureFlag>(0xFFF9)), ""},
      {Text(CsiDataType::kRaw10), "raw_10"},
      {Text(PdafAutoFocusMode::kVideoRecording), "video recording"},
  };
  for (const auto& [got, want] : cases) EXPECT_EQ(got, want);

  // Every code from 17 to 64, joined.
  std::string csi;
  for (int code = 17; code <= 64; ++code) csi += ToString(static_cast<CsiDataType>(code)) + "|";
  const std::string unknown = "unknown_csi_data_type|";
  std::string want = unknown + "8_bit_data|";
  for (int i = 0; i < 5; ++i) want += unknown;
  want += "yuv_420_8_bit|yuv_420_10_bit|";
  for (int i = 0; i < 4; ++i) want += unknown;
  want += "yuv_422_8_bit|yuv_422_10_bit|rgb_444|rgb_555|rgb_565|rgb_666|rgb_888|";
  for (int i = 0; i < 3; ++i) want += unknown;
  want += "raw_6|raw_7|raw_8|raw_10|raw_12|raw_14|raw_16|raw_20|";
  for (int i = 0; i < 8; ++i) want += "user_defined_" + std::to_string(i) + "|";
  for (int i = 0; i < 7; ++i) want += unknown;
  want += "undefined|" + unknown;
  EXPECT_EQ(csi, want);
}

TEST(AlgorithmRecordsTest, PdafSettingTexts) {
  PdafStatsConfigDualPdHardware hardware;
  auto& s = hardware.setting;
  s.algorithm_type = PdafStatsProcessAlgorithmType::kTileProcessing;
  s.auto_focus_mode = PdafAutoFocusMode::kVideoPreview;
  s.estimation_mode = PdafDisparityEstimationMode::kHybrid;
  s.disparity_range_start = -8;
  s.disparity_range_extent = 16;
  s.disparity_range_step = 2;
  s.skip_post_processing = true;
  s.width_downsample_factor_log2_minus_one = 1;
  s.pdaf_lsc_setting = {{17, 13}, 4096, 64, -3, 5, true, false};
  s.black_level_global = 256;
  s.spotlight_setting = {1, 2, 3, 900, 12};
  for (int i = 0; i < 31; ++i)
    s.salience_filter_setting.filter_coeffs[i] = static_cast<int16_t>(i - 15);
  s.salience_filter_setting.filter_shift = 200;
  std::string coeffs;
  for (int i = 0; i < 31; ++i) coeffs += std::to_string(i) + ": " + std::to_string(i - 15);
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
  EXPECT_THAT(coeffs, ::testing::StartsWith("0: -151: -142: -13"));

  PdafStatsConfigDualPdSoftware software;
  software.setting = {PdafStatsProcessAlgorithmType::kTwoDisparity,
                      PdafAutoFocusMode::kPhotoPreview,
                      static_cast<PdafDisparityEstimationMode>(9),
                      static_cast<PdafSoftwareFeatureFlag>(6),
                      true,
                      false,
                      true};
  EXPECT_EQ(Text(software.setting),
            "{algorithm type:two disparity, auto focus mode:photo preview, estimation "
            "mode:unknown pdaf disparity estimation mode, software feature flag:6, use previous "
            "frame:1, use face detection roi:0, use ML inference:1}");

  PdafStatsConfigSparsePd sparse;
  sparse.setting.use_ml_inference = true;
  EXPECT_EQ(Text(sparse.setting),
            "{algorithm type:one disparity, auto focus mode:photo preview, estimation "
            "mode:correlation, use ML inference:1}");
  // The configurations are PDAF statistics configurations.
  const PdafStatsConfiguration* base = &sparse;
  EXPECT_NE(dynamic_cast<const PdafStatsConfigSparsePd*>(base), nullptr);
}

TEST(AlgorithmRecordsTest, GridAndSmartRoiTexts) {
  SmartRoiConfigV1 config;
  config.tracking_mode = 2;
  config.reference_depth = -40;
  config.reference_roi = {8, 6, 64, 48, 100, 200};
  for (int i = 0; i < 12; ++i) config.reference_elp[i] = static_cast<uint16_t>(65535 - i);
  EXPECT_EQ(config.reference_roi.DebugString(),
            "start_x: 100 start_y: 200 grid_width: 8 grid_height: 6 cell_width: 64 "
            "cell_height: 48");
  const std::string want =
      "{type: SmartRoiConfigV1, tracking_mode: 2, reference_depth: -40, reference_roi: "
      "start_x: 100 start_y: 200 grid_width: 8 grid_height: 6 cell_width: 64 cell_height: 48, "
      "reference_elp: {65535, 65534, 65533, 65532, 65531, 65530, 65529, 65528, 65527, 65526, "
      "65525, 65524}}";
  EXPECT_EQ(config.DebugStr(), want);
  // Printed through its Printable base.
  const orvex::Printable& printable = config;
  EXPECT_EQ(Text(printable), want);
}

TEST(AlgorithmRecordsTest, SensorSettingTexts) {
  EXPECT_EQ(Text(PerFrameRegisterSettings{3000, 4000, 256, 512, 2999, 12, 18446744073709551615u}),
            "{analog_gain: 256, digital_gain: 512, frame_length: 3000, coarse_integration_time: "
            "2999, fine_integration_time: 12, coarse_integration_time_lshift: "
            "18446744073709551615}");

  SensorPerFrameSettings settings;
  settings.analog_gain = 2.5;
  settings.digital_gain = 1.0 / 3.0;
  settings.frame_time = absl::Milliseconds(33);
  settings.exposure_time = absl::Microseconds(16500);
  settings.manual_mode = true;
  EXPECT_EQ(Text(settings),
            "{analog_gain: 2.5, digitial_gain: 0.333333, frame_time: 33ms, exposure_time: "
            "16.5ms, manual_mode: 1}");

  const NoiseProfile profile{{1, 2, 3, 4}, {5, 6, 7, 8}, {9, 10, 11, 12}, {1e-7, 0.5, -1, 1e9}};
  EXPECT_EQ(Text(profile),
            "{noise_coefficients_r: {gradient_slope: 1, offset_slope: 2, gradient_intercept: 3, "
            "offset_intercept: 4}, noise_coefficients_gr: {gradient_slope: 5, offset_slope: 6, "
            "gradient_intercept: 7, offset_intercept: 8}, noise_coefficients_gb: "
            "{gradient_slope: 9, offset_slope: 10, gradient_intercept: 11, offset_intercept: "
            "12}, noise_coefficients_b: {gradient_slope: 1e-07, offset_slope: 0.5, "
            "gradient_intercept: -1, offset_intercept: 1e+09}}");

  SensorProperties properties;
  properties.active_array_size = {4032, 3024};
  properties.line_count_step = 2;
  properties.settings_range = {{1.0, 16.0}, {1.0, 4.5}, {4, 65531}, 7, 65535, 3100};
  properties.physical_size = {6.4f, 4.8f};
  properties.color_level = {1023, 64, 64.5, 63, 64.25};
  properties.pixel_bit_depth = 10;
  EXPECT_EQ(Text(properties),
            "{active_array_size: {width: 4032, height: 3024}, line_count_step: 2, "
            "settings_range: {analog_gain: [1, 16], digital_gain: [1, 4.5], "
            "exposure_time_linecount: [4, 65531], max_frame_time_linecount: 65535, "
            "max_linecount_normal: 3100}, physical_size: {width: 6.4, height: 4.8}, "
            "color_level: {white_level: 1023, r_black_level: 64, gr_black_level: 64.5, "
            "b_black_level: 63, gb_black_level: 64.25}, pixel_bit_depth: 10}");
}

TEST(AlgorithmRecordsTest, PerFramePropertiesText) {
  SensorPerFrameProperties p;
  p.settings.frame_time = absl::Milliseconds(33);
  p.settings.exposure_time = absl::Milliseconds(10);
  p.rolling_shutter_skew = absl::Microseconds(12345);
  p.isp_gain = 1.25;
  p.noise_coefficients = {1.5, 0.1234567, -2};
  p.green_split = 0.75f;
  p.ldc_data.is_valid = true;
  p.ldc_data.lens_distortion_preview = {9.0f};
  p.ldc_data.lens_distortion_high_quality = {0.1f, -0.02f, 1e-6f};
  p.ldc_data.optical_center_high_quality = {2016.5f, 1512.0f};
  p.ldc_data.normalization_high_quality = {};
  p.ldc_data.active_rectangle_high_quality = {0, 0, 4032, 3024};
  p.ldc_data.valid_rectangle_high_quality = {8, -8};
  p.effective_frame = 77;
  p.dropped_frames = 2;
  const std::string head =
      "{settings: {analog_gain: 1, digitial_gain: 1, frame_time: 33ms, exposure_time: 10ms, "
      "manual_mode: 0}, rolling_shutter_skew: 12.345ms, isp_gain: 1.25, noise_coefficients: "
      "{1.5,0.123457,-2}, green_split: 0.75, LDC data: {is_valid: 1, "
      "lens_distortion_high_quality: {0.1,-0.02,1e-06}, optical_center_high_quality: "
      "{2016.5,1512}, normalization_high_quality: {}, active_rectangle_high_quality: "
      "{0,0,4032,3024}, valid_rectangle_high_quality: {8,-8}}, temp(C): ";
  EXPECT_EQ(Text(p), head + "N/A, effective frame: 77, dropped frames: 2}");
  p.temperature_celsius = -5;
  EXPECT_EQ(Text(p), head + "-5, effective frame: 77, dropped frames: 2}");
}

TEST(AlgorithmRecordsTest, SensorModeTexts) {
  SensorOutput output;
  output.image = {{4032, 3024}, 0, CsiDataType::kRaw10};
  EXPECT_EQ(Text(output),
            "{image: {size: {width: 4032, height: 3024}, virtual_channel: 0, data_type: raw_10}, "
            "pd: N/A, embedded: N/A}");
  output.pd = OutputFormat{{504, 756}, 1, static_cast<CsiDataType>(19)};
  output.embedded = OutputFormat{{4032, 2}, 2, CsiDataType::k8BitData};
  const std::string output_text =
      "{image: {size: {width: 4032, height: 3024}, virtual_channel: 0, data_type: raw_10}, "
      "pd: {size: {width: 504, height: 756}, virtual_channel: 1, data_type: "
      "unknown_csi_data_type}, embedded: {size: {width: 4032, height: 2}, virtual_channel: 2, "
      "data_type: 8_bit_data}}";
  EXPECT_EQ(Text(output), output_text);

  SensorModeInfo mode;
  mode.sensor_name = "main wide";
  mode.pixel_bit_depth = 10;
  mode.active_array_size = {4032, 3024};
  mode.output = output;
  mode.frame_rate_range = {15.0f, 30.0f};
  mode.min_vertical_blanking = 40;
  mode.output_pixel_rate = 600000000;
  mode.crop_offset = {16, 8};
  mode.binning_factor = {2, 2};
  mode.line_time = absl::Nanoseconds(10400);
  mode.min_required_frontend_pixel_rate = 9000000000;
  mode.csi_info = {3, 4, true};
  mode.mode_index = 5;
  mode.mipi_rate = 2.1e9;
  mode.requested_fps_range = {24.0f, 29.97f};
  EXPECT_EQ(Text(mode),
            "{sensor_name: main wide, pixel_bit_depth: 10, active_array_size: "
            "{width: 4032, height: 3024}, output: " +
                output_text +
                ", frame_rate_range: [15, 30], min_vertical_blanking: 40, "
                "output_pixel_rate: 600000000, crop_offset: {x: 16, y: 8}, "
                "binning_factor: {x: 2, y: 2}, line_time: 10.4us, "
                "min_required_frontend_pixel_rate: 9000000000, csi_info: "
                "{csi_channel: 3, num_lanes: 4, use_cphy: 1}, mode_index: 5, "
                "mipi_rate: 2.1e+09, requested_fps_range: [24, 29.97]}");
}

TEST(AlgorithmRecordsTest, CdafConfigText) {
  CdafStatsConfigV1 c;
  c.gamma_enabled = true;
  c.vert_lp_subsample_factor = 2;
  c.hori_lp_high_enabled = true;
  c.hori_high_fir_enabled = true;
  c.hori_mid_iir_enabled = true;
  c.hori_lp_subsample_factor = 4;
  c.vert_mid_iir_enabled = true;
  c.luma_coefficients = {0.299f, 0.587f, 0.1234567f, 0.114f};
  for (int i = 0; i < 81; ++i) c.gamma_table[i] = static_cast<uint16_t>(i * 50);
  for (int i = 0; i < 17; ++i) {
    c.horizontal_filter.high_fir_coeff[i] = static_cast<float>(i) / 4.0f;
    c.horizontal_filter.mid_fir_coeff[i] = -static_cast<float>(i);
  }
  for (int i = 0; i < 10; ++i) {
    c.horizontal_filter.high_iir_coeff[i] = static_cast<float>(i) * 0.5f;
    c.horizontal_filter.mid_iir_coeff[i] = static_cast<float>(i) * 100000.0f;
    c.vertical_filter.high_iir_coeff[i] = 1.0f / static_cast<float>(i + 1);
    c.vertical_filter.mid_iir_coeff[i] = static_cast<float>(i);
  }
  c.horizontal_filter.high_iir_input_shift = 3;
  c.horizontal_filter.high_coring_threshold = 4000000000u;
  c.horizontal_filter.mid_iir_input_shift = -1;
  c.horizontal_filter.mid_coring_threshold = 7;
  c.vertical_filter.hori_lp_coeff = {1, 4, 6, 255, 6, 4, 1};
  c.vertical_filter.high_iir_input_shift = 5;
  c.vertical_filter.high_coring_threshold = 8;
  c.vertical_filter.mid_iir_input_shift = 6;
  c.vertical_filter.mid_coring_threshold = 9;
  c.saturation_threshold = 0.95f;
  c.roi_grid = {5, 4, 128, 96, 10, 20};
  c.windows = {{0, 0, 100, 50}, {-4, 8, 12, 16}};

  const std::string want =
      "  CDAF flags: \n"
      "    gamma_enabled: 1\n"
      "    vert_lp_subsample_factor: 2\n"
      "    hori_lp_high_enabled: 1\n"
      "    hori_lp_mid_enabled: 0\n"
      "    hori_high_fir_enabled: 1\n"
      "    hori_mid_fir_enabled: 0\n"
      "    hori_high_iir_enabled: 0\n"
      "    hori_mid_iir_enabled: 1\n"
      "    vert_lp_enabled: 0\n"
      "    hori_lp_subsample_factor: 4\n"
      "    vert_high_iir_enabled: 0\n"
      "    vert_mid_iir_enabled: 1\n"
      "  Luma coefficients: \n"
      "    0.299, 0.587, 0.123457, 0.114000\n"
      "  Gamma table: \n"
      "    0, 50, 100, 150, 200, 250, 300, 350,\n"
      "    400, 450, 500, 550, 600, 650, 700, 750,\n"
      "    800, 850, 900, 950, 1000, 1050, 1100, 1150,\n"
      "    1200, 1250, 1300, 1350, 1400, 1450, 1500, 1550,\n"
      "    1600, 1650, 1700, 1750, 1800, 1850, 1900, 1950,\n"
      "    2000, 2050, 2100, 2150, 2200, 2250, 2300, 2350,\n"
      "    2400, 2450, 2500, 2550, 2600, 2650, 2700, 2750,\n"
      "    2800, 2850, 2900, 2950, 3000, 3050, 3100, 3150,\n"
      "    3200, 3250, 3300, 3350, 3400, 3450, 3500, 3550,\n"
      "    3600, 3650, 3700, 3750, 3800, 3850, 3900, 3950,\n"
      "    4000\n"
      "  Horizontal filter config: \n"
      "    high_fir_coeff:\n"
      "      0, 0.25, 0.5, 0.75, 1, 1.25, 1.5, 1.75, 2,\n"
      "      2.25, 2.5, 2.75, 3, 3.25, 3.5, 3.75, 4.000000\n"
      "    high_iir_coeff:\n"
      "      0, 0.5, 1, 1.5, 2, 2.5, 3, 3.5, 4, 4.500000\n"
      "    high_iir_input_shift: 3\n"
      "    high_coring_threshold: 4000000000\n"
      "    mid_fir_coeff: \n"
      "      -0, -1, -2, -3, -4, -5, -6, -7, -8,\n"
      "      -9, -10, -11, -12, -13, -14, -15, -16.000000\n"
      "    mid_iir_coeff: \n"
      "      0, 100000, 200000, 300000, 400000, 500000, 600000, 700000, 800000, "
      "900000.000000\n"
      "    mid_iir_input_shift: -1\n"
      "    mid_coring_threshold: 7\n"
      "  Vertical filter config: \n"
      "    hori_lp_coeff: \n"
      "      1, 4, 6, 255, 6, 4, 1\n"
      "    high_iir_coeff: \n"
      "      1, 0.5, 0.333333, 0.25, 0.2, 0.166667, 0.142857, 0.125, 0.111111, 0.100000\n"
      "    high_iir_input_shift: 5\n"
      "    high_coring_threshold: 8\n"
      "    mid_iir_coeff:\n"
      "      0, 1, 2, 3, 4, 5, 6, 7, 8, 9.000000\n"
      "    mid_iir_input_shift: 6\n"
      "    mid_coring_threshold: 9\n"
      "  Saturation threshold: 0.95\n"
      " ROI windows config: \n"
      "  ROI grid:\n"
      "    grid_width: 5\n"
      "    grid_height: 4\n"
      "    cell_width: 128\n"
      "    cell_height: 96\n"
      "    start_x: 10\n"
      "    start_y: 20\n"
      "  Windows config: \n"
      "    window 0: {left: 0, top: 0, right: 100, bottom: 50}\n"
      "    window 1: {left: -4, top: 8, right: 12, bottom: 16}";
  EXPECT_EQ(c.DebugStr(), want);

  // Without windows the section ends after its heading.
  c.windows.clear();
  EXPECT_THAT(c.DebugStr(), ::testing::EndsWith("start_y: 20\n  Windows config: "));
}

}  // namespace
}  // namespace orvex_api
