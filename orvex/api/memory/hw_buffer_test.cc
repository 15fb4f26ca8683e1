#include "orvex/api/memory/hw_buffer.h"

#include <dlfcn.h>
#include <errno.h>
#include <fcntl.h>
#include <linux/dma-buf.h>
#include <linux/dma-heap.h>
#include <linux/udmabuf.h>
#include <stdarg.h>
#include <sys/ioctl.h>
#include <sys/mman.h>
#include <unistd.h>

#include <atomic>
#include <cstdint>
#include <cstring>
#include <deque>
#include <limits>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "fmt/format.h"
#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/status/status_matchers.h"
#include "platform/testing/reexec_death_test.h"

// ---------------------------------------------------------------------------
// DMA_BUF_IOCTL_SYNC requests are intercepted at the system-call boundary:
// this definition of ioctl takes precedence over the C library's for the
// whole process, the library under test included. Sync requests are recorded
// and answered from a script (success when the script is empty) unless
// pass-through is on; every other request goes to the real ioctl.
namespace {

struct SyncCall {
  int fd;
  uint64_t flags;
  friend bool operator==(const SyncCall&, const SyncCall&) = default;
  // gtest prints the recorded calls in failure messages.
  friend void PrintTo(const SyncCall& call, std::ostream* os) {
    *os << "{fd " << call.fd << ", flags " << call.flags << "}";
  }
};

struct IoctlInterposer {
  std::mutex mutex;
  std::vector<SyncCall> calls;
  std::deque<int> scripted_errnos;  // 0 answers success
  bool pass_through = false;
};

IoctlInterposer& Interposer() {
  static auto* interposer = new IoctlInterposer();
  return *interposer;
}

using IoctlFn = int (*)(int, unsigned long, ...);

}  // namespace

extern "C" int ioctl(int fd, unsigned long request, ...) __THROW {
  va_list args;
  va_start(args, request);
  void* arg = va_arg(args, void*);
  va_end(args);
  static const auto real_ioctl = reinterpret_cast<IoctlFn>(dlsym(RTLD_NEXT, "ioctl"));
  if (request == DMA_BUF_IOCTL_SYNC) {
    IoctlInterposer& interposer = Interposer();
    std::unique_lock<std::mutex> lock(interposer.mutex);
    interposer.calls.push_back({fd, static_cast<const dma_buf_sync*>(arg)->flags});
    if (!interposer.pass_through) {
      int err = 0;
      if (!interposer.scripted_errnos.empty()) {
        err = interposer.scripted_errnos.front();
        interposer.scripted_errnos.pop_front();
      }
      if (err == 0) return 0;
      errno = err;
      return -1;
    }
  }
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

constexpr BufferAttributes kCachedDma{BufferTransport::kDma, BufferAccess::kCpu,
                                      BufferSecurity::kNone, BufferCached::kCached,
                                      BufferCompression::kNone};
constexpr uint64_t kSize = 4096;

std::vector<SyncCall> TakeSyncCalls() {
  IoctlInterposer& interposer = Interposer();
  std::lock_guard<std::mutex> lock(interposer.mutex);
  std::vector<SyncCall> calls;
  calls.swap(interposer.calls);
  return calls;
}

void ScriptSyncErrnos(std::deque<int> errnos) {
  IoctlInterposer& interposer = Interposer();
  std::lock_guard<std::mutex> lock(interposer.mutex);
  interposer.scripted_errnos = std::move(errnos);
}

class ScopedFd {
 public:
  explicit ScopedFd(int fd) : fd_(fd) {}
  ~ScopedFd() {
    if (fd_ >= 0) close(fd_);
  }
  ScopedFd(const ScopedFd&) = delete;
  ScopedFd& operator=(const ScopedFd&) = delete;
  int get() const { return fd_; }

 private:
  int fd_;
};

// A memfd of `size` bytes: real shared memory behind a descriptor.
ScopedFd MakeMemfd(uint64_t size) {
  const int fd = memfd_create("hw_buffer_test", MFD_CLOEXEC | MFD_ALLOW_SEALING);
  if (fd >= 0 && ftruncate(fd, static_cast<off_t>(size)) != 0) {
    close(fd);
    return ScopedFd(-1);
  }
  return ScopedFd(fd);
}

// MmapWrapper that records "map <mode>" and "unmap <mode of that address>",
// and answers mappings from a script of results while one is left.
class RecordingMapper : public MmapWrapper {
 public:
  StatusOr<void*> MapFileDescriptor(int fd, uint64_t size, int64_t offset,
                                    BufferAccessMode mode) const override {
    std::unique_lock<std::mutex> lock(mutex_);
    StatusOr<void*> address = UnknownError("");
    if (!script_.empty()) {
      address = std::move(script_.front());
      script_.pop_front();
    } else {
      lock.unlock();
      address = MmapWrapper::MapFileDescriptor(fd, size, offset, mode);
      lock.lock();
    }
    events_.push_back(fmt::format("map {}", AccessModeToString(mode)));
    if (address.ok()) modes_[*address] = AccessModeToString(mode);
    return address;
  }
  int Unmap(void* address, uint64_t size) const override {
    int failure = 0;
    {
      std::lock_guard<std::mutex> lock(mutex_);
      events_.push_back(fmt::format("unmap {} {}", modes_[address], size));
      std::swap(failure, unmap_errno_);
    }
    const int result = MmapWrapper::Unmap(address, size);
    if (failure == 0) return result;
    errno = failure;
    return -1;
  }
  // The next Unmap reports failure with `err` (after unmapping for real).
  void FailNextUnmap(int err) {
    std::lock_guard<std::mutex> lock(mutex_);
    unmap_errno_ = err;
  }
  std::vector<std::string> events() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return events_;
  }
  void Script(std::deque<StatusOr<void*>> results) {
    std::lock_guard<std::mutex> lock(mutex_);
    script_ = std::move(results);
  }

 private:
  mutable std::mutex mutex_;
  mutable std::deque<StatusOr<void*>> script_;
  mutable int unmap_errno_ = 0;
  mutable std::vector<std::string> events_;
  mutable std::map<void*, std::string_view> modes_;
};

// Installs a RecordingMapper and clears the sync record; restores the
// process-wide state afterwards.
class HwBufferTest : public ::testing::Test {
 protected:
  void SetUp() override {
    auto mapper = std::make_unique<RecordingMapper>();
    mapper_ = mapper.get();
    saved_mapper_ = std::exchange(HwBuffer::mapper_, std::move(mapper));
    TakeSyncCalls();
    ScriptSyncErrnos({});
    ASSERT_GE(fd_.get(), 0);
  }
  void TearDown() override {
    HwBuffer::mapper_ = std::move(saved_mapper_);
    HwBuffer::partial_cpu_cache_sync_handler_ = nullptr;
  }

  std::shared_ptr<HwBuffer> MakeBuffer(int fd, uint64_t size = kSize,
                                       BufferAttributes attributes = kCachedDma) {
    auto buffer = HwBuffer::Make(fd, size, attributes, nullptr);
    EXPECT_THAT(buffer, IsOk());
    return *std::move(buffer);
  }

  // A 4 KiB memfd: real shared memory behind a descriptor.
  ScopedFd fd_ = MakeMemfd(kSize);
  RecordingMapper* mapper_ = nullptr;
  std::unique_ptr<MemoryMapper> saved_mapper_;
};

TEST_F(HwBufferTest, MapsOncePerModeAndUnmapsWhenTheBufferDies) {
  auto buffer = MakeBuffer(fd_.get());
  std::weak_ptr<HwBuffer> weak = buffer;
  {
    auto writer = buffer->Map(100, 16, BufferAccessMode::kWrite);
    ASSERT_THAT(writer, IsOk());
    std::memcpy((*writer)->data(), "camera frame 01", 16);
  }
  auto first = buffer->Map(0, kSize, BufferAccessMode::kRead);
  auto second = static_cast<const HwBuffer&>(*buffer).Map(96, 20, BufferAccessMode::kRead);
  ASSERT_THAT(first, IsOk());
  ASSERT_THAT(second, IsOk());
  EXPECT_STREQ(static_cast<const char*>((*first)->data()) + 100, "camera frame 01");
  EXPECT_STREQ(static_cast<const char*>((*second)->data()) + 4, "camera frame 01");
  // A second buffer over the descriptor maps it again and sees the same bytes.
  auto other = MakeBuffer(fd_.get());
  auto other_reader = other->Map(100, 16, BufferAccessMode::kReadWrite);
  ASSERT_THAT(other_reader, IsOk());
  EXPECT_STREQ(static_cast<const char*>((*other_reader)->data()), "camera frame 01");
  other_reader->reset();
  other.reset();
  EXPECT_THAT(mapper_->events(),
              ElementsAre("map Write", "map Read", "map ReadWrite", "unmap ReadWrite 4096"));

  buffer.reset();
  first->reset();
  EXPECT_FALSE(weak.expired()) << "a handle must keep its buffer alive";
  second->reset();
  EXPECT_TRUE(weak.expired());
  // Clean-ups run most recent first: the read mapping goes before the write.
  EXPECT_THAT(mapper_->events(), ElementsAre(_, _, _, _, "unmap Read 4096", "unmap Write 4096"));
}

TEST_F(HwBufferTest, RangesAreCheckedBeforeMapping) {
  auto buffer = MakeBuffer(fd_.get());
  auto huge = MakeBuffer(fd_.get(), uint64_t{1} << 33);
  struct Case {
    std::shared_ptr<HwBuffer> buffer;
    int64_t offset;
    uint64_t size;
    StatusCode code;
    std::string message;
  };
  const std::vector<Case> cases = {
      {buffer, 4096, 0, StatusCode::kOk, ""},
      {buffer, 4000, 96, StatusCode::kOk, ""},
      {buffer, 4000, 100, StatusCode::kOutOfRange,
       "Offset: 4000 and size: 100 is out of range for the buffer size: 4096"},
      {buffer, -1, 0, StatusCode::kInvalidArgument, "Invalid negative offset: -1"},
      {buffer, -1, 1u << 20, StatusCode::kInvalidArgument, "Invalid negative offset: -1"},
      {buffer, 8, std::numeric_limits<uint64_t>::max() - 4, StatusCode::kOutOfRange,
       "Offset: 8 and size: 18446744073709551611 is out of range for the buffer size: 4096"},
      {huge, int64_t{1} << 31, 16, StatusCode::kOutOfRange,
       "Offset: 2147483648 does not fit the 32-bit offset of a mapping handle"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(::testing::Message() << c.offset << "+" << c.size);
    auto handle = c.buffer->Map(c.offset, c.size, BufferAccessMode::kRead);
    if (c.code == StatusCode::kOk) {
      EXPECT_THAT(handle, IsOk());
    } else {
      EXPECT_THAT(handle, StatusIs(c.code, c.message));
    }
  }
  // Only the accepted cases mapped (once, in read mode).
  EXPECT_EQ(mapper_->events().size(), 1u);
  EXPECT_THAT(buffer->Map(0, 1, static_cast<BufferAccessMode>(3)),
              StatusIs(StatusCode::kInvalidArgument, "Invalid access mode: 3"));
}

TEST_F(HwBufferTest, MappingFailures) {
  auto no_fd = MakeBuffer(-1);
  EXPECT_THAT(no_fd->Map(0, kSize, BufferAccessMode::kRead),
              StatusIs(StatusCode::kInternal, "Invalid FD: -1"));

  // A pipe cannot be mapped.
  int pipe_fds[2];
  ASSERT_EQ(pipe(pipe_fds), 0);
  ScopedFd read_end(pipe_fds[0]);
  ScopedFd write_end(pipe_fds[1]);
  auto pipe_buffer = MakeBuffer(read_end.get());
  EXPECT_THAT(pipe_buffer->Map(0, kSize, BufferAccessMode::kRead),
              StatusIs(StatusCode::kInternal,
                       fmt::format("Mapping of FD: {0} failed, mmap error: (No such device), "
                                   "offset: 0, size: 4096; Error mapping: {{type: Buffer, Size: "
                                   "4096, FD: {0}, Attributes: Transport: DMA, Access: CPU, "
                                   "Security: None, Compression: None}}",
                                   read_end.get())));

  // A read-only descriptor maps for reading but not for writing.
  ScopedFd read_only(open(fmt::format("/proc/self/fd/{}", fd_.get()).c_str(), O_RDONLY));
  ASSERT_GE(read_only.get(), 0);
  auto read_only_buffer = MakeBuffer(read_only.get());
  EXPECT_THAT(read_only_buffer->Map(0, kSize, BufferAccessMode::kWrite),
              StatusIs(StatusCode::kInternal, HasSubstr("mmap error: (Permission denied)")));
  EXPECT_THAT(read_only_buffer->Map(0, kSize, BufferAccessMode::kRead), IsOk());

  // Failed mappings register nothing and synchronise nothing: only the
  // successful read mapping is undone.
  no_fd.reset();
  pipe_buffer.reset();
  read_only_buffer.reset();
  EXPECT_THAT(mapper_->events(),
              ElementsAre("map Read", "map Write", "map Read", "unmap Read 4096"));
  EXPECT_THAT(TakeSyncCalls(), ElementsAre(SyncCall{read_only.get(), DMA_BUF_SYNC_READ}));
}

// A mapper failure of any kind leaves the mode unmapped, with nothing
// registered or synchronised, and the next mapping in that mode works.
TEST_F(HwBufferTest, FailedMappingsLeaveNoStateBehind) {
  auto buffer = MakeBuffer(fd_.get());
  const std::string annotation = "; Error mapping: " + buffer->DebugStr();
  struct Case {
    StatusOr<void*> mapper_result;
    StatusCode code;
    std::string message;
  };
  const std::vector<Case> cases = {
      {ResourceExhaustedError("no address space"), StatusCode::kResourceExhausted,
       "no address space" + annotation},
      {PermissionDeniedError(""), StatusCode::kPermissionDenied,
       "Error mapping: " + buffer->DebugStr()},
      {static_cast<void*>(nullptr), StatusCode::kInternal,
       fmt::format("Mapping of FD: {} gave no address", fd_.get()) + annotation},
  };
  for (const Case& c : cases) {
    for (auto mode : {BufferAccessMode::kRead, BufferAccessMode::kReadWrite}) {
      SCOPED_TRACE(::testing::Message() << c.message << " " << AccessModeToString(mode));
      mapper_->Script({c.mapper_result});
      EXPECT_THAT(buffer->Map(0, kSize, mode), StatusIs(c.code, c.message));
      EXPECT_THAT(TakeSyncCalls(), IsEmpty());
    }
  }
  std::weak_ptr<HwBuffer> weak = buffer;
  EXPECT_EQ(weak.use_count(), 1) << "a failed mapping keeps a share of the buffer";

  // The next attempt maps for real, once per mode, and is undone once.
  for (auto mode : {BufferAccessMode::kRead, BufferAccessMode::kReadWrite}) {
    auto handle = buffer->Map(8, 8, mode);
    ASSERT_THAT(handle, IsOk());
    EXPECT_NE((*handle)->data(), nullptr);
  }
  // A failed unmapping at destruction has no caller to go to: it is logged.
  mapper_->FailNextUnmap(EINVAL);
  ::testing::internal::CaptureStderr();
  buffer.reset();
  EXPECT_EQ(errno, EINVAL) << "the log line keeps the failure's errno";
  EXPECT_THAT(::testing::internal::GetCapturedStderr(),
              HasSubstr(fmt::format("] Unmapping of FD: {} failed with code: -1 errno: Invalid "
                                    "argument\n",
                                    fd_.get())));
  const std::vector<std::string> events = mapper_->events();
  EXPECT_THAT(std::vector<std::string>(events.end() - 4, events.end()),
              ElementsAre("map Read", "map ReadWrite", "unmap ReadWrite 4096", "unmap Read 4096"));
  EXPECT_EQ(events.size(), 10u);

  // mmap itself refusing a mapping the address space cannot hold.
  auto huge = MakeBuffer(fd_.get(), uint64_t{1} << 62);
  EXPECT_THAT(huge->Map(0, 1, BufferAccessMode::kRead),
              StatusIs(StatusCode::kInternal,
                       HasSubstr(fmt::format("Mapping of FD: {} failed, mmap error: (Cannot "
                                             "allocate memory), offset: 0, size: {}; Error mapping",
                                             fd_.get(), uint64_t{1} << 62))));
}

TEST_F(HwBufferTest, CacheMaintenanceBracketsEachAccess) {
  auto buffer = MakeBuffer(fd_.get());
  struct Case {
    BufferAccessMode mode;
    std::vector<uint64_t> at_map;
    std::vector<uint64_t> at_release;
  };
  const std::vector<Case> cases = {
      {BufferAccessMode::kRead, {DMA_BUF_SYNC_READ | DMA_BUF_SYNC_START}, {}},
      {BufferAccessMode::kWrite, {}, {DMA_BUF_SYNC_WRITE | DMA_BUF_SYNC_END}},
      {BufferAccessMode::kReadWrite,
       {DMA_BUF_SYNC_RW | DMA_BUF_SYNC_START},
       {DMA_BUF_SYNC_RW | DMA_BUF_SYNC_END}},
  };
  auto flags_of = [](const std::vector<SyncCall>& calls, int expected_fd) {
    std::vector<uint64_t> flags;
    for (const SyncCall& call : calls) {
      EXPECT_EQ(call.fd, expected_fd);
      flags.push_back(call.flags);
    }
    return flags;
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(AccessModeToString(c.mode));
    for (int repeat = 0; repeat < 2; ++repeat) {  // the first maps, the second reuses
      auto handle = buffer->Map(0, kSize, c.mode);
      ASSERT_THAT(handle, IsOk());
      EXPECT_EQ(flags_of(TakeSyncCalls(), fd_.get()), c.at_map);
      handle->reset();
      EXPECT_EQ(flags_of(TakeSyncCalls(), fd_.get()), c.at_release);
    }
  }
  // The flag values the dma-buf interface defines.
  EXPECT_EQ(DMA_BUF_SYNC_READ | DMA_BUF_SYNC_START, 1u);
  EXPECT_EQ(DMA_BUF_SYNC_RW | DMA_BUF_SYNC_START, 3u);
  EXPECT_EQ(DMA_BUF_SYNC_WRITE | DMA_BUF_SYNC_END, 6u);
  EXPECT_EQ(DMA_BUF_SYNC_RW | DMA_BUF_SYNC_END, 7u);
  EXPECT_EQ(DMA_BUF_IOCTL_SYNC, 0x40086200u);
}

TEST_F(HwBufferTest, NoMaintenanceUnlessCachedCpuDma) {
  const std::vector<BufferAttributes> uncoherent_free = {
      {BufferTransport::kDma, BufferAccess::kCpu, BufferSecurity::kNone, BufferCached::kUnCached,
       BufferCompression::kNone},
      {BufferTransport::kDma, BufferAccess::kGpu, BufferSecurity::kNone, BufferCached::kCached,
       BufferCompression::kNone},
      {BufferTransport::kHeap, BufferAccess::kCpu, BufferSecurity::kNone, BufferCached::kCached,
       BufferCompression::kNone},
      {BufferTransport::kOpaque, BufferAccess::kNone, BufferSecurity::kNone, BufferCached::kCached,
       BufferCompression::kNone},
  };
  for (const BufferAttributes& attributes : uncoherent_free) {
    SCOPED_TRACE(BufferAttributesToString(attributes));
    auto buffer = MakeBuffer(fd_.get(), kSize, attributes);
    EXPECT_FALSE(buffer->IsCached());
    for (auto mode :
         {BufferAccessMode::kRead, BufferAccessMode::kWrite, BufferAccessMode::kReadWrite}) {
      EXPECT_THAT(buffer->Map(0, kSize, mode), IsOk());
      EXPECT_THAT(buffer->Map(8, 8, mode), IsOk());
    }
    EXPECT_THAT(TakeSyncCalls(), IsEmpty());
  }
  // Security and compression do not matter.
  auto secure = MakeBuffer(fd_.get(), kSize,
                           {BufferTransport::kDma, BufferAccess::kCpu, BufferSecurity::kSecure,
                            BufferCached::kCached, BufferCompression::kAfbc});
  EXPECT_TRUE(secure->IsCached());
}

TEST_F(HwBufferTest, PartialMappingsUseTheHandler) {
  auto buffer = MakeBuffer(fd_.get());

  // Without a handler, a partial mapping synchronises the whole buffer.
  {
    auto handle = buffer->Map(100, 200, BufferAccessMode::kReadWrite);
    ASSERT_THAT(handle, IsOk());
  }
  EXPECT_THAT(TakeSyncCalls(), ElementsAre(SyncCall{fd_.get(), 3}, SyncCall{fd_.get(), 7}));

  std::vector<std::string> handled;
  HwBuffer::partial_cpu_cache_sync_handler_ = [&](const Buffer* b, bool begin, uint64_t offset,
                                                  uint64_t size, BufferAccessMode mode) {
    EXPECT_EQ(b, buffer.get());
    handled.push_back(fmt::format("{} {} {} {}", begin ? "begin" : "end", offset, size,
                                  AccessModeToString(mode)));
  };
  {
    auto handle = buffer->Map(100, 200, BufferAccessMode::kRead);
    ASSERT_THAT(handle, IsOk());
    EXPECT_THAT(handled, ElementsAre("begin 100 200 Read"));
  }
  EXPECT_THAT(handled, ElementsAre("begin 100 200 Read", "end 100 200 Read"));
  EXPECT_THAT(TakeSyncCalls(), IsEmpty());

  // A whole-buffer mapping ignores the handler.
  handled.clear();
  { ASSERT_THAT(buffer->Map(0, kSize, BufferAccessMode::kWrite), IsOk()); }
  EXPECT_THAT(handled, IsEmpty());
  EXPECT_THAT(TakeSyncCalls(), ElementsAre(SyncCall{fd_.get(), 6}));
}

TEST_F(HwBufferTest, SyncRetriesOnEintr) {
  auto buffer = MakeBuffer(42);
  ScriptSyncErrnos({EINTR, EINTR, 0});
  ::testing::internal::CaptureStderr();
  buffer->DoCpuSync(true, BufferAccessMode::kRead);
  EXPECT_THAT(::testing::internal::GetCapturedStderr(), IsEmpty());
  EXPECT_THAT(TakeSyncCalls(), ElementsAre(SyncCall{42, 1}, SyncCall{42, 1}, SyncCall{42, 1}));
}

TEST_F(HwBufferTest, SyncFailureIsLoggedAndNotReported) {
  auto buffer = MakeBuffer(fd_.get());

  ScriptSyncErrnos({EINTR, EIO});
  ::testing::internal::CaptureStderr();
  errno = 0;
  buffer->DoCpuSync(false, BufferAccessMode::kWrite);
  const int errno_after = errno;
  const std::string log = ::testing::internal::GetCapturedStderr();
  EXPECT_EQ(errno_after, EIO);
  EXPECT_THAT(log, HasSubstr("] DMA_BUF_IOCTL_SYNC failed with code: -1 errno: Input/output "
                             "error\n"));
  EXPECT_THAT(log, ::testing::ContainsRegex("^[^ ]+ E "));  // tag, then severity
  EXPECT_EQ(TakeSyncCalls().size(), 2u);

  // Map and the handle's release go on regardless.
  ScriptSyncErrnos({EPERM, ENOTTY});
  ::testing::internal::CaptureStderr();
  auto handle = buffer->Map(0, kSize, BufferAccessMode::kReadWrite);
  ASSERT_THAT(handle, IsOk());
  handle->reset();
  EXPECT_THAT(::testing::internal::GetCapturedStderr(),
              ::testing::AllOf(HasSubstr("errno: Operation not permitted"),
                               HasSubstr("errno: Inappropriate ioctl for device")));
}

TEST_F(HwBufferTest, DebugTextsAndUnmappableKinds) {
  auto hw = MakeBuffer(5, 64);
  EXPECT_EQ(hw->DebugStr(),
            "{type: Buffer, Size: 64, FD: 5, Attributes: Transport: DMA, Access: CPU, Security: "
            "None, Compression: None}");
  EXPECT_EQ(hw->GetFd(), 5);
  EXPECT_EQ(hw->GetOffset(), 0);

  const BufferAttributes attributes{BufferTransport::kOpaque, BufferAccess::kGpu,
                                    BufferSecurity::kSecure, BufferCached::kUnCached,
                                    BufferCompression::kJpeg};
  const std::string attribute_text =
      "Transport: Opaque, Access: GPU, Security: Secure, Compression: JPEG";
  auto partition = CachePartition::Make(11, 3, 128, attributes, nullptr);
  auto secure = SecureBuffer::Make(12, 256, attributes, nullptr);
  auto virtual_buffer = VirtualBuffer::Make(512, attributes, nullptr);
  ASSERT_THAT(partition, IsOk());
  ASSERT_THAT(secure, IsOk());
  ASSERT_THAT(virtual_buffer, IsOk());
  EXPECT_EQ((*partition)->GetPartitionId(), 3u);

  struct Case {
    std::shared_ptr<Buffer> buffer;
    int fd;
    std::string text;
    std::string refusal;
  };
  const std::vector<Case> cases = {
      {*partition, 11,
       "{type: CachePartition, Size: 128, FD: 11, PartitionId: 3, Attributes: " + attribute_text +
           "}",
       "CachePartition are not mappable: "},
      {*secure, 12, "{type: SecureBuffer, Size: 256, FD: 12, Attributes: " + attribute_text + "}",
       "SecureBuffers are not mappable: "},
      {*virtual_buffer, -1, "{type: VirtualBuffer, Attributes: " + attribute_text + "}",
       "VirtualBuffers are not mappable: "},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.text);
    EXPECT_EQ(c.buffer->GetFd(), c.fd);
    EXPECT_EQ(c.buffer->GetOffset(), 0);
    EXPECT_EQ(c.buffer->DebugStr(), c.text);
    EXPECT_THAT(c.buffer->Map(0, 1, BufferAccessMode::kRead),
                StatusIs(StatusCode::kUnimplemented, c.refusal + c.text));
    const Buffer& const_buffer = *c.buffer;
    EXPECT_THAT(const_buffer.Map(0, 1, BufferAccessMode::kWrite),
                StatusIs(StatusCode::kUnimplemented, c.refusal + c.text));
  }
  EXPECT_THAT(mapper_->events(), IsEmpty());
}

TEST(HwBufferStateTest, ProcessWideDefaults) {
  EXPECT_EQ(SystemPageSize(), sysconf(_SC_PAGESIZE));
  EXPECT_NE(dynamic_cast<MmapWrapper*>(HwBuffer::mapper_.get()), nullptr);
  EXPECT_FALSE(HwBuffer::partial_cpu_cache_sync_handler_);

  const int64_t page = SystemPageSize();
  MmapWrapper mapper;
  const std::vector<std::pair<int64_t, int64_t>> cases = {
      {0, 0},
      {1, 0},
      {page - 1, 0},
      {page, page},
      {3 * page + 5, 3 * page},
      {-1, 0},
      {-page - 1, -page},
  };
  for (const auto& [offset, aligned] : cases) {
    SCOPED_TRACE(offset);
    EXPECT_EQ(mapper.AlignOffset(offset), aligned);
  }
}

// Real dma-buf memory, where the kernel offers it. The sync requests pass
// through to the kernel here.
TEST_F(HwBufferTest, RealDmaBuf) {
  int dmabuf_fd = -1;
  const int64_t page = SystemPageSize();
  ScopedFd memfd = MakeMemfd(static_cast<uint64_t>(page));
  if (ScopedFd udmabuf(open("/dev/udmabuf", O_RDWR | O_CLOEXEC)); udmabuf.get() >= 0) {
    ASSERT_EQ(fcntl(memfd.get(), F_ADD_SEALS, F_SEAL_SHRINK), 0);
    udmabuf_create create = {};
    create.memfd = static_cast<uint32_t>(memfd.get());
    create.flags = UDMABUF_FLAGS_CLOEXEC;
    create.size = static_cast<uint64_t>(page);
    dmabuf_fd = ioctl(udmabuf.get(), UDMABUF_CREATE, &create);
  } else if (ScopedFd heap(open("/dev/dma_heap/system", O_RDONLY | O_CLOEXEC)); heap.get() >= 0) {
    dma_heap_allocation_data allocation = {};
    allocation.len = static_cast<uint64_t>(page);
    allocation.fd_flags = O_RDWR | O_CLOEXEC;
    if (ioctl(heap.get(), DMA_HEAP_IOCTL_ALLOC, &allocation) == 0) {
      dmabuf_fd = static_cast<int>(allocation.fd);
    }
  } else {
    GTEST_SKIP() << "neither /dev/udmabuf nor /dev/dma_heap/system is available: real dma-buf "
                    "mapping and cache maintenance not exercised";
  }
  ASSERT_GE(dmabuf_fd, 0) << "dma-buf creation failed: " << strerror(errno);
  ScopedFd dmabuf(dmabuf_fd);
  {
    std::lock_guard<std::mutex> lock(Interposer().mutex);
    Interposer().pass_through = true;
  }
  auto buffer = MakeBuffer(dmabuf.get(), static_cast<uint64_t>(page));
  ::testing::internal::CaptureStderr();
  {
    auto writer = buffer->Map(0, static_cast<uint64_t>(page), BufferAccessMode::kReadWrite);
    ASSERT_THAT(writer, IsOk());
    std::memcpy((*writer)->data(), "dma", 4);
  }
  auto reader = buffer->Map(0, 4, BufferAccessMode::kRead);
  ASSERT_THAT(reader, IsOk());
  EXPECT_STREQ(static_cast<const char*>((*reader)->data()), "dma");
  reader->reset();
  EXPECT_THAT(::testing::internal::GetCapturedStderr(), IsEmpty()) << "the kernel refused a sync";
  {
    std::lock_guard<std::mutex> lock(Interposer().mutex);
    Interposer().pass_through = false;
  }
  EXPECT_THAT(TakeSyncCalls(), ElementsAre(SyncCall{dmabuf.get(), 3}, SyncCall{dmabuf.get(), 7},
                                           SyncCall{dmabuf.get(), 1}));
}

TEST_F(HwBufferTest, ConcurrentMappingOfOneBuffer) {
  constexpr int kThreads = 4;
  constexpr int kIterations = 300;
  constexpr uint64_t kStripe = kSize / kThreads;
  auto buffer = MakeBuffer(fd_.get());
  std::atomic<int> cleanups{0};
  std::vector<std::unique_ptr<Buffer::MappedHandle>> last(kThreads);
  std::vector<std::thread> threads;
  for (int t = 0; t < kThreads; ++t) {
    threads.emplace_back([&, t] {
      const auto offset = static_cast<int64_t>(t * kStripe);
      for (int i = 0; i < kIterations; ++i) {
        const auto mode = static_cast<BufferAccessMode>((t + i) % 3);
        auto handle = buffer->Map(offset, kStripe, mode);
        ASSERT_THAT(handle, IsOk());
        auto* bytes = static_cast<volatile unsigned char*>((*handle)->data());
        if (mode != BufferAccessMode::kRead) bytes[0] = static_cast<unsigned char>(t);
        if (mode != BufferAccessMode::kWrite) (void)bytes[0];
        if (i % 50 == 0) buffer->AddCleanup([&cleanups](Buffer*) { ++cleanups; }, false);
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
  EXPECT_EQ(cleanups.load(), kThreads * (kIterations / 50));
  unsigned char stripe_start[kThreads] = {};
  for (int t = 0; t < kThreads; ++t) {
    ASSERT_EQ(pread(fd_.get(), &stripe_start[t], 1, static_cast<off_t>(t * kStripe)), 1);
  }
  EXPECT_THAT(stripe_start, ElementsAre(0, 1, 2, 3));
}

TEST_F(HwBufferTest, UnmapBeyondTheBufferIsFatal) {
  orvex_testing::UseReexecDeathTests();
  auto buffer = MakeBuffer(3, 4096, kCachedDma);
  EXPECT_DEATH(
      { Buffer::MappedHandle(4000, nullptr, 200, BufferAccessMode::kRead, buffer); },
      "\\] Check failed: offset \\+ size <= GetSize\\(\\) Invalid buffer unmap argument\n");
  EXPECT_DEATH(
      { Buffer::MappedHandle(-8, nullptr, 8, BufferAccessMode::kRead, buffer); },
      "\\] Check failed: offset \\+ size <= GetSize\\(\\) Invalid buffer unmap argument\n");
}

}  // namespace
}  // namespace orvex
