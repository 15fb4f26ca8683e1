#include "orvex/api/memory/buffer_views.h"

#include <cstdint>
#include <limits>
#include <memory>
#include <string>
#include <tuple>
#include <utility>
#include <vector>

#include "fmt/format.h"
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
using ::testing::EndsWith;
using ::testing::IsEmpty;
using enum BufferAccessMode;
using enum StatusCode;

constexpr BufferAttributes kSourceAttributes{BufferTransport::kDma, BufferAccess::kCpu,
                                             BufferSecurity::kNone, BufferCached::kUnCached,
                                             BufferCompression::kSbwcLossyLow};

std::shared_ptr<RecordingBuffer> MakeSource(uint64_t size, int fd = 7, int64_t offset = 0) {
  return std::make_shared<RecordingBuffer>(size, kSourceAttributes, fd, offset);
}

TEST(SpanBufferTest, MakeAndMapCheckTheirRanges) {
  constexpr uint64_t kMax = std::numeric_limits<uint64_t>::max();
  auto source = MakeSource(150);
  EXPECT_THAT(SpanBuffer::Make(nullptr, 0, 0, nullptr),
              StatusIs(kInvalidArgument, "Invalid buffer pointer"));
  // Extents are exact sums: 100 + kMax would wrap to 99 in 64 bits.
  for (auto [size, extent] :
       {std::pair<uint64_t, std::string>{51, "151"}, {kMax, "18446744073709551715"}}) {
    EXPECT_THAT(SpanBuffer::Make(source, 100, size, nullptr),
                StatusIs(kInvalidArgument, "Requested SpanBuffer extent: " + extent +
                                               " greater than original buffer size: 150"));
  }
  auto span = SpanBuffer::Make(source, 100, 50, nullptr).value();
  EXPECT_THAT(span->Map(10, 40, kReadWrite), IsOk());  // up to the span's end
  // clang-format off
  const std::tuple<int64_t, uint64_t, std::string> refused[] = {
      {10, 41, "size + offset: 51 extends beyone span buffer size: 50"},
      {1, kMax, "size + offset: 18446744073709551616 extends beyone span buffer size: 50"},
      {-10, 10, "Invalid negative offset: -10"},  // would reach the bytes before the span
  };
  // clang-format on
  for (const auto& [offset, size, error] : refused) {
    EXPECT_THAT(static_cast<const SpanBuffer&>(*span).Map(offset, size, kRead),
                StatusIs(kInvalidArgument, error));
  }
  // Source offsets must fit 63 bits; a refusal by the source carries the span's text.
  auto far = SpanBuffer::Make(VirtualBuffer::Make(kMax, {}, nullptr).value(), kMax / 2, 2, nullptr);
  EXPECT_THAT((*far)->Map(0, 1, kRead),
              StatusIs(kUnimplemented, EndsWith("; Error mapping: " + (*far)->DebugStr())));
  EXPECT_THAT((*far)->Map(1, 1, kRead),
              StatusIs(kOutOfRange, "Offset: 9223372036854775808 does not fit a buffer offset"));
}

// Offsets add up, the root's descriptor, attributes and clean-ups; own fence; mappings outlive.
TEST(SpanBufferTest, NestedSpansForwardToTheRoot) {
  auto source = MakeSource(1000, /*fd=*/12, /*offset=*/4096);
  source->SetFence(std::make_unique<RecordingFence>(AbortedError("source")));
  std::vector<const Buffer*> cleanups;
  std::unique_ptr<Buffer::MappedHandle> handle;
  {
    auto outer = SpanBuffer::Make(source, 100, 500, nullptr).value();
    auto inner = SpanBuffer::Make(outer, 30, 200, std::make_unique<RecordingFence>()).value();
    EXPECT_EQ(std::tuple(inner->GetOffset(), inner->GetFd(), inner->GetAttributes()),
              std::tuple(int64_t{4096 + 100 + 30}, 12, kSourceAttributes));
    EXPECT_EQ(
        inner->DebugStr(),
        fmt::format("{{type: SpanBuffer, Size: 200, Offset: 30, {0}, OriginalBuffer: {{type: "
                    "SpanBuffer, Size: 500, Offset: 100, {0}, OriginalBuffer: {{type: Buffer, "
                    "Size: 1000, FD: 12, {0}}}}}}}",
                    "Attributes: Transport: DMA, Access: CPU, Security: None, Compression: "
                    "Lossy SBWC Low Compression"));
    inner->Abort();
    EXPECT_EQ(static_cast<RecordingFence*>(inner->GetFence())->aborts(), 1);
    EXPECT_EQ(static_cast<RecordingFence*>(source->GetFence())->aborts(), 0);
    for (bool propagate : {false, true}) {
      inner->AddCleanup([&cleanups](Buffer* b) { cleanups.push_back(b); }, propagate);
    }
    handle = std::move(inner->Map(5, 10, kRead).value());
    EXPECT_EQ(handle->buffer(), source) << "the handle belongs to the source";
    inner->DoCpuSync(true, kWrite);  // covers the whole root
  }
  EXPECT_THAT(source->unmaps(), IsEmpty());
  handle.reset();
  EXPECT_THAT(source->unmaps(), ElementsAre("135/10/Read"));
  EXPECT_THAT(source->syncs(), ElementsAre("begin Write"));
  EXPECT_THAT(cleanups, IsEmpty());
  const Buffer* raw = source.get();
  source.reset();
  EXPECT_THAT(cleanups, ElementsAre(raw, raw));
}

// GetFence, SetFence and Abort act on the source's fence; waits use the proxy's own.
TEST(ProxyBufferTest, ForwardsToTheSource) {
  auto source = MakeSource(32, /*fd=*/9, /*offset=*/64);
  auto own_fence = std::make_unique<RecordingFence>(DataLossError("own"));
  auto proxy = ProxyBuffer::Make(source, false, nullptr, std::move(own_fence)).value();
  EXPECT_EQ(
      std::tuple(proxy->GetSize(), proxy->GetAttributes(), proxy->GetFd(), proxy->GetOffset()),
      std::tuple(32u, kSourceAttributes, 9, 64));
  EXPECT_EQ(proxy->DebugStr(), "{type: ProxyBuffer, OriginalBuffer: " + source->DebugStr() + "}");
  EXPECT_THAT(proxy->Map(4, 8, kWrite), IsOk());  // released at once
  EXPECT_THAT(static_cast<const Buffer&>(*proxy).Map(30, 4, kRead),
              StatusIs(kOutOfRange, EndsWith("size: 32; Error mapping: " + proxy->DebugStr())));
  EXPECT_THAT(source->unmaps(), ElementsAre("4/8/Write"));
  proxy->DoCpuSync(false, kRead);
  EXPECT_THAT(source->syncs(), ElementsAre("end Read"));
  EXPECT_THAT(ProxyBuffer::Make(nullptr, false, nullptr, nullptr),
              StatusIs(kInvalidArgument, "Invalid buffer pointer"));
  proxy->SetFence(std::make_unique<RecordingFence>(CancelledError("source fence")));
  proxy->Abort();
  EXPECT_EQ(static_cast<RecordingFence*>(source->GetFence())->aborts(), 1);
  EXPECT_THAT(WaitStatus(proxy->WaitForDone(absl::ZeroDuration())), StatusIs(kDataLoss, "own"));
}

// Kept by the proxy only when neither flag forwards it; a proxy runs its own before releasing.
TEST(ProxyBufferTest, CleanupRoutingAndDestructionOrder) {
  for (auto [forward_all, propagate, with_proxy] :
       {std::tuple{false, false, true}, {false, true, false}, {true, false, false}}) {
    SCOPED_TRACE(::testing::Message() << forward_all << propagate);
    std::vector<std::string> events;
    auto source = MakeSource(8);
    source->AddCleanup([&events](Buffer*) { events.push_back("source's own"); }, false);
    std::shared_ptr<void> keep_alive(nullptr,
                                     [&events](void*) { events.push_back("keep-alive released"); });
    const Buffer* source_raw = source.get();
    auto proxy =
        ProxyBuffer::Make(std::move(source), forward_all, std::move(keep_alive), nullptr).value();
    const Buffer* expected = with_proxy ? proxy.get() : source_raw;
    proxy->AddCleanup(
        [&events, expected](Buffer* b) { events.push_back(b == expected ? "added" : "wrong"); },
        propagate);
    proxy.reset();  // the proxy holds the source's last share
    std::vector<std::string> order = {"keep-alive released", "added", "source's own"};
    if (with_proxy) std::swap(order[0], order[1]);
    EXPECT_EQ(events, order);
  }
}

}  // namespace
}  // namespace orvex
