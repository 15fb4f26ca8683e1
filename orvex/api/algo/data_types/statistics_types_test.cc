#include "orvex/api/algo/data_types/statistics_types.h"

#include <cstdint>
#include <functional>
#include <string>

#include "gmock/gmock.h"
#include "gtest/gtest.h"

namespace orvex_api {
namespace {

// Producers that implement only what every producer must, so that the
// library's defaults are what consumers reach.
struct GridStats : CommonPixelGridStatistics {
  const PixelGridStatisticsParams& GetParams() const override { return params_; }
  size_t GetNumRegions() const override { return 1; }
  int64_t GetFrameNumber() const override { return 7; }
  bool IsValid() const override { return true; }
  PixelGridStatisticsParams params_{{}, 1, 1, 1, 1, 0, 0, 0};
};

struct OutputHistogram : SensorOutputHistogram {
  size_t GetNumBins() const override { return 0; }
  std::span<const uint32_t> GetRedHistogram() const override { return {}; }
  std::span<const uint32_t> GetGreenHistogram() const override { return {}; }
  std::span<const uint32_t> GetBlueHistogram() const override { return {}; }
  uint64_t GetTotalPixelCount() const override { return 0; }
  int64_t GetFrameNumber() const override { return 0; }
  FenceWaitResult WaitForDone(absl::Duration) const override { return orvex::OkStatus(); }
};

struct Rgby : RgbyHistogram {
  size_t GetNumBins() const override { return 0; }
  std::span<const uint32_t> GetRedHistogram() const override { return {}; }
  std::span<const uint32_t> GetGreenHistogram() const override { return {}; }
  std::span<const uint32_t> GetBlueHistogram() const override { return {}; }
  std::span<const uint32_t> GetLumaHistogram() const override { return {}; }
  int64_t GetFrameNumber() const override { return 0; }
  FenceWaitResult WaitForDone(absl::Duration) const override { return orvex::OkStatus(); }
};

struct Cdaf : CdafStatistics {
  const CdafStatsConfig& GetConfig() const override { return config_; }
  int64_t GetFrameNumber() const override { return 0; }
  absl::Time GetTimestamp() const override { return absl::UnixEpoch(); }
  int32_t GetBitDepth() const override { return 10; }
  bool IsValid() const override { return true; }
  FenceWaitResult WaitForDone(absl::Duration) const override { return orvex::OkStatus(); }
  CdafStatsConfig config_;
};

struct Bgs : BgsStatistics {
  FenceWaitResult WaitForDone(absl::Duration) const override { return orvex::OkStatus(); }
};

struct Pdaf : PdafStatistics {
  const PdafStatsConfiguration& GetConfig() const override { return config_; }
  int64_t GetFrameNumber() const override { return 0; }
  bool IsValid() const override { return true; }
  FenceWaitResult WaitForDone(absl::Duration) const override { return orvex::OkStatus(); }
  PdafStatsConfiguration config_;
};

TEST(StatisticsTypesTest, NonFatalDefaults) {
  const GridStats grid;
  const Cdaf cdaf;
  const Bgs bgs;
  const Pdaf pdaf;
  EXPECT_FALSE(grid.HasRggbRegionStatsV2Extended());
  EXPECT_FALSE(OutputHistogram().HasTotalPixelCount());
  EXPECT_FALSE(Rgby().HasTotalPixelCount());
  EXPECT_EQ(cdaf.GetNumRois() + cdaf.GetNumWindows() + bgs.GetGridWidth() + bgs.GetGridHeight(),
            0u);
  EXPECT_EQ(pdaf.GetWindowsStats(), nullptr);
  EXPECT_EQ(pdaf.GetFullframeStats(), nullptr);
}

TEST(StatisticsTypesDeathTest, FatalTexts) {
  const GridStats grid;
  const Rgby rgby;
  const Cdaf cdaf;
  const Bgs bgs;
  const std::string fits =
      "Check failed: region_of_interest.width\\(\\) == 0 \\|\\| "
      "region_of_interest.width\\(\\) == GetRoiWidth\\(\\) ";
  const std::pair<std::string, std::function<void()>> cases[] = {
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
      // A region that does not fit the grid; edges far apart are compared
      // without overflow.
      {fits,
       [] {
         PixelGridStatisticsParams({0, 0, 641, 480}, 16, 12, 40, 40, 0, 0, 0);
       }},
      {fits,
       [] {
         PixelGridStatisticsParams({INT32_MIN, 0, INT32_MAX, 0}, 1, 1, 1, 1, 0, 0, 0);
       }},
      {"Check failed: region_of_interest.height\\(\\) == 0 \\|\\| "
       "region_of_interest.height\\(\\) == GetRoiHeight\\(\\) ",
       [] {
         PixelGridStatisticsParams({0, 0, 640, 479}, 16, 12, 40, 40, 0, 0, 0);
       }},
  };
  for (const auto& [text, call] : cases) {
    SCOPED_TRACE(text);
    const bool check = text.starts_with("Check");
    EXPECT_DEATH(call(),
                 "statistics_types.*\\] " + text + (check ? "" : " not implemented but called\\."));
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
  EXPECT_EQ(PixelGridStatisticsParams({5, 5, 5, 5}, 3, 7, 11, 13, 0, 0, 0).GetRoiWidth(), 33);
  EXPECT_EQ(PixelGridStatisticsParams({0, 9, 640, 9}, 16, 7, 40, 13, 0, 0, 0).start_y, 9);
  // The 16-bit products wrap: 256 * 256 cells is an extent of 0.
  const PixelGridStatisticsParams wrapped({0, 0, 0, 0}, 256, 300, 256, 300, 0, 0, 0);
  EXPECT_EQ(wrapped.GetRoiWidth(), 0);
  EXPECT_EQ(wrapped.GetRoiHeight(), static_cast<int16_t>(90000 - 65536));
}

}  // namespace
}  // namespace orvex_api
