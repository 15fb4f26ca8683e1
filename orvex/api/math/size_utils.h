#ifndef ORVEX_API_MATH_SIZE_UTILS_H_
#define ORVEX_API_MATH_SIZE_UTILS_H_

// Size and alignment helpers for buffer layouts.
//
// Thread safety: pure functions.

#include <cstddef>
#include <cstdint>

#include "orvex/base/export.h"

namespace orvex {

// True when exactly one bit of `value` is set.
constexpr bool IsPowerOf2(size_t value) { return value != 0 && (value & (value - 1)) == 0; }

// `value` rounded up to a multiple of `alignment`, computed modulo 2^64.
// Callers pass int values sign-extended to 64 bits; a negative value comes
// back as the two's-complement form of its rounded value.
// Precondition: `alignment` is a power of 2 (fatal otherwise).
ORVEX_EXPORT size_t AlignToPower2(size_t value, size_t alignment);

// AlignToPower2 over a signed 64-bit value (int inputs widened without
// loss), returning the signed result.
inline int64_t AlignToPower2Signed(int64_t value, size_t alignment) {
  return static_cast<int64_t>(AlignToPower2(static_cast<size_t>(value), alignment));
}

// ceil(value / divisor) for non-negative values; for negative values the
// truncating form (value + divisor - 1) / divisor. divisor > 0.
constexpr int64_t CeilDiv(int64_t value, int64_t divisor) {
  return (value + divisor - 1) / divisor;
}

}  // namespace orvex

#endif  // ORVEX_API_MATH_SIZE_UTILS_H_
