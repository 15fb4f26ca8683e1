#include "orvex/api/memory/buffer.h"

#include <atomic>
#include <cstdint>
#include <limits>
#include <memory>
#include <string>
#include <thread>
#include <tuple>
#include <utility>
#include <vector>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/memory/buffer_testing.h"
#include "orvex/status/status_matchers.h"

// Huge allocations return null (for HeapBuffer::Make to report) instead of ending the process.
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
using enum BufferAccessMode;
using enum StatusCode;
using enum BufferCompression;

TEST(HeapBufferTest, ElementTypes) {
  const std::tuple<std::shared_ptr<Buffer>, std::string, char> cases[] = {
      {HeapBuffer<uint8_t>::Make(10, kSbwc, nullptr).value(), "10", '1'},
      {HeapBuffer<uint32_t>::Make(10, kSbwc, nullptr).value(), "40", '4'},
      {HeapBuffer<int32_t>::Make(3, kSbwc, nullptr).value(), "12", '4'},
      {HeapBuffer<float>::Make(0, kSbwc, nullptr).value(), "0", '4'},
  };
  for (const auto& [buffer, size, element_size] : cases) {
    SCOPED_TRACE(size);
    EXPECT_THAT(buffer->DebugStr(),
                MatchesRegex("\\{type: HeapBuffer, Size: " + size +
                             ", Addr: 0x[0-9a-f]+, ElementSize: " + element_size +
                             ", Attributes: Transport: Heap, .*\\}"));
    EXPECT_EQ(buffer->GetAttributes(),
              (BufferAttributes{BufferTransport::kHeap, BufferAccess::kCpu, {}, {}, kSbwc}));
  }
}

TEST(HeapBufferTest, SizesThatCannotBeAllocatedAreResourceExhausted) {
  constexpr uint64_t kMax = std::numeric_limits<uint64_t>::max();
  // A byte size beyond 64 bits (and the address space), and one the system cannot give.
  EXPECT_THAT(HeapBuffer<float>::Make(kMax / 2, kNone, nullptr),
              StatusIs(kResourceExhausted,
                       "Cannot allocate a HeapBuffer of 9223372036854775807 elements of 4 bytes"));
  EXPECT_THAT(HeapBuffer<int32_t>::Make(uint64_t{1} << 60, kNone, nullptr),
              StatusIs(kResourceExhausted));
}

TEST(HeapBufferTest, MapOffsetsAreInBytes) {
  auto buffer = HeapBuffer<uint32_t>::Make(16, kNone, nullptr).value();
  auto* base = reinterpret_cast<unsigned char*>(buffer->GetPointer().get());
  auto handle = buffer->Map(8, 16, kWrite);
  ASSERT_THAT(handle, IsOk());
  EXPECT_EQ((*handle)->data(), base + 8);
  EXPECT_EQ(static_cast<const HeapBuffer<uint32_t>&>(*buffer).Map(60, 4, kRead).value()->data(),
            base + 60);
  EXPECT_EQ(std::tuple((*handle)->offset(), (*handle)->size(), (*handle)->mode()),
            std::tuple(8, 16u, kWrite));
  EXPECT_THAT(buffer->Map(60, 5, kRead), StatusIs(kOutOfRange));
  RecordingBuffer unshared(16, {});
  EXPECT_THAT(
      unshared.Map(0, 16, kRead),
      StatusIs(kFailedPrecondition, "A buffer must be owned by a std::shared_ptr to be mapped"));
}

TEST(BufferTest, BaseDefaultsAndFence) {
  bool destroyed[2] = {false, false};
  auto buffer = std::make_shared<RecordingBuffer>(64, BufferAttributes{});
  EXPECT_EQ(std::pair(buffer->Buffer::GetFd(), buffer->Buffer::GetOffset()),
            std::pair(-1, int64_t{0}));
  // No fence: done at once even with no time limit; Abort does nothing.
  EXPECT_THAT(WaitStatus(buffer->WaitForDone(absl::InfiniteDuration())), IsOk());
  buffer->Abort();
  EXPECT_THAT(buffer->AddListener([](Status) {}), StatusIs(kUnimplemented));
  buffer->SetFence(std::make_unique<RecordingFence>(AbortedError("failed"), &destroyed[0]));
  EXPECT_THAT(WaitStatus(buffer->WaitForDone(absl::ZeroDuration())), StatusIs(kAborted, "failed"));
  buffer->Abort();
  EXPECT_EQ(static_cast<RecordingFence*>(buffer->GetFence())->aborts(), 1);
  buffer->SetFence(std::make_unique<RecordingFence>(OkStatus(), &destroyed[1]));
  EXPECT_TRUE(destroyed[0]);
  buffer.reset();
  EXPECT_TRUE(destroyed[1]);
}

TEST(BufferTest, CleanupsRunInReverseOrderExactlyOnce) {
  std::vector<std::string> calls;
  {
    auto buffer = HeapBuffer<uint8_t>::Make(8, kNone, nullptr).value();
    std::shared_ptr<uint8_t> array = buffer->GetPointer();
    array.get()[0] = 42;
    for (const char* name : {"A", "B", "C"}) {
      buffer->AddCleanup([&calls, name, raw = buffer.get()](
                             Buffer* b) { calls.push_back(b == raw ? name : "another buffer"); },
                         /*propagate=*/name[0] == 'B');
    }
    buffer->AddCleanup(  // may still read the memory
        [&calls, array](Buffer*) { calls.push_back(std::to_string(array.get()[0])); }, false);
    EXPECT_TRUE(calls.empty());
  }
  EXPECT_THAT(calls, ElementsAre("42", "C", "B", "A"));
}

TEST(BufferConcurrencyTest, CleanupsAndHandlesFromManyThreads) {
  constexpr int kThreads = 4;
  constexpr int kPerThread = 200;
  std::atomic<int> ran{0};
  auto buffer = HeapBuffer<uint8_t>::Make(kThreads * kPerThread, kNone, nullptr).value();
  std::vector<std::unique_ptr<Buffer::MappedHandle>> handles(kThreads);
  std::vector<std::thread> threads;
  for (int t = 0; t < kThreads; ++t) {
    threads.emplace_back([&, t] {
      for (int i = 0; i < kPerThread; ++i) {
        buffer->AddCleanup([&ran](Buffer*) { ran.fetch_add(1); }, i % 2 == 0);
        auto handle = buffer->Map(t * kPerThread + i, 1, kWrite);
        ASSERT_THAT(handle, IsOk());
        *static_cast<uint8_t*>((*handle)->data()) = static_cast<uint8_t>(i);
        handles[t] = std::move(*handle);  // releases the previous handle
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
  buffer.reset();  // the last handles, released on other threads, drop the last shares
  threads.clear();
  for (int t = 0; t < kThreads; ++t) threads.emplace_back([&handles, t] { handles[t].reset(); });
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(ran.load(), kThreads * kPerThread);
}

}  // namespace
}  // namespace orvex
