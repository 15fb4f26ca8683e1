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

// Waits on `other` if given: the wait goes through the GetFence slot.
class FakePoint : public TuningPoint {
 public:
  explicit FakePoint(std::shared_ptr<Fence> fence, Fence* other = nullptr)
      : TuningPoint(std::move(fence)), other_(other) {}
  int64_t GetFrameNumber() const override { return 17; }
  Fence* GetFence() const override { return other_ ? other_ : TuningPoint::GetFence(); }
  Fence* other_;
};

TEST(TuningPointTest, WaitsOnItsFenceAndIsOwnedByMetadata) {
  auto fence = std::make_shared<SoftwareFence>();
  FakePoint point(fence);
  EXPECT_EQ(point.GetFence(), fence.get());
  EXPECT_THAT(
      point.WaitForDone(absl::Milliseconds(2)),
      StatusIs(StatusCode::kDeadlineExceeded, "TuningPoint fence not signalled within 2ms"));
  fence->Signal(DataLossError("bad tuning"));
  EXPECT_THAT(point.WaitForDone(absl::ZeroDuration()),
              StatusIs(StatusCode::kDataLoss, "bad tuning"));
  DummyFence done;
  EXPECT_THAT(FakePoint(fence, &done).WaitForDone(absl::ZeroDuration()), IsOk());
  EXPECT_THAT(FakePoint(nullptr).WaitForDone(absl::InfiniteDuration()),
              StatusIs(StatusCode::kFailedPrecondition, "TuningPoint has no fence to wait on"));
  // Destroyed through its base, opaque metadata releases the point it owns.
  auto owned = std::make_shared<FakePoint>(nullptr);
  std::weak_ptr<TuningPoint> weak = owned;
  std::unique_ptr<OpaqueMetadata> metadata =
      std::make_unique<TuningPointOpaqueMetadata>(std::move(owned));
  EXPECT_EQ(static_cast<TuningPointOpaqueMetadata&>(*metadata).tuning_point()->GetFrameNumber(),
            17);
  metadata.reset();
  EXPECT_TRUE(weak.expired());
}

}  // namespace
}  // namespace orvex
