#include "tools/orvex/layout_svg.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <vector>

#include "fmt/format.h"

namespace orvex_tool {
namespace {

using orvex::ImageFormat;

constexpr double kBarLength = 720.0;  // pixels for the largest buffer
constexpr int kLeft = 20;
constexpr int kLaneHeight = 26;
constexpr int kLegendLine = 16;
constexpr double kCharWidth = 6.6;  // of the 11px sans-serif labels, generously

// Area of one component inside its buffer, in bytes, and its lane.
struct Area {
  const ImageFormat::Component* component;
  uint64_t begin;
  uint64_t end;
  size_t lane;
};

const char* ColorFor(ImageFormat::ComponentContent content) {
  static constexpr std::array<const char*, 8> kColors = {
      "#8fb8de", "#f2b880", "#9fd4a3", "#e89aa8", "#c5a3e0", "#e6d36f", "#7fcdc4", "#c9c9c9"};
  return kColors[static_cast<uint32_t>(content) % kColors.size()];
}

std::vector<Area> AreasOf(const ImageFormat& format, int buffer, uint64_t buffer_size) {
  std::vector<Area> areas;
  for (const ImageFormat::Component& c : format.components()) {
    if (c.buffer_index != buffer) continue;
    const uint64_t rows = c.height > 0 ? static_cast<uint64_t>(c.height) : 0;
    const uint64_t stride = c.row_stride_bytes > 0 ? static_cast<uint64_t>(c.row_stride_bytes) : 0;
    const uint64_t begin = std::min<uint64_t>(c.offset_bytes, buffer_size);
    const uint64_t end = std::clamp<uint64_t>(c.offset_bytes + rows * stride, begin, buffer_size);
    // First lane where the area overlaps nothing placed so far.
    size_t lane = 0;
    for (bool clash = true; clash;) {
      clash = false;
      for (const Area& other : areas) {
        if (other.lane == lane && begin < other.end && other.begin < end) {
          clash = true;
          ++lane;
          break;
        }
      }
    }
    areas.push_back({&c, begin, end, lane});
  }
  return areas;
}

}  // namespace

std::string XmlEscape(std::string_view text) {
  std::string out;
  for (char c : text) {
    switch (c) {
      case '&':
        out += "&amp;";
        break;
      case '<':
        out += "&lt;";
        break;
      case '>':
        out += "&gt;";
        break;
      case '"':
        out += "&quot;";
        break;
      default:
        out += c;
    }
  }
  return out;
}

std::string LayoutSvg(const ImageFormat& format) {
  const std::vector<size_t>& sizes = format.buffer_sizes();
  uint64_t largest = 1;
  uint64_t total = 0;
  for (size_t size : sizes) {
    largest = std::max<uint64_t>(largest, size);
    total += size;
  }
  const double scale = kBarLength / static_cast<double>(largest);
  const std::string name = orvex::FormatToString(format.format());

  std::string body;
  int y = 30;
  body += fmt::format(
      "<text x=\"{}\" y=\"{}\" font-size=\"14\" font-weight=\"bold\">{} {} x {}: {} buffer{}, {} "
      "bytes</text>\n",
      kLeft, y, XmlEscape(name), format.width(), format.height(), sizes.size(),
      sizes.size() == 1 ? "" : "s", total);
  y += 16;
  for (size_t b = 0; b < sizes.size(); ++b) {
    const std::vector<Area> areas = AreasOf(format, static_cast<int>(b), sizes[b]);
    size_t lanes = 1;
    for (const Area& area : areas) lanes = std::max(lanes, area.lane + 1);
    y += 18;
    body += fmt::format("<text x=\"{}\" y=\"{}\" font-size=\"12\">buffer {}: {} bytes</text>\n",
                        kLeft, y, b, sizes[b]);
    y += 6;
    const double bar = std::max(1.0, static_cast<double>(sizes[b]) * scale);
    const int bar_height = static_cast<int>(lanes) * kLaneHeight;
    body += fmt::format(
        "<rect x=\"{}\" y=\"{}\" width=\"{:.2f}\" height=\"{}\" fill=\"#f4f4f4\" "
        "stroke=\"#555\"/>\n",
        kLeft, y, bar, bar_height);
    for (const Area& area : areas) {
      const ImageFormat::Component& c = *area.component;
      const std::string content = ImageFormat::ComponentContentToString(c.content);
      const double x = kLeft + static_cast<double>(area.begin) * scale;
      const double w = std::max(1.0, static_cast<double>(area.end - area.begin) * scale);
      const int top = y + static_cast<int>(area.lane) * kLaneHeight;
      body += fmt::format(
          "<rect x=\"{:.2f}\" y=\"{}\" width=\"{:.2f}\" height=\"{}\" fill=\"{}\" "
          "stroke=\"#333\" stroke-width=\"0.5\"><title>{}: bytes {} to {}</title></rect>\n",
          x, top, w, kLaneHeight, ColorFor(c.content), XmlEscape(content), area.begin, area.end);
      if (w > kCharWidth * static_cast<double>(content.size()) + 8) {
        body += fmt::format("<text x=\"{:.2f}\" y=\"{}\" font-size=\"11\">{}</text>\n", x + 4,
                            top + 17, XmlEscape(content));
      }
    }
    y += bar_height + 4;
    for (const Area& area : areas) {
      const ImageFormat::Component& c = *area.component;
      y += kLegendLine;
      body += fmt::format(
          "<rect x=\"{}\" y=\"{}\" width=\"10\" height=\"10\" fill=\"{}\" stroke=\"#333\" "
          "stroke-width=\"0.5\"/>\n"
          "<text x=\"{}\" y=\"{}\" font-size=\"11\">{}: offset {}, {} bytes, {} x {}, row stride "
          "{}, {} bpp, pixel stride {}, phase {}</text>\n",
          kLeft, y - 9, ColorFor(c.content), kLeft + 16, y,
          XmlEscape(ImageFormat::ComponentContentToString(c.content)), c.offset_bytes,
          area.end - area.begin, c.width, c.height, c.row_stride_bytes, c.bits_per_pixel,
          c.pixel_stride, c.pixel_phase);
    }
    y += 8;
  }
  y += 12;
  const int width = kLeft * 2 + static_cast<int>(kBarLength) + 200;
  return SvgDocument(width, y, body);
}

std::string SvgDocument(int width, int height, std::string_view body) {
  return fmt::format(
      "<svg xmlns=\"http://www.w3.org/2000/svg\" width=\"{}\" height=\"{}\" viewBox=\"0 0 {} {}\" "
      "font-family=\"sans-serif\">\n"
      "<rect width=\"100%\" height=\"100%\" fill=\"white\"/>\n{}</svg>\n",
      width, height, width, height, body);
}

}  // namespace orvex_tool
