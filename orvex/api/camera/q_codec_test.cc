#include "orvex/api/camera/q_codec.h"

#include <cmath>
#include <cstdint>
#include <limits>
#include <string>

#include "gtest/gtest.h"

namespace orvex {
namespace {

constexpr double kInf = std::numeric_limits<double>::infinity();
constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

TEST(QCodecTest, EncodeRoundsClampsAndMasks) {
  const struct {
    int32_t integer_bits;
    int32_t fraction_bits;
    double x;
    int64_t code;
  } cases[] = {
      // 4-bit codes: I = 1, F = 2, L = 8.
      {1, 2, 0.375, 2},    // 1.5 rounds away from zero to 2.
      {1, 2, -0.375, 14},  // -1.5 rounds to -2; low four bits 0b1110.
      {1, 2, 0.125, 1},    // 0.5 rounds away from zero to 1.
      {1, 2, 1.75, 7},     // Largest value.
      {1, 2, 5.0, 7},      // Clamped to L - 1.
      {1, 2, -2.0, 8},     // -L exactly.
      {1, 2, -5.0, 8},     // Clamped to -L; the low four bits of -8.
      {1, 2, -0.25, 15},   // -1 -> 0b1111.
      {1, 2, kInf, 7},
      {1, 2, -kInf, 8},
      {1, 2, kNaN, 0},
      // No fraction bits, no integer bits: a 1-bit code holds 0 or -1.
      {0, 0, 0.4, 0},
      {0, 0, 3.0, 0},   // L - 1 = 0.
      {0, 0, -0.5, 1},  // Rounds to -1, code 0b1.
      // The widest codec: 64-bit codes, L = 2^63.
      {63, 0, 1e300, std::numeric_limits<int64_t>::max()},
      {63, 0, 9223372036854775808.0, std::numeric_limits<int64_t>::max()},
      {63, 0, -9223372036854775808.0, std::numeric_limits<int64_t>::min()},
      {63, 0, -kInf, std::numeric_limits<int64_t>::min()},
      {63, 0, -3.0, -3},
      {0, 63, 0.5, int64_t{1} << 62},
      {31, 32, -1.0, -(int64_t{1} << 32)},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(testing::Message()
                 << "I=" << c.integer_bits << " F=" << c.fraction_bits << " x=" << c.x);
    const QCodec codec{c.integer_bits, c.fraction_bits};
    EXPECT_EQ(codec.Encode(c.x), c.code);
  }
}

TEST(QCodecTest, DecodeSignExtends) {
  const struct {
    int32_t integer_bits;
    int32_t fraction_bits;
    int64_t code;
    double value;
  } cases[] = {
      {1, 2, 8, -2.0},
      {1, 2, 7, 1.75},
      {1, 2, 15, -0.25},
      {1, 2, 0, 0.0},
      {0, 0, 1, -1.0},
      {63, 0, std::numeric_limits<int64_t>::min(), -9223372036854775808.0},
      {63, 0, -3, -3.0},
      {0, 63, int64_t{1} << 62, 0.5},
      {12, 4, 0x20000 - 24, -1.5},  // 17-bit code of -24.
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(testing::Message()
                 << "I=" << c.integer_bits << " F=" << c.fraction_bits << " code=" << c.code);
    EXPECT_EQ((QCodec{c.integer_bits, c.fraction_bits}.Decode(c.code)), c.value);
  }
}

// Decode(Encode(x)) is x rounded to a multiple of 2^-F, clamped to
// [-2^I, 2^I - 2^-F].
TEST(QCodecTest, RoundTrip) {
  const QCodec codec{3, 5};
  const double step = 1.0 / 32;
  for (double x = -10.0; x <= 10.0; x += 0.0137) {
    SCOPED_TRACE(x);
    double want = std::round(x / step) * step;
    want = std::fmin(std::fmax(want, -8.0), 8.0 - step);
    const int64_t code = codec.Encode(x);
    EXPECT_GE(code, 0);
    EXPECT_LT(code, 512);
    EXPECT_EQ(codec.Decode(code), want);
  }
}

TEST(QCodecDeathTest, RefusesCodesWiderThan64Bits) {
  const struct {
    int32_t integer_bits;
    int32_t fraction_bits;
    const char* bits;
  } cases[] = {{40, 24, "40 and fraction_bits 24"},
               {-1, 4, "-1 and fraction_bits 4"},
               {2147483647, 2147483647, "2147483647 and fraction_bits 2147483647"}};
  for (const auto& c : cases) {
    const std::string text = std::string("QCodec with integer_bits ") + c.bits +
                             " does not fit a 64-bit code \\(need both >= 0 and a sum <= 63\\)";
    const QCodec codec{c.integer_bits, c.fraction_bits};
    EXPECT_DEATH(codec.Encode(1.0), text);
    EXPECT_DEATH(codec.Decode(0), text);
  }
}

}  // namespace
}  // namespace orvex
