#ifndef ORVEX_API_THREAD_FENCE_INTERNAL_H_
#define ORVEX_API_THREAD_FENCE_INTERNAL_H_

// Helpers shared by the fence kinds of this directory. Not exported.

#include <atomic>
#include <chrono>
#include <exception>
#include <optional>
#include <string_view>
#include <utility>
#include <vector>

#include "absl/time/time.h"
#include "orvex/api/thread/fence.h"
#include "orvex/status/status.h"

namespace orvex {
namespace fence_internal {

// Calls `listener` with `status`; a listener without a target is skipped.
inline void CallListener(const FenceListener& listener, Status status) {
  if (listener) listener(std::move(status));
}

// Calls each listener in order with its own copy of `status`. One that
// throws does not keep the others from running: the first exception is
// returned, for the caller to rethrow once its fence is consistent again;
// later ones are dropped.
std::exception_ptr CallListeners(const std::vector<FenceListener>& listeners, const Status& status);

// The time left until `deadline` (a SteadyNow() value), clamped at zero;
// infinite for an infinite deadline.
absl::Duration TimeLeft(absl::Duration deadline);

// The steady-clock deadline `timeout` from now, with the timeout rounded up
// to a whole multiple of `unit`. Empty for an infinite timeout and for a
// finite one too long to represent, both of which wait without limit.
std::optional<std::chrono::steady_clock::time_point> DeadlineAfter(absl::Duration timeout,
                                                                   absl::Duration unit);

// Marks, for the calling thread, that listeners of `fence` are being called,
// so that a fence destroyed from inside its own listener is detected rather
// than waiting for itself.
class ListenerScope {
 public:
  explicit ListenerScope(const void* fence);
  ~ListenerScope();
  ListenerScope(const ListenerScope&) = delete;
  ListenerScope& operator=(const ListenerScope&) = delete;

  static bool IsRunningListenersOf(const void* fence);

 private:
  const void* fence_;
  ListenerScope* outer_;
};

// Counts a signalling call that may still touch its fence after releasing
// the fence's lock (to wake waiters). Enter it while holding the lock.
class ActiveSignal {
 public:
  explicit ActiveSignal(std::atomic<int>& count) : count_(count) {
    count_.fetch_add(1, std::memory_order_relaxed);
  }
  ~ActiveSignal() { count_.fetch_sub(1, std::memory_order_release); }
  ActiveSignal(const ActiveSignal&) = delete;
  ActiveSignal& operator=(const ActiveSignal&) = delete;

 private:
  std::atomic<int>& count_;
};

// Called by a fence's destructor: waits until no signalling call touches
// `fence` any more. A fence destroyed by one of its own listeners would wait
// for itself; that ends the process with "<what> destroyed by one of its own
// listeners while being signalled".
void AwaitActiveSignals(const std::atomic<int>& count, const void* fence, std::string_view what);

}  // namespace fence_internal
}  // namespace orvex

#endif  // ORVEX_API_THREAD_FENCE_INTERNAL_H_
