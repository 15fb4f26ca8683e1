#ifndef ORVEX_API_MEMORY_IMAGE_H_
#define ORVEX_API_MEMORY_IMAGE_H_

// Image: a pixel layout (ImageFormat) bound to the buffers that hold the
// pixels, a small record of capture facts (the sideband) and one fence that
// completes when every buffer's fence has. An image is itself a Fence: a
// consumer waits on it, the producer completes it with SignalFences().
//
//   producer:
//     ORVEX_ASSIGN_OR_RETURN(auto image, Image::Make(format, {}, buffers));
//     ORVEX_ASSIGN_OR_RETURN(auto mapped,
//                            Image::MappedImage::Make(image.get(), BufferAccessMode::kWrite));
//     uint8_t* luma = nullptr;
//     ORVEX_ASSIGN_OR_RETURN(auto component,
//                            GetComponentFor(mapped.get(), ComponentContent::kLuma, &luma));
//     ... write through luma ...
//     ORVEX_RETURN_IF_ERROR(image->SignalFences(OkStatus()));
//   consumer:
//     FenceWaitResult done = image->WaitForDone(absl::Milliseconds(100));
//
// The image's fence refers to the fences its buffers own at the time of
// Make: replacing a buffer's fence (Buffer::SetFence) afterwards leaves the
// image waiting on a destroyed fence, so don't.
//
// Thread safety: an image holds no lock of its own. WaitForDone and Abort
// are as thread-safe as the merged fence; SignalFences signals each buffer's
// fence under that fence's own lock. A MappedImage is used by one thread at
// a time; several mapped images of one image map the buffers independently.

#include <array>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "absl/time/time.h"
#include "orvex/api/memory/buffer.h"
#include "orvex/api/memory/buffer_attributes.h"
#include "orvex/api/memory/hal_pixel_format.h"
#include "orvex/api/memory/image_format.h"
#include "orvex/api/thread/fence.h"
#include "orvex/base/export.h"
#include "orvex/status/printable.h"
#include "orvex/status/status.h"
#include "orvex/status/statusor.h"

namespace orvex {

// A crop rectangle in normalised image coordinates (0 to 1 across the
// image).
class ORVEX_EXPORT NormalizedCrop : public Printable {
 public:
  NormalizedCrop() = default;
  NormalizedCrop(float crop_left, float crop_top, float crop_width, float crop_height)
      : left(crop_left), top(crop_top), width(crop_width), height(crop_height) {}
  NormalizedCrop(const NormalizedCrop&) = default;
  NormalizedCrop& operator=(const NormalizedCrop&) = default;
  ~NormalizedCrop() override;

  // {type: NormalizedCrop, left: 0.500000, top: ..., width: ..., height: ...}
  std::string DebugStr() const override;

  friend bool operator==(const NormalizedCrop& a, const NormalizedCrop& b) {
    return a.left == b.left && a.top == b.top && a.width == b.width && a.height == b.height;
  }

  float left = 0;
  float top = 0;
  float width = 0;
  float height = 0;
};

class ORVEX_EXPORT Image final : public Fence {
  // Pass key: only Make constructs images.
  struct Sigil {
    explicit Sigil() = default;
  };

 public:
  // Capture facts that travel with the image, copied by value.
  struct ORVEX_EXPORT Sideband {
    std::optional<ColorFilterArrangement> color_filter_arrangement;
    std::optional<NormalizedCrop> sensor_crop;
    // Opaque data copied along with the sideband; nothing here reads it.
    std::array<uint8_t, 21> opaque_data{};

    // {type: Sideband, color_filter_arrangement: <text or N/A>,
    //  sensor_crop: <crop's text or N/A>}; the opaque data is not printed.
    std::string DebugStr() const;

    friend bool operator==(const Sideband&, const Sideband&) = default;
  };

  class MappedImage;

  // Binds `format`, `sideband` and `buffers` (in the order the format's
  // buffer indices name them) and merges the buffers' fences. Errors, all
  // INVALID_ARGUMENT:
  //   "Can't create Image with no buffers";
  //   "Image buffers contain a nullptr at index: <i>";
  //   "All buffers must have same transport, access, security and
  //    compression" (the cached attribute may differ);
  //   "ImageFormat component <content> refers to buffer index: <b>, but the
  //    Image has <n> buffers" (also for a negative index).
  // Buffer sizes are not compared with the format's buffer sizes.
  static StatusOr<std::shared_ptr<Image>> Make(ImageFormat format, Sideband sideband,
                                               std::vector<std::shared_ptr<Buffer>> buffers);

  // Behind Make, which has checked the arguments.
  Image(Sigil, ImageFormat format, Sideband sideband, std::vector<std::shared_ptr<Buffer>> buffers);
  // Releases the fence, then the buffers, then the format.
  ~Image() override;

  Image(const Image&) = delete;
  Image& operator=(const Image&) = delete;

  // The merged fence's wait: done when every buffer's fence is, with the
  // first error among them in buffer order.
  FenceWaitResult WaitForDone(absl::Duration timeout) const override;
  // Aborts every buffer's fence.
  void Abort() override;

  // Completes each buffer's fence with `status`, in buffer order: Signal for
  // a SoftwareFence, SignalDone for a TwoStageSoftwareFence (whose error is
  // returned unchanged). FAILED_PRECONDITION "Image Buffer Fence is not
  // signalable" for a buffer without a fence or with another kind. Stops at
  // the first failure; buffers signalled before it stay signalled.
  Status SignalFences(Status status) const;

  const ImageFormat& GetFormat() const { return format_; }
  // Sum of the buffers' sizes in bytes.
  uint64_t GetTotalSize() const { return total_size_; }
  const std::vector<std::shared_ptr<Buffer>>& GetBuffers() const { return buffers_; }
  // The first buffer's attributes, all five.
  const BufferAttributes& GetAttributes() const { return attributes_; }
  const Sideband& GetSideband() const { return sideband_; }

 private:
  ImageFormat format_;
  uint64_t total_size_ = 0;
  std::vector<std::shared_ptr<Buffer>> buffers_;
  std::shared_ptr<Fence> fence_;
  BufferAttributes attributes_;
  Sideband sideband_;
};

// Every buffer an image's format uses, mapped whole for CPU access. The
// mapped image shares the mapping handles and through them the buffers: it
// may outlive the image, and the buffers stay mapped until it is destroyed.
class ORVEX_EXPORT Image::MappedImage {
 public:
  using Handles = std::vector<std::shared_ptr<Buffer::MappedHandle>>;

  // Maps buffers 0 to the largest buffer index of the image's format.
  // INVALID_ARGUMENT "image must not be null"; a buffer's mapping error is
  // returned unchanged (buffers mapped before it are unmapped again).
  static StatusOr<std::shared_ptr<MappedImage>> Make(Image* image, BufferAccessMode mode);
  static StatusOr<std::shared_ptr<MappedImage>> Make(const Image* image, BufferAccessMode mode);

  // The handles Make keeps: entry i maps the whole of buffer i, for every i
  // up to the largest buffer index the format uses (0 without components).
  // Later buffers are not mapped. INVALID_ARGUMENT "image must not be null".
  static StatusOr<Handles> GetMappedHandles(const Image* image, BufferAccessMode mode);

  MappedImage(Sigil, ImageFormat format, Handles handles);

  // The CPU address of component `component_index` of the format; null when
  // the index names no component, its buffer is not mapped, or its offset
  // lies beyond the mapped buffer.
  uint8_t* GetPointer(int component_index);
  const uint8_t* GetPointer(int component_index) const;
  // The same for `component`, from its buffer index and offset alone.
  uint8_t* GetPointer(const ImageFormat::Component& component);
  const uint8_t* GetPointer(const ImageFormat::Component& component) const;

  const ImageFormat& format() const { return format_; }
  const Handles& handles() const { return handles_; }

 private:
  uint8_t* PointerFor(const ImageFormat::Component& component) const;
  uint8_t* PointerForIndex(int component_index) const;

  ImageFormat format_;
  Handles handles_;
};

// The format's first component holding `content` (FAILED_PRECONDITION from
// ImageFormat::GetComponentFor when there is none). When `data` is not null
// it receives the component's CPU address as GetPointer computes it (null
// when that buffer is not mapped). INVALID_ARGUMENT "mapped image must not be
// null".
ORVEX_EXPORT StatusOr<ImageFormat::Component> GetComponentFor(Image::MappedImage* mapped_image,
                                                              ImageFormat::ComponentContent content,
                                                              uint8_t** data);
ORVEX_EXPORT StatusOr<ImageFormat::Component> GetComponentFor(
    const Image::MappedImage* mapped_image, ImageFormat::ComponentContent content,
    const uint8_t** data);

}  // namespace orvex

#endif  // ORVEX_API_MEMORY_IMAGE_H_
