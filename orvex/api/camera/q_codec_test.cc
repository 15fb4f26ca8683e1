#include "orvex/api/camera/q_codec.h"

#include <cmath>
#include <cstdint>
#include <limits>
#include <string>

#include "gtest/gtest.h"

namespace orvex {
namespace {

constexpr double kInf = std::numeric_limits<double>::infinity();
constexpr int64_t kMin64 = std::numeric_limits<int64_t>::min();
constexpr int64_t kMax64 = std::numeric_limits<int64_t>::max();

TEST(QCodecTest, EncodeAndDecode) {
  // clang-format off
  const struct { int32_t integer_bits, fraction_bits; double x; int64_t code; double decoded; }
  cases[] = {
      {1, 2, 0.375, 2, 0.5}, {1, 2, -0.375, 14, -0.5}, {1, 2, 0.125, 1, 0.25},
      {1, 2, 1.75, 7, 1.75}, {1, 2, 2.0, 7, 1.75}, {1, 2, -2.0, 8, -2.0}, {1, 2, -0.25, 15, -0.25},
      {1, 2, kInf, 7, 1.75}, {1, 2, -kInf, 8, -2.0}, {1, 2, NAN, 0, 0.0}, {0, 0, 0.4, 0, 0.0},
      {0, 0, 3.0, 0, 0.0}, {0, 0, -0.5, 1, -1.0}, {12, 4, -1.5, 0x20000 - 24, -1.5},
      {63, 0, -3.0, -3, -3.0}, {63, 0, 9223372036854775808.0, kMax64, 9223372036854775807.0},
      {63, 0, -kInf, kMin64, -9223372036854775808.0}, {0, 63, 0.5, int64_t{1} << 62, 0.5}};
  // clang-format on
  for (const auto& c : cases) {
    SCOPED_TRACE(::testing::Message() << c.integer_bits << "/" << c.fraction_bits << " " << c.x);
    const QCodec codec{c.integer_bits, c.fraction_bits};
    EXPECT_EQ(codec.Encode(c.x), c.code);
    EXPECT_EQ(codec.Decode(c.code), c.decoded);
  }
}

TEST(QCodecDeathTest, RefusesCodesWiderThan64Bits) {
  for (const auto& [integer_bits, fraction_bits] :
       {std::pair{40, 24}, {-1, 4}, {4, -1}, {2147483647, 2147483647}}) {
    const std::string text = "QCodec with integer_bits " + std::to_string(integer_bits) +
                             " and fraction_bits " + std::to_string(fraction_bits) +
                             " does not fit a 64-bit code \\(need both >= 0 and a sum <= 63\\)";
    const QCodec codec{integer_bits, fraction_bits};
    EXPECT_DEATH(codec.Encode(1.0), text);
    EXPECT_DEATH(codec.Decode(0), text);
  }
}

}  // namespace
}  // namespace orvex
