#include "orvex/api/memory/heap_allocator.h"

#include <string>
#include <utility>
#include <variant>
#include <vector>

#include "orvex/api/memory/hal_pixel_format.h"
#include "orvex/status/log.h"
#include "orvex/status/status_builder.h"
#include "orvex/status/status_macros.h"

namespace orvex {

HeapAllocator::HeapAllocator(FenceType default_fence_type)
    : default_fence_type_(default_fence_type),
      allocated_bytes_(std::make_shared<std::atomic<uint64_t>>(0)) {
  ORVEX_CHECK_NE(default_fence_type, FenceType::kDefault)
      << "HeapAllocator needs a concrete default fence type";
}

HeapAllocator::~HeapAllocator() = default;

StatusOr<std::shared_ptr<Buffer>> HeapAllocator::MakeBuffer(uint64_t size,
                                                            BufferCompression compression,
                                                            FenceType fence_type) {
  ORVEX_ASSIGN_OR_RETURN(std::shared_ptr<HeapBuffer<uint8_t>> buffer,
                         HeapBuffer<uint8_t>::Make(size, compression, CreateFence(fence_type)));
  allocated_bytes_->fetch_add(size, std::memory_order_relaxed);
  buffer->AddCleanup([allocated_bytes = allocated_bytes_, size](
                         Buffer*) { allocated_bytes->fetch_sub(size, std::memory_order_relaxed); },
                     /*propagate=*/false);
  return buffer;
}

StatusOr<Allocation> HeapAllocator::Allocate(const AllocationSpec& spec) {
  const FenceType fence_type =
      spec.fence_type() == FenceType::kDefault ? default_fence_type_ : spec.fence_type();
  if (const auto* by_size = std::get_if<AllocationSpec::BySize>(&spec.request())) {
    ORVEX_ASSIGN_OR_RETURN(std::shared_ptr<Buffer> buffer,
                           MakeBuffer(by_size->size, BufferCompression::kNone, fence_type));
    return Allocation({std::move(buffer)});
  }
  if (const auto* by_image = std::get_if<AllocationSpec::ByImage>(&spec.request())) {
    const BufferCompression compression =
        HalPixelFormatToBufferCompression(by_image->format.format());
    std::vector<std::shared_ptr<Buffer>> buffers;
    buffers.reserve(by_image->format.buffer_sizes().size());
    for (size_t size : by_image->format.buffer_sizes()) {
      ORVEX_ASSIGN_OR_RETURN(std::shared_ptr<Buffer> buffer,
                             MakeBuffer(size, compression, fence_type));
      buffers.push_back(std::move(buffer));
    }
    return Allocation(std::move(buffers), by_image->format);
  }
  return UnimplementedErrorBuilder(ORVEX_LOC)
         << "HeapAllocator cannot allocate by request id and stream id";
}

uint64_t HeapAllocator::GetAllocatedBytes() const {
  return allocated_bytes_->load(std::memory_order_relaxed);
}

std::string HeapAllocator::DebugStr() const {
  return BuildOrvexDebugStrWithStrings(
      "HeapAllocator",
      {{"DefaultFenceType", std::to_string(static_cast<int32_t>(default_fence_type_))},
       {"AllocatedBytes", std::to_string(GetAllocatedBytes())}});
}

}  // namespace orvex
