#include "orvex/api/memory/image_pyramid_utils.h"

#include <cstdint>
#include <limits>

#include "orvex/status/log.h"
#include "orvex/status/status_builder.h"
#include "orvex/status/status_macros.h"

namespace orvex {
namespace {

constexpr int64_t kInt32Max = std::numeric_limits<int32_t>::max();

// (d + factor - 1) / factor in 64 bits, so that neither the sum nor a factor
// of 2^31 can overflow. The quotient's magnitude never exceeds |d|.
int DownsampleDimension(int d, int64_t factor) {
  return static_cast<int>((int64_t{d} + factor - 1) / factor);
}

GenericSize<int> DownsampleWide(GenericSize<int> size, int64_t factor) {
  return {DownsampleDimension(size.width, factor), DownsampleDimension(size.height, factor)};
}

Status CheckLevel(int level) {
  if (level < 0 || level > image_pyramid_utils::kMaxLevel) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC)
           << "pyramid level must be in [0, " << image_pyramid_utils::kMaxLevel
           << "], received: " << level;
  }
  return OkStatus();
}

// Ends the process with the message of a refused argument.
[[noreturn]] void DieWith(const Status& status) { ORVEX_LOG(FATAL) << status.message(); }

}  // namespace

GenericSize<int> Downsample(GenericSize<int> size, int downsample_factor) {
  if (downsample_factor < 1) {
    ORVEX_LOG(FATAL) << "downsample factor must be >= 1, received: " << downsample_factor;
  }
  return DownsampleWide(size, downsample_factor);
}

namespace image_pyramid_utils {

GenericSize<int> GetSizeForLevel(GenericSize<int> size, int level) {
  if (Status status = CheckLevel(level); !status.ok()) DieWith(status);
  return DownsampleWide(size, int64_t{1} << level);
}

StatusOr<int> CheckedGetBufferSizeForLevel(GenericSize<int> size, int level, int alignment,
                                           int bits_per_pixel) {
  ORVEX_RETURN_IF_ERROR(CheckLevel(level));
  if (alignment < 1) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC)
           << "alignment must be >= 1, received: " << alignment;
  }
  if (bits_per_pixel < 0) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC)
           << "bits per pixel must be >= 0, received: " << bits_per_pixel;
  }
  if (size.width < 0 || size.height < 0) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC)
           << "image size must not be negative, received: " << size;
  }
  const GenericSize<int> level_size = DownsampleWide(size, int64_t{1} << level);
  // Every term is non-negative and below 2^62: width * bits < 2^62, and the
  // stride is compared with 2^31 before it is multiplied by the height.
  const int64_t row_bytes = (int64_t{level_size.width} * bits_per_pixel + 7) / 8;
  const int64_t stride = (row_bytes + alignment - 1) / alignment * alignment;
  if (level_size.height == 0) return 0;
  if (stride > kInt32Max || stride * level_size.height > kInt32Max) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC) << "buffer size of level " << level << " for a "
                                                  << size << " image does not fit in 32 bits";
  }
  return static_cast<int>(stride * level_size.height);
}

int GetBufferSizeForLevel(GenericSize<int> size, int level, int alignment, int bits_per_pixel) {
  StatusOr<int> bytes = CheckedGetBufferSizeForLevel(size, level, alignment, bits_per_pixel);
  if (!bytes.ok()) DieWith(bytes.status());
  return *bytes;
}

StatusOr<int> CheckedGetTotalBufferSize(GenericSize<int> size, orvex_api::Range<int> levels,
                                        int alignment, int bits_per_pixel) {
  if (levels.lower > levels.upper) return 0;
  // Both ends first, so that the loop below stays within [0, 31].
  ORVEX_RETURN_IF_ERROR(CheckLevel(levels.lower));
  ORVEX_RETURN_IF_ERROR(CheckLevel(levels.upper));
  int64_t total = 0;  // at most 32 terms below 2^31 each
  for (int level = levels.lower; level <= levels.upper; ++level) {
    ORVEX_ASSIGN_OR_RETURN(const int bytes,
                           CheckedGetBufferSizeForLevel(size, level, alignment, bits_per_pixel));
    total += bytes;
  }
  if (total > kInt32Max) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC)
           << "total buffer size of levels " << levels << " for a " << size
           << " image does not fit in 32 bits";
  }
  return static_cast<int>(total);
}

int GetTotalBufferSize(GenericSize<int> size, orvex_api::Range<int> levels, int alignment,
                       int bits_per_pixel) {
  StatusOr<int> bytes = CheckedGetTotalBufferSize(size, levels, alignment, bits_per_pixel);
  if (!bytes.ok()) DieWith(bytes.status());
  return *bytes;
}

}  // namespace image_pyramid_utils
}  // namespace orvex
