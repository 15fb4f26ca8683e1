#ifndef ORVEX_API_MEMORY_HW_BUFFER_H_
#define ORVEX_API_MEMORY_HW_BUFFER_H_

// Buffers over hardware memory handed around as file descriptors.
//
// - HwBuffer presents a dma-buf descriptor as a Buffer. It maps the whole
//   descriptor on the first CPU access in each access mode, keeps that
//   mapping until the buffer dies, and brackets every CPU access of a cached
//   DMA buffer with cache maintenance (DMA_BUF_IOCTL_SYNC): invalidate before
//   the CPU reads, flush after it writes.
// - CachePartition, SecureBuffer and VirtualBuffer describe memory the CPU
//   may not map; their Map always fails with UNIMPLEMENTED.
//
// Mapping goes through the process-wide, replaceable HwBuffer::mapper_
// (MmapWrapper by default). Descriptors are never closed by these buffers.
//
//   ORVEX_ASSIGN_OR_RETURN(auto buffer, orvex::HwBuffer::Make(fd, size, attributes, nullptr));
//   ORVEX_ASSIGN_OR_RETURN(auto handle, buffer->Map(0, size, orvex::BufferAccessMode::kRead));
//   Consume(handle->data(), handle->size());  // caches invalidated before, nothing after
//
// Thread safety: an HwBuffer's mapping mutex serialises its Map calls and its
// unmapping clean-ups; cache maintenance of a Map runs under it. Unmap takes
// no lock. mapper_ and partial_cpu_cache_sync_handler_ are read without a
// lock: replace them only while no HwBuffer is being mapped or unmapped.

#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <string>

#include "orvex/api/memory/buffer.h"
#include "orvex/base/export.h"
#include "orvex/status/statusor.h"

namespace orvex {

// The system page size, read once with sysconf(_SC_PAGESIZE).
ORVEX_EXPORT int64_t SystemPageSize();

// Maps file descriptors into the process.
class ORVEX_EXPORT MemoryMapper {
 public:
  virtual ~MemoryMapper();
  // `offset` rounded toward zero to a multiple of the page size.
  virtual int64_t AlignOffset(int64_t offset) const = 0;
  // Maps `size` bytes of `fd` from `offset` for `mode`.
  virtual StatusOr<void*> MapFileDescriptor(int fd, uint64_t size, int64_t offset,
                                            BufferAccessMode mode) const = 0;
  // Removes a mapping; returns the system call's result.
  virtual int Unmap(void* address, uint64_t size) const = 0;
};

// mmap/munmap with MAP_SHARED: kRead maps PROT_READ, kWrite PROT_WRITE,
// kReadWrite both.
class ORVEX_EXPORT MmapWrapper : public MemoryMapper {
 public:
  int64_t AlignOffset(int64_t offset) const override;
  // INTERNAL "Mapping of FD: <fd> failed, mmap error: (<reason>), offset:
  // <offset>, size: <size>" when mmap fails.
  StatusOr<void*> MapFileDescriptor(int fd, uint64_t size, int64_t offset,
                                    BufferAccessMode mode) const override;
  int Unmap(void* address, uint64_t size) const override;
};

class ORVEX_EXPORT HwBuffer final : public Buffer {
 public:
  using PartialCpuCacheSyncHandler =
      std::function<void(const Buffer*, bool, uint64_t, uint64_t, BufferAccessMode)>;

  // The mapper used by every HwBuffer; initially an MmapWrapper.
  static std::unique_ptr<MemoryMapper> mapper_;
  // Called with (buffer, begin, offset, size, mode) to synchronise part of a
  // cached buffer; when empty, the whole buffer is synchronised instead.
  static PartialCpuCacheSyncHandler partial_cpu_cache_sync_handler_;

  // A buffer over `size` bytes of dma-buf descriptor `fd` (not owned) with
  // `attributes`. A negative descriptor is accepted; mapping it fails.
  static StatusOr<std::shared_ptr<HwBuffer>> Make(int fd, uint64_t size,
                                                  BufferAttributes attributes,
                                                  std::unique_ptr<Fence> fence);

  HwBuffer(Sigil, int fd, uint64_t size, BufferAttributes attributes, std::unique_ptr<Fence> fence);
  // Runs the clean-ups, which remove the mappings (most recent first); a
  // mapper that fails to unmap is logged at ERROR ("Unmapping of FD: ...").
  ~HwBuffer() override;

  int GetFd() const override;

  // Maps `size` bytes at `offset` (see MapImpl).
  StatusOr<std::unique_ptr<MappedHandle>> Map(int64_t offset, uint64_t size,
                                              BufferAccessMode mode) override;
  StatusOr<std::unique_ptr<const MappedHandle>> Map(int64_t offset, uint64_t size,
                                                    BufferAccessMode mode) const override;

  // Issues DMA_BUF_IOCTL_SYNC on the descriptor with the flags for `begin`
  // and `mode`: READ|START before a read, RW|START before a read-write
  // access, WRITE|END after a write, RW|END after a read-write access, and
  // nothing otherwise. EINTR is retried; other failures are logged (errno is
  // preserved) and not reported.
  void DoCpuSync(bool begin, BufferAccessMode mode) const override;

  // Transport kDma, access kCpu and cached.
  bool IsCached() const;

  // The body of both Map overloads. Checks the range (Buffer::CheckMapRange),
  // maps the whole descriptor in `mode` on first use (INTERNAL "Invalid FD:
  // <fd>" for a negative descriptor; a mapper failure, or INTERNAL "Mapping
  // of FD: <fd> gave no address" for a null address, annotated with "Error
  // mapping: " and DebugStr()), starts the CPU access of a cached buffer,
  // and returns a handle at base + offset.
  StatusOr<std::unique_ptr<MappedHandle>> MapImpl(int64_t offset, uint64_t size,
                                                  BufferAccessMode mode) const;

 protected:
  // Ends the CPU access of a cached buffer. A range beyond the buffer is a
  // contract violation.
  void Unmap(int64_t offset, uint64_t size, BufferAccessMode mode) override;

 private:
  // Removes the mapping of `mode` (the clean-up registered by MapImpl).
  void UnmapMode(int mode_index) const;

  int fd_;
  mutable std::mutex mapping_mutex_;
  mutable void* base_addresses_[3] = {nullptr, nullptr, nullptr};
};

// A partition of a hardware cache, identified by a number. Not mappable.
class ORVEX_EXPORT CachePartition final : public Buffer {
 public:
  static StatusOr<std::shared_ptr<CachePartition>> Make(int fd, uint32_t partition_id,
                                                        uint64_t size, BufferAttributes attributes,
                                                        std::unique_ptr<Fence> fence);
  CachePartition(Sigil, int fd, uint32_t partition_id, uint64_t size, BufferAttributes attributes,
                 std::unique_ptr<Fence> fence);
  ~CachePartition() override;

  int GetFd() const override;
  uint32_t GetPartitionId() const { return partition_id_; }
  // UNIMPLEMENTED "CachePartition are not mappable: " + DebugStr().
  StatusOr<std::unique_ptr<MappedHandle>> Map(int64_t offset, uint64_t size,
                                              BufferAccessMode mode) override;
  StatusOr<std::unique_ptr<const MappedHandle>> Map(int64_t offset, uint64_t size,
                                                    BufferAccessMode mode) const override;
  // {type: CachePartition, Size: <n>, FD: <fd>, PartitionId: <id>,
  //  Attributes: <...>}
  std::string DebugStr() const override;

 protected:
  void Unmap(int64_t offset, uint64_t size, BufferAccessMode mode) override;

 private:
  int fd_;
  uint32_t partition_id_;
};

// Protected content behind a descriptor. Not mappable.
class ORVEX_EXPORT SecureBuffer final : public Buffer {
 public:
  static StatusOr<std::shared_ptr<SecureBuffer>> Make(int fd, uint64_t size,
                                                      BufferAttributes attributes,
                                                      std::unique_ptr<Fence> fence);
  SecureBuffer(Sigil, int fd, uint64_t size, BufferAttributes attributes,
               std::unique_ptr<Fence> fence);
  ~SecureBuffer() override;

  int GetFd() const override;
  // UNIMPLEMENTED "SecureBuffers are not mappable: " + DebugStr().
  StatusOr<std::unique_ptr<MappedHandle>> Map(int64_t offset, uint64_t size,
                                              BufferAccessMode mode) override;
  StatusOr<std::unique_ptr<const MappedHandle>> Map(int64_t offset, uint64_t size,
                                                    BufferAccessMode mode) const override;
  // {type: SecureBuffer, Size: <n>, FD: <fd>, Attributes: <...>}
  std::string DebugStr() const override;

 protected:
  void Unmap(int64_t offset, uint64_t size, BufferAccessMode mode) override;

 private:
  int fd_;
};

// A placeholder with attributes but no memory. Not mappable; GetFd() is -1.
class ORVEX_EXPORT VirtualBuffer final : public Buffer {
 public:
  static StatusOr<std::shared_ptr<VirtualBuffer>> Make(uint64_t size, BufferAttributes attributes,
                                                       std::unique_ptr<Fence> fence);
  VirtualBuffer(Sigil, uint64_t size, BufferAttributes attributes, std::unique_ptr<Fence> fence);
  ~VirtualBuffer() override;

  // UNIMPLEMENTED "VirtualBuffers are not mappable: " + DebugStr().
  StatusOr<std::unique_ptr<MappedHandle>> Map(int64_t offset, uint64_t size,
                                              BufferAccessMode mode) override;
  StatusOr<std::unique_ptr<const MappedHandle>> Map(int64_t offset, uint64_t size,
                                                    BufferAccessMode mode) const override;
  // {type: VirtualBuffer, Attributes: <...>}
  std::string DebugStr() const override;

 protected:
  void Unmap(int64_t offset, uint64_t size, BufferAccessMode mode) override;
};

}  // namespace orvex

#endif  // ORVEX_API_MEMORY_HW_BUFFER_H_
