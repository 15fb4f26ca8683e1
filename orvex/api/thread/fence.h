#ifndef ORVEX_API_THREAD_FENCE_H_
#define ORVEX_API_THREAD_FENCE_H_

// Fences: completion objects that carry the final Status of a producer.
//
// A consumer either waits for a fence with a timeout or adds a listener that
// is called once with the final status. A zero or negative timeout polls, an
// infinite one (absl::InfiniteDuration()) waits without limit.
//
//   orvex::SoftwareFence fence;
//   producer: fence.Signal(orvex::OkStatus());
//   consumer: auto result = fence.WaitForDone(absl::Milliseconds(33));
//             if (std::holds_alternative<orvex::Status>(result)) ...
//
// Kinds: DummyFence (always done with OK), SoftwareFence (done by Signal),
// TwoStageSoftwareFence (two_stage_software_fence.h) and MergedFence
// (merged_fence.h). Buffers and images derive from Fence themselves.
//
// Thread safety: every operation of the fences here may be called from any
// thread. Listeners never run while a fence's lock is held.
//
// Listeners should not throw. If one does inside Signal() or SignalDone(),
// the fence completes as usual all the same: the other listeners still run,
// waiters wake, and then the first exception is rethrown to the caller of
// Signal()/SignalDone() (later ones are dropped).

#include <atomic>
#include <condition_variable>
#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "absl/time/time.h"
#include "orvex/base/export.h"
#include "orvex/status/status.h"

namespace orvex_api {

// The wait ended before the fence completed.
struct FenceNotDone {};

}  // namespace orvex_api

namespace orvex {

// The result of a wait: FenceNotDone (index 0) when the wait ended first, or
// the fence's final status (index 1), which may itself be an error.
using FenceWaitResult = std::variant<orvex_api::FenceNotDone, Status>;

// A listener receives the final status exactly once.
using FenceListener = std::function<void(Status)>;

class Fence;

namespace fence_internal {

// For WaitForMultipleFencesDone (merged_fence.h): the steady clock's time
// since its epoch, and one wait for `fence` with the time left until
// `deadline` (a SteadyNow() value), clamped at zero. The fence kinds of this
// file read the clock only when they find themselves not done.
ORVEX_EXPORT absl::Duration SteadyNow();
ORVEX_EXPORT FenceWaitResult WaitForDoneUntil(const Fence& fence, absl::Duration deadline);

}  // namespace fence_internal

// The kind of fence CreateFence makes.
enum class FenceType : int32_t {
  kDefault = 0,  // no kind: an allocator must substitute a concrete one first
  kDummy = 1,
  kSoftware = 2,
  kTwoStageSoftware = 3,
};

// The abstract completion object. Has no data.
class ORVEX_EXPORT Fence {
 public:
  virtual ~Fence();

  // Waits up to `timeout` for completion.
  virtual FenceWaitResult WaitForDone(absl::Duration timeout) const = 0;

  // Registers `listener` to be called once with the final status. This base
  // version refuses with UNIMPLEMENTED and never calls the listener.
  virtual Status AddListener(FenceListener listener);

  // Completes the fence with an ABORTED error (each kind says how).
  virtual void Abort() = 0;

  // Polls: the final status if done, else UNAVAILABLE "Fence not yet (fully)
  // signalled.".
  Status GetStatus() const;

 protected:
  Fence() = default;
  Fence(const Fence&) = default;
  Fence& operator=(const Fence&) = default;
};

// Makes a new fence of `type` (a TwoStageSoftwareFence in its initial state,
// an unnamed SoftwareFence, or a DummyFence). kDefault is a contract
// violation and ends the process.
ORVEX_EXPORT std::unique_ptr<Fence> CreateFence(FenceType type);

// Always done with OK.
class ORVEX_EXPORT DummyFence final : public Fence {
 public:
  DummyFence() = default;
  ~DummyFence() override;

  // OK at once, whatever the timeout.
  FenceWaitResult WaitForDone(absl::Duration timeout) const override;
  // Calls `listener` at once on the calling thread with OK; returns OK.
  Status AddListener(FenceListener listener) override;
  // Does nothing.
  void Abort() override;
};

// A fence completed by Signal(). Before the first signal it is not done;
// after it, every wait returns the last signalled status. Listeners added
// before the signal run on the signalling thread, in the order added, before
// waiters blocked in WaitForDone() wake; listeners added afterwards run at
// once on the adder's thread. A wait that begins after the signal (also one
// made by a listener of that signal) returns at once.
class ORVEX_EXPORT SoftwareFence : public Fence {
 public:
  // Named "unnamed".
  SoftwareFence();
  explicit SoftwareFence(std::string_view name);
  // Pending listeners are destroyed without being called. If a Signal() on
  // another thread still calls listeners or wakes waiters, waits for it to
  // finish with the fence; destroying the fence from one of its own
  // listeners ends the process.
  ~SoftwareFence() override;

  SoftwareFence(const SoftwareFence&) = delete;
  SoftwareFence& operator=(const SoftwareFence&) = delete;

  // Completes the fence with `status` (a later call replaces the status and
  // calls no listener), calls the pending listeners, then wakes waiters.
  // Destroying the called listeners is the last thing it does, so they may
  // own the fence.
  void Signal(Status status);

  // Signal(AbortedError("Fence was aborted")).
  void Abort() override;

  // Always returns OK; see the class comment for where `listener` runs.
  Status AddListener(FenceListener listener) override;

  // Once signalled, returns the status at once. Before that, polls
  // (timeout <= 0), waits without limit (infinite) or until the timeout,
  // rounded up to whole microseconds, has passed.
  FenceWaitResult WaitForDone(absl::Duration timeout) const override;

  // Returns the fence to the not-signalled state for reuse, renamed `name`.
  // Pending listeners are destroyed without being called; waiters are not
  // woken.
  void Reset(std::string name);

  // The fence's name.
  std::string name() const;

 private:
  friend FenceWaitResult fence_internal::WaitForDoneUntil(const Fence&, absl::Duration);

  // WaitForDone with the time left until `deadline` (see WaitForDoneUntil),
  // read only when the fence is not done. Hidden: bound within the library.
  [[gnu::visibility("hidden")]] FenceWaitResult WaitUntil(absl::Duration deadline) const;
  // The blocking part of a wait, entered with `lock` held on a fence not yet
  // signalled.
  [[gnu::visibility("hidden")]] FenceWaitResult WaitLocked(std::unique_lock<std::mutex>& lock,
                                                           absl::Duration timeout) const;

  // mutex_ guards every field below.
  mutable std::mutex mutex_;
  mutable std::condition_variable cond_;
  bool signaled_ = false;
  Status status_;
  std::string name_;
  std::vector<FenceListener> listeners_;
  // Signal() calls running listeners outside the lock; blocked waiters wake
  // only when it is zero.
  int listeners_running_ = 0;
  // Signal() calls that may still touch the fence; the destructor waits for
  // them. Not guarded.
  std::atomic<int> active_signals_{0};
};

}  // namespace orvex

#endif  // ORVEX_API_THREAD_FENCE_H_
