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

// Size, attributes and text of a HeapBuffer<T> of `count` elements.
template <typename T>
void ExpectHeapBuffer(uint64_t count) {
  SCOPED_TRACE(sizeof(T));
  auto buffer = HeapBuffer<T>::Make(count, BufferCompression::kSbwc, nullptr).value();
  const std::string size = std::to_string(count * sizeof(T));
  EXPECT_EQ(buffer->GetSize(), count * sizeof(T));
  EXPECT_EQ(buffer->GetFd(), -1);
  EXPECT_EQ(BufferAttributesToString(buffer->GetAttributes()),
            "Transport: Heap, Access: CPU, Security: None, Cached: Cached, Compression: SBWC");
  EXPECT_THAT(buffer->DebugStr(),
              MatchesRegex("\\{type: HeapBuffer, Size: " + size + ", Addr: 0x[0-9a-f]+, " +
                           "ElementSize: " + std::to_string(sizeof(T)) +
                           ", Attributes: Transport: Heap, Access: CPU, Security: None, "
                           "Compression: SBWC\\}"));
}

TEST(HeapBufferTest, ElementTypes) {
  ExpectHeapBuffer<uint8_t>(10);
  ExpectHeapBuffer<uint32_t>(10);
  ExpectHeapBuffer<int32_t>(3);
  ExpectHeapBuffer<float>(0);
}

TEST(HeapBufferTest, SizesThatCannotBeAllocatedAreResourceExhausted) {
  constexpr uint64_t kMax = std::numeric_limits<uint64_t>::max();
  // A byte size that overflows 64 bits, one beyond the address space, and
  // one the system cannot provide.
  EXPECT_THAT(HeapBuffer<float>::Make(kMax / 2, BufferCompression::kNone, nullptr),
              StatusIs(StatusCode::kResourceExhausted,
                       "Cannot allocate a HeapBuffer of 9223372036854775807 elements of 4 bytes"));
  EXPECT_THAT(HeapBuffer<uint8_t>::Make(kMax, BufferCompression::kNone, nullptr),
              StatusIs(StatusCode::kResourceExhausted));
  EXPECT_THAT(HeapBuffer<int32_t>::Make(uint64_t{1} << 60, BufferCompression::kNone, nullptr),
              StatusIs(StatusCode::kResourceExhausted));
}

TEST(HeapBufferTest, MapOffsetsAreInBytes) {
  auto buffer = HeapBuffer<uint32_t>::Make(16, BufferCompression::kNone, nullptr).value();
  auto* base = reinterpret_cast<unsigned char*>(buffer->GetPointer().get());
  auto handle = buffer->Map(8, 16, BufferAccessMode::kWrite);
  ASSERT_THAT(handle, IsOk());
  EXPECT_EQ((*handle)->data(), base + 8);
  EXPECT_EQ((*handle)->offset(), 8);
  EXPECT_EQ((*handle)->size(), 16u);
  EXPECT_EQ((*handle)->mode(), BufferAccessMode::kWrite);
  EXPECT_EQ((*handle)->buffer(), buffer);
  auto last = static_cast<const HeapBuffer<uint32_t>&>(*buffer).Map(60, 4, BufferAccessMode::kRead);
  ASSERT_THAT(last, IsOk());
  EXPECT_EQ((*last)->data(), base + 60);
  // The range checks are those of every mappable buffer (hw_buffer_test).
  EXPECT_THAT(buffer->Map(60, 5, BufferAccessMode::kRead),
              StatusIs(StatusCode::kOutOfRange,
                       "Offset: 60 and size: 5 is out of range for the buffer size: 64"));
  RecordingBuffer unshared(16, {});
  EXPECT_THAT(unshared.Map(0, 16, BufferAccessMode::kRead),
              StatusIs(StatusCode::kFailedPrecondition,
                       "A buffer must be owned by a std::shared_ptr to be mapped"));
}

TEST(BufferTest, BaseDefaultsAndFence) {
  bool first_destroyed = false, second_destroyed = false;
  auto buffer = std::make_shared<RecordingBuffer>(64, BufferAttributes{});
  EXPECT_EQ(buffer->Buffer::GetFd(), -1);
  EXPECT_EQ(buffer->Buffer::GetOffset(), 0);
  // No fence: done with OK whatever the timeout; Abort does nothing.
  EXPECT_THAT(WaitStatus(buffer->WaitForDone(absl::ZeroDuration())), IsOk());
  EXPECT_THAT(WaitStatus(buffer->WaitForDone(absl::InfiniteDuration())), IsOk());
  buffer->Abort();
  EXPECT_THAT(buffer->AddListener([](Status) {}), StatusIs(StatusCode::kUnimplemented));

  // The fence is owned, waited on and aborted through the buffer.
  buffer->SetFence(
      std::make_unique<RecordingFence>(AbortedError("producer failed"), &first_destroyed));
  EXPECT_THAT(WaitStatus(buffer->WaitForDone(absl::ZeroDuration())),
              StatusIs(StatusCode::kAborted, "producer failed"));
  buffer->Abort();
  EXPECT_EQ(static_cast<RecordingFence*>(buffer->GetFence())->aborts(), 1);
  buffer->SetFence(std::make_unique<RecordingFence>(OkStatus(), &second_destroyed));
  EXPECT_TRUE(first_destroyed);
  EXPECT_THAT(WaitStatus(buffer->WaitForDone(absl::Seconds(1))), IsOk());
  EXPECT_FALSE(second_destroyed);
  buffer.reset();
  EXPECT_TRUE(second_destroyed);
}

TEST(BufferTest, CleanupsRunInReverseOrderExactlyOnce) {
  std::vector<std::string> calls;
  {
    auto buffer = HeapBuffer<uint8_t>::Make(8, BufferCompression::kNone, nullptr).value();
    std::shared_ptr<uint8_t> array = buffer->GetPointer();
    array.get()[0] = 42;
    for (const char* name : {"A", "B", "C"}) {
      buffer->AddCleanup([&calls, name, raw = buffer.get()](
                             Buffer* b) { calls.push_back(b == raw ? name : "another buffer"); },
                         /*propagate=*/name[0] == 'B');
    }
    // A clean-up may still read the memory.
    buffer->AddCleanup(
        [&calls, array](Buffer*) { calls.push_back(std::to_string(array.get()[0])); }, false);
    EXPECT_TRUE(calls.empty());
  }
  EXPECT_THAT(calls, ElementsAre("42", "C", "B", "A"));
}

TEST(BufferConcurrencyTest, CleanupsAndHandlesFromManyThreads) {
  constexpr int kThreads = 4;
  constexpr int kPerThread = 200;
  std::atomic<int> ran{0};
  auto buffer = HeapBuffer<uint8_t>::Make(kThreads * kPerThread, BufferCompression::kNone, nullptr);
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
  for (int t = 0; t < kThreads; ++t) threads.emplace_back([&handles, t] { handles[t].reset(); });
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(ran.load(), kThreads * kPerThread);
}

}  // namespace
}  // namespace orvex
