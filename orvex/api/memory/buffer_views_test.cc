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
constexpr uint64_t kMax = std::numeric_limits<uint64_t>::max();

std::shared_ptr<RecordingBuffer> MakeSource(uint64_t size, int fd = 7, int64_t offset = 0) {
  return std::make_shared<RecordingBuffer>(size, kSourceAttributes, fd, offset);
}

TEST(SpanBufferTest, MakeAndMapCheckTheirRanges) {
  auto source = MakeSource(150);
  struct Case {
    int64_t offset;
    uint64_t size;
    std::string error;  // empty: accepted
  };
  const Case makes[] = {
      {100, 50, ""},
      {150, 0, ""},
      {100, 51, "Requested SpanBuffer extent: 151 greater than original buffer size: 150"},
      {151, 0, "Requested SpanBuffer extent: 151 greater than original buffer size: 150"},
      // The exact sum is reported; in 64 bits it would wrap to 99.
      {100, kMax,
       "Requested SpanBuffer extent: 18446744073709551715 greater than original "
       "buffer size: 150"},
  };
  for (const Case& c : makes) {
    SCOPED_TRACE(c.error);
    EXPECT_THAT(
        SpanBuffer::Make(source, static_cast<uint64_t>(c.offset), c.size, nullptr),
        StatusIs(c.error.empty() ? StatusCode::kOk : StatusCode::kInvalidArgument, c.error));
  }
  EXPECT_THAT(SpanBuffer::Make(nullptr, 0, 0, nullptr),
              StatusIs(StatusCode::kInvalidArgument, "Invalid buffer pointer"));

  auto span = SpanBuffer::Make(source, 100, 50, nullptr).value();
  auto handle = span->Map(10, 40, BufferAccessMode::kReadWrite);
  ASSERT_THAT(handle, IsOk());
  EXPECT_EQ((*handle)->data(), source->bytes() + 110);
  EXPECT_EQ((*handle)->offset(), 110);
  EXPECT_EQ((*handle)->buffer(), source) << "the handle belongs to the source";
  const Case maps[] = {
      {10, 41, "size + offset: 51 extends beyone span buffer size: 50"},
      {51, 0, "size + offset: 51 extends beyone span buffer size: 50"},
      {1, kMax, "size + offset: 18446744073709551616 extends beyone span buffer size: 50"},
      // Would reach the source's bytes before the span.
      {-10, 10, "Invalid negative offset: -10"},
  };
  for (const Case& c : maps) {
    SCOPED_TRACE(c.error);
    EXPECT_THAT(
        static_cast<const SpanBuffer&>(*span).Map(c.offset, c.size, BufferAccessMode::kRead),
        StatusIs(StatusCode::kInvalidArgument, c.error));
  }
}

TEST(SpanBufferTest, SourceFailuresCarryTheViewTexts) {
  auto source = VirtualBuffer::Make(16, kSourceAttributes, nullptr).value();
  auto span = SpanBuffer::Make(source, 4, 8, nullptr).value();
  auto proxy = ProxyBuffer::Make(span, false, nullptr, nullptr).value();
  const std::string source_error = "VirtualBuffers are not mappable: " + source->DebugStr();
  EXPECT_THAT(
      span->Map(0, 8, BufferAccessMode::kRead),
      StatusIs(StatusCode::kUnimplemented, source_error + "; Error mapping: " + span->DebugStr()));
  EXPECT_THAT(
      static_cast<const Buffer&>(*proxy).Map(0, 8, BufferAccessMode::kRead),
      StatusIs(StatusCode::kUnimplemented, source_error + "; Error mapping: " + span->DebugStr() +
                                               "; Error mapping: " + proxy->DebugStr()));
}

// A span of a span: offsets add up, the descriptor, attributes and clean-ups
// are the root's, the fence is the span's own, and a mapping outlives it.
TEST(SpanBufferTest, NestedSpansForwardToTheRoot) {
  auto source = MakeSource(1000, /*fd=*/12, /*offset=*/4096);
  source->SetFence(std::make_unique<RecordingFence>(AbortedError("source")));
  source->bytes()[135] = 0x5a;
  std::vector<const Buffer*> cleanups;
  std::unique_ptr<Buffer::MappedHandle> handle;
  {
    auto outer = SpanBuffer::Make(source, 100, 500, nullptr).value();
    auto inner = SpanBuffer::Make(outer, 30, 200, std::make_unique<RecordingFence>()).value();
    EXPECT_EQ(inner->GetOffset(), 4096 + 100 + 30);
    EXPECT_EQ(inner->GetFd(), 12);
    EXPECT_EQ(inner->GetAttributes(), kSourceAttributes);
    EXPECT_EQ(inner->DebugStr(),
              "{type: SpanBuffer, Size: 200, Offset: 30, Attributes: Transport: DMA, Access: CPU, "
              "Security: None, Compression: Lossy SBWC Low Compression, OriginalBuffer: "
              "{type: SpanBuffer, Size: 500, Offset: 100, Attributes: Transport: DMA, Access: "
              "CPU, Security: None, Compression: Lossy SBWC Low Compression, OriginalBuffer: "
              "{type: Buffer, Size: 1000, FD: 12, Attributes: Transport: DMA, Access: CPU, "
              "Security: None, Compression: Lossy SBWC Low Compression}}}");

    EXPECT_THAT(WaitStatus(inner->WaitForDone(absl::ZeroDuration())), IsOk());
    inner->Abort();
    EXPECT_EQ(static_cast<RecordingFence*>(inner->GetFence())->aborts(), 1);
    EXPECT_EQ(static_cast<RecordingFence*>(source->GetFence())->aborts(), 0);

    for (bool propagate : {false, true}) {
      inner->AddCleanup([&cleanups](Buffer* b) { cleanups.push_back(b); }, propagate);
    }
    auto mapped = inner->Map(5, 10, BufferAccessMode::kRead);
    ASSERT_THAT(mapped, IsOk());
    handle = std::move(*mapped);
    inner->DoCpuSync(true, BufferAccessMode::kWrite);  // covers the whole root
  }
  EXPECT_EQ(static_cast<unsigned char*>(handle->data())[0], 0x5a);
  EXPECT_EQ(handle->buffer(), source);
  EXPECT_THAT(source->unmaps(), IsEmpty());
  handle.reset();
  EXPECT_THAT(source->unmaps(), ElementsAre("135/10/Read"));
  EXPECT_THAT(source->syncs(), ElementsAre("begin Write"));
  EXPECT_THAT(cleanups, IsEmpty());
  const Buffer* raw = source.get();
  source.reset();
  EXPECT_THAT(cleanups, ElementsAre(raw, raw));
}

TEST(ProxyBufferTest, ForwardsToTheSource) {
  auto source = MakeSource(32, /*fd=*/9, /*offset=*/64);
  auto proxy = ProxyBuffer::Make(source, false, nullptr, nullptr).value();
  EXPECT_EQ(proxy->GetSize(), 32u);
  EXPECT_EQ(proxy->GetAttributes(), kSourceAttributes);
  EXPECT_EQ(proxy->GetFd(), 9);
  EXPECT_EQ(proxy->GetOffset(), 64);
  EXPECT_EQ(proxy->DebugStr(), "{type: ProxyBuffer, OriginalBuffer: " + source->DebugStr() + "}");

  auto handle = proxy->Map(4, 8, BufferAccessMode::kWrite);
  ASSERT_THAT(handle, IsOk());
  EXPECT_EQ((*handle)->data(), source->bytes() + 4);
  EXPECT_EQ((*handle)->buffer(), source);
  handle->reset();
  EXPECT_THAT(source->unmaps(), ElementsAre("4/8/Write"));
  proxy->DoCpuSync(false, BufferAccessMode::kRead);
  EXPECT_THAT(source->syncs(), ElementsAre("end Read"));
  EXPECT_THAT(ProxyBuffer::Make(nullptr, false, nullptr, nullptr),
              StatusIs(StatusCode::kInvalidArgument, "Invalid buffer pointer"));

  // GetFence, SetFence and Abort act on the source's fence; waits use the
  // proxy's own (none: done at once).
  EXPECT_EQ(proxy->GetFence(), nullptr);
  proxy->SetFence(std::make_unique<RecordingFence>(CancelledError("source fence")));
  ASSERT_NE(source->GetFence(), nullptr);
  EXPECT_EQ(proxy->GetFence(), source->GetFence());
  proxy->Abort();
  EXPECT_EQ(static_cast<RecordingFence*>(source->GetFence())->aborts(), 1);
  EXPECT_THAT(WaitStatus(proxy->WaitForDone(absl::ZeroDuration())), IsOk());
  auto fenced = ProxyBuffer::Make(source, false, nullptr,
                                  std::make_unique<RecordingFence>(DataLossError("own")));
  EXPECT_THAT(WaitStatus((*fenced)->WaitForDone(absl::ZeroDuration())),
              StatusIs(StatusCode::kDataLoss, "own"));
}

TEST(ProxyBufferTest, CleanupRoutingAndDestructionOrder) {
  struct Case {
    bool forward_all;
    bool propagate;
    bool runs_with_proxy;
  };
  for (const Case& c : {Case{false, false, true}, Case{false, true, false},
                        Case{true, false, false}, Case{true, true, false}}) {
    SCOPED_TRACE(::testing::Message()
                 << "forward_all=" << c.forward_all << " propagate=" << c.propagate);
    std::vector<std::string> events;
    auto source = MakeSource(8);
    source->AddCleanup([&events](Buffer*) { events.push_back("source's own"); }, false);
    std::shared_ptr<void> keep_alive(new int(0), [&events](void* p) {
      events.push_back("keep-alive released");
      delete static_cast<int*>(p);
    });
    const Buffer* source_raw = source.get();
    auto proxy =
        ProxyBuffer::Make(std::move(source), c.forward_all, std::move(keep_alive), nullptr).value();
    const Buffer* expected = c.runs_with_proxy ? proxy.get() : source_raw;
    proxy->AddCleanup(
        [&events, expected](Buffer* b) { events.push_back(b == expected ? "added" : "wrong"); },
        c.propagate);
    // The proxy holds the source's last share.
    proxy.reset();
    if (c.runs_with_proxy) {
      EXPECT_THAT(events, ElementsAre("added", "keep-alive released", "source's own"));
    } else {
      EXPECT_THAT(events, ElementsAre("keep-alive released", "added", "source's own"));
    }
  }
}

}  // namespace
}  // namespace orvex
