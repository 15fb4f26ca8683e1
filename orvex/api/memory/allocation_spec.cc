#include "orvex/api/memory/allocation_spec.h"

#include <string>
#include <utility>
#include <variant>
#include <vector>

#include "orvex/status/log.h"
#include "orvex/status/status_builder.h"
#include "orvex/status/status_macros.h"

namespace orvex {
namespace {

// The allocators whose Flush() runs on this thread, innermost first: this
// thread holds their registry mutexes.
class FlushScope {
 public:
  explicit FlushScope(const Allocator* allocator) : allocator_(allocator), outer_(innermost_) {
    innermost_ = this;
  }
  ~FlushScope() { innermost_ = outer_; }
  FlushScope(const FlushScope&) = delete;
  FlushScope& operator=(const FlushScope&) = delete;

  static bool IsFlushing(const Allocator* allocator) {
    for (const FlushScope* scope = innermost_; scope != nullptr; scope = scope->outer_) {
      if (scope->allocator_ == allocator) return true;
    }
    return false;
  }

 private:
  static thread_local FlushScope* innermost_;
  const Allocator* allocator_;
  FlushScope* outer_;
};

thread_local FlushScope* FlushScope::innermost_ = nullptr;

}  // namespace

AllocationSpec::AllocationSpec(uint64_t size, Flags flags, FenceType fence_type)
    : request_(BySize{size, flags}), fence_type_(fence_type) {
  ORVEX_CHECK(size > 0) << "AllocationSpec of 0 bytes";
}

AllocationSpec::AllocationSpec(ImageFormat format, Flags flags, FenceType fence_type)
    : request_(ByImage{std::move(format), flags}), fence_type_(fence_type) {}

AllocationSpec::AllocationSpec(ByRequest request, FenceType fence_type)
    : request_(request), fence_type_(fence_type) {}

AllocationSpec::~AllocationSpec() = default;

std::optional<uint64_t> AllocationSpec::GetSize() const {
  if (const BySize* by_size = std::get_if<BySize>(&request_)) return by_size->size;
  return std::nullopt;
}

std::string AllocationSpec::DebugStr() const {
  struct Fields {
    std::vector<std::pair<std::string, std::string>> operator()(const BySize& r) const {
      return {{"size", std::to_string(r.size)}, {"flags", std::to_string(r.flags)}};
    }
    std::vector<std::pair<std::string, std::string>> operator()(const ByImage& r) const {
      return {{"image", r.format.DebugStr()}, {"flags", std::to_string(r.flags)}};
    }
    std::vector<std::pair<std::string, std::string>> operator()(const ByRequest& r) const {
      return {{"request_id", std::to_string(r.request_id)},
              {"stream_id", std::to_string(r.stream_id)}};
    }
  };
  return BuildOrvexDebugStrWithStrings("AllocationSpec", std::visit(Fields(), request_));
}

Allocation::~Allocation() = default;

std::string Allocation::DebugStr() const {
  return BuildOrvexDebugStrWithStrings(
      "Allocation: ",
      {{"buffers", ContainerDebugStr(buffers,
                                     [](const std::shared_ptr<Buffer>& buffer) {
                                       return buffer == nullptr ? std::string("<null>")
                                                                : buffer->DebugStr();
                                     })},
       {"image_format", image_format.has_value() ? image_format->DebugStr() : "<n/a>"}});
}

Allocator::Allocator(std::vector<std::shared_ptr<Allocator>> parents)
    : parents_(std::move(parents)) {}

Allocator::~Allocator() = default;

std::vector<std::shared_ptr<Allocator>> Allocator::GetParents() const { return parents_; }

void Allocator::Flush() {
  ORVEX_CHECK(!FlushScope::IsFlushing(this))
      << "Allocator::Flush re-entered on the thread that is running it";
  std::lock_guard<std::mutex> lock(registry_mutex_);
  const FlushScope scope(this);
  // The flushed allocators may change the registry from this thread (an
  // allocator destroyed meanwhile unregisters itself): iterate over a copy
  // and skip those no longer registered.
  const std::vector<Allocator*> registered(registry_.begin(), registry_.end());
  for (Allocator* allocator : registered) {
    if (registry_.contains(allocator)) allocator->Flush();
  }
}

void Allocator::RegisterAllocator(Allocator* allocator) {
  if (allocator == nullptr) return;
  if (FlushScope::IsFlushing(this)) {  // the mutex is held by this thread's Flush()
    registry_.insert(allocator);
    return;
  }
  std::lock_guard<std::mutex> lock(registry_mutex_);
  registry_.insert(allocator);
}

void Allocator::UnregisterAllocator(Allocator* allocator) {
  if (FlushScope::IsFlushing(this)) {  // the mutex is held by this thread's Flush()
    registry_.erase(allocator);
    return;
  }
  std::lock_guard<std::mutex> lock(registry_mutex_);
  registry_.erase(allocator);
}

void GetAllocatorAncestry(const Allocator* allocator,
                          absl::flat_hash_set<const Allocator*>* ancestry) {
  ORVEX_CHECK(ancestry != nullptr) << "GetAllocatorAncestry needs a set to fill";
  if (allocator == nullptr) return;
  // Depth first with an explicit stack, so that long parent chains cannot
  // exhaust the thread's stack. An allocator is inserted before its parents
  // are looked at, which ends cycles.
  std::vector<const Allocator*> pending = {allocator};
  ancestry->insert(allocator);
  while (!pending.empty()) {
    const Allocator* current = pending.back();
    pending.pop_back();
    for (const std::shared_ptr<Allocator>& parent : current->GetParents()) {
      if (parent != nullptr && ancestry->insert(parent.get()).second) {
        pending.push_back(parent.get());
      }
    }
  }
}

StatusOr<std::vector<const Allocator*>> SortAllocatorsTopologically(
    absl::flat_hash_set<const Allocator*> allocators) {
  // Depth-first post-order over the parent links, with an explicit stack.
  // `allocators` holds the ones not placed yet.
  struct Frame {
    const Allocator* allocator;
    std::vector<std::shared_ptr<Allocator>> parents;
    size_t next_parent;
  };
  absl::flat_hash_set<const Allocator*> in_progress;
  std::vector<const Allocator*> result;
  result.reserve(allocators.size());
  std::vector<Frame> stack;
  // Starts the visit of `allocator` unless it is placed or not in the input.
  auto enter = [&](const Allocator* allocator) -> Status {
    if (!allocators.contains(allocator)) return OkStatus();
    if (!in_progress.insert(allocator).second) {
      return FailedPreconditionError("Detected allocator cycle, unable to sort topologically");
    }
    stack.push_back(Frame{allocator, allocator->GetParents(), 0});
    return OkStatus();
  };
  while (!allocators.empty()) {
    ORVEX_RETURN_IF_ERROR(enter(*allocators.begin()));
    while (!stack.empty()) {
      Frame& frame = stack.back();
      if (frame.next_parent < frame.parents.size()) {
        const Allocator* parent = frame.parents[frame.next_parent++].get();
        ORVEX_RETURN_IF_ERROR(enter(parent));  // may reallocate `stack`
        continue;
      }
      const Allocator* done = frame.allocator;
      stack.pop_back();
      in_progress.erase(done);
      allocators.erase(done);
      result.push_back(done);
    }
  }
  return result;
}

namespace allocation_internal {

StatusOr<std::shared_ptr<Buffer>> AllocateBuffer(Allocator* allocator, const uint64_t& size,
                                                 AllocationSpec::Flags flags,
                                                 FenceType fence_type) {
  ORVEX_CHECK(allocator != nullptr) << "Buffer::Allocate needs an allocator";
  const AllocationSpec spec(size, flags, fence_type);
  ORVEX_ASSIGN_OR_RETURN(Allocation allocation, allocator->Allocate(spec));
  if (allocation.buffers.empty()) {
    return InternalErrorBuilder(ORVEX_LOC)
           << "Allocator returned no buffers for " << spec.DebugStr();
  }
  if (allocation.buffers.front() == nullptr) {
    return InternalErrorBuilder(ORVEX_LOC)
           << "Allocator returned a null buffer for " << spec.DebugStr();
  }
  return std::move(allocation.buffers.front());
}

}  // namespace allocation_internal
}  // namespace orvex
