#ifndef ORVEX_API_MEMORY_IMAGE_PYRAMID_H_
#define ORVEX_API_MEMORY_IMAGE_PYRAMID_H_

// ImagePyramid: successively halved versions of one image, one buffer per
// level, over a contiguous range of levels (for example [1, 4]). Level L is
// the level-0 size divided by 2^L, rounded up (image_pyramid_utils.h). The
// buffers are supplied one per level (Make) or cut as consecutive spans out
// of one parent buffer (MakeFromSpans).
//
//   const int bytes = image_pyramid_utils::GetTotalBufferSize(size, {0, 3}, 64, 10);
//   ... allocate a parent of `bytes` bytes ...
//   ORVEX_ASSIGN_OR_RETURN(auto pyramid,
//                          ImagePyramid::MakeFromSpans({0, 3}, size, parent, 64, 10));
//   ORVEX_ASSIGN_OR_RETURN(Buffer* level2, pyramid->GetBufferForLevel(2));
//
// Thread safety: immutable after construction; const members may be used
// from any thread.

#include <memory>
#include <vector>

#include "orvex/api/math/generic_types.h"
#include "orvex/api/memory/buffer.h"
#include "orvex/api/thread/fence.h"
#include "orvex/base/export.h"
#include "orvex/status/statusor.h"

namespace orvex {

class ORVEX_EXPORT ImagePyramid {
 public:
  // A pyramid over `buffers`, entry i holding level levels.lower + i;
  // `size` is the size of level 0. INVALID_ARGUMENT, first failing check
  // first:
  //   "min level must be >= 0, received: <lower> unable to make ImagePyramid"
  //   "buffers is empty, unable to make ImagePyramid"
  //   "buffers contains a nullptr, unable to make ImagePyramid"
  //   "An image pyramid with levels [<lower>, <upper>] requires <count>
  //    buffers, but received: <n> unable to make ImagePyramid"
  // Buffer sizes are not compared with the level sizes.
  static StatusOr<std::unique_ptr<ImagePyramid>> Make(orvex_api::Range<int> levels,
                                                      GenericSize<int> size,
                                                      std::vector<std::shared_ptr<Buffer>> buffers);

  // Cuts `parent` into one span per level, back to back from offset 0 in
  // level order, each span with its own new, unsignalled SoftwareFence and
  // GetBufferSizeForLevel bytes; then signals the parent's fence, if it is a
  // SoftwareFence, with INTERNAL "This is the parent buffer for a set of
  // ImagePyramid SpanBuffers, do not access directly"; then Make's checks
  // apply. INVALID_ARGUMENT, before anything is made:
  //   "parent buffer is null, unable to make ImagePyramid";
  //   the refusals of image_pyramid_utils::CheckedGetTotalBufferSize (levels
  //   outside [0, 31], alignment below 1, negative size or bits per pixel,
  //   sizes beyond 32 bits), when lower <= upper;
  //   "Input buffer too small, making SpanBuffers through level: <L>
  //    requires at least: <total> bytes, but input buffer only has: <n>".
  static StatusOr<std::unique_ptr<ImagePyramid>> MakeFromSpans(orvex_api::Range<int> levels,
                                                               GenericSize<int> size,
                                                               std::shared_ptr<Buffer> parent,
                                                               int alignment, int bits_per_pixel);

  // Behind Make, which has checked the arguments (no null buffer).
  ImagePyramid(orvex_api::Range<int> levels, GenericSize<int> size,
               std::vector<std::shared_ptr<Buffer>> buffers);
  ~ImagePyramid();

  ImagePyramid(const ImagePyramid&) = delete;
  ImagePyramid& operator=(const ImagePyramid&) = delete;

  // The buffer of `level`, owned by the pyramid. OUT_OF_RANGE "Requested
  // level: <level> outside image pyramid range: [<lower>, <upper>]".
  StatusOr<Buffer*> GetBufferForLevel(int level);
  StatusOr<const Buffer*> GetBufferForLevel(int level) const;

  orvex_api::Range<int> levels() const { return levels_; }
  // The size of level 0, also when level 0 is not held.
  GenericSize<int> size() const { return size_; }
  const std::vector<std::shared_ptr<Buffer>>& buffers() const { return buffers_; }
  // Done when every level buffer's fence is done (MergeFences over them).
  const std::shared_ptr<Fence>& fence() const { return fence_; }

 private:
  StatusOr<Buffer*> BufferForLevel(int level) const;

  orvex_api::Range<int> levels_;
  GenericSize<int> size_;
  std::vector<std::shared_ptr<Buffer>> buffers_;
  std::shared_ptr<Fence> fence_;
};

}  // namespace orvex

#endif  // ORVEX_API_MEMORY_IMAGE_PYRAMID_H_
