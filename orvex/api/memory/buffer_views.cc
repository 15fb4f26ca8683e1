#include "orvex/api/memory/buffer_views.h"

#include <limits>
#include <utility>

#include "absl/numeric/int128.h"
#include "orvex/status/status_builder.h"

namespace orvex {
namespace {

// Hands a view's source failure back with the view's own description.
Status AnnotateMapError(const Status& status, const Buffer& view) {
  return StatusBuilder(status, ORVEX_LOC) << "Error mapping: " << view.DebugStr();
}

}  // namespace

// ---------------------------------------------------------------- SpanBuffer

StatusOr<std::shared_ptr<SpanBuffer>> SpanBuffer::Make(const std::shared_ptr<Buffer>& source,
                                                       uint64_t offset, uint64_t size,
                                                       std::unique_ptr<Fence> fence) {
  if (source == nullptr) return InvalidArgumentError("Invalid buffer pointer");
  // The exact extent: a sum that would wrap in 64 bits is still refused.
  const absl::uint128 extent = absl::uint128(offset) + size;
  if (extent > source->GetSize()) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC)
           << "Requested SpanBuffer extent: " << extent
           << " greater than original buffer size: " << source->GetSize();
  }
  return std::make_shared<SpanBuffer>(Sigil{}, source, offset, size, std::move(fence));
}

SpanBuffer::SpanBuffer(Sigil, std::shared_ptr<Buffer> source, uint64_t offset, uint64_t size,
                       std::unique_ptr<Fence> fence)
    : Buffer(source->GetAttributes(), size, std::move(fence)),
      source_(std::move(source)),
      offset_(offset) {}

SpanBuffer::~SpanBuffer() { RunCleanups(); }

int SpanBuffer::GetFd() const { return source_->GetFd(); }

int64_t SpanBuffer::GetOffset() const {
  // Two's-complement wrap made explicit; offsets are far below 2^63.
  return static_cast<int64_t>(static_cast<uint64_t>(source_->GetOffset()) + offset_);
}

StatusOr<std::unique_ptr<Buffer::MappedHandle>> SpanBuffer::MapImpl(int64_t offset, uint64_t size,
                                                                    BufferAccessMode mode) const {
  // A negative offset would reach the source's bytes before the span.
  if (offset < 0) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC) << "Invalid negative offset: " << offset;
  }
  const absl::uint128 end = absl::uint128(static_cast<uint64_t>(offset)) + size;
  if (end > GetSize()) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC)
           << "size + offset: " << end << " extends beyone span buffer size: " << GetSize();
  }
  const absl::uint128 source_offset = absl::uint128(offset_) + static_cast<uint64_t>(offset);
  if (source_offset > static_cast<uint64_t>(std::numeric_limits<int64_t>::max())) {
    return OutOfRangeErrorBuilder(ORVEX_LOC)
           << "Offset: " << source_offset << " does not fit a buffer offset";
  }
  StatusOr<std::unique_ptr<MappedHandle>> handle =
      source_->Map(static_cast<int64_t>(source_offset), size, mode);
  if (!handle.ok()) return AnnotateMapError(handle.status(), *this);
  return handle;
}

StatusOr<std::unique_ptr<Buffer::MappedHandle>> SpanBuffer::Map(int64_t offset, uint64_t size,
                                                                BufferAccessMode mode) {
  return MapImpl(offset, size, mode);
}

StatusOr<std::unique_ptr<const Buffer::MappedHandle>> SpanBuffer::Map(int64_t offset, uint64_t size,
                                                                      BufferAccessMode mode) const {
  return MapImpl(offset, size, mode);
}

void SpanBuffer::DoCpuSync(bool begin, BufferAccessMode mode) const {
  source_->DoCpuSync(begin, mode);
}

void SpanBuffer::AddCleanup(Cleanup cleanup, bool propagate) const {
  source_->AddCleanup(std::move(cleanup), propagate);
}

std::string SpanBuffer::DebugStr() const {
  return BuildOrvexDebugStrWithStrings("SpanBuffer", {{"Size", std::to_string(GetSize())},
                                                      {"Offset", std::to_string(offset_)},
                                                      {"Attributes", AttributeStr()},
                                                      {"OriginalBuffer", source_->DebugStr()}});
}

void SpanBuffer::Unmap(int64_t /*offset*/, uint64_t /*size*/, BufferAccessMode /*mode*/) {}

// --------------------------------------------------------------- ProxyBuffer

StatusOr<std::shared_ptr<ProxyBuffer>> ProxyBuffer::Make(std::shared_ptr<Buffer> source,
                                                         bool forward_all_cleanups,
                                                         std::shared_ptr<void> keep_alive,
                                                         std::unique_ptr<Fence> own_fence) {
  if (source == nullptr) return InvalidArgumentError("Invalid buffer pointer");
  return std::make_shared<ProxyBuffer>(Sigil{}, std::move(source), forward_all_cleanups,
                                       std::move(keep_alive), std::move(own_fence));
}

ProxyBuffer::ProxyBuffer(Sigil, std::shared_ptr<Buffer> source, bool forward_all_cleanups,
                         std::shared_ptr<void> keep_alive, std::unique_ptr<Fence> own_fence)
    : Buffer(source->GetAttributes(), source->GetSize(), std::move(own_fence)),
      source_(std::move(source)),
      forward_all_cleanups_(forward_all_cleanups),
      keep_alive_(std::move(keep_alive)) {}

ProxyBuffer::~ProxyBuffer() {
  RunCleanups();
  keep_alive_.reset();
  source_.reset();
}

Fence* ProxyBuffer::GetFence() const { return source_->GetFence(); }

void ProxyBuffer::SetFence(std::unique_ptr<Fence> fence) { source_->SetFence(std::move(fence)); }

int ProxyBuffer::GetFd() const { return source_->GetFd(); }

int64_t ProxyBuffer::GetOffset() const { return source_->GetOffset(); }

StatusOr<std::unique_ptr<Buffer::MappedHandle>> ProxyBuffer::MapImpl(int64_t offset, uint64_t size,
                                                                     BufferAccessMode mode) const {
  StatusOr<std::unique_ptr<MappedHandle>> handle = source_->Map(offset, size, mode);
  if (!handle.ok()) return AnnotateMapError(handle.status(), *this);
  return handle;
}

StatusOr<std::unique_ptr<Buffer::MappedHandle>> ProxyBuffer::Map(int64_t offset, uint64_t size,
                                                                 BufferAccessMode mode) {
  return MapImpl(offset, size, mode);
}

StatusOr<std::unique_ptr<const Buffer::MappedHandle>> ProxyBuffer::Map(
    int64_t offset, uint64_t size, BufferAccessMode mode) const {
  return MapImpl(offset, size, mode);
}

void ProxyBuffer::DoCpuSync(bool begin, BufferAccessMode mode) const {
  source_->DoCpuSync(begin, mode);
}

void ProxyBuffer::AddCleanup(Cleanup cleanup, bool propagate) const {
  if (!forward_all_cleanups_ && !propagate) {
    Buffer::AddCleanup(std::move(cleanup), propagate);
  } else {
    source_->AddCleanup(std::move(cleanup), propagate);
  }
}

std::string ProxyBuffer::DebugStr() const {
  return BuildOrvexDebugStrWithStrings("ProxyBuffer", {{"OriginalBuffer", source_->DebugStr()}});
}

void ProxyBuffer::Unmap(int64_t /*offset*/, uint64_t /*size*/, BufferAccessMode /*mode*/) {}

}  // namespace orvex
