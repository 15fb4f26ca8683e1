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

// A packed map of `bytes` bytes holding `words` from its start (the rest 0).
std::shared_ptr<RecordingBuffer> Packed(uint64_t bytes, const std::vector<uint32_t>& words,
                                        std::unique_ptr<Fence> fence = nullptr) {
  auto buffer =
      std::make_shared<RecordingBuffer>(bytes, BufferAttributes{}, -1, 0, std::move(fence));
  if (!words.empty()) std::memcpy(buffer->bytes(), words.data(), words.size() * 4);
  return buffer;
}

std::shared_ptr<RecordingBuffer> Output(uint64_t bytes, unsigned char fill = 0xAB) {
  auto buffer = std::make_shared<RecordingBuffer>(bytes, BufferAttributes{});
  if (bytes > 0) std::memset(buffer->bytes(), fill, bytes);
  return buffer;
}

template <typename T>
std::vector<T> Read(const Buffer::MappedHandle& handle) {
  std::vector<T> values(handle.size() / sizeof(T));
  std::memcpy(values.data(), handle.data(), values.size() * sizeof(T));
  return values;
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
    auto map = AlignmentMap::Make(c.image, Packed(static_cast<uint64_t>(bytes), {}));
    EXPECT_EQ(map->image_size, c.image);
    EXPECT_EQ(map->alignment_map_size, c.blocks);
    EXPECT_EQ(map->alignment_map_stride, c.stride);
  }
  // The largest width is rounded up without overflow. The placeholder buffer
  // has the size but no memory, so it cannot be mapped.
  auto placeholder =
      VirtualBuffer::Make(uint64_t{33554432} * 4, BufferAttributes{}, nullptr).value();
  auto wide = AlignmentMap::Make({std::numeric_limits<int>::max(), 1}, placeholder);
  EXPECT_EQ(wide->alignment_map_size.width, 33554432);
  EXPECT_EQ(wide->alignment_map_stride, 33554432);
  std::shared_ptr<Buffer> output = Output(16);
  EXPECT_THAT(
      wide->UnpackMatchingErrors(nullptr, output),
      StatusIs(StatusCode::kFailedPrecondition,
               HasSubstr("Alignment map buffer could not be mapped: {type: VirtualBuffer")));
}

// Unpacking runs the vector kernels: once per target.
class AlignmentMapVectorTest : public VectorTargetTest {};
ORVEX_INSTANTIATE_FOR_VECTOR_TARGETS(AlignmentMapVectorTest);

TEST_P(AlignmentMapVectorTest, UnpacksEveryWordIntoItsOwnBuffer) {
  // 25 words in a 100-byte map: 200 bytes of vectors, 25 of errors.
  const std::vector<uint32_t> words = {0x7FF00000, 0x80000000, 0x000FFF00, 0x000000FF,
                                       0xFFFFFFFF, 0x00100180, 0x12345678};
  auto map = AlignmentMap::Make({64, 64}, Packed(100, words));
  std::shared_ptr<Buffer> vectors = Output(200);
  auto mv = map->UnpackMotionVectors(nullptr, vectors);
  ASSERT_THAT(mv.status(), IsOk());
  EXPECT_EQ((*mv)->size(), 200u);
  EXPECT_EQ((*mv)->mode(), BufferAccessMode::kReadWrite);
  std::vector<int32_t> want_mv = {2047, 0, -2048, 0, 0, -1, 0, 0, -1, -1, 1, 1, 0x123, 0x456};
  want_mv.resize(50, 0);
  EXPECT_EQ(Read<int32_t>(**mv), want_mv);

  std::shared_ptr<Buffer> errors = Output(25);
  auto me = map->UnpackMatchingErrors(nullptr, errors);
  ASSERT_THAT(me.status(), IsOk());
  std::vector<uint8_t> want_me = {0, 0, 0, 255, 255, 0x80, 0x78};
  want_me.resize(25, 0);
  EXPECT_EQ(Read<uint8_t>(**me), want_me);
}

TEST(AlignmentMapTest, OutputSizes) {
  auto map = AlignmentMap::Make({64, 64}, Packed(100, {0x00100101}));
  const struct {
    bool vectors;
    uint64_t size;
    const char* message;  // empty: accepted
  } cases[] = {
      {true, 199, "Motion vector buffer is not big enough, need 200 given 199"},
      {true, 0, "Motion vector buffer is not big enough, need 200 given 0"},
      {false, 24, "Motion vector buffer is not big enough, need 25 given 24"},
      {true, 203, ""},
      {false, 40, ""},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(::testing::Message() << c.vectors << " " << c.size);
    auto raw = Output(c.size);
    std::shared_ptr<Buffer> output = raw;
    auto handle = c.vectors ? map->UnpackMotionVectors(nullptr, output)
                            : map->UnpackMatchingErrors(nullptr, output);
    if (*c.message != '\0') {
      EXPECT_THAT(handle.status(), StatusIs(StatusCode::kInvalidArgument, c.message));
      EXPECT_THAT(std::vector<unsigned char>(raw->bytes(), raw->bytes() + c.size),
                  ::testing::Each(0xAB));
      continue;
    }
    ASSERT_THAT(handle.status(), IsOk());
    // The values (only the first word is not 0), then zeroes up to the end.
    std::vector<unsigned char> want = {1, 0, 0, 0, static_cast<unsigned char>(c.vectors ? 1 : 0)};
    want.resize(c.size, 0);
    EXPECT_EQ(Read<unsigned char>(**handle), want);
  }
}

// Hands out what a test gives it and records the requests.
class ScriptedAllocator : public Allocator {
 public:
  explicit ScriptedAllocator(StatusOr<std::shared_ptr<Buffer>> result)
      : result_(std::move(result)) {}
  StatusOr<Allocation> Allocate(const AllocationSpec& spec) override {
    specs.push_back(spec.DebugStr());
    if (!result_.ok()) return result_.status();
    return Allocation({*result_});
  }
  uint64_t GetAllocatedBytes() const override { return 0; }
  std::string DebugStr() const override { return "{type: ScriptedAllocator}"; }

  std::vector<std::string> specs;

 private:
  StatusOr<std::shared_ptr<Buffer>> result_;
};

TEST(AlignmentMapTest, AllocatesMissingOutputs) {
  auto map = AlignmentMap::Make({64, 64}, Packed(100, {0x7FF00000, 0x000FFF80}));
  HeapAllocator heap(FenceType::kSoftware);
  std::shared_ptr<Buffer> vectors;
  std::shared_ptr<Buffer> errors;
  auto mv = map->UnpackMotionVectors(&heap, vectors);
  auto me = map->UnpackMatchingErrors(&heap, errors);
  ASSERT_THAT(mv.status(), IsOk());
  ASSERT_THAT(me.status(), IsOk());
  ASSERT_NE(vectors, nullptr);
  ASSERT_NE(errors, nullptr);
  EXPECT_EQ(vectors->GetSize(), 200u);
  EXPECT_EQ(errors->GetSize(), 25u);
  EXPECT_EQ((*mv)->buffer(), vectors);
  // Dummy fences, whatever the allocator's default kind: done at once.
  EXPECT_TRUE(std::holds_alternative<Status>(vectors->WaitForDone(absl::ZeroDuration())));
  std::vector<int32_t> want = {2047, 0, 0, -1};
  want.resize(50, 0);
  EXPECT_EQ(Read<int32_t>(**mv), want);
  EXPECT_EQ(Read<uint8_t>(**me)[1], 0x80);

  ScriptedAllocator failing(ResourceExhaustedError("pool empty"));
  std::shared_ptr<Buffer> none;
  EXPECT_THAT(map->UnpackMotionVectors(&failing, none),
              StatusIs(StatusCode::kResourceExhausted,
                       "pool empty; Error allocating image for motion vectors."));
  EXPECT_THAT(map->UnpackMatchingErrors(&failing, none),
              StatusIs(StatusCode::kResourceExhausted,
                       "pool empty; Error allocating image for matching errors."));
  EXPECT_EQ(none, nullptr);
  EXPECT_THAT(failing.specs, ::testing::ElementsAre("{type: AllocationSpec, size: 200, flags: 32}",
                                                    "{type: AllocationSpec, size: 25, flags: 32}"));

  // A buffer that a later step refuses stays with the caller; one smaller
  // than asked for is never written.
  ScriptedAllocator placeholder(
      std::shared_ptr<Buffer>(VirtualBuffer::Make(200, BufferAttributes{}, nullptr).value()));
  EXPECT_THAT(map->UnpackMotionVectors(&placeholder, none),
              StatusIs(StatusCode::kUnimplemented, HasSubstr("VirtualBuffers are not mappable")));
  EXPECT_NE(none, nullptr);
  ScriptedAllocator short_buffer(std::shared_ptr<Buffer>(Output(24)));
  std::shared_ptr<Buffer> small;
  EXPECT_THAT(map->UnpackMatchingErrors(&short_buffer, small),
              StatusIs(StatusCode::kInvalidArgument,
                       "Motion vector buffer is not big enough, need 25 given 24"));
}

TEST(AlignmentMapTest, ErrorsOfTheOutput) {
  auto map = AlignmentMap::Make({64, 64}, Packed(32, {}));
  std::shared_ptr<Buffer> none;
  EXPECT_THAT(map->UnpackMotionVectors(nullptr, none),
              StatusIs(StatusCode::kInvalidArgument, "No allocator for the unpacked output"));
  EXPECT_EQ(none, nullptr);
  HeapAllocator heap;
  auto empty = AlignmentMap::Make({0, 0}, Packed(0, {}));
  EXPECT_THAT(
      empty->UnpackMotionVectors(&heap, none),
      StatusIs(StatusCode::kInvalidArgument, "Nothing to unpack: the alignment map is empty"));
  // A mapping failure of the output comes back unchanged.
  std::shared_ptr<Buffer> placeholder =
      VirtualBuffer::Make(64, BufferAttributes{}, nullptr).value();
  EXPECT_THAT(map->UnpackMotionVectors(nullptr, placeholder),
              StatusIs(StatusCode::kUnimplemented, HasSubstr("VirtualBuffers are not mappable: ")));
}

// Unpacks both contents of `map` into the given outputs and returns the
// output bytes, vectors then errors.
std::pair<std::vector<unsigned char>, std::vector<unsigned char>> UnpackBoth(
    const AlignmentMap& map, std::shared_ptr<Buffer> vectors, std::shared_ptr<Buffer> errors) {
  auto mv = map.UnpackMotionVectors(nullptr, vectors);
  auto me = map.UnpackMatchingErrors(nullptr, errors);
  EXPECT_THAT(mv.status(), IsOk());
  EXPECT_THAT(me.status(), IsOk());
  if (!mv.ok() || !me.ok()) return {};
  return {Read<unsigned char>(**mv), Read<unsigned char>(**me)};
}

TEST_P(AlignmentMapVectorTest, MisalignedStorageMatchesAlignedResults) {
  // More words than one staging chunk, with every kind of field value.
  std::mt19937 rng(17);
  std::vector<uint32_t> words(3000);
  for (auto& w : words) w = static_cast<uint32_t>(rng());
  words[0] = 0x80080080;
  words[2999] = 0x7FF7FF7F;
  const uint64_t bytes = words.size() * 4;
  auto map = AlignmentMap::Make({64 * 8, 64 * 375}, Packed(bytes, words));
  const auto want = UnpackBoth(*map, Output(bytes * 2), Output(bytes / 4));
  ASSERT_EQ(want.first.size(), bytes * 2);
  // The aligned result itself matches a per-word decoding.
  std::vector<int32_t> vectors(words.size() * 2);
  std::memcpy(vectors.data(), want.first.data(), want.first.size());
  for (size_t i = 0; i < words.size(); ++i) {
    const auto sign_extend = [](uint32_t field) {
      return static_cast<int32_t>(field) - ((field & 0x800u) != 0 ? 4096 : 0);
    };
    ASSERT_EQ(vectors[2 * i], sign_extend(words[i] >> 20)) << i;
    ASSERT_EQ(vectors[2 * i + 1], sign_extend((words[i] >> 8) & 0xFFFu)) << i;
    ASSERT_EQ(want.second[i], words[i] & 0xFFu) << i;
  }

  // Views one byte into their sources start off every natural alignment.
  EXPECT_EQ(UnpackBoth(*map, SpanBuffer::Make(Output(bytes * 2 + 1), 1, bytes * 2, nullptr).value(),
                       SpanBuffer::Make(Output(bytes / 4 + 1), 1, bytes / 4, nullptr).value()),
            want);

  // A packed map that starts off alignment unpacks the same.
  auto odd_source = Output(bytes + 2);
  std::memcpy(odd_source->bytes() + 2, words.data(), bytes);
  auto odd_map = AlignmentMap::Make({64 * 8, 64 * 375},
                                    SpanBuffer::Make(odd_source, 2, bytes, nullptr).value());
  EXPECT_EQ(UnpackBoth(*odd_map, Output(bytes * 2), Output(bytes / 4)), want);
}

TEST(AlignmentMapTest, WaitsOnThePackedBufferAndUnmapsFirst) {
  auto fence = std::make_unique<SoftwareFence>();
  SoftwareFence* raw_fence = fence.get();
  auto packed = Packed(32, {}, std::move(fence));
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

TEST(AlignmentMapTest, ConcurrentUnpacks) {
  std::vector<uint32_t> words(4096);
  for (size_t i = 0; i < words.size(); ++i) words[i] = static_cast<uint32_t>(i * 2654435761u);
  auto map = AlignmentMap::Make({64 * 64, 64 * 64}, Packed(words.size() * 4, words));
  std::vector<std::shared_ptr<Buffer>> outputs(4);
  std::vector<Status> results(4);
  std::vector<std::thread> threads;
  for (size_t t = 0; t < outputs.size(); ++t) {
    threads.emplace_back([&, t] {
      outputs[t] = Output(t % 2 == 0 ? words.size() * 8 : words.size());
      results[t] = (t % 2 == 0 ? map->UnpackMotionVectors(nullptr, outputs[t])
                               : map->UnpackMatchingErrors(nullptr, outputs[t]))
                       .status();
    });
  }
  for (auto& thread : threads) thread.join();
  for (const Status& status : results) EXPECT_THAT(status, IsOk());
  auto* errors = static_cast<RecordingBuffer*>(outputs[1].get())->bytes();
  for (size_t i = 0; i < words.size(); ++i) ASSERT_EQ(errors[i], static_cast<uint8_t>(words[i]));
}

TEST(AlignmentMapDeathTest, PackedBufferContract) {
  EXPECT_DEATH(AlignmentMap::Make({64, 64}, nullptr),
               "alignment_map.*\\] Check failed: buffer_ != nullptr ");
  EXPECT_DEATH(AlignmentMap::Make({4032, 3024}, Packed(12287, {})),
               "Check failed: buffer_->GetSize\\(\\) >= alignment_map_stride \\* "
               "kAlignMapBytesPerPixel \\* alignment_map_size.height "
               "\\(buffer_->GetSize\\(\\)=12287, alignment_map_stride \\* kAlignMapBytesPerPixel "
               "\\* alignment_map_size.height=12288\\) ");
}

}  // namespace
}  // namespace orvex
