// Arbitrary bytes read as a performance-data (".cpa") file, the way
// `orvex cpa` reads one (one CameraPerformanceDataFile message, nothing
// around it). Properties checked:
// - a file that parses serializes to bytes that parse back to the same
//   message (compared by deterministic serialization);
// - its latency data injected into the latency analyzer comes back from
//   ConvertToProto grouped by operation name in order of first appearance,
//   records without a name left out, and survives its own round trip.
// Operations whose names end a session ("-Close") are not injected: a close
// would write or discard the records instead of keeping them.

#include <cstdint>
#include <list>
#include <string>
#include <utility>

#include "absl/container/flat_hash_map.h"
#include "absl/strings/match.h"
#include "google/protobuf/io/coded_stream.h"
#include "google/protobuf/io/zero_copy_stream_impl_lite.h"
#include "google/protobuf/stubs/logging.h"
#include "orvex/api/debug/camera_latency_analyzer.h"
#include "orvex/api/debug/camera_performance_analyzer.pb.h"
#include "orvex/status/log.h"

namespace {

using orvex::CameraLatencyData;
using orvex::CameraPerformanceDataFile;

std::string Serialize(const google::protobuf::Message& message) {
  std::string bytes;
  {
    google::protobuf::io::StringOutputStream stream(&bytes);
    google::protobuf::io::CodedOutputStream out(&stream);
    out.SetSerializationDeterministic(true);
    ORVEX_CHECK(message.SerializeToCodedStream(&out));
  }
  return bytes;
}

// Serialize, parse back, serialize again: the same bytes.
void CheckRoundTrip(const CameraPerformanceDataFile& file) {
  const std::string bytes = Serialize(file);
  CameraPerformanceDataFile again;
  ORVEX_CHECK(again.ParseFromString(bytes)) << bytes.size() << " bytes";
  ORVEX_CHECK(Serialize(again) == bytes) << again.ShortDebugString();
}

// What the analyzer should make of the file's latency data.
CameraPerformanceDataFile ExpectedGrouping(const CameraPerformanceDataFile& file) {
  CameraPerformanceDataFile expected;
  absl::flat_hash_map<std::string, CameraLatencyData*> groups;
  for (const CameraLatencyData& operation : file.camera_latency_data()) {
    const std::string& name = operation.operation_case();
    if (name.empty() || absl::EndsWithIgnoreCase(name, "-Close")) continue;
    CameraLatencyData*& group = groups[name];
    if (group == nullptr) {
      group = expected.add_camera_latency_data();
      group->set_operation_case(name);
    }
    for (const auto& event : operation.latency_data()) {
      auto* copy = group->add_latency_data();
      copy->set_event_name(event.event_name());
      copy->set_duration_ms(event.duration_ms());
    }
  }
  return expected;
}

void CheckAnalyzer(const CameraPerformanceDataFile& file) {
  orvex::CameraLatencyAnalyzer& analyzer = orvex::CameraLatencyAnalyzer::GetAnalyzer();
  analyzer.ClearLatencyData();
  for (const CameraLatencyData& operation : file.camera_latency_data()) {
    if (absl::EndsWithIgnoreCase(operation.operation_case(), "-Close")) continue;
    std::list<std::pair<std::string, float>> events;
    for (const auto& event : operation.latency_data()) {
      events.emplace_back(event.event_name(), event.duration_ms());
    }
    analyzer.InjectEvent(operation.operation_case(), std::move(events));
  }
  const CameraPerformanceDataFile converted = analyzer.ConvertToProto();
  analyzer.ClearLatencyData();
  ORVEX_CHECK(Serialize(converted) == Serialize(ExpectedGrouping(file)))
      << converted.ShortDebugString();
  CheckRoundTrip(converted);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  // Invalid UTF-8 in a string field fails the parse with a log line each.
  const google::protobuf::LogSilencer quiet;
  CameraPerformanceDataFile file;
  if (!file.ParseFromArray(data, static_cast<int>(size))) return 0;
  CheckRoundTrip(file);
  CheckAnalyzer(file);
  return 0;
}
