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

// Words at every field boundary, then random words.
std::vector<uint32_t> WordPatterns(size_t random_count) {
  std::vector<uint32_t> words;
  const uint32_t fields[] = {0x000, 0x001, 0x7FE, 0x7FF, 0x800, 0x801, 0xFFE, 0xFFF};
  for (uint32_t a : fields) {
    for (uint32_t b : fields) {
      for (uint32_t e : {0x00, 0x01, 0x7F, 0x80, 0xFF}) words.push_back((a << 20) | (b << 8) | e);
    }
  }
  std::mt19937 rng(3);
  for (size_t i = 0; i < random_count; ++i) words.push_back(static_cast<uint32_t>(rng()));
  return words;
}

// Every test runs once per vector target the machine supports.
class DataKernelsTest : public VectorTargetTest {};
ORVEX_INSTANTIATE_FOR_VECTOR_TARGETS(DataKernelsTest);

TEST_P(DataKernelsTest, MatchScalarReferenceForEveryLengthAndOffset) {
  // Straightforward per-word decoding that the vector kernels must match:
  // the fields are cut out as unsigned bit fields and sign-extended by hand.
  const std::vector<uint32_t> all = WordPatterns(4096);
  std::vector<int32_t> want_mv;
  std::vector<uint8_t> want_err;
  for (uint32_t w : all) {
    for (uint32_t field : {(w >> 20) & 0xFFFu, (w >> 8) & 0xFFFu}) {
      want_mv.push_back(static_cast<int32_t>(field) - ((field & 0x800u) != 0 ? 4096 : 0));
    }
    want_err.push_back(static_cast<uint8_t>(w & 0xFFu));
  }
  // Lengths around every vector width hit each tail; odd offsets start the
  // input and the outputs off their natural alignment.
  for (size_t offset : {0u, 1u, 3u}) {
    for (size_t length : {0u, 1u, 3u, 4u, 5u, 7u, 8u, 9u, 15u, 16u, 17u, 31u, 33u, 63u, 65u,
                          static_cast<unsigned>(all.size() - 3)}) {
      SCOPED_TRACE(::testing::Message() << "offset " << offset << " length " << length);
      const std::span<const uint32_t> words(all.data() + offset, length);
      std::vector<int32_t> mv(2 * length + 3, 0x5A5A5A5A);
      std::vector<uint8_t> err(length + 3, 0xA5);
      UnpackMotionVectorWords(words, std::span<int32_t>(mv.data() + 1, 2 * length));
      UnpackMatchingErrorWords(words, std::span<uint8_t>(err.data() + 1, length));
      ASSERT_TRUE(std::equal(mv.begin() + 1, mv.begin() + 1 + 2 * static_cast<ptrdiff_t>(length),
                             want_mv.begin() + 2 * static_cast<ptrdiff_t>(offset)));
      ASSERT_TRUE(std::equal(err.begin() + 1, err.begin() + 1 + static_cast<ptrdiff_t>(length),
                             want_err.begin() + static_cast<ptrdiff_t>(offset)));
      // Nothing outside the requested range is touched.
      EXPECT_EQ(mv.front(), 0x5A5A5A5A);
      EXPECT_EQ(mv[2 * length + 1], 0x5A5A5A5A);
      EXPECT_EQ(err.front(), 0xA5);
      EXPECT_EQ(err[length + 1], 0xA5);
    }
  }
}

TEST_P(DataKernelsTest, HalfPairSums) {
  std::mt19937 rng(9);
  std::uniform_real_distribution<float> value(-4.0f, 4.0f);
  for (size_t pairs : {0u, 1u, 3u, 8u, 17u, 192u, 1001u}) {
    SCOPED_TRACE(pairs);
    std::vector<uint16_t> halves;
    double even = 0.0;
    double odd = 0.0;
    for (size_t i = 0; i < pairs; ++i) {
      halves.push_back(FloatToHalf(value(rng)));
      halves.push_back(FloatToHalf(value(rng)));
      even += HalfToFloat(halves[2 * i]);
      odd += HalfToFloat(halves[2 * i + 1]);
    }
    // Subnormal halves take the conversion's slow path on some targets.
    if (pairs == 3) {
      even += 0x1p-24 - HalfToFloat(halves[2]);
      halves[2] = 0x0001;
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
               "Check failed: out.size\\(\\) >= 2 \\* words.size\\(\\) "
               "\\(out.size\\(\\)=7, 2 \\* words.size\\(\\)=8\\) ");
  EXPECT_DEATH(UnpackMatchingErrorWords(words, err),
               "Check failed: out.size\\(\\) >= words.size\\(\\) \\(out.size\\(\\)=3, "
               "words.size\\(\\)=4\\) ");
  EXPECT_DEATH(SumInterleavedHalves(halves),
               "Check failed: halves.size\\(\\) % 2 == 0u \\(halves.size\\(\\) % 2=1, 0u=0\\) ");
}

}  // namespace
}  // namespace orvex
