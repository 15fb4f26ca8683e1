#ifndef ORVEX_API_CAMERA_Q_CODEC_H_
#define ORVEX_API_CAMERA_Q_CODEC_H_

// QCodec: signed fixed-point codes of integer_bits + fraction_bits + 1 bits
// (two's complement, sign bit included), as exchanged with hardware blocks.
//
//   QCodec q{.integer_bits = 1, .fraction_bits = 2};   // 4-bit codes
//   q.Encode(0.375);  // 2  (1.5 quarter steps, halves round away from zero)
//   q.Encode(-5.0);   // 8  (clamped to -2.0, low four bits of -8)
//   q.Decode(8);      // -2.0
//
// Encode rounds x * 2^fraction_bits to the nearest integer (halves away from
// zero), clamps it to [-2^(I+F), 2^(I+F) - 1] and returns the low I+F+1 bits
// without sign extension. +infinity and -infinity clamp to the bounds; NaN
// encodes as 0. Decode sign-extends the code from bit I+F and divides by
// 2^fraction_bits, so Decode(Encode(x)) is x rounded to a multiple of 2^-F
// and clamped to [-2^I, 2^I - 2^-F].
//
// Precondition of both operations: integer_bits >= 0, fraction_bits >= 0 and
// integer_bits + fraction_bits <= 63 (the code fits 64 bits). A codec that
// breaks it ends the process with a FATAL line.
//
// Thread safety: a plain value; the operations are const and pure.

#include <cstdint>

#include "orvex/base/export.h"

namespace orvex {

struct ORVEX_EXPORT QCodec {
  int32_t integer_bits = 0;
  int32_t fraction_bits = 0;

  int64_t Encode(double x) const;
  double Decode(int64_t code) const;
};

}  // namespace orvex

#endif  // ORVEX_API_CAMERA_Q_CODEC_H_
