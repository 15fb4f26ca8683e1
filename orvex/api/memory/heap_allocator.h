#ifndef ORVEX_API_MEMORY_HEAP_ALLOCATOR_H_
#define ORVEX_API_MEMORY_HEAP_ALLOCATOR_H_

// HeapAllocator: an allocator over process heap memory for host use (tests,
// demos, embedding code without a device memory pool). It has no parents.
//
//   auto allocator = std::make_shared<HeapAllocator>();
//   ORVEX_ASSIGN_OR_RETURN(ImageFormat format,
//                          ImageFormat::Make(4000, 3000, HalPixelFormat::YCBCR_420_888));
//   ORVEX_ASSIGN_OR_RETURN(Allocation allocation,
//                          allocator->Allocate(AllocationSpec(format, 0, FenceType::kSoftware)));
//   ORVEX_ASSIGN_OR_RETURN(auto image, Image::Make(*allocation.image_format, {},
//                                                  std::move(allocation.buffers)));
//
// Thread safety: Allocate, GetAllocatedBytes and DebugStr may be called from
// any thread; buffers may outlive the allocator.

#include <atomic>
#include <cstdint>
#include <memory>
#include <string>

#include "orvex/api/memory/allocation_spec.h"
#include "orvex/api/thread/fence.h"
#include "orvex/base/export.h"
#include "orvex/status/statusor.h"

namespace orvex {

class ORVEX_EXPORT HeapAllocator final : public Allocator {
 public:
  // Requests with FenceType::kDefault get fences of `default_fence_type`.
  // Precondition: default_fence_type is not kDefault (FATAL "Check failed:
  // default_fence_type != FenceType::kDefault ...").
  explicit HeapAllocator(FenceType default_fence_type = FenceType::kSoftware);
  ~HeapAllocator() override;

  // A size request: one HeapBuffer<uint8_t> of that size, uncompressed. An
  // image request: one HeapBuffer<uint8_t> per entry of the format's
  // buffer_sizes, with the compression the pixel format implies, and the
  // format recorded in the allocation. Each buffer gets a new fence of the
  // requested kind. UNIMPLEMENTED "HeapAllocator cannot allocate by request
  // id and stream id" for a request of a capture stream; a failing
  // HeapBuffer::Make is returned unchanged.
  StatusOr<Allocation> Allocate(const AllocationSpec& spec) override;

  // Bytes of the buffers handed out that are still alive.
  uint64_t GetAllocatedBytes() const override;

  // {type: HeapAllocator, DefaultFenceType: <n>, AllocatedBytes: <n>}
  std::string DebugStr() const override;

 private:
  StatusOr<std::shared_ptr<Buffer>> MakeBuffer(uint64_t size, BufferCompression compression,
                                               FenceType fence_type);

  const FenceType default_fence_type_;
  // Shared with the clean-ups of the buffers, which may outlive the
  // allocator.
  std::shared_ptr<std::atomic<uint64_t>> allocated_bytes_;
};

}  // namespace orvex

#endif  // ORVEX_API_MEMORY_HEAP_ALLOCATOR_H_
