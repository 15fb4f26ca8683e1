#include "orvex/api/memory/image_pyramid.h"

#include <cstdint>
#include <utility>
#include <vector>

#include "orvex/api/memory/buffer_views.h"
#include "orvex/api/memory/image_pyramid_utils.h"
#include "orvex/api/thread/merged_fence.h"
#include "orvex/status/status_builder.h"
#include "orvex/status/status_macros.h"

namespace orvex {

StatusOr<std::unique_ptr<ImagePyramid>> ImagePyramid::Make(
    orvex_api::Range<int> levels, GenericSize<int> size,
    std::vector<std::shared_ptr<Buffer>> buffers) {
  if (levels.lower < 0) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC)
           << "min level must be >= 0, received: " << levels.lower
           << " unable to make ImagePyramid";
  }
  if (buffers.empty()) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC)
           << "buffers is empty, unable to make ImagePyramid";
  }
  for (const std::shared_ptr<Buffer>& buffer : buffers) {
    if (buffer == nullptr) {
      return InvalidArgumentErrorBuilder(ORVEX_LOC)
             << "buffers contains a nullptr, unable to make ImagePyramid";
    }
  }
  // 64 bits: [0, INT_MAX] holds 2^31 levels.
  const int64_t count = int64_t{levels.upper} - levels.lower + 1;
  if (count != static_cast<int64_t>(buffers.size())) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC)
           << "An image pyramid with levels " << levels << " requires " << count
           << " buffers, but received: " << buffers.size() << " unable to make ImagePyramid";
  }
  return std::make_unique<ImagePyramid>(levels, size, std::move(buffers));
}

StatusOr<std::unique_ptr<ImagePyramid>> ImagePyramid::MakeFromSpans(orvex_api::Range<int> levels,
                                                                    GenericSize<int> size,
                                                                    std::shared_ptr<Buffer> parent,
                                                                    int alignment,
                                                                    int bits_per_pixel) {
  if (parent == nullptr) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC)
           << "parent buffer is null, unable to make ImagePyramid";
  }
  std::vector<std::shared_ptr<Buffer>> spans;
  if (levels.lower <= levels.upper) {
    // Refuses levels outside [0, 31] and sizes beyond 32 bits before any
    // level size is computed.
    ORVEX_RETURN_IF_ERROR(
        image_pyramid_utils::CheckedGetTotalBufferSize(size, levels, alignment, bits_per_pixel)
            .status());
    spans.reserve(static_cast<size_t>(levels.upper) - static_cast<size_t>(levels.lower) + 1);
  }
  uint64_t offset = 0;
  uint64_t total = 0;
  for (int level = levels.lower; level <= levels.upper; ++level) {
    const uint64_t level_size = static_cast<uint64_t>(
        image_pyramid_utils::GetBufferSizeForLevel(size, level, alignment, bits_per_pixel));
    total += level_size;
    if (parent->GetSize() < total) {
      return InvalidArgumentErrorBuilder(ORVEX_LOC)
             << "Input buffer too small, making SpanBuffers through level: " << level
             << " requires at least: " << total
             << " bytes, but input buffer only has: " << parent->GetSize();
    }
    ORVEX_ASSIGN_OR_RETURN(
        std::shared_ptr<SpanBuffer> span,
        SpanBuffer::Make(parent, offset, level_size, std::make_unique<SoftwareFence>()));
    spans.push_back(std::move(span));
    offset += level_size;
  }
  if (auto* parent_fence = dynamic_cast<SoftwareFence*>(parent->GetFence())) {
    parent_fence->Signal(InternalError(
        "This is the parent buffer for a set of ImagePyramid SpanBuffers, do not access "
        "directly"));
  }
  return Make(levels, size, std::move(spans));
}

ImagePyramid::ImagePyramid(orvex_api::Range<int> levels, GenericSize<int> size,
                           std::vector<std::shared_ptr<Buffer>> buffers)
    : levels_(levels), size_(size), buffers_(std::move(buffers)) {
  std::vector<Fence*> fences;
  fences.reserve(buffers_.size());
  for (const std::shared_ptr<Buffer>& buffer : buffers_) fences.push_back(buffer->GetFence());
  fence_ = MergeFences(std::move(fences));
}

ImagePyramid::~ImagePyramid() = default;

StatusOr<Buffer*> ImagePyramid::BufferForLevel(int level) const {
  if (level < levels_.lower || level > levels_.upper) {
    return OutOfRangeErrorBuilder(ORVEX_LOC)
           << "Requested level: " << level << " outside image pyramid range: " << levels_;
  }
  return buffers_[static_cast<size_t>(level - levels_.lower)].get();
}

StatusOr<Buffer*> ImagePyramid::GetBufferForLevel(int level) { return BufferForLevel(level); }

StatusOr<const Buffer*> ImagePyramid::GetBufferForLevel(int level) const {
  ORVEX_ASSIGN_OR_RETURN(const Buffer* buffer, BufferForLevel(level));
  return buffer;
}

}  // namespace orvex
