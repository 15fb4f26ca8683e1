#include "orvex/api/math/size_utils.h"

#include <cstddef>
#include <string>

#include "gtest/gtest.h"

namespace orvex {
namespace {

TEST(SizeUtilsTest, AlignmentAndCeilDiv) {
  constexpr size_t kCases[][3] = {{0, 64, 0},   {1, 64, 64},
                                  {64, 64, 64}, {65, 64, 128},
                                  {7, 1, 7},    {size_t{1} << 40, 4096, size_t{1} << 40}};
  for (const auto& [value, alignment, want] : kCases) {
    SCOPED_TRACE(testing::Message() << value << " to " << alignment);
    EXPECT_EQ(AlignToPower2(value, alignment), want);
  }
  // int inputs are passed sign-extended; divisions truncate toward zero.
  EXPECT_EQ(AlignToPower2Signed(-5, 16), 0);
  EXPECT_EQ(AlignToPower2Signed(-20, 16), -16);
  EXPECT_EQ(CeilDiv(4000, 256), 16);
  EXPECT_EQ(CeilDiv(-40, 32), 0);
}

TEST(SizeUtilsDeathTest, AlignmentMustBeAPowerOf2) {
  for (const size_t alignment : {48, 0}) {
    EXPECT_DEATH(AlignToPower2(10, alignment),
                 "Check failed: IsPowerOf2\\(alignment\\) alignment value: " +
                     std::to_string(alignment) + " is not a power of 2");
  }
}

}  // namespace
}  // namespace orvex
