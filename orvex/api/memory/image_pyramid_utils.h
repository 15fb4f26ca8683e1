#ifndef ORVEX_API_MEMORY_IMAGE_PYRAMID_UTILS_H_
#define ORVEX_API_MEMORY_IMAGE_PYRAMID_UTILS_H_

// Size arithmetic of image pyramids. Level 0 is the full image; level L is
// the full size divided by 2^L, rounded up. Level buffers hold rows of
// ceil(width * bits_per_pixel / 8) bytes padded to a multiple of the row
// alignment, with nothing after the last row.
//
//   GetSizeForLevel({4000, 3000}, 3)                    -> 500x375
//   GetBufferSizeForLevel({4000, 3000}, 0, 64, 10)      -> 15168000 (stride 5056)
//   GetTotalBufferSize({4000, 3000}, {0, 2}, 64, 10)    -> 19968000
//
// Results are exact and must fit in a signed 32-bit int. The plain forms
// treat bad arguments (a level outside [0, 31], a downsample factor or an
// alignment below 1, a negative size or bits per pixel, a result beyond
// 32 bits) as broken preconditions: one FATAL line with the same text the
// checked forms return, and the process ends. The checked forms refuse the
// same arguments with INVALID_ARGUMENT instead.
//
// Thread safety: pure functions.

#include "orvex/api/math/generic_types.h"
#include "orvex/base/export.h"
#include "orvex/status/statusor.h"

namespace orvex {

// Each dimension d becomes (d + factor - 1) / factor, dividing toward zero:
// for d >= 0 that is d / factor rounded up. Computed without overflow for
// every int d. Precondition: downsample_factor >= 1 (FATAL
// "downsample factor must be >= 1, received: <factor>").
ORVEX_EXPORT GenericSize<int> Downsample(GenericSize<int> size, int downsample_factor);

namespace image_pyramid_utils {

// The highest pyramid level; levels are 0 to kMaxLevel.
inline constexpr int kMaxLevel = 31;

// Downsample(size, 2^level). Precondition: 0 <= level <= kMaxLevel (FATAL
// "pyramid level must be in [0, 31], received: <level>"). At level 31 every
// positive dimension becomes 1.
ORVEX_EXPORT GenericSize<int> GetSizeForLevel(GenericSize<int> size, int level);

// Bytes of the buffer of `level`: row stride (row bytes rounded up to a
// multiple of `alignment`) times the level's height.
ORVEX_EXPORT int GetBufferSizeForLevel(GenericSize<int> size, int level, int alignment,
                                       int bits_per_pixel);

// Sum of GetBufferSizeForLevel over levels.lower..levels.upper; 0 when
// lower > upper (nothing else is checked then).
ORVEX_EXPORT int GetTotalBufferSize(GenericSize<int> size, orvex_api::Range<int> levels,
                                    int alignment, int bits_per_pixel);

// Checked forms: the same results, or INVALID_ARGUMENT with one of the texts
//   "pyramid level must be in [0, 31], received: <level>"
//   "alignment must be >= 1, received: <alignment>"
//   "bits per pixel must be >= 0, received: <bits>"
//   "image size must not be negative, received: <w>x<h>"
//   "buffer size of level <level> for a <w>x<h> image does not fit in 32 bits"
//   "total buffer size of levels [<lower>, <upper>] for a <w>x<h> image does
//    not fit in 32 bits" (one line)
ORVEX_EXPORT StatusOr<int> CheckedGetBufferSizeForLevel(GenericSize<int> size, int level,
                                                        int alignment, int bits_per_pixel);
ORVEX_EXPORT StatusOr<int> CheckedGetTotalBufferSize(GenericSize<int> size,
                                                     orvex_api::Range<int> levels, int alignment,
                                                     int bits_per_pixel);

}  // namespace image_pyramid_utils
}  // namespace orvex

#endif  // ORVEX_API_MEMORY_IMAGE_PYRAMID_UTILS_H_
