#ifndef ORVEX_TOOLS_ORVEX_LAYOUT_SVG_H_
#define ORVEX_TOOLS_ORVEX_LAYOUT_SVG_H_

// A picture of an image layout for reviews: every buffer as a bar whose
// length is its byte size (one scale for all buffers), each component as a
// labelled area of the bytes it covers (offset to offset + height x row
// stride), with components that share bytes (interleaved samples) stacked
// in lanes, and a legend line per component with its numbers.

#include <string>

#include "orvex/api/memory/image_format.h"

namespace orvex_tool {

// A standalone SVG document.
std::string LayoutSvg(const orvex::ImageFormat& format);

// A standalone SVG document of the given size on a white background around
// `body` (SVG elements).
std::string SvgDocument(int width, int height, std::string_view body);

// `text` with the XML special characters escaped.
std::string XmlEscape(std::string_view text);

}  // namespace orvex_tool

#endif  // ORVEX_TOOLS_ORVEX_LAYOUT_SVG_H_
