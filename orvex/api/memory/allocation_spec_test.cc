#include "orvex/api/memory/allocation_spec.h"

#include <algorithm>
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
using ::testing::ElementsAre;
using ::testing::UnorderedElementsAre;
using AllocatorSet = absl::flat_hash_set<const Allocator*>;

// An allocator whose parents are held weakly, so that tests can build
// cycles, and whose Allocate answers with a preset result.
class FakeAllocator final : public Allocator {
 public:
  explicit FakeAllocator(std::string name) : name_(std::move(name)) {}

  StatusOr<Allocation> Allocate(const AllocationSpec& spec) override {
    last_spec_ = spec.DebugStr();
    last_fence_type_ = spec.fence_type();
    return result_;
  }
  std::vector<std::shared_ptr<Allocator>> GetParents() const override {
    std::vector<std::shared_ptr<Allocator>> parents;
    for (const std::weak_ptr<Allocator>& parent : parents_) parents.push_back(parent.lock());
    return parents;
  }
  uint64_t GetAllocatedBytes() const override { return 0; }
  void Flush() override {
    ++flushes_;
    Allocator::Flush();
  }
  std::string DebugStr() const override { return name_; }

  void AddParent(const std::shared_ptr<Allocator>& parent) { parents_.push_back(parent); }

  StatusOr<Allocation> result_ = Allocation();
  std::string last_spec_;
  FenceType last_fence_type_ = FenceType::kDefault;
  int flushes_ = 0;

 private:
  std::string name_;
  std::vector<std::weak_ptr<Allocator>> parents_;
};

std::shared_ptr<Buffer> Heap(uint64_t size) {
  return HeapBuffer<uint8_t>::Make(size, BufferCompression::kNone, nullptr).value();
}

ImageFormat Yuv420() { return ImageFormat::Make(64, 32, HalPixelFormat::YCBCR_420_888).value(); }

TEST(AllocationSpecTest, DebugStrAndSize) {
  const AllocationSpec by_size(4096, 32, FenceType::kSoftware);
  EXPECT_EQ(by_size.DebugStr(), "{type: AllocationSpec, size: 4096, flags: 32}");
  EXPECT_EQ(by_size.GetSize(), 4096u);
  EXPECT_EQ(by_size.fence_type(), FenceType::kSoftware);

  const AllocationSpec by_image(Yuv420(), 4294967295u, FenceType::kDummy);
  EXPECT_EQ(by_image.DebugStr(),
            "{type: AllocationSpec, image: " + Yuv420().DebugStr() + ", flags: 4294967295}");
  EXPECT_EQ(by_image.GetSize(), std::nullopt);

  const AllocationSpec by_request(AllocationSpec::ByRequest{4294967295u, -1},
                                  FenceType::kTwoStageSoftware);
  EXPECT_EQ(by_request.DebugStr(), "{type: AllocationSpec, request_id: 4294967295, stream_id: -1}");
  EXPECT_EQ(by_request.GetSize(), std::nullopt);
  EXPECT_EQ(by_request.request().index(), 2u);
}

TEST(AllocationSpecTest, AllocationDebugStr) {
  EXPECT_EQ(Allocation().DebugStr(), "{type: Allocation: , buffers: {}, image_format: <n/a>}");
  std::shared_ptr<Buffer> buffer = Heap(8);
  EXPECT_EQ(Allocation({nullptr, buffer}, Yuv420()).DebugStr(),
            "{type: Allocation: , buffers: {<null>, " + buffer->DebugStr() +
                "}, image_format: " + Yuv420().DebugStr() + "}");
}

TEST(AllocatorTest, FlushReachesRegisteredAllocatorsOnce) {
  FakeAllocator root("root"), a("a"), b("b");
  root.RegisterAllocator(&a);
  root.RegisterAllocator(&b);
  root.RegisterAllocator(&a);
  root.RegisterAllocator(nullptr);
  root.Flush();
  EXPECT_EQ(a.flushes_, 1);
  EXPECT_EQ(b.flushes_, 1);
  root.UnregisterAllocator(&a);
  root.UnregisterAllocator(&a);
  root.Flush();
  EXPECT_EQ(a.flushes_, 1);
  EXPECT_EQ(b.flushes_, 2);
}

TEST(AllocatorTest, AncestryFollowsParentsAndEndsCycles) {
  auto a = std::make_shared<FakeAllocator>("a");
  auto b = std::make_shared<FakeAllocator>("b");
  auto c = std::make_shared<FakeAllocator>("c");
  auto d = std::make_shared<FakeAllocator>("d");
  c->AddParent(b);
  b->AddParent(a);
  b->AddParent(d);
  AllocatorSet ancestry;
  GetAllocatorAncestry(c.get(), &ancestry);
  EXPECT_THAT(ancestry, UnorderedElementsAre(a.get(), b.get(), c.get(), d.get()));
  ancestry.clear();
  GetAllocatorAncestry(b.get(), &ancestry);
  EXPECT_THAT(ancestry, UnorderedElementsAre(a.get(), b.get(), d.get()));

  a->AddParent(c);  // a -> c -> b -> a
  ancestry = {d.get()};
  GetAllocatorAncestry(a.get(), &ancestry);
  EXPECT_THAT(ancestry, UnorderedElementsAre(a.get(), b.get(), c.get(), d.get()));
  GetAllocatorAncestry(nullptr, &ancestry);
  EXPECT_EQ(ancestry.size(), 4u);
}

// Sorts `input` after inserting it in every order and into sets of several
// capacities, so that the result cannot depend on one hash order.
std::vector<StatusOr<std::vector<const Allocator*>>> SortInManyOrders(
    std::vector<const Allocator*> input) {
  std::vector<StatusOr<std::vector<const Allocator*>>> results;
  std::sort(input.begin(), input.end());
  do {
    for (size_t capacity : {0, 7, 100}) {
      AllocatorSet set;
      set.reserve(capacity);
      for (const Allocator* allocator : input) set.insert(allocator);
      results.push_back(SortAllocatorsTopologically(std::move(set)));
    }
  } while (std::next_permutation(input.begin(), input.end()));
  return results;
}

size_t PositionOf(const std::vector<const Allocator*>& order, const Allocator* allocator) {
  return static_cast<size_t>(std::find(order.begin(), order.end(), allocator) - order.begin());
}

TEST(AllocatorTest, TopologicalSortPlacesParentsFirst) {
  auto a = std::make_shared<FakeAllocator>("a");
  auto b = std::make_shared<FakeAllocator>("b");
  auto c = std::make_shared<FakeAllocator>("c");
  auto d = std::make_shared<FakeAllocator>("d");
  auto outside = std::make_shared<FakeAllocator>("outside");
  EXPECT_THAT(SortAllocatorsTopologically({}), IsOkAndHolds(::testing::IsEmpty()));

  // Chain a -> b -> c (a is b's parent).
  b->AddParent(a);
  c->AddParent(b);
  for (const auto& result : SortInManyOrders({a.get(), b.get(), c.get()})) {
    EXPECT_THAT(result, IsOkAndHolds(ElementsAre(a.get(), b.get(), c.get())));
  }

  // Diamond: a parent of b and d, both parents of c.
  c->AddParent(d);
  d->AddParent(a);
  for (const auto& result : SortInManyOrders({a.get(), b.get(), c.get(), d.get()})) {
    ASSERT_THAT(result, IsOk());
    ASSERT_EQ(result->size(), 4u);
    EXPECT_EQ(result->front(), a.get());
    EXPECT_EQ(result->back(), c.get());
  }

  // A parent outside the input is neither listed nor followed: c's order
  // relative to a through the absent b is not enforced, but the direct
  // parents that are present still come first.
  c->AddParent(outside);
  outside->AddParent(outside);  // a cycle outside the input is never seen
  for (const auto& result : SortInManyOrders({a.get(), c.get(), d.get()})) {
    ASSERT_THAT(result, IsOk());
    EXPECT_THAT(*result, UnorderedElementsAre(a.get(), c.get(), d.get()));
    EXPECT_LT(PositionOf(*result, d.get()), PositionOf(*result, c.get()));
    EXPECT_LT(PositionOf(*result, a.get()), PositionOf(*result, d.get()));
  }
  // x is the parent of the absent z; the input {x, y} lists exactly both.
  auto x = std::make_shared<FakeAllocator>("x");
  auto y = std::make_shared<FakeAllocator>("y");
  auto z = std::make_shared<FakeAllocator>("z");
  z->AddParent(x);
  for (const auto& result : SortInManyOrders({x.get(), y.get()})) {
    EXPECT_THAT(result, IsOkAndHolds(UnorderedElementsAre(x.get(), y.get())));
  }
}

TEST(AllocatorTest, TopologicalSortRejectsCycles) {
  auto a = std::make_shared<FakeAllocator>("a");
  auto b = std::make_shared<FakeAllocator>("b");
  auto c = std::make_shared<FakeAllocator>("c");
  b->AddParent(c);
  c->AddParent(c);  // length 1
  for (const auto& result : SortInManyOrders({b.get(), c.get()})) {
    EXPECT_THAT(result, StatusIs(StatusCode::kFailedPrecondition,
                                 "Detected allocator cycle, unable to sort topologically"));
  }
  a->AddParent(b);
  b->AddParent(a);  // length 2, beside an acyclic chain into c
  auto d = std::make_shared<FakeAllocator>("d");
  auto e = std::make_shared<FakeAllocator>("e");
  e->AddParent(d);
  e->AddParent(a);
  for (const auto& result : SortInManyOrders({a.get(), b.get(), d.get(), e.get()})) {
    EXPECT_THAT(result, StatusIs(StatusCode::kFailedPrecondition,
                                 "Detected allocator cycle, unable to sort topologically"));
  }
}

TEST(BufferAllocateTest, ReturnsTheFirstBufferOrRefuses) {
  FakeAllocator allocator("fake");
  std::shared_ptr<Buffer> first = Heap(16);
  allocator.result_ = Allocation({first, Heap(32)}, Yuv420());
  uint64_t size = 16;
  auto buffer = Buffer::Allocate(&allocator, size, 5, FenceType::kTwoStageSoftware);
  ASSERT_THAT(buffer, IsOk());
  EXPECT_EQ(*buffer, first);
  allocator.result_ = Allocation();
  EXPECT_EQ(buffer->use_count(), 2);  // the rest of the returned allocation is gone
  EXPECT_EQ(allocator.last_spec_, "{type: AllocationSpec, size: 16, flags: 5}");
  EXPECT_EQ(allocator.last_fence_type_, FenceType::kTwoStageSoftware);

  allocator.result_ = ResourceExhaustedError("pool empty");
  EXPECT_THAT(Buffer::Allocate(&allocator, size, 0, FenceType::kDummy),
              StatusIs(StatusCode::kResourceExhausted, "pool empty"));
  allocator.result_ = Allocation();
  EXPECT_THAT(Buffer::Allocate(&allocator, size, 0, FenceType::kDummy),
              StatusIs(StatusCode::kInternal,
                       "Allocator returned no buffers for {type: AllocationSpec, size: 16, "
                       "flags: 0}"));
  allocator.result_ = Allocation({nullptr, first});
  EXPECT_THAT(Buffer::Allocate(&allocator, size, 0, FenceType::kDummy),
              StatusIs(StatusCode::kInternal,
                       "Allocator returned a null buffer for {type: AllocationSpec, size: 16, "
                       "flags: 0}"));
}

TEST(AllocationDeathTest, BrokenPreconditions) {
  EXPECT_DEATH(AllocationSpec(0, 0, FenceType::kSoftware),
               "Check failed: size > 0 AllocationSpec of 0 bytes");
  FakeAllocator allocator("fake");
  uint64_t zero = 0;
  EXPECT_DEATH((void)Buffer::Allocate(&allocator, zero, 0, FenceType::kSoftware),
               "Check failed: size > 0 AllocationSpec of 0 bytes");
  uint64_t size = 8;
  EXPECT_DEATH(
      (void)Buffer::Allocate(static_cast<Allocator*>(nullptr), size, 0, FenceType::kSoftware),
      "Check failed: allocator != nullptr Buffer::Allocate needs an allocator");
  EXPECT_DEATH(GetAllocatorAncestry(&allocator, nullptr),
               "Check failed: ancestry != nullptr GetAllocatorAncestry needs a set to fill");
}

}  // namespace
}  // namespace orvex
