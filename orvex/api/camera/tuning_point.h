#ifndef ORVEX_API_CAMERA_TUNING_POINT_H_
#define ORVEX_API_CAMERA_TUNING_POINT_H_

// TuningPoint: a point of the tuning pipeline whose data is ready when its
// fence completes. The camera stack derives from it; the library supplies
// the fence holding and the wait.
//
// Slot order: destructor, WaitForDone, GetFence, GetFrameNumber.
//
// Thread safety: WaitForDone and GetFence may be called from any thread (the
// fence is fixed at construction and fences are thread-safe).

#include <cstdint>
#include <memory>

#include "absl/time/time.h"
#include "orvex/api/thread/fence.h"
#include "orvex/base/export.h"
#include "orvex/status/status.h"

namespace orvex {

class ORVEX_EXPORT TuningPoint {
 public:
  virtual ~TuningPoint();

  // Waits on GetFence() (called through the virtual slot, so a subclass may
  // supply another fence). Returns the fence's final status when it
  // completes within `timeout`; DEADLINE_EXCEEDED when the wait ends first;
  // FAILED_PRECONDITION when there is no fence.
  virtual Status WaitForDone(absl::Duration timeout) const;

  // The held fence (not a new reference); null when made without one.
  virtual Fence* GetFence() const;

  // The frame this tuning point belongs to.
  virtual int64_t GetFrameNumber() const = 0;

 protected:
  explicit TuningPoint(std::shared_ptr<Fence> fence);

 private:
  std::shared_ptr<Fence> fence_;
};

}  // namespace orvex

#endif  // ORVEX_API_CAMERA_TUNING_POINT_H_
