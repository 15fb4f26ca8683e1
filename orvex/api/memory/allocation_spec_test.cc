#include "orvex/api/memory/allocation_spec.h"

#include <algorithm>
#include <array>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::IsOk;
using ::orvex::testing::IsOkAndHolds;
using ::orvex::testing::StatusIs;
using ::testing::UnorderedElementsAreArray;
using AllocatorSet = absl::flat_hash_set<const Allocator*>;

// Parents are held weakly, so that tests can build cycles; Allocate answers
// `result`; Flush runs `on_flush` first. Leaves `owner`'s registry when
// destroyed.
class FakeAllocator final : public Allocator {
 public:
  explicit FakeAllocator(Allocator* owner = nullptr) : owner_(owner) {
    if (owner_ != nullptr) owner_->RegisterAllocator(this);
  }
  ~FakeAllocator() override {
    if (owner_ != nullptr) owner_->UnregisterAllocator(this);
  }
  StatusOr<Allocation> Allocate(const AllocationSpec& spec) override {
    last_spec = spec.DebugStr() + " " + std::to_string(static_cast<int>(spec.fence_type()));
    return result;
  }
  std::vector<std::shared_ptr<Allocator>> GetParents() const override {
    std::vector<std::shared_ptr<Allocator>> locked;
    for (const auto& parent : parents) locked.push_back(parent.lock());
    return locked;
  }
  uint64_t GetAllocatedBytes() const override { return 0; }
  void Flush() override {
    ++flushes;
    if (on_flush) on_flush();
    Allocator::Flush();
  }
  std::string DebugStr() const override { return "fake"; }

  Allocator* owner_;
  std::vector<std::weak_ptr<Allocator>> parents;
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
  EXPECT_EQ(AllocationSpec({1, 2}, FenceType::kSoftware).GetSize(), std::nullopt);
}

// Registered allocators are flushed once each; those that leave the registry
// during the flush (unregistered, or destroyed by another one's Flush) are
// not flushed afterwards, and the flush does not deadlock.
TEST(AllocatorTest, FlushReachesRegisteredAllocatorsOnce) {
  FakeAllocator root;
  auto a = std::make_unique<FakeAllocator>(&root), b = std::make_unique<FakeAllocator>(&root);
  root.RegisterAllocator(a.get());
  root.RegisterAllocator(nullptr);
  root.Flush();
  EXPECT_EQ(a->flushes + b->flushes, 2);
  // Whichever is flushed first destroys the other.
  int flushes = 0;
  a->on_flush = [&] { ++flushes, b.reset(); };
  b->on_flush = [&] { ++flushes, a.reset(); };
  root.Flush();
  EXPECT_EQ(flushes, 1);
  FakeAllocator* left = a != nullptr ? a.get() : b.get();
  FakeAllocator added;
  left->on_flush = [&] {
    root.UnregisterAllocator(left);
    root.RegisterAllocator(&added);  // flushed from the next Flush on
  };
  root.Flush();
  root.Flush();
  EXPECT_EQ(left->flushes, 3);
  EXPECT_EQ(added.flushes, 1);
  root.UnregisterAllocator(&added);
}

// Allocators named by letters, linked by "parent>child" edges.
struct Graph {
  explicit Graph(const std::string& edges) {
    for (size_t i = 0; i + 2 < edges.size(); i += 4)
      At(edges[i + 2])->parents.push_back(At(edges[i]));
  }
  std::shared_ptr<FakeAllocator> At(char name) {
    auto& node = nodes[name];
    if (node == nullptr) node = std::make_shared<FakeAllocator>();
    return node;
  }
  std::vector<const Allocator*> Of(const std::string& names) {
    std::vector<const Allocator*> out;
    for (char name : names) out.push_back(At(name).get());
    return out;
  }
  std::map<char, std::shared_ptr<FakeAllocator>> nodes;
};

TEST(AllocatorTest, AncestryFollowsParentsAndEndsCycles) {
  for (const auto& [edges, from, expected] :
       std::vector<std::array<std::string, 3>>{{"a>b d>b b>c", "c", "abcd"},
                                               {"a>b d>b b>c", "b", "abd"},
                                               {"a>b d>b b>c c>a", "a", "abcd"},
                                               {"a>b", "", ""}}) {
    SCOPED_TRACE(edges + " from " + from);
    Graph graph(edges);
    AllocatorSet ancestry;
    GetAllocatorAncestry(from.empty() ? nullptr : graph.At(from[0]).get(), &ancestry);
    EXPECT_THAT(ancestry, UnorderedElementsAreArray(graph.Of(expected)));
  }
}

// Sorts the input inserted in every order and into sets of several
// capacities, so that the result cannot depend on one hash order: every
// input allocator once, each after its parents in the input.
TEST(AllocatorTest, TopologicalSortPlacesParentsFirstAndRejectsCycles) {
  const struct {
    std::string edges, input;
    bool cycle;
  } cases[] = {
      {"", "", false},
      {"a>b b>c", "abc", false},
      {"a>b a>d b>c d>c", "abcd", false},
      {"a>b a>d b>c d>c o>c o>o", "acd", false},  // b and o are outside the input
      {"x>z", "xy", false},
      {"c>b c>c", "bc", true},
      {"a>b b>a d>e a>e", "abde", true},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.edges + " of " + c.input);
    Graph graph(c.edges);
    std::vector<const Allocator*> input = graph.Of(c.input);
    std::sort(input.begin(), input.end());
    do {
      for (size_t capacity : {0, 7, 100}) {
        AllocatorSet set;
        set.reserve(capacity);
        set.insert(input.begin(), input.end());
        const auto sorted = SortAllocatorsTopologically(std::move(set));
        if (c.cycle) {
          EXPECT_THAT(sorted, StatusIs(StatusCode::kFailedPrecondition,
                                       "Detected allocator cycle, unable to sort topologically"));
          continue;
        }
        ASSERT_THAT(sorted, IsOkAndHolds(UnorderedElementsAreArray(input)));
        for (size_t i = 0; i < sorted->size(); ++i) {
          for (const auto& parent : (*sorted)[i]->GetParents()) {
            const auto end = sorted->begin() + static_cast<std::ptrdiff_t>(i);
            EXPECT_TRUE(!std::count(input.begin(), input.end(), parent.get()) ||
                        std::count(sorted->begin(), end, parent.get()));
          }
        }
      }
    } while (std::next_permutation(input.begin(), input.end()));
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
  FakeAllocator allocator, child(&allocator);
  child.on_flush = [&] { allocator.Flush(); };
  uint64_t zero = 0, size = 8;
  const std::pair<std::function<void()>, const char*> cases[] = {
      {[] { AllocationSpec(0, 0, FenceType::kSoftware); },
       "Check failed: size > 0 AllocationSpec of 0 bytes"},
      {[&] { (void)Buffer::Allocate(&allocator, zero, 0, FenceType::kSoftware); },
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
