// orvex cpa: reads performance-data (".cpa") files, one or many.

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <filesystem>
#include <ostream>
#include <string>
#include <vector>

#include "absl/container/flat_hash_map.h"
#include "absl/container/flat_hash_set.h"
#include "fmt/format.h"
#include "google/protobuf/io/zero_copy_stream_impl.h"
#include "google/protobuf/io/zero_copy_stream_impl_lite.h"
#include "google/protobuf/util/json_util.h"
#include "orvex/api/debug/camera_latency_analyzer.h"
#include "orvex/api/debug/camera_performance_analyzer.pb.h"
#include "tools/orvex/cpa.h"
#include "tools/orvex/demo.h"
#include "tools/orvex/json.h"
#include "tools/orvex/output.h"
#include "tools/orvex/table.h"
#include "tools/orvex/tool.h"

namespace orvex_tool {
namespace {

constexpr std::string_view kOverall = "Overall";

std::string Plural(int64_t n, std::string_view word) {
  return fmt::format("{} {}{}", n, word, n == 1 ? "" : "s");
}

std::string CpaSummary(const orvex::CameraPerformanceDataFile& file) {
  std::string text;
  int events = 0;
  TextTable table({{"OPERATION"}, {"EVENT"}, {"DURATION (ms)", TextTable::Align::kRight}});
  for (const orvex::CameraLatencyData& operation : file.camera_latency_data()) {
    const std::string name = EscapeControlCharacters(operation.operation_case());
    for (const orvex::CameraLatencyDataType& event : operation.latency_data()) {
      table.AddRow({name, EscapeControlCharacters(event.event_name()),
                    fmt::format("{:.3f}", event.duration_ms())});
      ++events;
    }
    if (operation.latency_data_size() == 0) table.AddRow({name, "-", "-"});
  }
  if (file.camera_latency_data_size() == 0) {
    text += "latency data: none\n";
  } else {
    text += table.Render();
    text +=
        fmt::format("latency data: {}, {}\n", Plural(file.camera_latency_data_size(), "operation"),
                    Plural(events, "event"));
  }
  int frames = 0;
  for (const orvex::CameraPerformanceData& camera : file.camera_data()) {
    frames += camera.per_frame_data_size();
  }
  text += fmt::format("camera data: {}, {}\n", Plural(file.camera_data_size(), "camera"),
                      Plural(frames, "frame"));
  if (file.has_graph_representation()) {
    const orvex::GraphRepresentation& graph = file.graph_representation();
    text += fmt::format("graph representation: '{}', {} nodes, {} edges\n",
                        EscapeControlCharacters(graph.graph_name()), graph.nodes_size(),
                        graph.edges_size());
  } else {
    text += "graph representation: none\n";
  }
  return text;
}

int PrintProtoJson(const std::string& path, const orvex::CameraPerformanceDataFile& file,
                   CommandContext& context) {
  std::string json;
  google::protobuf::util::JsonPrintOptions options;
  options.add_whitespace = true;
  const auto printed = google::protobuf::util::MessageToJsonString(file, &json, options);
  if (!printed.ok()) {
    return context.Error(
        orvex::InternalError(fmt::format("cannot print {} as JSON: {}", path, printed.ToString())));
  }
  context.out() << json;
  if (json.empty() || json.back() != '\n') context.out() << "\n";
  return kExitOk;
}

// When a session was profiled: the local time in an analyzer file name
// ("camera-ended-2026-12-06_17-40-26.cpa"), else the file's modification time.
absl::Time SessionTime(const std::string& path) {
  const std::string name = std::filesystem::path(path).filename().string();
  constexpr size_t kLength = std::string_view("2026-12-06_17-40-26").size();
  for (size_t at = 0; at + kLength <= name.size(); ++at) {
    absl::Time time;
    if (name[at + 4] == '-' && name[at + 10] == '_' &&
        absl::ParseTime("%Y-%m-%d_%H-%M-%S", name.substr(at, kLength), absl::LocalTimeZone(), &time,
                        nullptr)) {
      return time;
    }
  }
  struct stat info = {};
  if (stat(path.c_str(), &info) != 0) return absl::UnixEpoch();
  return absl::TimeFromTimespec(info.st_mtim);
}

std::string TimeText(absl::Time time) {
  return absl::FormatTime("%Y-%m-%d %H:%M:%S", time, absl::LocalTimeZone());
}

// The paths named on the command line, a directory standing for the ".cpa"
// files in it (sorted by name). Unreadable directories are reported.
std::vector<std::string> ExpandInputs(const std::vector<std::string>& inputs,
                                      CommandContext& context, bool& failed) {
  std::vector<std::string> paths;
  for (const std::string& input : inputs) {
    std::error_code error;
    if (!std::filesystem::is_directory(input, error)) {
      paths.push_back(input);
      continue;
    }
    std::vector<std::string> found;
    for (std::filesystem::directory_iterator it(input, error), end; !error && it != end;
         it.increment(error)) {
      if (it->path().extension() == ".cpa") found.push_back(it->path().string());
    }
    if (error) {
      context.err() << orvex::StatusFromErrno(
                           error.value(),
                           fmt::format("cannot list {}", EscapeControlCharacters(input)))
                           .ToString()
                    << "\n";
      failed = true;
    }
    std::sort(found.begin(), found.end());
    paths.insert(paths.end(), found.begin(), found.end());
  }
  return paths;
}

// Durations of one event of one operation across sessions.
struct EventStats {
  std::string event;
  std::vector<float> durations_ms;
};

struct OperationStats {
  std::string operation;
  std::vector<EventStats> events;
  int sessions = 0;        // sessions holding the operation
  int over_threshold = 0;  // of those, sessions whose Overall reached the threshold
};

// Names of the operations of a session whose Overall reached their threshold.
std::vector<std::string> OverThreshold(const orvex::CameraPerformanceDataFile& file) {
  std::vector<std::string> names;
  for (const orvex::CameraLatencyData& operation : file.camera_latency_data()) {
    const auto threshold =
        orvex::CameraLatencyAnalyzer::LatencyThresholdMs(operation.operation_case());
    const auto overall = LargestOverallMs(operation);
    if (threshold && overall && *overall >= *threshold) names.push_back(operation.operation_case());
  }
  return names;
}

std::vector<OperationStats> Summarise(const std::vector<CpaSession>& sessions) {
  std::vector<OperationStats> operations;
  absl::flat_hash_map<std::string, size_t> index;
  for (const CpaSession& session : sessions) {
    const std::vector<std::string> over = OverThreshold(session.file);
    absl::flat_hash_set<std::string> seen;
    for (const orvex::CameraLatencyData& data : session.file.camera_latency_data()) {
      auto [at, added] = index.try_emplace(data.operation_case(), operations.size());
      if (added) operations.push_back({data.operation_case(), {}, 0, 0});
      OperationStats& stats = operations[at->second];
      if (seen.insert(data.operation_case()).second) {
        ++stats.sessions;
        if (std::find(over.begin(), over.end(), data.operation_case()) != over.end()) {
          ++stats.over_threshold;
        }
      }
      for (const orvex::CameraLatencyDataType& event : data.latency_data()) {
        if (std::isnan(event.duration_ms())) continue;  // no duration to rank
        auto it = std::find_if(stats.events.begin(), stats.events.end(),
                               [&](const EventStats& e) { return e.event == event.event_name(); });
        if (it == stats.events.end()) it = stats.events.insert(it, {event.event_name(), {}});
        it->durations_ms.push_back(event.duration_ms());
      }
    }
  }
  return operations;
}

// Nearest-rank percentile `p` of `values` in milliseconds.
double PercentileMs(const std::vector<float>& values, double p) {
  std::vector<absl::Duration> durations;
  for (float value : values) durations.push_back(absl::Milliseconds(value));
  return absl::ToDoubleMilliseconds(Percentile(std::move(durations), p));
}

std::string ManySummary(const std::vector<CpaSession>& sessions,
                        const std::vector<OperationStats>& operations) {
  std::string text = fmt::format("{}", Plural(static_cast<int64_t>(sessions.size()), "session"));
  if (!sessions.empty()) {
    text +=
        fmt::format(", {} to {}", TimeText(sessions.front().time), TimeText(sessions.back().time));
  }
  text += "\n";
  using Align = TextTable::Align;
  for (const OperationStats& operation : operations) {
    const auto threshold = orvex::CameraLatencyAnalyzer::LatencyThresholdMs(operation.operation);
    text += fmt::format("\n{} ({}", EscapeControlCharacters(operation.operation),
                        Plural(operation.sessions, "session"));
    if (threshold) {
      text += fmt::format(", threshold {:g} ms: {} over", *threshold, operation.over_threshold);
    }
    text += ")\n";
    TextTable table({{"EVENT"},
                     {"COUNT", Align::kRight},
                     {"MIN (ms)", Align::kRight},
                     {"MEDIAN (ms)", Align::kRight},
                     {"P90 (ms)", Align::kRight},
                     {"MAX (ms)", Align::kRight}});
    for (const EventStats& event : operation.events) {
      const auto [min, max] =
          std::minmax_element(event.durations_ms.begin(), event.durations_ms.end());
      table.AddRow({EscapeControlCharacters(event.event),
                    fmt::format("{}", event.durations_ms.size()), fmt::format("{:.3f}", *min),
                    fmt::format("{:.3f}", PercentileMs(event.durations_ms, 0.5)),
                    fmt::format("{:.3f}", PercentileMs(event.durations_ms, 0.9)),
                    fmt::format("{:.3f}", *max)});
    }
    text += table.Render();
  }
  text += "\nsessions in time order:\n";
  TextTable table({{"TIME"}, {"FILE"}, {"OPERATIONS", Align::kRight}, {"OVER THRESHOLD"}});
  for (const CpaSession& session : sessions) {
    std::string over;
    for (const std::string& name : OverThreshold(session.file)) {
      over += (over.empty() ? "" : ", ") + EscapeControlCharacters(name);
    }
    table.AddRow({TimeText(session.time), EscapeControlCharacters(session.path),
                  fmt::format("{}", session.file.camera_latency_data_size()),
                  over.empty() ? "-" : over});
  }
  return text + table.Render();
}

double Rounded(double ms) { return std::round(ms * 1000.0) / 1000.0; }

Json ManyJson(const std::vector<CpaSession>& sessions,
              const std::vector<OperationStats>& operations) {
  Json operation_list = Json::MakeArray();
  for (const OperationStats& operation : operations) {
    Json events = Json::MakeArray();
    for (const EventStats& event : operation.events) {
      const auto [min, max] =
          std::minmax_element(event.durations_ms.begin(), event.durations_ms.end());
      events.Append(Json::MakeObject()
                        .Set("event", event.event)
                        .Set("count", uint64_t{event.durations_ms.size()})
                        .Set("min_ms", Rounded(*min))
                        .Set("median_ms", Rounded(PercentileMs(event.durations_ms, 0.5)))
                        .Set("p90_ms", Rounded(PercentileMs(event.durations_ms, 0.9)))
                        .Set("max_ms", Rounded(*max)));
    }
    const auto threshold = orvex::CameraLatencyAnalyzer::LatencyThresholdMs(operation.operation);
    operation_list.Append(Json::MakeObject()
                              .Set("operation", operation.operation)
                              .Set("sessions", operation.sessions)
                              .Set("threshold_ms", threshold ? Json(double{*threshold}) : Json())
                              .Set("over_threshold", operation.over_threshold)
                              .Set("events", std::move(events)));
  }
  Json session_list = Json::MakeArray();
  for (const CpaSession& session : sessions) {
    Json over = Json::MakeArray();
    for (const std::string& name : OverThreshold(session.file)) over.Append(name);
    session_list.Append(Json::MakeObject()
                            .Set("file", session.path)
                            .Set("time", TimeText(session.time))
                            .Set("operations", session.file.camera_latency_data_size())
                            .Set("over_threshold", std::move(over)));
  }
  return Json::MakeObject()
      .Set("operations", std::move(operation_list))
      .Set("sessions", std::move(session_list));
}

int RunCpa(const ParsedArgs& args, CommandContext& context) {
  bool failed = false;
  const std::vector<std::string> paths = ExpandInputs(args.positionals, context, failed);
  std::error_code ignored;
  const bool one_file =
      args.positionals.size() == 1 && !std::filesystem::is_directory(args.positionals[0], ignored);
  if (one_file && !args.Has("svg")) {
    auto file = ReadCpaFile(paths[0]);
    if (!file.ok()) return context.Error(file.status());
    if (args.Has("json")) return PrintProtoJson(paths[0], *file, context);
    context.out() << CpaSummary(*file);
    return kExitOk;
  }
  std::vector<CpaSession> sessions;
  for (const std::string& path : paths) {
    auto file = ReadCpaFile(path);
    if (!file.ok()) {
      context.err() << "skipped: " << EscapeControlCharacters(file.status().ToString()) << "\n";
      failed = true;
      continue;
    }
    sessions.push_back({path, SessionTime(path), *std::move(file)});
  }
  std::stable_sort(sessions.begin(), sessions.end(),
                   [](const CpaSession& a, const CpaSession& b) { return a.time < b.time; });
  const std::vector<OperationStats> operations = Summarise(sessions);
  if (auto svg = args.Get("svg")) {
    if (orvex::Status written = WriteFileAtomically(*svg, CpaChartSvg(sessions)); !written.ok()) {
      context.Error(written);
      failed = true;
    }
  }
  context.out() << (args.Has("json") ? ManyJson(sessions, operations).Dump()
                                     : ManySummary(sessions, operations));
  return failed ? kExitError : kExitOk;
}

}  // namespace

std::optional<float> LargestOverallMs(const orvex::CameraLatencyData& operation) {
  std::optional<float> largest;
  for (const orvex::CameraLatencyDataType& event : operation.latency_data()) {
    if (event.event_name() == kOverall) {
      largest = std::max(largest.value_or(event.duration_ms()), event.duration_ms());
    }
  }
  return largest;
}

orvex::StatusOr<orvex::CameraPerformanceDataFile> ReadCpaFile(const std::string& path,
                                                              int64_t max_bytes) {
  const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC);
  if (fd == -1) return orvex::StatusFromErrno(errno, fmt::format("cannot open {}", path));
  google::protobuf::io::FileInputStream input(fd);
  input.SetCloseOnDelete(true);
  struct stat info = {};
  const bool regular = fstat(fd, &info) == 0 && S_ISREG(info.st_mode);
  if (regular && info.st_size > max_bytes) {
    return orvex::InvalidArgumentError(fmt::format(
        "{} is {} bytes, more than the {} a .cpa file can hold", path, info.st_size, max_bytes));
  }
  // Parse as the bytes arrive, through a window of at most max_bytes. The
  // window hands back what it read past its end when it goes.
  orvex::CameraPerformanceDataFile file;
  bool parsed = false;
  int64_t consumed = 0;
  {
    google::protobuf::io::LimitingInputStream limited(&input, max_bytes);
    parsed = file.ParseFromZeroCopyStream(&limited);
    consumed = limited.ByteCount();
  }
  if (input.GetErrno() != 0) {
    return orvex::StatusFromErrno(input.GetErrno(), fmt::format("cannot read {}", path));
  }
  const void* more = nullptr;
  int more_size = 0;
  if (consumed >= max_bytes && input.Next(&more, &more_size)) {
    return orvex::InvalidArgumentError(
        fmt::format("{} goes on past {} bytes, more than a .cpa file can hold", path, max_bytes));
  }
  if (!parsed) {
    return orvex::InvalidArgumentError(fmt::format(
        "{} is not a valid .cpa file: it does not parse as a CameraPerformanceDataFile message "
        "({})",
        path,
        regular ? fmt::format("{} bytes", info.st_size) : fmt::format("{} bytes read", consumed)));
  }
  return file;
}

const Command& CpaCommand() {
  static const Command command = {
      {.name = "cpa",
       .positionals = "FILE|DIR...",
       .positional_count = 1,
       .more_positionals = true,
       .summary = "summarise performance-data (.cpa) files, one or many",
       .details = "One FILE: the latency data (operation, event, duration in milliseconds) and\n"
                  "counts of the other sections; --json prints the whole message with Protocol\n"
                  "Buffers' JSON printer. An empty file is valid and holds no data.\n\n"
                  "Several files, or a DIR standing for the .cpa files in it: per operation and\n"
                  "event the count, min, median, p90 and max across sessions (in ms), then the\n"
                  "sessions in time order (the time in an analyzer file name, else the file's\n"
                  "modification time) with the operations whose Overall reached the latency\n"
                  "analyzer's threshold. --svg charts each operation's Overall per session.\n"
                  "Durations that are not numbers (NaN) are left out of the statistics.\n"
                  "A file that cannot be read or parsed is reported and skipped, and the exit\n"
                  "status is 2; the others are still summarised. Files over 2 GiB are refused.\n\n"
                  "example: orvex cpa orvex-out --svg latency.svg",
       .flags = {{"json", "", "print JSON instead of text"},
                 {"svg", "OUT.svg", "chart each operation's Overall duration per session"}}},
      RunCpa};
  return command;
}

}  // namespace orvex_tool
