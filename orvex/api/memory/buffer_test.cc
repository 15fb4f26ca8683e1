#include "orvex/api/memory/buffer.h"

#include <atomic>
#include <cstdint>
#include <limits>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/memory/buffer_testing.h"
#include "orvex/status/status_matchers.h"

// Huge allocations must fail with a null pointer, not end the process, so
// that HeapBuffer::Make can report them.
extern "C" const char* __asan_default_options() { return "allocator_may_return_null=1"; }
extern "C" const char* __tsan_default_options() { return "allocator_may_return_null=1"; }

namespace orvex {
namespace {

using ::orvex::testing::IsOk;
using ::orvex::testing::RecordingBuffer;
using ::orvex::testing::RecordingFence;
using ::orvex::testing::StatusIs;
using ::orvex::testing::WaitStatus;
using ::testing::ElementsAre;
using ::testing::MatchesRegex;

constexpr BufferAttributes kDmaAttributes{BufferTransport::kDma, BufferAccess::kGpu,
                                          BufferSecurity::kSecure, BufferCached::kUnCached,
                                          BufferCompression::kAfbc};

template <typename T>
void ExpectHeapBufferBasics(uint64_t count, size_t element_size) {
  auto buffer = HeapBuffer<T>::Make(count, BufferCompression::kSbwc, nullptr);
  ASSERT_THAT(buffer, IsOk());
  EXPECT_EQ((*buffer)->GetSize(), count * element_size);
  EXPECT_EQ((*buffer)->GetFd(), -1);
  EXPECT_EQ((*buffer)->GetOffset(), 0);
  EXPECT_EQ((*buffer)->GetFence(), nullptr);
  EXPECT_EQ((*buffer)->GetAttributes(),
            (BufferAttributes{BufferTransport::kHeap, BufferAccess::kCpu, BufferSecurity::kNone,
                              BufferCached::kCached, BufferCompression::kSbwc}));
  EXPECT_THAT((*buffer)->DebugStr(),
              MatchesRegex("\\{type: HeapBuffer, Size: " + std::to_string(count * element_size) +
                           ", Addr: 0x[0-9a-f]+, ElementSize: " + std::to_string(element_size) +
                           ", Attributes: Transport: Heap, Access: CPU, Security: None, "
                           "Compression: SBWC\\}"));
}

TEST(HeapBufferTest, ElementTypes) {
  ExpectHeapBufferBasics<uint8_t>(10, 1);
  ExpectHeapBufferBasics<uint32_t>(10, 4);
  ExpectHeapBufferBasics<int32_t>(3, 4);
  ExpectHeapBufferBasics<float>(10, 4);
  ExpectHeapBufferBasics<uint8_t>(0, 1);
  EXPECT_EQ(BufferAttributesToString(BufferAttributes{}),
            "Transport: None, Access: None, Security: None, Cached: Cached, Compression: None");
}

TEST(HeapBufferTest, SizesThatCannotBeAllocatedAreResourceExhausted) {
  // A byte size that overflows 64 bits, one beyond the address space, and
  // one the system cannot provide.
  EXPECT_THAT(HeapBuffer<float>::Make(std::numeric_limits<uint64_t>::max() / 2,
                                      BufferCompression::kNone, nullptr),
              StatusIs(StatusCode::kResourceExhausted,
                       "Cannot allocate a HeapBuffer of 9223372036854775807 elements of 4 bytes"));
  EXPECT_THAT(HeapBuffer<uint8_t>::Make(std::numeric_limits<uint64_t>::max(),
                                        BufferCompression::kNone, nullptr),
              StatusIs(StatusCode::kResourceExhausted));
  EXPECT_THAT(HeapBuffer<int32_t>::Make(uint64_t{1} << 60, BufferCompression::kNone, nullptr),
              StatusIs(StatusCode::kResourceExhausted));
}

TEST(HeapBufferTest, MapOffsetsAreInBytes) {
  auto buffer = HeapBuffer<uint32_t>::Make(16, BufferCompression::kNone, nullptr);
  ASSERT_THAT(buffer, IsOk());
  auto base = reinterpret_cast<unsigned char*>((*buffer)->GetPointer().get());
  auto handle = (*buffer)->Map(8, 16, BufferAccessMode::kWrite);
  ASSERT_THAT(handle, IsOk());
  EXPECT_EQ((*handle)->data(), base + 8);
  EXPECT_EQ((*handle)->offset(), 8);
  EXPECT_EQ((*handle)->size(), 16u);
  EXPECT_EQ((*handle)->mode(), BufferAccessMode::kWrite);
  EXPECT_EQ((*handle)->buffer(), *buffer);

  const HeapBuffer<uint32_t>& const_buffer = **buffer;
  auto const_handle = const_buffer.Map(60, 4, BufferAccessMode::kRead);
  ASSERT_THAT(const_handle, IsOk());
  EXPECT_EQ((*const_handle)->data(), base + 60);
}

TEST(HeapBufferTest, MapRangeIsChecked) {
  auto buffer = HeapBuffer<uint8_t>::Make(4096, BufferCompression::kNone, nullptr);
  ASSERT_THAT(buffer, IsOk());
  struct Case {
    int64_t offset;
    uint64_t size;
    StatusCode code;
    std::string message;
  };
  const std::vector<Case> cases = {
      {0, 4096, StatusCode::kOk, ""},
      {4096, 0, StatusCode::kOk, ""},
      {4000, 100, StatusCode::kOutOfRange,
       "Offset: 4000 and size: 100 is out of range for the buffer size: 4096"},
      {4097, 0, StatusCode::kOutOfRange,
       "Offset: 4097 and size: 0 is out of range for the buffer size: 4096"},
      {-1, 0, StatusCode::kInvalidArgument, "Invalid negative offset: -1"},
      // The sum wraps to 0 in 64 bits.
      {1, std::numeric_limits<uint64_t>::max(), StatusCode::kOutOfRange,
       "Offset: 1 and size: 18446744073709551615 is out of range for the buffer size: 4096"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(::testing::Message() << c.offset << "+" << c.size);
    auto handle = (*buffer)->Map(c.offset, c.size, BufferAccessMode::kRead);
    if (c.code == StatusCode::kOk) {
      EXPECT_THAT(handle, IsOk());
    } else {
      EXPECT_THAT(handle, StatusIs(c.code, c.message));
    }
  }
}

TEST(BufferTest, BaseDefaults) {
  auto buffer = std::make_shared<RecordingBuffer>(64, kDmaAttributes);
  EXPECT_EQ(buffer->Buffer::GetFd(), -1);
  EXPECT_EQ(buffer->Buffer::GetOffset(), 0);
  EXPECT_EQ(buffer->DebugStr(),
            "{type: Buffer, Size: 64, FD: -1, Attributes: Transport: DMA, Access: GPU, Security: "
            "Secure, Compression: AFBC}");
  // No fence: done with OK whatever the timeout; Abort does nothing.
  EXPECT_THAT(WaitStatus(buffer->WaitForDone(absl::ZeroDuration())), IsOk());
  EXPECT_THAT(WaitStatus(buffer->WaitForDone(absl::InfiniteDuration())), IsOk());
  buffer->Abort();
  EXPECT_THAT(buffer->AddListener([](Status) {}), StatusIs(StatusCode::kUnimplemented));
}

TEST(BufferTest, FenceIsOwnedAndForwarded) {
  bool first_destroyed = false;
  bool second_destroyed = false;
  {
    auto buffer = HeapBuffer<uint8_t>::Make(
        4, BufferCompression::kNone,
        std::make_unique<RecordingFence>(AbortedError("producer failed"), &first_destroyed));
    ASSERT_THAT(buffer, IsOk());
    EXPECT_THAT(WaitStatus((*buffer)->WaitForDone(absl::ZeroDuration())),
                StatusIs(StatusCode::kAborted, "producer failed"));
    auto* first = static_cast<RecordingFence*>((*buffer)->GetFence());
    (*buffer)->Abort();
    EXPECT_EQ(first->aborts(), 1);

    (*buffer)->SetFence(std::make_unique<RecordingFence>(OkStatus(), &second_destroyed));
    EXPECT_TRUE(first_destroyed);
    EXPECT_THAT(WaitStatus((*buffer)->WaitForDone(absl::Seconds(1))), IsOk());
    EXPECT_FALSE(second_destroyed);
  }
  EXPECT_TRUE(second_destroyed);
}

TEST(BufferTest, CleanupsRunInReverseOrderExactlyOnce) {
  std::vector<std::string> calls;
  Buffer* seen = nullptr;
  {
    auto buffer = HeapBuffer<uint8_t>::Make(8, BufferCompression::kNone, nullptr);
    ASSERT_THAT(buffer, IsOk());
    Buffer* raw = buffer->get();
    std::shared_ptr<uint8_t> array = (*buffer)->GetPointer();
    array.get()[0] = 42;
    for (const char* name : {"A", "B", "C"}) {
      (*buffer)->AddCleanup(
          [&calls, &seen, name, raw](Buffer* b) {
            calls.push_back(name);
            if (b != raw) seen = b;
          },
          /*propagate=*/std::string(name) == "B");
    }
    // A clean-up may still read the memory.
    (*buffer)->AddCleanup(
        [&calls, array](Buffer*) { calls.push_back("read " + std::to_string(array.get()[0])); },
        false);
    EXPECT_TRUE(calls.empty());
  }
  EXPECT_THAT(calls, ElementsAre("read 42", "C", "B", "A"));
  EXPECT_EQ(seen, nullptr) << "a clean-up received another buffer's pointer";
}

TEST(BufferTest, HandlesKeepTheBufferAlive) {
  auto buffer = std::make_shared<RecordingBuffer>(64, kDmaAttributes);
  std::weak_ptr<RecordingBuffer> weak = buffer;
  std::vector<std::string> cleanups;
  buffer->AddCleanup([&cleanups](Buffer*) { cleanups.push_back("cleanup"); }, false);
  auto first = buffer->Map(0, 64, BufferAccessMode::kRead);
  auto second = static_cast<const RecordingBuffer&>(*buffer).Map(16, 8, BufferAccessMode::kWrite);
  ASSERT_THAT(first, IsOk());
  ASSERT_THAT(second, IsOk());
  RecordingBuffer* raw = buffer.get();
  buffer.reset();
  EXPECT_FALSE(weak.expired());
  first->reset();
  EXPECT_FALSE(weak.expired());
  EXPECT_THAT(raw->unmaps(), ElementsAre("0/64/Read"));
  EXPECT_TRUE(cleanups.empty());
  second->reset();
  EXPECT_TRUE(weak.expired());
  EXPECT_THAT(cleanups, ElementsAre("cleanup"));
}

TEST(BufferTest, MappingABufferNotOwnedBySharedPointerFails) {
  RecordingBuffer buffer(16, kDmaAttributes);
  EXPECT_THAT(buffer.Map(0, 16, BufferAccessMode::kRead),
              StatusIs(StatusCode::kFailedPrecondition,
                       "A buffer must be owned by a std::shared_ptr to be mapped"));
}

TEST(BufferConcurrencyTest, CleanupsAndHandlesFromManyThreads) {
  constexpr int kThreads = 4;
  constexpr int kPerThread = 200;
  std::atomic<int> ran{0};
  {
    auto buffer =
        HeapBuffer<uint8_t>::Make(kThreads * kPerThread, BufferCompression::kNone, nullptr);
    ASSERT_THAT(buffer, IsOk());
    std::vector<std::unique_ptr<Buffer::MappedHandle>> handles(kThreads);
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) {
      threads.emplace_back([&, t] {
        for (int i = 0; i < kPerThread; ++i) {
          (*buffer)->AddCleanup([&ran](Buffer*) { ran.fetch_add(1); }, i % 2 == 0);
          auto handle = (*buffer)->Map(t * kPerThread + i, 1, BufferAccessMode::kWrite);
          ASSERT_THAT(handle, IsOk());
          *static_cast<uint8_t*>((*handle)->data()) = static_cast<uint8_t>(i);
          handles[t] = std::move(*handle);  // releases the previous handle
        }
      });
    }
    for (std::thread& thread : threads) thread.join();
    buffer->reset();
    // The last handles, released on other threads, drop the last shares.
    threads.clear();
    for (int t = 0; t < kThreads; ++t) {
      threads.emplace_back([&handles, t] { handles[t].reset(); });
    }
    for (std::thread& thread : threads) thread.join();
  }
  EXPECT_EQ(ran.load(), kThreads * kPerThread);
}

}  // namespace
}  // namespace orvex
