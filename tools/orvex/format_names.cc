#include "tools/orvex/format_names.h"

#include <array>
#include <cctype>
#include <limits>
#include <string>

#include "fmt/format.h"
#include "orvex/status/status.h"
#include "orvex/status/status_macros.h"
#include "tools/orvex/args.h"

namespace orvex_tool {
namespace {

using orvex::HalPixelFormat;

constexpr std::array kFormats = {
    HalPixelFormat::RGB_888,
    HalPixelFormat::YCBCR_422_I,
    HalPixelFormat::RAW16,
    HalPixelFormat::BLOB,
    HalPixelFormat::IMPLEMENTATION_DEFINED,
    HalPixelFormat::YCBCR_420_888,
    HalPixelFormat::RAW10,
    HalPixelFormat::RAW12,
    HalPixelFormat::YCBCR_P010,
    HalPixelFormat::YCBCR_420_SP_M,
    HalPixelFormat::YCBCR_420_SP_M_S10B,
    HalPixelFormat::YCBCR_P010_M,
    HalPixelFormat::YCBCR_420_SP_M_SBWC,
    HalPixelFormat::YCBCR_420_SP_M_S10B_SBWC,
    HalPixelFormat::YCRCB_420_SP_M_SBWC,
    HalPixelFormat::YCBCR_420_SP_M_SBWC_L50,
    HalPixelFormat::YCBCR_420_SP_M_SBWC_L75,
    HalPixelFormat::YCBCR_420_SP_M_S10B_SBWC_L40,
    HalPixelFormat::YCBCR_420_SP_M_S10B_SBWC_L60,
    HalPixelFormat::YCBCR_420_SP_M_S10B_SBWC_L80,
    HalPixelFormat::YCBCR_420_888_I_AFBC_WIDEBLK,
    HalPixelFormat::YCBCR_420_888_AFBC_EXTRAWIDEBLK,
    HalPixelFormat::Y8,
    HalPixelFormat::Y16,
    HalPixelFormat::YV12,
    HalPixelFormat::RAW16_BAYER_SBWC,
    HalPixelFormat::RAW16_BAYER_SBWC_L50,
    HalPixelFormat::RAW16_BAYER_SBWC_L75,
    HalPixelFormat::IMPLEMENTATION_DEFINED_64,
    HalPixelFormat::YCBCR_420_888_SINGLE_BUFFER,
    HalPixelFormat::Y10,
    HalPixelFormat::YCBCR_420_888_STRIDE_ALIGNED_64,
    HalPixelFormat::YCBCR_420_SP_M_STRIDE_ALIGNED_64,
    HalPixelFormat::YCBCR_420_SP_M_SBWC_STRIDE_ALIGNED_64,
    HalPixelFormat::YCBCR_420_SP_M_SBWC_L50_STRIDE_ALIGNED_64,
    HalPixelFormat::YCBCR_420_SP_M_S10B_STRIDE_ALIGNED_64,
    HalPixelFormat::YCBCR_420_SP_M_S10B_SBWC_STRIDE_ALIGNED_64,
    HalPixelFormat::YCBCR_420_SP_M_S10B_SBWC_L40_STRIDE_ALIGNED_64,
    HalPixelFormat::YCBCR_420_SP_M_S10B_SBWC_L80_STRIDE_ALIGNED_64,
    HalPixelFormat::YCBCR_420_888_SINGLE_BUFFER_STRIDE_ALIGNED_64,
    HalPixelFormat::YCBCR_P010_M_STRIDE_ALIGNED_64,
};

bool EqualsIgnoreCase(std::string_view a, std::string_view b) {
  if (a.size() != b.size()) return false;
  for (size_t i = 0; i < a.size(); ++i) {
    if (std::tolower(static_cast<unsigned char>(a[i])) !=
        std::tolower(static_cast<unsigned char>(b[i]))) {
      return false;
    }
  }
  return true;
}

}  // namespace

std::span<const HalPixelFormat> AllHalPixelFormats() { return kFormats; }

orvex::StatusOr<HalPixelFormat> ParseHalPixelFormat(std::string_view text, std::string_view what) {
  for (HalPixelFormat format : kFormats) {
    if (EqualsIgnoreCase(text, orvex::FormatToString(format))) return format;
  }
  if (text.empty() || !std::isdigit(static_cast<unsigned char>(text[0]))) {
    return orvex::InvalidArgumentError(fmt::format(
        "unknown {} '{}' (see 'orvex formats' for the names, or give a code)", what, text));
  }
  ORVEX_ASSIGN_OR_RETURN(uint32_t code, ParseCode(text, what));
  // Codes are 32-bit patterns; the enumeration's underlying type is signed.
  return static_cast<HalPixelFormat>(static_cast<int32_t>(code));
}

orvex::StatusOr<orvex::ImageFormat::InterleavedChromaOrder> ParseChromaOrder(
    std::string_view text) {
  using Order = orvex::ImageFormat::InterleavedChromaOrder;
  for (Order order : {Order::kCbCr, Order::kCrCb}) {
    if (EqualsIgnoreCase(text, orvex::ImageFormat::InterleavedChromaOrderToString(order))) {
      return order;
    }
  }
  return orvex::InvalidArgumentError(fmt::format("--order must be CbCr or CrCb, got '{}'", text));
}

orvex::StatusOr<LayoutArgs> ParseLayoutArgs(const ParsedArgs& args) {
  constexpr int64_t kMaxDimension = std::numeric_limits<int>::max();
  ORVEX_ASSIGN_OR_RETURN(int64_t width,
                         ParseInteger(args.positionals[0], "WIDTH", 1, kMaxDimension));
  ORVEX_ASSIGN_OR_RETURN(int64_t height,
                         ParseInteger(args.positionals[1], "HEIGHT", 1, kMaxDimension));
  ORVEX_ASSIGN_OR_RETURN(HalPixelFormat format, ParseHalPixelFormat(args.positionals[2], "FORMAT"));
  LayoutArgs parsed = {static_cast<int>(width), static_cast<int>(height), format, std::nullopt};
  if (auto text = args.Get("order")) {
    ORVEX_ASSIGN_OR_RETURN(parsed.order, ParseChromaOrder(*text));
  }
  return parsed;
}

std::string HexCode(HalPixelFormat format) {
  return fmt::format("0x{:x}", static_cast<uint32_t>(format));
}

}  // namespace orvex_tool
