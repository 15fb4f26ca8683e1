#include "orvex/api/memory/heap_allocator.h"

#include <memory>
#include <thread>
#include <vector>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/thread/two_stage_software_fence.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::IsOk;
using ::orvex::testing::StatusIs;

// Each buffer gets a new fence of the requested kind; kDefault takes the
// allocator's default kind. An image gets one buffer per plane.
TEST(HeapAllocatorTest, SizeAndImageRequests) {
  HeapAllocator allocator(FenceType::kDummy);
  auto by_size = allocator.Allocate(AllocationSpec(100, 0, FenceType::kTwoStageSoftware));
  ASSERT_THAT(by_size, IsOk());
  ASSERT_EQ(by_size->buffers.size(), 1u);
  EXPECT_EQ(by_size->image_format, std::nullopt);
  EXPECT_EQ(by_size->buffers[0]->GetSize(), 100u);
  EXPECT_NE(dynamic_cast<TwoStageSoftwareFence*>(by_size->buffers[0]->GetFence()), nullptr);
  const auto format = ImageFormat::Make(320, 240, HalPixelFormat::YCBCR_420_SP_M_SBWC).value();
  auto by_image = allocator.Allocate(AllocationSpec(format, 0, FenceType::kDefault));
  ASSERT_THAT(by_image, IsOk());
  EXPECT_EQ(by_image->image_format, format);
  ASSERT_EQ(by_image->buffers.size(), 2u);
  for (size_t i = 0; i < 2; ++i) {
    EXPECT_EQ(by_image->buffers[i]->GetSize(), format.buffer_sizes()[i]);
    EXPECT_EQ(by_image->buffers[i]->GetAttributes().compression, BufferCompression::kSbwc);
    EXPECT_NE(dynamic_cast<DummyFence*>(by_image->buffers[i]->GetFence()), nullptr);
  }
  EXPECT_THAT(
      allocator.Allocate(AllocationSpec(AllocationSpec::ByRequest{1, 2}, FenceType::kSoftware)),
      StatusIs(StatusCode::kUnimplemented,
               "HeapAllocator cannot allocate by request id and stream id"));
}

TEST(HeapAllocatorTest, CountsLiveBytesAcrossThreads) {
  auto allocator = std::make_shared<HeapAllocator>();
  std::shared_ptr<Buffer> survivor =
      std::move(allocator->Allocate(AllocationSpec(10, 0, FenceType::kDummy))->buffers[0]);
  std::vector<std::thread> threads;
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([&allocator] {
      for (int i = 0; i < 50; ++i) {
        auto allocation = allocator->Allocate(AllocationSpec(1000, 0, FenceType::kSoftware));
        EXPECT_GE(allocator->GetAllocatedBytes(), 1010u);
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(allocator->DebugStr(),
            "{type: HeapAllocator, DefaultFenceType: 2, AllocatedBytes: 10}");
  allocator.reset();  // a buffer may outlive its allocator
  survivor.reset();
}

TEST(HeapAllocatorDeathTest, DefaultKindMustBeConcrete) {
  EXPECT_DEATH((void)HeapAllocator(FenceType::kDefault),
               "Check failed: default_fence_type != FenceType::kDefault "
               "\\(default_fence_type=0, FenceType::kDefault=0\\) HeapAllocator needs a concrete "
               "default fence type");
}

}  // namespace
}  // namespace orvex
