#include "orvex/api/camera/tuning.h"

#include <memory>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/camera/tuning_point.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::IsOk;
using ::orvex::testing::StatusIs;

// Waits on its own fence, or on `other` when one is given: GetFence is the
// virtual slot the wait goes through.
class FakePoint : public TuningPoint {
 public:
  explicit FakePoint(std::shared_ptr<Fence> fence, Fence* other = nullptr)
      : TuningPoint(std::move(fence)), other_(other) {}
  int64_t GetFrameNumber() const override { return 17; }
  Fence* GetFence() const override { return other_ ? other_ : TuningPoint::GetFence(); }

 private:
  Fence* other_;
};

TEST(TuningPointTest, WaitForDoneReportsTheFenceOutcome) {
  auto fence = std::make_shared<SoftwareFence>();
  FakePoint point(fence);
  EXPECT_EQ(point.GetFence(), fence.get());
  EXPECT_EQ(fence.use_count(), 2);  // GetFence hands out no new reference.
  EXPECT_THAT(
      point.WaitForDone(absl::Milliseconds(2)),
      StatusIs(StatusCode::kDeadlineExceeded, "TuningPoint fence not signalled within 2ms"));
  // A signalled error is the fence's status, passed through unchanged.
  fence->Signal(DataLossError("bad tuning"));
  EXPECT_THAT(point.WaitForDone(absl::ZeroDuration()),
              StatusIs(StatusCode::kDataLoss, "bad tuning"));

  DummyFence done;
  EXPECT_THAT(FakePoint(std::make_shared<SoftwareFence>(), &done).WaitForDone(absl::ZeroDuration()),
              IsOk());
  EXPECT_THAT(FakePoint(nullptr).WaitForDone(absl::InfiniteDuration()),
              StatusIs(StatusCode::kFailedPrecondition, "TuningPoint has no fence to wait on"));
}

TEST(TuningPointOpaqueMetadataTest, OwnsThePointUntilDestroyed) {
  auto point = std::make_shared<FakePoint>(std::make_shared<DummyFence>());
  std::weak_ptr<TuningPoint> weak = point;
  std::unique_ptr<OpaqueMetadata> metadata =
      std::make_unique<TuningPointOpaqueMetadata>(std::move(point));
  EXPECT_EQ(static_cast<TuningPointOpaqueMetadata&>(*metadata).tuning_point()->GetFrameNumber(),
            17);
  metadata.reset();  // Through the base's virtual destructor.
  EXPECT_TRUE(weak.expired());
}

}  // namespace
}  // namespace orvex
