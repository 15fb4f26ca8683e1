#include "orvex/api/math/size_utils.h"

#include <cstddef>
#include <cstdint>
#include <string>

#include "gtest/gtest.h"

namespace orvex {
namespace {

TEST(SizeUtilsTest, AlignmentAndCeilDiv) {
  struct Case {
    size_t value, alignment, want;
  };
  for (const Case& c :
       {Case{0, 64, 0}, Case{1, 64, 64}, Case{64, 64, 64}, Case{65, 64, 128}, Case{1000, 16, 1008},
        Case{7, 1, 7}, Case{size_t{1} << 40, 4096, size_t{1} << 40}}) {
    SCOPED_TRACE(testing::Message() << c.value << " to " << c.alignment);
    EXPECT_EQ(AlignToPower2(c.value, c.alignment), c.want);
  }
  // int inputs are passed sign-extended: -5 rounds up to 0, -20 to -16.
  EXPECT_EQ(AlignToPower2Signed(-5, 16), 0);
  EXPECT_EQ(AlignToPower2Signed(-20, 16), -16);
  EXPECT_EQ(CeilDiv(4000, 256), 16);
  EXPECT_EQ(CeilDiv(256, 256), 1);
  EXPECT_EQ(CeilDiv(-40, 32), 0);  // (-40 + 31) / 32 truncates toward zero
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
