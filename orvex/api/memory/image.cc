#include "orvex/api/memory/image.h"

#include <algorithm>
#include <string>
#include <utility>
#include <variant>
#include <vector>

#include "orvex/api/thread/merged_fence.h"
#include "orvex/api/thread/two_stage_software_fence.h"
#include "orvex/status/status_builder.h"
#include "orvex/status/status_macros.h"

namespace orvex {
namespace {

bool SameAttributesExceptCached(const BufferAttributes& a, const BufferAttributes& b) {
  return a.transport == b.transport && a.access == b.access && a.security == b.security &&
         a.compression == b.compression;
}

}  // namespace

NormalizedCrop::~NormalizedCrop() = default;

std::string NormalizedCrop::DebugStr() const {
  return BuildOrvexDebugStrWithStrings("NormalizedCrop", {{"left", std::to_string(left)},
                                                          {"top", std::to_string(top)},
                                                          {"width", std::to_string(width)},
                                                          {"height", std::to_string(height)}});
}

std::string Image::Sideband::DebugStr() const {
  return BuildOrvexDebugStrWithStrings(
      "Sideband",
      {{"color_filter_arrangement", color_filter_arrangement.has_value()
                                        ? ColorFilterArrangementToString(*color_filter_arrangement)
                                        : "N/A"},
       {"sensor_crop", sensor_crop.has_value() ? sensor_crop->DebugStr() : "N/A"}});
}

StatusOr<std::shared_ptr<Image>> Image::Make(ImageFormat format, Sideband sideband,
                                             std::vector<std::shared_ptr<Buffer>> buffers) {
  if (buffers.empty()) {
    return InvalidArgumentErrorBuilder(ORVEX_LOC) << "Can't create Image with no buffers";
  }
  // Construction reads every buffer, and the mapping reads every buffer the
  // format names: refuse what would make either dereference nothing.
  for (size_t i = 0; i < buffers.size(); ++i) {
    if (buffers[i] == nullptr) {
      return InvalidArgumentErrorBuilder(ORVEX_LOC)
             << "Image buffers contain a nullptr at index: " << i;
    }
  }
  const BufferAttributes& first = buffers.front()->GetAttributes();
  for (size_t i = 1; i < buffers.size(); ++i) {
    if (!SameAttributesExceptCached(first, buffers[i]->GetAttributes())) {
      return InvalidArgumentErrorBuilder(ORVEX_LOC)
             << "All buffers must have same transport, access, security and compression";
    }
  }
  for (const ImageFormat::Component& component : format.components()) {
    if (component.buffer_index < 0 ||
        static_cast<size_t>(component.buffer_index) >= buffers.size()) {
      return InvalidArgumentErrorBuilder(ORVEX_LOC)
             << "ImageFormat component " << ImageFormat::ComponentContentToString(component.content)
             << " refers to buffer index: " << component.buffer_index << ", but the Image has "
             << buffers.size() << " buffers";
    }
  }
  return std::make_shared<Image>(Sigil(), std::move(format), std::move(sideband),
                                 std::move(buffers));
}

Image::Image(Sigil, ImageFormat format, Sideband sideband,
             std::vector<std::shared_ptr<Buffer>> buffers)
    : format_(std::move(format)), buffers_(std::move(buffers)), sideband_(std::move(sideband)) {
  std::vector<Fence*> fences;
  fences.reserve(buffers_.size());
  for (const std::shared_ptr<Buffer>& buffer : buffers_) {
    total_size_ += buffer->GetSize();
    // Virtual, so that a view reports the fence it forwards to.
    fences.push_back(buffer->GetFence());
  }
  fence_ = MergeFences(std::move(fences));
  if (!buffers_.empty()) attributes_ = buffers_.front()->GetAttributes();
}

// Members go in reverse order of declaration: the fence, the buffers, then
// the format.
Image::~Image() = default;

FenceWaitResult Image::WaitForDone(absl::Duration timeout) const {
  if (fence_ == nullptr) return OkStatus();
  return fence_->WaitForDone(timeout);
}

void Image::Abort() {
  if (fence_ != nullptr) fence_->Abort();
}

Status Image::SignalFences(Status status) const {
  for (const std::shared_ptr<Buffer>& buffer : buffers_) {
    Fence* fence = buffer->GetFence();
    if (auto* software_fence = dynamic_cast<SoftwareFence*>(fence)) {
      software_fence->Signal(status);
    } else if (auto* two_stage_fence = dynamic_cast<TwoStageSoftwareFence*>(fence)) {
      ORVEX_RETURN_IF_ERROR(two_stage_fence->SignalDone(status));
    } else {
      return FailedPreconditionErrorBuilder(ORVEX_LOC) << "Image Buffer Fence is not signalable";
    }
  }
  return OkStatus();
}

StatusOr<Image::MappedImage::Handles> Image::MappedImage::GetMappedHandles(const Image* image,
                                                                           BufferAccessMode mode) {
  if (image == nullptr) return InvalidArgumentError("image must not be null");
  int largest_index = 0;
  for (const ImageFormat::Component& component : image->format_.components()) {
    largest_index = std::max(largest_index, component.buffer_index);
  }
  Handles handles;
  handles.reserve(static_cast<size_t>(largest_index) + 1);
  // Make has checked that every index the format uses names a buffer; the
  // bound also covers a format without components on an image of buffers.
  const size_t count = std::min(static_cast<size_t>(largest_index) + 1, image->buffers_.size());
  for (size_t i = 0; i < count; ++i) {
    Buffer& buffer = *image->buffers_[i];
    ORVEX_ASSIGN_OR_RETURN(std::unique_ptr<Buffer::MappedHandle> handle,
                           buffer.Map(0, buffer.GetSize(), mode));
    handles.push_back(std::move(handle));
  }
  return handles;
}

StatusOr<std::shared_ptr<Image::MappedImage>> Image::MappedImage::Make(const Image* image,
                                                                       BufferAccessMode mode) {
  if (image == nullptr) return InvalidArgumentError("image must not be null");
  ORVEX_ASSIGN_OR_RETURN(Handles handles, GetMappedHandles(image, mode));
  return std::make_shared<MappedImage>(Sigil(), image->format_, std::move(handles));
}

StatusOr<std::shared_ptr<Image::MappedImage>> Image::MappedImage::Make(Image* image,
                                                                       BufferAccessMode mode) {
  return Make(static_cast<const Image*>(image), mode);
}

Image::MappedImage::MappedImage(Sigil, ImageFormat format, Handles handles)
    : format_(std::move(format)), handles_(std::move(handles)) {}

uint8_t* Image::MappedImage::PointerFor(const ImageFormat::Component& component) const {
  if (component.buffer_index < 0 ||
      static_cast<size_t>(component.buffer_index) >= handles_.size()) {
    return nullptr;
  }
  const Buffer::MappedHandle& handle = *handles_[static_cast<size_t>(component.buffer_index)];
  // Pointer arithmetic past the mapping would be undefined; a component
  // starting beyond its buffer has no address.
  if (handle.data() == nullptr || component.offset_bytes > handle.size()) return nullptr;
  return static_cast<uint8_t*>(handle.data()) + component.offset_bytes;
}

uint8_t* Image::MappedImage::PointerForIndex(int component_index) const {
  const std::vector<ImageFormat::Component>& components = format_.components();
  if (component_index < 0 || static_cast<size_t>(component_index) >= components.size()) {
    return nullptr;
  }
  return PointerFor(components[static_cast<size_t>(component_index)]);
}

uint8_t* Image::MappedImage::GetPointer(int component_index) {
  return PointerForIndex(component_index);
}

const uint8_t* Image::MappedImage::GetPointer(int component_index) const {
  return PointerForIndex(component_index);
}

uint8_t* Image::MappedImage::GetPointer(const ImageFormat::Component& component) {
  return PointerFor(component);
}

const uint8_t* Image::MappedImage::GetPointer(const ImageFormat::Component& component) const {
  return PointerFor(component);
}

namespace {

// Both GetComponentFor overloads: the lookup, then the address.
template <typename MappedImageT, typename DataT>
StatusOr<ImageFormat::Component> GetComponentForImpl(MappedImageT* mapped_image,
                                                     ImageFormat::ComponentContent content,
                                                     DataT** data) {
  if (mapped_image == nullptr) return InvalidArgumentError("mapped image must not be null");
  ORVEX_ASSIGN_OR_RETURN(const ImageFormat::Component component,
                         mapped_image->format().GetComponentFor(content, true));
  if (data != nullptr) *data = mapped_image->GetPointer(component);
  return component;
}

}  // namespace

StatusOr<ImageFormat::Component> GetComponentFor(Image::MappedImage* mapped_image,
                                                 ImageFormat::ComponentContent content,
                                                 uint8_t** data) {
  return GetComponentForImpl(mapped_image, content, data);
}

StatusOr<ImageFormat::Component> GetComponentFor(const Image::MappedImage* mapped_image,
                                                 ImageFormat::ComponentContent content,
                                                 const uint8_t** data) {
  return GetComponentForImpl(mapped_image, content, data);
}

}  // namespace orvex
