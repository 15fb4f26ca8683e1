#include "orvex/api/memory/hw_buffer.h"

#include <errno.h>
#include <linux/dma-buf.h>
#include <string.h>
#include <sys/ioctl.h>
#include <sys/mman.h>
#include <unistd.h>

#include <utility>

#include "orvex/status/log.h"
#include "orvex/status/status_builder.h"
#include "orvex/status/status_macros.h"

namespace orvex {
namespace {

// Read once while the library is loaded.
const int64_t kPageSize = sysconf(_SC_PAGESIZE);

int ModeIndex(BufferAccessMode mode) { return static_cast<int>(mode); }

bool IsValidMode(BufferAccessMode mode) {
  return mode == BufferAccessMode::kRead || mode == BufferAccessMode::kWrite ||
         mode == BufferAccessMode::kReadWrite;
}

// The dma-buf sync flags that bracket a CPU access; 0 when the direction
// needs no maintenance (no invalidate before a write-only access, no flush
// after a read-only one).
uint64_t SyncFlags(bool begin, BufferAccessMode mode) {
  if (begin) {
    switch (mode) {
      case BufferAccessMode::kRead:
        return DMA_BUF_SYNC_READ | DMA_BUF_SYNC_START;
      case BufferAccessMode::kReadWrite:
        return DMA_BUF_SYNC_RW | DMA_BUF_SYNC_START;
      case BufferAccessMode::kWrite:
        return 0;
    }
  } else {
    switch (mode) {
      case BufferAccessMode::kWrite:
        return DMA_BUF_SYNC_WRITE | DMA_BUF_SYNC_END;
      case BufferAccessMode::kReadWrite:
        return DMA_BUF_SYNC_RW | DMA_BUF_SYNC_END;
      case BufferAccessMode::kRead:
        return 0;
    }
  }
  return 0;
}

// The refusal of every kind the CPU may not map.
StatusOr<std::unique_ptr<Buffer::MappedHandle>> NotMappable(std::string_view what,
                                                            const Buffer& buffer) {
  return UnimplementedErrorBuilder(ORVEX_LOC) << what << buffer.DebugStr();
}

}  // namespace

int64_t SystemPageSize() { return kPageSize; }

// ------------------------------------------------------------------ mappers

MemoryMapper::~MemoryMapper() = default;

int64_t MmapWrapper::AlignOffset(int64_t offset) const { return offset / kPageSize * kPageSize; }

StatusOr<void*> MmapWrapper::MapFileDescriptor(int fd, uint64_t size, int64_t offset,
                                               BufferAccessMode mode) const {
  int protection = PROT_READ | PROT_WRITE;
  if (mode == BufferAccessMode::kRead) protection = PROT_READ;
  if (mode == BufferAccessMode::kWrite) protection = PROT_WRITE;
  void* address = mmap(nullptr, size, protection, MAP_SHARED, fd, offset);
  if (address == MAP_FAILED) {
    const int err = errno;
    return InternalErrorBuilder(ORVEX_LOC)
           << "Mapping of FD: " << fd << " failed, mmap error: (" << ErrnoText(err)
           << "), offset: " << offset << ", size: " << size;
  }
  return address;
}

int MmapWrapper::Unmap(void* address, uint64_t size) const { return munmap(address, size); }

// ----------------------------------------------------------------- HwBuffer

std::unique_ptr<MemoryMapper> HwBuffer::mapper_ = std::make_unique<MmapWrapper>();
HwBuffer::PartialCpuCacheSyncHandler HwBuffer::partial_cpu_cache_sync_handler_;

StatusOr<std::shared_ptr<HwBuffer>> HwBuffer::Make(int fd, uint64_t size,
                                                   BufferAttributes attributes,
                                                   std::unique_ptr<Fence> fence) {
  return std::make_shared<HwBuffer>(Sigil{}, fd, size, attributes, std::move(fence));
}

HwBuffer::HwBuffer(Sigil, int fd, uint64_t size, BufferAttributes attributes,
                   std::unique_ptr<Fence> fence)
    : Buffer(attributes, size, std::move(fence)), fd_(fd) {}

HwBuffer::~HwBuffer() { RunCleanups(); }

int HwBuffer::GetFd() const { return fd_; }

bool HwBuffer::IsCached() const {
  const BufferAttributes& a = GetAttributes();
  return a.transport == BufferTransport::kDma && a.access == BufferAccess::kCpu &&
         a.cached == BufferCached::kCached;
}

StatusOr<std::unique_ptr<Buffer::MappedHandle>> HwBuffer::MapImpl(int64_t offset, uint64_t size,
                                                                  BufferAccessMode mode) const {
  if (Status status = CheckMapRange(offset, size, GetSize()); !status.ok()) return status;
  if (!IsValidMode(mode)) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC)
           << "Invalid access mode: " << static_cast<int>(mode);
  }
  ORVEX_ASSIGN_OR_RETURN(std::shared_ptr<Buffer> self, SharedSelf());

  const int index = ModeIndex(mode);
  bool newly_mapped = false;
  void* base = nullptr;
  {
    std::lock_guard<std::mutex> lock(mapping_mutex_);
    if (base_addresses_[index] == nullptr) {
      const int fd = GetFd();
      if (fd < 0) return InternalErrorBuilder(ORVEX_LOC) << "Invalid FD: " << fd;
      StatusOr<void*> mapped = mapper_->MapFileDescriptor(fd, GetSize(), 0, mode);
      // A mapper that answers success without an address has mapped
      // nothing usable: report it instead of handing out a null pointer
      // (and mapping again, unrecorded, at every later call).
      if (mapped.ok() && *mapped == nullptr) {
        mapped = Status(InternalErrorBuilder(ORVEX_LOC)
                        << "Mapping of FD: " << fd << " gave no address");
      }
      if (!mapped.ok()) {
        return StatusBuilder(mapped.status(), ORVEX_LOC) << "Error mapping: " << DebugStr();
      }
      base_addresses_[index] = *mapped;
      newly_mapped = true;
    }
    base = base_addresses_[index];
    if (IsCached()) {
      const bool whole = offset == 0 && size == GetSize();
      if (!whole && partial_cpu_cache_sync_handler_) {
        partial_cpu_cache_sync_handler_(this, true, static_cast<uint64_t>(offset), size, mode);
      } else {
        DoCpuSync(true, mode);
      }
    }
  }
  // The unmapping clean-up is registered only after the mapping mutex is
  // released: the destructor holds the clean-up mutex while that clean-up
  // takes the mapping mutex, so taking them here in the opposite order would
  // invert the lock order. The buffer cannot die in between: `self` holds it.
  if (newly_mapped) {
    AddCleanup([this, index](Buffer*) { UnmapMode(index); }, /*propagate=*/true);
  }
  return std::make_unique<MappedHandle>(static_cast<int32_t>(offset),
                                        static_cast<unsigned char*>(base) + offset, size, mode,
                                        std::move(self));
}

void HwBuffer::UnmapMode(int mode_index) const {
  std::lock_guard<std::mutex> lock(mapping_mutex_);
  void*& base = base_addresses_[mode_index];
  if (base == nullptr) return;
  // Nobody is left to receive an error here (the buffer is being destroyed),
  // so a failure is logged rather than lost.
  if (const int result = mapper_->Unmap(base, GetSize()); result != 0) {
    ORVEX_LOG(ERROR) << "Unmapping of FD: " << fd_ << " failed with code: " << result
                     << " errno: " << ErrnoText(errno);
  }
  base = nullptr;
}

StatusOr<std::unique_ptr<Buffer::MappedHandle>> HwBuffer::Map(int64_t offset, uint64_t size,
                                                              BufferAccessMode mode) {
  return MapImpl(offset, size, mode);
}

StatusOr<std::unique_ptr<const Buffer::MappedHandle>> HwBuffer::Map(int64_t offset, uint64_t size,
                                                                    BufferAccessMode mode) const {
  return MapImpl(offset, size, mode);
}

void HwBuffer::Unmap(int64_t offset, uint64_t size, BufferAccessMode mode) {
  if (offset < 0 || size > GetSize() || static_cast<uint64_t>(offset) > GetSize() - size) {
    ORVEX_LOG(FATAL) << "Check failed: offset + size <= GetSize() Invalid buffer unmap argument";
  }
  if (!IsCached()) return;
  const bool whole = offset == 0 && size == GetSize();
  if (!whole && partial_cpu_cache_sync_handler_) {
    partial_cpu_cache_sync_handler_(this, false, static_cast<uint64_t>(offset), size, mode);
  } else {
    DoCpuSync(false, mode);
  }
}

void HwBuffer::DoCpuSync(bool begin, BufferAccessMode mode) const {
  const uint64_t flags = SyncFlags(begin, mode);
  if (flags == 0) return;
  struct dma_buf_sync sync = {};
  sync.flags = flags;
  int result;
  do {
    result = ioctl(fd_, DMA_BUF_IOCTL_SYNC, &sync);
  } while (result < 0 && errno == EINTR);
  if (result < 0) {
    const int err = errno;
    ORVEX_LOG(ERROR) << "DMA_BUF_IOCTL_SYNC failed with code: " << result
                     << " errno: " << ErrnoText(err);
    errno = err;
  }
}

// ------------------------------------------------------- unmappable kinds

StatusOr<std::shared_ptr<CachePartition>> CachePartition::Make(int fd, uint32_t partition_id,
                                                               uint64_t size,
                                                               BufferAttributes attributes,
                                                               std::unique_ptr<Fence> fence) {
  return std::make_shared<CachePartition>(Sigil{}, fd, partition_id, size, attributes,
                                          std::move(fence));
}

CachePartition::CachePartition(Sigil, int fd, uint32_t partition_id, uint64_t size,
                               BufferAttributes attributes, std::unique_ptr<Fence> fence)
    : Buffer(attributes, size, std::move(fence)), fd_(fd), partition_id_(partition_id) {}

CachePartition::~CachePartition() { RunCleanups(); }

int CachePartition::GetFd() const { return fd_; }

StatusOr<std::unique_ptr<Buffer::MappedHandle>> CachePartition::Map(int64_t, uint64_t,
                                                                    BufferAccessMode) {
  return NotMappable("CachePartition are not mappable: ", *this);
}

StatusOr<std::unique_ptr<const Buffer::MappedHandle>> CachePartition::Map(int64_t, uint64_t,
                                                                          BufferAccessMode) const {
  return NotMappable("CachePartition are not mappable: ", *this);
}

std::string CachePartition::DebugStr() const {
  return BuildOrvexDebugStrWithStrings("CachePartition",
                                       {{"Size", std::to_string(GetSize())},
                                        {"FD", std::to_string(fd_)},
                                        {"PartitionId", std::to_string(partition_id_)},
                                        {"Attributes", AttributeStr()}});
}

void CachePartition::Unmap(int64_t, uint64_t, BufferAccessMode) {}

StatusOr<std::shared_ptr<SecureBuffer>> SecureBuffer::Make(int fd, uint64_t size,
                                                           BufferAttributes attributes,
                                                           std::unique_ptr<Fence> fence) {
  return std::make_shared<SecureBuffer>(Sigil{}, fd, size, attributes, std::move(fence));
}

SecureBuffer::SecureBuffer(Sigil, int fd, uint64_t size, BufferAttributes attributes,
                           std::unique_ptr<Fence> fence)
    : Buffer(attributes, size, std::move(fence)), fd_(fd) {}

SecureBuffer::~SecureBuffer() { RunCleanups(); }

int SecureBuffer::GetFd() const { return fd_; }

StatusOr<std::unique_ptr<Buffer::MappedHandle>> SecureBuffer::Map(int64_t, uint64_t,
                                                                  BufferAccessMode) {
  return NotMappable("SecureBuffers are not mappable: ", *this);
}

StatusOr<std::unique_ptr<const Buffer::MappedHandle>> SecureBuffer::Map(int64_t, uint64_t,
                                                                        BufferAccessMode) const {
  return NotMappable("SecureBuffers are not mappable: ", *this);
}

std::string SecureBuffer::DebugStr() const {
  return BuildOrvexDebugStrWithStrings("SecureBuffer", {{"Size", std::to_string(GetSize())},
                                                        {"FD", std::to_string(fd_)},
                                                        {"Attributes", AttributeStr()}});
}

void SecureBuffer::Unmap(int64_t, uint64_t, BufferAccessMode) {}

StatusOr<std::shared_ptr<VirtualBuffer>> VirtualBuffer::Make(uint64_t size,
                                                             BufferAttributes attributes,
                                                             std::unique_ptr<Fence> fence) {
  return std::make_shared<VirtualBuffer>(Sigil{}, size, attributes, std::move(fence));
}

VirtualBuffer::VirtualBuffer(Sigil, uint64_t size, BufferAttributes attributes,
                             std::unique_ptr<Fence> fence)
    : Buffer(attributes, size, std::move(fence)) {}

VirtualBuffer::~VirtualBuffer() { RunCleanups(); }

StatusOr<std::unique_ptr<Buffer::MappedHandle>> VirtualBuffer::Map(int64_t, uint64_t,
                                                                   BufferAccessMode) {
  return NotMappable("VirtualBuffers are not mappable: ", *this);
}

StatusOr<std::unique_ptr<const Buffer::MappedHandle>> VirtualBuffer::Map(int64_t, uint64_t,
                                                                         BufferAccessMode) const {
  return NotMappable("VirtualBuffers are not mappable: ", *this);
}

std::string VirtualBuffer::DebugStr() const {
  return BuildOrvexDebugStrWithStrings("VirtualBuffer", {{"Attributes", AttributeStr()}});
}

void VirtualBuffer::Unmap(int64_t, uint64_t, BufferAccessMode) {}

}  // namespace orvex
