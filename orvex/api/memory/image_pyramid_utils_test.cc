#include "orvex/api/memory/image_pyramid_utils.h"

#include <functional>
#include <limits>
#include <utility>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using image_pyramid_utils::CheckedGetBufferSizeForLevel;
using image_pyramid_utils::CheckedGetTotalBufferSize;
using image_pyramid_utils::GetBufferSizeForLevel;
using image_pyramid_utils::GetSizeForLevel;
using image_pyramid_utils::GetTotalBufferSize;
using ::orvex::testing::IsOkAndHolds;
using ::orvex::testing::StatusIs;
using Size = GenericSize<int>;
using Levels = orvex_api::Range<int>;

constexpr int kIntMax = std::numeric_limits<int>::max();
constexpr int kIntMin = std::numeric_limits<int>::min();

TEST(ImagePyramidUtilsTest, DownsampleAndSizeForLevel) {
  // Downsample by `factor` when `level` is -1, else GetSizeForLevel.
  struct Case {
    int width, height, factor, level, expected_width, expected_height;
  };
  const Case cases[] = {
      {4000, 3000, 1, -1, 4000, 3000},
      {5, 1, 2, -1, 3, 1},
      {0, 7, 8, -1, 0, 1},
      {-5, -1, 2, -1, -2, 0},  // dividing toward zero: (-5 + 1) / 2
      // The sum d + factor - 1 exceeds 32 bits here.
      {kIntMax, kIntMax, 2, -1, 1 << 30, 1 << 30},
      {kIntMax, 1, kIntMax, -1, 1, 1},
      {kIntMin, 1, kIntMax, -1, 0, 1},
      {4000, 3000, 0, 0, 4000, 3000},
      {4000, 3000, 0, 1, 2000, 1500},
      {4000, 3000, 0, 3, 500, 375},
      {4001, 3001, 0, 1, 2001, 1501},
      {5, 1, 0, 2, 2, 1},
      {5, 1, 0, 3, 1, 1},
      // A factor of 2^31 does not fit in an int; every positive size ends at 1.
      {kIntMax, 1, 0, 31, 1, 1},
      {0, 2, 0, 31, 0, 1},
  };
  for (const Case& c : cases) {
    const Size size = {c.width, c.height};
    SCOPED_TRACE(::testing::Message() << size << " factor " << c.factor << " level " << c.level);
    EXPECT_EQ(c.level < 0 ? Downsample(size, c.factor) : GetSizeForLevel(size, c.level),
              (Size{c.expected_width, c.expected_height}));
  }
}

TEST(ImagePyramidUtilsTest, BufferSizes) {
  struct Case {
    int width, height, level, alignment, bits, expected;
  };
  const Case cases[] = {
      {4000, 3000, 0, 64, 10, 15168000},  // stride 5056
      {4000, 3000, 1, 64, 10, 3840000},
      {4000, 3000, 2, 64, 10, 960000},
      {100, 75, 0, 64, 8, 9600},
      {100, 75, 2, 64, 8, 1216},  // 25x19, stride 64
      {3, 1, 0, 1, 10, 4},        // 30 bits occupy 4 bytes
      {3, 2, 0, 3, 10, 12},       // 4 bytes padded to 6
      {7, 5, 0, 16, 0, 0},        // no bits, no bytes
      {0, 5, 0, 16, 8, 0},
      {kIntMax, 1, 0, 1, 8, kIntMax},
      {1 << 28, 1, 0, 1, 12, 3 << 27},  // width * bits exceeds 32 bits, the row does not
      {kIntMax, 0, 0, 64, 16, 0},       // a row too wide for 32 bits, but no rows
  };
  for (const Case& c : cases) {
    const Size size = {c.width, c.height};
    SCOPED_TRACE(::testing::Message()
                 << size << " level " << c.level << " align " << c.alignment << " bits " << c.bits);
    EXPECT_EQ(GetBufferSizeForLevel(size, c.level, c.alignment, c.bits), c.expected);
    EXPECT_THAT(CheckedGetBufferSizeForLevel(size, c.level, c.alignment, c.bits),
                IsOkAndHolds(c.expected));
  }
  EXPECT_EQ(GetTotalBufferSize({4000, 3000}, {0, 2}, 64, 10), 19968000);
  EXPECT_EQ(GetTotalBufferSize({4000, 3000}, {1, 1}, 64, 10), 3840000);
  EXPECT_EQ(GetTotalBufferSize({4000, 3000}, {2, 1}, 64, 10), 0);
  // An empty range checks nothing else.
  EXPECT_EQ(GetTotalBufferSize({-1, -1}, {40, -40}, 0, -1), 0);
  EXPECT_EQ(GetTotalBufferSize({1, 1}, {0, 31}, 1, 8), 32);
  EXPECT_EQ(GetTotalBufferSize({kIntMax, 1}, {0, 0}, 1, 8), kIntMax);
  EXPECT_THAT(CheckedGetTotalBufferSize({4000, 3000}, {0, 2}, 64, 10), IsOkAndHolds(19968000));
}

TEST(ImagePyramidUtilsTest, CheckedFormsRefuseBadArguments) {
  struct Case {
    int width, height, lower, upper, alignment, bits;
    const char* message;
  };
  const Case cases[] = {
      {8, 8, -1, 2, 1, 8, "pyramid level must be in [0, 31], received: -1"},
      {8, 8, 30, 32, 1, 8, "pyramid level must be in [0, 31], received: 32"},
      {8, 8, 0, 0, 0, 8, "alignment must be >= 1, received: 0"},
      {8, 8, 0, 0, 1, -1, "bits per pixel must be >= 0, received: -1"},
      {-8, 8, 0, 0, 1, 8, "image size must not be negative, received: -8x8"},
      {8, -8, 0, 0, 1, 8, "image size must not be negative, received: 8x-8"},
      {kIntMax, 1, 0, 0, 1, 16,
       "buffer size of level 0 for a 2147483647x1 image does not fit in 32 bits"},
      {46341, 46341, 0, 0, 1, 8,
       "buffer size of level 0 for a 46341x46341 image does not fit in 32 bits"},
      // Each level fits, the sum does not.
      {1, kIntMax, 0, 1, 1, 8,
       "total buffer size of levels [0, 1] for a 1x2147483647 image does not fit in 32 bits"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.message);
    EXPECT_THAT(
        CheckedGetTotalBufferSize({c.width, c.height}, {c.lower, c.upper}, c.alignment, c.bits),
        StatusIs(StatusCode::kInvalidArgument, c.message));
  }
  EXPECT_THAT(
      CheckedGetBufferSizeForLevel({8, 8}, 32, 1, 8),
      StatusIs(StatusCode::kInvalidArgument, "pyramid level must be in [0, 31], received: 32"));
}

TEST(ImagePyramidUtilsDeathTest, PlainFormsEndTheProcessOnBrokenPreconditions) {
  const std::pair<std::function<void()>, const char*> cases[] = {
      {std::bind(Downsample, Size{4, 4}, 0), "downsample factor must be >= 1, received: 0"},
      {std::bind(GetSizeForLevel, Size{4, 4}, -1), "level must be in \\[0, 31\\], received: -1"},
      {std::bind(GetSizeForLevel, Size{4, 4}, 32), "level must be in \\[0, 31\\], received: 32"},
      {std::bind(GetBufferSizeForLevel, Size{4, 4}, 0, 0, 8),
       "alignment must be >= 1, received: 0"},
      {std::bind(GetTotalBufferSize, Size{1, kIntMax}, Levels{0, 1}, 1, 8),
       "total buffer size of levels \\[0, 1\\] for a 1x2147483647 image does not fit"},
  };
  for (const auto& [call, message] : cases) {
    SCOPED_TRACE(message);
    EXPECT_DEATH(call(), message);
  }
}

}  // namespace
}  // namespace orvex
