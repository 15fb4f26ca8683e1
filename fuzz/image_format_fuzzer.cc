// ImageFormat::Make with an arbitrary size, format code and chroma order,
// then every query and debug text of the result. Properties checked:
// - Make fails only with INVALID_ARGUMENT or UNIMPLEMENTED, with a message;
// - a made format records the requested size and the substituted format,
//   its components lie inside their buffers, and it conforms to its own
//   format and subsampling, except packed Y10 rows whose stride is no
//   multiple of 10 (widths that are no multiple of 8) and YCBCR_420_SP_M,
//   which has no rules; conformance to the requested code differs only for
//   the two IMPLEMENTATION_DEFINED codes;
// - every check returns the same code quietly, with an empty message.

#include <fuzzer/FuzzedDataProvider.h>

#include <cstdint>
#include <iterator>
#include <optional>
#include <string>

#include "orvex/api/memory/image_format.h"
#include "orvex/status/log.h"

namespace {

using orvex::HalPixelFormat;
using orvex::ImageFormat;
using orvex::Status;
using orvex::StatusCode;
using F = HalPixelFormat;
using Order = ImageFormat::InterleavedChromaOrder;
using Sub = ImageFormat::ChromaSubsampling;
using Content = ImageFormat::ComponentContent;

constexpr uint32_t kCodes[] = {
    0x3,        0x14,       0x20,       0x21,       0x22,       0x23,       0x25,
    0x26,       0x36,       0x105,      0x125,      0x127,      0x130,      0x132,
    0x134,      0x140,      0x141,      0x160,      0x161,      0x162,      0x50208,
    0x190023,   0x20203859, 0x20363159, 0x32315659, 0x40000000, 0x40000001, 0x40000002,
    0x40000003, 0x40000004, 0x40000005, 0x40000006, 0x40000007, 0x40000008, 0x40000009,
    0x4000000a, 0x4000000b, 0x4000000c, 0x4000000d, 0x4000000e, 0x4000000f};

// Mostly the codes that have layouts; otherwise any 32-bit value.
HalPixelFormat ConsumeFormat(FuzzedDataProvider& in) {
  const uint8_t pick = in.ConsumeIntegral<uint8_t>();
  if (pick < std::size(kCodes)) return static_cast<HalPixelFormat>(kCodes[pick]);
  return static_cast<HalPixelFormat>(in.ConsumeIntegral<int32_t>());
}

std::optional<Order> ConsumeOrder(FuzzedDataProvider& in) {
  switch (in.ConsumeIntegral<uint8_t>() % 4) {
    case 0:
      return std::nullopt;
    case 1:
      return Order::kCbCr;
    case 2:
      return Order::kCrCb;
    default:
      return static_cast<Order>(in.ConsumeIntegral<int32_t>());
  }
}

// Verbose and quiet forms agree on the code; the quiet one has no text.
Status CheckQuietMatches(const Status& verbose, const Status& quiet) {
  ORVEX_CHECK_EQ(verbose.code(), quiet.code()) << verbose;
  ORVEX_CHECK(quiet.message().empty()) << quiet;
  return verbose;
}

Status ConformsTo(const ImageFormat& f, HalPixelFormat target) {
  return CheckQuietMatches(f.ConformsTo(target, true), f.ConformsTo(target, false));
}

Status ConformsTo(const ImageFormat& f, Sub expected) {
  return CheckQuietMatches(f.ConformsTo(expected, true), f.ConformsTo(expected, false));
}

void CheckLayout(const ImageFormat& f) {
  for (const ImageFormat::Component& c : f.components()) {
    const std::string text = ImageFormat::ComponentToString(c);
    ORVEX_CHECK(c.buffer_index >= 0 &&
                static_cast<size_t>(c.buffer_index) < f.buffer_sizes().size())
        << text;
    ORVEX_CHECK(c.width >= 0 && c.height >= 0 && c.row_stride_bytes >= 0) << text;
    // The rows a consumer addresses through the component stay inside its
    // buffer.
    const unsigned __int128 end =
        static_cast<unsigned __int128>(c.offset_bytes) +
        static_cast<unsigned __int128>(c.height) * static_cast<unsigned>(c.row_stride_bytes);
    ORVEX_CHECK(end <= f.buffer_sizes()[static_cast<size_t>(c.buffer_index)])
        << text << " outside " << f.DebugStrVerbose();
  }
}

void CheckMade(const ImageFormat& f, int width, int height, HalPixelFormat requested) {
  HalPixelFormat expected = requested;
  if (requested == F::IMPLEMENTATION_DEFINED) expected = F::YCBCR_420_888;
  if (requested == F::IMPLEMENTATION_DEFINED_64) expected = F::YCBCR_420_888_STRIDE_ALIGNED_64;
  ORVEX_CHECK(f.format() == expected) << f.DebugStr();
  ORVEX_CHECK(f.width() == width && f.height() == height) << f.DebugStr();
  CheckLayout(f);

  const Status own = ConformsTo(f, f.format());
  if (f.format() == F::Y10 && width % 8 != 0) {
    ORVEX_CHECK_EQ(own.code(), StatusCode::kInvalidArgument) << own;
    ORVEX_CHECK(own.message() ==
                "ImageFormat does not conform to Y10. stride must be multiple of 10")
        << own;
  } else if (f.format() == F::YCBCR_420_SP_M) {
    ORVEX_CHECK_EQ(own.code(), StatusCode::kUnimplemented) << own;
  } else {
    ORVEX_CHECK(own.ok()) << f.DebugStrVerbose() << ": " << own;
  }
  if (requested == F::IMPLEMENTATION_DEFINED) {
    ORVEX_CHECK_EQ(ConformsTo(f, requested).code(), StatusCode::kInvalidArgument);
  } else if (requested == F::IMPLEMENTATION_DEFINED_64) {
    ORVEX_CHECK_EQ(ConformsTo(f, requested).code(), StatusCode::kUnimplemented);
  }
  if (f.chroma_subsampling().has_value()) {
    const Status sub = ConformsTo(f, *f.chroma_subsampling());
    ORVEX_CHECK(sub.ok()) << f.DebugStrVerbose() << ": " << sub;
    ORVEX_CHECK(f.IsYuv(true).ok()) << f.DebugStrVerbose();
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  FuzzedDataProvider in(data, size);
  const HalPixelFormat format = ConsumeFormat(in);
  const std::optional<Order> order = ConsumeOrder(in);
  const HalPixelFormat other_target = ConsumeFormat(in);
  const auto other_sub = static_cast<Sub>(in.ConsumeIntegral<int32_t>());
  const auto content = static_cast<Content>(in.ConsumeIntegralInRange<int32_t>(-1, 15));
  // Small sizes are the interesting ones; the rest of the input, if any,
  // reaches the 32-bit limits.
  const int width =
      in.ConsumeBool() ? in.ConsumeIntegralInRange(0, 9000) : in.ConsumeIntegral<int>();
  const int height =
      in.ConsumeBool() ? in.ConsumeIntegralInRange(0, 9000) : in.ConsumeIntegral<int>();

  const orvex::StatusOr<ImageFormat> made = ImageFormat::Make(width, height, format, order);
  if (!made.ok()) {
    const StatusCode code = made.status().code();
    ORVEX_CHECK(code == StatusCode::kInvalidArgument || code == StatusCode::kUnimplemented)
        << made.status();
    ORVEX_CHECK(!made.status().message().empty());
    return 0;
  }
  const ImageFormat& f = *made;
  CheckMade(f, width, height, format);

  // Arbitrary queries must not crash and must agree between their forms.
  for (const Status& status : {ConformsTo(f, other_target), ConformsTo(f, other_sub),
                               CheckQuietMatches(f.IsYuv(true), f.IsYuv(false)),
                               CheckQuietMatches(f.IsRaw(true), f.IsRaw(false))}) {
    ORVEX_CHECK(status.ok() || !status.message().empty()) << status;
  }
  const orvex::StatusOr<ImageFormat::Component> found = f.GetComponentFor(content, true);
  ORVEX_CHECK_EQ(found.ok(), f.GetComponentForInternal(content).has_value());
  ORVEX_CHECK_EQ(found.ok(), f.GetComponentFor(content, false).ok());
  static_cast<void>(f.Is64ByteAligned());
  const std::string texts = f.DebugStr() + f.DebugStrVerbose() +
                            ImageFormat::ChromaSubsamplingToString(other_sub) +
                            orvex::OptionalChromaSubsamplingToString(f.chroma_subsampling()) +
                            orvex::OptionalInterleavedChromaOrderToString(order) +
                            ImageFormat::ComponentContentToString(content);
  ORVEX_CHECK(!texts.empty());
  return 0;
}
