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

// Encode rounds half away from zero, clamps to [-2^(I+F), 2^(I+F) - 1] and
// keeps the low I + F + 1 bits; Decode sign-extends them back.
TEST(QCodecTest, EncodeAndDecode) {
  const struct {
    int32_t integer_bits, fraction_bits;
    double x;
    int64_t code;
    double decoded;
  } cases[] = {
      // clang-format off
      // 4-bit codes: I = 1, F = 2, L = 8.
      {1, 2, 0.375, 2, 0.5},  {1, 2, -0.375, 14, -0.5}, {1, 2, 0.125, 1, 0.25},
      {1, 2, 1.75, 7, 1.75},  {1, 2, 5.0, 7, 1.75},     {1, 2, -2.0, 8, -2.0},
      {1, 2, -5.0, 8, -2.0},  {1, 2, -0.25, 15, -0.25}, {1, 2, kInf, 7, 1.75},
      {1, 2, -kInf, 8, -2.0}, {1, 2, NAN, 0, 0.0},
      // A 1-bit code holds 0 or -1.
      {0, 0, 0.4, 0, 0.0},    {0, 0, 3.0, 0, 0.0},      {0, 0, -0.5, 1, -1.0},
      // The widest codes: 64 bits.
      {63, 0, 1e300, kMax64, 9223372036854775807.0},
      {63, 0, 9223372036854775808.0, kMax64, 9223372036854775807.0},
      {63, 0, -kInf, kMin64, -9223372036854775808.0}, {63, 0, -3.0, -3, -3.0},
      {0, 63, 0.5, int64_t{1} << 62, 0.5},            {31, 32, -1.0, -(int64_t{1} << 32), -1.0},
      {12, 4, -1.5, 0x20000 - 24, -1.5},  // A 17-bit code.
      // clang-format on
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(testing::Message()
                 << "I=" << c.integer_bits << " F=" << c.fraction_bits << " x=" << c.x);
    const QCodec codec{c.integer_bits, c.fraction_bits};
    EXPECT_EQ(codec.Encode(c.x), c.code);
    EXPECT_EQ(codec.Decode(c.code), c.decoded);
  }
}

// Decode(Encode(x)) is x rounded to a multiple of 2^-F, clamped to
// [-2^I, 2^I - 2^-F].
TEST(QCodecTest, RoundTrip) {
  const QCodec codec{3, 5};
  const double step = 1.0 / 32;
  for (double x = -10.0; x <= 10.0; x += 0.0137) {
    SCOPED_TRACE(x);
    const double want = std::fmin(std::fmax(std::round(x / step) * step, -8.0), 8.0 - step);
    const int64_t code = codec.Encode(x);
    EXPECT_GE(code, 0);
    EXPECT_LT(code, 512);
    EXPECT_EQ(codec.Decode(code), want);
  }
}

TEST(QCodecDeathTest, RefusesCodesWiderThan64Bits) {
  const struct {
    int32_t integer_bits, fraction_bits;
  } cases[] = {{40, 24}, {-1, 4}, {4, -1}, {2147483647, 2147483647}};
  for (const auto& c : cases) {
    const std::string text = "QCodec with integer_bits " + std::to_string(c.integer_bits) +
                             " and fraction_bits " + std::to_string(c.fraction_bits) +
                             " does not fit a 64-bit code \\(need both >= 0 and a sum <= 63\\)";
    const QCodec codec{c.integer_bits, c.fraction_bits};
    EXPECT_DEATH(codec.Encode(1.0), text);
    EXPECT_DEATH(codec.Decode(0), text);
  }
}

}  // namespace
}  // namespace orvex
