#ifndef ORVEX_API_THREAD_FENCE_INTERNAL_H_
#define ORVEX_API_THREAD_FENCE_INTERNAL_H_

// Helpers shared by the fence kinds of this directory. Not exported.

#include <chrono>
#include <optional>
#include <utility>

#include "absl/time/time.h"
#include "orvex/api/thread/fence.h"
#include "orvex/status/status.h"

namespace orvex {
namespace fence_internal {

// Calls `listener` with `status`; a listener without a target is skipped.
inline void CallListener(const FenceListener& listener, Status status) {
  if (listener) listener(std::move(status));
}

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

}  // namespace fence_internal
}  // namespace orvex

#endif  // ORVEX_API_THREAD_FENCE_INTERNAL_H_
