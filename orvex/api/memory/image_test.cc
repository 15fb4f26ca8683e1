#include "orvex/api/memory/image.h"

#include <cstdint>
#include <memory>
#include <thread>
#include <utility>
#include <vector>

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

constexpr BufferAttributes kHeapAttributes = {BufferTransport::kHeap, BufferAccess::kCpu,
                                              BufferSecurity::kNone, BufferCached::kCached,
                                              BufferCompression::kNone};

// 64x32 YCBCR_420_888: luma in buffer 0, Cr and Cb sharing buffer 1.
ImageFormat Yuv420() { return ImageFormat::Make(64, 32, HalPixelFormat::YCBCR_420_888).value(); }

std::shared_ptr<Buffer> Heap(uint64_t size,
                             std::unique_ptr<Fence> fence = std::make_unique<SoftwareFence>()) {
  return HeapBuffer<uint8_t>::Make(size, BufferCompression::kNone, std::move(fence)).value();
}

std::shared_ptr<RecordingBuffer> Recording(uint64_t size,
                                           BufferAttributes attributes = kHeapAttributes) {
  return std::make_shared<RecordingBuffer>(size, attributes);
}

TEST(ImageTest, MakeRefusesBadBuffersAndFormats) {
  BufferAttributes uncached = kHeapAttributes, sbwc = kHeapAttributes;
  uncached.cached = BufferCached::kUnCached;
  sbwc.compression = BufferCompression::kSbwc;
  struct Case {
    std::vector<std::shared_ptr<Buffer>> buffers;
    std::string error;  // empty: accepted
  };
  const Case cases[] = {
      {{}, "Can't create Image with no buffers"},
      {{Heap(2048), nullptr}, "Image buffers contain a nullptr at index: 1"},
      {{nullptr, Heap(1024)}, "Image buffers contain a nullptr at index: 0"},
      {{Recording(2048), Recording(1024, sbwc)},
       "All buffers must have same transport, access, security and compression"},
      {{Recording(2048), Recording(1024, uncached)}, ""},
      {{Heap(2048)},
       "ImageFormat component ChromaB refers to buffer index: 1, but the Image has 1 buffers"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.error);
    EXPECT_THAT(
        Image::Make(Yuv420(), {}, c.buffers),
        StatusIs(c.error.empty() ? StatusCode::kOk : StatusCode::kInvalidArgument, c.error));
  }
  // One buffer is accepted whatever its attributes.
  EXPECT_THAT(Image::Make(ImageFormat::Make(8, 8, HalPixelFormat::BLOB).value(), {},
                          {Recording(64, {BufferTransport::kOpaque, BufferAccess::kGpu,
                                          BufferSecurity::kSecure, BufferCached::kUnCached,
                                          BufferCompression::kAfbc})}),
              IsOk());
}

TEST(ImageTest, RecordsSizeAttributesAndSideband) {
  BufferAttributes first = kHeapAttributes;
  first.cached = BufferCached::kUnCached;
  Image::Sideband sideband;
  sideband.color_filter_arrangement = ColorFilterArrangement::kGrbg;
  sideband.sensor_crop = NormalizedCrop(0.5f, 0.25f, 0.125f, 1.0f);
  sideband.opaque_data[20] = 7;
  auto image =
      Image::Make(Yuv420(), sideband, {Recording(3000, first), Recording(1500), Recording(5)})
          .value();
  EXPECT_EQ(image->GetTotalSize(), 4505u);
  EXPECT_EQ(image->GetAttributes(), first);
  EXPECT_EQ(image->GetSideband(), sideband);
  EXPECT_EQ(image->GetFormat(), Yuv420());
  EXPECT_EQ(sideband.DebugStr(),
            "{type: Sideband, color_filter_arrangement: Grbg, sensor_crop: {type: NormalizedCrop, "
            "left: 0.500000, top: 0.250000, width: 0.125000, height: 1.000000}}");
  EXPECT_EQ(Image::Sideband().DebugStr(),
            "{type: Sideband, color_filter_arrangement: N/A, sensor_crop: N/A}");
}

// SignalFences completes software and two-stage fences in buffer order and
// stops at the first buffer it cannot signal; waits see the merged fence.
TEST(ImageTest, SignalWaitAndAbort) {
  for (auto second : {Heap(1024, nullptr), Heap(1024, std::make_unique<DummyFence>())}) {
    auto first = Heap(2048), third = Heap(1024);
    auto image = Image::Make(Yuv420(), {}, {first, second, third}).value();
    EXPECT_THAT(image->SignalFences(OkStatus()),
                StatusIs(StatusCode::kFailedPrecondition, "Image Buffer Fence is not signalable"));
    EXPECT_TRUE(IsDone(*first));
    EXPECT_FALSE(IsDone(*third));
  }
  // A two-stage fence's refusal (done before ready-to-start) comes back
  // unchanged.
  auto two_stage = std::make_unique<TwoStageSoftwareFence>();
  TwoStageSoftwareFence* stage = two_stage.get();
  auto image = Image::Make(Yuv420(), {}, {Heap(2048, std::move(two_stage)), Heap(1024)}).value();
  EXPECT_THAT(image->SignalFences(OkStatus()),
              StatusIs(StatusCode::kFailedPrecondition,
                       "Two stage fence done signaled ok, but ready-to-start signal was never "
                       "received"));
  EXPECT_FALSE(IsDone(*image));
  ASSERT_THAT(stage->SignalReadyToStart(OkStatus()), IsOk());
  EXPECT_THAT(image->SignalFences(DataLossError("sensor lost")), IsOk());
  EXPECT_THAT(WaitStatus(image->WaitForDone(absl::ZeroDuration())),
              StatusIs(StatusCode::kDataLoss, "sensor lost"));

  auto aborted = Image::Make(Yuv420(), {}, {Heap(2048), Heap(1024, nullptr)}).value();
  aborted->Abort();
  EXPECT_THAT(WaitStatus(aborted->WaitForDone(absl::ZeroDuration())),
              StatusIs(StatusCode::kAborted, "Fence was aborted"));
}

TEST(MappedImageTest, MapsOnlyTheBuffersTheFormatUses) {
  auto b0 = Recording(2048), b1 = Recording(1024), b2 = Recording(512);
  auto image = Image::Make(Yuv420(), {}, {b0, b1, b2}).value();
  {
    auto handles = Image::MappedImage::GetMappedHandles(image.get(), BufferAccessMode::kRead);
    ASSERT_THAT(handles, IsOk());
    ASSERT_EQ(handles->size(), 2u);
    EXPECT_EQ((*handles)[1]->data(), b1->bytes());
    EXPECT_EQ((*handles)[1]->size(), 1024u);
  }
  EXPECT_THAT(b0->unmaps(), ElementsAre("0/2048/Read"));
  EXPECT_THAT(b1->unmaps(), ElementsAre("0/1024/Read"));
  EXPECT_THAT(b2->unmaps(), IsEmpty());
  EXPECT_THAT(Image::MappedImage::Make(static_cast<Image*>(nullptr), BufferAccessMode::kRead),
              StatusIs(StatusCode::kInvalidArgument, "image must not be null"));
  EXPECT_THAT(Image::MappedImage::GetMappedHandles(nullptr, BufferAccessMode::kRead),
              StatusIs(StatusCode::kInvalidArgument, "image must not be null"));

  // A buffer that cannot be mapped fails the whole; earlier mappings are undone.
  auto placeholder = VirtualBuffer::Make(1024, kHeapAttributes, nullptr).value();
  auto unmappable = Image::Make(Yuv420(), {}, {b0, placeholder}).value();
  EXPECT_THAT(Image::MappedImage::Make(unmappable.get(), BufferAccessMode::kWrite),
              StatusIs(StatusCode::kUnimplemented,
                       "VirtualBuffers are not mappable: " + placeholder->DebugStr()));
  EXPECT_THAT(b0->unmaps(), ElementsAre(::testing::_, "0/2048/Write"));
}

TEST(MappedImageTest, PointersAndComponentLookup) {
  auto b0 = Recording(2048), b1 = Recording(1024);
  auto image = Image::Make(Yuv420(), {}, {b0, b1}).value();
  std::shared_ptr<Image::MappedImage> mapped =
      Image::MappedImage::Make(static_cast<const Image*>(image.get()), BufferAccessMode::kRead)
          .value();
  const Image::MappedImage& const_mapped = *mapped;
  EXPECT_EQ(mapped->GetPointer(0), b0->bytes());
  EXPECT_EQ(const_mapped.GetPointer(2), b1->bytes());
  EXPECT_EQ(mapped->GetPointer(3), nullptr);
  EXPECT_EQ(mapped->GetPointer(-1), nullptr);
  struct Case {
    int buffer_index;
    size_t offset_bytes;
    const uint8_t* expected;
  };
  const Case cases[] = {
      {2, 0, nullptr},
      {-1, 0, nullptr},
      {1, 1000, b1->bytes() + 1000},
      {1, 1024, b1->bytes() + 1024},  // the end of the mapping
      {1, 1025, nullptr},             // beyond the mapped buffer
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(::testing::Message() << c.buffer_index << "+" << c.offset_bytes);
    ImageFormat::Component component = image->GetFormat().components()[0];
    component.buffer_index = c.buffer_index;
    component.offset_bytes = c.offset_bytes;
    EXPECT_EQ(mapped->GetPointer(component), c.expected);
    EXPECT_EQ(const_mapped.GetPointer(component), c.expected);
  }

  uint8_t* data = nullptr;
  auto luma = GetComponentFor(mapped.get(), Content::kLuma, &data);
  ASSERT_THAT(luma, IsOk());
  EXPECT_EQ(data, b0->bytes());
  const uint8_t* const_data = nullptr;
  ASSERT_THAT(GetComponentFor(&const_mapped, Content::kChromaB, &const_data), IsOk());
  EXPECT_EQ(const_data, b1->bytes());
  EXPECT_THAT(GetComponentFor(mapped.get(), Content::kChromaR, nullptr), IsOk());
  EXPECT_THAT(GetComponentFor(mapped.get(), Content::kBayer, &data),
              StatusIs(StatusCode::kFailedPrecondition,
                       "Failed to find component with Bayer in " + Yuv420().DebugStr()));
  EXPECT_THAT(GetComponentFor(static_cast<Image::MappedImage*>(nullptr), Content::kLuma, &data),
              StatusIs(StatusCode::kInvalidArgument, "mapped image must not be null"));

  // The mapped image keeps the buffers mapped after the image is gone.
  image.reset();
  b0.reset();
  EXPECT_EQ(mapped->handles()[0]->buffer()->GetSize(), 2048u);
}

// Calls visit(sample, expected) for every sample of the three planes of
// `image` mapped in `mode`; false when a plane cannot be reached.
template <typename ImageT, typename Visit>
bool ForEachSample(ImageT& image, BufferAccessMode mode, Visit visit) {
  auto mapped = Image::MappedImage::Make(&image, mode);
  if (!mapped.ok()) return false;
  for (Content content : {Content::kLuma, Content::kChromaB, Content::kChromaR}) {
    uint8_t* data = nullptr;
    auto component = GetComponentFor(mapped->get(), content, &data);
    if (!component.ok() || data == nullptr) return false;
    for (int y = 0; y < component->height; ++y) {
      uint8_t* row = data + static_cast<size_t>(y) * component->row_stride_bytes;
      for (int x = 0; x < component->width; ++x) {
        visit(row[x * component->pixel_stride + component->pixel_phase],
              static_cast<uint8_t>(x * 7 + y * 13 + static_cast<int>(content) * 31));
      }
    }
  }
  return true;
}

// The road of one frame: an allocator makes the image, a producer thread
// writes it and signals, a consumer thread waiting on it wakes and reads.
TEST(ImageTest, RoadOfOneFrame) {
  HeapAllocator allocator;
  const ImageFormat format = ImageFormat::Make(4000, 3000, HalPixelFormat::YCBCR_420_888).value();
  auto allocation = allocator.Allocate(AllocationSpec(format, 0, FenceType::kSoftware));
  ASSERT_THAT(allocation, IsOk());
  std::shared_ptr<Image> image =
      Image::Make(allocation->image_format.value(), {}, std::move(allocation->buffers)).value();
  EXPECT_EQ(image->GetTotalSize(), 18000000u);
  Status consumer_status = UnknownError("consumer did not run");
  int64_t mismatches = -1;
  std::thread consumer([&] {
    consumer_status = WaitStatus(image->WaitForDone(absl::InfiniteDuration()));
    if (!consumer_status.ok()) return;
    mismatches = 0;
    EXPECT_TRUE(
        ForEachSample(static_cast<const Image&>(*image), BufferAccessMode::kRead,
                      [&](uint8_t sample, uint8_t expected) { mismatches += sample != expected; }));
  });
  std::thread producer([&] {
    const bool written = ForEachSample(*image, BufferAccessMode::kWrite,
                                       [](uint8_t& sample, uint8_t value) { sample = value; });
    EXPECT_THAT(image->SignalFences(written ? OkStatus() : InternalError("not written")), IsOk());
  });
  producer.join();
  consumer.join();
  EXPECT_THAT(consumer_status, IsOk());
  EXPECT_EQ(mismatches, 0);
}

}  // namespace
}  // namespace orvex
