#include "orvex/api/algo/data_types/local_tone_mapping_data_v1.h"

#include <cmath>
#include <functional>
#include <string>
#include <vector>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/algo/data_types/vector_targets_testing.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::StatusIs;
using ::testing::Each;
using ::testing::FloatNear;
using Data = LocalToneMappingDataV1;

constexpr float kSentinel = -7.0f;

std::unique_ptr<Data> MakeData() { return HeapAllocateLocalToneMappingDataV1().value(); }

// Writes slope (c 0) and bias (c 1) of every cell from `value(x, y, z, c)`.
void FillGrid(Data& data, const std::function<float(int, int, int, int)>& value) {
  const Data::GridDesc& d = data.grid->desc;
  auto* p = static_cast<uint16_t*>(data.grid->GetPointer());
  for (int i = 0; i < d.width * d.height * d.depth; ++i) {
    const int x = i % d.width, y = i / d.width % d.height, z = i / d.width / d.height;
    const int index = d.stride_x * x + d.stride_y * y + d.stride_z * z;
    p[index] = FloatToHalf(value(x, y, z, 0));
    p[index + d.stride_channel] = FloatToHalf(value(x, y, z, 1));
  }
}

void FillCurve(Data& data, const std::function<float(int)>& value) {
  for (int i = 0; i < 128; ++i) static_cast<float*>(data.guide_curve->GetPointer())[i] = value(i);
}

// The gains of entries 1 to n - 1 of an n-entry table; entry 0 must be 1.
std::vector<float> Gains(const Data& data, int n) {
  std::vector<float> lut(static_cast<size_t>(n) + 1, kSentinel);
  EXPECT_TRUE(data.GetGlobalToneMap(n, lut.data()).ok());
  EXPECT_EQ(lut.front(), 1.0f);
  EXPECT_EQ(lut.back(), kSentinel) << "wrote past the table";
  return std::vector<float>(lut.begin() + 1, lut.end() - 1);
}

// A caller's own storage of `n` elements; none gives a null pointer.
template <typename Base, typename Element>
struct CallerStorage : Base {
  explicit CallerStorage(size_t n) : data(n) {}
  void* GetPointer() override { return data.empty() ? nullptr : data.data(); }
  const void* GetPointer() const override { return data.empty() ? nullptr : data.data(); }
  std::vector<Element> data;
};
using CallerGrid = CallerStorage<Data::Grid, uint16_t>;
using CallerCurve = CallerStorage<Data::GuideCurve, float>;

TEST(HalfConversionTest, KnownValuesRoundingAndRoundTrips) {
  // clang-format off
  const struct { float value; uint16_t half; bool exact; } cases[] = {
      {-2.0f, 0xC000, true}, {0.333251953125f, 0x3555, true}, {0x1p-24f, 1, true},
      {INFINITY, 0x7C00, true}, {65519.0f, 0x7BFF, false}, {65520.0f, 0x7C00, false},
      {-1e9f, 0xFC00, false}, {1 + 0x1p-11f, 0x3C00, false}, {1 + 3 * 0x1p-11f, 0x3C02, false},
      {0x1p-25f, 0, false}, {3 * 0x1p-25f, 2, false}};  // the last four: ties to even
  // clang-format on
  for (const auto& c : cases) {
    SCOPED_TRACE(c.value);
    EXPECT_EQ(FloatToHalf(c.value), c.half);
    if (!c.exact) continue;
    EXPECT_EQ(HalfToFloat(c.half), c.value);
  }
  EXPECT_TRUE(std::isnan(HalfToFloat(FloatToHalf(std::nanf("")))));
  for (uint32_t h = 0; h <= 0xFFFF; ++h) {
    if ((h & 0x7C00) == 0x7C00 && (h & 0x3FF) != 0) continue;  // NaN
    ASSERT_EQ(FloatToHalf(HalfToFloat(static_cast<uint16_t>(h))), h);
  }
}

TEST(LocalToneMappingTest, GainsFollowTheGridAndTheGuideCurve) {
  auto data = MakeData();
  EXPECT_TRUE(Gains(*data, 1).empty());
  // Bin z has slope z + 1, but for one cell that the average must dilute.
  FillGrid(*data, [](int x, int y, int z, int c) {
    return c == 1 ? 0.0f : static_cast<float>(z + 1) + (x == 3 && y == 4 ? 192.0f : 0.0f);
  });
  const std::pair<float, float> cases[] = {{-5.0f, 2.0f}, {NAN, 2.0f}, {5.0f, 9.0f}, {0.5f, 5.5f}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.first);
    FillCurve(*data, [&](int) { return c.first; });
    EXPECT_THAT(Gains(*data, 17), Each(::testing::FloatEq(c.second)));
  }
  // A rising guide curve: the gain at t interpolates the bins around 7 * t.
  FillCurve(*data, [](int i) { return static_cast<float>(i) / 127.0f; });
  EXPECT_THAT(Gains(*data, 8),
              ::testing::Pointwise(FloatNear(1e-4f), std::vector<float>{3, 4, 5, 6, 7, 8, 9}));
  // Zero strides share elements: one slope and bias per row, or one for all.
  const std::pair<Data::GridDesc, std::vector<float>> shared[] = {
      {{16, 12, 8, 2, 0, 32, 0, 1, 2}, {2.0f, 1.5f}},
      {{16, 12, 8, 2, 0, 0, 0, 0, 2}, {1.5f, 1.0f}}};
  for (const auto& [desc, gains] : shared) {
    data->grid->desc = desc;
    FillGrid(*data, [](int, int, int, int c) { return c == 0 ? 1.0f : 0.5f; });
    EXPECT_EQ(Gains(*data, 3), gains);
  }
  // All-zero grids are raised to rise by 1e-6 per entry, and so is a falling one.
  FillGrid(*data, [](int, int, int, int) { return 0.0f; });
  for (int n : {2, 257}) {
    SCOPED_TRACE(n);
    EXPECT_THAT(Gains(*data, n), Each(FloatNear((n - 1) * 1e-6f, (n - 1) * 1e-9f)));
  }
  data->grid->desc = Data::GridDesc();
  FillGrid(*data, [](int, int, int z, int c) { return c == 0 ? (z < 4 ? 1.0f : 0.25f) : 0.0f; });
  const auto g = Gains(*data, 257);  // 256 t gain rises by 256e-6 per entry
  for (size_t k = 1; k < g.size(); ++k)
    EXPECT_GE((k + 1) * double{g[k]} - k * double{g[k - 1]}, 0.9e-6 * 256) << k;
}

// Packed (vector sums), planar and caller-owned padded layouts: one curve.
class LocalToneMappingVectorTest : public VectorTargetTest {};
ORVEX_INSTANTIATE_FOR_VECTOR_TARGETS(LocalToneMappingVectorTest);

TEST_P(LocalToneMappingVectorTest, LayoutsGiveTheSameCurve) {
  // clang-format off
  const struct { int32_t x, y, z, channel; bool caller; } layouts[] = {
      {2, 32, 384, 1, false}, {1, 16, 192, 1536, false}, {2, 64, 768, 1, true},
      {2, 32, 768, 384, true}};
  // clang-format on
  std::vector<float> reference;
  for (const auto& l : layouts) {
    SCOPED_TRACE(::testing::Message() << l.y << " " << l.channel);
    auto data = MakeData();
    if (l.caller) data->grid = std::make_shared<CallerGrid>(768 * 8);
    data->grid->desc = {16, 12, 8, 2, l.x, l.y, l.z, l.channel, 2};
    data->SetIdentity();
    EXPECT_THAT(Gains(*data, 257), Each(1.0f));
    FillGrid(*data, [](int x, int y, int z, int c) {
      return c == 0 ? 0.25f * ((x * 7 + y * 5 + z * 3) % 11 + 1)
                    : 0.05f * ((x + 3 * y + 5 * z) % 9 - 4);
    });
    FillCurve(*data, [](int i) { return std::sqrt(static_cast<float>(i) / 127.0f); });
    const auto gains = Gains(*data, 257);
    if (reference.empty()) reference = gains;
    for (size_t i = 0; i < gains.size(); ++i)
      EXPECT_NEAR(gains[i], reference[i], 1e-5f * reference[i]);
  }
}

// GetGlobalToneMap refuses these without writing; SetIdentity dies on most.
TEST(LocalToneMappingDeathTest, UnsoundDescriptions) {
  const std::string outside = "Grid strides address elements outside the grid buffer";
  const char* layout = "Check failed: GridLayoutFits\\(\\*grid\\) grid layout does not fit";
  const char* no_storage = "Check failed: base != nullptr && curve != nullptr ";
  const char* no_object = "Check failed: grid != nullptr && guide_curve != nullptr ";
  const struct {
    std::function<void(Data&)> spoil;
    std::string message;
    const char* fatal = nullptr;
  } cases[] = {
      {[](Data& d) { d.grid->desc.element_size = 4; }, "Unexpected grid data size", layout},
      {[](Data& d) { d.guide_curve->desc.entry_size = 2; }, "Unexpected guide curve data size",
       "Check failed: guide_curve->desc.entry_size == 4 && "},
      {[](Data& d) { d.grid = std::make_shared<CallerGrid>(0); }, "Empty grid buffer", no_storage},
      {[](Data& d) { d.guide_curve = std::make_shared<CallerCurve>(0); },
       "Empty guide_curve buffer", no_storage},
      {[](Data& d) { d.grid.reset(); }, "Empty grid buffer", no_object},
      {[](Data& d) { d.guide_curve.reset(); }, "Empty guide_curve buffer", no_object},
      {[](Data& d) { d.grid->desc.channels = 3; },
       "Unexpected grid dimension - expected 2 for (slope, bias), got 3"},
      {nullptr, "Gain table size must be at least 1, got 0"},
      {[](Data& d) { d.grid->desc.width = 0; }, "Empty grid: width 0, height 12, depth 8", layout},
      {[](Data& d) { d.grid->desc.height = 0; }, "Empty grid: width 16, height 0, depth 8", layout},
      {[](Data& d) { d.grid->desc.depth = 0; }, "Empty grid: width 16, height 12, depth 0", layout},
      {[](Data& d) { d.guide_curve->desc.num_entries = 0; }, "Empty guide curve: 0 entries"},
      {[](Data& d) { d.guide_curve->desc.num_entries = 129; },  // outruns the heap storage
       "Guide curve entries outside the guide curve buffer",
       "Check failed: GuideCurveFits\\(\\*guide_curve\\) guide curve entries do not fit"},
      // The last bias lands one element past the heap storage.
      {[](Data& d) { d.grid->desc.stride_channel = 2; }, outside, layout},
      {[](Data& d) { d.grid->desc.stride_x = -2; }, outside, layout},
      {[](Data& d) { d.grid->desc.stride_channel = -1; }, outside, layout},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.message);
    auto data = MakeData();
    data->SetIdentity();
    if (c.spoil) c.spoil(*data);
    std::vector<float> lut(8, kSentinel);
    EXPECT_THAT(data->GetGlobalToneMap(c.spoil ? 8 : 0, lut.data()),
                StatusIs(StatusCode::kInvalidArgument, c.message));
    EXPECT_THAT(lut, Each(kSentinel));
    if (c.fatal == nullptr) continue;
    EXPECT_DEATH(data->SetIdentity(), c.fatal);
  }
  EXPECT_DEATH((void)MakeData()->GetGlobalToneMap(4, nullptr),
               "Check failed: gain_lut != nullptr \\(gain_lut=\\(null\\), nullptr=\\(null\\)\\) ");
}

}  // namespace
}  // namespace orvex
