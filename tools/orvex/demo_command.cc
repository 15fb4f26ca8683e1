// orvex demo: runs the frame pipeline of demo.h and prints what happened.

#include <cerrno>
#include <cstring>
#include <ostream>

#include "absl/strings/str_join.h"
#include "fmt/format.h"
#ifndef __ANDROID__
#include "host_trace/host_trace.h"
#endif
#include "orvex/api/debug/perf_trace.h"
#include "tools/orvex/demo.h"
#include "tools/orvex/format_names.h"
#include "tools/orvex/tool.h"

namespace orvex_tool {
namespace {

// The trace level that also records the library's fence waits.
constexpr int kDemoTraceLevel = 5;

std::string PrintReport(const DemoOptions& options, const DemoReport& report) {
  std::string text = fmt::format(
      "orvex demo: {} frames of {} {}x{} ({} buffer{}, {} bytes per frame)\n", options.frames,
      report.format_name, options.size.width, options.size.height, report.buffers_per_frame,
      report.buffers_per_frame == 1 ? "" : "s", report.bytes_per_frame);
  text += fmt::format("frames processed: {}\n", report.frames_processed);
  if (report.failures.empty() && report.frames_verified == options.frames) {
    text += fmt::format("verification: passed ({} of {} frames, {} plane checksums)\n",
                        report.frames_verified, options.frames, report.planes_checked);
  } else {
    text += fmt::format("verification: FAILED ({} of {} frames verified)\n", report.frames_verified,
                        options.frames);
    for (const std::string& failure : report.failures) text += fmt::format("  {}\n", failure);
  }
  const double seconds = absl::ToDoubleSeconds(report.elapsed);
  const double frames_per_second = seconds > 0 ? report.frames_processed / seconds : 0;
  text +=
      fmt::format("throughput: {:.1f} frames/s, {:.1f} MB/s ({:.3f} s in all)\n", frames_per_second,
                  frames_per_second * static_cast<double>(report.bytes_per_frame) / 1e6, seconds);
  text += fmt::format("signal-to-wake latency: median {:.3f} ms, p99 {:.3f} ms\n",
                      absl::ToDoubleMilliseconds(Percentile(report.wake_latencies, 0.5)),
                      absl::ToDoubleMilliseconds(Percentile(report.wake_latencies, 0.99)));
  text += fmt::format("latency profile: {}\n  read it back with: orvex cpa {}\n", report.cpa_path,
                      report.cpa_path);
  if (!report.dump_files.empty()) {
    const std::string files = absl::StrJoin(report.dump_files, " ");
    text += fmt::format("last frame: {}\n  render it with: orvex render {} {} {} {} -o {}.png\n",
                        files, options.size.width, options.size.height, report.format_name, files,
                        options.dump_dir + "/last-frame");
  }
  return text;
}

int RunDemoCommand(const ParsedArgs& args, CommandContext& context) {
  DemoOptions options;
  if (auto text = args.Get("size")) {
    auto size = ParseSize(*text, "--size");
    if (!size.ok()) return context.UsageError(size.status().message());
    options.size = *size;
  }
  if (auto text = args.Get("format")) {
    auto format = ParseHalPixelFormat(*text, "--format");
    if (!format.ok()) return context.UsageError(format.status().message());
    options.format = *format;
  }
  if (auto text = args.Get("frames")) {
    auto frames = ParseInteger(*text, "--frames", 1, 100000);
    if (!frames.ok()) return context.UsageError(frames.status().message());
    options.frames = static_cast<int>(*frames);
  }
  if (auto text = args.Get("out")) {
    if (text->empty()) return context.UsageError("--out must name a directory");
    options.out_dir = *text;
  }
  if (auto text = args.Get("dump")) {
    if (text->empty()) return context.UsageError("--dump must name a directory");
    options.dump_dir = *text;
  }
  if (context.terminal()) options.progress = &context.err();

  const std::optional<std::string> trace = args.Get("trace");
  if (trace.has_value()) {
#ifdef __ANDROID__
    // No host trace library on a device: the library's markers go to the
    // system trace there.
    return context.UsageError(
        "--trace records on a development host; on a device record the "
        "system trace (camera category) instead");
#else
    if (orvex_host_trace_start(trace->c_str()) != 0) {
      return context.Error(
          orvex::StatusFromErrno(errno, fmt::format("cannot trace into {}", *trace)));
    }
    orvex::PerfTrace::trace_level_.store(kDemoTraceLevel);
#endif
  }
  auto report = RunDemo(options);
  // A trace cut short (full disk) is no valid JSON: never recommend it.
  orvex::Status traced = orvex::OkStatus();
#ifndef __ANDROID__
  if (trace.has_value() && orvex_host_trace_stop() != 0) {
    traced = orvex::StatusFromErrno(errno, fmt::format("cannot write the trace {}", *trace));
  }
#endif
  if (!report.ok()) {
    if (!traced.ok()) context.Error(traced);
    return context.Error(report.status());
  }

  // The run itself is reported even when its trace failed.
  context.out() << PrintReport(options, *report);
  if (!traced.ok()) return context.Error(traced);
  if (trace.has_value()) {
    context.out() << fmt::format(
        "trace: {} (open it in the Perfetto UI, https://ui.perfetto.dev)\n", *trace);
  }
  const bool verified = report->failures.empty() && report->frames_verified == options.frames;
  return verified ? kExitOk : kExitNegative;
}

}  // namespace

const Command& DemoCommand() {
  static const Command command = {
      {.name = "demo",
       .positionals = "",
       .positional_count = 0,
       .summary = "run frames through allocation, fences, mapping and verification",
       .details =
           "A producer thread writes every plane of each frame through a mapped image and\n"
           "signals its fences; a consumer thread waits, maps the image and verifies a\n"
           "checksum of every plane. Prints frames processed, the verification result,\n"
           "throughput and the producer-signal-to-consumer-wake latency, and has the\n"
           "latency analyzer write a .cpa file into the output directory. Frames of a\n"
           "layout that holds samples show colour bars and a progress bar; --dump writes\n"
           "the last one for 'orvex render'. Exit status 1 when a frame fails\n"
           "verification, 2 when the trace cannot be written in full.\n\n"
           "example: orvex demo --size 1920x1080 --format YCBCR_P010 --frames 60 --trace t.json",
       .flags = {{"size", "WxH", "frame size (default 4000x3000)"},
                 {"format", "NAME", "pixel format, name or code (default YCBCR_420_888)"},
                 {"frames", "N", "number of frames, 1 to 100000 (default 30)"},
                 {"out", "DIR", "directory for the .cpa file (default ./orvex-out)"},
                 {"trace", "FILE", "record a trace (JSON, for the Perfetto UI) into FILE"},
                 {"dump", "DIR", "write the last frame's buffers into DIR for 'orvex render'"}}},
      RunDemoCommand};
  return command;
}

}  // namespace orvex_tool
