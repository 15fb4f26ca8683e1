#include "orvex/api/algo/data_types/alignment_map.h"

#include <cstring>
#include <span>
#include <utility>

#include "orvex/api/algo/data_types/data_kernels.h"
#include "orvex/api/memory/allocation_spec.h"
#include "orvex/status/log.h"
#include "orvex/status/status_builder.h"
#include "orvex/status/status_macros.h"

namespace orvex {
namespace {

constexpr int32_t kBlockSize = 64;

// Whole blocks covering `pixels`, computed without overflow.
int32_t BlocksFor(int pixels) {
  return static_cast<int32_t>((int64_t{pixels} + kBlockSize - 1) / kBlockSize);
}

// Words per row: 4 bytes per block rounded up to 32 bytes, in words.
int32_t StrideFor(int32_t blocks) {
  return static_cast<int32_t>((int64_t{kAlignMapBytesPerPixel} * blocks + 31) / 32 * 8);
}

// Allocation flags of unpacked outputs, passed through to the allocator.
constexpr AllocationSpec::Flags kUnpackAllocationFlags = 32;

template <typename Out, size_t kPerWord>
void UnpackChunked(const unsigned char* in, uint64_t words, unsigned char* out,
                   void (*kernel)(std::span<const uint32_t>, std::span<Out>)) {
  // Storage of foreign buffers may start anywhere; go through aligned
  // chunks so that the kernels only ever see aligned elements.
  constexpr size_t kChunk = 1024;
  uint32_t word_chunk[kChunk];
  Out out_chunk[kChunk * kPerWord];
  for (uint64_t done = 0; done < words;) {
    const size_t n = static_cast<size_t>(std::min<uint64_t>(kChunk, words - done));
    std::memcpy(word_chunk, in + done * 4, n * 4);
    kernel(std::span<const uint32_t>(word_chunk, n), std::span<Out>(out_chunk, n * kPerWord));
    std::memcpy(out + done * kPerWord * sizeof(Out), out_chunk, n * kPerWord * sizeof(Out));
    done += n;
  }
}

bool IsAligned(const void* p, size_t alignment) {
  return reinterpret_cast<uintptr_t>(p) % alignment == 0;
}

}  // namespace

std::shared_ptr<AlignmentMap> AlignmentMap::Make(GenericSize<int> image_size,
                                                 std::shared_ptr<Buffer> buffer) {
  return std::make_shared<AlignmentMap>(Sigil(), image_size, std::move(buffer));
}

AlignmentMap::AlignmentMap(Sigil, GenericSize<int> image_size_in, std::shared_ptr<Buffer> buffer)
    : image_size(image_size_in),
      alignment_map_size{BlocksFor(image_size_in.width), BlocksFor(image_size_in.height)},
      alignment_map_stride(StrideFor(alignment_map_size.width)),
      buffer_(std::move(buffer)) {
  // Checked before mapping, so that a null buffer is never dereferenced.
  ORVEX_CHECK(buffer_ != nullptr);
  const int64_t required =
      int64_t{alignment_map_stride} * kAlignMapBytesPerPixel * alignment_map_size.height;
  if (required > 0 && buffer_->GetSize() < static_cast<uint64_t>(required)) {
    ORVEX_LOG(FATAL) << "Check failed: buffer_->GetSize() >= alignment_map_stride * "
                        "kAlignMapBytesPerPixel * alignment_map_size.height (buffer_->GetSize()="
                     << buffer_->GetSize()
                     << ", alignment_map_stride * kAlignMapBytesPerPixel * "
                        "alignment_map_size.height="
                     << required << ") ";
  }
  StatusOr<std::unique_ptr<Buffer::MappedHandle>> handle =
      buffer_->Map(0, buffer_->GetSize(), BufferAccessMode::kReadWrite);
  if (handle.ok()) buffer_handle_ = std::move(handle).value();
}

FenceWaitResult AlignmentMap::WaitForDone(absl::Duration timeout) const {
  return buffer_->WaitForDone(timeout);
}

StatusOr<std::unique_ptr<Buffer::MappedHandle>> AlignmentMap::UnpackMotionVectors(
    Allocator* allocator, std::shared_ptr<Buffer>& output) const {
  return Unpack(Content::kMotionVectors, allocator, output);
}

StatusOr<std::unique_ptr<Buffer::MappedHandle>> AlignmentMap::UnpackMatchingErrors(
    Allocator* allocator, std::shared_ptr<Buffer>& output) const {
  return Unpack(Content::kMatchingErrors, allocator, output);
}

StatusOr<std::unique_ptr<Buffer::MappedHandle>> AlignmentMap::Unpack(
    Content content, Allocator* allocator, std::shared_ptr<Buffer>& output) const {
  if (buffer_handle_ == nullptr) {
    return FailedPreconditionErrorBuilder(ORVEX_LOC)
           << "Alignment map buffer could not be mapped: " << buffer_->DebugStr();
  }
  const bool vectors = content == Content::kMotionVectors;
  const uint64_t words = buffer_handle_->size() / kAlignMapBytesPerPixel;
  const uint64_t required = vectors ? words * 2 * sizeof(int32_t) : words;

  if (output == nullptr) {
    // Allocation needs an allocator and a non-empty size.
    if (allocator == nullptr) {
      return InvalidArgumentErrorBuilder(ORVEX_LOC) << "No allocator for the unpacked output";
    }
    if (required == 0) {
      return InvalidArgumentErrorBuilder(ORVEX_LOC)
             << "Nothing to unpack: the alignment map is empty";
    }
    StatusOr<std::shared_ptr<Buffer>> allocated =
        Buffer::Allocate(allocator, required, kUnpackAllocationFlags, FenceType::kDummy);
    if (!allocated.ok()) {
      return StatusBuilder(allocated.status(), ORVEX_LOC)
             << (vectors ? "Error allocating image for motion vectors."
                         : "Error allocating image for matching errors.");
    }
    output = std::move(allocated).value();
  }
  // Also applies to a fresh allocation: nothing is written past the output.
  if (output->GetSize() < required) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC) << "Motion vector buffer is not big enough, need "
                                                  << required << " given " << output->GetSize();
  }
  ORVEX_ASSIGN_OR_RETURN(std::unique_ptr<Buffer::MappedHandle> handle,
                         output->Map(0, output->GetSize(), BufferAccessMode::kReadWrite));

  auto* out = static_cast<unsigned char*>(handle->data());
  const auto* in = static_cast<const unsigned char*>(buffer_handle_->data());
  // The unpacked range is overwritten below; only the rest needs zeroes.
  if (handle->size() > required) {
    std::memset(out + required, 0, static_cast<size_t>(handle->size() - required));
  }
  if (vectors) {
    if (IsAligned(in, alignof(uint32_t)) && IsAligned(out, alignof(int32_t))) {
      UnpackMotionVectorWords({reinterpret_cast<const uint32_t*>(in), words},
                              {reinterpret_cast<int32_t*>(out), 2 * words});
    } else {
      UnpackChunked<int32_t, 2>(in, words, out, &UnpackMotionVectorWords);
    }
  } else {
    if (IsAligned(in, alignof(uint32_t))) {
      UnpackMatchingErrorWords({reinterpret_cast<const uint32_t*>(in), words}, {out, words});
    } else {
      UnpackChunked<uint8_t, 1>(in, words, out, &UnpackMatchingErrorWords);
    }
  }
  return handle;
}

}  // namespace orvex
