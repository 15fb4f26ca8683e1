#include "orvex/api/math/size_utils.h"

#include <cstddef>
#include <cstdint>
#include <vector>

#include "gtest/gtest.h"

namespace orvex {
namespace {

TEST(SizeUtilsTest, AlignToPower2) {
  struct Case {
    size_t value;
    size_t alignment;
    size_t want;
  };
  const std::vector<Case> cases = {
      {0, 64, 0},       {1, 64, 64},
      {64, 64, 64},     {65, 64, 128},
      {1000, 16, 1008}, {1008, 64, 1024},
      {7, 1, 7},        {4097, 4096, 8192},
      {1, 1024, 1024},  {size_t{1} << 40, 4096, size_t{1} << 40},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(testing::Message() << c.value << " to " << c.alignment);
    EXPECT_EQ(AlignToPower2(c.value, c.alignment), c.want);
  }
  // int inputs are passed sign-extended: -5 rounds up to 0, -20 to -16.
  EXPECT_EQ(AlignToPower2Signed(-5, 16), 0);
  EXPECT_EQ(AlignToPower2Signed(-20, 16), -16);
  EXPECT_EQ(AlignToPower2Signed(int64_t{INT32_MAX}, 16), int64_t{INT32_MAX} + 1);
}

TEST(SizeUtilsTest, CeilDivTruncatesLikeIntegerDivision) {
  EXPECT_EQ(CeilDiv(4000, 256), 16);
  EXPECT_EQ(CeilDiv(256, 256), 1);
  EXPECT_EQ(CeilDiv(0, 32), 0);
  EXPECT_EQ(CeilDiv(-40, 32), 0);  // (-40 + 31) / 32 truncates toward zero
  EXPECT_EQ(CeilDiv(INT32_MAX, 32), (int64_t{INT32_MAX} + 31) / 32);
}

TEST(SizeUtilsDeathTest, AlignmentMustBeAPowerOf2) {
  EXPECT_DEATH(AlignToPower2(10, 48),
               "Check failed: IsPowerOf2\\(alignment\\) alignment value: 48 is not a power of 2");
  EXPECT_DEATH(AlignToPower2(10, 0),
               "Check failed: IsPowerOf2\\(alignment\\) alignment value: 0 is not a power of 2");
}

}  // namespace
}  // namespace orvex
