#ifndef ORVEX_API_MEMORY_BUFFER_TESTING_H_
#define ORVEX_API_MEMORY_BUFFER_TESTING_H_

// Test doubles shared by the buffer tests: a buffer over a byte vector that
// records its unmaps and cache maintenance and can pretend to sit at an
// offset of a descriptor, a fence that records its aborts and its
// destruction, and wait helpers.

#include <cstdint>
#include <memory>
#include <mutex>
#include <string>
#include <utility>
#include <variant>
#include <vector>

#include "fmt/format.h"
#include "orvex/api/memory/buffer.h"
#include "orvex/api/thread/fence.h"

namespace orvex::testing {

class RecordingBuffer : public Buffer {
 public:
  RecordingBuffer(uint64_t size, BufferAttributes attributes, int fd = -1, int64_t offset = 0,
                  std::unique_ptr<Fence> fence = nullptr)
      : Buffer(attributes, size, std::move(fence)),
        bytes_(static_cast<size_t>(size)),
        fd_(fd),
        offset_(offset) {}
  ~RecordingBuffer() override { RunCleanups(); }

  int GetFd() const override { return fd_; }
  int64_t GetOffset() const override { return offset_; }

  StatusOr<std::unique_ptr<MappedHandle>> Map(int64_t offset, uint64_t size,
                                              BufferAccessMode mode) override {
    return MapImpl(offset, size, mode);
  }
  StatusOr<std::unique_ptr<const MappedHandle>> Map(int64_t offset, uint64_t size,
                                                    BufferAccessMode mode) const override {
    return MapImpl(offset, size, mode);
  }

  unsigned char* bytes() { return bytes_.data(); }

  // "offset/size/mode" of every Unmap, in order.
  std::vector<std::string> unmaps() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return unmaps_;
  }
  // "begin <mode>" or "end <mode>" of every DoCpuSync, in order.
  std::vector<std::string> syncs() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return syncs_;
  }
  void DoCpuSync(bool begin, BufferAccessMode mode) const override {
    std::lock_guard<std::mutex> lock(mutex_);
    syncs_.push_back(fmt::format("{} {}", begin ? "begin" : "end", AccessModeToString(mode)));
  }

  using Buffer::CheckMapRange;
  using Buffer::SharedSelf;

 protected:
  void Unmap(int64_t offset, uint64_t size, BufferAccessMode mode) override {
    std::lock_guard<std::mutex> lock(mutex_);
    unmaps_.push_back(fmt::format("{}/{}/{}", offset, size, AccessModeToString(mode)));
  }

 private:
  StatusOr<std::unique_ptr<MappedHandle>> MapImpl(int64_t offset, uint64_t size,
                                                  BufferAccessMode mode) const {
    if (Status status = CheckMapRange(offset, size, GetSize()); !status.ok()) return status;
    StatusOr<std::shared_ptr<Buffer>> self = SharedSelf();
    if (!self.ok()) return self.status();
    auto* data = const_cast<unsigned char*>(bytes_.data()) + offset;
    return std::make_unique<MappedHandle>(static_cast<int32_t>(offset), data, size, mode, *self);
  }

  std::vector<unsigned char> bytes_;
  int fd_;
  int64_t offset_;
  mutable std::mutex mutex_;
  std::vector<std::string> unmaps_;
  mutable std::vector<std::string> syncs_;
};

// Done with `status`; counts Abort calls and reports its destruction.
class RecordingFence : public Fence {
 public:
  explicit RecordingFence(Status status = OkStatus(), bool* destroyed = nullptr)
      : status_(std::move(status)), destroyed_(destroyed) {}
  ~RecordingFence() override {
    if (destroyed_ != nullptr) *destroyed_ = true;
  }
  FenceWaitResult WaitForDone(absl::Duration /*timeout*/) const override { return status_; }
  void Abort() override { ++aborts_; }
  int aborts() const { return aborts_; }

 private:
  Status status_;
  bool* destroyed_;
  int aborts_ = 0;
};

// The Status a wait result holds, or UNAVAILABLE "not done".
inline Status WaitStatus(const FenceWaitResult& result) {
  if (const Status* status = std::get_if<Status>(&result)) return *status;
  return UnavailableError("not done");
}

// Whether `fence` is done, without waiting.
inline bool IsDone(const Fence& fence) {
  return std::holds_alternative<Status>(fence.WaitForDone(absl::ZeroDuration()));
}

}  // namespace orvex::testing

#endif  // ORVEX_API_MEMORY_BUFFER_TESTING_H_
