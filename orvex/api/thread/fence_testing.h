#ifndef ORVEX_API_THREAD_FENCE_TESTING_H_
#define ORVEX_API_THREAD_FENCE_TESTING_H_

// Test helpers for the fences of this directory.

#include <sys/syscall.h>
#include <unistd.h>

#include <atomic>
#include <fstream>
#include <functional>
#include <string>
#include <thread>
#include <variant>
#include <vector>

#include "absl/time/clock.h"
#include "absl/time/time.h"
#include "gtest/gtest.h"
#include "orvex/api/thread/fence.h"

namespace orvex {
namespace testing {

inline bool NotDone(const FenceWaitResult& r) {
  return std::holds_alternative<orvex_api::FenceNotDone>(r);
}
inline Status Done(const FenceWaitResult& r) {
  return NotDone(r) ? InternalError("not done") : std::get<Status>(r);
}

// Expects `fence` done with `status` within a wait that must not take long.
inline void ExpectDonePromptly(const Fence& fence, const Status& status) {
  const absl::Time start = absl::Now();
  EXPECT_EQ(Done(fence.WaitForDone(absl::Seconds(10))), status);
  EXPECT_LT(absl::Now() - start, absl::Seconds(5));
}

// Records the timeout of every wait (from one thread), sleeps `delay`,
// answers `result`. Keeps the base AddListener, which refuses.
class RecordingFence : public Fence {
 public:
  explicit RecordingFence(FenceWaitResult r = OkStatus(), absl::Duration d = absl::ZeroDuration())
      : result(r), delay(d) {}
  FenceWaitResult WaitForDone(absl::Duration timeout) const override {
    timeouts.push_back(timeout);
    absl::SleepFor(delay);
    return result;
  }
  void Abort() override {}

  FenceWaitResult result;
  absl::Duration delay;
  mutable std::vector<absl::Duration> timeouts;
};

// Runs `wait` on its own thread; the constructor returns once that thread
// sleeps, that is, blocks in the wait. The destructor joins it.
class BlockedWaiter {
 public:
  explicit BlockedWaiter(std::function<void()> wait)
      : thread_([this, wait] {
          tid_ = static_cast<long>(syscall(SYS_gettid));
          wait();
        }) {
    while (tid_ == 0) std::this_thread::yield();
    const std::string stat = "/proc/self/task/" + std::to_string(tid_) + "/stat";
    for (std::string line; std::getline(std::ifstream(stat), line);) {
      const size_t state = line.rfind(')') + 2;  // the state follows the name
      if (state < line.size() && line[state] == 'S') break;
      std::this_thread::yield();
    }
  }
  ~BlockedWaiter() { thread_.join(); }

 private:
  std::atomic<long> tid_{0};
  std::thread thread_;
};

}  // namespace testing
}  // namespace orvex

#endif  // ORVEX_API_THREAD_FENCE_TESTING_H_
