#include "orvex/api/algo/data_types/statistics_types.h"

#include <cstdint>
#include <functional>
#include <string>

#include "gmock/gmock.h"
#include "gtest/gtest.h"

namespace orvex_api {
namespace {

struct Config : CdafStatsConfig, PdafStatsConfiguration {};

// A producer of every kind implementing only what each must, so consumers reach the defaults.
struct Producer : CommonPixelGridStatistics,
                  SensorOutputHistogram,
                  RgbyHistogram,
                  CdafStatistics,
                  BgsStatistics,
                  PdafStatistics {
  const PixelGridStatisticsParams& GetParams() const override { return params_; }
  size_t GetNumRegions() const override { return 1; }
  int64_t GetFrameNumber() const override { return 7; }
  bool IsValid() const override { return true; }
  size_t GetNumBins() const override { return 0; }
  std::span<const uint32_t> GetRedHistogram() const override { return {}; }
  std::span<const uint32_t> GetGreenHistogram() const override { return {}; }
  std::span<const uint32_t> GetBlueHistogram() const override { return {}; }
  std::span<const uint32_t> GetLumaHistogram() const override { return {}; }
  uint64_t GetTotalPixelCount() const override { return 0; }
  absl::Time GetTimestamp() const override { return absl::UnixEpoch(); }
  int32_t GetBitDepth() const override { return 10; }
  FenceWaitResult WaitForDone(absl::Duration) const override { return orvex::OkStatus(); }
  const Config& GetConfig() const override { return config_; }
  PixelGridStatisticsParams params_{{}, 1, 1, 1, 1, 0, 0, 0};
  Config config_;
};

TEST(StatisticsTypesTest, NonFatalDefaultsAndGridExtents) {
  const Producer p;
  EXPECT_FALSE(p.HasRggbRegionStatsV2Extended());
  EXPECT_FALSE(p.SensorOutputHistogram::HasTotalPixelCount());
  EXPECT_FALSE(p.RgbyHistogram::HasTotalPixelCount());
  EXPECT_EQ(p.GetNumRois() + p.GetNumWindows() + p.GetGridWidth() + p.GetGridHeight(), 0u);
  EXPECT_EQ(p.GetWindowsStats(), nullptr);
  EXPECT_EQ(p.GetFullframeStats(), nullptr);
  // A covering or empty region is accepted; the 16-bit extents wrap.
  const PixelGridStatisticsParams params({10, 20, 650, 500}, 16, 12, 40, 40, 3, 4, 99);
  EXPECT_EQ(params.GetRoiWidth(), 640);
  EXPECT_EQ(params.GetRoiHeight(), 480);
  const PixelGridStatisticsParams wrapped({0, 0, 0, 0}, 256, 300, 256, 300, 0, 0, 0);
  EXPECT_EQ(wrapped.GetRoiWidth(), 0);
  EXPECT_EQ(wrapped.GetRoiHeight(), static_cast<int16_t>(90000 - 65536));
}

TEST(StatisticsTypesDeathTest, FatalTexts) {
  const Producer p;
  const auto region = [](orvex::GenericRoi<int> roi) {
    return [roi] { PixelGridStatisticsParams(roi, 16, 12, 40, 40, 0, 0, 0); };
  };
  const std::string width =
      "Check failed: region_of_interest.width\\(\\) == 0 \\|\\| "
      "region_of_interest.width\\(\\) == GetRoiWidth\\(\\) ";
  const std::pair<std::string, std::function<void()>> cases[] = {
      {"GetRggbRegionStatsV1", [&] { (void)p.GetRggbRegionStatsV1(0); }},
      {"GetRggbRegionStatsV2", [&] { (void)p.GetRggbRegionStatsV2(0); }},
      {"GetRggbRegionStatsV2Extended", [&] { (void)p.GetRggbRegionStatsV2Extended(0); }},
      {"GetAeStatsMetadata", [&] { (void)p.GetAeStatsMetadata(); }},
      {"GetAwbLscStatsMetadata", [&] { (void)p.GetAwbLscStatsMetadata(); }},
      {"WaitUntilDone", [&] { (void)p.WaitUntilDone(absl::ZeroDuration()); }},
      {"WaitForDone",
       [&] { (void)p.CommonPixelGridStatistics::WaitForDone(absl::ZeroDuration()); }},
      {"GetRedTotalPixelCount", [&] { (void)p.GetRedTotalPixelCount(); }},
      {"GetGreenTotalPixelCount", [&] { (void)p.GetGreenTotalPixelCount(); }},
      {"GetBlueTotalPixelCount", [&] { (void)p.GetBlueTotalPixelCount(); }},
      {"GetLumaTotalPixelCount", [&] { (void)p.GetLumaTotalPixelCount(); }},
      {"GetCdafRoiStatsV1", [&] { (void)p.GetCdafRoiStatsV1(0); }},
      {"GetCdafWindowStatsV1", [&] { (void)p.GetCdafWindowStatsV1(0); }},
      {"GetCdafMetaDataV1", [&] { (void)p.GetCdafMetaDataV1(); }},
      {"GetBgsRegionStatsV1", [&] { (void)p.GetBgsRegionStatsV1(0, 0); }},
      {width, region({0, 0, 641, 480})},
      {width, region({INT32_MIN, 0, INT32_MAX, 0})},
      {"Check failed: region_of_interest.height\\(\\) == 0 \\|\\| "
       "region_of_interest.height\\(\\) == GetRoiHeight\\(\\) ",
       region({0, 0, 640, 479})},
  };
  for (const auto& [text, call] : cases) {
    SCOPED_TRACE(text);
    const bool check = text.starts_with("Check");
    EXPECT_DEATH(call(),
                 "statistics_types.*\\] " + text + (check ? "" : " not implemented but called\\."));
  }
}

}  // namespace
}  // namespace orvex_api
