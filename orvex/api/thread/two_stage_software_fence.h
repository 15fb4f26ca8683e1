#ifndef ORVEX_API_THREAD_TWO_STAGE_SOFTWARE_FENCE_H_
#define ORVEX_API_THREAD_TWO_STAGE_SOFTWARE_FENCE_H_

// A software fence with two signals: the producer first signals
// ready-to-start (the consumer may begin), later done. A consumer that cannot
// wait longer may forfeit the frame; the fence then carries its error.
//
//   producer: fence.SignalReadyToStart(OkStatus()); ... fence.SignalDone(OkStatus());
//   consumer: Status s = fence.WaitUntilReadyToStartOrForfeit(
//                 absl::Milliseconds(30), DeadlineExceededError("consumer gave up"));
//
// States: initial (nothing), ready (ready OK), done OK (both OK), failed
// (both errors) and done after an OK start (ready OK, done error). An error
// at either stage, Abort() or a forfeit completes the fence. Listeners run
// only inside SignalDone() (on its thread, in the order added, before waiters
// blocked in WaitForDone() wake) or at once in AddListener() when the fence
// is done. A wait that begins once its stage is over (also one made by a
// listener) returns at once. Waits round a finite timeout up to whole
// milliseconds. A listener that throws: see fence.h.
//
// Thread safety: every operation may be called from any thread.

#include <atomic>
#include <condition_variable>
#include <mutex>
#include <optional>
#include <vector>

#include "absl/time/time.h"
#include "orvex/api/thread/fence.h"
#include "orvex/base/export.h"
#include "orvex/status/status.h"

namespace orvex {

class ORVEX_EXPORT TwoStageSoftwareFence : public Fence {
 public:
  TwoStageSoftwareFence() = default;
  // Pending listeners are destroyed without being called. Waits for a
  // signalling call on another thread that still calls listeners or wakes
  // waiters; destroying the fence from its own listener ends the process.
  ~TwoStageSoftwareFence() override;

  TwoStageSoftwareFence(const TwoStageSoftwareFence&) = delete;
  TwoStageSoftwareFence& operator=(const TwoStageSoftwareFence&) = delete;

  // The done stage: FenceNotDone, or the done status.
  FenceWaitResult WaitForDone(absl::Duration timeout) const override;
  // Calls `listener` at once if done, else keeps it for SignalDone().
  // Always returns OK.
  Status AddListener(FenceListener listener) override;
  // Both stages become ABORTED "Fence was aborted"; wakes waiters but calls
  // no listener.
  void Abort() override;

  // Ends the ready-to-start stage with `status`. An error also completes the
  // fence. FAILED_PRECONDITION when an OK would replace a stored status.
  Status SignalReadyToStart(Status status);

  // Completes the fence with `status` and calls the pending listeners, then
  // wakes waiters and destroys the listeners (which may own the fence).
  // FAILED_PRECONDITION for an OK before ready-to-start, or for a second
  // signal when either status is OK.
  Status SignalDone(Status status);

  // Waits for the ready-to-start stage: its status, or DEADLINE_EXCEEDED.
  Status WaitUntilReadyToStart(absl::Duration timeout) const;

  // Like WaitUntilReadyToStart(), but on timeout forfeits: both stages take
  // `forfeit_status`, which must be an error (an OK one ends the process).
  // INTERNAL when the stage holds DEADLINE_EXCEEDED from an earlier forfeit.
  Status WaitUntilReadyToStartOrForfeit(absl::Duration timeout, Status forfeit_status);

  // The ready-to-start status, or UNAVAILABLE before that stage ends.
  Status GetReadyToStartStatus() const;

 private:
  friend FenceWaitResult fence_internal::WaitForDoneUntil(const Fence&, absl::Duration);

  // WaitForDone with the time left until `deadline` (see WaitForDoneUntil),
  // read only when the fence is not done. Hidden: bound within the library.
  [[gnu::visibility("hidden")]] FenceWaitResult WaitUntil(absl::Duration deadline) const;
  // The blocking part of a wait for done, entered with `lock` held on a
  // fence not yet done.
  [[gnu::visibility("hidden")]] FenceWaitResult WaitLocked(std::unique_lock<std::mutex>& lock,
                                                           absl::Duration timeout) const;
  // Waits until ready_to_start_status_ is engaged; false on timeout.
  bool WaitForReadyLocked(std::unique_lock<std::mutex>& lock, absl::Duration timeout) const;
  static Status ReadyTimeoutError(absl::Duration timeout);

  // mutex_ guards every field below.
  mutable std::mutex mutex_;
  mutable std::condition_variable cond_;
  std::optional<Status> done_status_;
  std::optional<Status> ready_to_start_status_;
  std::vector<FenceListener> listeners_;
  // SignalDone() calls running listeners outside the lock; blocked done
  // waiters wake only when it is zero.
  int listeners_running_ = 0;
  // Threads blocked in a ready-to-start wait.
  mutable int ready_waiters_ = 0;
  // Signalling calls that may still touch the fence; the destructor waits
  // for them. Not guarded.
  std::atomic<int> active_signals_{0};
};

}  // namespace orvex

#endif  // ORVEX_API_THREAD_TWO_STAGE_SOFTWARE_FENCE_H_
