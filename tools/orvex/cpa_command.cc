// orvex cpa: reads a performance-data (".cpa") file.

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <ostream>
#include <string>

#include "fmt/format.h"
#include "google/protobuf/util/json_util.h"
#include "orvex/api/debug/camera_performance_analyzer.pb.h"
#include "orvex/status/status_macros.h"
#include "tools/orvex/table.h"
#include "tools/orvex/tool.h"

namespace orvex_tool {
namespace {

orvex::StatusOr<std::string> ReadWholeFile(const std::string& path) {
  const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC);
  if (fd == -1) return orvex::StatusFromErrno(errno, fmt::format("cannot open {}", path));
  std::string bytes;
  char chunk[65536];
  for (;;) {
    const ssize_t n = read(fd, chunk, sizeof(chunk));
    if (n == 0) break;
    if (n < 0) {
      if (errno == EINTR) continue;
      const int error = errno;
      close(fd);
      return orvex::StatusFromErrno(error, fmt::format("cannot read {}", path));
    }
    bytes.append(chunk, static_cast<size_t>(n));
  }
  close(fd);
  return bytes;
}

orvex::StatusOr<orvex::CameraPerformanceDataFile> ReadCpaFile(const std::string& path) {
  ORVEX_ASSIGN_OR_RETURN(std::string bytes, ReadWholeFile(path));
  orvex::CameraPerformanceDataFile file;
  // An empty file is a valid file holding no data.
  if (!file.ParseFromString(bytes)) {
    return orvex::InvalidArgumentError(
        fmt::format("{} is not a valid .cpa file: it does not parse as a "
                    "CameraPerformanceDataFile message ({} bytes)",
                    path, bytes.size()));
  }
  return file;
}

std::string CpaSummary(const orvex::CameraPerformanceDataFile& file) {
  std::string text;
  int events = 0;
  TextTable table({{"OPERATION"}, {"EVENT"}, {"DURATION (ms)", TextTable::Align::kRight}});
  for (const orvex::CameraLatencyData& operation : file.camera_latency_data()) {
    for (const orvex::CameraLatencyDataType& event : operation.latency_data()) {
      table.AddRow({operation.operation_case(), event.event_name(),
                    fmt::format("{:.3f}", event.duration_ms())});
      ++events;
    }
    if (operation.latency_data_size() == 0) table.AddRow({operation.operation_case(), "-", "-"});
  }
  if (file.camera_latency_data_size() == 0) {
    text += "latency data: none\n";
  } else {
    text += table.Render();
    text += fmt::format(
        "latency data: {} operation{}, {} event{}\n", file.camera_latency_data_size(),
        file.camera_latency_data_size() == 1 ? "" : "s", events, events == 1 ? "" : "s");
  }
  int frames = 0;
  for (const orvex::CameraPerformanceData& camera : file.camera_data()) {
    frames += camera.per_frame_data_size();
  }
  text += fmt::format("camera data: {} camera{}, {} frame{}\n", file.camera_data_size(),
                      file.camera_data_size() == 1 ? "" : "s", frames, frames == 1 ? "" : "s");
  if (file.has_graph_representation()) {
    const orvex::GraphRepresentation& graph = file.graph_representation();
    text += fmt::format("graph representation: '{}', {} nodes, {} edges\n", graph.graph_name(),
                        graph.nodes_size(), graph.edges_size());
  } else {
    text += "graph representation: none\n";
  }
  return text;
}

int RunCpa(const ParsedArgs& args, CommandContext& context) {
  auto file = ReadCpaFile(args.positionals[0]);
  if (!file.ok()) return context.Error(file.status());
  if (!args.Has("json")) {
    context.out() << CpaSummary(*file);
    return kExitOk;
  }
  std::string json;
  google::protobuf::util::JsonPrintOptions options;
  options.add_whitespace = true;
  const auto printed = google::protobuf::util::MessageToJsonString(*file, &json, options);
  if (!printed.ok()) {
    return context.Error(orvex::InternalError(
        fmt::format("cannot print {} as JSON: {}", args.positionals[0], printed.ToString())));
  }
  context.out() << json;
  if (json.empty() || json.back() != '\n') context.out() << "\n";
  return kExitOk;
}

}  // namespace

const Command& CpaCommand() {
  static const Command command = {
      {.name = "cpa",
       .positionals = "FILE",
       .positional_count = 1,
       .summary = "summarise a performance-data (.cpa) file",
       .details = "Prints the latency data (operation, event, duration in milliseconds) and\n"
                  "counts of the other sections. A file that does not parse is an error\n"
                  "(exit status 2); an empty file is valid and holds no data.\n\n"
                  "example: orvex cpa orvex-out/camera-ended-2026-12-06_17-40-26.cpa",
       .flags = {{"json", "", "print the whole message with Protocol Buffers' JSON printer"}}},
      RunCpa};
  return command;
}

}  // namespace orvex_tool
