#ifndef ORVEX_API_MEMORY_BUFFER_H_
#define ORVEX_API_MEMORY_BUFFER_H_

// Buffer: a block of image or statistics memory moving through the camera
// pipeline. Whatever backs it, a buffer has a size in bytes, attributes, an
// optional completion fence, a way to map a byte range for CPU access (the
// returned handle unmaps when destroyed) and clean-up actions that run, most
// recent first, when the buffer dies. A buffer is itself a Fence that answers
// waits with the fence it carries.
//
// Buffers are always owned through std::shared_ptr: a mapping handle holds a
// share of the buffer that made it, so the buffer outlives its mappings.
//
//   ORVEX_ASSIGN_OR_RETURN(auto buffer, orvex::HeapBuffer<uint8_t>::Make(
//                                           4096, orvex::BufferCompression::kNone, nullptr));
//   ORVEX_ASSIGN_OR_RETURN(auto handle,
//                          buffer->Map(0, 4096, orvex::BufferAccessMode::kWrite));
//   std::memset(handle->data(), 0, handle->size());
//
// Thread safety: AddCleanup may be called from any thread. GetFence, SetFence,
// Map and Unmap of the base and of heap buffers take no lock; SetFence must
// not race with other uses of the fence. Handles may be destroyed on any
// thread.

#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "absl/time/time.h"
#include "orvex/api/memory/buffer_attributes.h"
#include "orvex/api/thread/fence.h"
#include "orvex/base/export.h"
#include "orvex/status/printable.h"
#include "orvex/status/status.h"
#include "orvex/status/statusor.h"

namespace orvex {

class Allocator;

class ORVEX_EXPORT Buffer : public std::enable_shared_from_this<Buffer>,
                            public Fence,
                            public Printable {
 protected:
  // Pass key of the constructors of concrete buffers: only the buffer
  // classes' own factories can make one.
  struct Sigil {
    explicit Sigil() = default;
  };

 public:
  // The CPU view of a mapped byte range. Destroying the handle calls the
  // producing buffer's Unmap with the recorded offset, size and mode, then
  // releases the handle's share of that buffer.
  class ORVEX_EXPORT MappedHandle {
   public:
    MappedHandle(int32_t offset, void* data, uint64_t size, BufferAccessMode mode,
                 std::shared_ptr<Buffer> buffer);
    ~MappedHandle();
    MappedHandle(const MappedHandle&) = delete;
    MappedHandle& operator=(const MappedHandle&) = delete;

    // Byte offset of the mapping within `buffer()`.
    int32_t offset() const { return offset_; }
    // First mapped byte.
    void* data() const { return data_; }
    // Mapped length in bytes.
    uint64_t size() const { return size_; }
    BufferAccessMode mode() const { return mode_; }
    // The buffer that produced the mapping (a view hands on its source's).
    const std::shared_ptr<Buffer>& buffer() const { return buffer_; }

   private:
    int32_t offset_;
    void* data_;
    uint64_t size_;
    BufferAccessMode mode_;
    std::shared_ptr<Buffer> buffer_;
  };

  using Cleanup = std::function<void(Buffer*)>;

  // Runs any clean-ups still pending, then destroys the fence.
  ~Buffer() override;

  Buffer(const Buffer&) = delete;
  Buffer& operator=(const Buffer&) = delete;

  // The wait of the fence stored in this buffer (a proxy's own, not its
  // source's); with no fence, OK at once.
  FenceWaitResult WaitForDone(absl::Duration timeout) const override;
  // Aborts the fence GetFence() yields, if any.
  void Abort() override;

  // The fence, still owned by the buffer; null when there is none.
  virtual Fence* GetFence() const;
  // Takes ownership of `fence` and destroys the previous one.
  virtual void SetFence(std::unique_ptr<Fence> fence);
  // The file descriptor behind the memory, -1 when there is none.
  virtual int GetFd() const;
  // Byte offset of this buffer's memory within its file descriptor.
  virtual int64_t GetOffset() const;

  // Maps `size` bytes at byte `offset` for CPU access in `mode`.
  virtual StatusOr<std::unique_ptr<MappedHandle>> Map(int64_t offset, uint64_t size,
                                                      BufferAccessMode mode) = 0;
  virtual StatusOr<std::unique_ptr<const MappedHandle>> Map(int64_t offset, uint64_t size,
                                                            BufferAccessMode mode) const = 0;

  // CPU cache maintenance at the start (`begin`) or end of a CPU access.
  // Does nothing by default.
  virtual void DoCpuSync(bool begin, BufferAccessMode mode) const;

  // Registers `cleanup` to run when the buffer is destroyed. The base keeps
  // it in its own list whatever `propagate` says; views use the flag to pick
  // the buffer it belongs to. A clean-up must not call AddCleanup on the
  // buffer being destroyed.
  virtual void AddCleanup(Cleanup cleanup, bool propagate) const;

  // {type: Buffer, Size: <n>, FD: <fd>, Attributes: <AttributeStr()>}
  std::string DebugStr() const override;

  // Asks an allocator for one buffer. Provided (in allocation_spec.h, which
  // callers include) for the arguments (Allocator* allocator, uint64_t& size,
  // AllocationSpec::Flags flags, FenceType fence_type).
  template <typename... Args>
  static StatusOr<std::shared_ptr<Buffer>> Allocate(Args&&... args);

  uint64_t GetSize() const { return size_; }
  const BufferAttributes& GetAttributes() const { return attributes_; }
  // "Transport: {}, Access: {}, Security: {}, Compression: {}".
  std::string AttributeStr() const;

 protected:
  Buffer(BufferAttributes attributes, uint64_t size, std::unique_ptr<Fence> fence);

  // Ends the CPU access of a handle; called only by MappedHandle's
  // destruction with the values recorded in the handle.
  virtual void Unmap(int64_t offset, uint64_t size, BufferAccessMode mode) = 0;

  // Runs the pending clean-ups, most recent first, each exactly once, with
  // the clean-up mutex held. Every concrete buffer calls it first in its
  // destructor so that clean-ups still see its resources.
  void RunCleanups();

  // The checks every mappable buffer makes on a requested range:
  // INVALID_ARGUMENT "Invalid negative offset: <o>" for a negative offset;
  // OUT_OF_RANGE "Offset: <o> and size: <s> is out of range for the buffer
  // size: <n>" when the range ends past `buffer_size` (tested without
  // overflow); OUT_OF_RANGE when `offset` does not fit the handle's 32-bit
  // offset.
  static Status CheckMapRange(int64_t offset, uint64_t size, uint64_t buffer_size);

  // A share of this buffer for a mapping handle. FAILED_PRECONDITION when
  // the buffer is not owned by a std::shared_ptr.
  StatusOr<std::shared_ptr<Buffer>> SharedSelf() const;

 private:
  mutable std::mutex cleanup_mutex_;
  mutable std::vector<Cleanup> cleanups_;
  BufferAttributes attributes_;
  uint64_t size_;
  std::unique_ptr<Fence> fence_;
};

// A buffer over process heap memory: an array of `T` (uint8_t, uint32_t,
// int32_t or float) whose contents are not initialised. Heap memory is
// coherent for the CPU, so mapping does no cache maintenance. Mapping
// offsets and sizes are in bytes for every element type.
template <typename T>
class ORVEX_EXPORT HeapBuffer final : public Buffer {
 public:
  // A buffer of `count` elements with transport kHeap, access kCpu, no
  // security, cached, and `compression`. RESOURCE_EXHAUSTED when the byte
  // size overflows or the memory cannot be allocated.
  static StatusOr<std::shared_ptr<HeapBuffer<T>>> Make(uint64_t count,
                                                       BufferCompression compression,
                                                       std::unique_ptr<Fence> fence);

  // Behind Make. When the array cannot be allocated the buffer holds no
  // array (Make reports it).
  HeapBuffer(Sigil, uint64_t count, BufferCompression compression, std::unique_ptr<Fence> fence);
  ~HeapBuffer() override;

  // The array, in shared ownership: it stays valid after the buffer is gone.
  std::shared_ptr<T> GetPointer() const { return array_; }

  // Checked like every mappable buffer (see Buffer::CheckMapRange).
  StatusOr<std::unique_ptr<MappedHandle>> Map(int64_t offset, uint64_t size,
                                              BufferAccessMode mode) override;
  StatusOr<std::unique_ptr<const MappedHandle>> Map(int64_t offset, uint64_t size,
                                                    BufferAccessMode mode) const override;

  // {type: HeapBuffer, Size: <n>, Addr: 0x<hex>, ElementSize: <1|4>,
  //  Attributes: <AttributeStr()>}
  std::string DebugStr() const override;

 protected:
  void Unmap(int64_t offset, uint64_t size, BufferAccessMode mode) override;

 private:
  StatusOr<std::unique_ptr<MappedHandle>> MapImpl(int64_t offset, uint64_t size,
                                                  BufferAccessMode mode) const;

  std::shared_ptr<T> array_;
};

extern template class HeapBuffer<uint8_t>;
extern template class HeapBuffer<uint32_t>;
extern template class HeapBuffer<int32_t>;
extern template class HeapBuffer<float>;

}  // namespace orvex

#endif  // ORVEX_API_MEMORY_BUFFER_H_
