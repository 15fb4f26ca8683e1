#ifndef ORVEX_API_MEMORY_ALLOCATION_SPEC_H_
#define ORVEX_API_MEMORY_ALLOCATION_SPEC_H_

// Allocation: requests (AllocationSpec), results (Allocation) and the
// allocators that turn one into the other.
//
// An allocator knows a memory pool and may draw from parent allocators; the
// parent links form a graph, which GetAllocatorAncestry walks and
// SortAllocatorsTopologically orders parents first. Concrete allocators live
// outside this library (heap_allocator.h has one for host use).
//
//   AllocationSpec spec(ImageFormat::Make(4000, 3000, HalPixelFormat::YCBCR_420_888).value(),
//                       /*flags=*/0, FenceType::kSoftware);
//   ORVEX_ASSIGN_OR_RETURN(Allocation allocation, allocator->Allocate(spec));
//
//   uint64_t size = 4096;
//   ORVEX_ASSIGN_OR_RETURN(std::shared_ptr<Buffer> buffer,
//                          Buffer::Allocate(allocator, size, 0, FenceType::kDummy));
//
// Thread safety: AllocationSpec and Allocation are values. Allocator's
// registry is guarded by its mutex; Flush holds it while flushing the
// registered allocators. Those may register and unregister allocators (also
// themselves, or by being destroyed) on the same thread, but must not flush
// back into an allocator whose Flush is running on that thread (a contract
// violation that ends the process). The graph functions take no lock: parent
// links must not change meanwhile.

#include <cstdint>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <utility>
#include <variant>
#include <vector>

#include "absl/container/flat_hash_set.h"
#include "orvex/api/memory/buffer.h"
#include "orvex/api/memory/image_format.h"
#include "orvex/api/thread/fence.h"
#include "orvex/base/export.h"
#include "orvex/status/printable.h"
#include "orvex/status/statusor.h"

namespace orvex {

// What to allocate and which fence kind the buffers are to carry.
class ORVEX_EXPORT AllocationSpec : public Printable {
 public:
  // Allocation flags, passed through to the allocator; no bit has a meaning
  // here.
  using Flags = uint32_t;

  // The three kinds of request.
  struct BySize {
    uint64_t size;
    Flags flags;
  };
  struct ByImage {
    ImageFormat format;
    Flags flags;
  };
  // The buffers of a capture request's stream, resolved by the allocator.
  struct ByRequest {
    uint32_t request_id;
    int32_t stream_id;
  };
  using Request = std::variant<BySize, ByImage, ByRequest>;

  // `size` bytes. Precondition: size > 0 (FATAL "Check failed: size > 0
  // AllocationSpec of 0 bytes").
  AllocationSpec(uint64_t size, Flags flags, FenceType fence_type);
  // The buffers of `format` (one per entry of its buffer_sizes).
  AllocationSpec(ImageFormat format, Flags flags, FenceType fence_type);
  // The buffers of a request's stream.
  AllocationSpec(ByRequest request, FenceType fence_type);

  AllocationSpec(const AllocationSpec&) = default;
  AllocationSpec& operator=(const AllocationSpec&) = default;
  AllocationSpec(AllocationSpec&&) noexcept = default;
  AllocationSpec& operator=(AllocationSpec&&) noexcept = default;
  ~AllocationSpec() override;

  const Request& request() const { return request_; }
  // kDefault leaves the kind to the allocator, which substitutes a concrete
  // one before creating fences.
  FenceType fence_type() const { return fence_type_; }

  // The requested size of a size request; empty for the other kinds.
  std::optional<uint64_t> GetSize() const;

  // {type: AllocationSpec, size: <n>, flags: <f>}
  // {type: AllocationSpec, image: <format's DebugStr>, flags: <f>}
  // {type: AllocationSpec, request_id: <r>, stream_id: <s>}
  // The fence type is not printed.
  std::string DebugStr() const override;

 private:
  Request request_;
  FenceType fence_type_;
};

// The buffers an allocator made for one request.
class ORVEX_EXPORT Allocation : public Printable {
 public:
  Allocation() = default;
  explicit Allocation(std::vector<std::shared_ptr<Buffer>> allocated_buffers,
                      std::optional<ImageFormat> format = std::nullopt)
      : buffers(std::move(allocated_buffers)), image_format(std::move(format)) {}
  Allocation(const Allocation&) = default;
  Allocation& operator=(const Allocation&) = default;
  Allocation(Allocation&&) noexcept = default;
  Allocation& operator=(Allocation&&) noexcept = default;
  ~Allocation() override;

  // {type: Allocation: , buffers: {<DebugStr>, ... or <null>}, image_format:
  //  <format's DebugStr or <n/a>>}
  std::string DebugStr() const override;

  std::vector<std::shared_ptr<Buffer>> buffers;
  // Present when the allocation describes an image.
  std::optional<ImageFormat> image_format;
};

// A source of buffers. Concrete allocators implement Allocate, DebugStr and
// GetAllocatedBytes.
class ORVEX_EXPORT Allocator : public virtual Printable {
 public:
  ~Allocator() override;

  Allocator(const Allocator&) = delete;
  Allocator& operator=(const Allocator&) = delete;

  virtual StatusOr<Allocation> Allocate(const AllocationSpec& spec) = 0;

  // A share of each parent, in order.
  virtual std::vector<std::shared_ptr<Allocator>> GetParents() const;

  // Bytes of the buffers this allocator has handed out that are still
  // alive. An accounting query for the camera stack.
  virtual uint64_t GetAllocatedBytes() const = 0;

  // Flushes every allocator in the registry (in the set's order) with the
  // registry mutex held. An allocator unregistered meanwhile is not flushed
  // any more; one registered meanwhile is not flushed by this call.
  virtual void Flush();

  // Adds `allocator` to (or removes it from) the registry that Flush acts
  // on. The registry does not own its entries: an allocator must be removed
  // before it is destroyed, in its most derived destructor. Adding one that
  // is already there, or removing one that is not, does nothing. Both may
  // be called from inside this allocator's Flush() on its thread.
  void RegisterAllocator(Allocator* allocator);
  void UnregisterAllocator(Allocator* allocator);

 protected:
  explicit Allocator(std::vector<std::shared_ptr<Allocator>> parents = {});

 private:
  const std::vector<std::shared_ptr<Allocator>> parents_;
  std::mutex registry_mutex_;
  absl::flat_hash_set<Allocator*> registry_;  // guarded by registry_mutex_
};

// Adds `allocator` and every allocator reachable through parent links to
// `ancestry`. A null allocator adds nothing; parent cycles end the walk.
// Precondition: ancestry is not null.
ORVEX_EXPORT void GetAllocatorAncestry(const Allocator* allocator,
                                       absl::flat_hash_set<const Allocator*>* ancestry);

// The allocators in an order where each comes after its parents that are in
// the input. Parents outside the input are neither listed nor followed;
// unrelated allocators come in the set's iteration order. FAILED_PRECONDITION
// "Detected allocator cycle, unable to sort topologically" for a cycle among
// the input allocators.
ORVEX_EXPORT StatusOr<std::vector<const Allocator*>> SortAllocatorsTopologically(
    absl::flat_hash_set<const Allocator*> allocators);

namespace allocation_internal {

// Buffer::Allocate: the first buffer of `allocator`'s allocation for a size
// request. The allocator's error is returned unchanged; an allocation
// without buffers, or whose first buffer is null, is INTERNAL. Preconditions:
// allocator not null, size > 0.
ORVEX_EXPORT StatusOr<std::shared_ptr<Buffer>> AllocateBuffer(Allocator* allocator,
                                                              const uint64_t& size,
                                                              AllocationSpec::Flags flags,
                                                              FenceType fence_type);

}  // namespace allocation_internal

template <typename... Args>
StatusOr<std::shared_ptr<Buffer>> Buffer::Allocate(Args&&... args) {
  return allocation_internal::AllocateBuffer(std::forward<Args>(args)...);
}

}  // namespace orvex

#endif  // ORVEX_API_MEMORY_ALLOCATION_SPEC_H_
