#include "orvex/api/algo/data_types/data_kernels.h"

#include <cstring>
#include <random>
#include <vector>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/algo/data_types/local_tone_mapping_data_v1.h"
#include "orvex/api/algo/data_types/vector_targets_testing.h"

namespace orvex {
namespace {

class DataKernelsTest : public VectorTargetTest {};
ORVEX_INSTANTIATE_FOR_VECTOR_TARGETS(DataKernelsTest);

// A plain decoding, for every tail and alignment; nothing outside the range is touched.
TEST_P(DataKernelsTest, MatchScalarReferenceForEveryLengthAndOffset) {
  std::vector<uint32_t> all;
  for (uint32_t a : {0x000, 0x001, 0x7FE, 0x7FF, 0x800, 0x801, 0xFFE, 0xFFF}) {
    for (uint32_t b : {0x000, 0x001, 0x7FF, 0x800, 0xFFF}) {
      for (uint32_t e : {0x00, 0x01, 0x7F, 0x80, 0xFF}) all.push_back((a << 20) | (b << 8) | e);
    }
  }
  std::mt19937 rng(3);
  while (all.size() < 4096) all.push_back(static_cast<uint32_t>(rng()));
  std::vector<int32_t> want_mv;
  std::vector<uint8_t> want_err;
  for (uint32_t w : all) {
    for (uint32_t field : {(w >> 20) & 0xFFFu, (w >> 8) & 0xFFFu})
      want_mv.push_back(static_cast<int32_t>(field) - ((field & 0x800u) != 0 ? 4096 : 0));
    want_err.push_back(static_cast<uint8_t>(w & 0xFFu));
  }
  for (size_t offset : {0u, 1u, 3u}) {
    for (size_t length : {0u, 1u, 3u, 4u, 5u, 7u, 8u, 9u, 15u, 16u, 17u, 31u, 33u, 4093u}) {
      SCOPED_TRACE(::testing::Message() << "offset " << offset << " length " << length);
      const std::span<const uint32_t> words(all.data() + offset, length);
      std::vector<int32_t> mv(2 * length + 2, 0x5A5A5A5A), mv_want = mv;
      std::vector<uint8_t> err(length + 2, 0xA5), err_want = err;
      UnpackMotionVectorWords(words, std::span<int32_t>(mv.data() + 1, 2 * length));
      UnpackMatchingErrorWords(words, std::span<uint8_t>(err.data() + 1, length));
      std::copy_n(want_mv.begin() + 2 * static_cast<ptrdiff_t>(offset), 2 * length, &mv_want[1]);
      std::copy_n(want_err.begin() + static_cast<ptrdiff_t>(offset), length, &err_want[1]);
      ASSERT_EQ(mv, mv_want);
      ASSERT_EQ(err, err_want);
    }
  }
}

TEST_P(DataKernelsTest, HalfPairSums) {
  std::mt19937 rng(9);
  std::uniform_real_distribution<float> value(-4.0f, 4.0f);
  for (size_t pairs : {0u, 1u, 3u, 8u, 17u, 192u, 1001u}) {
    SCOPED_TRACE(pairs);
    std::vector<uint16_t> halves;
    double even = 0.0, odd = 0.0;
    for (size_t i = 0; i < pairs; ++i) {
      halves.push_back(i == 1 ? 0x0001 : FloatToHalf(value(rng)));  // one subnormal
      halves.push_back(FloatToHalf(value(rng)));
      even += HalfToFloat(halves[2 * i]);
      odd += HalfToFloat(halves[2 * i + 1]);
    }
    const HalfPairSums sums = SumInterleavedHalves(halves);
    EXPECT_NEAR(sums.even, even, 1e-3);
    EXPECT_NEAR(sums.odd, odd, 1e-3);
  }
}

TEST(DataKernelsDeathTest, ShortOutputs) {
  const uint32_t words[4] = {};
  int32_t mv[7];
  uint8_t err[3];
  const uint16_t halves[3] = {};
  EXPECT_DEATH(UnpackMotionVectorWords(words, mv),
               "Check failed: out.size\\(\\) >= 2 \\* words.size\\(\\) \\(out.size\\(\\)=7");
  EXPECT_DEATH(UnpackMatchingErrorWords(words, err),
               "Check failed: out.size\\(\\) >= words.size\\(\\) \\(out.size\\(\\)=3");
  EXPECT_DEATH(SumInterleavedHalves(halves), "Check failed: halves.size\\(\\) % 2 == 0u ");
}

}  // namespace
}  // namespace orvex
