#include "orvex/api/algo/data_types/local_tone_mapping_data_v1.h"

#include <cmath>
#include <cstring>
#include <functional>
#include <limits>
#include <random>
#include <string>
#include <vector>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/algo/data_types/vector_targets_testing.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::IsOk;
using ::orvex::testing::StatusIs;
using ::testing::Each;
using GridDesc = LocalToneMappingDataV1::GridDesc;

constexpr float kSentinel = -7.0f;

std::unique_ptr<LocalToneMappingDataV1> MakeData() {
  auto data = HeapAllocateLocalToneMappingDataV1();
  EXPECT_THAT(data.status(), IsOk());
  return std::move(data).value();
}

// Writes slope and bias of every cell of bin z from `value(x, y, z, channel)`.
void FillGrid(LocalToneMappingDataV1& data, const std::function<float(int, int, int, int)>& value) {
  const GridDesc& d = data.grid->desc;
  auto* p = static_cast<uint16_t*>(data.grid->GetPointer());
  for (int z = 0; z < d.depth; ++z) {
    for (int y = 0; y < d.height; ++y) {
      for (int x = 0; x < d.width; ++x) {
        const int index = d.stride_x * x + d.stride_y * y + d.stride_z * z;
        p[index] = FloatToHalf(value(x, y, z, 0));
        p[index + d.stride_channel] = FloatToHalf(value(x, y, z, 1));
      }
    }
  }
}

void FillCurve(LocalToneMappingDataV1& data, const std::function<float(int)>& value) {
  auto* p = static_cast<float*>(data.guide_curve->GetPointer());
  for (int i = 0; i < data.guide_curve->desc.num_entries; ++i) p[i] = value(i);
}

std::vector<float> ToneMap(const LocalToneMappingDataV1& data, int n) {
  std::vector<float> lut(static_cast<size_t>(n) + 1, kSentinel);
  EXPECT_THAT(data.GetGlobalToneMap(n, lut.data()), IsOk());
  EXPECT_EQ(lut.back(), kSentinel) << "wrote past the table";
  lut.pop_back();
  return lut;
}

// A caller's own storage of `n` elements; none gives a null pointer.
template <typename Base, typename Element>
class CallerStorage : public Base {
 public:
  explicit CallerStorage(size_t n) : data_(n) {}
  void* GetPointer() override { return data_.empty() ? nullptr : data_.data(); }
  const void* GetPointer() const override { return data_.empty() ? nullptr : data_.data(); }

 private:
  std::vector<Element> data_;
};
using CallerGrid = CallerStorage<LocalToneMappingDataV1::Grid, uint16_t>;
using CallerCurve = CallerStorage<LocalToneMappingDataV1::GuideCurve, float>;

TEST(HalfConversionTest, KnownValuesAndRounding) {
  const struct {
    uint16_t half;
    float value;
  } cases[] = {{0x8000, -0.0f},           {0xC000, -2.0f},
               {0x3555, 0.333251953125f}, {0x7BFF, 65504.0f},
               {0x0001, 0x1p-24f},        {0x03FF, 1023 * 0x1p-24f},
               {0x0400, 0x1p-14f},        {0x7C00, std::numeric_limits<float>::infinity()}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.half);
    EXPECT_EQ(HalfToFloat(c.half), c.value);
    EXPECT_EQ(FloatToHalf(c.value), c.half);
  }
  // Ties round to even; beyond the largest half is infinity.
  EXPECT_EQ(FloatToHalf(1.0f + 0x1p-11f), 0x3C00);
  EXPECT_EQ(FloatToHalf(1.0f + 3 * 0x1p-11f), 0x3C02);
  EXPECT_EQ(FloatToHalf(0x1p-25f), 0x0000);
  EXPECT_EQ(FloatToHalf(3 * 0x1p-25f), 0x0002);
  EXPECT_EQ(FloatToHalf(65519.0f), 0x7BFF);
  EXPECT_EQ(FloatToHalf(65520.0f), 0x7C00);
  EXPECT_EQ(FloatToHalf(-1e9f), 0xFC00);
  EXPECT_TRUE(std::isnan(HalfToFloat(FloatToHalf(std::nanf("")))));
  // Every non-NaN half survives a round trip.
  for (uint32_t h = 0; h <= 0xFFFF; ++h) {
    if ((h & 0x7C00) == 0x7C00 && (h & 0x3FF) != 0) continue;
    ASSERT_EQ(FloatToHalf(HalfToFloat(static_cast<uint16_t>(h))), h);
  }
}

TEST(LocalToneMappingTest, ToneMapsOfSimpleGrids) {
  std::mt19937 rng(5);
  std::uniform_real_distribution<float> any(-0.5f, 1.5f);
  auto data = MakeData();
  data->SetIdentity();
  EXPECT_THAT(ToneMap(*data, 256), Each(1.0f));
  EXPECT_EQ(ToneMap(*data, 1), std::vector<float>{1.0f});

  // A constant slope of 2 gives a gain of 2 whatever the guide curve.
  FillGrid(*data, [](int, int, int, int c) { return c == 0 ? 2.0f : 0.0f; });
  FillCurve(*data, [&](int) { return any(rng); });
  const auto doubled = ToneMap(*data, 257);
  EXPECT_EQ(doubled[0], 1.0f);
  for (size_t i = 1; i < doubled.size(); ++i) EXPECT_FLOAT_EQ(doubled[i], 2.0f) << i;

  // Slope 1, bias 0.5: gain 1 + 0.5 / t.
  FillGrid(*data, [](int, int, int, int c) { return c == 0 ? 1.0f : 0.5f; });
  EXPECT_THAT(ToneMap(*data, 3), ::testing::ElementsAre(1.0f, 2.0f, 1.5f));
}

TEST(LocalToneMappingTest, GuideCurveSelectsAndClampsBins) {
  auto data = MakeData();
  // Bin d has slope d + 1 in every cell, plus one outlier cell per bin that
  // the spatial average must dilute.
  FillGrid(*data, [](int x, int y, int z, int c) {
    if (c == 1) return 0.0f;
    return (x == 3 && y == 4) ? static_cast<float>(z + 1) + 192.0f : static_cast<float>(z + 1);
  });
  const struct {
    float guide;
    float gain;
  } cases[] = {{-5.0f, 2.0f}, {std::nanf(""), 2.0f}, {0.0f, 2.0f},
               {5.0f, 9.0f},  {1.0f, 9.0f},          {0.5f, 5.5f}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.guide);
    FillCurve(*data, [&](int) { return c.guide; });
    const auto lut = ToneMap(*data, 17);
    for (size_t i = 1; i < lut.size(); ++i) EXPECT_FLOAT_EQ(lut[i], c.gain) << i;
  }
  // A rising guide curve walks through the bins: the gain at t interpolates
  // between the slopes of the two bins around 7 * t.
  FillCurve(*data, [](int i) { return static_cast<float>(i) / 127.0f; });
  const auto lut = ToneMap(*data, 8);
  for (int i = 1; i < 8; ++i) EXPECT_NEAR(lut[i], 2.0f + i, 1e-4f) << i;
}

// The packed layout takes the vector kernel (once per target); the planar
// one and a caller's grid with rows padded to 64 elements the scalar loop.
// All give the identity and the same curve.
class LocalToneMappingVectorTest : public VectorTargetTest {};
ORVEX_INSTANTIATE_FOR_VECTOR_TARGETS(LocalToneMappingVectorTest);

TEST_P(LocalToneMappingVectorTest, LayoutsGiveTheSameCurve) {
  std::mt19937 rng(11);
  std::uniform_real_distribution<float> slope(0.25f, 3.0f), bias(-0.2f, 0.2f);
  std::vector<float> values(16 * 12 * 8 * 2);
  for (size_t i = 0; i < values.size(); ++i) values[i] = (i % 2 == 0) ? slope(rng) : bias(rng);
  const struct {
    int32_t x, y, z, channel;
    bool caller;
  } layouts[] = {{2, 32, 384, 1, false}, {1, 16, 192, 1536, false}, {2, 64, 768, 1, true}};
  std::vector<float> reference;
  for (const auto& l : layouts) {
    SCOPED_TRACE(l.channel);
    auto data = MakeData();
    if (l.caller) data->grid = std::make_shared<CallerGrid>(768 * 8);
    data->grid->desc = {16, 12, 8, 2, l.x, l.y, l.z, l.channel, 2};
    data->SetIdentity();
    EXPECT_THAT(ToneMap(*data, 257), Each(1.0f));
    FillGrid(*data,
             [&](int x, int y, int z, int c) { return values[(((z * 12) + y) * 16 + x) * 2 + c]; });
    FillCurve(*data, [](int i) { return std::sqrt(static_cast<float>(i) / 127.0f); });
    const auto lut = ToneMap(*data, 257);
    if (reference.empty()) reference = lut;
    for (size_t i = 0; i < lut.size(); ++i) EXPECT_NEAR(lut[i], reference[i], 1e-5f * reference[i]);
  }
}

TEST(LocalToneMappingTest, FallingCurvesAreRaised) {
  auto data = MakeData();
  FillGrid(*data, [](int, int, int, int) { return 0.0f; });
  FillCurve(*data, [](int) { return 0.5f; });
  for (int n : {2, 9, 257}) {
    SCOPED_TRACE(n);
    const auto lut = ToneMap(*data, n);
    EXPECT_EQ(lut[0], 1.0f);
    for (int i = 1; i < n; ++i) EXPECT_NEAR(lut[i], (n - 1) * 1e-6f, (n - 1) * 1e-9f) << i;
  }
  // A curve that falls halfway is held just above its previous value.
  FillGrid(*data, [](int, int, int z, int c) { return c == 0 ? (z < 4 ? 1.0f : 0.25f) : 0.0f; });
  FillCurve(*data, [](int i) { return static_cast<float>(i) / 127.0f; });
  const auto lut = ToneMap(*data, 257);
  float previous = 0.0f;
  for (int i = 1; i < 257; ++i) {
    const float v = (static_cast<float>(i) / 256.0f) * lut[static_cast<size_t>(i)];
    EXPECT_GE(v, previous + 0.9e-6f) << i;
    previous = v;
  }
}

TEST(LocalToneMappingTest, InvalidInputsWriteNothing) {
  using Data = LocalToneMappingDataV1;
  const std::string outside = "Grid strides address elements outside the grid buffer";
  const std::pair<std::function<void(Data&)>, std::string> cases[] = {
      {[](Data& d) { d.grid->desc.element_size = 4; }, "Unexpected grid data size"},
      {[](Data& d) { d.guide_curve->desc.entry_size = 2; }, "Unexpected guide curve data size"},
      {[](Data& d) { d.grid = std::make_shared<CallerGrid>(0); }, "Empty grid buffer"},
      {[](Data& d) { d.guide_curve = std::make_shared<CallerCurve>(0); },
       "Empty guide_curve buffer"},
      {[](Data& d) { d.grid.reset(); }, "Empty grid buffer"},
      {[](Data& d) { d.guide_curve.reset(); }, "Empty guide_curve buffer"},
      {[](Data& d) { d.grid->desc.channels = 3; },
       "Unexpected grid dimension - expected 2 for (slope, bias), got 3"},
      {nullptr, "Gain table size must be at least 1, got 0"},
      {[](Data& d) { d.grid->desc.width = 0; }, "Empty grid: width 0, height 12, depth 8"},
      {[](Data& d) { d.grid->desc.height = 0; }, "Empty grid: width 16, height 0, depth 8"},
      {[](Data& d) { d.grid->desc.depth = -1; }, "Empty grid: width 16, height 12, depth -1"},
      {[](Data& d) { d.guide_curve->desc.num_entries = 0; }, "Empty guide curve: 0 entries"},
      {[](Data& d) { d.guide_curve->desc.num_entries = 129; },  // outruns the heap storage
       "Guide curve entries outside the guide curve buffer"},
      {[](Data& d) { d.grid->desc.stride_z = 385; }, outside},  // outruns the heap storage
      {[](Data& d) { d.grid->desc.width = 17; }, outside},      // outruns the heap storage
      {[](Data& d) { d.grid->desc.stride_x = -2; }, outside},
      {[](Data& d) { d.grid->desc.stride_channel = -1; }, outside},
  };
  for (const auto& [spoil, message] : cases) {
    SCOPED_TRACE(message);
    auto data = MakeData();
    data->SetIdentity();
    if (spoil) spoil(*data);
    std::vector<float> lut(8, kSentinel);
    EXPECT_THAT(data->GetGlobalToneMap(spoil ? 8 : 0, lut.data()),
                StatusIs(StatusCode::kInvalidArgument, message));
    EXPECT_THAT(lut, Each(kSentinel));
  }
}

TEST(LocalToneMappingDeathTest, ContractViolations) {
  auto data = MakeData();
  data->SetIdentity();
  EXPECT_DEATH((void)data->GetGlobalToneMap(4, nullptr),
               "Check failed: gain_lut != nullptr \\(gain_lut=\\(null\\), nullptr=\\(null\\)\\) ");
  // SetIdentity writes through the descriptions, so they must be sound.
  const std::pair<std::function<void(LocalToneMappingDataV1&)>, const char*> cases[] = {
      {[](auto& d) { d.grid.reset(); }, "Check failed: grid != nullptr && guide_curve != nullptr "},
      {[](auto& d) { d.grid->desc.stride_y = 400; },
       "Check failed: GridLayoutFits\\(\\*grid\\) grid layout does not fit its storage"},
      {[](auto& d) { d.guide_curve->desc.num_entries = 129; },
       "Check failed: GuideCurveFits\\(\\*guide_curve\\) guide curve entries do not fit its "
       "storage"},
      {[](auto& d) { d.guide_curve->desc.entry_size = 8; },
       "Check failed: guide_curve->desc.entry_size == 4 && guide_curve->desc.num_entries >= 0 "},
      {[](auto& d) { d.guide_curve = std::make_shared<CallerCurve>(0); },
       "Check failed: base != nullptr && curve != nullptr "},
  };
  for (const auto& [spoil, text] : cases) {
    SCOPED_TRACE(text);
    auto spoilt = MakeData();
    spoil(*spoilt);
    EXPECT_DEATH(spoilt->SetIdentity(), text);
  }
}

}  // namespace
}  // namespace orvex
