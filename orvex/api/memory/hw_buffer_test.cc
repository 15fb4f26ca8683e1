#include <dlfcn.h>
#include <errno.h>
#include <fcntl.h>
#include <linux/dma-buf.h>
#include <stdarg.h>
#include <sys/mman.h>
#include <unistd.h>

#include <cstdint>
#include <cstring>
#include <deque>
#include <limits>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "fmt/format.h"
#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/memory/hw_buffer.h"
#include "orvex/status/status_matchers.h"
#include "platform/testing/reexec_death_test.h"

// DMA_BUF_IOCTL_SYNC requests are intercepted at the system-call boundary:
// this ioctl takes precedence over the C library's for the whole process, the
// library under test included. Sync requests are recorded and answered from a
// script of errnos (0 or an empty script: success); other requests go to the
// real ioctl.
namespace {

struct SyncRecord {
  std::mutex mutex;
  std::vector<std::pair<int, uint64_t>> calls;  // descriptor, flags
  std::deque<int> errnos;
};

SyncRecord& Syncs() {
  static auto* record = new SyncRecord();
  return *record;
}

}  // namespace

extern "C" int ioctl(int fd, unsigned long request, ...) __THROW {
  va_list args;
  va_start(args, request);
  void* arg = va_arg(args, void*);
  va_end(args);
  if (request == DMA_BUF_IOCTL_SYNC) {
    std::lock_guard<std::mutex> lock(Syncs().mutex);
    Syncs().calls.emplace_back(fd, static_cast<const dma_buf_sync*>(arg)->flags);
    if (Syncs().errnos.empty()) return 0;
    const int err = Syncs().errnos.front();
    Syncs().errnos.pop_front();
    if (err == 0) return 0;  // errno stays as it was, like a real call's
    errno = err;
    return -1;
  }
  using IoctlFn = int (*)(int, unsigned long, ...);
  static const auto real_ioctl = reinterpret_cast<IoctlFn>(dlsym(RTLD_NEXT, "ioctl"));
  return real_ioctl(fd, request, arg);
}

namespace orvex {
namespace {

using ::orvex::testing::IsOk;
using ::orvex::testing::StatusIs;
using ::testing::_;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using Flags = std::vector<uint64_t>;

constexpr BufferAttributes kCachedDma{BufferTransport::kDma, BufferAccess::kCpu,
                                      BufferSecurity::kNone, BufferCached::kCached,
                                      BufferCompression::kNone};
constexpr uint64_t kSize = 4096;
constexpr auto kRead = BufferAccessMode::kRead;
constexpr auto kWrite = BufferAccessMode::kWrite;
constexpr auto kReadWrite = BufferAccessMode::kReadWrite;

// Real mmap that records "map <mode>" and "unmap <mode> <size>", gives
// `answer` instead of mapping when it is set, and reports the next unmapping (made
// for real) as failed with `unmap_errno` when that is set.
class RecordingMapper : public MmapWrapper {
 public:
  StatusOr<void*> MapFileDescriptor(int fd, uint64_t size, int64_t offset,
                                    BufferAccessMode mode) const override {
    std::lock_guard<std::mutex> lock(mutex_);
    events_.push_back(fmt::format("map {}", AccessModeToString(mode)));
    StatusOr<void*> address = answer ? *std::exchange(answer, std::nullopt)
                                     : MmapWrapper::MapFileDescriptor(fd, size, offset, mode);
    if (address.ok()) modes_[*address] = AccessModeToString(mode);
    return address;
  }
  int Unmap(void* address, uint64_t size) const override {
    std::lock_guard<std::mutex> lock(mutex_);
    events_.push_back(fmt::format("unmap {} {}", modes_[address], size));
    const int result = MmapWrapper::Unmap(address, size);
    if (const int err = std::exchange(unmap_errno, 0); err != 0) {
      errno = err;
      return -1;
    }
    return result;
  }
  std::vector<std::string> events() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return events_;
  }

  mutable std::optional<StatusOr<void*>> answer;
  mutable int unmap_errno = 0;

 private:
  mutable std::mutex mutex_;
  mutable std::vector<std::string> events_;
  mutable std::map<void*, std::string_view> modes_;
};

// Installs a RecordingMapper over a 4 KiB memfd (real shared memory behind a
// descriptor); restores the process-wide state afterwards.
class HwBufferTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_EQ(ftruncate(fd_, kSize), 0);
    saved_mapper_ = std::exchange(HwBuffer::mapper_, std::make_unique<RecordingMapper>());
    mapper_ = static_cast<RecordingMapper*>(HwBuffer::mapper_.get());
    TakeSyncs(-1);
  }
  void TearDown() override {
    HwBuffer::mapper_ = std::move(saved_mapper_);
    HwBuffer::partial_cpu_cache_sync_handler_ = nullptr;
    Syncs().errnos.clear();
    close(fd_);
  }

  std::shared_ptr<HwBuffer> Make(int fd, uint64_t size = kSize,
                                 BufferAttributes attributes = kCachedDma) {
    return HwBuffer::Make(fd, size, attributes, nullptr).value();
  }
  // The flags of the sync requests since the last call, each checked to be
  // made on `fd` (-1: not checked).
  static Flags TakeSyncs(int fd) {
    std::lock_guard<std::mutex> lock(Syncs().mutex);
    Flags flags;
    for (const auto& [call_fd, call_flags] : Syncs().calls) {
      EXPECT_TRUE(fd < 0 || call_fd == fd) << call_fd;
      flags.push_back(call_flags);
    }
    Syncs().calls.clear();
    return flags;
  }

  const int fd_ = memfd_create("hw_buffer_test", MFD_CLOEXEC);
  RecordingMapper* mapper_ = nullptr;
  std::unique_ptr<MemoryMapper> saved_mapper_;
};

TEST_F(HwBufferTest, MapsOncePerModeAndUnmapsWhenTheBufferDies) {
  auto buffer = Make(fd_);
  std::weak_ptr<HwBuffer> weak = buffer;
  {
    auto writer = buffer->Map(100, 16, kWrite);
    ASSERT_THAT(writer, IsOk());
    std::memcpy((*writer)->data(), "camera frame 01", 16);
  }
  auto first = buffer->Map(0, kSize, kRead);
  auto second = static_cast<const HwBuffer&>(*buffer).Map(96, 20, kRead);
  ASSERT_THAT(first, IsOk());
  ASSERT_THAT(second, IsOk());
  EXPECT_STREQ(static_cast<const char*>((*first)->data()) + 100, "camera frame 01");
  EXPECT_STREQ(static_cast<const char*>((*second)->data()) + 4, "camera frame 01");
  EXPECT_EQ((*second)->offset(), 96);
  EXPECT_THAT(mapper_->events(), ElementsAre("map Write", "map Read"));

  buffer.reset();
  first->reset();
  EXPECT_FALSE(weak.expired()) << "a handle must keep its buffer alive";
  second->reset();
  EXPECT_TRUE(weak.expired());
  // Clean-ups run most recent first: the read mapping goes before the write.
  EXPECT_THAT(mapper_->events(), ElementsAre(_, _, "unmap Read 4096", "unmap Write 4096"));
}

// The range checks every mappable buffer shares (Buffer::CheckMapRange), made
// before anything is mapped.
TEST_F(HwBufferTest, RangesAndModesAreCheckedBeforeMapping) {
  auto buffer = Make(fd_);
  auto huge = Make(fd_, uint64_t{1} << 33);
  struct Case {
    HwBuffer* buffer;
    int64_t offset;
    uint64_t size;
    StatusCode code;
    std::string message;
  };
  const Case cases[] = {
      {buffer.get(), 4096, 0, StatusCode::kOk, ""},
      {buffer.get(), 4000, 100, StatusCode::kOutOfRange,
       "Offset: 4000 and size: 100 is out of range for the buffer size: 4096"},
      {buffer.get(), -1, 1u << 20, StatusCode::kInvalidArgument, "Invalid negative offset: -1"},
      // The sum wraps in 64 bits.
      {buffer.get(), 8, std::numeric_limits<uint64_t>::max() - 4, StatusCode::kOutOfRange,
       "Offset: 8 and size: 18446744073709551611 is out of range for the buffer size: 4096"},
      {huge.get(), int64_t{1} << 31, 16, StatusCode::kOutOfRange,
       "Offset: 2147483648 does not fit the 32-bit offset of a mapping handle"},
      {huge.get(), (int64_t{1} << 31) - 1, 16, StatusCode::kOk, ""},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(::testing::Message() << c.offset << "+" << c.size);
    EXPECT_THAT(c.buffer->Map(c.offset, c.size, kRead), StatusIs(c.code, c.message));
  }
  EXPECT_THAT(buffer->Map(0, 1, static_cast<BufferAccessMode>(3)),
              StatusIs(StatusCode::kInvalidArgument, "Invalid access mode: 3"));
  EXPECT_EQ(mapper_->events().size(), 2u) << "only the accepted ranges map";
}

// A failed mapping leaves its mode unmapped, with nothing registered or
// synchronised; the next mapping in that mode maps for real.
TEST_F(HwBufferTest, MappingFailuresLeaveNoStateBehind) {
  int pipe_fds[2];
  ASSERT_EQ(pipe(pipe_fds), 0);
  const int read_only = open(fmt::format("/proc/self/fd/{}", fd_).c_str(), O_RDONLY);
  auto buffer = Make(fd_), no_fd = Make(-1), pipe_buffer = Make(pipe_fds[0]);
  auto read_only_buffer = Make(read_only);
  const std::string annotation = "; Error mapping: " + buffer->DebugStr();
  struct Case {
    HwBuffer* buffer;
    std::optional<StatusOr<void*>> mapper_answer;  // none: mmap
    BufferAccessMode mode;
    StatusCode code;
    std::string message;
  };
  const Case cases[] = {
      {no_fd.get(), std::nullopt, kRead, StatusCode::kInternal, "Invalid FD: -1"},
      {pipe_buffer.get(), std::nullopt, kRead, StatusCode::kInternal,
       fmt::format("Mapping of FD: {0} failed, mmap error: (No such device), offset: 0, size: "
                   "4096; Error mapping: {{type: Buffer, Size: 4096, FD: {0}, Attributes: "
                   "Transport: DMA, Access: CPU, Security: None, Compression: None}}",
                   pipe_fds[0])},
      // Write access maps PROT_WRITE only, read access PROT_READ only.
      {read_only_buffer.get(), std::nullopt, kWrite, StatusCode::kInternal,
       fmt::format("Mapping of FD: {} failed, mmap error: (Permission denied)", read_only)},
      {read_only_buffer.get(), std::nullopt, kRead, StatusCode::kOk, ""},
      {buffer.get(), StatusOr<void*>(ResourceExhaustedError("no address space")), kRead,
       StatusCode::kResourceExhausted, "no address space" + annotation},
      {buffer.get(), StatusOr<void*>(nullptr), kRead, StatusCode::kInternal,
       fmt::format("Mapping of FD: {} gave no address", fd_) + annotation},
      {buffer.get(), std::nullopt, kRead, StatusCode::kOk, ""},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.message);
    mapper_->answer = c.mapper_answer;
    EXPECT_THAT(c.buffer->Map(0, kSize, c.mode), StatusIs(c.code, HasSubstr(c.message)));
    EXPECT_EQ(TakeSyncs(-1).size(), c.code == StatusCode::kOk ? 1u : 0u);
  }
  EXPECT_EQ(buffer.use_count(), 1) << "a failed mapping keeps a share of the buffer";

  // A failed unmapping at destruction has no caller to go to: it is logged,
  // and errno still tells the failure.
  mapper_->unmap_errno = EINVAL;
  ::testing::internal::CaptureStderr();
  buffer.reset();
  EXPECT_EQ(errno, EINVAL);
  EXPECT_THAT(::testing::internal::GetCapturedStderr(),
              HasSubstr(fmt::format("] Unmapping of FD: {} failed with code: -1 errno: Invalid "
                                    "argument\n",
                                    fd_)));
  read_only_buffer.reset();
  EXPECT_THAT(mapper_->events(),
              ElementsAre("map Read", "map Write", "map Read", "map Read", "map Read", "map Read",
                          "unmap Read 4096", "unmap Read 4096"));
  for (int fd : {pipe_fds[0], pipe_fds[1], read_only}) close(fd);
}

// Caches are invalidated before the CPU reads and flushed after it writes,
// for cached CPU-accessed DMA memory only (security and compression do not
// matter).
TEST_F(HwBufferTest, CacheMaintenanceBracketsEachAccess) {
  BufferAttributes secure_afbc = kCachedDma, uncached = kCachedDma, gpu = kCachedDma,
                   heap = kCachedDma;
  secure_afbc.security = BufferSecurity::kSecure;
  secure_afbc.compression = BufferCompression::kAfbc;
  uncached.cached = BufferCached::kUnCached;
  gpu.access = BufferAccess::kGpu;
  heap.transport = BufferTransport::kHeap;
  struct Case {
    BufferAttributes attributes;
    BufferAccessMode mode;
    uint64_t at_map;  // dma_buf_sync flags, 0: none
    uint64_t at_release;
  };
  const Case cases[] = {
      {kCachedDma, kRead, DMA_BUF_SYNC_READ | DMA_BUF_SYNC_START, 0},
      {kCachedDma, kWrite, 0, DMA_BUF_SYNC_WRITE | DMA_BUF_SYNC_END},
      {kCachedDma, kReadWrite, DMA_BUF_SYNC_RW | DMA_BUF_SYNC_START,
       DMA_BUF_SYNC_RW | DMA_BUF_SYNC_END},
      {secure_afbc, kReadWrite, 3, 7},
      {uncached, kReadWrite, 0, 0},
      {gpu, kReadWrite, 0, 0},
      {heap, kReadWrite, 0, 0},
  };
  auto flags = [](uint64_t f) { return f == 0 ? Flags{} : Flags{f}; };
  for (const Case& c : cases) {
    SCOPED_TRACE(BufferAttributesToString(c.attributes) + " " +
                 std::string(AccessModeToString(c.mode)));
    auto buffer = Make(fd_, kSize, c.attributes);
    EXPECT_EQ(buffer->IsCached(), c.at_map + c.at_release != 0);
    // The first maps, the second reuses the mapping; without a handler a
    // partial range synchronises the whole buffer.
    for (auto [offset, size] : {std::pair<int64_t, uint64_t>{0, kSize}, {0, kSize}, {8, 8}}) {
      auto handle = buffer->Map(offset, size, c.mode);
      ASSERT_THAT(handle, IsOk());
      EXPECT_EQ(TakeSyncs(fd_), flags(c.at_map));
      handle->reset();
      EXPECT_EQ(TakeSyncs(fd_), flags(c.at_release));
    }
  }
}

TEST_F(HwBufferTest, PartialMappingsUseTheHandler) {
  auto buffer = Make(fd_);
  std::vector<std::string> handled;
  HwBuffer::partial_cpu_cache_sync_handler_ = [&](const Buffer* b, bool begin, uint64_t offset,
                                                  uint64_t size, BufferAccessMode mode) {
    EXPECT_EQ(b, buffer.get());
    handled.push_back(fmt::format("{} {} {} {}", begin ? "begin" : "end", offset, size,
                                  AccessModeToString(mode)));
  };
  {
    auto middle = buffer->Map(100, 200, kRead);
    auto head = buffer->Map(0, 200, kWrite);
    ASSERT_THAT(middle, IsOk());
    ASSERT_THAT(head, IsOk());
    EXPECT_THAT(handled, ElementsAre("begin 100 200 Read", "begin 0 200 Write"));
  }
  EXPECT_THAT(handled, ElementsAre(_, _, "end 0 200 Write", "end 100 200 Read"));
  EXPECT_THAT(TakeSyncs(fd_), IsEmpty());
  // A whole-buffer mapping ignores the handler.
  handled.clear();
  { ASSERT_THAT(buffer->Map(0, kSize, kReadWrite), IsOk()); }
  EXPECT_THAT(handled, IsEmpty());
  EXPECT_THAT(TakeSyncs(fd_), ElementsAre(3, 7));
}

// EINTR is retried; other failures are logged with errno kept.
TEST_F(HwBufferTest, SyncFailuresAreLoggedNotReported) {
  auto buffer = Make(fd_);
  Syncs().errnos = {EINTR, EINTR, 0, EPERM};  // the success ends the retries
  ::testing::internal::CaptureStderr();
  buffer->DoCpuSync(true, kRead);
  EXPECT_THAT(::testing::internal::GetCapturedStderr(), IsEmpty());
  EXPECT_THAT(TakeSyncs(fd_), ElementsAre(1, 1, 1));

  Syncs().errnos = {EINTR, EIO};
  ::testing::internal::CaptureStderr();
  errno = 0;
  buffer->DoCpuSync(false, kWrite);
  EXPECT_EQ(errno, EIO);
  EXPECT_THAT(::testing::internal::GetCapturedStderr(),
              ::testing::MatchesRegex("[^ ]+ E .*\\] DMA_BUF_IOCTL_SYNC failed with code: -1 errno: "
                                      "Input/output error\n"));
  EXPECT_THAT(TakeSyncs(fd_), ElementsAre(6, 6));
}

TEST_F(HwBufferTest, DebugTextsAndUnmappableKinds) {
  const BufferAttributes attributes{BufferTransport::kOpaque, BufferAccess::kGpu,
                                    BufferSecurity::kSecure, BufferCached::kUnCached,
                                    BufferCompression::kJpeg};
  const std::string attribute_text =
      "Attributes: Transport: Opaque, Access: GPU, Security: Secure, Compression: JPEG}";
  struct Case {
    std::shared_ptr<Buffer> buffer;
    int fd;
    std::string text;
    std::string refusal;  // empty: mappable
  };
  const Case cases[] = {
      {Make(-1, 64, attributes), -1, "{type: Buffer, Size: 64, FD: -1, " + attribute_text, ""},
      {CachePartition::Make(11, 3, 128, attributes, nullptr).value(), 11,
       "{type: CachePartition, Size: 128, FD: 11, PartitionId: 3, " + attribute_text,
       "CachePartition are not mappable: "},
      {SecureBuffer::Make(12, 256, attributes, nullptr).value(), 12,
       "{type: SecureBuffer, Size: 256, FD: 12, " + attribute_text,
       "SecureBuffers are not mappable: "},
      {VirtualBuffer::Make(512, attributes, nullptr).value(), -1,
       "{type: VirtualBuffer, " + attribute_text, "VirtualBuffers are not mappable: "},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.text);
    EXPECT_EQ(c.buffer->GetFd(), c.fd);
    EXPECT_EQ(c.buffer->DebugStr(), c.text);
    if (c.refusal.empty()) continue;
    EXPECT_THAT(c.buffer->Map(0, 1, kRead),
                StatusIs(StatusCode::kUnimplemented, c.refusal + c.text));
    EXPECT_THAT(static_cast<const Buffer&>(*c.buffer).Map(0, 1, kWrite),
                StatusIs(StatusCode::kUnimplemented, c.refusal + c.text));
  }
  EXPECT_EQ(CachePartition::Make(1, 3, 8, {}, nullptr).value()->GetPartitionId(), 3u);
  EXPECT_THAT(mapper_->events(), IsEmpty());
}

TEST(MmapWrapperTest, AlignOffsetTruncatesToPages) {
  const int64_t page = SystemPageSize();
  EXPECT_EQ(page, sysconf(_SC_PAGESIZE));
  const std::pair<int64_t, int64_t> cases[] = {
      {0, 0}, {page - 1, 0}, {page, page}, {3 * page + 5, 3 * page}, {-1, 0}, {-page - 1, -page},
  };
  for (const auto& [offset, aligned] : cases) {
    SCOPED_TRACE(offset);
    EXPECT_EQ(MmapWrapper().AlignOffset(offset), aligned);
  }
}

TEST_F(HwBufferTest, ConcurrentMappingOfOneBuffer) {
  constexpr int kThreads = 4;
  constexpr int kIterations = 300;
  constexpr uint64_t kStripe = kSize / kThreads;
  auto buffer = Make(fd_);
  std::vector<std::unique_ptr<Buffer::MappedHandle>> last(kThreads);
  std::vector<std::thread> threads;
  for (int t = 0; t < kThreads; ++t) {
    threads.emplace_back([&, t] {
      for (int i = 0; i < kIterations; ++i) {
        const auto mode = static_cast<BufferAccessMode>((t + i) % 3);
        auto handle = buffer->Map(static_cast<int64_t>(t * kStripe), kStripe, mode);
        ASSERT_THAT(handle, IsOk());
        auto* bytes = static_cast<volatile unsigned char*>((*handle)->data());
        if (mode != kRead) bytes[0] = static_cast<unsigned char>(t);
        if (mode != kWrite) (void)bytes[0];
        last[t] = std::move(*handle);
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(mapper_->events().size(), 3u) << "one mapping per access mode";

  // The buffer dies on whichever thread releases the last handle.
  buffer.reset();
  threads.clear();
  for (int t = 0; t < kThreads; ++t) threads.emplace_back([&last, t] { last[t].reset(); });
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(mapper_->events().size(), 6u);
  unsigned char stripe_start[kThreads] = {};
  for (int t = 0; t < kThreads; ++t) {
    ASSERT_EQ(pread(fd_, &stripe_start[t], 1, static_cast<off_t>(t * kStripe)), 1);
  }
  EXPECT_THAT(stripe_start, ElementsAre(0, 1, 2, 3));
}

TEST_F(HwBufferTest, UnmapBeyondTheBufferIsFatal) {
  orvex_testing::UseReexecDeathTests();
  auto buffer = Make(3);
  for (auto [offset, size] : {std::pair<int32_t, uint64_t>{4000, 200}, {-8, 8}, {0, kSize + 1}}) {
    SCOPED_TRACE(offset);
    EXPECT_DEATH({ Buffer::MappedHandle(offset, nullptr, size, kRead, buffer); },
                 "\\] Check failed: offset \\+ size <= GetSize\\(\\) Invalid buffer unmap "
                 "argument\n");
  }
}

}  // namespace
}  // namespace orvex
