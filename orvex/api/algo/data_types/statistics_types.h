#ifndef ORVEX_API_ALGO_DATA_TYPES_STATISTICS_TYPES_H_
#define ORVEX_API_ALGO_DATA_TYPES_STATISTICS_TYPES_H_

// Interfaces through which a statistics producer (the image-statistics
// hardware's driver) hands per-frame statistics to a consumer (exposure,
// focus and white-balance algorithms). Concrete classes live with the
// producers; this library supplies only the interfaces and the default
// bodies of the non-pure operations.
//
// Defaults marked "fatal" end the process with the line
// "<Operation> not implemented but called.": a producer that advertises a
// kind of statistics must override every operation its consumers call.
//
// Thread safety: the interfaces hold no state; implementations decide.
// WaitUntilDone/WaitForDone, when implemented, block until the statistics
// are complete, like Fence::WaitForDone.

#include <cstddef>
#include <cstdint>
#include <span>

#include "absl/time/time.h"
#include "orvex/api/math/generic_types.h"
#include "orvex/api/thread/fence.h"
#include "orvex/base/export.h"

namespace orvex_api {

using orvex::FenceWaitResult;

// Sums of one region of a Bayer (R, Gr, Gb, B) pixel grid.
struct RggbRegionStatsV1 {
  uint32_t r_sum = 0;
  uint32_t gr_sum = 0;
  uint32_t gb_sum = 0;
  uint32_t b_sum = 0;
};

// V1 plus the number of saturated and of counted pixels.
struct RggbRegionStatsV2 {
  uint32_t r_sum = 0;
  uint32_t gr_sum = 0;
  uint32_t gb_sum = 0;
  uint32_t b_sum = 0;
  uint32_t saturated_count = 0;
  uint32_t pixel_count = 0;
};

// V2 with 64-bit sums for large regions.
struct RggbRegionStatsV2Extended {
  uint64_t r_sum = 0;
  uint64_t gr_sum = 0;
  uint64_t gb_sum = 0;
  uint64_t b_sum = 0;
  uint32_t saturated_count = 0;
  uint32_t pixel_count = 0;
};

// Capture conditions of the frame the exposure statistics come from.
struct AeStatsMetadata {
  int64_t frame_number = 0;
  absl::Duration exposure_time;
  float analog_gain = 1.0f;
  float digital_gain = 1.0f;
  int32_t bit_depth = 0;
};

// Lens-shading state of the frame the white-balance statistics come from.
struct AwbLscStatsMetadata {
  int64_t frame_number = 0;
  bool lsc_applied = false;
  float lsc_strength = 0.0f;
};

struct CdafRoiStatsV1 {
  uint64_t high_pass_sum = 0;
  uint64_t mid_pass_sum = 0;
  uint64_t luma_sum = 0;
  uint32_t pixel_count = 0;
};

struct CdafWindowStatsV1 {
  uint64_t high_pass_sum = 0;
  uint64_t mid_pass_sum = 0;
  uint32_t saturated_count = 0;
  uint32_t pixel_count = 0;
};

struct CdafMetaDataV1 {
  int64_t frame_number = 0;
  uint32_t num_rois = 0;
  uint32_t num_windows = 0;
};

// Red, green, blue and luma sums of one cell of a Bayer grid statistic.
struct BgsRegionStatsV1 {
  uint32_t r_sum = 0;
  uint32_t g_sum = 0;
  uint32_t b_sum = 0;
  uint32_t y_sum = 0;
  uint32_t pixel_count = 0;
};

// Layout of pixel-grid statistics over a region of interest: a grid of
// grid_width x grid_height cells of cell_width x cell_height pixels whose
// top-left corner is the region's (left, top). The region must be empty in
// a dimension or cover the grid exactly in it (checked, fatal).
struct ORVEX_EXPORT PixelGridStatisticsParams {
  PixelGridStatisticsParams(const orvex::GenericRoi<int>& region, int16_t grid_width_cells,
                            int16_t grid_height_cells, int16_t cell_width_pixels,
                            int16_t cell_height_pixels, int16_t aux_x_value, int16_t aux_y_value,
                            int32_t aux);

  // grid_width * cell_width and grid_height * cell_height, truncated to
  // 16 bits.
  int16_t GetRoiWidth() const;
  int16_t GetRoiHeight() const;

  orvex::GenericRoi<int> region_of_interest;
  int32_t cell_width;
  int32_t cell_height;
  int32_t grid_width;
  int32_t grid_height;
  int32_t start_x;  // region_of_interest.left
  int32_t start_y;  // region_of_interest.top
  int16_t aux_x;
  int16_t aux_y;
  int32_t reserved[4] = {0, 0, 0, 0};
  int32_t aux_value;
};

class ORVEX_EXPORT CommonPixelGridStatistics {
 public:
  virtual ~CommonPixelGridStatistics();
  virtual RggbRegionStatsV1 GetRggbRegionStatsV1(size_t region) const;                  // fatal
  virtual RggbRegionStatsV2 GetRggbRegionStatsV2(size_t region) const;                  // fatal
  virtual bool HasRggbRegionStatsV2Extended() const;                                    // false
  virtual RggbRegionStatsV2Extended GetRggbRegionStatsV2Extended(size_t region) const;  // fatal
  virtual AeStatsMetadata GetAeStatsMetadata() const;                                   // fatal
  virtual AwbLscStatsMetadata GetAwbLscStatsMetadata() const;                           // fatal
  virtual const PixelGridStatisticsParams& GetParams() const = 0;
  virtual size_t GetNumRegions() const = 0;
  virtual int64_t GetFrameNumber() const = 0;
  virtual FenceWaitResult WaitUntilDone(absl::Duration timeout) const;  // fatal
  virtual FenceWaitResult WaitForDone(absl::Duration timeout) const;    // fatal
  virtual bool IsValid() const = 0;
};

// Region sums taken before clipping to the sensor's white level.
class ORVEX_EXPORT UnclippedPixelGridStatistics {
 public:
  virtual ~UnclippedPixelGridStatistics();
  virtual const PixelGridStatisticsParams& GetParams() const = 0;
  virtual size_t GetNumRegions() const = 0;
  virtual RggbRegionStatsV2Extended GetRegionStats(size_t region) const = 0;
  virtual int64_t GetFrameNumber() const = 0;
  virtual int32_t GetBitDepth() const = 0;
  virtual FenceWaitResult WaitForDone(absl::Duration timeout) const = 0;
};

// Mean values of small pixel patches.
class ORVEX_EXPORT PixelPatchStatistics {
 public:
  virtual ~PixelPatchStatistics();
  virtual orvex::GenericSize<int> GetPatchSize() const = 0;
  virtual size_t GetNumPatches() const = 0;
  virtual RggbRegionStatsV1 GetPatchMeans(size_t patch) const = 0;
  virtual int64_t GetFrameNumber() const = 0;
  virtual int32_t GetBitDepth() const = 0;
  virtual FenceWaitResult WaitForDone(absl::Duration timeout) const = 0;
};

class ORVEX_EXPORT SensorOutputHistogram {
 public:
  virtual ~SensorOutputHistogram();
  virtual size_t GetNumBins() const = 0;
  virtual std::span<const uint32_t> GetRedHistogram() const = 0;
  virtual std::span<const uint32_t> GetGreenHistogram() const = 0;
  virtual std::span<const uint32_t> GetBlueHistogram() const = 0;
  // False unless a producer counts pixels; check before asking for it.
  virtual bool HasTotalPixelCount() const;
  virtual uint64_t GetTotalPixelCount() const = 0;
  virtual int64_t GetFrameNumber() const = 0;
  virtual FenceWaitResult WaitForDone(absl::Duration timeout) const = 0;
};

class ORVEX_EXPORT RgbyHistogram {
 public:
  virtual ~RgbyHistogram();
  virtual size_t GetNumBins() const = 0;
  virtual std::span<const uint32_t> GetRedHistogram() const = 0;
  virtual std::span<const uint32_t> GetGreenHistogram() const = 0;
  virtual std::span<const uint32_t> GetBlueHistogram() const = 0;
  // False unless a producer counts pixels; check before asking for them.
  virtual bool HasTotalPixelCount() const;
  virtual uint64_t GetRedTotalPixelCount() const;    // fatal
  virtual uint64_t GetGreenTotalPixelCount() const;  // fatal
  virtual uint64_t GetBlueTotalPixelCount() const;   // fatal
  virtual uint64_t GetLumaTotalPixelCount() const;   // fatal
  virtual std::span<const uint32_t> GetLumaHistogram() const = 0;
  virtual int64_t GetFrameNumber() const = 0;
  virtual FenceWaitResult WaitForDone(absl::Duration timeout) const = 0;
};

class ORVEX_EXPORT FlickerStatistics {
 public:
  virtual ~FlickerStatistics();
  virtual std::span<const float> GetRowMeans() const = 0;
  virtual absl::Duration GetRowTime() const = 0;
  virtual FenceWaitResult WaitForDone(absl::Duration timeout) const = 0;
};

class ORVEX_EXPORT PdafDefocusResults {
 public:
  virtual ~PdafDefocusResults();
  virtual size_t GetNumRois() const = 0;
  virtual float GetDefocus(size_t roi) const = 0;
  virtual float GetConfidence(size_t roi) const = 0;
};

class ORVEX_EXPORT PdafStatsResults {
 public:
  virtual ~PdafStatsResults();
  virtual size_t GetNumRois() const = 0;
  virtual float GetDisparity(size_t roi) const = 0;
  virtual float GetConfidence(size_t roi) const = 0;
};

class ORVEX_EXPORT ExposureStatistics {
 public:
  virtual ~ExposureStatistics();
  virtual int64_t GetFrameNumber() const = 0;
  virtual absl::Duration GetExposureTime() const = 0;
  virtual float GetAnalogGain() const = 0;
  virtual float GetDigitalGain() const = 0;
  virtual int32_t GetBitDepth() const = 0;
  virtual orvex::GenericRoi<int> GetRoi() const = 0;
  virtual orvex::GenericSize<int> GetGridSize() const = 0;
  virtual float GetRegionLuma(size_t region) const = 0;
  virtual float GetMeanLuma() const = 0;
  virtual float GetSaturatedFraction() const = 0;
  virtual float GetDarkFraction() const = 0;
  virtual std::span<const uint32_t> GetLumaHistogram() const = 0;
  virtual bool HasFace() const = 0;
  virtual float GetFaceLuma() const = 0;
  virtual bool IsValid() const = 0;
  virtual FenceWaitResult WaitForDone(absl::Duration timeout) const = 0;
};

class CdafStatsConfig;

class ORVEX_EXPORT CdafStatistics {
 public:
  virtual ~CdafStatistics();
  virtual CdafRoiStatsV1 GetCdafRoiStatsV1(size_t roi) const;           // fatal
  virtual CdafWindowStatsV1 GetCdafWindowStatsV1(size_t window) const;  // fatal
  virtual CdafMetaDataV1 GetCdafMetaDataV1() const;                     // fatal
  virtual size_t GetNumRois() const;                                    // 0
  virtual size_t GetNumWindows() const;                                 // 0
  virtual const CdafStatsConfig& GetConfig() const = 0;
  virtual int64_t GetFrameNumber() const = 0;
  virtual absl::Time GetTimestamp() const = 0;
  virtual int32_t GetBitDepth() const = 0;
  virtual bool IsValid() const = 0;
  virtual FenceWaitResult WaitForDone(absl::Duration timeout) const = 0;
};

class ORVEX_EXPORT BgsStatistics {
 public:
  virtual ~BgsStatistics();
  virtual BgsRegionStatsV1 GetBgsRegionStatsV1(size_t column, size_t row) const;  // fatal
  virtual size_t GetGridWidth() const;                                            // 0
  virtual size_t GetGridHeight() const;                                           // 0
  virtual FenceWaitResult WaitForDone(absl::Duration timeout) const = 0;
};

class ORVEX_EXPORT PdafStatisticsPerWindowsSet {
 public:
  virtual ~PdafStatisticsPerWindowsSet();
  virtual size_t GetNumWindows() const = 0;
  virtual std::span<const int32_t> GetWindowStats(size_t window) const = 0;
};

class PdafStatsConfiguration;

class ORVEX_EXPORT PdafStatistics {
 public:
  virtual ~PdafStatistics();
  // The per-window-set and full-frame statistics, or null when the producer
  // has none.
  virtual const PdafStatisticsPerWindowsSet* GetWindowsStats() const;
  virtual const PdafStatisticsPerWindowsSet* GetFullframeStats() const;
  virtual const PdafStatsConfiguration& GetConfig() const = 0;
  virtual int64_t GetFrameNumber() const = 0;
  virtual bool IsValid() const = 0;
  virtual FenceWaitResult WaitForDone(absl::Duration timeout) const = 0;
};

class ORVEX_EXPORT MotionMeteringStats {
 public:
  virtual ~MotionMeteringStats();
  virtual orvex::GenericSize<int> GetGridSize() const = 0;
  virtual float GetMotion(size_t cell) const = 0;
  virtual float GetGlobalMotionX() const = 0;
  virtual float GetGlobalMotionY() const = 0;
  virtual float GetConfidence() const = 0;
  virtual int64_t GetFrameNumber() const = 0;
  virtual FenceWaitResult WaitForDone(absl::Duration timeout) const = 0;
};

class ORVEX_EXPORT DrcStats {
 public:
  virtual ~DrcStats();
  virtual size_t GetNumBins() const = 0;
  virtual std::span<const uint32_t> GetHistogram() const = 0;
  virtual float GetDynamicRange() const = 0;
  virtual int64_t GetFrameNumber() const = 0;
  virtual FenceWaitResult WaitForDone(absl::Duration timeout) const = 0;
};

// Configuration records; the versioned ones derive from these.
class ORVEX_EXPORT FlickerStatisticsConfig {
 public:
  virtual ~FlickerStatisticsConfig();
};
class ORVEX_EXPORT CdafStatsConfig {
 public:
  virtual ~CdafStatsConfig();
};
class ORVEX_EXPORT PdafStatsConfiguration {
 public:
  virtual ~PdafStatsConfiguration();
};
class ORVEX_EXPORT MotionMeteringConfig {
 public:
  virtual ~MotionMeteringConfig();
};
class ORVEX_EXPORT LightnessBilateralGridStatsConfig {
 public:
  virtual ~LightnessBilateralGridStatsConfig();
};

}  // namespace orvex_api

#endif  // ORVEX_API_ALGO_DATA_TYPES_STATISTICS_TYPES_H_
