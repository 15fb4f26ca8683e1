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

template <typename FenceT>
bool Carries(const std::shared_ptr<Buffer>& buffer) {
  return dynamic_cast<FenceT*>(buffer->GetFence()) != nullptr;
}

TEST(HeapAllocatorTest, SizeRequestsGetTheRequestedFenceKind) {
  HeapAllocator allocator;
  auto allocation = allocator.Allocate(AllocationSpec(100, 0, FenceType::kTwoStageSoftware));
  ASSERT_THAT(allocation, IsOk());
  ASSERT_EQ(allocation->buffers.size(), 1u);
  EXPECT_EQ(allocation->image_format, std::nullopt);
  EXPECT_EQ(allocation->buffers[0]->GetSize(), 100u);
  EXPECT_EQ(allocation->buffers[0]->GetAttributes().transport, BufferTransport::kHeap);
  EXPECT_TRUE(Carries<TwoStageSoftwareFence>(allocation->buffers[0]));

  // kDefault becomes the allocator's default kind.
  uint64_t size = 8;
  HeapAllocator dummy_allocator(FenceType::kDummy);
  EXPECT_TRUE(
      Carries<SoftwareFence>(Buffer::Allocate(&allocator, size, 0, FenceType::kDefault).value()));
  EXPECT_TRUE(Carries<DummyFence>(
      Buffer::Allocate(&dummy_allocator, size, 0, FenceType::kDefault).value()));
  EXPECT_TRUE(Carries<SoftwareFence>(
      Buffer::Allocate(&dummy_allocator, size, 0, FenceType::kSoftware).value()));
}

TEST(HeapAllocatorTest, ImageRequestsGetOneBufferPerPlane) {
  HeapAllocator allocator;
  const std::pair<HalPixelFormat, BufferCompression> cases[] = {
      {HalPixelFormat::YCBCR_420_888, BufferCompression::kNone},
      {HalPixelFormat::YV12, BufferCompression::kNone},
      {HalPixelFormat::YCBCR_420_SP_M_SBWC, BufferCompression::kSbwc},
  };
  for (const auto& [pixel_format, compression] : cases) {
    SCOPED_TRACE(FormatToString(pixel_format));
    const ImageFormat format = ImageFormat::Make(320, 240, pixel_format).value();
    auto allocation = allocator.Allocate(AllocationSpec(format, 0, FenceType::kSoftware));
    ASSERT_THAT(allocation, IsOk());
    EXPECT_EQ(allocation->image_format, format);
    ASSERT_EQ(allocation->buffers.size(), format.buffer_sizes().size());
    for (size_t i = 0; i < format.buffer_sizes().size(); ++i) {
      EXPECT_EQ(allocation->buffers[i]->GetSize(), format.buffer_sizes()[i]);
      EXPECT_EQ(allocation->buffers[i]->GetAttributes().compression, compression);
      EXPECT_TRUE(Carries<SoftwareFence>(allocation->buffers[i]));
    }
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
        uint64_t size = 1000;
        auto buffer = Buffer::Allocate(allocator.get(), size, 0, FenceType::kSoftware);
        EXPECT_THAT(buffer, IsOk());
        EXPECT_GE(allocator->GetAllocatedBytes(), 1010u);
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(allocator->DebugStr(),
            "{type: HeapAllocator, DefaultFenceType: 2, AllocatedBytes: 10}");
  // A buffer may outlive its allocator.
  allocator.reset();
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
