#include "orvex/api/memory/image_pyramid_utils.h"

#include <functional>
#include <limits>
#include <tuple>
#include <utility>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/status/status_matchers.h"

namespace orvex::image_pyramid_utils {
namespace {

using ::orvex::testing::StatusIs;
using Size = GenericSize<int>;
using Levels = orvex_api::Range<int>;

constexpr int kIntMax = std::numeric_limits<int>::max();

// Downsample(size, factor) when the level is -1, else GetSizeForLevel.
TEST(ImagePyramidUtilsTest, DownsampleAndSizeForLevel) {
  // clang-format off
  const std::tuple<Size, int, int, Size> cases[] = {
      {{4000, 3000}, 1, -1, {4000, 3000}}, {{5, 1}, 2, -1, {3, 1}}, {{0, 7}, 8, -1, {0, 1}},
      {{-5, -1}, 2, -1, {-2, 0}},  // dividing toward zero
      {{kIntMax, kIntMax}, 2, -1, {1 << 30, 1 << 30}}, {{std::numeric_limits<int>::min(), 1}, kIntMax, -1, {0, 1}},
      {{4000, 3000}, 0, 3, {500, 375}}, {{4001, 3001}, 0, 1, {2001, 1501}}, {{5, 1}, 0, 2, {2, 1}},
      {{kIntMax, 0}, 0, 31, {1, 0}},  // a factor of 2^31 does not fit in an int
  };
  // clang-format on
  for (const auto& [size, factor, level, expected] : cases) {
    SCOPED_TRACE(::testing::Message() << size << " factor " << factor << " level " << level);
    EXPECT_EQ(level < 0 ? Downsample(size, factor) : GetSizeForLevel(size, level), expected);
  }
}

// Total sizes; a single level is also GetBufferSizeForLevel's result.
TEST(ImagePyramidUtilsTest, BufferSizes) {
  // clang-format off
  const std::tuple<Size, Levels, int, int, int> cases[] = {
      {{4000, 3000}, {0, 2}, 64, 10, 19968000}, {{4000, 3000}, {2, 1}, 64, 10, 0},
      {{100, 75}, {2, 2}, 64, 8, 1216},          // 25x19, stride 64
      {{3, 1}, {0, 0}, 1, 10, 4},                // 30 bits occupy 4 bytes
      {{3, 2}, {0, 0}, 3, 10, 12},               // 4 bytes padded to 6
      {{7, 5}, {0, 0}, 16, 0, 0}, {{0, 5}, {0, 0}, 16, 8, 0}, {{1, 1}, {0, 31}, 1, 8, 32},
      {{kIntMax, 1}, {0, 0}, 1, 8, kIntMax},
      {{1 << 28, 1}, {0, 0}, 1, 12, 3 << 27},    // width * bits beyond 32 bits, the row is not
      {{kIntMax, 0}, {0, 0}, 64, 16, 0},         // a row too wide for 32 bits, but no rows
      {{-1, -1}, {40, -40}, 0, -1, 0},           // an empty range checks nothing else
  };
  // clang-format on
  for (const auto& [size, levels, alignment, bits, expected] : cases) {
    SCOPED_TRACE(::testing::Message() << size << " " << levels << " " << alignment << " " << bits);
    EXPECT_EQ(GetTotalBufferSize(size, levels, alignment, bits), expected);
    if (levels.lower == levels.upper) {
      EXPECT_EQ(GetBufferSizeForLevel(size, levels.lower, alignment, bits), expected);
    }
  }
}

TEST(ImagePyramidUtilsTest, CheckedFormsRefuseBadArguments) {
  // clang-format off
  const std::tuple<Size, Levels, int, int, const char*> cases[] = {
      {{8, 8}, {-1, 2}, 1, 8, "pyramid level must be in [0, 31], received: -1"},
      {{8, 8}, {30, 32}, 1, 8, "pyramid level must be in [0, 31], received: 32"},
      {{8, 8}, {0, 0}, 0, 8, "alignment must be >= 1, received: 0"},
      {{8, 8}, {0, 0}, 1, -1, "bits per pixel must be >= 0, received: -1"},
      {{-8, 8}, {0, 0}, 1, 8, "image size must not be negative, received: -8x8"},
      {{8, -8}, {0, 0}, 1, 8, "image size must not be negative, received: 8x-8"},
      {{kIntMax, 1}, {0, 0}, 1, 16, "buffer size of level 0 for a 2147483647x1 image does not fit in 32 bits"},
      {{46341, 46341}, {0, 0}, 1, 8, "buffer size of level 0 for a 46341x46341 image does not fit in 32 bits"},
      {{1, kIntMax}, {0, 1}, 1, 8,  // each level fits, the sum does not
       "total buffer size of levels [0, 1] for a 1x2147483647 image does not fit in 32 bits"},
  };
  // clang-format on
  for (const auto& [size, levels, alignment, bits, message] : cases) {
    SCOPED_TRACE(message);
    EXPECT_THAT(CheckedGetTotalBufferSize(size, levels, alignment, bits),
                StatusIs(StatusCode::kInvalidArgument, message));
  }
}

TEST(ImagePyramidUtilsDeathTest, PlainFormsEndTheProcessOnBrokenPreconditions) {
  const std::pair<std::function<void()>, const char*> cases[] = {
      {std::bind(Downsample, Size{4, 4}, 0), "downsample factor must be >= 1, received: 0"},
      {std::bind(GetSizeForLevel, Size{4, 4}, -1), "level must be in \\[0, 31\\], received: -1"},
      {std::bind(GetBufferSizeForLevel, Size{4, 4}, 32, 1, 8),
       "level must be in \\[0, 31\\], received: 32"},
      {std::bind(GetTotalBufferSize, Size{1, kIntMax}, Levels{0, 1}, 1, 8),
       "total buffer size of levels \\[0, 1\\] for a 1x2147483647 image does not fit"},
  };
  for (const auto& [call, message] : cases) {
    SCOPED_TRACE(message);
    EXPECT_DEATH(call(), message);
  }
}

}  // namespace
}  // namespace orvex::image_pyramid_utils
