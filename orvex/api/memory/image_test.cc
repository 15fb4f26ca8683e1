#include "orvex/api/memory/image.h"

#include <thread>
#include <tuple>
#include <utility>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/memory/buffer_testing.h"
#include "orvex/api/memory/heap_allocator.h"
#include "orvex/api/memory/hw_buffer.h"
#include "orvex/api/thread/two_stage_software_fence.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::IsDone;
using ::orvex::testing::IsOk;
using ::orvex::testing::RecordingBuffer;
using ::orvex::testing::StatusIs;
using ::orvex::testing::WaitStatus;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using Content = ImageFormat::ComponentContent;

// 64x32 YCBCR_420_888: luma in buffer 0, Cr and Cb sharing buffer 1.
ImageFormat Yuv420() { return ImageFormat::Make(64, 32, HalPixelFormat::YCBCR_420_888).value(); }

std::shared_ptr<RecordingBuffer> Buf(
    uint64_t size, std::unique_ptr<Fence> fence = std::make_unique<SoftwareFence>(),
    BufferAttributes attributes = {}) {
  return std::make_shared<RecordingBuffer>(size, attributes, -1, 0, std::move(fence));
}

TEST(ImageTest, MakeRefusesBadBuffers) {
  const std::pair<std::vector<std::shared_ptr<Buffer>>, std::string> cases[] = {
      {{}, "Can't create Image with no buffers"},
      {{Buf(2048), nullptr}, "Image buffers contain a nullptr at index: 1"},
      {{Buf(2048), Buf(1024, nullptr, {.compression = BufferCompression::kSbwc})},
       "All buffers must have same transport, access, security and compression"},
      {{Buf(2048)},
       "ImageFormat component ChromaB refers to buffer index: 1, but the Image has 1 buffers"},
  };
  for (const auto& [buffers, error] : cases) {
    SCOPED_TRACE(error);
    EXPECT_THAT(Image::Make(Yuv420(), {}, buffers), StatusIs(StatusCode::kInvalidArgument, error));
  }
}

// The cached attribute may differ; the image takes the first buffer's.
TEST(ImageTest, RecordsSizeAttributesAndSideband) {
  const BufferAttributes first = {.cached = BufferCached::kUnCached};
  const Image::Sideband sideband = {ColorFilterArrangement::kGrbg,
                                    NormalizedCrop(0.5f, 0.25f, 0.125f, 1.0f)};
  auto image =
      Image::Make(Yuv420(), sideband, {Buf(3000, nullptr, first), Buf(1500), Buf(5)}).value();
  EXPECT_EQ(image->GetTotalSize(), 4505u);
  EXPECT_EQ(image->GetAttributes(), first);
  EXPECT_EQ(image->GetSideband(), sideband);
  EXPECT_EQ(sideband.DebugStr(),
            "{type: Sideband, color_filter_arrangement: Grbg, sensor_crop: {type: NormalizedCrop, "
            "left: 0.500000, top: 0.250000, width: 0.125000, height: 1.000000}}");
  EXPECT_EQ(Image::Sideband().DebugStr(),
            "{type: Sideband, color_filter_arrangement: N/A, sensor_crop: N/A}");
}

// SignalFences stops at the first buffer it cannot signal; waits and aborts
// go through the merged fence.
TEST(ImageTest, SignalWaitAndAbort) {
  auto first = Buf(2048), third = Buf(1024);
  auto image = Image::Make(Yuv420(), {}, {first, Buf(1024, nullptr), third}).value();
  EXPECT_THAT(image->SignalFences(OkStatus()),
              StatusIs(StatusCode::kFailedPrecondition, "Image Buffer Fence is not signalable"));
  EXPECT_TRUE(IsDone(*first));
  EXPECT_FALSE(IsDone(*third));
  auto two_stage = std::make_unique<TwoStageSoftwareFence>();
  TwoStageSoftwareFence* stage = two_stage.get();
  image = Image::Make(Yuv420(), {}, {Buf(2048, std::move(two_stage)), Buf(1024)}).value();
  EXPECT_THAT(image->SignalFences(OkStatus()), StatusIs(StatusCode::kFailedPrecondition));
  ASSERT_THAT(stage->SignalReadyToStart(OkStatus()), IsOk());
  EXPECT_THAT(image->SignalFences(DataLossError("sensor lost")), IsOk());
  EXPECT_THAT(WaitStatus(image->WaitForDone(absl::ZeroDuration())),
              StatusIs(StatusCode::kDataLoss, "sensor lost"));
  image = Image::Make(Yuv420(), {}, {Buf(2048), Buf(1024, nullptr)}).value();
  image->Abort();
  EXPECT_THAT(WaitStatus(image->WaitForDone(absl::ZeroDuration())), StatusIs(StatusCode::kAborted));
}

// Maps buffers up to the largest index the format uses, for as long as the
// mapped image lives.
TEST(MappedImageTest, MapsUsedBuffersAndFindsComponents) {
  auto b0 = Buf(2048), b1 = Buf(1024), b2 = Buf(512);
  auto image = Image::Make(Yuv420(), {}, {b0, b1, b2}).value();
  std::shared_ptr<Image::MappedImage> mapped =
      Image::MappedImage::Make(static_cast<const Image*>(image.get()), BufferAccessMode::kRead)
          .value();
  const Image::MappedImage& const_mapped = *mapped;
  EXPECT_EQ(mapped->GetPointer(0), b0->bytes());
  EXPECT_EQ(const_mapped.GetPointer(2), b1->bytes());
  EXPECT_EQ(mapped->GetPointer(3), nullptr);
  EXPECT_EQ(mapped->GetPointer(-1), nullptr);
  // Buffer index, offset, address: an offset may reach the end of the mapping.
  const std::tuple<int, size_t, const uint8_t*> cases[] = {
      {2, 0, nullptr}, {-1, 0, nullptr}, {1, 1024, b1->bytes() + 1024}, {1, 1025, nullptr}};
  for (const auto& [buffer_index, offset, expected] : cases) {
    SCOPED_TRACE(::testing::Message() << buffer_index << "+" << offset);
    ImageFormat::Component component = image->GetFormat().components()[0];
    component.buffer_index = buffer_index;
    component.offset_bytes = offset;
    EXPECT_EQ(mapped->GetPointer(component), expected);
    EXPECT_EQ(const_mapped.GetPointer(component), expected);
  }
  uint8_t* data = nullptr;
  ASSERT_THAT(GetComponentFor(mapped.get(), Content::kLuma, &data), IsOk());
  EXPECT_EQ(data, b0->bytes());
  const uint8_t* const_data = nullptr;
  ASSERT_THAT(GetComponentFor(&const_mapped, Content::kChromaB, &const_data), IsOk());
  EXPECT_EQ(const_data, b1->bytes());
  EXPECT_THAT(GetComponentFor(mapped.get(), Content::kChromaR, nullptr), IsOk());
  EXPECT_THAT(GetComponentFor(mapped.get(), Content::kBayer, &data),
              StatusIs(StatusCode::kFailedPrecondition));
  EXPECT_THAT(GetComponentFor(static_cast<Image::MappedImage*>(nullptr), Content::kLuma, &data),
              StatusIs(StatusCode::kInvalidArgument, "mapped image must not be null"));
  image.reset();
  EXPECT_THAT(b0->unmaps(), IsEmpty());
  mapped.reset();
  EXPECT_THAT(b0->unmaps(), ElementsAre("0/2048/Read"));
  EXPECT_THAT(b1->unmaps(), ElementsAre("0/1024/Read"));
  EXPECT_THAT(b2->unmaps(), IsEmpty());
  EXPECT_THAT(Image::MappedImage::Make(static_cast<Image*>(nullptr), BufferAccessMode::kRead),
              StatusIs(StatusCode::kInvalidArgument, "image must not be null"));
  EXPECT_THAT(Image::MappedImage::GetMappedHandles(nullptr, BufferAccessMode::kRead),
              StatusIs(StatusCode::kInvalidArgument, "image must not be null"));
  // A buffer that cannot be mapped fails the whole; earlier mappings are undone.
  auto placeholder = VirtualBuffer::Make(1024, {}, nullptr).value();
  image = Image::Make(Yuv420(), {}, {b0, placeholder}).value();
  EXPECT_THAT(Image::MappedImage::Make(image.get(), BufferAccessMode::kWrite),
              StatusIs(StatusCode::kUnimplemented));
  EXPECT_THAT(b0->unmaps(), ElementsAre(::testing::_, "0/2048/Write"));
  // A format that uses buffer 0 alone.
  image = Image::Make(ImageFormat::Make(8, 8, HalPixelFormat::BLOB).value(), {}, {b2}).value();
  EXPECT_THAT(Image::MappedImage::Make(image.get(), BufferAccessMode::kRead), IsOk());
}

// Writes (kWrite) or checks (kRead) a pattern over every mapped byte of
// `image`; the bytes that differ from it, or -1 when it cannot be mapped.
int64_t Pattern(Image& image, BufferAccessMode mode) {
  auto mapped = Image::MappedImage::Make(&image, mode);
  if (!mapped.ok()) return -1;
  int64_t mismatches = 0;
  for (const auto& handle : (*mapped)->handles()) {
    auto* bytes = static_cast<uint8_t*>(handle->data());
    for (size_t i = 0; i < handle->size(); ++i) {
      if (mode == BufferAccessMode::kWrite) bytes[i] = static_cast<uint8_t>(i * 7);
      mismatches += bytes[i] != static_cast<uint8_t>(i * 7);
    }
  }
  return mismatches;
}

// The road of one frame: a producer thread writes an allocated image and
// signals it; a consumer thread waiting on it wakes and reads it back.
TEST(ImageTest, RoadOfOneFrame) {
  HeapAllocator allocator;
  const ImageFormat format = ImageFormat::Make(4000, 3000, HalPixelFormat::YCBCR_420_888).value();
  auto allocation = allocator.Allocate(AllocationSpec(format, 0, FenceType::kSoftware)).value();
  std::shared_ptr<Image> image = Image::Make(format, {}, std::move(allocation.buffers)).value();
  Status consumer_status;
  int64_t mismatches = -1;
  std::thread consumer([&] {
    consumer_status = WaitStatus(image->WaitForDone(absl::InfiniteDuration()));
    if (consumer_status.ok()) mismatches = Pattern(*image, BufferAccessMode::kRead);
  });
  std::thread producer([&] {
    EXPECT_EQ(Pattern(*image, BufferAccessMode::kWrite), 0);
    EXPECT_THAT(image->SignalFences(OkStatus()), IsOk());
  });
  producer.join();
  consumer.join();
  EXPECT_THAT(consumer_status, IsOk());
  EXPECT_EQ(mismatches, 0);
}

}  // namespace
}  // namespace orvex
