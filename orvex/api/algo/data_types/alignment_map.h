#ifndef ORVEX_API_ALGO_DATA_TYPES_ALIGNMENT_MAP_H_
#define ORVEX_API_ALGO_DATA_TYPES_ALIGNMENT_MAP_H_

// The result of block-based frame alignment as the hardware writes it: one
// packed 32-bit word per 64 x 64 pixel block, rows padded to a multiple of
// 8 words. Bits 31..20 and 19..8 hold the two motion vector components
// (12-bit two's complement), bits 7..0 the matching error.
//
// The map owns the packed buffer and keeps it mapped for its whole life.
// The unpack operations expand every word (row padding included, so the
// output keeps the packed stride) into another buffer:
//
//   auto map = orvex::AlignmentMap::Make({4032, 3024}, packed);
//   map->WaitForDone(absl::InfiniteDuration());
//   std::shared_ptr<orvex::Buffer> vectors;  // allocated on first use
//   ORVEX_ASSIGN_OR_RETURN(auto handle, map->UnpackMotionVectors(allocator, vectors));
//   const auto* mv = static_cast<const int32_t*>(handle->data());  // x, y pairs
//
// A null packed buffer, or one smaller than stride * 4 * rows bytes, is a
// contract violation (fatal). Unpacking does not wait for the packed
// buffer's fence: call WaitForDone first.
//
// Thread safety: immutable after Make; both unpack operations may run
// concurrently on one map, each with its own output.

#include <cstdint>
#include <memory>

#include "absl/time/time.h"
#include "orvex/api/math/generic_types.h"
#include "orvex/api/memory/buffer.h"
#include "orvex/api/thread/fence.h"
#include "orvex/base/export.h"
#include "orvex/status/statusor.h"

namespace orvex {

class Allocator;

// Bytes per packed word (one word per block).
inline constexpr int32_t kAlignMapBytesPerPixel = 4;

class ORVEX_EXPORT AlignmentMap {
  struct Sigil {
    explicit Sigil() = default;
  };

 public:
  // The map of an image of `image_size` pixels over the packed `buffer`,
  // which it maps read-write. A failed mapping is kept as "no mapping" and
  // reported by the unpack operations.
  static std::shared_ptr<AlignmentMap> Make(GenericSize<int> image_size,
                                            std::shared_ptr<Buffer> buffer);

  // Behind Make.
  AlignmentMap(Sigil, GenericSize<int> image_size, std::shared_ptr<Buffer> buffer);
  AlignmentMap(const AlignmentMap&) = delete;
  AlignmentMap& operator=(const AlignmentMap&) = delete;

  // The packed buffer's fence wait.
  FenceWaitResult WaitForDone(absl::Duration timeout) const;

  // Unpacks each word i into int32 elements 2i and 2i + 1 of `output`
  // (N * 8 bytes for N = packed size / 4 words). When `output` is empty it
  // is allocated from `allocator` (flags 32, a dummy fence) and stored there
  // (and kept even if a later step fails); INVALID_ARGUMENT when there is no
  // allocator or nothing to unpack. Every byte of `output` past the unpacked values is zeroed.
  // Returns the read-write mapping of the whole output, or:
  // FAILED_PRECONDITION when the packed buffer is not mapped; the
  // allocator's error annotated "Error allocating image for motion
  // vectors."; INVALID_ARGUMENT "Motion vector buffer is not big enough,
  // need <R> given <size>"; the output's mapping error.
  StatusOr<std::unique_ptr<Buffer::MappedHandle>> UnpackMotionVectors(
      Allocator* allocator, std::shared_ptr<Buffer>& output) const;

  // Unpacks each word i into byte i of `output` (N bytes); otherwise as
  // UnpackMotionVectors, with "Error allocating image for matching
  // errors." (the size message is the same).
  StatusOr<std::unique_ptr<Buffer::MappedHandle>> UnpackMatchingErrors(
      Allocator* allocator, std::shared_ptr<Buffer>& output) const;

  // Size in pixels of the image the map describes.
  const GenericSize<int> image_size;
  // Blocks across and down: each dimension rounded up to whole 64 pixels.
  const GenericSize<int> alignment_map_size;
  // Words per packed row: the block width rounded up to a multiple of 8.
  const int32_t alignment_map_stride;

 private:
  enum class Content { kMotionVectors, kMatchingErrors };
  StatusOr<std::unique_ptr<Buffer::MappedHandle>> Unpack(Content content, Allocator* allocator,
                                                         std::shared_ptr<Buffer>& output) const;

  std::shared_ptr<Buffer> buffer_;
  // Declared after buffer_ so that it is released (unmapped) first.
  std::unique_ptr<Buffer::MappedHandle> buffer_handle_;
};

}  // namespace orvex

#endif  // ORVEX_API_ALGO_DATA_TYPES_ALIGNMENT_MAP_H_
