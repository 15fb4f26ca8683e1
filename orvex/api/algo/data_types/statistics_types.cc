#include "orvex/api/algo/data_types/statistics_types.h"

#include <string_view>

#include "orvex/status/log.h"

namespace orvex_api {
namespace {

// The default body of an accessor that a producer must override before
// its consumers call it.
[[noreturn]] void NotImplemented(std::string_view operation) {
  ORVEX_LOG(FATAL) << operation << " not implemented but called.";
  __builtin_unreachable();
}

// right - left without overflow for any pair of edges.
int64_t Extent(int lower, int upper) { return int64_t{upper} - int64_t{lower}; }

}  // namespace

PixelGridStatisticsParams::PixelGridStatisticsParams(
    const orvex::GenericRoi<int>& region, int16_t grid_width_cells, int16_t grid_height_cells,
    int16_t cell_width_pixels, int16_t cell_height_pixels, int16_t aux_x_value, int16_t aux_y_value,
    int32_t aux)
    : region_of_interest(region),
      cell_width(cell_width_pixels),
      cell_height(cell_height_pixels),
      grid_width(grid_width_cells),
      grid_height(grid_height_cells),
      start_x(region.left),
      start_y(region.top),
      aux_x(aux_x_value),
      aux_y(aux_y_value),
      aux_value(aux) {
  // The extents are computed in 64 bits so that extreme edges cannot
  // overflow; the texts name the conditions as callers know them.
  const int64_t width = Extent(region.left, region.right);
  const int64_t height = Extent(region.top, region.bottom);
  if (width != 0 && width != GetRoiWidth()) {
    ORVEX_LOG(FATAL) << "Check failed: region_of_interest.width() == 0 || "
                        "region_of_interest.width() == GetRoiWidth() ";
  }
  if (height != 0 && height != GetRoiHeight()) {
    ORVEX_LOG(FATAL) << "Check failed: region_of_interest.height() == 0 || "
                        "region_of_interest.height() == GetRoiHeight() ";
  }
}

// The products wrap to 16 bits (modular conversion).
int16_t PixelGridStatisticsParams::GetRoiWidth() const {
  return static_cast<int16_t>(grid_width * cell_width);
}
int16_t PixelGridStatisticsParams::GetRoiHeight() const {
  return static_cast<int16_t>(grid_height * cell_height);
}

CommonPixelGridStatistics::~CommonPixelGridStatistics() = default;
RggbRegionStatsV1 CommonPixelGridStatistics::GetRggbRegionStatsV1(size_t) const {
  NotImplemented("GetRggbRegionStatsV1");
}
RggbRegionStatsV2 CommonPixelGridStatistics::GetRggbRegionStatsV2(size_t) const {
  NotImplemented("GetRggbRegionStatsV2");
}
bool CommonPixelGridStatistics::HasRggbRegionStatsV2Extended() const { return false; }
RggbRegionStatsV2Extended CommonPixelGridStatistics::GetRggbRegionStatsV2Extended(size_t) const {
  NotImplemented("GetRggbRegionStatsV2Extended");
}
AeStatsMetadata CommonPixelGridStatistics::GetAeStatsMetadata() const {
  NotImplemented("GetAeStatsMetadata");
}
AwbLscStatsMetadata CommonPixelGridStatistics::GetAwbLscStatsMetadata() const {
  NotImplemented("GetAwbLscStatsMetadata");
}
FenceWaitResult CommonPixelGridStatistics::WaitUntilDone(absl::Duration) const {
  NotImplemented("WaitUntilDone");
}
FenceWaitResult CommonPixelGridStatistics::WaitForDone(absl::Duration) const {
  NotImplemented("WaitForDone");
}

UnclippedPixelGridStatistics::~UnclippedPixelGridStatistics() = default;
PixelPatchStatistics::~PixelPatchStatistics() = default;

SensorOutputHistogram::~SensorOutputHistogram() = default;
bool SensorOutputHistogram::HasTotalPixelCount() const { return false; }

RgbyHistogram::~RgbyHistogram() = default;
bool RgbyHistogram::HasTotalPixelCount() const { return false; }
uint64_t RgbyHistogram::GetRedTotalPixelCount() const { NotImplemented("GetRedTotalPixelCount"); }
uint64_t RgbyHistogram::GetGreenTotalPixelCount() const {
  NotImplemented("GetGreenTotalPixelCount");
}
uint64_t RgbyHistogram::GetBlueTotalPixelCount() const { NotImplemented("GetBlueTotalPixelCount"); }
uint64_t RgbyHistogram::GetLumaTotalPixelCount() const { NotImplemented("GetLumaTotalPixelCount"); }

FlickerStatistics::~FlickerStatistics() = default;
PdafDefocusResults::~PdafDefocusResults() = default;
PdafStatsResults::~PdafStatsResults() = default;
ExposureStatistics::~ExposureStatistics() = default;

CdafStatistics::~CdafStatistics() = default;
CdafRoiStatsV1 CdafStatistics::GetCdafRoiStatsV1(size_t) const {
  NotImplemented("GetCdafRoiStatsV1");
}
CdafWindowStatsV1 CdafStatistics::GetCdafWindowStatsV1(size_t) const {
  NotImplemented("GetCdafWindowStatsV1");
}
CdafMetaDataV1 CdafStatistics::GetCdafMetaDataV1() const { NotImplemented("GetCdafMetaDataV1"); }
size_t CdafStatistics::GetNumRois() const { return 0; }
size_t CdafStatistics::GetNumWindows() const { return 0; }

BgsStatistics::~BgsStatistics() = default;
BgsRegionStatsV1 BgsStatistics::GetBgsRegionStatsV1(size_t, size_t) const {
  NotImplemented("GetBgsRegionStatsV1");
}
size_t BgsStatistics::GetGridWidth() const { return 0; }
size_t BgsStatistics::GetGridHeight() const { return 0; }

PdafStatisticsPerWindowsSet::~PdafStatisticsPerWindowsSet() = default;
PdafStatistics::~PdafStatistics() = default;
const PdafStatisticsPerWindowsSet* PdafStatistics::GetWindowsStats() const { return nullptr; }
const PdafStatisticsPerWindowsSet* PdafStatistics::GetFullframeStats() const { return nullptr; }

MotionMeteringStats::~MotionMeteringStats() = default;
DrcStats::~DrcStats() = default;

FlickerStatisticsConfig::~FlickerStatisticsConfig() = default;
CdafStatsConfig::~CdafStatsConfig() = default;
PdafStatsConfiguration::~PdafStatsConfiguration() = default;
MotionMeteringConfig::~MotionMeteringConfig() = default;
LightnessBilateralGridStatsConfig::~LightnessBilateralGridStatsConfig() = default;

}  // namespace orvex_api
