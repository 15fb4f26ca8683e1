#include "orvex/api/memory/image_pyramid.h"

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

using ::orvex::testing::IsOk;
using ::orvex::testing::IsOkAndHolds;
using ::orvex::testing::StatusIs;
using ::orvex::testing::WaitStatus;

constexpr char kParentMessage[] =
    "This is the parent buffer for a set of ImagePyramid SpanBuffers, do not access directly";

std::shared_ptr<Buffer> Heap(uint64_t size, std::unique_ptr<Fence> fence = nullptr) {
  return HeapBuffer<uint8_t>::Make(size, BufferCompression::kNone, std::move(fence)).value();
}

std::vector<std::shared_ptr<Buffer>> Heaps(int count) {
  std::vector<std::shared_ptr<Buffer>> buffers;
  for (int i = 0; i < count; ++i) buffers.push_back(Heap(16, std::make_unique<SoftwareFence>()));
  return buffers;
}

bool IsDone(const Fence& fence) {
  return std::holds_alternative<Status>(fence.WaitForDone(absl::ZeroDuration()));
}

TEST(ImagePyramidTest, MakeChecksInOrder) {
  struct Case {
    orvex_api::Range<int> levels;
    std::vector<std::shared_ptr<Buffer>> buffers;
    const char* message;
  };
  const Case cases[] = {
      {{-1, 2}, {}, "min level must be >= 0, received: -1 unable to make ImagePyramid"},
      {{0, 2}, {}, "buffers is empty, unable to make ImagePyramid"},
      {{0, 1}, {Heap(4), nullptr}, "buffers contains a nullptr, unable to make ImagePyramid"},
      {{0, 2},
       Heaps(2),
       "An image pyramid with levels [0, 2] requires 3 buffers, but received: 2 unable to make "
       "ImagePyramid"},
      {{3, 1},
       Heaps(1),
       "An image pyramid with levels [3, 1] requires -1 buffers, but received: 1 unable to make "
       "ImagePyramid"},
      // The count does not wrap.
      {{0, 2147483647},
       Heaps(1),
       "An image pyramid with levels [0, 2147483647] requires 2147483648 buffers, but received: 1 "
       "unable to make ImagePyramid"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.message);
    EXPECT_THAT(ImagePyramid::Make(c.levels, {64, 48}, c.buffers),
                StatusIs(StatusCode::kInvalidArgument, c.message));
  }
}

TEST(ImagePyramidTest, LevelLookupAndFence) {
  std::vector<std::shared_ptr<Buffer>> buffers = Heaps(4);
  auto pyramid = ImagePyramid::Make({1, 4}, {64, 48}, buffers);
  ASSERT_THAT(pyramid, IsOk());
  const ImagePyramid& const_pyramid = **pyramid;
  EXPECT_THAT((*pyramid)->GetBufferForLevel(1), IsOkAndHolds(buffers[0].get()));
  EXPECT_THAT(const_pyramid.GetBufferForLevel(4), IsOkAndHolds(buffers[3].get()));
  for (int level : {0, 5, -2147483647 - 1}) {
    SCOPED_TRACE(level);
    const std::string message =
        "Requested level: " + std::to_string(level) + " outside image pyramid range: [1, 4]";
    EXPECT_THAT((*pyramid)->GetBufferForLevel(level), StatusIs(StatusCode::kOutOfRange, message));
    EXPECT_THAT(const_pyramid.GetBufferForLevel(level), StatusIs(StatusCode::kOutOfRange, message));
  }
  EXPECT_EQ(const_pyramid.size(), (GenericSize<int>{64, 48}));
  // Done when every level is, with the first error in level order.
  for (int i = 3; i >= 1; --i) {
    dynamic_cast<SoftwareFence*>(buffers[i]->GetFence())->Signal(AbortedError("level"));
  }
  EXPECT_FALSE(IsDone(*const_pyramid.fence()));
  dynamic_cast<SoftwareFence*>(buffers[0]->GetFence())->Signal(OkStatus());
  EXPECT_THAT(WaitStatus(const_pyramid.fence()->WaitForDone(absl::ZeroDuration())),
              StatusIs(StatusCode::kAborted, "level"));
}

TEST(ImagePyramidTest, SpansLieBackToBackWithIndependentFences) {
  const GenericSize<int> size = {100, 75};
  const int total = image_pyramid_utils::GetTotalBufferSize(size, {0, 2}, 64, 8);
  ASSERT_EQ(total, 9600 + 2432 + 1216);
  auto parent_fence = std::make_unique<SoftwareFence>();
  SoftwareFence* parent_fence_ptr = parent_fence.get();
  std::shared_ptr<Buffer> parent = Heap(static_cast<uint64_t>(total), std::move(parent_fence));
  auto pyramid = ImagePyramid::MakeFromSpans({0, 2}, size, parent, 64, 8);
  ASSERT_THAT(pyramid, IsOk());

  EXPECT_THAT(WaitStatus(parent->WaitForDone(absl::ZeroDuration())),
              StatusIs(StatusCode::kInternal, kParentMessage));
  uint64_t expected_offset = 0;
  std::vector<SoftwareFence*> level_fences;
  for (int level = 0; level <= 2; ++level) {
    SCOPED_TRACE(level);
    Buffer* buffer = (*pyramid)->GetBufferForLevel(level).value();
    auto* span = dynamic_cast<SpanBuffer*>(buffer);
    ASSERT_NE(span, nullptr);
    EXPECT_EQ(span->source(), parent);
    EXPECT_EQ(span->GetOffset(), static_cast<int64_t>(expected_offset));
    EXPECT_EQ(span->GetSize(), static_cast<uint64_t>(
                                   image_pyramid_utils::GetBufferSizeForLevel(size, level, 64, 8)));
    expected_offset += span->GetSize();
    auto* fence = dynamic_cast<SoftwareFence*>(span->GetFence());
    ASSERT_NE(fence, nullptr);
    ASSERT_NE(fence, parent_fence_ptr);
    EXPECT_FALSE(IsDone(*fence));
    level_fences.push_back(fence);
  }
  EXPECT_EQ(expected_offset, static_cast<uint64_t>(total));  // the last span ends at the end

  // Each level completes on its own; the pyramid when all have.
  level_fences[1]->Signal(OkStatus());
  EXPECT_FALSE(IsDone(*level_fences[0]));
  EXPECT_FALSE(IsDone(*level_fences[2]));
  EXPECT_FALSE(IsDone(*(*pyramid)->fence()));
  level_fences[0]->Signal(OkStatus());
  level_fences[2]->Signal(OkStatus());
  EXPECT_THAT(WaitStatus((*pyramid)->fence()->WaitForDone(absl::ZeroDuration())), IsOk());

  // The spans keep the parent alive.
  std::weak_ptr<Buffer> weak_parent = parent;
  parent.reset();
  EXPECT_FALSE(weak_parent.expired());
  pyramid->reset();
  EXPECT_TRUE(weak_parent.expired());
}

TEST(ImagePyramidTest, MakeFromSpansRefusals) {
  const GenericSize<int> size = {4000, 3000};
  const int total = image_pyramid_utils::GetTotalBufferSize(size, {0, 2}, 64, 10);
  struct Case {
    const char* name;
    orvex_api::Range<int> levels;
    GenericSize<int> size;
    uint64_t parent_size;
    int alignment;
    const char* message;
    bool parent_signalled;
  };
  const Case cases[] = {
      {"one byte short",
       {0, 2},
       size,
       static_cast<uint64_t>(total) - 1,
       64,
       "Input buffer too small, making SpanBuffers through level: 2 requires at least: 19968000 "
       "bytes, but input buffer only has: 19967999",
       false},
      {"first level too large",
       {0, 2},
       size,
       100,
       64,
       "Input buffer too small, making SpanBuffers through level: 0 requires at least: 15168000 "
       "bytes, but input buffer only has: 100",
       false},
      {"negative lower level",
       {-1, 2},
       size,
       1u << 26,
       64,
       "pyramid level must be in [0, 31], received: -1",
       false},
      {"upper level above 31",
       {30, 32},
       size,
       1u << 26,
       64,
       "pyramid level must be in [0, 31], received: 32",
       false},
      {"zero alignment", {0, 2}, size, 1u << 26, 0, "alignment must be >= 1, received: 0", false},
      {"32-bit overflow",
       {0, 0},
       {65536, 65536},
       1u << 26,
       64,
       "buffer size of level 0 for a 65536x65536 image does not fit in 32 bits",
       false},
      // No level is processed: the parent is signalled, then Make refuses.
      {"empty range",
       {2, 1},
       size,
       1u << 26,
       64,
       "buffers is empty, unable to make ImagePyramid",
       true},
      {"empty negative range",
       {-1, -3},
       size,
       1u << 26,
       0,
       "min level must be >= 0, received: -1 unable to make ImagePyramid",
       true},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.name);
    std::shared_ptr<Buffer> parent = Heap(c.parent_size, std::make_unique<SoftwareFence>());
    EXPECT_THAT(ImagePyramid::MakeFromSpans(c.levels, c.size, parent, c.alignment, 10),
                StatusIs(StatusCode::kInvalidArgument, c.message));
    EXPECT_EQ(IsDone(*parent), c.parent_signalled);
    EXPECT_EQ(parent.use_count(), 1);  // no span survives
  }
  EXPECT_THAT(
      ImagePyramid::MakeFromSpans({0, 2}, size, nullptr, 64, 10),
      StatusIs(StatusCode::kInvalidArgument, "parent buffer is null, unable to make ImagePyramid"));
}

TEST(ImagePyramidTest, ParentFenceOfAnotherKindIsLeftAlone) {
  auto two_stage = std::make_unique<TwoStageSoftwareFence>();
  std::shared_ptr<Buffer> parent = Heap(1024, std::move(two_stage));
  ASSERT_THAT(ImagePyramid::MakeFromSpans({0, 1}, {8, 8}, parent, 8, 8), IsOk());
  EXPECT_FALSE(IsDone(*parent));
  std::shared_ptr<Buffer> bare = Heap(1024);
  EXPECT_THAT(ImagePyramid::MakeFromSpans({0, 1}, {8, 8}, bare, 8, 8), IsOk());
}

}  // namespace
}  // namespace orvex
