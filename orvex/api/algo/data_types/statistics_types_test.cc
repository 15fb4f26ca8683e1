#include "orvex/api/algo/data_types/statistics_types.h"

#include <functional>
#include <string>

#include "gmock/gmock.h"
#include "gtest/gtest.h"

namespace orvex_api {
namespace {

// Producers that implement only what every producer must, so that the
// library's defaults are what consumers reach.
class GridStats : public CommonPixelGridStatistics {
 public:
  const PixelGridStatisticsParams& GetParams() const override { return params_; }
  size_t GetNumRegions() const override { return 1; }
  int64_t GetFrameNumber() const override { return 7; }
  bool IsValid() const override { return true; }

 private:
  PixelGridStatisticsParams params_{{}, 1, 1, 1, 1, 0, 0, 0};
};

class OutputHistogram : public SensorOutputHistogram {
 public:
  size_t GetNumBins() const override { return 0; }
  std::span<const uint32_t> GetRedHistogram() const override { return {}; }
  std::span<const uint32_t> GetGreenHistogram() const override { return {}; }
  std::span<const uint32_t> GetBlueHistogram() const override { return {}; }
  uint64_t GetTotalPixelCount() const override { return 0; }
  int64_t GetFrameNumber() const override { return 0; }
  FenceWaitResult WaitForDone(absl::Duration) const override { return orvex::OkStatus(); }
};

class Rgby : public RgbyHistogram {
 public:
  size_t GetNumBins() const override { return 0; }
  std::span<const uint32_t> GetRedHistogram() const override { return {}; }
  std::span<const uint32_t> GetGreenHistogram() const override { return {}; }
  std::span<const uint32_t> GetBlueHistogram() const override { return {}; }
  std::span<const uint32_t> GetLumaHistogram() const override { return {}; }
  int64_t GetFrameNumber() const override { return 0; }
  FenceWaitResult WaitForDone(absl::Duration) const override { return orvex::OkStatus(); }
};

class Cdaf : public CdafStatistics {
 public:
  const CdafStatsConfig& GetConfig() const override { return config_; }
  int64_t GetFrameNumber() const override { return 0; }
  absl::Time GetTimestamp() const override { return absl::UnixEpoch(); }
  int32_t GetBitDepth() const override { return 10; }
  bool IsValid() const override { return true; }
  FenceWaitResult WaitForDone(absl::Duration) const override { return orvex::OkStatus(); }

 private:
  CdafStatsConfig config_;
};

class Bgs : public BgsStatistics {
 public:
  FenceWaitResult WaitForDone(absl::Duration) const override { return orvex::OkStatus(); }
};

class Pdaf : public PdafStatistics {
 public:
  const PdafStatsConfiguration& GetConfig() const override { return config_; }
  int64_t GetFrameNumber() const override { return 0; }
  bool IsValid() const override { return true; }
  FenceWaitResult WaitForDone(absl::Duration) const override { return orvex::OkStatus(); }

 private:
  PdafStatsConfiguration config_;
};

TEST(StatisticsTypesTest, NonFatalDefaults) {
  const GridStats grid;
  const OutputHistogram output;
  const Rgby rgby;
  const Cdaf cdaf;
  const Bgs bgs;
  const Pdaf pdaf;
  EXPECT_FALSE(grid.HasRggbRegionStatsV2Extended());
  EXPECT_FALSE(output.HasTotalPixelCount());
  EXPECT_FALSE(rgby.HasTotalPixelCount());
  EXPECT_EQ(cdaf.GetNumRois(), 0u);
  EXPECT_EQ(cdaf.GetNumWindows(), 0u);
  EXPECT_EQ(bgs.GetGridWidth(), 0u);
  EXPECT_EQ(bgs.GetGridHeight(), 0u);
  EXPECT_EQ(pdaf.GetWindowsStats(), nullptr);
  EXPECT_EQ(pdaf.GetFullframeStats(), nullptr);
}

TEST(StatisticsTypesDeathTest, FatalDefaultsNameTheOperation) {
  const GridStats grid;
  const Rgby rgby;
  const Cdaf cdaf;
  const Bgs bgs;
  const std::pair<const char*, std::function<void()>> cases[] = {
      {"GetRggbRegionStatsV1", [&] { (void)grid.GetRggbRegionStatsV1(0); }},
      {"GetRggbRegionStatsV2", [&] { (void)grid.GetRggbRegionStatsV2(0); }},
      {"GetRggbRegionStatsV2Extended", [&] { (void)grid.GetRggbRegionStatsV2Extended(0); }},
      {"GetAeStatsMetadata", [&] { (void)grid.GetAeStatsMetadata(); }},
      {"GetAwbLscStatsMetadata", [&] { (void)grid.GetAwbLscStatsMetadata(); }},
      {"WaitUntilDone", [&] { (void)grid.WaitUntilDone(absl::ZeroDuration()); }},
      {"WaitForDone", [&] { (void)grid.WaitForDone(absl::ZeroDuration()); }},
      {"GetRedTotalPixelCount", [&] { (void)rgby.GetRedTotalPixelCount(); }},
      {"GetGreenTotalPixelCount", [&] { (void)rgby.GetGreenTotalPixelCount(); }},
      {"GetBlueTotalPixelCount", [&] { (void)rgby.GetBlueTotalPixelCount(); }},
      {"GetLumaTotalPixelCount", [&] { (void)rgby.GetLumaTotalPixelCount(); }},
      {"GetCdafRoiStatsV1", [&] { (void)cdaf.GetCdafRoiStatsV1(0); }},
      {"GetCdafWindowStatsV1", [&] { (void)cdaf.GetCdafWindowStatsV1(0); }},
      {"GetCdafMetaDataV1", [&] { (void)cdaf.GetCdafMetaDataV1(); }},
      {"GetBgsRegionStatsV1", [&] { (void)bgs.GetBgsRegionStatsV1(0, 0); }},
  };
  for (const auto& [name, call] : cases) {
    SCOPED_TRACE(name);
    EXPECT_DEATH(call(),
                 std::string("statistics_types.*\\] ") + name + " not implemented but called\\.");
  }
}

TEST(PixelGridStatisticsParamsTest, LayoutAndAcceptedRegions) {
  const PixelGridStatisticsParams p({10, 20, 650, 500}, 16, 12, 40, 40, 3, 4, 99);
  EXPECT_EQ(p.GetRoiWidth(), 640);
  EXPECT_EQ(p.GetRoiHeight(), 480);
  EXPECT_EQ(p.start_x, 10);
  EXPECT_EQ(p.start_y, 20);
  EXPECT_THAT(p.reserved, ::testing::Each(0));
  // Empty in either dimension: accepted whatever the grid.
  const PixelGridStatisticsParams empty({5, 5, 5, 5}, 3, 7, 11, 13, 0, 0, 0);
  EXPECT_EQ(empty.GetRoiWidth(), 33);
  const PixelGridStatisticsParams empty_height({0, 9, 640, 9}, 16, 7, 40, 13, 0, 0, 0);
  EXPECT_EQ(empty_height.start_y, 9);
  // The 16-bit products wrap: 256 * 256 cells is an extent of 0.
  const PixelGridStatisticsParams wrapped({0, 0, 0, 0}, 256, 300, 256, 300, 0, 0, 0);
  EXPECT_EQ(wrapped.GetRoiWidth(), 0);
  EXPECT_EQ(wrapped.GetRoiHeight(), static_cast<int16_t>(90000 - 65536));
}

TEST(PixelGridStatisticsParamsDeathTest, RegionMustCoverTheGrid) {
  EXPECT_DEATH(PixelGridStatisticsParams({0, 0, 641, 480}, 16, 12, 40, 40, 0, 0, 0),
               "Check failed: region_of_interest.width\\(\\) == 0 \\|\\| "
               "region_of_interest.width\\(\\) == GetRoiWidth\\(\\) ");
  EXPECT_DEATH(PixelGridStatisticsParams({0, 0, 640, 479}, 16, 12, 40, 40, 0, 0, 0),
               "Check failed: region_of_interest.height\\(\\) == 0 \\|\\| "
               "region_of_interest.height\\(\\) == GetRoiHeight\\(\\) ");
  // Edges far apart are compared without overflow.
  EXPECT_DEATH(PixelGridStatisticsParams({-2147483647 - 1, 0, 2147483647, 0}, 1, 1, 1, 1, 0, 0, 0),
               "region_of_interest.width\\(\\) == GetRoiWidth\\(\\) ");
}

}  // namespace
}  // namespace orvex_api
