#include "orvex/api/memory/image_pyramid.h"

#include <cstdlib>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/memory/buffer_testing.h"
#include "orvex/api/memory/buffer_views.h"
#include "orvex/api/memory/image_pyramid_utils.h"
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

std::vector<std::shared_ptr<Buffer>> Heaps(int count) {
  std::vector<std::shared_ptr<Buffer>> buffers;
  for (int i = 0; i < count; ++i) buffers.push_back(Heap(16, std::make_unique<SoftwareFence>()));
  return buffers;
}

void Signal(Buffer* buffer, Status status) {
  dynamic_cast<SoftwareFence&>(*buffer->GetFence()).Signal(std::move(status));
}

TEST(ImagePyramidTest, MakeChecksInOrder) {
  const std::string unable = " unable to make ImagePyramid";
  struct Case {
    int lower, upper, buffers;  // buffers < 0: a heap buffer and a null entry
    std::string message;
  };
  const Case cases[] = {
      {-1, 2, 0, "min level must be >= 0, received: -1" + unable},
      {0, 2, 0, "buffers is empty," + unable},
      {0, 1, -1, "buffers contains a nullptr," + unable},
      {0, 2, 2, "An image pyramid with levels [0, 2] requires 3 buffers, but received: 2" + unable},
      {3, 1, 1,
       "An image pyramid with levels [3, 1] requires -1 buffers, but received: 1" + unable},
      // The count does not wrap.
      {0, 2147483647, 1,
       "An image pyramid with levels [0, 2147483647] requires 2147483648 buffers, but received: "
       "1" +
           unable},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.message);
    auto buffers = Heaps(std::abs(c.buffers));
    if (c.buffers < 0) buffers.push_back(nullptr);
    EXPECT_THAT(ImagePyramid::Make({c.lower, c.upper}, {64, 48}, buffers),
                StatusIs(StatusCode::kInvalidArgument, c.message));
  }
}

TEST(ImagePyramidTest, LevelLookupAndFence) {
  std::vector<std::shared_ptr<Buffer>> buffers = Heaps(4);
  auto pyramid = ImagePyramid::Make({1, 4}, {64, 48}, buffers).value();
  const ImagePyramid& const_pyramid = *pyramid;
  EXPECT_THAT(pyramid->GetBufferForLevel(1), IsOkAndHolds(buffers[0].get()));
  EXPECT_THAT(const_pyramid.GetBufferForLevel(4), IsOkAndHolds(buffers[3].get()));
  for (int level : {0, 5, -2147483647 - 1}) {
    const std::string message =
        "Requested level: " + std::to_string(level) + " outside image pyramid range: [1, 4]";
    SCOPED_TRACE(message);
    EXPECT_THAT(pyramid->GetBufferForLevel(level), StatusIs(StatusCode::kOutOfRange, message));
    EXPECT_THAT(const_pyramid.GetBufferForLevel(level), StatusIs(StatusCode::kOutOfRange, message));
  }
  // Done when every level is, with the first error in level order.
  for (int i = 3; i >= 1; --i) Signal(buffers[i].get(), AbortedError("level"));
  EXPECT_FALSE(IsDone(*pyramid->fence()));
  Signal(buffers[0].get(), OkStatus());
  EXPECT_THAT(WaitStatus(pyramid->fence()->WaitForDone(absl::ZeroDuration())),
              StatusIs(StatusCode::kAborted, "level"));
}

TEST(ImagePyramidTest, SpansLieBackToBackWithIndependentFences) {
  const GenericSize<int> size = {100, 75};
  const int total = image_pyramid_utils::GetTotalBufferSize(size, {0, 2}, 64, 8);
  std::shared_ptr<Buffer> parent =
      Heap(static_cast<uint64_t>(total), std::make_unique<SoftwareFence>());
  auto pyramid = ImagePyramid::MakeFromSpans({0, 2}, size, parent, 64, 8).value();
  EXPECT_EQ(pyramid->size(), size);
  EXPECT_THAT(WaitStatus(parent->WaitForDone(absl::ZeroDuration())),
              StatusIs(StatusCode::kInternal,
                       "This is the parent buffer for a set of ImagePyramid SpanBuffers, do not "
                       "access directly"));
  const int sizes[] = {9600, 2432, 1216};
  int64_t offset = 0;
  for (int level = 0; level <= 2; ++level) {
    SCOPED_TRACE(level);
    auto* span = dynamic_cast<SpanBuffer*>(pyramid->GetBufferForLevel(level).value());
    ASSERT_NE(span, nullptr);
    EXPECT_EQ(span->source(), parent);
    EXPECT_EQ(span->GetOffset(), offset);
    EXPECT_EQ(span->GetSize(), static_cast<uint64_t>(sizes[level]));
    offset += sizes[level];
    EXPECT_FALSE(IsDone(*span->GetFence()));
  }
  EXPECT_EQ(offset, total);  // the last span ends at the parent's end
  // Each level completes on its own.
  Signal(pyramid->buffers()[1].get(), OkStatus());
  EXPECT_FALSE(IsDone(*pyramid->buffers()[0]));
  EXPECT_FALSE(IsDone(*pyramid->fence()));

  // The spans keep the parent alive.
  std::weak_ptr<Buffer> weak_parent = parent;
  parent.reset();
  EXPECT_FALSE(weak_parent.expired());
  pyramid.reset();
  EXPECT_TRUE(weak_parent.expired());
}

TEST(ImagePyramidTest, MakeFromSpansRefusals) {
  struct Case {
    int lower, upper;
    uint64_t parent_size;
    bool parent_signalled;
    std::string message;
  };
  const Case cases[] = {
      {0, 2, 19967999, false,
       "Input buffer too small, making SpanBuffers through level: 2 requires at least: 19968000 "
       "bytes, but input buffer only has: 19967999"},
      {0, 2, 100, false,
       "Input buffer too small, making SpanBuffers through level: 0 requires at least: 15168000 "
       "bytes, but input buffer only has: 100"},
      // Refused before any level size is computed.
      {-1, 2, 1u << 26, false, "pyramid level must be in [0, 31], received: -1"},
      {30, 32, 1u << 26, false, "pyramid level must be in [0, 31], received: 32"},
      {32, 32, 1u << 26, false, "pyramid level must be in [0, 31], received: 32"},
      // No level is processed: the parent is signalled, then Make refuses.
      {2, 1, 1u << 26, true, "buffers is empty, unable to make ImagePyramid"},
      {-1, -3, 1u << 26, true, "min level must be >= 0, received: -1 unable to make ImagePyramid"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.message);
    std::shared_ptr<Buffer> parent = Heap(c.parent_size, std::make_unique<SoftwareFence>());
    EXPECT_THAT(ImagePyramid::MakeFromSpans({c.lower, c.upper}, {4000, 3000}, parent, 64, 10),
                StatusIs(StatusCode::kInvalidArgument, c.message));
    EXPECT_EQ(IsDone(*parent), c.parent_signalled);
    EXPECT_EQ(parent.use_count(), 1);  // no span survives
  }
  EXPECT_THAT(
      ImagePyramid::MakeFromSpans({0, 2}, {8, 8}, nullptr, 64, 10),
      StatusIs(StatusCode::kInvalidArgument, "parent buffer is null, unable to make ImagePyramid"));
  // A parent fence of another kind is left alone.
  std::shared_ptr<Buffer> parent = Heap(1024, std::make_unique<TwoStageSoftwareFence>());
  ASSERT_THAT(ImagePyramid::MakeFromSpans({0, 1}, {8, 8}, parent, 8, 8), IsOk());
  EXPECT_FALSE(IsDone(*parent));
  EXPECT_THAT(ImagePyramid::MakeFromSpans({0, 1}, {8, 8}, Heap(1024), 8, 8), IsOk());
}

}  // namespace
}  // namespace orvex
