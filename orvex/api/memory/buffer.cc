#include "orvex/api/memory/buffer.h"

#include <cstddef>
#include <limits>
#include <new>
#include <utility>

#include "fmt/format.h"
#include "orvex/status/status_builder.h"
#include "orvex/status/status_macros.h"

namespace orvex {

Buffer::MappedHandle::MappedHandle(int32_t offset, void* data, uint64_t size, BufferAccessMode mode,
                                   std::shared_ptr<Buffer> buffer)
    : offset_(offset), data_(data), size_(size), mode_(mode), buffer_(std::move(buffer)) {}

Buffer::MappedHandle::~MappedHandle() {
  // Unmap first: the share released afterwards may be the buffer's last.
  if (buffer_ != nullptr) buffer_->Unmap(offset_, size_, mode_);
}

Buffer::Buffer(BufferAttributes attributes, uint64_t size, std::unique_ptr<Fence> fence)
    : attributes_(attributes), size_(size), fence_(std::move(fence)) {}

Buffer::~Buffer() {
  // Concrete buffers have run their clean-ups already; this finds the list
  // empty unless a clean-up was added while the concrete part was destroyed.
  RunCleanups();
}

void Buffer::RunCleanups() {
  std::lock_guard<std::mutex> lock(cleanup_mutex_);
  while (!cleanups_.empty()) {
    // Move the action out before calling it so that it is destroyed (and its
    // captures released) before the next one runs.
    Cleanup cleanup = std::move(cleanups_.back());
    cleanups_.pop_back();
    cleanup(this);
  }
}

FenceWaitResult Buffer::WaitForDone(absl::Duration timeout) const {
  if (fence_ == nullptr) return FenceWaitResult(std::in_place_index<1>, OkStatus());
  return fence_->WaitForDone(timeout);
}

void Buffer::Abort() {
  if (Fence* fence = GetFence(); fence != nullptr) fence->Abort();
}

Fence* Buffer::GetFence() const { return fence_.get(); }

void Buffer::SetFence(std::unique_ptr<Fence> fence) { fence_ = std::move(fence); }

int Buffer::GetFd() const { return -1; }

int64_t Buffer::GetOffset() const { return 0; }

void Buffer::DoCpuSync(bool /*begin*/, BufferAccessMode /*mode*/) const {}

void Buffer::AddCleanup(Cleanup cleanup, bool /*propagate*/) const {
  std::lock_guard<std::mutex> lock(cleanup_mutex_);
  cleanups_.push_back(std::move(cleanup));
}

std::string Buffer::DebugStr() const {
  return BuildOrvexDebugStrWithStrings("Buffer", {{"Size", std::to_string(GetSize())},
                                                  {"FD", std::to_string(GetFd())},
                                                  {"Attributes", AttributeStr()}});
}

std::string Buffer::AttributeStr() const {
  return fmt::format("Transport: {}, Access: {}, Security: {}, Compression: {}",
                     TransportToString(attributes_.transport), AccessToString(attributes_.access),
                     SecurityToString(attributes_.security),
                     CompressionToString(attributes_.compression));
}

Status Buffer::CheckMapRange(int64_t offset, uint64_t size, uint64_t buffer_size) {
  if (offset < 0) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC) << "Invalid negative offset: " << offset;
  }
  const auto unsigned_offset = static_cast<uint64_t>(offset);
  // offset + size > buffer_size, without forming a sum that could wrap.
  if (size > buffer_size || unsigned_offset > buffer_size - size) {
    return OutOfRangeErrorBuilder(ORVEX_LOC)
           << "Offset: " << offset << " and size: " << size
           << " is out of range for the buffer size: " << buffer_size;
  }
  if (offset > std::numeric_limits<int32_t>::max()) {
    return OutOfRangeErrorBuilder(ORVEX_LOC)
           << "Offset: " << offset << " does not fit the 32-bit offset of a mapping handle";
  }
  return OkStatus();
}

StatusOr<std::shared_ptr<Buffer>> Buffer::SharedSelf() const {
  // Mapping hands out handles from const buffers too: the handle's constness,
  // not the pointer's, carries the restriction.
  std::shared_ptr<const Buffer> self = weak_from_this().lock();
  if (self == nullptr) {
    return FailedPreconditionError("A buffer must be owned by a std::shared_ptr to be mapped");
  }
  return std::const_pointer_cast<Buffer>(std::move(self));
}

namespace {

// The largest element count whose byte size fits the address space.
template <typename T>
constexpr uint64_t MaxElementCount() {
  return static_cast<uint64_t>(std::numeric_limits<ptrdiff_t>::max()) / sizeof(T);
}

}  // namespace

template <typename T>
StatusOr<std::shared_ptr<HeapBuffer<T>>> HeapBuffer<T>::Make(uint64_t count,
                                                             BufferCompression compression,
                                                             std::unique_ptr<Fence> fence) {
  std::shared_ptr<HeapBuffer<T>> buffer;
  try {
    buffer = std::make_shared<HeapBuffer<T>>(Sigil{}, count, compression, std::move(fence));
  } catch (const std::bad_alloc&) {
    buffer = nullptr;
  }
  if (buffer == nullptr || buffer->array_ == nullptr) {
    return ResourceExhaustedErrorBuilder(ORVEX_LOC) << "Cannot allocate a HeapBuffer of " << count
                                                    << " elements of " << sizeof(T) << " bytes";
  }
  return buffer;
}

template <typename T>
HeapBuffer<T>::HeapBuffer(Sigil, uint64_t count, BufferCompression compression,
                          std::unique_ptr<Fence> fence)
    : Buffer(BufferAttributes{BufferTransport::kHeap, BufferAccess::kCpu, BufferSecurity::kNone,
                              BufferCached::kCached, compression},
             count <= MaxElementCount<T>() ? count * sizeof(T) : 0, std::move(fence)) {
  // A byte size beyond the address space leaves the buffer without an array;
  // Make reports it instead of wrapping the size.
  if (count > MaxElementCount<T>()) return;
  T* raw = new (std::nothrow) T[static_cast<size_t>(count)];
  if (raw == nullptr) return;
  try {
    array_ = std::shared_ptr<T>(raw, std::default_delete<T[]>());
  } catch (const std::bad_alloc&) {
    // The shared_ptr constructor has already released `raw`.
    array_ = nullptr;
  }
}

template <typename T>
HeapBuffer<T>::~HeapBuffer() {
  RunCleanups();
}

template <typename T>
StatusOr<std::unique_ptr<Buffer::MappedHandle>> HeapBuffer<T>::MapImpl(
    int64_t offset, uint64_t size, BufferAccessMode mode) const {
  if (Status status = CheckMapRange(offset, size, GetSize()); !status.ok()) return status;
  ORVEX_ASSIGN_OR_RETURN(std::shared_ptr<Buffer> self, SharedSelf());
  // The offset is in bytes whatever the element type.
  auto* data = reinterpret_cast<unsigned char*>(array_.get()) + offset;
  return std::make_unique<MappedHandle>(static_cast<int32_t>(offset), data, size, mode,
                                        std::move(self));
}

template <typename T>
StatusOr<std::unique_ptr<Buffer::MappedHandle>> HeapBuffer<T>::Map(int64_t offset, uint64_t size,
                                                                   BufferAccessMode mode) {
  return MapImpl(offset, size, mode);
}

template <typename T>
StatusOr<std::unique_ptr<const Buffer::MappedHandle>> HeapBuffer<T>::Map(
    int64_t offset, uint64_t size, BufferAccessMode mode) const {
  return MapImpl(offset, size, mode);
}

template <typename T>
void HeapBuffer<T>::Unmap(int64_t /*offset*/, uint64_t /*size*/, BufferAccessMode /*mode*/) {}

template <typename T>
std::string HeapBuffer<T>::DebugStr() const {
  return BuildOrvexDebugStrWithStrings(
      "HeapBuffer", {{"Size", std::to_string(GetSize())},
                     {"Addr", fmt::format("{}", static_cast<const void*>(array_.get()))},
                     {"ElementSize", std::to_string(sizeof(T))},
                     {"Attributes", AttributeStr()}});
}

template class HeapBuffer<uint8_t>;
template class HeapBuffer<uint32_t>;
template class HeapBuffer<int32_t>;
template class HeapBuffer<float>;

}  // namespace orvex
