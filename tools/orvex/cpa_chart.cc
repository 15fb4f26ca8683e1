// The SVG chart of `orvex cpa --svg`.

#include <algorithm>
#include <cmath>
#include <optional>
#include <string>
#include <vector>

#include "fmt/format.h"
#include "orvex/api/debug/camera_latency_analyzer.h"
#include "tools/orvex/cpa.h"
#include "tools/orvex/layout_svg.h"
#include "tools/orvex/table.h"

namespace orvex_tool {
namespace {

constexpr int kLeft = 70;  // room for the duration labels
constexpr int kPlotWidth = 640;
constexpr int kPlotHeight = 160;
constexpr int kPanelHeight = kPlotHeight + 70;

// Text of a file for an SVG document: no control characters, XML escaped.
std::string SvgText(std::string_view text) { return XmlEscape(EscapeControlCharacters(text)); }

struct Point {
  size_t session;
  float overall_ms;
};

struct Panel {
  std::string operation;
  std::vector<Point> points;
};

std::vector<Panel> PanelsOf(const std::vector<CpaSession>& sessions) {
  std::vector<Panel> panels;
  for (size_t s = 0; s < sessions.size(); ++s) {
    for (const orvex::CameraLatencyData& data : sessions[s].file.camera_latency_data()) {
      const std::optional<float> overall = LargestOverallMs(data);
      if (!overall || !std::isfinite(*overall)) continue;
      auto panel = std::find_if(panels.begin(), panels.end(), [&](const Panel& p) {
        return p.operation == data.operation_case();
      });
      if (panel == panels.end()) panel = panels.insert(panel, {data.operation_case(), {}});
      // Records of one operation within a session are one file entry; a
      // second entry of the same name (hand-made files) joins the first.
      if (!panel->points.empty() && panel->points.back().session == s) {
        panel->points.back().overall_ms = std::max(panel->points.back().overall_ms, *overall);
      } else {
        panel->points.push_back({s, *overall});
      }
    }
  }
  return panels;
}

}  // namespace

std::string CpaChartSvg(const std::vector<CpaSession>& sessions) {
  const std::vector<Panel> panels = PanelsOf(sessions);
  const double step = sessions.size() > 1 ? static_cast<double>(kPlotWidth) /
                                                static_cast<double>(sessions.size() - 1)
                                          : 0.0;
  auto x_of = [&](size_t session) {
    return kLeft + (sessions.size() > 1 ? step * static_cast<double>(session) : kPlotWidth / 2.0);
  };
  std::string body;
  int top = 20;
  for (const Panel& panel : panels) {
    const std::optional<float> threshold =
        orvex::CameraLatencyAnalyzer::LatencyThresholdMs(panel.operation);
    float highest = threshold.value_or(0.0f);
    int over = 0;
    for (const Point& p : panel.points) {
      highest = std::max(highest, p.overall_ms);
      if (threshold && p.overall_ms >= *threshold) ++over;
    }
    const double scale_max = highest > 0 ? highest * 1.1 : 1.0;
    const int plot_top = top + 30;
    auto y_of = [&](double ms) {
      return plot_top + kPlotHeight - std::clamp(ms / scale_max, 0.0, 1.0) * kPlotHeight;
    };
    body += fmt::format(
        "<text x=\"{}\" y=\"{}\" font-size=\"14\" font-weight=\"bold\">{}: Overall per "
        "session{}</text>\n",
        kLeft, top + 16, SvgText(panel.operation),
        threshold ? fmt::format(" (threshold {:g} ms, {} of {} at or over)", *threshold, over,
                                panel.points.size())
                  : "");
    body += fmt::format(
        "<rect x=\"{}\" y=\"{}\" width=\"{}\" height=\"{}\" fill=\"#fafafa\" stroke=\"#999\"/>\n"
        "<text x=\"{}\" y=\"{:.1f}\" font-size=\"11\" text-anchor=\"end\">{:.1f} ms</text>\n"
        "<text x=\"{}\" y=\"{}\" font-size=\"11\" text-anchor=\"end\">0 ms</text>\n",
        kLeft, plot_top, kPlotWidth, kPlotHeight, kLeft - 6, y_of(scale_max) + 4, scale_max,
        kLeft - 6, plot_top + kPlotHeight + 4);
    if (threshold) {
      body += fmt::format(
          "<line x1=\"{}\" y1=\"{:.1f}\" x2=\"{}\" y2=\"{:.1f}\" stroke=\"#c0392b\" "
          "stroke-dasharray=\"6 4\"/>\n"
          "<text x=\"{}\" y=\"{:.1f}\" font-size=\"11\" fill=\"#c0392b\" "
          "text-anchor=\"end\">threshold {:g} ms</text>\n",
          kLeft, y_of(*threshold), kLeft + kPlotWidth, y_of(*threshold), kLeft + kPlotWidth - 4,
          y_of(*threshold) - 4, *threshold);
    }
    std::string line;
    for (const Point& p : panel.points) {
      line += fmt::format("{}{:.1f},{:.1f}", line.empty() ? "" : " ", x_of(p.session),
                          y_of(p.overall_ms));
    }
    body += fmt::format("<polyline points=\"{}\" fill=\"none\" stroke=\"#2c6fbb\"/>\n", line);
    for (const Point& p : panel.points) {
      const bool slow = threshold && p.overall_ms >= *threshold;
      body += fmt::format(
          "<circle cx=\"{:.1f}\" cy=\"{:.1f}\" r=\"{}\" fill=\"{}\"><title>{} {}: {:.3f} "
          "ms{}</title></circle>\n",
          x_of(p.session), y_of(p.overall_ms), slow ? 5 : 3.5, slow ? "#c0392b" : "#2c6fbb",
          SvgText(sessions[p.session].path),
          absl::FormatTime("%Y-%m-%d %H:%M:%S", sessions[p.session].time, absl::LocalTimeZone()),
          p.overall_ms, slow ? ", over the threshold" : "");
    }
    const int axis = plot_top + kPlotHeight + 16;
    auto time_label = [&](size_t session, const char* anchor) {
      return fmt::format(
          "<text x=\"{:.1f}\" y=\"{}\" font-size=\"11\" text-anchor=\"{}\">{}</text>\n",
          x_of(session), axis, anchor,
          absl::FormatTime("%Y-%m-%d %H:%M:%S", sessions[session].time, absl::LocalTimeZone()));
    };
    body += time_label(panel.points.front().session, panel.points.size() > 1 ? "start" : "middle");
    if (panel.points.size() > 1) body += time_label(panel.points.back().session, "end");
    top += kPanelHeight;
  }
  if (panels.empty()) {
    body += fmt::format(
        "<text x=\"{}\" y=\"{}\" font-size=\"14\">no Overall events in {} session{}</text>\n",
        kLeft, top + 16, sessions.size(), sessions.size() == 1 ? "" : "s");
    top += 40;
  }
  const int width = kLeft + kPlotWidth + 30;
  return SvgDocument(width, top, body);
}

}  // namespace orvex_tool
