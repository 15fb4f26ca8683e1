#include "orvex/api/thread/fence_internal.h"

#include <algorithm>
#include <atomic>
#include <chrono>
#include <exception>
#include <optional>
#include <thread>
#include <vector>

#include "absl/time/time.h"
#include "orvex/status/log.h"

namespace orvex {
namespace fence_internal {
namespace {

thread_local ListenerScope* innermost_scope = nullptr;

// Longer timeouts wait without limit; this keeps the deadline arithmetic far
// from the clock's range.
constexpr absl::Duration kLongestFiniteWait = absl::Hours(24 * 365 * 100);

}  // namespace

std::optional<std::chrono::steady_clock::time_point> DeadlineAfter(absl::Duration timeout,
                                                                   absl::Duration unit) {
  if (timeout >= kLongestFiniteWait) return std::nullopt;
  const absl::Duration rounded = absl::Ceil(timeout, unit);
  return std::chrono::steady_clock::now() + absl::ToChronoNanoseconds(rounded);
}

std::exception_ptr CallListeners(const std::vector<FenceListener>& listeners,
                                 const Status& status) {
  std::exception_ptr first;
  for (const FenceListener& listener : listeners) {
    try {
      CallListener(listener, status);
    } catch (...) {
      if (first == nullptr) first = std::current_exception();
    }
  }
  return first;
}

absl::Duration TimeLeft(absl::Duration deadline) {
  return std::max(absl::ZeroDuration(), deadline - SteadyNow());
}

ListenerScope::ListenerScope(const void* fence) : fence_(fence), outer_(innermost_scope) {
  innermost_scope = this;
}

ListenerScope::~ListenerScope() { innermost_scope = outer_; }

bool ListenerScope::IsRunningListenersOf(const void* fence) {
  for (const ListenerScope* scope = innermost_scope; scope != nullptr; scope = scope->outer_) {
    if (scope->fence_ == fence) return true;
  }
  return false;
}

void AwaitActiveSignals(const std::atomic<int>& count, const void* fence, std::string_view what) {
  if (count.load(std::memory_order_acquire) == 0) return;
  if (ListenerScope::IsRunningListenersOf(fence)) {
    ORVEX_LOG(FATAL) << what << " destroyed by one of its own listeners while being signalled";
  }
  // The signaller is at most a few instructions and one wake-up away.
  while (count.load(std::memory_order_acquire) != 0) std::this_thread::yield();
}

}  // namespace fence_internal
}  // namespace orvex
