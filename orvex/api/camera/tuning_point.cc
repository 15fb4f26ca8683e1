#include "orvex/api/camera/tuning_point.h"

#include <string>
#include <utility>
#include <variant>

namespace orvex {

TuningPoint::TuningPoint(std::shared_ptr<Fence> fence) : fence_(std::move(fence)) {}

TuningPoint::~TuningPoint() = default;

Fence* TuningPoint::GetFence() const { return fence_.get(); }

Status TuningPoint::WaitForDone(absl::Duration timeout) const {
  const Fence* fence = GetFence();
  if (fence == nullptr) return FailedPreconditionError("TuningPoint has no fence to wait on");
  FenceWaitResult result = fence->WaitForDone(timeout);
  if (Status* status = std::get_if<Status>(&result)) return std::move(*status);
  return DeadlineExceededError("TuningPoint fence not signalled within " +
                               absl::FormatDuration(timeout));
}

}  // namespace orvex
