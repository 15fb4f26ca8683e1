#include "orvex/api/algo/data_types/local_tone_mapping_data_v1.h"

#include <algorithm>
#include <cmath>
#include <cstring>
#include <vector>

#include "orvex/api/algo/data_types/data_kernels.h"
#include "orvex/status/log.h"
#include "orvex/status/status_builder.h"

namespace orvex {
namespace {

constexpr uint16_t kHalfOne = 0x3C00;
constexpr float kMinRise = 1e-6f;

// Heap storage for a grid (binary16 elements) or a guide curve (floats):
// one array of desc.GetBufferSize() bytes, typed so that it is aligned for
// its elements.
template <typename Base, typename Element>
class HeapStorage final : public Base {
 public:
  explicit HeapStorage(const decltype(Base::desc)& storage_desc)
      : elements_(static_cast<size_t>(storage_desc.GetBufferSize()) / sizeof(Element)),
        storage_(std::make_shared<Element[]>(elements_)) {
    this->desc = storage_desc;
  }
  void* GetPointer() override { return storage_.get(); }
  const void* GetPointer() const override { return storage_.get(); }
  // The allocation, which a later change of `desc` does not follow.
  int64_t elements() const { return static_cast<int64_t>(elements_); }

 private:
  size_t elements_;
  std::shared_ptr<Element[]> storage_;
};
using HeapGrid = HeapStorage<LocalToneMappingDataV1::Grid, uint16_t>;
using HeapGuideCurve = HeapStorage<LocalToneMappingDataV1::GuideCurve, float>;

// The elements the library knows `storage` to hold: a heap grid's or heap
// guide curve's allocation. -1 for a caller's own storage, which must cover
// whatever its description addresses.
template <typename Heap, typename Storage>
int64_t KnownElements(const Storage& storage) {
  const auto* heap = dynamic_cast<const Heap*>(&storage);
  return heap == nullptr ? -1 : heap->elements();
}

// True when `grid` has binary16 elements, at least two channels, a cell in
// each dimension and no negative stride, and, where its storage is known,
// every slope and bias element its strides address lies inside it.
bool GridLayoutFits(const LocalToneMappingDataV1::Grid& grid) {
  const LocalToneMappingDataV1::GridDesc& d = grid.desc;
  if (d.width <= 0 || d.height <= 0 || d.depth <= 0 || d.channels < 2) return false;
  if (d.element_size != 2) return false;
  if (d.stride_x < 0 || d.stride_y < 0 || d.stride_z < 0 || d.stride_channel < 0) return false;
  const int64_t known = KnownElements<HeapGrid>(grid);
  const int64_t last = int64_t{d.stride_x} * (d.width - 1) + int64_t{d.stride_y} * (d.height - 1) +
                       int64_t{d.stride_z} * (d.depth - 1) + d.stride_channel;
  return known < 0 || last < known;
}

// True when the guide curve's entries fit its storage, where that is known.
bool GuideCurveFits(const LocalToneMappingDataV1::GuideCurve& curve) {
  const int64_t known = KnownElements<HeapGuideCurve>(curve);
  return known < 0 || curve.desc.num_entries <= known;
}

// Storage may come from any producer, so elements are read without
// assuming alignment.
inline uint16_t LoadHalf(const unsigned char* base, int64_t index) {
  uint16_t v;
  std::memcpy(&v, base + index * 2, sizeof(v));
  return v;
}

inline float LoadFloat(const unsigned char* base, int64_t index) {
  float v;
  std::memcpy(&v, base + index * 4, sizeof(v));
  return v;
}

// clamp(v, 0, 1) * scale that maps NaN to 0, so that the index derived
// from it is always in range. The result is never negative, so truncation
// toward zero is its floor.
inline float ClampUnitTimes(float v, int32_t scale) {
  const float c = v > 0.0f ? (v < 1.0f ? v : 1.0f) : 0.0f;
  return c * static_cast<float>(scale);
}

}  // namespace

int64_t LocalToneMappingDataV1::GridDesc::GetBufferSize() const {
  return int64_t{width} * height * depth * channels * element_size;
}

int64_t LocalToneMappingDataV1::GuideCurveDesc::GetBufferSize() const {
  return int64_t{num_entries} * entry_size;
}

LocalToneMappingDataV1::Grid::~Grid() = default;
LocalToneMappingDataV1::GuideCurve::~GuideCurve() = default;

float HalfToFloat(uint16_t half) {
  const uint32_t sign = static_cast<uint32_t>(half & 0x8000u) << 16;
  const uint32_t exponent = (half >> 10) & 0x1Fu;
  const uint32_t mantissa = half & 0x3FFu;
  uint32_t bits;
  if (exponent == 0) {
    // Zero or subnormal: mantissa * 2^-24 is exact in single precision.
    const float magnitude = static_cast<float>(mantissa) * 0x1p-24f;
    std::memcpy(&bits, &magnitude, sizeof(bits));
    bits |= sign;
  } else if (exponent == 0x1F) {
    bits = sign | 0x7F800000u | (mantissa << 13);
  } else {
    bits = sign | ((exponent + 112u) << 23) | (mantissa << 13);
  }
  float out;
  std::memcpy(&out, &bits, sizeof(out));
  return out;
}

uint16_t FloatToHalf(float value) {
  uint32_t bits;
  std::memcpy(&bits, &value, sizeof(bits));
  const uint16_t sign = static_cast<uint16_t>((bits >> 16) & 0x8000u);
  const uint32_t abs = bits & 0x7FFFFFFFu;
  if (abs > 0x7F800000u) return static_cast<uint16_t>(sign | 0x7E00u);   // NaN
  if (abs >= 0x477FF000u) return static_cast<uint16_t>(sign | 0x7C00u);  // rounds past 65504
  if (abs < 0x38800000u) {
    // Below the smallest normal half: scale into the subnormal range and let
    // the float unit round to nearest even.
    float magnitude;
    std::memcpy(&magnitude, &abs, sizeof(magnitude));
    const float scaled = magnitude * 0x1p24f;
    const auto units = static_cast<uint32_t>(std::nearbyint(scaled));
    return static_cast<uint16_t>(sign | units);
  }
  // Normal: rebias and round the 13 dropped mantissa bits to nearest even.
  const uint32_t rebased = abs - (112u << 23);
  const uint32_t kept = rebased >> 13;
  const uint32_t dropped = rebased & 0x1FFFu;
  uint32_t rounded = kept;
  if (dropped > 0x1000u || (dropped == 0x1000u && (kept & 1u) != 0)) ++rounded;
  return static_cast<uint16_t>(sign | rounded);
}

void LocalToneMappingDataV1::SetIdentity() {
  ORVEX_CHECK(grid != nullptr && guide_curve != nullptr);
  const GridDesc& d = grid->desc;
  ORVEX_CHECK(GridLayoutFits(*grid)) << "grid layout does not fit its storage";
  ORVEX_CHECK(guide_curve->desc.entry_size == 4 && guide_curve->desc.num_entries >= 0);
  ORVEX_CHECK(GuideCurveFits(*guide_curve)) << "guide curve entries do not fit its storage";
  auto* base = static_cast<unsigned char*>(grid->GetPointer());
  auto* curve = static_cast<unsigned char*>(guide_curve->GetPointer());
  ORVEX_CHECK(base != nullptr && curve != nullptr);
  const uint16_t zero = 0;
  for (int32_t z = 0; z < d.depth; ++z) {
    for (int32_t y = 0; y < d.height; ++y) {
      for (int32_t x = 0; x < d.width; ++x) {
        const int64_t index =
            int64_t{d.stride_x} * x + int64_t{d.stride_y} * y + int64_t{d.stride_z} * z;
        std::memcpy(base + index * 2, &kHalfOne, sizeof(kHalfOne));
        std::memcpy(base + (index + d.stride_channel) * 2, &zero, sizeof(zero));
      }
    }
  }
  const float one = 1.0f;
  for (int32_t i = 0; i < guide_curve->desc.num_entries; ++i) {
    std::memcpy(curve + int64_t{i} * 4, &one, sizeof(one));
  }
}

Status LocalToneMappingDataV1::GetGlobalToneMap(int n, float* gain_lut) const {
  // A missing grid or guide curve object is reported like missing storage.
  if (grid == nullptr) return InvalidArgumentErrorBuilder(ORVEX_LOC) << "Empty grid buffer";
  if (guide_curve == nullptr) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC) << "Empty guide_curve buffer";
  }
  const GridDesc& d = grid->desc;
  const GuideCurveDesc& gd = guide_curve->desc;
  if (d.element_size != 2)
    return InvalidArgumentErrorBuilder(ORVEX_LOC) << "Unexpected grid data size";
  if (gd.entry_size != 4) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC) << "Unexpected guide curve data size";
  }
  const auto* base = static_cast<const unsigned char*>(grid->GetPointer());
  if (base == nullptr) return InvalidArgumentErrorBuilder(ORVEX_LOC) << "Empty grid buffer";
  const auto* curve = static_cast<const unsigned char*>(guide_curve->GetPointer());
  if (curve == nullptr) return InvalidArgumentErrorBuilder(ORVEX_LOC) << "Empty guide_curve buffer";
  if (d.channels != 2) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC)
           << "Unexpected grid dimension - expected 2 for (slope, bias), got " << d.channels;
  }
  ORVEX_CHECK_NE(gain_lut, nullptr);
  // Inputs that would write past an empty table, divide by zero or read
  // outside the storage are refused before anything is written.
  if (n < 1)
    return InvalidArgumentErrorBuilder(ORVEX_LOC)
           << "Gain table size must be at least 1, got " << n;
  if (d.width <= 0 || d.height <= 0 || d.depth <= 0) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC)
           << "Empty grid: width " << d.width << ", height " << d.height << ", depth " << d.depth;
  }
  if (gd.num_entries <= 0) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC)
           << "Empty guide curve: " << gd.num_entries << " entries";
  }
  if (!GuideCurveFits(*guide_curve)) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC)
           << "Guide curve entries outside the guide curve buffer";
  }
  if (!GridLayoutFits(*grid)) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC)
           << "Grid strides address elements outside the grid buffer";
  }

  // Collapse the grid to one slope and one bias curve over the bins.
  std::vector<float> slopes(static_cast<size_t>(d.depth));
  std::vector<float> biases(static_cast<size_t>(d.depth));
  const float inv_cells = 1.0f / static_cast<float>(int64_t{d.width} * d.height);
  // The usual layout keeps each bin's cells contiguous with slope and bias
  // interleaved; such bins are summed with the vector kernel.
  const bool interleaved_bins = d.stride_channel == 1 && d.stride_x == 2 &&
                                int64_t{d.stride_y} == int64_t{d.width} * 2 &&
                                reinterpret_cast<uintptr_t>(base) % alignof(uint16_t) == 0;
  const auto cells_per_bin = static_cast<size_t>(int64_t{d.width} * d.height);
  for (int32_t z = 0; z < d.depth; ++z) {
    float slope_sum = 0.0f;
    float bias_sum = 0.0f;
    if (interleaved_bins) {
      const auto* bin = reinterpret_cast<const uint16_t*>(base) + int64_t{d.stride_z} * z;
      const HalfPairSums sums = SumInterleavedHalves({bin, 2 * cells_per_bin});
      slope_sum = sums.even;
      bias_sum = sums.odd;
    } else {
      for (int32_t y = 0; y < d.height; ++y) {
        const int64_t row = int64_t{d.stride_z} * z + int64_t{d.stride_y} * y;
        for (int32_t x = 0; x < d.width; ++x) {
          const int64_t index = row + int64_t{d.stride_x} * x;
          slope_sum += HalfToFloat(LoadHalf(base, index));
          bias_sum += HalfToFloat(LoadHalf(base, index + d.stride_channel));
        }
      }
    }
    slopes[static_cast<size_t>(z)] = slope_sum * inv_cells;
    biases[static_cast<size_t>(z)] = bias_sum * inv_cells;
  }

  gain_lut[0] = 1.0f;
  if (n == 1) return OkStatus();
  const float denom = static_cast<float>(n - 1);
  const int32_t last_entry = gd.num_entries - 1;
  const int32_t last_bin = d.depth - 1;
  for (int i = 1; i < n; ++i) {
    const float t = static_cast<float>(i) / denom;
    const float p = ClampUnitTimes(t, last_entry);
    const auto k = static_cast<int32_t>(p);
    const float f = p - static_cast<float>(k);
    const float g =
        LoadFloat(curve, std::min(last_entry, k + 1)) * f + LoadFloat(curve, k) * (1.0f - f);
    const float q = ClampUnitTimes(g, last_bin);
    const auto m = static_cast<int32_t>(q);
    const float h = q - static_cast<float>(m);
    const auto m0 = static_cast<size_t>(m);
    const auto m1 = static_cast<size_t>(std::min(last_bin, m + 1));
    const float slope = slopes[m1] * h + slopes[m0] * (1.0f - h);
    const float bias = biases[m1] * h + biases[m0] * (1.0f - h);
    gain_lut[i] = (bias + t * slope) / t;
  }

  // Make the tone curve t * gain strictly rising.
  const float step = 1.0f / denom;
  float previous = 0.0f;
  for (int i = 1; i < n; ++i) {
    const float t = std::max(step * static_cast<float>(i), kMinRise);
    float v = t * gain_lut[i];
    if (v < previous + kMinRise) {
      v = previous + kMinRise;
      gain_lut[i] = v / t;
    }
    previous = v;
  }
  return OkStatus();
}

StatusOr<std::unique_ptr<LocalToneMappingDataV1>> HeapAllocateLocalToneMappingDataV1() {
  auto data = std::make_unique<LocalToneMappingDataV1>();
  data->grid = std::make_shared<HeapGrid>(LocalToneMappingDataV1::GridDesc{});
  data->guide_curve = std::make_shared<HeapGuideCurve>(LocalToneMappingDataV1::GuideCurveDesc{});
  return data;
}

}  // namespace orvex
