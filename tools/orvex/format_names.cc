#include "tools/orvex/format_names.h"

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

orvex::StatusOr<HalPixelFormat> ParseHalPixelFormat(std::string_view text, std::string_view what) {
  for (HalPixelFormat format : orvex::AllHalPixelFormats()) {
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
