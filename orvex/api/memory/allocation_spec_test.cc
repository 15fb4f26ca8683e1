#include "orvex/api/memory/allocation_spec.h"

#include <algorithm>
#include <functional>
#include <tuple>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::IsOkAndHolds;
using ::orvex::testing::StatusIs;
using ::testing::UnorderedElementsAreArray;

// Allocate answers `result`; Flush runs `on_flush` first. Parents are not
// owned, so that tests can build cycles.
class FakeAllocator final : public Allocator {
 public:
  StatusOr<Allocation> Allocate(const AllocationSpec& spec) override {
    last_spec = spec.DebugStr() + " " + std::to_string(static_cast<int>(spec.fence_type()));
    return result;
  }
  std::vector<std::shared_ptr<Allocator>> GetParents() const override {
    std::vector<std::shared_ptr<Allocator>> shares;
    for (Allocator* parent : parents) shares.emplace_back(std::shared_ptr<void>(), parent);
    return shares;
  }
  uint64_t GetAllocatedBytes() const override { return 0; }
  void Flush() override {
    ++flushes;
    if (on_flush) on_flush();
    Allocator::Flush();
  }
  std::string DebugStr() const override { return "fake"; }

  std::vector<Allocator*> parents;
  StatusOr<Allocation> result = Allocation();
  std::string last_spec;
  int flushes = 0;
  std::function<void()> on_flush;
};

std::shared_ptr<Buffer> Heap(uint64_t size) {
  return HeapBuffer<uint8_t>::Make(size, BufferCompression::kNone, nullptr).value();
}
ImageFormat Yuv420() { return ImageFormat::Make(64, 32, HalPixelFormat::YCBCR_420_888).value(); }

TEST(AllocationSpecTest, DebugStrAndSize) {
  const std::shared_ptr<Buffer> buffer = Heap(8);
  const std::pair<std::string, std::string> cases[] = {
      {AllocationSpec(4096, 32, FenceType::kSoftware).DebugStr(),
       "{type: AllocationSpec, size: 4096, flags: 32}"},
      {AllocationSpec(Yuv420(), 4294967295u, FenceType::kDummy).DebugStr(),
       "{type: AllocationSpec, image: " + Yuv420().DebugStr() + ", flags: 4294967295}"},
      {AllocationSpec({4294967295u, -1}, FenceType::kDefault).DebugStr(),
       "{type: AllocationSpec, request_id: 4294967295, stream_id: -1}"},
      {Allocation().DebugStr(), "{type: Allocation: , buffers: {}, image_format: <n/a>}"},
      {Allocation({nullptr, buffer}, Yuv420()).DebugStr(),
       "{type: Allocation: , buffers: {<null>, " + buffer->DebugStr() +
           "}, image_format: " + Yuv420().DebugStr() + "}"},
  };
  for (const auto& [text, expected] : cases) EXPECT_EQ(text, expected);
  EXPECT_EQ(AllocationSpec(4096, 0, FenceType::kSoftware).GetSize(), 4096u);
  EXPECT_EQ(AllocationSpec(Yuv420(), 0, FenceType::kSoftware).GetSize(), std::nullopt);
}

// Each registered allocator is flushed once; one that leaves the registry
// during the flush is skipped, one that joins it is flushed from the next on.
TEST(AllocatorTest, FlushReachesRegisteredAllocatorsOnce) {
  FakeAllocator root, a, b, added;
  for (FakeAllocator* allocator : {&a, &b, &added, static_cast<FakeAllocator*>(nullptr)})
    root.RegisterAllocator(allocator);
  root.UnregisterAllocator(&added);
  root.Flush();
  EXPECT_EQ(a.flushes + b.flushes, 2);
  // Whichever is flushed first unregisters the other.
  a.on_flush = [&] { root.UnregisterAllocator(&b), root.RegisterAllocator(&added); };
  b.on_flush = [&] { root.UnregisterAllocator(&a), root.RegisterAllocator(&added); };
  root.Flush();
  EXPECT_EQ(a.flushes + b.flushes, 3);
  root.Flush();
  EXPECT_EQ(a.flushes + b.flushes, 4);
  EXPECT_EQ(added.flushes, 1);
}

// Allocators 'a' to 'z', linked by "parent>child" edges.
struct Graph {
  explicit Graph(const std::string& edges) {
    for (size_t i = 0; i + 2 < edges.size(); i += 4)
      At(edges[i + 2])->parents.push_back(At(edges[i]));
  }
  FakeAllocator* At(char name) { return &nodes[name - 'a']; }
  std::vector<const Allocator*> Of(const std::string& names) {
    std::vector<const Allocator*> out;
    for (char name : names) out.push_back(At(name));
    return out;
  }
  FakeAllocator nodes[26];
};

// The ancestry of one allocator, over cycles too; the sorted input lists each
// input allocator once, after its parents in the input, whatever the set's
// capacity (and so its iteration order).
TEST(AllocatorTest, AncestryAndTopologicalOrder) {
  // Edges, input, whether the input holds a cycle, an allocator, its ancestry.
  const std::tuple<std::string, std::string, bool, char, std::string> cases[] = {
      {"", "", false, 'a', "a"},
      {"a>b a>d b>c d>c", "abcd", false, 'c', "abcd"},
      {"a>b a>d b>c d>c o>c o>o", "acd", false, 'c', "abcdo"},  // b, o outside the input
      {"c>b c>c", "bc", true, 'b', "bc"},
      {"a>b b>a d>e a>e", "abde", true, 'e', "abde"},
  };
  for (const auto& [edges, input, cycle, from, ancestry] : cases) {
    SCOPED_TRACE(edges + " of " + input);
    Graph graph(edges);
    absl::flat_hash_set<const Allocator*> ancestors;
    GetAllocatorAncestry(graph.At(from), &ancestors);
    GetAllocatorAncestry(nullptr, &ancestors);  // adds nothing
    EXPECT_THAT(ancestors, UnorderedElementsAreArray(graph.Of(ancestry)));
    const std::vector<const Allocator*> allocators = graph.Of(input);
    for (size_t capacity : {0, 3, 7, 15, 100}) {
      absl::flat_hash_set<const Allocator*> set;
      set.reserve(capacity);
      set.insert(allocators.begin(), allocators.end());
      const auto sorted = SortAllocatorsTopologically(std::move(set));
      if (cycle) {
        EXPECT_THAT(sorted, StatusIs(StatusCode::kFailedPrecondition,
                                     "Detected allocator cycle, unable to sort topologically"));
        continue;
      }
      ASSERT_THAT(sorted, IsOkAndHolds(UnorderedElementsAreArray(allocators)));
      for (auto it = sorted->begin(); it != sorted->end(); ++it) {
        for (const auto& parent : (*it)->GetParents()) {
          EXPECT_TRUE(!std::count(allocators.begin(), allocators.end(), parent.get()) ||
                      std::count(sorted->begin(), it, parent.get()));
        }
      }
    }
  }
}

TEST(BufferAllocateTest, ReturnsTheFirstBufferOrRefuses) {
  FakeAllocator allocator;
  std::shared_ptr<Buffer> first = Heap(16);
  allocator.result = Allocation({first, Heap(32)}, Yuv420());
  uint64_t size = 16;
  auto buffer = Buffer::Allocate(&allocator, size, 5, FenceType::kTwoStageSoftware);
  ASSERT_THAT(buffer, IsOkAndHolds(first));
  allocator.result = Allocation();
  EXPECT_EQ(buffer->use_count(), 2);  // the rest of the returned allocation is gone
  EXPECT_EQ(allocator.last_spec, "{type: AllocationSpec, size: 16, flags: 5} 3");
  const std::string spec = " for {type: AllocationSpec, size: 16, flags: 0}";
  const std::pair<StatusOr<Allocation>, Status> cases[] = {
      {ResourceExhaustedError("pool empty"), ResourceExhaustedError("pool empty")},
      {Allocation(), InternalError("Allocator returned no buffers" + spec)},
      {Allocation({nullptr, first}), InternalError("Allocator returned a null buffer" + spec)},
  };
  for (const auto& [result, expected] : cases) {
    allocator.result = result;
    EXPECT_EQ(Buffer::Allocate(&allocator, size, 0, FenceType::kDummy).status(), expected);
  }
}

TEST(AllocationDeathTest, BrokenPreconditions) {
  FakeAllocator allocator, child;
  allocator.RegisterAllocator(&child);
  child.on_flush = [&] { allocator.Flush(); };
  uint64_t size = 8;
  const std::pair<std::function<void()>, const char*> cases[] = {
      {[] { AllocationSpec(0, 0, FenceType::kSoftware); },
       "Check failed: size > 0 AllocationSpec of 0 bytes"},
      {[&] {
         (void)Buffer::Allocate(static_cast<Allocator*>(nullptr), size, 0, FenceType::kDummy);
       },
       "Check failed: allocator != nullptr Buffer::Allocate needs an allocator"},
      {[&] { GetAllocatorAncestry(&allocator, nullptr); },
       "Check failed: ancestry != nullptr GetAllocatorAncestry needs a set to fill"},
      {[&] { allocator.Flush(); },
       "Check failed: !FlushScope::IsFlushing\\(this\\) Allocator::Flush re-entered on the thread "
       "that is running it"},
  };
  for (const auto& [call, text] : cases) {
    SCOPED_TRACE(text);
    EXPECT_DEATH(call(), text);
  }
}

}  // namespace
}  // namespace orvex
