#ifndef ORVEX_TOOLS_ORVEX_CPA_H_
#define ORVEX_TOOLS_ORVEX_CPA_H_

// Reading performance-data (".cpa") files and charting latency profiles over
// many sessions, for `orvex cpa`.

#include <cstdint>
#include <limits>
#include <optional>
#include <string>
#include <vector>

#include "absl/time/time.h"
#include "orvex/api/debug/camera_performance_analyzer.pb.h"
#include "orvex/status/statusor.h"

namespace orvex_tool {

// The largest message Protocol Buffers parses: 2 GiB less one byte.
inline constexpr int64_t kMaxCpaBytes = std::numeric_limits<int32_t>::max();

// Parses the file at `path` as it is read, never holding more than
// `max_bytes` of it. INVALID_ARGUMENT when a regular file is larger (checked
// before reading), when a stream goes on past `max_bytes`, or when the bytes
// do not parse; the errno status when it cannot be opened or read. An empty
// file is a valid file holding no data.
orvex::StatusOr<orvex::CameraPerformanceDataFile> ReadCpaFile(const std::string& path,
                                                              int64_t max_bytes = kMaxCpaBytes);

// The largest duration of the operation's events named "Overall", if any.
std::optional<float> LargestOverallMs(const orvex::CameraLatencyData& operation);

// One profiled session: a file and when it was written.
struct CpaSession {
  std::string path;
  absl::Time time;
  orvex::CameraPerformanceDataFile file;
};

// An SVG chart with one panel per operation that has "Overall" events: each
// session's Overall duration (the largest, when the session holds several)
// in time order, one point per session, beside the operation's threshold when
// the latency analyzer checks it, with the sessions at or over it marked.
std::string CpaChartSvg(const std::vector<CpaSession>& sessions);

}  // namespace orvex_tool

#endif  // ORVEX_TOOLS_ORVEX_CPA_H_
