#ifndef ORVEX_TOOLS_ORVEX_FORMAT_NAMES_H_
#define ORVEX_TOOLS_ORVEX_FORMAT_NAMES_H_

// The HAL pixel formats the library knows, in code order, and the reading of
// a format or chroma order given on the command line.

#include <optional>
#include <span>
#include <string_view>

#include "orvex/api/memory/hal_pixel_format.h"
#include "orvex/api/memory/image_format.h"
#include "orvex/status/statusor.h"
#include "tools/orvex/args.h"

namespace orvex_tool {

// A format name (any letter case) or a decimal or 0x-hexadecimal code. Codes
// need not name a known format: the library decides what it can lay out.
orvex::StatusOr<orvex::HalPixelFormat> ParseHalPixelFormat(std::string_view text,
                                                           std::string_view what);

// "CbCr" or "CrCb" (any letter case).
orvex::StatusOr<orvex::ImageFormat::InterleavedChromaOrder> ParseChromaOrder(std::string_view text);

// WIDTH HEIGHT FORMAT (the first three positional arguments) and --order, as
// the layout commands take them; INVALID_ARGUMENT with the text for the
// usage error.
struct LayoutArgs {
  int width;
  int height;
  orvex::HalPixelFormat format;
  std::optional<orvex::ImageFormat::InterleavedChromaOrder> order;
};
orvex::StatusOr<LayoutArgs> ParseLayoutArgs(const ParsedArgs& args);

// "0x23" style text of a code.
std::string HexCode(orvex::HalPixelFormat format);

}  // namespace orvex_tool

#endif  // ORVEX_TOOLS_ORVEX_FORMAT_NAMES_H_
