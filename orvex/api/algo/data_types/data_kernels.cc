#include "orvex/api/algo/data_types/data_kernels.h"

#include <algorithm>

#include "orvex/status/log.h"

// Compiled once per instruction set that the build targets.
#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "orvex/api/algo/data_types/data_kernels.cc"
#include "hwy/foreach_target.h"  // IWYU pragma: keep
#include "hwy/highway.h"

HWY_BEFORE_NAMESPACE();
namespace orvex {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

void UnpackMotionVectorsImpl(const uint32_t* HWY_RESTRICT words, size_t count,
                             int32_t* HWY_RESTRICT out) {
  const hn::ScalableTag<int32_t> d;
  const size_t lanes = hn::Lanes(d);
  const auto* in = reinterpret_cast<const int32_t*>(words);
  size_t i = 0;
  for (; i + lanes <= count; i += lanes) {
    const auto v = hn::LoadU(d, in + i);
    const auto first = hn::ShiftRight<20>(v);
    const auto second = hn::ShiftRight<20>(hn::ShiftLeft<12>(v));
    hn::StoreInterleaved2(first, second, d, out + 2 * i);
  }
  for (; i < count; ++i) {
    // Shifts on the unsigned word, then a two's complement narrowing, keep
    // every step defined.
    const uint32_t w = words[i];
    out[2 * i] = static_cast<int32_t>(w) >> 20;
    out[2 * i + 1] = static_cast<int32_t>(w << 12) >> 20;
  }
}

void UnpackMatchingErrorsImpl(const uint32_t* HWY_RESTRICT words, size_t count,
                              uint8_t* HWY_RESTRICT out) {
  const hn::ScalableTag<uint32_t> d;
  const hn::Rebind<uint8_t, decltype(d)> d8;
  const size_t lanes = hn::Lanes(d);
  size_t i = 0;
  for (; i + lanes <= count; i += lanes) {
    hn::StoreU(hn::TruncateTo(d8, hn::LoadU(d, words + i)), d8, out + i);
  }
  for (; i < count; ++i) out[i] = static_cast<uint8_t>(words[i]);
}

HalfPairSums SumInterleavedHalvesImpl(const uint16_t* HWY_RESTRICT halves, size_t count) {
  const hn::ScalableTag<float> df;
  const hn::Rebind<hwy::float16_t, decltype(df)> dh;
  const size_t lanes = hn::Lanes(df);
  HalfPairSums sums;
  size_t i = 0;
  if (lanes % 2 == 0) {
    // Even lanes of the accumulators collect even elements.
    auto acc0 = hn::Zero(df);
    auto acc1 = hn::Zero(df);
    const auto* in = reinterpret_cast<const hwy::float16_t*>(halves);
    for (; i + 2 * lanes <= count; i += 2 * lanes) {
      acc0 = hn::Add(acc0, hn::PromoteTo(df, hn::LoadU(dh, in + i)));
      acc1 = hn::Add(acc1, hn::PromoteTo(df, hn::LoadU(dh, in + i + lanes)));
    }
    HWY_ALIGN float lane_sums[hn::MaxLanes(df)];
    hn::Store(hn::Add(acc0, acc1), df, lane_sums);
    for (size_t l = 0; l < lanes; l += 2) {
      sums.even += lane_sums[l];
      sums.odd += lane_sums[l + 1];
    }
  }
  const hn::CappedTag<float, 1> d1;
  const hn::Rebind<hwy::float16_t, decltype(d1)> dh1;
  for (; i + 1 < count; i += 2) {
    const auto* in = reinterpret_cast<const hwy::float16_t*>(halves);
    sums.even += hn::GetLane(hn::PromoteTo(d1, hn::LoadU(dh1, in + i)));
    sums.odd += hn::GetLane(hn::PromoteTo(d1, hn::LoadU(dh1, in + i + 1)));
  }
  return sums;
}

int64_t TargetImpl() { return HWY_TARGET; }

}  // namespace HWY_NAMESPACE
}  // namespace orvex
HWY_AFTER_NAMESPACE();

#if HWY_ONCE
namespace orvex {

HWY_EXPORT(UnpackMotionVectorsImpl);
HWY_EXPORT(UnpackMatchingErrorsImpl);
HWY_EXPORT(SumInterleavedHalvesImpl);
HWY_EXPORT(TargetImpl);

void UnpackMotionVectorWords(std::span<const uint32_t> words, std::span<int32_t> out) {
  ORVEX_CHECK_GE(out.size(), 2 * words.size());
  HWY_DYNAMIC_DISPATCH(UnpackMotionVectorsImpl)(words.data(), words.size(), out.data());
}

void UnpackMatchingErrorWords(std::span<const uint32_t> words, std::span<uint8_t> out) {
  ORVEX_CHECK_GE(out.size(), words.size());
  HWY_DYNAMIC_DISPATCH(UnpackMatchingErrorsImpl)(words.data(), words.size(), out.data());
}

HalfPairSums SumInterleavedHalves(std::span<const uint16_t> halves) {
  ORVEX_CHECK_EQ(halves.size() % 2, 0u);
  return HWY_DYNAMIC_DISPATCH(SumInterleavedHalvesImpl)(halves.data(), halves.size());
}

int64_t DataKernelsTarget() { return HWY_DYNAMIC_DISPATCH(TargetImpl)(); }

}  // namespace orvex
#endif  // HWY_ONCE
