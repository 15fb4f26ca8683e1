#include "orvex/api/thread/fence.h"

#include <chrono>
#include <cstdint>
#include <exception>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <typeinfo>
#include <utility>
#include <variant>
#include <vector>

#include "absl/time/time.h"
#include "orvex/api/debug/perf_trace.h"
#include "orvex/api/thread/fence_internal.h"
#include "orvex/api/thread/two_stage_software_fence.h"
#include "orvex/status/log.h"
#include "orvex/status/status_builder.h"

namespace orvex {
namespace fence_internal {

absl::Duration SteadyNow() {
  return absl::FromChrono(std::chrono::steady_clock::now().time_since_epoch());
}

FenceWaitResult WaitForDoneUntil(const Fence& fence, absl::Duration deadline) {
  // Exactly these kinds, not kinds derived from them that may override
  // WaitForDone: a done fence then costs no clock reading.
  const std::type_info& type = typeid(fence);
  if (type == typeid(SoftwareFence)) {
    return static_cast<const SoftwareFence&>(fence).WaitUntil(deadline);
  }
  if (type == typeid(TwoStageSoftwareFence)) {
    return static_cast<const TwoStageSoftwareFence&>(fence).WaitUntil(deadline);
  }
  return fence.WaitForDone(TimeLeft(deadline));
}

}  // namespace fence_internal

Fence::~Fence() = default;

Status Fence::AddListener(FenceListener /*listener*/) {
  return UnimplementedError(
      "Fence::AddListener is unimplemented by design. Specific fence implementations must "
      "provide their own implementation of AddListener if needed.");
}

Status Fence::GetStatus() const {
  FenceWaitResult result = WaitForDone(absl::ZeroDuration());
  if (Status* status = std::get_if<Status>(&result)) return std::move(*status);
  return UnavailableErrorBuilder(ORVEX_LOC) << "Fence not yet (fully) signalled.";
}

std::unique_ptr<Fence> CreateFence(FenceType type) {
  switch (type) {
    case FenceType::kDummy:
      return std::make_unique<DummyFence>();
    case FenceType::kSoftware:
      return std::make_unique<SoftwareFence>();
    case FenceType::kTwoStageSoftware:
      return std::make_unique<TwoStageSoftwareFence>();
    case FenceType::kDefault:
      break;
  }
  ORVEX_LOG(FATAL) << "Should not reach here. Allocator must substsitute a proper type for "
                      "kDefault before calling this function.";
}

DummyFence::~DummyFence() = default;

FenceWaitResult DummyFence::WaitForDone(absl::Duration /*timeout*/) const { return OkStatus(); }

Status DummyFence::AddListener(FenceListener listener) {
  fence_internal::CallListener(listener, OkStatus());
  return OkStatus();
}

void DummyFence::Abort() {}

SoftwareFence::SoftwareFence() : SoftwareFence("unnamed") {}

SoftwareFence::SoftwareFence(std::string_view name)
    : status_(UnavailableError("Software fence has not been signaled yet")), name_(name) {
  listeners_.reserve(8);
}

SoftwareFence::~SoftwareFence() {
  if (active_signals_.load(std::memory_order_acquire) == 0) return;
  fence_internal::AwaitActiveSignals(active_signals_, this, "SoftwareFence \"" + name_ + "\"");
}

void SoftwareFence::Signal(Status status) {
  std::vector<FenceListener> listeners;
  std::optional<fence_internal::ActiveSignal> active;
  {
    std::lock_guard<std::mutex> lock(mutex_);
    signaled_ = true;
    status_ = std::move(status);
    active.emplace(active_signals_);
    if (!listeners_.empty()) {
      listeners.swap(listeners_);
      status = status_;
      ++listeners_running_;
    }
  }
  std::exception_ptr thrown;
  if (!listeners.empty()) {
    {
      fence_internal::ListenerScope scope(this);
      // `status` was reassigned from status_ when listeners were taken.
      thrown = fence_internal::CallListeners(listeners, status);  // NOLINT(bugprone-use-after-move)
    }
    std::lock_guard<std::mutex> lock(mutex_);
    --listeners_running_;
  }
  // Waiters wake after every listener has returned. A notification without
  // waiters makes no system call.
  cond_.notify_all();
  active.reset();
  // The fence is complete; from here on it may already be destroyed.
  if (thrown != nullptr) std::rethrow_exception(thrown);
  // The taken listeners are destroyed last, outside the fence.
}

void SoftwareFence::Abort() { Signal(AbortedError("Fence was aborted")); }

Status SoftwareFence::AddListener(FenceListener listener) {
  std::unique_lock<std::mutex> lock(mutex_);
  if (signaled_) {
    Status status = status_;
    lock.unlock();
    fence_internal::CallListener(listener, std::move(status));
    return OkStatus();
  }
  listeners_.push_back(std::move(listener));
  return OkStatus();
}

FenceWaitResult SoftwareFence::WaitForDone(absl::Duration timeout) const {
  PerfTrace trace(5, "SoftwareFence WaitForDone");
  std::unique_lock<std::mutex> lock(mutex_);
  // A wait that begins after the signal returns at once, also one that a
  // listener of that signal makes on its own thread.
  if (signaled_) return status_;
  return WaitLocked(lock, timeout);
}

FenceWaitResult SoftwareFence::WaitUntil(absl::Duration deadline) const {
  PerfTrace trace(5, "SoftwareFence WaitForDone");
  std::unique_lock<std::mutex> lock(mutex_);
  if (signaled_) return status_;
  return WaitLocked(lock, fence_internal::TimeLeft(deadline));
}

FenceWaitResult SoftwareFence::WaitLocked(std::unique_lock<std::mutex>& lock,
                                          absl::Duration timeout) const {
  if (timeout <= absl::ZeroDuration()) return orvex_api::FenceNotDone{};
  // A waiter blocked before the signal wakes once every listener has run.
  const auto done = [this] { return signaled_ && listeners_running_ == 0; };
  const std::optional<std::chrono::steady_clock::time_point> deadline =
      fence_internal::DeadlineAfter(timeout, absl::Microseconds(1));
  if (!deadline.has_value()) {
    cond_.wait(lock, done);
    return status_;
  }
  while (!done()) {
    if (std::chrono::steady_clock::now() >= *deadline) {
      if (signaled_) return status_;
      return orvex_api::FenceNotDone{};
    }
    cond_.wait_until(lock, *deadline);
  }
  return status_;
}

void SoftwareFence::Reset(std::string name) {
  std::vector<FenceListener> dropped;
  {
    std::lock_guard<std::mutex> lock(mutex_);
    signaled_ = false;
    status_ = UnavailableError("SoftwareFence has not been signaled yet.");
    dropped.swap(listeners_);
    name_ = std::move(name);
  }
  // The dropped listeners are destroyed outside the lock: their captures may
  // own objects whose destruction calls back into this fence.
}

std::string SoftwareFence::name() const {
  std::lock_guard<std::mutex> lock(mutex_);
  return name_;
}

}  // namespace orvex
