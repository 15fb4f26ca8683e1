#ifndef ORVEX_API_DEBUG_TESTING_TRACE_RECORDING_H_
#define ORVEX_API_DEBUG_TESTING_TRACE_RECORDING_H_

// Test helper: records the host trace into a temporary file and reads the
// events back. Needs the orvex_host_trace library.

#include <sys/syscall.h>
#include <unistd.h>

#include <atomic>
#include <cstdint>
#include <fstream>
#include <optional>
#include <regex>
#include <string>
#include <vector>

#include "gtest/gtest.h"
#include "host_trace/host_trace.h"

namespace orvex {
namespace testing {

struct TraceEvent {
  char ph = '?';
  std::string name;
  long tid = 0;
  std::string id;
  std::optional<int64_t> value;
};

inline long CurrentTid() { return static_cast<long>(syscall(SYS_gettid)); }

class TraceRecording {
 public:
  TraceRecording() {
    static std::atomic<int> counter{0};
    path_ = ::testing::TempDir() + "trace_" + std::to_string(getpid()) + "_" +
            std::to_string(counter.fetch_add(1)) + ".json";
    EXPECT_EQ(orvex_host_trace_start(path_.c_str()), 0) << path_;
  }
  ~TraceRecording() {
    orvex_host_trace_stop();
    std::remove(path_.c_str());
  }
  TraceRecording(const TraceRecording&) = delete;
  TraceRecording& operator=(const TraceRecording&) = delete;

  // Stops the recording; returns its events without the metadata ones.
  std::vector<TraceEvent> Stop() {
    orvex_host_trace_stop();
    return ReadEvents(path_);
  }

  static std::vector<TraceEvent> ReadEvents(const std::string& path) {
    std::ifstream in(path);
    std::vector<std::string> lines;
    for (std::string line; std::getline(in, line);) lines.push_back(line);
    std::vector<TraceEvent> events;
    if (lines.size() < 2 || lines.front() != "[" || lines.back() != "]") {
      ADD_FAILURE() << "not a complete JSON event array: " << path;
      return events;
    }
    static const std::regex ph_re("\"ph\":\"(.)\"");
    static const std::regex name_re("\"name\":\"((?:[^\"\\\\]|\\\\.)*)\"");
    static const std::regex tid_re("\"tid\":(-?\\d+)");
    static const std::regex id_re("\"id\":\"([^\"]*)\"");
    static const std::regex value_re("\"value\":(-?\\d+)");
    for (size_t i = 1; i + 1 < lines.size(); ++i) {
      const std::string& line = lines[i];
      // Events are separated by ",\n"; the last one has no comma.
      EXPECT_EQ(line.back() == ',', i + 2 < lines.size()) << line;
      std::smatch m;
      if (!std::regex_search(line, m, ph_re) || m[1] == "M") continue;
      TraceEvent event;
      event.ph = m.str(1)[0];
      if (std::regex_search(line, m, name_re)) event.name = m.str(1);
      if (std::regex_search(line, m, tid_re)) event.tid = std::stol(m.str(1));
      if (std::regex_search(line, m, id_re)) event.id = m.str(1);
      if (std::regex_search(line, m, value_re)) event.value = std::stoll(m.str(1));
      events.push_back(event);
    }
    return events;
  }

 private:
  std::string path_;
};

}  // namespace testing
}  // namespace orvex

#endif  // ORVEX_API_DEBUG_TESTING_TRACE_RECORDING_H_
