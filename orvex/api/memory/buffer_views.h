#ifndef ORVEX_API_MEMORY_BUFFER_VIEWS_H_
#define ORVEX_API_MEMORY_BUFFER_VIEWS_H_

// Buffers that own no memory and present another buffer, their source:
//
// - SpanBuffer: a byte range of the source with its own size, fence and a
//   copy of the source's attributes (how one allocation is cut into several
//   buffers);
// - ProxyBuffer: stands in for the whole source and forwards almost
//   everything to it, its fence included.
//
// Both keep the source alive, translate mapping requests into the source's
// terms and hand back the source's handle (so a mapping may outlive its
// view), forward CPU cache maintenance, and pass clean-ups on to the source
// by the rules of AddCleanup below.
//
// Thread safety: views take no lock of their own except the proxy's
// clean-up mutex; they are as thread-safe as their source.

#include <cstdint>
#include <memory>
#include <string>

#include "orvex/api/memory/buffer.h"
#include "orvex/base/export.h"
#include "orvex/status/statusor.h"

namespace orvex {

class ORVEX_EXPORT SpanBuffer final : public Buffer {
 public:
  // `size` bytes of `source` starting at byte `offset`. INVALID_ARGUMENT
  // "Invalid buffer pointer" for a null source, and "Requested SpanBuffer
  // extent: <offset + size> greater than original buffer size: <n>" when the
  // range ends past the source (tested on the exact sum).
  static StatusOr<std::shared_ptr<SpanBuffer>> Make(const std::shared_ptr<Buffer>& source,
                                                    uint64_t offset, uint64_t size,
                                                    std::unique_ptr<Fence> fence);

  SpanBuffer(Sigil, std::shared_ptr<Buffer> source, uint64_t offset, uint64_t size,
             std::unique_ptr<Fence> fence);
  ~SpanBuffer() override;

  // The source's descriptor.
  int GetFd() const override;
  // The source's offset plus the span's.
  int64_t GetOffset() const override;

  // Maps the source at the span's offset plus `offset`. INVALID_ARGUMENT for
  // a negative offset or a range ending past the span; a failure of the
  // source is annotated with "Error mapping: " and this span's text. The
  // handle belongs to the source.
  StatusOr<std::unique_ptr<MappedHandle>> Map(int64_t offset, uint64_t size,
                                              BufferAccessMode mode) override;
  StatusOr<std::unique_ptr<const MappedHandle>> Map(int64_t offset, uint64_t size,
                                                    BufferAccessMode mode) const override;

  // The source's cache maintenance (it covers the whole source).
  void DoCpuSync(bool begin, BufferAccessMode mode) const override;
  // Always registered on the source: it runs when the source dies and
  // receives the source's pointer.
  void AddCleanup(Cleanup cleanup, bool propagate) const override;

  // {type: SpanBuffer, Size: <n>, Offset: <o>, Attributes: <...>,
  //  OriginalBuffer: <source's text>}
  std::string DebugStr() const override;

  const std::shared_ptr<Buffer>& source() const { return source_; }

 protected:
  void Unmap(int64_t offset, uint64_t size, BufferAccessMode mode) override;

 private:
  StatusOr<std::unique_ptr<MappedHandle>> MapImpl(int64_t offset, uint64_t size,
                                                  BufferAccessMode mode) const;

  std::shared_ptr<Buffer> source_;
  uint64_t offset_;
};

class ORVEX_EXPORT ProxyBuffer final : public Buffer {
 public:
  // A proxy for `source` with the source's size and attributes.
  // `forward_all_cleanups` sends every clean-up to the source; `keep_alive`
  // is only held until the proxy dies; `own_fence` is the fence the proxy's
  // WaitForDone waits on (GetFence and SetFence act on the source's).
  // INVALID_ARGUMENT "Invalid buffer pointer" for a null source.
  static StatusOr<std::shared_ptr<ProxyBuffer>> Make(std::shared_ptr<Buffer> source,
                                                     bool forward_all_cleanups,
                                                     std::shared_ptr<void> keep_alive,
                                                     std::unique_ptr<Fence> own_fence);

  ProxyBuffer(Sigil, std::shared_ptr<Buffer> source, bool forward_all_cleanups,
              std::shared_ptr<void> keep_alive, std::unique_ptr<Fence> own_fence);
  // Runs the proxy's own clean-ups, then releases `keep_alive`, then the
  // source.
  ~ProxyBuffer() override;

  Fence* GetFence() const override;
  void SetFence(std::unique_ptr<Fence> fence) override;
  int GetFd() const override;
  int64_t GetOffset() const override;

  // The source's Map; a failure is annotated with "Error mapping: " and the
  // proxy's text.
  StatusOr<std::unique_ptr<MappedHandle>> Map(int64_t offset, uint64_t size,
                                              BufferAccessMode mode) override;
  StatusOr<std::unique_ptr<const MappedHandle>> Map(int64_t offset, uint64_t size,
                                                    BufferAccessMode mode) const override;

  void DoCpuSync(bool begin, BufferAccessMode mode) const override;
  // Kept by the proxy when neither `forward_all_cleanups` nor `propagate` is
  // set; otherwise registered on the source.
  void AddCleanup(Cleanup cleanup, bool propagate) const override;

  // {type: ProxyBuffer, OriginalBuffer: <source's text>}
  std::string DebugStr() const override;

  const std::shared_ptr<Buffer>& source() const { return source_; }

 protected:
  void Unmap(int64_t offset, uint64_t size, BufferAccessMode mode) override;

 private:
  StatusOr<std::unique_ptr<MappedHandle>> MapImpl(int64_t offset, uint64_t size,
                                                  BufferAccessMode mode) const;

  std::shared_ptr<Buffer> source_;
  bool forward_all_cleanups_;
  std::shared_ptr<void> keep_alive_;
};

}  // namespace orvex

#endif  // ORVEX_API_MEMORY_BUFFER_VIEWS_H_
