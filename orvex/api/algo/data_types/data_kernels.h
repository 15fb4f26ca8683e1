#ifndef ORVEX_API_ALGO_DATA_TYPES_DATA_KERNELS_H_
#define ORVEX_API_ALGO_DATA_TYPES_DATA_KERNELS_H_

// Vectorised inner loops of the algorithm data types, dispatched at run
// time to the best instruction set of the CPU (SSE/AVX on x86-64, NEON/SVE
// on 64-bit Arm). They work on plain spans and know nothing of buffers.
//
// Packed alignment word (native-endian 32 bits): bits 31..20 and 19..8 are
// the two motion vector components (12-bit two's complement), bits 7..0 the
// matching error.
//
// Thread safety: pure functions.

#include <cstddef>
#include <cstdint>
#include <span>

#include "orvex/base/export.h"

namespace orvex {

// out[2i] and out[2i + 1] = the sign-extended components of words[i].
// Requires out.size() >= 2 * words.size(); writes exactly that many.
ORVEX_EXPORT void UnpackMotionVectorWords(std::span<const uint32_t> words, std::span<int32_t> out);

// out[i] = bits 7..0 of words[i]. Requires out.size() >= words.size().
ORVEX_EXPORT void UnpackMatchingErrorWords(std::span<const uint32_t> words, std::span<uint8_t> out);

// Sums of the even-indexed and of the odd-indexed binary16 values of
// `halves` (whose size must be even), each converted to single precision.
// The summation order is unspecified. Infinities and NaNs are only
// guaranteed to propagate on targets with hardware half conversion.
struct HalfPairSums {
  float even = 0.0f;
  float odd = 0.0f;
};
ORVEX_EXPORT HalfPairSums SumInterleavedHalves(std::span<const uint16_t> halves);

// The instruction set the kernels above currently dispatch to, as a Highway
// target bit (HWY_NEON, HWY_SVE2, HWY_AVX2, ...). Tests use it to check that
// restricting the supported targets really switches the code path.
ORVEX_EXPORT int64_t DataKernelsTarget();

}  // namespace orvex

#endif  // ORVEX_API_ALGO_DATA_TYPES_DATA_KERNELS_H_
