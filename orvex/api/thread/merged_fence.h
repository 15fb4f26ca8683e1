#ifndef ORVEX_API_THREAD_MERGED_FENCE_H_
#define ORVEX_API_THREAD_MERGED_FENCE_H_

// MergedFence presents several fences as one: it is done when all of them
// are done, and its status is the first error among them in their order.
//
//   std::shared_ptr<orvex::MergedFence> all = orvex::MergeFences({&a, &b, &c});
//   all->AddListener([](orvex::Status s) { ... });   // once, when a, b, c are done
//   orvex::FenceWaitResult r = all->WaitForDone(absl::Milliseconds(50));
//
// The covered fences are not owned: the caller keeps them alive as long as
// the merged fence is used, and until every covered fence has called back
// once a listener was added. Null entries count as done with OK for the
// waits and are skipped by TrySignal(); AddListener(), Abort() and
// GetFenceStatus() require non-null entries.
//
// Thread safety: every operation may be called from any thread. Listeners
// run once, outside any lock: on the thread whose covered fence completed
// last, or on the adder's thread when the merged fence is already done. In
// the first case they are destroyed where that covered fence destroys its
// own listeners (for the fences here: once its signal is complete), so a
// listener may be the last owner of the fences it waits for. A listener
// that throws: the others still run, then the first exception propagates
// out of the covered fence's signal (see fence.h).

#include <atomic>
#include <cstdint>
#include <memory>
#include <mutex>
#include <utility>
#include <variant>
#include <vector>

#include "absl/time/time.h"
#include "orvex/api/thread/fence.h"
#include "orvex/base/export.h"
#include "orvex/status/status.h"

namespace orvex {

// Waits for `fences` in order, calling each one's WaitForDone once. A zero
// or negative timeout polls: each fence gets that same timeout. Any other
// timeout fixes one deadline from now, and each fence gets the time left
// until it, clamped at zero (fences reached after the deadline are polled);
// an infinite timeout waits for each without limit. FenceNotDone as soon as
// one fence is not done in time; otherwise the first non-OK status, or OK.
// A null entry counts as done with OK. T is any pointer-like type to a Fence
// (Fence*, std::shared_ptr<Fence>...).
template <typename T>
FenceWaitResult WaitForMultipleFencesDone(const std::vector<T>& fences, absl::Duration timeout) {
  const bool poll = timeout <= absl::ZeroDuration();
  const absl::Duration deadline = poll ? timeout : fence_internal::SteadyNow() + timeout;
  Status first_error;
  for (const T& fence : fences) {
    if (fence == nullptr) continue;
    FenceWaitResult result =
        poll ? fence->WaitForDone(timeout) : fence_internal::WaitForDoneUntil(*fence, deadline);
    Status* status = std::get_if<Status>(&result);
    if (status == nullptr) return orvex_api::FenceNotDone{};
    if (first_error.ok() && !status->ok()) first_error = std::move(*status);
  }
  return first_error;
}

class MergedFence;

// A new merged fence over `fences` (in this order).
ORVEX_EXPORT std::shared_ptr<MergedFence> MergeFences(std::vector<Fence*> fences);

class ORVEX_EXPORT MergedFence final : public Fence,
                                       public std::enable_shared_from_this<MergedFence> {
  struct Sigil {
    explicit Sigil() = default;
  };

 public:
  // Use MergeFences().
  MergedFence(Sigil, std::vector<Fence*> fences);
  ~MergedFence() override;

  MergedFence(const MergedFence&) = delete;
  MergedFence& operator=(const MergedFence&) = delete;

  // WaitForMultipleFencesDone() over the covered fences.
  FenceWaitResult WaitForDone(absl::Duration timeout) const override;

  // On the first call, registers with every covered fence. Returns the error
  // of a covered fence that refused (the listener is then neither kept nor
  // called), else OK.
  Status AddListener(FenceListener listener) override;

  // Aborts every covered fence, in order.
  void Abort() override;

  // The first non-OK GetStatus() of the covered fences, or OK; a fence not
  // yet done yields UNAVAILABLE unless an earlier fence failed.
  Status GetFenceStatus() const;

  // Pushes `status` into the covered software fences: Signal() for a
  // SoftwareFence, SignalDone() for a TwoStageSoftwareFence (which must
  // accept it, or the process ends), TrySignal() for a MergedFence; other
  // kinds and null entries are left alone.
  void TrySignal(const Status& status);

 private:
  friend std::shared_ptr<MergedFence> MergeFences(std::vector<Fence*> fences);

  void Register();
  // Moves the pending listeners (once) into `called` and calls them with the
  // merged status; rethrows the first exception one of them threw.
  void CallListeners(std::vector<FenceListener>& called);

  std::mutex mutex_;
  std::once_flag registration_once_;
  // Written only inside registration_once_; read after it.
  Status registration_status_;
  std::atomic<uint32_t> remaining_;
  const std::vector<Fence*> fences_;
  // mutex_ guards the two fields below.
  std::vector<FenceListener> listeners_;
  bool listeners_called_ = false;
};

}  // namespace orvex

#endif  // ORVEX_API_THREAD_MERGED_FENCE_H_
