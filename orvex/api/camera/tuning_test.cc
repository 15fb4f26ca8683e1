#include "orvex/api/camera/tuning.h"

#include <memory>
#include <vector>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/camera/tuning_point.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::IsOk;
using ::orvex::testing::StatusIs;

class FakePoint : public TuningPoint {
 public:
  explicit FakePoint(std::shared_ptr<Fence> fence) : TuningPoint(std::move(fence)) {}
  int64_t GetFrameNumber() const override { return 17; }
};

// Supplies its own fence through the virtual slot and ignores the held one.
class RedirectingPoint : public FakePoint {
 public:
  RedirectingPoint(std::shared_ptr<Fence> held, Fence* other)
      : FakePoint(std::move(held)), other_(other) {}
  Fence* GetFence() const override { return other_; }

 private:
  Fence* other_;
};

TEST(TuningPointTest, WaitForDoneReportsTheFenceOutcome) {
  auto fence = std::make_shared<SoftwareFence>();
  FakePoint point(fence);
  EXPECT_EQ(point.GetFence(), fence.get());
  EXPECT_EQ(fence.use_count(), 2);  // GetFence hands out no new reference.

  EXPECT_THAT(point.WaitForDone(absl::ZeroDuration()),
              StatusIs(StatusCode::kDeadlineExceeded, "TuningPoint fence not signalled within 0"));
  EXPECT_THAT(
      point.WaitForDone(absl::Milliseconds(2)),
      StatusIs(StatusCode::kDeadlineExceeded, "TuningPoint fence not signalled within 2ms"));
  // A signalled error is the fence's status, passed through unchanged.
  fence->Signal(DataLossError("bad tuning"));
  EXPECT_THAT(point.WaitForDone(absl::ZeroDuration()),
              StatusIs(StatusCode::kDataLoss, "bad tuning"));
  fence->Signal(OkStatus());
  EXPECT_THAT(point.WaitForDone(absl::InfiniteDuration()), IsOk());
}

TEST(TuningPointTest, WaitGoesThroughTheVirtualGetFence) {
  auto held = std::make_shared<SoftwareFence>();  // Never signalled.
  DummyFence done;
  RedirectingPoint point(held, &done);
  EXPECT_THAT(point.WaitForDone(absl::ZeroDuration()), IsOk());

  RedirectingPoint none(held, nullptr);
  EXPECT_THAT(none.WaitForDone(absl::InfiniteDuration()),
              StatusIs(StatusCode::kFailedPrecondition, "TuningPoint has no fence to wait on"));
  FakePoint empty(nullptr);
  EXPECT_EQ(empty.GetFence(), nullptr);
  EXPECT_THAT(empty.WaitForDone(absl::ZeroDuration()), StatusIs(StatusCode::kFailedPrecondition));
}

TEST(TuningPointOpaqueMetadataTest, OwnsThePointUntilDestroyed) {
  auto point = std::make_shared<FakePoint>(std::make_shared<DummyFence>());
  std::weak_ptr<TuningPoint> weak = point;
  std::unique_ptr<OpaqueMetadata> metadata =
      std::make_unique<TuningPointOpaqueMetadata>(std::move(point));
  ASSERT_FALSE(weak.expired());
  EXPECT_EQ(static_cast<TuningPointOpaqueMetadata&>(*metadata).tuning_point()->GetFrameNumber(),
            17);
  metadata.reset();  // Through the base's virtual destructor.
  EXPECT_TRUE(weak.expired());
}

}  // namespace
}  // namespace orvex
