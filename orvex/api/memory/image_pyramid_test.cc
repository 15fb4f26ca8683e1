#include "orvex/api/memory/image_pyramid.h"

#include <cstdlib>
#include <string>
#include <tuple>
#include <utility>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/memory/buffer_testing.h"
#include "orvex/api/memory/buffer_views.h"
#include "orvex/api/thread/two_stage_software_fence.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::IsDone;
using ::orvex::testing::IsOk;
using ::orvex::testing::IsOkAndHolds;
using ::orvex::testing::StatusIs;
using ::orvex::testing::WaitStatus;

std::shared_ptr<Buffer> Heap(uint64_t size, std::unique_ptr<Fence> fence = nullptr) {
  return HeapBuffer<uint8_t>::Make(size, BufferCompression::kNone, std::move(fence)).value();
}

void Signal(const std::shared_ptr<Buffer>& buffer, Status status) {
  dynamic_cast<SoftwareFence&>(*buffer->GetFence()).Signal(std::move(status));
}

TEST(ImagePyramidTest, MakeChecksInOrder) {
  const std::string unable = " unable to make ImagePyramid", levels = "An image pyramid with ";
  // Levels, buffers (negative: a buffer and a null entry), message.
  // clang-format off
  const std::tuple<orvex_api::Range<int>, int, std::string> cases[] = {
      {{-1, 2}, 0, "min level must be >= 0, received: -1" + unable},
      {{0, 2}, 0, "buffers is empty," + unable},
      {{0, 1}, -1, "buffers contains a nullptr," + unable},
      {{0, 2}, 2, levels + "levels [0, 2] requires 3 buffers, but received: 2" + unable},
      {{3, 1}, 1, levels + "levels [3, 1] requires -1 buffers, but received: 1" + unable},
      {{0, 2147483647}, 1,  // the count does not wrap
       levels + "levels [0, 2147483647] requires 2147483648 buffers, but received: 1" + unable},
  };
  // clang-format on
  for (const auto& [range, count, message] : cases) {
    SCOPED_TRACE(message);
    std::vector<std::shared_ptr<Buffer>> buffers(std::abs(count), Heap(16));
    if (count < 0) buffers.push_back(nullptr);
    EXPECT_THAT(ImagePyramid::Make(range, {64, 48}, buffers),
                StatusIs(StatusCode::kInvalidArgument, message));
  }
}

TEST(ImagePyramidTest, LevelLookupAndFence) {
  std::vector<std::shared_ptr<Buffer>> buffers;
  for (int i = 0; i < 4; ++i) buffers.push_back(Heap(16, std::make_unique<SoftwareFence>()));
  auto pyramid = ImagePyramid::Make({1, 4}, {64, 48}, buffers).value();
  const ImagePyramid& const_pyramid = *pyramid;
  EXPECT_THAT(pyramid->GetBufferForLevel(1), IsOkAndHolds(buffers[0].get()));
  EXPECT_THAT(const_pyramid.GetBufferForLevel(4), IsOkAndHolds(buffers[3].get()));
  for (int level : {0, 5}) {
    const std::string message =
        "Requested level: " + std::to_string(level) + " outside image pyramid range: [1, 4]";
    EXPECT_THAT(pyramid->GetBufferForLevel(level), StatusIs(StatusCode::kOutOfRange, message));
    EXPECT_THAT(const_pyramid.GetBufferForLevel(level), StatusIs(StatusCode::kOutOfRange, message));
  }
  // Done when every level is, with the first error in level order.
  for (int i = 3; i >= 1; --i) Signal(buffers[i], AbortedError("level"));
  EXPECT_FALSE(IsDone(*pyramid->fence()));
  Signal(buffers[0], OkStatus());
  EXPECT_THAT(WaitStatus(pyramid->fence()->WaitForDone(absl::ZeroDuration())),
              StatusIs(StatusCode::kAborted, "level"));
}

// Spans of 9600, 2432 and 1216 bytes fill a parent of exactly their total.
TEST(ImagePyramidTest, SpansLieBackToBackWithOwnFences) {
  std::shared_ptr<Buffer> parent = Heap(13248, std::make_unique<SoftwareFence>());
  auto pyramid = ImagePyramid::MakeFromSpans({0, 2}, {100, 75}, parent, 64, 8).value();
  EXPECT_THAT(WaitStatus(parent->WaitForDone(absl::ZeroDuration())),
              StatusIs(StatusCode::kInternal,
                       "This is the parent buffer for a set of ImagePyramid SpanBuffers, do not "
                       "access directly"));
  int64_t offset = 0;
  for (const std::shared_ptr<Buffer>& buffer : pyramid->buffers()) {
    auto* span = dynamic_cast<SpanBuffer*>(buffer.get());
    ASSERT_NE(span, nullptr);
    EXPECT_EQ(span->source(), parent);
    EXPECT_EQ(span->GetOffset(), offset);
    offset += static_cast<int64_t>(span->GetSize());
  }
  EXPECT_EQ(offset, 13248);
  Signal(pyramid->buffers()[1], OkStatus());
  EXPECT_FALSE(IsDone(*pyramid->buffers()[0]));
  EXPECT_FALSE(IsDone(*pyramid->buffers()[2]));
}

TEST(ImagePyramidTest, MakeFromSpansRefusals) {
  // Levels of a 4000x3000 pyramid, parent size, whether the parent is signalled, message.
  // clang-format off
  const std::tuple<orvex_api::Range<int>, uint64_t, bool, std::string> cases[] = {
      {{0, 2}, 19967999, false,
       "Input buffer too small, making SpanBuffers through level: 2 requires at least: 19968000 "
       "bytes, but input buffer only has: 19967999"},
      {{32, 32}, 1u << 26, false, "pyramid level must be in [0, 31], received: 32"},
      // No level is processed: the parent is signalled, then Make refuses.
      {{2, 1}, 1u << 26, true, "buffers is empty, unable to make ImagePyramid"},
      {{-1, -3}, 1u << 26, true, "min level must be >= 0, received: -1 unable to make ImagePyramid"},
  };
  // clang-format on
  for (const auto& [levels, parent_size, parent_signalled, message] : cases) {
    SCOPED_TRACE(message);
    std::shared_ptr<Buffer> parent = Heap(parent_size, std::make_unique<SoftwareFence>());
    EXPECT_THAT(ImagePyramid::MakeFromSpans(levels, {4000, 3000}, parent, 64, 10),
                StatusIs(StatusCode::kInvalidArgument, message));
    EXPECT_EQ(IsDone(*parent), parent_signalled);
  }
  EXPECT_THAT(
      ImagePyramid::MakeFromSpans({0, 2}, {8, 8}, nullptr, 64, 10),
      StatusIs(StatusCode::kInvalidArgument, "parent buffer is null, unable to make ImagePyramid"));
  // A parent without a software fence is left alone.
  std::shared_ptr<Buffer> parent = Heap(1024, std::make_unique<TwoStageSoftwareFence>());
  ASSERT_THAT(ImagePyramid::MakeFromSpans({1, 1}, {8, 8}, parent, 8, 8), IsOk());
  EXPECT_FALSE(IsDone(*parent));
  EXPECT_THAT(ImagePyramid::MakeFromSpans({0, 1}, {8, 8}, Heap(1024), 8, 8), IsOk());
}

}  // namespace
}  // namespace orvex
