#include "orvex/api/thread/merged_fence.h"

#include <atomic>
#include <exception>
#include <memory>
#include <mutex>
#include <utility>
#include <vector>

#include "absl/time/time.h"
#include "orvex/api/thread/fence_internal.h"
#include "orvex/api/thread/two_stage_software_fence.h"
#include "orvex/status/log.h"

namespace orvex {

MergedFence::MergedFence(Sigil, std::vector<Fence*> fences)
    : remaining_(static_cast<uint32_t>(fences.size())), fences_(std::move(fences)) {
  listeners_.reserve(64);
}

MergedFence::~MergedFence() = default;

FenceWaitResult MergedFence::WaitForDone(absl::Duration timeout) const {
  return WaitForMultipleFencesDone(fences_, timeout);
}

void MergedFence::Register() {
  std::shared_ptr<MergedFence> self = weak_from_this().lock();
  if (self == nullptr) {
    registration_status_ =
        FailedPreconditionError("MergedFence must be owned by a std::shared_ptr to take listeners");
    return;
  }
  for (Fence* fence : fences_) {
    // A missing fence counts as done with OK, as in the waits.
    if (fence == nullptr) {
      if (remaining_.fetch_sub(1, std::memory_order_acq_rel) == 1) {
        std::vector<FenceListener> called;
        CallListeners(called);
      }
      continue;
    }
    // The last covered fence to finish hands out the listeners; acquire
    // makes the other fences' completion visible to it. The listeners it
    // called live on in this callback, so that the covered fence destroys
    // them with its own listeners, after its signal.
    Status status = fence->AddListener(
        [self, called = std::vector<FenceListener>()](const Status& /*status*/) mutable {
          if (self->remaining_.fetch_sub(1, std::memory_order_acq_rel) == 1) {
            self->CallListeners(called);
          }
        });
    if (!status.ok()) registration_status_ = std::move(status);
  }
}

Status MergedFence::AddListener(FenceListener listener) {
  std::call_once(registration_once_, &MergedFence::Register, this);
  if (!registration_status_.ok()) return registration_status_;
  bool stored = false;
  if (remaining_.load(std::memory_order_acquire) != 0) {
    std::lock_guard<std::mutex> lock(mutex_);
    if (!listeners_called_) {
      listeners_.push_back(std::move(listener));
      stored = true;
    }
  }
  // Moved from only when stored.
  if (!stored)
    fence_internal::CallListener(listener, GetFenceStatus());  // NOLINT(bugprone-use-after-move)
  return OkStatus();
}

void MergedFence::CallListeners(std::vector<FenceListener>& called) {
  {
    std::lock_guard<std::mutex> lock(mutex_);
    called.swap(listeners_);
    listeners_called_ = true;
  }
  if (called.empty()) return;
  std::exception_ptr thrown = fence_internal::CallListeners(called, GetFenceStatus());
  if (thrown != nullptr) std::rethrow_exception(thrown);
}

void MergedFence::Abort() {
  for (Fence* fence : fences_) {
    if (fence != nullptr) fence->Abort();
  }
}

Status MergedFence::GetFenceStatus() const {
  for (const Fence* fence : fences_) {
    if (fence == nullptr) continue;
    Status status = fence->GetStatus();
    if (!status.ok()) return status;
  }
  return OkStatus();
}

void MergedFence::TrySignal(const Status& status) {
  for (Fence* fence : fences_) {
    if (fence == nullptr) continue;
    if (auto* software_fence = dynamic_cast<SoftwareFence*>(fence)) {
      software_fence->Signal(status);
    } else if (auto* two_stage_software_fence = dynamic_cast<TwoStageSoftwareFence*>(fence)) {
      ORVEX_CHECK_EQ(two_stage_software_fence->SignalDone(status), OkStatus());
    } else if (auto* merged_fence = dynamic_cast<MergedFence*>(fence)) {
      merged_fence->TrySignal(status);
    }
  }
}

std::shared_ptr<MergedFence> MergeFences(std::vector<Fence*> fences) {
  return std::make_shared<MergedFence>(MergedFence::Sigil(), std::move(fences));
}

}  // namespace orvex
