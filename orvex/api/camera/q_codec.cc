#include "orvex/api/camera/q_codec.h"

#include <cmath>

#include "orvex/status/log.h"

namespace orvex {
namespace {

// Refuses widths that do not fit a 64-bit code; the shifts below rely on it.
// Returns I + F.
int CheckedMagnitudeBits(const QCodec& codec) {
  const int64_t integer_bits = codec.integer_bits;
  const int64_t fraction_bits = codec.fraction_bits;
  if (integer_bits < 0 || fraction_bits < 0 || integer_bits + fraction_bits > 63) {
    ORVEX_LOG(FATAL) << "QCodec with integer_bits " << integer_bits << " and fraction_bits "
                     << fraction_bits
                     << " does not fit a 64-bit code (need both >= 0 and a sum <= 63)";
  }
  return static_cast<int>(integer_bits + fraction_bits);
}

}  // namespace

int64_t QCodec::Encode(double x) const {
  const int magnitude_bits = CheckedMagnitudeBits(*this);
  if (std::isnan(x)) return 0;
  // L = 2^(I+F) is a power of two, exact as a double. The rounded value is
  // integral, so "q > L - 1" is "q >= L"; comparing with L itself avoids the
  // rounding of L - 1 to L when I + F is large.
  const double limit = std::ldexp(1.0, magnitude_bits);
  const double q = std::round(std::ldexp(x, fraction_bits));
  int64_t value;
  if (q >= limit) {
    value = static_cast<int64_t>((uint64_t{1} << magnitude_bits) - 1);
  } else if (q <= -limit) {
    // -2^(I+F): built in unsigned arithmetic, which wraps by definition;
    // the conversion to int64_t is modular.
    value = static_cast<int64_t>(uint64_t{0} - (uint64_t{1} << magnitude_bits));
  } else {
    value = static_cast<int64_t>(q);  // |q| < 2^63: in range.
  }
  const int code_bits = magnitude_bits + 1;
  const uint64_t mask = code_bits == 64 ? ~uint64_t{0} : (uint64_t{1} << code_bits) - 1;
  return static_cast<int64_t>(static_cast<uint64_t>(value) & mask);
}

double QCodec::Decode(int64_t code) const {
  const int magnitude_bits = CheckedMagnitudeBits(*this);
  // ((code XOR S) - S) with S = 2^(I+F), in unsigned arithmetic so that the
  // subtraction wraps instead of overflowing.
  const uint64_t sign = uint64_t{1} << magnitude_bits;
  const auto value = static_cast<int64_t>((static_cast<uint64_t>(code) ^ sign) - sign);
  return std::ldexp(static_cast<double>(value), -fraction_bits);
}

}  // namespace orvex
