#ifndef ORVEX_API_MEMORY_IMAGE_FORMAT_H_
#define ORVEX_API_MEMORY_IMAGE_FORMAT_H_

// ImageFormat: how the samples of one image lie in memory. It records the
// HAL pixel format, the size in pixels, the byte size of each buffer the
// image needs, and one Component per kind of sample (luma, each chroma
// channel, Bayer mosaic, or the header and payload areas of a compressed
// image) with its buffer, byte offset, size, row stride and sample stride.
//
// An ImageFormat is made only by ImageFormat::Make, which validates the
// dimensions and computes the layout the format implies:
//
//   ORVEX_ASSIGN_OR_RETURN(ImageFormat f,
//                          ImageFormat::Make(4000, 3000, HalPixelFormat::YCBCR_420_888));
//   // f.buffer_sizes() == {12000000, 6000000}
//
// The query members check whether a layout conforms to a HAL pixel format or
// a chroma subsampling and return OK or the first rule that failed. With
// verbose == false the failures carry the same codes with empty messages.
//
// Thread safety: an ImageFormat is an immutable value; any number of threads
// may read one concurrently.

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "orvex/api/memory/hal_pixel_format.h"
#include "orvex/base/export.h"
#include "orvex/status/printable.h"
#include "orvex/status/status.h"
#include "orvex/status/statusor.h"

namespace orvex {

class ORVEX_EXPORT ImageFormat : public Printable {
 public:
  // What a component holds. kRgb, kRed, kGreen and kBlue are part of the
  // vocabulary but no format made here produces them.
  enum class ComponentContent : int32_t {
    kUnspecified = 0,
    kBayer = 1,
    kRgb = 2,
    kRed = 3,
    kGreen = 4,
    kBlue = 5,
    kLuma = 6,
    kChromaB = 7,
    kChromaR = 8,
    kCompressedLumaHeader = 9,
    kCompressedLumaPayload = 10,
    kCompressedChromaHeader = 11,
    kCompressedChromaPayload = 12,
    kCompressedBayerHeader = 13,
    kCompressedBayerPayload = 14,
  };

  enum class ChromaSubsampling : int32_t { k444 = 0, k420 = 1, k422 = 2 };

  // Which chroma sample comes first where Cb and Cr are interleaved.
  enum class InterleavedChromaOrder : int32_t { kCbCr = 0, kCrCb = 1 };

  // One kind of sample. For compressed header and payload areas `width` is
  // the stride or block count of the layout rather than a pixel width.
  // Constructed from the first six values; the last three default.
  struct Component {
    ComponentContent content;
    int buffer_index;
    size_t offset_bytes;  // first row inside the buffer
    int width;            // samples per row
    int height;           // rows
    int row_stride_bytes;
    int bits_per_pixel = 8;
    int pixel_stride = 1;  // samples between two samples of this component
    int pixel_phase = 0;   // index of the first sample within the row

    friend bool operator==(const Component&, const Component&) = default;
  };

  // Lays out a width x height image of `format`. IMPLEMENTATION_DEFINED and
  // IMPLEMENTATION_DEFINED_64 are laid out (and recorded) as YCBCR_420_888
  // and YCBCR_420_888_STRIDE_ALIGNED_64. An order value that is no
  // enumerator is recorded as given and laid out, printed and checked as
  // kCrCb. Errors:
  //   UNIMPLEMENTED     format without a layout (RGB_888, unknown codes), or
  //                     a YCBCR_422_I order other than kCrCb;
  //   INVALID_ARGUMENT  dimensions that are not multiples the format needs,
  //                     negative dimensions, sizes whose strides do not fit
  //                     in int, or an order given for a format without
  //                     interleaved chroma.
  static StatusOr<ImageFormat> Make(
      int width, int height, HalPixelFormat format,
      std::optional<InterleavedChromaOrder> interleaved_chroma_order = std::nullopt);

  ImageFormat(const ImageFormat&) = default;
  ImageFormat& operator=(const ImageFormat&) = default;
  ImageFormat(ImageFormat&&) noexcept = default;
  ImageFormat& operator=(ImageFormat&&) noexcept = default;
  ~ImageFormat() override = default;

  HalPixelFormat format() const { return format_; }
  int width() const { return width_; }
  int height() const { return height_; }
  const std::vector<size_t>& buffer_sizes() const { return buffer_sizes_; }
  const std::vector<Component>& components() const { return components_; }
  const std::optional<ChromaSubsampling>& chroma_subsampling() const { return chroma_subsampling_; }
  const std::optional<InterleavedChromaOrder>& interleaved_chroma_order() const {
    return interleaved_chroma_order_;
  }

  // {type: ImageFormat, HalPixelFormat: <name>, Width: <w>, Height: <h>}
  std::string DebugStr() const override;
  // DebugStr's fields plus BufferSizes, Components, ChromaSubsampling and
  // InterleavedChromaOrder.
  std::string DebugStrVerbose() const;

  static std::string ComponentToString(const Component& component);
  static std::string ComponentContentToString(ComponentContent content);
  // "444", "420", "422"; any other value reads "444".
  static std::string ChromaSubsamplingToString(ChromaSubsampling subsampling);
  // "CbCr" for kCbCr, "CrCb" for any other value.
  static std::string InterleavedChromaOrderToString(InterleavedChromaOrder order);

  // The first component (in vector order) holding `content`, if any.
  std::optional<Component> GetComponentForInternal(ComponentContent content) const;
  // As above; FAILED_PRECONDITION when there is none.
  StatusOr<Component> GetComponentFor(ComponentContent content, bool verbose = true) const;

  // OK when the format has luma and both chroma components (or compressed
  // luma and chroma payloads) and a chroma subsampling; INVALID_ARGUMENT
  // otherwise.
  Status IsYuv(bool verbose = true) const;
  // OK when some component is Bayer or a compressed Bayer payload;
  // INVALID_ARGUMENT otherwise.
  Status IsRaw(bool verbose = true) const;

  // OK when the chroma subsampling is `expected` and (for uncompressed
  // layouts) the chroma components have the matching size; INVALID_ARGUMENT
  // otherwise.
  Status ConformsTo(ChromaSubsampling expected, bool verbose = true) const;
  // OK when the layout satisfies the rules of `target`; INVALID_ARGUMENT
  // naming the first failed rule; UNIMPLEMENTED for targets without rules
  // (RGB_888, YCBCR_420_SP_M, IMPLEMENTATION_DEFINED_64, unknown codes).
  Status ConformsTo(HalPixelFormat target, bool verbose = true) const;

  // Is64ByteAlignedPixelFormat(format()).
  bool Is64ByteAligned() const;

  friend bool operator==(const ImageFormat& a, const ImageFormat& b) {
    return a.format_ == b.format_ && a.width_ == b.width_ && a.height_ == b.height_ &&
           a.buffer_sizes_ == b.buffer_sizes_ && a.components_ == b.components_ &&
           a.chroma_subsampling_ == b.chroma_subsampling_ &&
           a.interleaved_chroma_order_ == b.interleaved_chroma_order_;
  }

 private:
  friend class ImageFormatTestPeer;  // builds hand-made layouts in tests

  ImageFormat(HalPixelFormat format, int width, int height, std::vector<size_t> buffer_sizes,
              std::vector<Component> components,
              std::optional<ChromaSubsampling> chroma_subsampling,
              std::optional<InterleavedChromaOrder> interleaved_chroma_order);

  HalPixelFormat format_;
  int width_;
  int height_;
  std::vector<size_t> buffer_sizes_;
  std::vector<Component> components_;
  std::optional<ChromaSubsampling> chroma_subsampling_;
  std::optional<InterleavedChromaOrder> interleaved_chroma_order_;
};

// "n/a" when empty, else the value's text.
ORVEX_EXPORT std::string OptionalChromaSubsamplingToString(
    const std::optional<ImageFormat::ChromaSubsampling>& subsampling);
ORVEX_EXPORT std::string OptionalInterleavedChromaOrderToString(
    const std::optional<ImageFormat::InterleavedChromaOrder>& order);

}  // namespace orvex

#endif  // ORVEX_API_MEMORY_IMAGE_FORMAT_H_
