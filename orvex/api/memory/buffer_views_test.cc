#include "orvex/api/memory/buffer_views.h"

#include <cstdint>
#include <limits>
#include <memory>
#include <string>
#include <vector>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/memory/buffer_testing.h"
#include "orvex/api/memory/hw_buffer.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::IsOk;
using ::orvex::testing::RecordingBuffer;
using ::orvex::testing::RecordingFence;
using ::orvex::testing::StatusIs;
using ::orvex::testing::WaitStatus;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr BufferAttributes kSourceAttributes{BufferTransport::kDma, BufferAccess::kCpu,
                                             BufferSecurity::kNone, BufferCached::kUnCached,
                                             BufferCompression::kSbwcLossyLow};

std::shared_ptr<RecordingBuffer> MakeSource(uint64_t size, int fd = 7, int64_t offset = 0) {
  return std::make_shared<RecordingBuffer>(size, kSourceAttributes, fd, offset);
}

TEST(SpanBufferTest, MakeChecksTheExtent) {
  auto source = MakeSource(150);
  struct Case {
    uint64_t offset;
    uint64_t size;
    std::string error;  // empty: accepted
  };
  const std::vector<Case> cases = {
      {100, 50, ""},
      {0, 150, ""},
      {150, 0, ""},
      {0, 0, ""},
      {100, 51, "Requested SpanBuffer extent: 151 greater than original buffer size: 150"},
      {151, 0, "Requested SpanBuffer extent: 151 greater than original buffer size: 150"},
      // The exact sum is reported; in 64 bits it would wrap to 99.
      {100, std::numeric_limits<uint64_t>::max(),
       "Requested SpanBuffer extent: 18446744073709551715 greater than original buffer size: "
       "150"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(::testing::Message() << c.offset << "+" << c.size);
    auto span = SpanBuffer::Make(source, c.offset, c.size, nullptr);
    if (c.error.empty()) {
      ASSERT_THAT(span, IsOk());
      EXPECT_EQ((*span)->GetSize(), c.size);
    } else {
      EXPECT_THAT(span, StatusIs(StatusCode::kInvalidArgument, c.error));
    }
  }
  EXPECT_THAT(SpanBuffer::Make(nullptr, 0, 0, nullptr),
              StatusIs(StatusCode::kInvalidArgument, "Invalid buffer pointer"));
}

TEST(SpanBufferTest, MapTranslatesIntoTheSource) {
  auto source = MakeSource(150);
  auto span = SpanBuffer::Make(source, 100, 50, nullptr);
  ASSERT_THAT(span, IsOk());

  auto handle = (*span)->Map(10, 40, BufferAccessMode::kReadWrite);
  ASSERT_THAT(handle, IsOk());
  EXPECT_EQ((*handle)->data(), source->bytes() + 110);
  EXPECT_EQ((*handle)->offset(), 110);
  EXPECT_EQ((*handle)->buffer(), source) << "the handle belongs to the source";

  const SpanBuffer& const_span = **span;
  auto const_handle = const_span.Map(0, 50, BufferAccessMode::kRead);
  ASSERT_THAT(const_handle, IsOk());
  EXPECT_EQ((*const_handle)->data(), source->bytes() + 100);

  struct Case {
    int64_t offset;
    uint64_t size;
    std::string error;
  };
  const std::vector<Case> refused = {
      {10, 41, "size + offset: 51 extends beyone span buffer size: 50"},
      {51, 0, "size + offset: 51 extends beyone span buffer size: 50"},
      {1, std::numeric_limits<uint64_t>::max(),
       "size + offset: 18446744073709551616 extends beyone span buffer size: 50"},
      // Would reach the source's bytes before the span.
      {-10, 10, "Invalid negative offset: -10"},
  };
  for (const Case& c : refused) {
    SCOPED_TRACE(c.error);
    EXPECT_THAT((*span)->Map(c.offset, c.size, BufferAccessMode::kRead),
                StatusIs(StatusCode::kInvalidArgument, c.error));
  }
}

TEST(SpanBufferTest, SourceFailuresCarryTheViewText) {
  auto source = VirtualBuffer::Make(16, kSourceAttributes, nullptr);
  ASSERT_THAT(source, IsOk());
  auto span = SpanBuffer::Make(*source, 4, 8, nullptr);
  ASSERT_THAT(span, IsOk());
  const std::string source_error = "VirtualBuffers are not mappable: " + (*source)->DebugStr();
  EXPECT_THAT((*span)->Map(0, 8, BufferAccessMode::kRead),
              StatusIs(StatusCode::kUnimplemented,
                       source_error + "; Error mapping: " + (*span)->DebugStr()));
  auto proxy = ProxyBuffer::Make(*span, false, nullptr, nullptr);
  ASSERT_THAT(proxy, IsOk());
  EXPECT_THAT((*proxy)->Map(0, 8, BufferAccessMode::kRead),
              StatusIs(StatusCode::kUnimplemented, source_error +
                                                       "; Error mapping: " + (*span)->DebugStr() +
                                                       "; Error mapping: " + (*proxy)->DebugStr()));
}

TEST(SpanBufferTest, NestedSpansAddTheirOffsets) {
  auto source = MakeSource(1000, /*fd=*/12, /*offset=*/4096);
  auto outer = SpanBuffer::Make(source, 100, 500, nullptr);
  ASSERT_THAT(outer, IsOk());
  auto inner = SpanBuffer::Make(*outer, 30, 200, nullptr);
  ASSERT_THAT(inner, IsOk());
  EXPECT_EQ((*inner)->GetOffset(), 4096 + 100 + 30);
  EXPECT_EQ((*inner)->GetFd(), 12);
  EXPECT_EQ((*inner)->GetAttributes(), kSourceAttributes);

  auto handle = (*inner)->Map(5, 10, BufferAccessMode::kRead);
  ASSERT_THAT(handle, IsOk());
  EXPECT_EQ((*handle)->data(), source->bytes() + 135);
  EXPECT_EQ((*handle)->buffer(), source);

  EXPECT_EQ((*inner)->DebugStr(),
            "{type: SpanBuffer, Size: 200, Offset: 30, Attributes: Transport: DMA, Access: CPU, "
            "Security: None, Compression: Lossy SBWC Low Compression, OriginalBuffer: "
            "{type: SpanBuffer, Size: 500, Offset: 100, Attributes: Transport: DMA, Access: CPU, "
            "Security: None, Compression: Lossy SBWC Low Compression, OriginalBuffer: "
            "{type: Buffer, Size: 1000, FD: 12, Attributes: Transport: DMA, Access: CPU, "
            "Security: None, Compression: Lossy SBWC Low Compression}}}");
}

TEST(SpanBufferTest, HasItsOwnFence) {
  auto source = MakeSource(64);
  source->SetFence(std::make_unique<RecordingFence>(AbortedError("source")));
  auto span = SpanBuffer::Make(source, 0, 64, std::make_unique<RecordingFence>());
  ASSERT_THAT(span, IsOk());
  EXPECT_THAT(WaitStatus((*span)->WaitForDone(absl::ZeroDuration())), IsOk());
  (*span)->Abort();
  EXPECT_EQ(static_cast<RecordingFence*>((*span)->GetFence())->aborts(), 1);
  EXPECT_EQ(static_cast<RecordingFence*>(source->GetFence())->aborts(), 0);
}

TEST(SpanBufferTest, CleanupsGoToTheSource) {
  std::vector<const Buffer*> calls;
  auto source = MakeSource(64);
  {
    auto span = SpanBuffer::Make(source, 8, 8, nullptr);
    ASSERT_THAT(span, IsOk());
    (*span)->AddCleanup([&calls](Buffer* b) { calls.push_back(b); }, false);
    (*span)->AddCleanup([&calls](Buffer* b) { calls.push_back(b); }, true);
  }
  EXPECT_THAT(calls, IsEmpty());
  const Buffer* raw = source.get();
  source.reset();
  EXPECT_THAT(calls, ElementsAre(raw, raw));
}

TEST(SpanBufferTest, MappingOutlivesItsSpan) {
  auto source = MakeSource(64);
  source->bytes()[20] = 0x5a;
  std::unique_ptr<Buffer::MappedHandle> handle;
  {
    auto span = SpanBuffer::Make(source, 16, 16, nullptr);
    ASSERT_THAT(span, IsOk());
    auto mapped = (*span)->Map(4, 4, BufferAccessMode::kRead);
    ASSERT_THAT(mapped, IsOk());
    handle = std::move(*mapped);
  }
  EXPECT_EQ(static_cast<unsigned char*>(handle->data())[0], 0x5a);
  EXPECT_THAT(source->unmaps(), IsEmpty());
  handle.reset();
  EXPECT_THAT(source->unmaps(), ElementsAre("20/4/Read"));
}

TEST(ProxyBufferTest, ForwardsToTheSource) {
  auto source = MakeSource(32, /*fd=*/9, /*offset=*/64);
  auto proxy = ProxyBuffer::Make(source, false, nullptr, nullptr);
  ASSERT_THAT(proxy, IsOk());
  EXPECT_EQ((*proxy)->GetSize(), 32u);
  EXPECT_EQ((*proxy)->GetAttributes(), kSourceAttributes);
  EXPECT_EQ((*proxy)->GetFd(), 9);
  EXPECT_EQ((*proxy)->GetOffset(), 64);
  EXPECT_EQ((*proxy)->DebugStr(),
            "{type: ProxyBuffer, OriginalBuffer: " + source->DebugStr() + "}");

  auto handle = (*proxy)->Map(4, 8, BufferAccessMode::kWrite);
  ASSERT_THAT(handle, IsOk());
  EXPECT_EQ((*handle)->data(), source->bytes() + 4);
  EXPECT_EQ((*handle)->buffer(), source);
  handle->reset();
  EXPECT_THAT(source->unmaps(), ElementsAre("4/8/Write"));

  const ProxyBuffer& const_proxy = **proxy;
  EXPECT_THAT(const_proxy.Map(30, 4, BufferAccessMode::kRead),
              StatusIs(StatusCode::kOutOfRange,
                       "Offset: 30 and size: 4 is out of range for the buffer size: 32; Error "
                       "mapping: " +
                           (*proxy)->DebugStr()));
  EXPECT_THAT(ProxyBuffer::Make(nullptr, false, nullptr, nullptr),
              StatusIs(StatusCode::kInvalidArgument, "Invalid buffer pointer"));
}

TEST(ProxyBufferTest, FenceOperationsActOnTheSourceButWaitsUseItsOwn) {
  auto source = MakeSource(8);
  auto proxy = ProxyBuffer::Make(source, false, nullptr, nullptr);
  ASSERT_THAT(proxy, IsOk());
  EXPECT_EQ((*proxy)->GetFence(), nullptr);
  (*proxy)->SetFence(std::make_unique<RecordingFence>(CancelledError("source fence")));
  ASSERT_NE(source->GetFence(), nullptr);
  EXPECT_EQ((*proxy)->GetFence(), source->GetFence());
  (*proxy)->Abort();
  EXPECT_EQ(static_cast<RecordingFence*>(source->GetFence())->aborts(), 1);
  // No fence of its own: done at once.
  EXPECT_THAT(WaitStatus((*proxy)->WaitForDone(absl::ZeroDuration())), IsOk());

  auto fenced = ProxyBuffer::Make(source, false, nullptr,
                                  std::make_unique<RecordingFence>(DataLossError("own")));
  ASSERT_THAT(fenced, IsOk());
  EXPECT_THAT(WaitStatus((*fenced)->WaitForDone(absl::ZeroDuration())),
              StatusIs(StatusCode::kDataLoss, "own"));
}

TEST(ProxyBufferTest, CleanupRouting) {
  struct Case {
    bool forward_all;
    bool propagate;
    bool runs_with_proxy;
  };
  for (const Case& c : std::vector<Case>{
           {false, false, true}, {false, true, false}, {true, false, false}, {true, true, false}}) {
    SCOPED_TRACE(::testing::Message()
                 << "forward_all=" << c.forward_all << " propagate=" << c.propagate);
    std::vector<const Buffer*> calls;
    auto source = MakeSource(8);
    auto proxy = ProxyBuffer::Make(source, c.forward_all, nullptr, nullptr);
    ASSERT_THAT(proxy, IsOk());
    const Buffer* proxy_raw = proxy->get();
    (*proxy)->AddCleanup([&calls](Buffer* b) { calls.push_back(b); }, c.propagate);
    proxy->reset();
    if (c.runs_with_proxy) {
      EXPECT_THAT(calls, ElementsAre(proxy_raw));
    } else {
      EXPECT_THAT(calls, IsEmpty());
      const Buffer* source_raw = source.get();
      source.reset();
      EXPECT_THAT(calls, ElementsAre(source_raw));
    }
  }
}

TEST(ProxyBufferTest, DestructionOrder) {
  std::vector<std::string> events;
  auto source = MakeSource(8);
  source->AddCleanup([&events](Buffer*) { events.push_back("source cleanup"); }, false);
  std::shared_ptr<void> keep_alive(new int(0), [&events](void* p) {
    events.push_back("keep-alive released");
    delete static_cast<int*>(p);
  });
  auto proxy = ProxyBuffer::Make(std::move(source), false, std::move(keep_alive), nullptr);
  ASSERT_THAT(proxy, IsOk());
  (*proxy)->AddCleanup([&events](Buffer*) { events.push_back("proxy cleanup"); }, false);
  proxy->reset();
  EXPECT_THAT(events, ElementsAre("proxy cleanup", "keep-alive released", "source cleanup"));
}

}  // namespace
}  // namespace orvex
