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

ImageFormat Yuv420(int width = 64, int height = 32) {
  return ImageFormat::Make(width, height, HalPixelFormat::YCBCR_420_888).value();
}

std::shared_ptr<Buffer> HeapWithFence(uint64_t size, std::unique_ptr<Fence> fence) {
  return HeapBuffer<uint8_t>::Make(size, BufferCompression::kNone, std::move(fence)).value();
}

std::shared_ptr<Buffer> Heap(uint64_t size) {
  return HeapWithFence(size, std::make_unique<SoftwareFence>());
}

std::shared_ptr<RecordingBuffer> Recording(uint64_t size,
                                           BufferAttributes attributes = kHeapAttributes) {
  return std::make_shared<RecordingBuffer>(size, attributes);
}

TEST(ImageTest, MakeRefusesBadBuffersAndFormats) {
  BufferAttributes uncached = kHeapAttributes;
  uncached.cached = BufferCached::kUnCached;
  BufferAttributes sbwc = kHeapAttributes;
  sbwc.compression = BufferCompression::kSbwc;
  struct Case {
    const char* name;
    std::vector<std::shared_ptr<Buffer>> buffers;
    const char* error;  // null: accepted
  };
  const Case cases[] = {
      {"no buffers", {}, "Can't create Image with no buffers"},
      {"null second buffer", {Heap(2048), nullptr}, "Image buffers contain a nullptr at index: 1"},
      {"null first buffer", {nullptr, Heap(1024)}, "Image buffers contain a nullptr at index: 0"},
      {"compression differs",
       {Recording(2048), Recording(1024, sbwc)},
       "All buffers must have same transport, access, security and compression"},
      {"only cached differs", {Recording(2048), Recording(1024, uncached)}, nullptr},
      {"chroma buffer missing",
       {Heap(2048)},
       "ImageFormat component ChromaB refers to buffer index: 1, but the Image has 1 buffers"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.name);
    auto image = Image::Make(Yuv420(), {}, c.buffers);
    if (c.error == nullptr) {
      EXPECT_THAT(image, IsOk());
    } else {
      EXPECT_THAT(image, StatusIs(StatusCode::kInvalidArgument, c.error));
    }
  }
  // One buffer is accepted whatever its attributes.
  BufferAttributes odd = {BufferTransport::kOpaque, BufferAccess::kGpu, BufferSecurity::kSecure,
                          BufferCached::kUnCached, BufferCompression::kAfbc};
  EXPECT_THAT(
      Image::Make(ImageFormat::Make(8, 8, HalPixelFormat::BLOB).value(), {}, {Recording(64, odd)}),
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

TEST(ImageTest, SignalFencesStopsAtTheFirstUnsignalableBuffer) {
  auto first = Heap(2048);
  auto third = Heap(1024);
  auto image = Image::Make(Yuv420(), {}, {first, HeapWithFence(1024, nullptr), third}).value();
  EXPECT_THAT(image->SignalFences(OkStatus()),
              StatusIs(StatusCode::kFailedPrecondition, "Image Buffer Fence is not signalable"));
  EXPECT_THAT(WaitStatus(first->WaitForDone(absl::ZeroDuration())), IsOk());
  EXPECT_THAT(WaitStatus(third->WaitForDone(absl::ZeroDuration())),
              StatusIs(StatusCode::kUnavailable, "not done"));

  auto dummy =
      Image::Make(Yuv420(), {}, {HeapWithFence(2048, std::make_unique<DummyFence>()), Heap(1024)})
          .value();
  EXPECT_THAT(dummy->SignalFences(OkStatus()), StatusIs(StatusCode::kFailedPrecondition));
}

TEST(ImageTest, SignalFencesDrivesTwoStageFences) {
  auto two_stage = std::make_unique<TwoStageSoftwareFence>();
  TwoStageSoftwareFence* stage = two_stage.get();
  auto image =
      Image::Make(Yuv420(), {}, {HeapWithFence(2048, std::move(two_stage)), Heap(1024)}).value();
  // Done OK before ready-to-start is refused by the fence; its error comes
  // back unchanged.
  Status refused = image->SignalFences(OkStatus());
  EXPECT_THAT(refused, StatusIs(StatusCode::kFailedPrecondition,
                                "Two stage fence done signaled ok, but ready-to-start signal was "
                                "never received"));
  ASSERT_THAT(stage->SignalReadyToStart(OkStatus()), IsOk());
  EXPECT_THAT(image->SignalFences(OkStatus()), IsOk());
  EXPECT_THAT(WaitStatus(image->WaitForDone(absl::ZeroDuration())), IsOk());
}

TEST(ImageTest, WaitAndAbortGoThroughTheBuffersFences) {
  auto image = Image::Make(Yuv420(), {}, {Heap(2048), Heap(1024)}).value();
  EXPECT_TRUE(
      std::holds_alternative<orvex_api::FenceNotDone>(image->WaitForDone(absl::Milliseconds(1))));
  EXPECT_THAT(image->AddListener([](Status) {}), StatusIs(StatusCode::kUnimplemented));
  ASSERT_THAT(image->SignalFences(DataLossError("sensor lost")), IsOk());
  EXPECT_THAT(WaitStatus(image->WaitForDone(absl::ZeroDuration())),
              StatusIs(StatusCode::kDataLoss, "sensor lost"));

  auto aborted = Image::Make(Yuv420(), {}, {Heap(2048), HeapWithFence(1024, nullptr)}).value();
  aborted->Abort();
  EXPECT_THAT(WaitStatus(aborted->WaitForDone(absl::ZeroDuration())),
              StatusIs(StatusCode::kAborted, "Fence was aborted"));
}

TEST(MappedImageTest, MapsOnlyTheBuffersTheFormatUses) {
  auto b0 = Recording(2048);
  auto b1 = Recording(1024);
  auto b2 = Recording(512);
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
}

TEST(MappedImageTest, MappingFailureReleasesEarlierMappings) {
  auto b0 = Recording(2048);
  auto placeholder = VirtualBuffer::Make(1024, kHeapAttributes, nullptr).value();
  auto image = Image::Make(Yuv420(), {}, {b0, placeholder}).value();
  EXPECT_THAT(Image::MappedImage::Make(image.get(), BufferAccessMode::kWrite),
              StatusIs(StatusCode::kUnimplemented,
                       "VirtualBuffers are not mappable: " + placeholder->DebugStr()));
  EXPECT_THAT(b0->unmaps(), ElementsAre("0/2048/Write"));
}

TEST(MappedImageTest, PointersAndComponentLookup) {
  auto b0 = Recording(2048);
  auto b1 = Recording(1024);
  auto image = Image::Make(Yuv420(), {}, {b0, b1}).value();
  std::shared_ptr<Image::MappedImage> mapped =
      Image::MappedImage::Make(static_cast<const Image*>(image.get()), BufferAccessMode::kRead)
          .value();
  const Image::MappedImage& const_mapped = *mapped;
  // YCBCR_420_888 defaults to CrCb: Cr and Cb share buffer 1 at offset 0.
  EXPECT_EQ(mapped->GetPointer(0), b0->bytes());
  EXPECT_EQ(const_mapped.GetPointer(2), b1->bytes());
  EXPECT_EQ(mapped->GetPointer(3), nullptr);
  EXPECT_EQ(mapped->GetPointer(-1), nullptr);
  ImageFormat::Component far = image->GetFormat().components()[0];
  far.buffer_index = 2;
  EXPECT_EQ(mapped->GetPointer(far), nullptr);
  far.buffer_index = -1;
  EXPECT_EQ(const_mapped.GetPointer(far), nullptr);
  far.buffer_index = 1;
  far.offset_bytes = 1000;
  EXPECT_EQ(mapped->GetPointer(far), b1->bytes() + 1000);
  far.offset_bytes = 1025;  // beyond the mapped buffer
  EXPECT_EQ(mapped->GetPointer(far), nullptr);

  uint8_t* data = nullptr;
  auto luma = GetComponentFor(mapped.get(), Content::kLuma, &data);
  ASSERT_THAT(luma, IsOk());
  EXPECT_EQ(luma->row_stride_bytes, 64);
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

// The road of one frame: an allocator makes the image, a producer thread
// writes it and signals, a consumer thread waiting on it wakes and reads.
class RoadOfOneFrameTest : public ::testing::Test {
 protected:
  static constexpr int kWidth = 4000;
  static constexpr int kHeight = 3000;

  // Calls visit(sample, expected) for every sample of the three planes of
  // `image` mapped in `mode`; false when a plane cannot be reached.
  template <typename ImageT, typename Visit>
  static bool ForEachSample(ImageT& image, BufferAccessMode mode, Visit visit) {
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

  std::shared_ptr<Image> AllocateFrame() {
    auto format = ImageFormat::Make(kWidth, kHeight, HalPixelFormat::YCBCR_420_888);
    EXPECT_THAT(format, IsOk());
    auto allocation = allocator_.Allocate(AllocationSpec(*format, 0, FenceType::kSoftware));
    EXPECT_THAT(allocation, IsOk());
    EXPECT_THAT(allocation->buffers, ::testing::SizeIs(2));
    auto image = Image::Make(allocation->image_format.value(), {}, std::move(allocation->buffers));
    EXPECT_THAT(image, IsOk());
    return *image;
  }

  HeapAllocator allocator_;
};

TEST_F(RoadOfOneFrameTest, ConsumerReadsWhatTheProducerWrote) {
  std::shared_ptr<Image> image = AllocateFrame();
  ASSERT_NE(image, nullptr);
  EXPECT_EQ(image->GetTotalSize(), 18000000u);
  Status consumer_status = UnknownError("consumer did not run");
  int64_t mismatches = -1;
  std::thread consumer([&] {
    consumer_status = WaitStatus(image->WaitForDone(absl::InfiniteDuration()));
    if (!consumer_status.ok()) return;
    const Image& read_only = *image;
    mismatches = 0;
    EXPECT_TRUE(
        ForEachSample(read_only, BufferAccessMode::kRead,
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

TEST_F(RoadOfOneFrameTest, ConsumerReceivesTheProducersError) {
  std::shared_ptr<Image> image = AllocateFrame();
  ASSERT_NE(image, nullptr);
  Status consumer_status;
  std::thread consumer(
      [&] { consumer_status = WaitStatus(image->WaitForDone(absl::InfiniteDuration())); });
  std::thread producer(
      [&] { EXPECT_THAT(image->SignalFences(InternalError("demosaic failed")), IsOk()); });
  producer.join();
  consumer.join();
  EXPECT_THAT(consumer_status, StatusIs(StatusCode::kInternal, "demosaic failed"));
}

}  // namespace
}  // namespace orvex
