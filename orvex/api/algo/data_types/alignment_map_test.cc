#include "orvex/api/algo/data_types/alignment_map.h"

#include <cstring>
#include <limits>
#include <random>
#include <thread>
#include <vector>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/memory/allocation_spec.h"
#include "orvex/api/memory/buffer_testing.h"
#include "orvex/api/memory/buffer_views.h"
#include "orvex/api/memory/heap_allocator.h"
#include "orvex/api/memory/hw_buffer.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::IsOk;
using ::orvex::testing::StatusIs;
using ::testing::HasSubstr;
using ::testing::Return;

// A buffer of `bytes` bytes holding `words` from its start, the rest `fill`.
std::shared_ptr<testing::RecordingBuffer> Filled(uint64_t bytes,
                                                 const std::vector<uint32_t>& words = {},
                                                 unsigned char fill = 0,
                                                 std::unique_ptr<Fence> fence = nullptr) {
  auto buffer = std::make_shared<testing::RecordingBuffer>(bytes, BufferAttributes{}, -1, 0,
                                                           std::move(fence));
  if (bytes > 0) std::memset(buffer->bytes(), fill, bytes);
  if (!words.empty()) std::memcpy(buffer->bytes(), words.data(), words.size() * 4);
  return buffer;
}

std::vector<unsigned char> Read(const Buffer::MappedHandle& handle) {
  const auto* data = static_cast<const unsigned char*>(handle.data());
  return {data, data + handle.size()};
}

// Has the size but no memory: cannot be mapped.
std::shared_ptr<Buffer> Placeholder(uint64_t bytes) {
  return VirtualBuffer::Make(bytes, BufferAttributes{}, nullptr).value();
}

// Blocks and stride; the map waits on the packed buffer's fence.
TEST(AlignmentMapTest, GeometryFenceAndLifetime) {
  // clang-format off
  const struct { GenericSize<int> image, blocks; int32_t stride; } cases[] = {
      {{4032, 3024}, {63, 48}, 64}, {{1, 1}, {1, 1}, 8}, {{64, 64}, {1, 1}, 8},
      {{65, 129}, {2, 3}, 8}, {{2048, 1}, {32, 1}, 32}, {{2049, 1}, {33, 1}, 40},
      {{0, 0}, {0, 0}, 0}};
  // clang-format on
  for (const auto& c : cases) {
    SCOPED_TRACE(::testing::Message() << c.image);
    const uint64_t bytes = uint64_t{4} * c.stride * c.blocks.height;
    auto packed =
        Filled(bytes, {}, 0, std::make_unique<testing::RecordingFence>(DataLossError("failed")));
    auto map = AlignmentMap::Make(c.image, packed);
    EXPECT_EQ(map->image_size, c.image);
    EXPECT_EQ(map->alignment_map_size, c.blocks);
    EXPECT_EQ(map->alignment_map_stride, c.stride);
    EXPECT_THAT(testing::WaitStatus(map->WaitForDone(absl::ZeroDuration())),
                StatusIs(StatusCode::kDataLoss, "failed"));
  }
  // The largest width rounds up without overflow; an unmappable map is refused.
  auto wide = AlignmentMap::Make({std::numeric_limits<int>::max(), 1}, Placeholder(134217728));
  EXPECT_EQ(wide->alignment_map_size.width, 33554432);
  EXPECT_EQ(wide->alignment_map_stride, 33554432);
  std::shared_ptr<Buffer> output = Filled(16);
  EXPECT_THAT(
      wide->UnpackMatchingErrors(nullptr, output),
      StatusIs(StatusCode::kFailedPrecondition,
               HasSubstr("Alignment map buffer could not be mapped: {type: VirtualBuffer")));
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

// Given or allocated outputs: refused ones stay with the caller, accepted ones get the values.
TEST(AlignmentMapTest, Outputs) {
  // 25 words in a 100-byte map: 200 bytes of vectors, 25 of errors.
  auto map = AlignmentMap::Make({64, 64}, Filled(100, {0x00100101}));
  MockAllocator mock;
  EXPECT_CALL(mock, Allocate(SpecIs("{type: AllocationSpec, size: 200, flags: 32}")))
      .WillOnce(Return(ResourceExhaustedError("pool empty")))
      .WillOnce(Return(Allocation({Placeholder(200)})));
  EXPECT_CALL(mock, Allocate(SpecIs("{type: AllocationSpec, size: 25, flags: 32}")))
      .WillOnce(Return(ResourceExhaustedError("pool empty")));
  HeapAllocator heap(FenceType::kSoftware);
  const std::string small = "Motion vector buffer is not big enough, need ";
  const std::string failed = "pool empty; Error allocating image for ";
  // clang-format off
  const struct { bool vectors; std::shared_ptr<Buffer> output; Allocator* allocator; Status error; }
  cases[] = {
      {true, Filled(199, {}, 0xAB), nullptr, InvalidArgumentError(small + "200 given 199")},
      {false, Filled(24, {}, 0xAB), nullptr, InvalidArgumentError(small + "25 given 24")},
      {true, nullptr, nullptr, InvalidArgumentError("No allocator for the unpacked output")},
      {true, nullptr, &mock, ResourceExhaustedError(failed + "motion vectors.")},
      {false, nullptr, &mock, ResourceExhaustedError(failed + "matching errors.")},
      {true, nullptr, &mock, UnimplementedError("")}, {true, Placeholder(200), nullptr,
      UnimplementedError("")}, {true, Filled(203, {}, 0xAB), nullptr, OkStatus()},
      {false, Filled(25, {}, 0xAB), nullptr, OkStatus()}, {true, nullptr, &heap, OkStatus()}};
  // clang-format on
  for (auto c : cases) {
    SCOPED_TRACE(::testing::Message() << c.vectors << " " << c.error);
    auto handle = c.vectors ? map->UnpackMotionVectors(c.allocator, c.output)
                            : map->UnpackMatchingErrors(c.allocator, c.output);
    EXPECT_EQ(c.output == nullptr, c.error.code() == StatusCode::kResourceExhausted ||
                                       c.error.message().starts_with("No allocator"));
    if (!c.error.ok()) {
      EXPECT_THAT(handle, StatusIs(c.error.code(), HasSubstr(c.error.message())));
      continue;
    }
    ASSERT_THAT(handle, IsOk());
    std::vector<unsigned char> want = {1, 0, 0, 0, static_cast<unsigned char>(c.vectors ? 1 : 0)};
    want.resize(c.output->GetSize(), 0);
    EXPECT_EQ(Read(**handle), want);
    EXPECT_TRUE(testing::IsDone(*c.output));
  }
  // A refused output is never written.
  EXPECT_THAT(Read(*cases[0].output->Map(0, 199, BufferAccessMode::kRead).value()),
              ::testing::Each(0xAB));
  std::shared_ptr<Buffer> none;
  EXPECT_THAT(
      AlignmentMap::Make({0, 0}, Filled(0))->UnpackMotionVectors(&heap, none),
      StatusIs(StatusCode::kInvalidArgument, "Nothing to unpack: the alignment map is empty"));
}

// The bytes of both contents of `map`, unpacked into the given outputs.
std::pair<std::vector<unsigned char>, std::vector<unsigned char>> UnpackBoth(
    const AlignmentMap& map, std::shared_ptr<Buffer> vectors, std::shared_ptr<Buffer> errors) {
  auto mv = map.UnpackMotionVectors(nullptr, vectors);
  auto me = map.UnpackMatchingErrors(nullptr, errors);
  EXPECT_THAT(mv, IsOk());
  EXPECT_THAT(me, IsOk());
  if (!mv.ok() || !me.ok()) return {};
  return {Read(**mv), Read(**me)};
}

// More words than one staging chunk, the same wherever storage starts, unpacked at once.
TEST(AlignmentMapTest, UnpacksEveryWordWhereverItsStorageStarts) {
  std::vector<uint32_t> words;
  std::mt19937 rng(17);
  while (words.size() < 3000) words.push_back(static_cast<uint32_t>(rng()));
  const uint64_t bytes = words.size() * 4;
  auto map = AlignmentMap::Make({64 * 8, 64 * 375}, Filled(bytes, words));
  const auto want = UnpackBoth(*map, Filled(bytes * 2), Filled(bytes / 4));
  ASSERT_EQ(want.first.size(), bytes * 2);
  EXPECT_EQ(UnpackBoth(*map, SpanBuffer::Make(Filled(bytes * 2 + 1), 1, bytes * 2, nullptr).value(),
                       SpanBuffer::Make(Filled(bytes / 4 + 1), 1, bytes / 4, nullptr).value()),
            want);
  auto odd_source = Filled(bytes + 2);
  std::memcpy(odd_source->bytes() + 2, words.data(), bytes);
  auto odd_map = AlignmentMap::Make({64 * 8, 64 * 375},
                                    SpanBuffer::Make(odd_source, 2, bytes, nullptr).value());
  std::vector<std::thread> threads;
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([&, t] {
      EXPECT_EQ(UnpackBoth(t % 2 ? *odd_map : *map, Filled(bytes * 2), Filled(bytes / 4)), want);
    });
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
