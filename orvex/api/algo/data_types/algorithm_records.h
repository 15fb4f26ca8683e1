#ifndef ORVEX_API_ALGO_DATA_TYPES_ALGORITHM_RECORDS_H_
#define ORVEX_API_ALGO_DATA_TYPES_ALGORITHM_RECORDS_H_

// Plain records exchanged with camera algorithms: statistics-engine
// configurations (phase- and contrast-detection autofocus), sensor per-frame
// settings and properties, sensor mode descriptions and small algorithm
// results, each with one debug text for logs (operator<<, or a DebugStr /
// DebugString member). The texts are fixed: log parsers read them.
//
// Number formatting: integers and enumerations stored as integers print in
// decimal, booleans as 1 or 0, floating-point values in the stream's
// default six-significant-digit form, durations as absl formats them
// (for example "33ms").
//
// Example:
//
//   orvex_api::OutputFormat format{{4032, 3024}, 0, orvex_api::CsiDataType::kRaw10};
//   LOG(INFO) << format;
//   // {size: {width: 4032, height: 3024}, virtual_channel: 0, data_type: raw_10}
//
// Thread safety: plain values; the interfaces hold no state.

#include <array>
#include <cstdint>
#include <optional>
#include <ostream>
#include <span>
#include <string>
#include <vector>

#include "absl/time/time.h"
#include "orvex/api/algo/data_types/statistics_types.h"
#include "orvex/api/math/generic_types.h"
#include "orvex/base/export.h"
#include "orvex/status/printable.h"

namespace orvex_api {

// ---------------------------------------------------------------------------
// Enumerations. Values outside the named ones print the row's "unknown" text.

enum class PdafStatsProcessAlgorithmType : int32_t {
  kOneDisparity = 0,
  kTileProcessing = 1,
  kTwoDisparity = 2,
};

enum class PdafAutoFocusMode : int32_t {
  kPhotoPreview = 0,
  kVideoPreview = 1,
  kVideoRecording = 2,
};

enum class PdafDisparityEstimationMode : int32_t {
  kCorrelation = 0,
  kHybrid = 1,
};

// A bit set of software processing features.
enum class PdafSoftwareFeatureFlag : uint16_t {
  kNone = 0,
  kDynamicDownsample = 1 << 1,
  kHotPixelSuppression = 1 << 2,
};

// MIPI CSI-2 data type codes.
enum class CsiDataType : int32_t {
  k8BitData = 18,
  kYuv420_8Bit = 24,
  kYuv420_10Bit = 25,
  kYuv422_8Bit = 30,
  kYuv422_10Bit = 31,
  kRgb444 = 32,
  kRgb555 = 33,
  kRgb565 = 34,
  kRgb666 = 35,
  kRgb888 = 36,
  kRaw6 = 40,
  kRaw7 = 41,
  kRaw8 = 42,
  kRaw10 = 43,
  kRaw12 = 44,
  kRaw14 = 45,
  kRaw16 = 46,
  kRaw20 = 47,
  kUserDefined0 = 48,  // through kUserDefined0 + 7 = 55
  kUndefined = 63,
};

ORVEX_EXPORT std::string ToString(PdafStatsProcessAlgorithmType type);
ORVEX_EXPORT std::string ToString(PdafAutoFocusMode mode);
ORVEX_EXPORT std::string ToString(PdafDisparityEstimationMode mode);
// "none" for 0; otherwise "dynamic downsample" for bit 1 followed by
// ", hot pixel suppression" for bit 2; other bits print nothing.
ORVEX_EXPORT std::string ToString(PdafSoftwareFeatureFlag flags);
ORVEX_EXPORT std::string ToString(CsiDataType type);

ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, PdafStatsProcessAlgorithmType type);
ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, PdafAutoFocusMode mode);
ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, PdafDisparityEstimationMode mode);
ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, PdafSoftwareFeatureFlag flags);
ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, CsiDataType type);

// ---------------------------------------------------------------------------
// Phase-detection autofocus statistics configurations.

class ORVEX_EXPORT PdafStatsConfigDualPdHardware : public PdafStatsConfiguration {
 public:
  struct Setting {
    struct PdafLscSetting {
      orvex::GenericSize<int> lsc_grid_size;
      int32_t lsc_normalize_factor = 0;
      int32_t lsc_black_level = 0;
      int32_t lsc_offset_x = 0;
      int32_t lsc_offset_y = 0;
      bool sobel_input_after_lsc = false;
      bool tile_sum_input_after_lsc = false;
    };
    struct SpotlightSetting {
      int32_t over_exposure_filter_half_width = 0;
      int32_t spotlight_filter_half_width = 0;
      int32_t spotlight_filter_half_height = 0;
      int32_t spotlight_threshold = 0;
      int32_t spotlight_valid_pixel_count = 0;
    };
    struct SalienceFilterSetting {
      std::array<int16_t, 31> filter_coeffs{};
      uint8_t filter_shift = 0;
    };

    PdafStatsProcessAlgorithmType algorithm_type = PdafStatsProcessAlgorithmType::kOneDisparity;
    PdafAutoFocusMode auto_focus_mode = PdafAutoFocusMode::kPhotoPreview;
    PdafDisparityEstimationMode estimation_mode = PdafDisparityEstimationMode::kCorrelation;
    int16_t disparity_range_start = 0;
    int16_t disparity_range_extent = 0;
    int16_t disparity_range_step = 0;
    bool skip_post_processing = false;
    int32_t width_downsample_factor_log2_minus_one = 0;
    PdafLscSetting pdaf_lsc_setting;
    int32_t black_level_global = 0;
    SpotlightSetting spotlight_setting;
    SalienceFilterSetting salience_filter_setting;
  };

  Setting setting;
};

class ORVEX_EXPORT PdafStatsConfigDualPdSoftware : public PdafStatsConfiguration {
 public:
  struct Setting {
    PdafStatsProcessAlgorithmType algorithm_type = PdafStatsProcessAlgorithmType::kOneDisparity;
    PdafAutoFocusMode auto_focus_mode = PdafAutoFocusMode::kPhotoPreview;
    PdafDisparityEstimationMode estimation_mode = PdafDisparityEstimationMode::kCorrelation;
    PdafSoftwareFeatureFlag software_feature_flag = PdafSoftwareFeatureFlag::kNone;
    bool use_previous_frame = false;
    bool use_face_detection_roi = false;
    bool use_ml_inference = false;
  };

  Setting setting;
};

class ORVEX_EXPORT PdafStatsConfigSparsePd : public PdafStatsConfiguration {
 public:
  struct Setting {
    PdafStatsProcessAlgorithmType algorithm_type = PdafStatsProcessAlgorithmType::kOneDisparity;
    PdafAutoFocusMode auto_focus_mode = PdafAutoFocusMode::kPhotoPreview;
    PdafDisparityEstimationMode estimation_mode = PdafDisparityEstimationMode::kCorrelation;
    bool use_ml_inference = false;
  };

  Setting setting;
};

ORVEX_EXPORT std::ostream& operator<<(
    std::ostream& os, const PdafStatsConfigDualPdHardware::Setting::PdafLscSetting& s);
ORVEX_EXPORT std::ostream& operator<<(
    std::ostream& os, const PdafStatsConfigDualPdHardware::Setting::SpotlightSetting& s);
ORVEX_EXPORT std::ostream& operator<<(
    std::ostream& os, const PdafStatsConfigDualPdHardware::Setting::SalienceFilterSetting& s);
ORVEX_EXPORT std::ostream& operator<<(std::ostream& os,
                                      const PdafStatsConfigDualPdHardware::Setting& s);
ORVEX_EXPORT std::ostream& operator<<(std::ostream& os,
                                      const PdafStatsConfigDualPdSoftware::Setting& s);
ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, const PdafStatsConfigSparsePd::Setting& s);

// A grid of grid_width x grid_height cells of cell_width x cell_height
// pixels starting at (start_x, start_y).
struct ORVEX_EXPORT PdafTypedGrid {
  int32_t grid_width = 0;
  int32_t grid_height = 0;
  int32_t cell_width = 0;
  int32_t cell_height = 0;
  int32_t start_x = 0;
  int32_t start_y = 0;

  // "start_x: X start_y: Y grid_width: W grid_height: H cell_width: CW
  // cell_height: CH".
  std::string DebugString() const;
};

// ---------------------------------------------------------------------------
// Disparity post-processing (smart region of interest).

class ORVEX_EXPORT DisparityPostprocessingConfig {
 public:
  virtual ~DisparityPostprocessingConfig();
};

class ORVEX_EXPORT DisparityPostprocessingResult {
 public:
  virtual ~DisparityPostprocessingResult();
};

class ORVEX_EXPORT SmartRoiConfigV1 : public DisparityPostprocessingConfig,
                                      public orvex::Printable {
 public:
  // {type: SmartRoiConfigV1, tracking_mode: .., reference_depth: ..,
  //  reference_roi: <PdafTypedGrid text>, reference_elp: {e0, ..., e11}}
  std::string DebugStr() const override;

  int32_t tracking_mode = 0;
  int32_t reference_depth = 0;
  PdafTypedGrid reference_roi;
  std::array<uint16_t, 12> reference_elp{};
};

class ORVEX_EXPORT SmartRoiResultV1 : public DisparityPostprocessingResult {
 public:
  PdafTypedGrid roi;
  int32_t depth = 0;
  float confidence = 0.0f;
};

// ---------------------------------------------------------------------------
// Sensor settings and properties.

// Register values of one frame.
struct PerFrameRegisterSettings {
  uint64_t frame_length = 0;
  uint64_t line_length = 0;
  uint64_t analog_gain = 0;
  uint64_t digital_gain = 0;
  uint64_t coarse_integration_time = 0;
  uint64_t fine_integration_time = 0;
  uint64_t coarse_integration_time_lshift = 0;
};

struct SensorPerFrameSettings {
  double analog_gain = 1.0;
  double digital_gain = 1.0;
  absl::Duration frame_time;
  absl::Duration exposure_time;
  PerFrameRegisterSettings register_settings;
  bool manual_mode = false;
};

struct NoiseCoefficients {
  double gradient_slope = 0.0;
  double offset_slope = 0.0;
  double gradient_intercept = 0.0;
  double offset_intercept = 0.0;
};

struct NoiseProfile {
  NoiseCoefficients noise_coefficients_r;
  NoiseCoefficients noise_coefficients_gr;
  NoiseCoefficients noise_coefficients_gb;
  NoiseCoefficients noise_coefficients_b;
};

struct ColorLevel {
  double white_level = 0.0;
  double r_black_level = 0.0;
  double gr_black_level = 0.0;
  double b_black_level = 0.0;
  double gb_black_level = 0.0;
};

struct SensorSettingsRange {
  Range<double> analog_gain;
  Range<double> digital_gain;
  Range<int32_t> exposure_time_linecount;
  int32_t exposure_time_linecount_margin = 0;
  int32_t max_frame_time_linecount = 0;
  int32_t max_linecount_normal = 0;
};

struct SensorProperties {
  orvex::GenericSize<int> active_array_size;
  orvex::GenericSize<int> pixel_array_size;
  int32_t line_count_step = 0;
  SensorSettingsRange settings_range;
  orvex::GenericSize<float> physical_size;
  ColorLevel color_level;
  int32_t pixel_bit_depth = 0;
};

// Lens distortion correction data. Lists print joined by "," without blanks.
struct LdcData {
  bool is_valid = false;
  std::vector<float> lens_distortion_preview;
  std::vector<float> lens_distortion_high_quality;
  std::vector<float> optical_center_high_quality;
  std::vector<float> normalization_high_quality;
  std::vector<int32_t> active_rectangle_high_quality;
  std::vector<int32_t> valid_rectangle_high_quality;
};

class ORVEX_EXPORT SensorPerFrameProperties {
 public:
  virtual ~SensorPerFrameProperties();

  SensorPerFrameSettings settings;
  int64_t frame_number = 0;
  absl::Duration rolling_shutter_skew;
  double isp_gain = 1.0;
  std::vector<double> noise_coefficients;
  NoiseProfile noise_profile;
  float green_split = 0.0f;
  LdcData ldc_data;
  std::optional<int32_t> temperature_celsius;  // "N/A" when absent
  uint64_t effective_frame = 0;
  int32_t dropped_frames = 0;
};

// ---------------------------------------------------------------------------
// Sensor modes.

struct OutputFormat {
  orvex::GenericSize<int> size;
  int32_t virtual_channel = 0;
  CsiDataType data_type = CsiDataType::kUndefined;
};

struct SensorOutput {
  OutputFormat image;
  std::optional<OutputFormat> pd;        // "N/A" when absent
  std::optional<OutputFormat> embedded;  // "N/A" when absent
};

struct SensorModeInfo {
  struct Point {
    int32_t x = 0;
    int32_t y = 0;
  };
  struct CsiInfo {
    int32_t csi_channel = 0;
    int32_t num_lanes = 0;
    bool use_cphy = false;
  };

  std::string sensor_name;
  int32_t pixel_bit_depth = 0;
  orvex::GenericSize<int> active_array_size;
  SensorOutput output;
  Range<float> frame_rate_range;
  int32_t min_vertical_blanking = 0;
  int32_t output_pixel_rate = 0;
  Point crop_offset;
  Point binning_factor;
  absl::Duration line_time;
  int64_t min_required_frontend_pixel_rate = 0;
  CsiInfo csi_info;
  int32_t mode_index = 0;
  double mipi_rate = 0.0;
  Range<float> requested_fps_range;
};

ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, const PerFrameRegisterSettings& s);
ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, const SensorPerFrameSettings& s);
ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, const NoiseCoefficients& c);
ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, const NoiseProfile& p);
ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, const ColorLevel& c);
ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, const SensorSettingsRange& r);
ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, const SensorProperties& p);
ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, const LdcData& d);
ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, const SensorPerFrameProperties& p);
ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, const OutputFormat& f);
ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, const SensorOutput& o);
ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, const SensorModeInfo& m);

// ---------------------------------------------------------------------------
// Contrast-detection autofocus statistics configuration.

class ORVEX_EXPORT CdafStatsConfigV1 : public CdafStatsConfig {
 public:
  struct HorizontalFilterConfig {
    std::array<float, 17> high_fir_coeff{};
    std::array<float, 10> high_iir_coeff{};
    int32_t high_iir_input_shift = 0;
    uint32_t high_coring_threshold = 0;
    std::array<float, 17> mid_fir_coeff{};
    std::array<float, 10> mid_iir_coeff{};
    int32_t mid_iir_input_shift = 0;
    uint32_t mid_coring_threshold = 0;
  };
  struct VerticalFilterConfig {
    std::array<uint8_t, 7> hori_lp_coeff{};
    std::array<float, 10> high_iir_coeff{};
    int32_t high_iir_input_shift = 0;
    uint32_t high_coring_threshold = 0;
    std::array<float, 10> mid_iir_coeff{};
    int32_t mid_iir_input_shift = 0;
    uint32_t mid_coring_threshold = 0;
  };

  // A multi-line text of the flags, luma coefficients, gamma table, filter
  // configurations, saturation threshold, ROI grid and windows.
  std::string DebugStr() const;

  bool gamma_enabled = false;
  int32_t vert_lp_subsample_factor = 0;
  bool hori_lp_high_enabled = false;
  bool hori_lp_mid_enabled = false;
  bool hori_high_fir_enabled = false;
  bool hori_mid_fir_enabled = false;
  bool hori_high_iir_enabled = false;
  bool hori_mid_iir_enabled = false;
  bool vert_lp_enabled = false;
  int32_t hori_lp_subsample_factor = 0;
  bool vert_high_iir_enabled = false;
  bool vert_mid_iir_enabled = false;
  std::array<float, 4> luma_coefficients{};
  std::array<uint16_t, 81> gamma_table{};
  HorizontalFilterConfig horizontal_filter;
  VerticalFilterConfig vertical_filter;
  float saturation_threshold = 0.0f;
  PdafTypedGrid roi_grid;
  std::vector<orvex::GenericRoi<int>> windows;
};

// ---------------------------------------------------------------------------
// Algorithm inputs and results without a fixed text. The pure operations
// are defined by the algorithms that implement them.

class ORVEX_EXPORT AwbFrameData {
 public:
  virtual ~AwbFrameData();
  virtual int64_t GetFrameNumber() const = 0;
  virtual const CommonPixelGridStatistics* GetGridStatistics() const = 0;
};

class ORVEX_EXPORT FaceDetectData {
 public:
  virtual ~FaceDetectData();
  virtual int64_t GetFrameNumber() const = 0;
  virtual size_t GetNumFaces() const = 0;
  virtual orvex::GenericRoi<int> GetFaceRect(size_t face) const = 0;
  virtual float GetFaceScore(size_t face) const = 0;
  virtual int32_t GetFaceId(size_t face) const = 0;
  virtual float GetFaceRoll(size_t face) const = 0;
  virtual float GetFaceYaw(size_t face) const = 0;
  virtual orvex::GenericSize<int> GetImageSize() const = 0;
};

// One motion-sensor sample.
struct MotionSample {
  absl::Time timestamp;
  float x = 0.0f;
  float y = 0.0f;
  float z = 0.0f;
};

class ORVEX_EXPORT GyroSamplePacket {
 public:
  virtual ~GyroSamplePacket();
  virtual std::span<const MotionSample> GetSamples() const = 0;
};

class ORVEX_EXPORT GravitySamplePacket {
 public:
  virtual ~GravitySamplePacket();
  virtual std::span<const MotionSample> GetSamples() const = 0;
};

class ORVEX_EXPORT OisSamplePacket {
 public:
  virtual ~OisSamplePacket();
  virtual std::span<const absl::Time> GetTimestamps() const = 0;
  virtual std::span<const float> GetShiftsX() const = 0;
  virtual std::span<const float> GetShiftsY() const = 0;
};

class ORVEX_EXPORT SaliencyData {
 public:
  virtual ~SaliencyData();
  virtual int64_t GetFrameNumber() const = 0;
  virtual orvex::GenericSize<int> GetMapSize() const = 0;
  virtual std::span<const uint8_t> GetMap() const = 0;
  virtual size_t GetNumRegions() const = 0;
  virtual orvex::GenericRoi<int> GetRegionRect(size_t region) const = 0;
  virtual float GetRegionScore(size_t region) const = 0;
  virtual int32_t GetRegionLabel(size_t region) const = 0;
  virtual orvex::GenericRoi<int> GetMostSalientRect() const = 0;
  virtual float GetMaxScore() const = 0;
  virtual bool IsValid() const = 0;
  virtual FenceWaitResult WaitForDone(absl::Duration timeout) const = 0;
};

class ORVEX_EXPORT SaliencyConfig {
 public:
  virtual ~SaliencyConfig();
  virtual orvex::GenericSize<int> GetInputSize() const = 0;
  virtual float GetScoreThreshold() const = 0;
};

class ORVEX_EXPORT SegmentationMaskView {
 public:
  virtual ~SegmentationMaskView();
  virtual orvex::GenericSize<int> GetSize() const = 0;
  virtual int32_t GetStride() const = 0;
  virtual int32_t GetNumClasses() const = 0;
  virtual std::span<const uint8_t> GetData() const = 0;
  virtual FenceWaitResult WaitForDone(absl::Duration timeout) const = 0;
};

// The class a binary classifier chose and its confidence.
struct BinaryClassificationResult {
  int32_t label = 0;
  float confidence = 0.0f;
};

}  // namespace orvex_api

#endif  // ORVEX_API_ALGO_DATA_TYPES_ALGORITHM_RECORDS_H_
