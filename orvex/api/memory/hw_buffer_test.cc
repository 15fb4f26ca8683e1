#include <dlfcn.h>
#include <errno.h>
#include <fcntl.h>
#include <linux/dma-buf.h>
#include <stdarg.h>
#include <sys/ioctl.h>
#include <sys/mman.h>
#include <unistd.h>

#include <cstdint>
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

// Overrides the C library's ioctl in the whole process: DMA_BUF_IOCTL_SYNC requests are
// recorded and fail with the next errno scripted (0 or none: success).
static std::mutex sync_mutex;
static std::vector<std::pair<int, uint64_t>> sync_calls;  // descriptor, flags
static std::vector<int> sync_errnos;

extern "C" int ioctl(int fd, unsigned long request, ...) __THROW {
  va_list args;
  va_start(args, request);
  void* arg = va_arg(args, void*);
  va_end(args);
  if (request != DMA_BUF_IOCTL_SYNC) {
    using IoctlFn = int (*)(int, unsigned long, ...);
    static const auto real_ioctl = reinterpret_cast<IoctlFn>(dlsym(RTLD_NEXT, "ioctl"));
    return real_ioctl(fd, request, arg);
  }
  std::lock_guard<std::mutex> lock(sync_mutex);
  sync_calls.emplace_back(fd, static_cast<const dma_buf_sync*>(arg)->flags);
  if (sync_errnos.empty()) return 0;
  const int err = sync_errnos.front();
  sync_errnos.erase(sync_errnos.begin());
  if (err != 0) errno = err;  // a success leaves errno as it was, like a real call
  return err == 0 ? 0 : -1;
}

namespace orvex {
namespace {

using ::orvex::testing::IsOk;
using ::orvex::testing::StatusIs;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::internal::CaptureStderr;
using ::testing::internal::GetCapturedStderr;
using enum BufferAccessMode;
using enum StatusCode;
using Flags = std::vector<uint64_t>;

constexpr BufferAttributes kCachedDma{BufferTransport::kDma, BufferAccess::kCpu};
constexpr uint64_t kSize = 4096;

// Real mmap recording "map <mode>" and "unmap <mode> <size>"; answers `answer`
// instead when set, and fails the next unmapping (leaking it) with `unmap_errno`.
class RecordingMapper : public MmapWrapper {
 public:
  StatusOr<void*> MapFileDescriptor(int fd, uint64_t size, int64_t offset,
                                    BufferAccessMode mode) const override {
    events.push_back(fmt::format("map {}", AccessModeToString(mode)));
    StatusOr<void*> address = answer ? *std::exchange(answer, std::nullopt)
                                     : MmapWrapper::MapFileDescriptor(fd, size, offset, mode);
    if (address.ok()) modes[*address] = AccessModeToString(mode);
    return address;
  }
  int Unmap(void* address, uint64_t size) const override {
    events.push_back(fmt::format("unmap {} {}", modes[address], size));
    if (unmap_errno == 0) return MmapWrapper::Unmap(address, size);
    errno = std::exchange(unmap_errno, 0);
    return -1;
  }

  mutable std::vector<std::string> events;
  mutable std::optional<StatusOr<void*>> answer;
  mutable int unmap_errno = 0;
  mutable std::map<void*, std::string_view> modes;  // of each mapped address
};

// A RecordingMapper over a 4 KiB memfd; the process-wide state is restored.
class HwBufferTest : public ::testing::Test {
 protected:
  void SetUp() override { ASSERT_EQ(ftruncate(fd_, kSize), 0); }
  void TearDown() override {
    HwBuffer::mapper_ = std::move(saved_mapper_);
    HwBuffer::partial_cpu_cache_sync_handler_ = nullptr;
    sync_calls.clear();
    close(fd_);
  }

  std::shared_ptr<HwBuffer> Make(int fd, uint64_t size = kSize,
                                 BufferAttributes attributes = kCachedDma) {
    return HwBuffer::Make(fd, size, attributes, nullptr).value();
  }
  // The sync flags requested since the last call, each checked to name fd_.
  Flags TakeSyncs() {
    Flags flags;
    for (auto [fd, call_flags] : std::exchange(sync_calls, {})) {
      EXPECT_EQ(fd, fd_);
      flags.push_back(call_flags);
    }
    return flags;
  }

  const int fd_ = memfd_create("hw_buffer_test", MFD_CLOEXEC);
  RecordingMapper* const mapper_ = new RecordingMapper();  // owned by HwBuffer::mapper_
  std::unique_ptr<MemoryMapper> saved_mapper_ =
      std::exchange(HwBuffer::mapper_, std::unique_ptr<MemoryMapper>(mapper_));
};

// Refusals map, register and sync nothing; a failed unmapping is logged, errno kept.
TEST_F(HwBufferTest, MappingFailuresLeaveNoStateBehind) {
  int pipe_fds[2];
  ASSERT_EQ(pipe(pipe_fds), 0);
  const int read_only = open(fmt::format("/proc/self/fd/{}", fd_).c_str(), O_RDONLY);
  auto buffer = Make(fd_), no_fd = Make(-1), piped = Make(pipe_fds[0]), ro = Make(read_only);
  auto huge = Make(fd_, uint64_t{1} << 33), zero_fd = Make(0);
  const int64_t k2Gi = int64_t{1} << 31;
  // clang-format off
  struct Case { HwBuffer* buffer; int64_t offset; uint64_t size; BufferAccessMode mode;
                std::optional<StatusOr<void*>> answer; StatusCode code; std::string message; };
  const Case cases[] = {
      {buffer.get(), 4000, 100, kRead, {}, kOutOfRange,
       "Offset: 4000 and size: 100 is out of range for the buffer size: 4096"},
      {buffer.get(), -1, 1u << 20, kRead, {}, kInvalidArgument, "Invalid negative offset: -1"},
      {buffer.get(), 8, ~uint64_t{0} - 4, kRead, {}, kOutOfRange, "size: 18446744073709551611 is"},
      {huge.get(), k2Gi, 16, kRead, {}, kOutOfRange, "Offset: 2147483648 does not fit the 32-bit"},
      {huge.get(), 0, 1, BufferAccessMode{3}, {}, kInvalidArgument, "Invalid access mode: 3"},
      {huge.get(), k2Gi - 1, 16, kRead, {}, kOk, ""},
      {no_fd.get(), 0, kSize, kRead, {}, kInternal, "Invalid FD: -1"},
      {piped.get(), 0, kSize, kRead, {}, kInternal,
       fmt::format("Mapping of FD: {0} failed, mmap error: (No such device), offset: 0, size: "
                   "4096; Error mapping: {{type: Buffer, Size: 4096, FD: {0}, ", pipe_fds[0])},
      // Write access maps PROT_WRITE only, read access PROT_READ only.
      {ro.get(), 0, kSize, kWrite, {}, kInternal, "failed, mmap error: (Permission denied)"},
      {ro.get(), 0, kSize, kRead, {}, kOk, ""},
      {ro.get(), 4096, 0, kRead, {}, kOk, ""},  // an empty range at the end, the mapping reused
      {zero_fd.get(), 0, kSize, kRead, ResourceExhaustedError("no space"), kResourceExhausted,
       "no space; Error mapping: {type: Buffer, Size: 4096, FD: 0, "},
      {buffer.get(), 0, kSize, kRead, nullptr, kInternal,
       fmt::format("Mapping of FD: {} gave no address; Error mapping: {{type: Buffer", fd_)},
      {buffer.get(), 0, kSize, kRead, {}, kOk, ""},
  };
  // clang-format on
  for (const Case& c : cases) {
    SCOPED_TRACE(c.message);
    mapper_->answer = c.answer;
    EXPECT_THAT(c.buffer->Map(c.offset, c.size, c.mode), StatusIs(c.code, HasSubstr(c.message)));
    EXPECT_EQ(std::exchange(sync_calls, {}).size(), c.code == kOk ? 1u : 0u);
  }
  mapper_->unmap_errno = EINVAL;
  CaptureStderr();
  buffer.reset();
  EXPECT_EQ(errno, EINVAL);
  EXPECT_THAT(GetCapturedStderr(), HasSubstr("] Unmapping of FD: " + std::to_string(fd_) +
                                             " failed with code: -1 errno: Invalid argument\n"));
  ro.reset();
  EXPECT_THAT(mapper_->events,
              ElementsAre("map Read", "map Read", "map Write", "map Read", "map Read", "map Read",
                          "map Read", "unmap Read 4096", "unmap Read 4096"));
  for (int fd : {pipe_fds[0], pipe_fds[1], read_only}) close(fd);
}

// Invalidate before reads, flush after writes: cached CPU DMA memory only, whatever its security.
TEST_F(HwBufferTest, CacheMaintenanceBracketsEachAccess) {
  // clang-format off
  struct Case { BufferAttributes attributes; BufferAccessMode mode; Flags at_map, at_release; };
  const Case cases[] = {  // dma_buf_sync flags: READ|START, WRITE|END, RW|START, RW|END
      {kCachedDma, kRead, {1}, {}},
      {kCachedDma, kWrite, {}, {6}},
      {kCachedDma, kReadWrite, {3}, {7}},
      {{BufferTransport::kDma, BufferAccess::kCpu, BufferSecurity::kSecure}, kReadWrite, {3}, {7}},
      {{BufferTransport::kDma, BufferAccess::kCpu, {}, BufferCached::kUnCached}, kReadWrite,
       {}, {}},
      {{BufferTransport::kDma, BufferAccess::kGpu}, kReadWrite, {}, {}},
      {{BufferTransport::kHeap, BufferAccess::kCpu}, kReadWrite, {}, {}},
  };
  // clang-format on
  for (const Case& c : cases) {
    SCOPED_TRACE(::testing::Message() << "row " << &c - cases);
    auto buffer = Make(fd_, kSize, c.attributes);
    // Mapped, reused, then partial: without a handler the whole buffer syncs.
    for (auto [offset, size] : {std::pair<int64_t, uint64_t>{0, kSize}, {0, kSize}, {8, 8}}) {
      auto handle = buffer->Map(offset, size, c.mode);
      ASSERT_THAT(handle, IsOk());
      EXPECT_EQ(TakeSyncs(), c.at_map);
      handle->reset();
      EXPECT_EQ(TakeSyncs(), c.at_release);
    }
  }
}

TEST_F(HwBufferTest, PartialMappingsUseTheHandler) {
  auto buffer = Make(fd_);
  std::vector<std::string> handled;
  HwBuffer::partial_cpu_cache_sync_handler_ = [&](const Buffer* b, bool begin, uint64_t offset,
                                                  uint64_t size, BufferAccessMode mode) {
    handled.push_back(fmt::format("{} {} {} {} {}", b == buffer.get(), begin, offset, size,
                                  AccessModeToString(mode)));
  };
  const std::pair<int64_t, uint64_t> ranges[] = {{100, 200}, {0, 200}, {0, kSize}};
  for (int i = 0; i < 3; ++i) {  // read, write, read-write; each released at once
    EXPECT_THAT(buffer->Map(ranges[i].first, ranges[i].second, BufferAccessMode{i}), IsOk());
  }
  EXPECT_THAT(handled, ElementsAre("true true 100 200 Read", "true false 100 200 Read",
                                   "true true 0 200 Write", "true false 0 200 Write"));
  EXPECT_THAT(TakeSyncs(), ElementsAre(3, 7));
}

TEST_F(HwBufferTest, SyncFailuresAreLoggedNotReported) {
  auto buffer = Make(fd_);
  sync_errnos = {EINTR, EINTR, 0, EPERM};  // the success ends the retries
  CaptureStderr();
  buffer->DoCpuSync(true, kRead);
  EXPECT_THAT(GetCapturedStderr(), IsEmpty());
  EXPECT_THAT(TakeSyncs(), ElementsAre(1, 1, 1));
  sync_errnos = {EINTR, EIO};
  CaptureStderr();
  buffer->DoCpuSync(false, kWrite);
  EXPECT_EQ(errno, EIO);
  EXPECT_THAT(GetCapturedStderr(),
              ::testing::MatchesRegex("[^ ]+ E .*\\] DMA_BUF_IOCTL_SYNC failed "
                                      "with code: -1 errno: Input/output error\n"));
  EXPECT_THAT(TakeSyncs(), ElementsAre(6, 6));
}

TEST_F(HwBufferTest, UnmappableKinds) {
  // clang-format off
  struct Case { std::shared_ptr<Buffer> buffer; int fd; std::string refusal, text; };
  const Case cases[] = {
      {CachePartition::Make(11, 3, 128, {}, nullptr).value(), 11,
       "CachePartition are not mappable: ",
       "{type: CachePartition, Size: 128, FD: 11, PartitionId: 3, "},
      {SecureBuffer::Make(12, 256, {}, nullptr).value(), 12,
       "SecureBuffers are not mappable: ", "{type: SecureBuffer, Size: 256, FD: 12, "},
      {VirtualBuffer::Make(512, {}, nullptr).value(), -1,
       "VirtualBuffers are not mappable: ", "{type: VirtualBuffer, "},
  };
  // clang-format on
  for (const Case& c : cases) {
    const std::string text =
        c.text + "Attributes: Transport: None, Access: None, Security: None, Compression: None}";
    SCOPED_TRACE(text);
    EXPECT_EQ(c.buffer->GetFd(), c.fd);
    EXPECT_EQ(c.buffer->DebugStr(), text);
    EXPECT_THAT(c.buffer->Map(0, 1, kRead), StatusIs(kUnimplemented, c.refusal + text));
    EXPECT_THAT(static_cast<const Buffer&>(*c.buffer).Map(0, 1, kWrite),
                StatusIs(kUnimplemented, c.refusal + text));
  }
  EXPECT_EQ(CachePartition::Make(1, 3, 8, {}, nullptr).value()->GetPartitionId(), 3u);
}

TEST(MmapWrapperTest, AlignOffsetTruncatesToPages) {
  const int64_t page = SystemPageSize();
  for (const auto& [offset, aligned] :
       {std::pair<int64_t, int64_t>{page - 1, 0}, {3 * page + 5, 3 * page}, {-page - 1, -page}}) {
    EXPECT_EQ(MmapWrapper().AlignOffset(offset), aligned) << offset;
  }
}

// Threads map their stripes in every mode; the buffer dies with the last handle released.
TEST_F(HwBufferTest, ConcurrentMappingOfOneBuffer) {
  constexpr int kThreads = 4;
  constexpr uint64_t kStripe = kSize / kThreads;
  auto buffer = Make(fd_);
  const HwBuffer& shared = *buffer;
  std::vector<std::unique_ptr<const Buffer::MappedHandle>> last(kThreads);
  std::vector<std::thread> threads;
  for (int t = 0; t < kThreads; ++t) {
    threads.emplace_back([&, t] {
      for (int i = 0; i < 300; ++i) {
        const auto mode = static_cast<BufferAccessMode>((t + i) % 3);
        auto handle = shared.Map(t * kStripe, kStripe, mode);
        ASSERT_THAT(handle, IsOk());
        if (mode != kRead) *static_cast<unsigned char*>((*handle)->data()) = t;
        last[t] = std::move(*handle);
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
  buffer.reset();
  EXPECT_EQ(mapper_->events.size(), 3u) << "one mapping per mode, kept while handles live";
  threads.clear();
  for (int t = 0; t < kThreads; ++t) threads.emplace_back([&last, t] { last[t].reset(); });
  for (std::thread& thread : threads) thread.join();
  EXPECT_THAT(mapper_->events, ::testing::IsSupersetOf({"unmap Read 4096", "unmap Write 4096",
                                                        "unmap ReadWrite 4096"}));
  std::vector<unsigned char> bytes(kSize);
  ASSERT_EQ(pread(fd_, bytes.data(), kSize, 0), static_cast<ssize_t>(kSize));
  for (int t = 0; t < kThreads; ++t) EXPECT_EQ(bytes[t * kStripe], t);
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
