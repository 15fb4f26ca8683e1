#include "orvex/api/algo/data_types/alignment_map.h"

#include <cstring>
#include <limits>
#include <random>
#include <thread>
#include <vector>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/algo/data_types/vector_targets_testing.h"
#include "orvex/api/memory/allocation_spec.h"
#include "orvex/api/memory/buffer_testing.h"
#include "orvex/api/memory/buffer_views.h"
#include "orvex/api/memory/heap_allocator.h"
#include "orvex/api/memory/hw_buffer.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::IsOk;
using ::orvex::testing::RecordingBuffer;
using ::orvex::testing::StatusIs;
using ::testing::HasSubstr;

// A buffer of `bytes` bytes holding `words` from its start, the rest `fill`.
std::shared_ptr<RecordingBuffer> Filled(uint64_t bytes, const std::vector<uint32_t>& words = {},
                                        unsigned char fill = 0,
                                        std::unique_ptr<Fence> fence = nullptr) {
  auto buffer =
      std::make_shared<RecordingBuffer>(bytes, BufferAttributes{}, -1, 0, std::move(fence));
  if (bytes > 0) std::memset(buffer->bytes(), fill, bytes);
  if (!words.empty()) std::memcpy(buffer->bytes(), words.data(), words.size() * 4);
  return buffer;
}

template <typename T>
std::vector<T> Read(const Buffer::MappedHandle& handle) {
  std::vector<T> values(handle.size() / sizeof(T));
  std::memcpy(values.data(), handle.data(), values.size() * sizeof(T));
  return values;
}

std::shared_ptr<Buffer> Placeholder(uint64_t bytes) {
  return VirtualBuffer::Make(bytes, BufferAttributes{}, nullptr).value();
}

TEST(AlignmentMapTest, Geometry) {
  const struct {
    GenericSize<int> image;
    GenericSize<int> blocks;
    int32_t stride;
  } cases[] = {{{4032, 3024}, {63, 48}, 64}, {{1, 1}, {1, 1}, 8},      {{64, 64}, {1, 1}, 8},
               {{65, 129}, {2, 3}, 8},       {{2048, 1}, {32, 1}, 32}, {{2049, 1}, {33, 1}, 40},
               {{0, 0}, {0, 0}, 0}};
  for (const auto& c : cases) {
    SCOPED_TRACE(::testing::Message() << c.image);
    const int64_t bytes = int64_t{c.stride} * 4 * c.blocks.height;
    auto map = AlignmentMap::Make(c.image, Filled(static_cast<uint64_t>(bytes)));
    EXPECT_EQ(map->image_size, c.image);
    EXPECT_EQ(map->alignment_map_size, c.blocks);
    EXPECT_EQ(map->alignment_map_stride, c.stride);
  }
  // The largest width is rounded up without overflow. The placeholder has
  // the size but no memory, so it cannot be mapped.
  auto wide = AlignmentMap::Make({std::numeric_limits<int>::max(), 1}, Placeholder(134217728));
  EXPECT_EQ(wide->alignment_map_size.width, 33554432);
  EXPECT_EQ(wide->alignment_map_stride, 33554432);
  std::shared_ptr<Buffer> output = Filled(16);
  EXPECT_THAT(
      wide->UnpackMatchingErrors(nullptr, output),
      StatusIs(StatusCode::kFailedPrecondition,
               HasSubstr("Alignment map buffer could not be mapped: {type: VirtualBuffer")));
}

TEST(AlignmentMapTest, Outputs) {
  // 25 words in a 100-byte map: 200 bytes of vectors, 25 of errors.
  auto map = AlignmentMap::Make({64, 64}, Filled(100, {0x00100101}));
  const std::string too_small = "Motion vector buffer is not big enough, need ";
  const struct {
    bool vectors;
    std::shared_ptr<Buffer> output;
    Status error;  // OK: accepted
  } cases[] = {
      {true, Filled(199, {}, 0xAB), InvalidArgumentError(too_small + "200 given 199")},
      {false, Filled(24, {}, 0xAB), InvalidArgumentError(too_small + "25 given 24")},
      {true, nullptr, InvalidArgumentError("No allocator for the unpacked output")},
      {true, Placeholder(200), UnimplementedError("VirtualBuffers are not mappable")},
      {true, Filled(203, {}, 0xAB), OkStatus()},
      {false, Filled(25, {}, 0xAB), OkStatus()},
  };
  for (auto c : cases) {
    SCOPED_TRACE(::testing::Message() << c.vectors << " " << c.error);
    const std::shared_ptr<Buffer> given = c.output;
    auto handle = c.vectors ? map->UnpackMotionVectors(nullptr, c.output)
                            : map->UnpackMatchingErrors(nullptr, c.output);
    EXPECT_EQ(c.output, given);
    if (!c.error.ok()) {
      EXPECT_THAT(handle, StatusIs(c.error.code(), HasSubstr(c.error.message())));
      continue;
    }
    ASSERT_THAT(handle, IsOk());
    // The values (only the first word is not 0), then zeroes up to the end.
    std::vector<unsigned char> want = {1, 0, 0, 0, static_cast<unsigned char>(c.vectors ? 1 : 0)};
    want.resize(given->GetSize(), 0);
    EXPECT_EQ(Read<unsigned char>(**handle), want);
  }
  // A refused output is never written.
  EXPECT_THAT(Read<unsigned char>(*cases[0].output->Map(0, 199, BufferAccessMode::kRead).value()),
              ::testing::Each(0xAB));
}

class MockAllocator : public Allocator {
 public:
  MOCK_METHOD(StatusOr<Allocation>, Allocate, (const AllocationSpec&), (override));
  MOCK_METHOD(uint64_t, GetAllocatedBytes, (), (const, override));
  MOCK_METHOD(std::string, DebugStr, (), (const, override));
};

auto SpecIs(const std::string& text) {
  return ::testing::ResultOf([](const AllocationSpec& spec) { return spec.DebugStr(); }, text);
}

TEST(AlignmentMapTest, AllocatesMissingOutputs) {
  auto map = AlignmentMap::Make({64, 64}, Filled(100, {0x7FF00000, 0x000FFF80}));
  // Exactly the size needed, with a dummy fence whatever the allocator's
  // default kind: done at once.
  HeapAllocator heap(FenceType::kSoftware);
  std::shared_ptr<Buffer> vectors;
  auto mv = map->UnpackMotionVectors(&heap, vectors);
  ASSERT_THAT(mv, IsOk());
  EXPECT_EQ((*mv)->buffer(), vectors);
  EXPECT_TRUE(std::holds_alternative<Status>(vectors->WaitForDone(absl::ZeroDuration())));
  std::vector<int32_t> want = {2047, 0, 0, -1};
  want.resize(50, 0);
  EXPECT_EQ(Read<int32_t>(**mv), want);

  MockAllocator mock;
  EXPECT_CALL(mock, Allocate(SpecIs("{type: AllocationSpec, size: 200, flags: 32}")))
      .WillOnce(::testing::Return(ResourceExhaustedError("pool empty")))
      .WillOnce(::testing::Return(Allocation({Placeholder(200)})));
  EXPECT_CALL(mock, Allocate(SpecIs("{type: AllocationSpec, size: 25, flags: 32}")))
      .WillOnce(::testing::Return(ResourceExhaustedError("pool empty")))
      .WillOnce(::testing::Return(Allocation({Filled(25)})));
  std::shared_ptr<Buffer> none;
  EXPECT_THAT(map->UnpackMotionVectors(&mock, none),
              StatusIs(StatusCode::kResourceExhausted,
                       "pool empty; Error allocating image for motion vectors."));
  EXPECT_THAT(map->UnpackMatchingErrors(&mock, none),
              StatusIs(StatusCode::kResourceExhausted,
                       "pool empty; Error allocating image for matching errors."));
  EXPECT_EQ(none, nullptr);
  // A buffer that a later step refuses stays with the caller.
  EXPECT_THAT(map->UnpackMotionVectors(&mock, none), StatusIs(StatusCode::kUnimplemented));
  EXPECT_NE(none, nullptr);
  std::shared_ptr<Buffer> errors;
  auto me = map->UnpackMatchingErrors(&mock, errors);
  ASSERT_THAT(me, IsOk());
  EXPECT_EQ(Read<uint8_t>(**me)[1], 0x80);

  EXPECT_THAT(
      AlignmentMap::Make({0, 0}, Filled(0))->UnpackMotionVectors(&heap, none = nullptr),
      StatusIs(StatusCode::kInvalidArgument, "Nothing to unpack: the alignment map is empty"));
}

// Unpacks both contents of `map` into the given outputs and returns the
// output bytes, vectors then errors.
std::pair<std::vector<unsigned char>, std::vector<unsigned char>> UnpackBoth(
    const AlignmentMap& map, std::shared_ptr<Buffer> vectors, std::shared_ptr<Buffer> errors) {
  auto mv = map.UnpackMotionVectors(nullptr, vectors);
  auto me = map.UnpackMatchingErrors(nullptr, errors);
  EXPECT_THAT(mv, IsOk());
  EXPECT_THAT(me, IsOk());
  if (!mv.ok() || !me.ok()) return {};
  return {Read<unsigned char>(**mv), Read<unsigned char>(**me)};
}

// Unpacking runs the vector kernels: once per target.
class AlignmentMapVectorTest : public VectorTargetTest {};
ORVEX_INSTANTIATE_FOR_VECTOR_TARGETS(AlignmentMapVectorTest);

TEST_P(AlignmentMapVectorTest, UnpacksEveryWordWhereverItsStorageStarts) {
  // More words than one staging chunk: field limits first, then random ones.
  std::vector<uint32_t> words = {0x7FF00000, 0x80000000, 0x000FFF00, 0x000000FF,
                                 0xFFFFFFFF, 0x00100180, 0x12345678};
  std::mt19937 rng(17);
  while (words.size() < 3000) words.push_back(static_cast<uint32_t>(rng()));
  const uint64_t bytes = words.size() * 4;
  auto map = AlignmentMap::Make({64 * 8, 64 * 375}, Filled(bytes, words));
  const auto want = UnpackBoth(*map, Filled(bytes * 2), Filled(bytes / 4));
  ASSERT_EQ(want.first.size(), bytes * 2);
  std::vector<int32_t> vectors(words.size() * 2);
  std::memcpy(vectors.data(), want.first.data(), want.first.size());
  EXPECT_THAT(std::vector<int32_t>(vectors.begin(), vectors.begin() + 14),
              ::testing::ElementsAre(2047, 0, -2048, 0, 0, -1, 0, 0, -1, -1, 1, 1, 0x123, 0x456));
  EXPECT_THAT(std::vector<uint8_t>(want.second.begin(), want.second.begin() + 7),
              ::testing::ElementsAre(0, 0, 0, 255, 255, 0x80, 0x78));
  // Views one byte into their sources start off every natural alignment.
  EXPECT_EQ(UnpackBoth(*map, SpanBuffer::Make(Filled(bytes * 2 + 1), 1, bytes * 2, nullptr).value(),
                       SpanBuffer::Make(Filled(bytes / 4 + 1), 1, bytes / 4, nullptr).value()),
            want);
  // A packed map that starts off alignment unpacks the same.
  auto odd_source = Filled(bytes + 2);
  std::memcpy(odd_source->bytes() + 2, words.data(), bytes);
  auto odd_map = AlignmentMap::Make({64 * 8, 64 * 375},
                                    SpanBuffer::Make(odd_source, 2, bytes, nullptr).value());
  EXPECT_EQ(UnpackBoth(*odd_map, Filled(bytes * 2), Filled(bytes / 4)), want);
}

TEST(AlignmentMapTest, WaitsOnThePackedBufferAndUnmapsFirst) {
  auto fence = std::make_unique<SoftwareFence>();
  SoftwareFence* raw_fence = fence.get();
  auto packed = Filled(32, {}, 0, std::move(fence));
  auto map = AlignmentMap::Make({1, 1}, packed);
  EXPECT_TRUE(
      std::holds_alternative<orvex_api::FenceNotDone>(map->WaitForDone(absl::ZeroDuration())));
  raw_fence->Signal(InternalError("producer failed"));
  const FenceWaitResult done = map->WaitForDone(absl::ZeroDuration());
  ASSERT_TRUE(std::holds_alternative<Status>(done));
  EXPECT_THAT(std::get<Status>(done), StatusIs(StatusCode::kInternal, "producer failed"));
  EXPECT_TRUE(packed->unmaps().empty());
  map.reset();
  EXPECT_THAT(packed->unmaps(), ::testing::ElementsAre("0/32/ReadWrite"));
}

// Both unpacks only read the packed map: any number may run at once.
TEST(AlignmentMapTest, ConcurrentUnpacks) {
  std::vector<uint32_t> words(4096);
  for (size_t i = 0; i < words.size(); ++i) words[i] = static_cast<uint32_t>(i * 2654435761u);
  auto map = AlignmentMap::Make({64 * 64, 64 * 64}, Filled(words.size() * 4, words));
  const auto want = UnpackBoth(*map, Filled(words.size() * 8), Filled(words.size()));
  std::vector<std::thread> threads;
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back(
        [&] { EXPECT_EQ(UnpackBoth(*map, Filled(words.size() * 8), Filled(words.size())), want); });
  }
  for (auto& thread : threads) thread.join();
}

TEST(AlignmentMapDeathTest, PackedBufferContract) {
  EXPECT_DEATH(AlignmentMap::Make({64, 64}, nullptr),
               "alignment_map.*\\] Check failed: buffer_ != nullptr ");
  EXPECT_DEATH(AlignmentMap::Make({4032, 3024}, Filled(12287)),
               "Check failed: buffer_->GetSize\\(\\) >= alignment_map_stride \\* "
               "kAlignMapBytesPerPixel \\* alignment_map_size.height "
               "\\(buffer_->GetSize\\(\\)=12287, alignment_map_stride \\* kAlignMapBytesPerPixel "
               "\\* alignment_map_size.height=12288\\) ");
}

}  // namespace
}  // namespace orvex
