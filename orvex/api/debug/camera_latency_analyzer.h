#ifndef ORVEX_API_DEBUG_CAMERA_LATENCY_ANALYZER_H_
#define ORVEX_API_DEBUG_CAMERA_LATENCY_ANALYZER_H_

// CameraLatencyAnalyzer collects the latencies of whole camera operations
// (open, reconfiguration, close) and writes them as a performance-data file
// (".cpa", one serialized CameraPerformanceDataFile) when a camera closes.
//
//   orvex::CameraLatencyAnalyzer::GetAnalyzer().InjectEvent(
//       "Camera-Open", {{"Overall", 212.5f}, {"SensorPowerUp", 48.0f}});
//
// Sessions: records accumulate until an operation whose name ends with
// "-Close" (any letter case) ends the session. The close then writes the file
// if an operation of the session was slower than its threshold and the
// auto-dump property is on (an unreadable property counts as on), or else if
// the write-to-disk property is true (an unreadable one counts as false).
// Records and the threshold flag are cleared at every close, written or not.
//
// Thresholds: an operation's kind is the text after the last "-" of its name
// (the whole name when there is none), compared without regard to case:
// "Open" 300 ms, "Close" 250 ms, "Reconfiguration" 715 ms. An event named
// exactly "Overall" at or above the kind's threshold marks the session as
// slow. Operations of other kinds are not checked.
//
// Files: "<prefix>-<local time %Y-%m-%d_%H-%M-%S>.cpa" in the output
// directory, for example camera-ended-2026-12-03_22-45-47.cpa. When that name
// is taken (a second session closed within the same second), the file is
// named "<prefix>-<time>_1.cpa", then "_2" and so on: an existing file is
// never replaced. A file appears only complete: it is written under a hidden
// temporary name in the same directory and then moved into place, and a
// failed write leaves nothing behind.
//
// Output directory: "/data/vendor/camera/profiler" unless the environment
// variable ORVEX_PROFILER_DIR names another one when the analyzer is first
// used, or SetOutputDirectory() chooses another (tests, host runs). The
// directory is used in its CleanPath form: "." and ".." are resolved
// lexically, before any symbolic link, both to make it and to write in it.
//
// Log lines carry the prefix "[CPA]".
//
// Thread safety: InjectEvent may be called from any thread; it holds the
// analyzer's mutex for the whole call, file write included. WriteLatencyData,
// ClearLatencyData, ConvertToProto and WriteProtoToDisk take no lock: callers
// must not run them concurrently with InjectEvent or with each other.
// SetOutputDirectory and output_directory may be called at any time.

#include <list>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "orvex/api/debug/camera_performance_analyzer.pb.h"
#include "orvex/base/export.h"
#include "orvex/status/status.h"

namespace orvex {

// Write the file at a close when the session was slow ("1", "true", "yes",
// "y", "on" or "0", "false", "no", "n", "off").
inline constexpr char kCameraPerformanceAnalyzerAutoDumpLatencyProperty[] =
    "vendor.camera.debug.camera_performance_analyzer.auto_dump_latency";
// Write the file at every close.
inline constexpr char kCameraPerformanceAnalyzerWriteToDiskProperty[] =
    "vendor.camera.debug.camera_performance_analyzer.write_to_disk";

class ORVEX_EXPORT CameraLatencyAnalyzer {
 public:
  // One injected operation: its name and its named durations in
  // milliseconds, in order.
  struct CameraOperationLatencyData {
    std::string operation;
    std::list<std::pair<std::string, float>> events;
  };

  static constexpr std::string_view kDefaultOutputDirectory = "/data/vendor/camera/profiler";
  static constexpr char kOutputDirectoryVariable[] = "ORVEX_PROFILER_DIR";

  // The process-wide analyzer, made on first use (thread-safe) and never
  // destroyed: records not yet written are discarded at exit.
  static CameraLatencyAnalyzer& GetAnalyzer();

  CameraLatencyAnalyzer(const CameraLatencyAnalyzer&) = delete;
  CameraLatencyAnalyzer& operator=(const CameraLatencyAnalyzer&) = delete;

  // Records one operation and, for a "-Close" operation, ends the session
  // (see above).
  void InjectEvent(std::string_view operation, std::list<std::pair<std::string, float>> events);

  // As above, and tells the caller which file it wrote: `*written_path`
  // (when not null) receives the path of the file that this very call wrote
  // at a close, and is cleared otherwise (no close, a close that writes no
  // file or fails to). The whole call runs under the analyzer's mutex, so
  // each of several threads learns only the file of its own close.
  void InjectEvent(std::string_view operation, std::list<std::pair<std::string, float>> events,
                   std::string* written_path);

  // Writes the file (prefix "camera-ended") if `write_to_disk`, logging a
  // failure; then clears the records and the threshold flag.
  void WriteLatencyData(bool write_to_disk);

  // Clears the records and the threshold flag.
  void ClearLatencyData();

  // The records as a file message holding only camera_latency_data: one
  // entry per operation name (case-sensitive) in order of first appearance,
  // with the events of all its records in injection order. Records with an
  // empty name are left out.
  CameraPerformanceDataFile ConvertToProto() const;

  // Writes ConvertToProto() to a new file named after `prefix` and the
  // current local time in the output directory, creating the directory if
  // needed. Errors: the directory's creation status; INTERNAL "Failed to open
  // file: <path>" when the file cannot be created; the errno status of a
  // failed write ("Failed to write file: <path>"); INTERNAL when the records
  // cannot be serialized; ALREADY_EXISTS when no free name is left for this
  // second.
  Status WriteProtoToDisk(std::string_view prefix) const;
  // As above; on success also stores the path of the file written in
  // `*written_path` when that is not null.
  Status WriteProtoToDisk(std::string_view prefix, std::string* written_path) const;

  // The threshold that an "Overall" event of `operation` is checked against,
  // or nullopt when operations of that name are not checked.
  static std::optional<float> LatencyThresholdMs(std::string_view operation);

  // Chooses the output directory; an empty one restores the default.
  void SetOutputDirectory(std::string_view directory);
  std::string output_directory() const;

 private:
  CameraLatencyAnalyzer();

  // WriteLatencyData, storing the written file's path when not null.
  void WriteLatencyData(bool write_to_disk, std::string* written_path);

  std::mutex mutex_;
  std::list<CameraOperationLatencyData> latency_data_;
  bool threshold_exceeded_ = false;

  mutable std::mutex directory_mutex_;
  std::string output_directory_;
};

}  // namespace orvex

#endif  // ORVEX_API_DEBUG_CAMERA_LATENCY_ANALYZER_H_
