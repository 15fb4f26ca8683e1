#include "orvex/api/thread/two_stage_software_fence.h"

#include <atomic>
#include <exception>
#include <mutex>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "absl/time/time.h"
#include "orvex/api/debug/perf_trace.h"
#include "orvex/api/thread/fence_internal.h"
#include "orvex/status/log.h"
#include "orvex/status/status_builder.h"

namespace orvex {

TwoStageSoftwareFence::~TwoStageSoftwareFence() {
  fence_internal::AwaitActiveSignals(active_signals_, this, "TwoStageSoftwareFence");
}

FenceWaitResult TwoStageSoftwareFence::WaitForDone(absl::Duration timeout) const {
  PerfTrace trace(5, "TwoStageSoftwareFence WaitForDone");
  std::unique_lock<std::mutex> lock(mutex_);
  // A wait that begins once the fence is done returns at once, also one that
  // a listener of SignalDone makes on its own thread.
  if (done_status_.has_value()) return *done_status_;
  return WaitLocked(lock, timeout);
}

FenceWaitResult TwoStageSoftwareFence::WaitUntil(absl::Duration deadline) const {
  PerfTrace trace(5, "TwoStageSoftwareFence WaitForDone");
  std::unique_lock<std::mutex> lock(mutex_);
  if (done_status_.has_value()) return *done_status_;
  return WaitLocked(lock, fence_internal::TimeLeft(deadline));
}

FenceWaitResult TwoStageSoftwareFence::WaitLocked(std::unique_lock<std::mutex>& lock,
                                                  absl::Duration timeout) const {
  if (timeout <= absl::ZeroDuration()) return orvex_api::FenceNotDone{};
  // A waiter blocked before SignalDone wakes once every listener has run.
  const auto done = [this] { return done_status_.has_value() && listeners_running_ == 0; };
  const auto deadline = fence_internal::DeadlineAfter(timeout, absl::Milliseconds(1));
  if (!deadline.has_value()) {
    cond_.wait(lock, done);
  } else if (!cond_.wait_until(lock, *deadline, done) && !done_status_.has_value()) {
    return orvex_api::FenceNotDone{};
  }
  return *done_status_;
}

Status TwoStageSoftwareFence::AddListener(FenceListener listener) {
  std::unique_lock<std::mutex> lock(mutex_);
  if (done_status_.has_value()) {
    Status status = *done_status_;
    lock.unlock();
    fence_internal::CallListener(listener, std::move(status));
    return OkStatus();
  }
  listeners_.push_back(std::move(listener));
  return OkStatus();
}

void TwoStageSoftwareFence::Abort() {
  std::optional<fence_internal::ActiveSignal> active;
  {
    std::lock_guard<std::mutex> lock(mutex_);
    ready_to_start_status_ = AbortedError("Fence was aborted");
    done_status_ = *ready_to_start_status_;
    active.emplace(active_signals_);
  }
  cond_.notify_all();
}

Status TwoStageSoftwareFence::SignalReadyToStart(Status status) {
  std::optional<fence_internal::ActiveSignal> active;
  std::unique_lock<std::mutex> lock(mutex_);
  if (ready_to_start_status_.has_value()) {
    if (!ready_to_start_status_->ok()) {
      // The first error stays; a later one changes nothing.
      if (!status.ok()) return OkStatus();
      return FailedPreconditionError(
          "Two stage fence signaled ready-to-start is already signaled with " +
          ready_to_start_status_->ToString() +
          " Cannot change to OkStatus since error already happened.");
    }
    if (status.ok()) {
      return FailedPreconditionError(
          "Two stage fence signaled ready-to-start is already signaled with OkStatus, it cannot "
          "be signaled again with OkStatus.");
    }
  }
  ready_to_start_status_ = std::move(status);
  // An error at ready-to-start finishes the fence.
  bool wake = ready_waiters_ > 0;
  if (!ready_to_start_status_->ok() && !done_status_.has_value()) {
    done_status_ = *ready_to_start_status_;
    wake = true;
  }
  // Waiters for done have nothing to see in an OK ready-to-start.
  if (wake) {
    active.emplace(active_signals_);
    lock.unlock();
    cond_.notify_all();
  }
  return OkStatus();
}

Status TwoStageSoftwareFence::SignalDone(Status status) {
  std::vector<FenceListener> listeners;
  std::optional<fence_internal::ActiveSignal> active;
  {
    std::lock_guard<std::mutex> lock(mutex_);
    if (!ready_to_start_status_.has_value()) {
      if (status.ok()) {
        return FailedPreconditionError(
            "Two stage fence done signaled ok, but ready-to-start signal was never received");
      }
      ready_to_start_status_ = status;
    }
    if (done_status_.has_value() && (done_status_->ok() || status.ok())) {
      return FailedPreconditionError(
          "Two stage fence signaled done twice, and one of the statuses was not an error: Old "
          "status = " +
          done_status_->ToString() + " New status = " + status.ToString());
    }
    done_status_ = std::move(status);
    active.emplace(active_signals_);
    if (!listeners_.empty()) {
      listeners.swap(listeners_);
      status = *done_status_;
      ++listeners_running_;
    }
  }
  std::exception_ptr thrown;
  if (!listeners.empty()) {
    {
      fence_internal::ListenerScope scope(this);
      // `status` was reassigned from the stored status when listeners were taken.
      thrown = fence_internal::CallListeners(listeners, status);  // NOLINT(bugprone-use-after-move)
    }
    std::lock_guard<std::mutex> lock(mutex_);
    --listeners_running_;
  }
  // Waiters wake after every listener has returned.
  cond_.notify_all();
  active.reset();
  // The fence is complete; from here on it may already be destroyed.
  if (thrown != nullptr) std::rethrow_exception(thrown);
  return OkStatus();
}

bool TwoStageSoftwareFence::WaitForReadyLocked(std::unique_lock<std::mutex>& lock,
                                               absl::Duration timeout) const {
  const auto ready = [this] { return ready_to_start_status_.has_value(); };
  if (timeout <= absl::ZeroDuration() || ready()) return ready();
  const auto deadline = fence_internal::DeadlineAfter(timeout, absl::Milliseconds(1));
  ++ready_waiters_;
  bool arrived = true;
  if (!deadline.has_value()) {
    cond_.wait(lock, ready);
  } else {
    arrived = cond_.wait_until(lock, *deadline, ready);
  }
  --ready_waiters_;
  return arrived;
}

Status TwoStageSoftwareFence::ReadyTimeoutError(absl::Duration timeout) {
  return DeadlineExceededErrorBuilder(ORVEX_LOC)
         << "timed out waiting for two stage software fence ready-to-start signal with a "
            "timeout duration of: "
         << timeout;
}

Status TwoStageSoftwareFence::WaitUntilReadyToStart(absl::Duration timeout) const {
  PerfTrace trace(5, "TwoStageSoftwareFence WaitUntilReadyToStart");
  std::unique_lock<std::mutex> lock(mutex_);
  if (!WaitForReadyLocked(lock, timeout)) return ReadyTimeoutError(timeout);
  return *ready_to_start_status_;
}

Status TwoStageSoftwareFence::WaitUntilReadyToStartOrForfeit(absl::Duration timeout,
                                                             Status forfeit_status) {
  ORVEX_CHECK_NE(forfeit_status, OkStatus())
      << "Cannot forfeit with Ok status, even to confuse the enemy.";
  PerfTrace trace(5, "TwoStageSoftwareFence WaitUntilReadyToStartOrForfeit");
  std::unique_lock<std::mutex> lock(mutex_);
  if (!WaitForReadyLocked(lock, timeout)) {
    // The consumer gives up the frame: its error becomes the fence's outcome.
    done_status_ = std::move(forfeit_status);
    ready_to_start_status_ = *done_status_;
    cond_.notify_all();
    return ReadyTimeoutError(timeout);
  }
  if (IsDeadlineExceeded(*ready_to_start_status_)) {
    return InternalErrorBuilder(ORVEX_LOC)
           << "Ready-to-start fence is with timeout status (" << ready_to_start_status_->ToString()
           << "), meaning that the consumer already timeout and gave up the frame";
  }
  return *ready_to_start_status_;
}

Status TwoStageSoftwareFence::GetReadyToStartStatus() const {
  std::lock_guard<std::mutex> lock(mutex_);
  if (ready_to_start_status_.has_value()) return *ready_to_start_status_;
  return UnavailableError("Two stage fence has not been signaled ready-to-start yet");
}

}  // namespace orvex
