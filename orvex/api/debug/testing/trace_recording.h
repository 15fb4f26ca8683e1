#ifndef ORVEX_API_DEBUG_TESTING_TRACE_RECORDING_H_
#define ORVEX_API_DEBUG_TESTING_TRACE_RECORDING_H_

// Test helper (needs orvex_host_trace): records the host trace into a
// temporary file and reads the events back, one "<ph> <name> #<id> =<value>
// @<tid>" line per event, metadata events left out.

#include <sys/syscall.h>
#include <unistd.h>

#include <fstream>
#include <regex>
#include <string>
#include <vector>

#include "gtest/gtest.h"
#include "host_trace/host_trace.h"

namespace orvex {
namespace testing {

inline long CurrentTid() { return static_cast<long>(syscall(SYS_gettid)); }

class TraceRecording {
 public:
  TraceRecording() : path_(::testing::TempDir() + "trace_" + std::to_string(getpid()) + ".json") {
    EXPECT_EQ(orvex_host_trace_start(path_.c_str()), 0) << path_;
  }
  ~TraceRecording() {
    orvex_host_trace_stop();
    std::remove(path_.c_str());
  }

  std::vector<std::string> Stop() {
    EXPECT_EQ(orvex_host_trace_stop(), 0) << path_;
    return ReadEvents(path_);
  }

  static std::vector<std::string> ReadEvents(const std::string& path) {
    std::ifstream in(path);
    std::vector<std::string> lines, events;
    for (std::string line; std::getline(in, line);) lines.push_back(line);
    EXPECT_TRUE(lines.size() >= 2 && lines.front() == "[" && lines.back() == "]") << path;
    static const std::regex field_re(
        "\"(name|ph|id|value|tid)\":(\"((?:[^\"\\\\]|\\\\.)*)\"|-?\\d+)");
    for (size_t i = 1; i + 1 < lines.size(); ++i) {
      // Events are separated by ",\n"; the last one has no comma.
      EXPECT_EQ(lines[i].back() == ',', i + 2 < lines.size()) << lines[i];
      std::string ph, name, rest, tid;
      for (std::sregex_iterator it(lines[i].begin(), lines[i].end(), field_re), end; it != end;
           ++it) {
        const std::string key = (*it)[1], text = (*it)[3].matched ? (*it)[3] : (*it)[2];
        if (key == "ph") ph = text;
        if (key == "name") name = " " + text;
        if (key == "id") rest += " #" + text;
        if (key == "value") rest += " =" + text;
        if (key == "tid") tid = " @" + text;
      }
      if (ph != "M") events.push_back(std::string(ph).append(name).append(rest).append(tid));
    }
    return events;
  }

 private:
  std::string path_;
};

}  // namespace testing
}  // namespace orvex

#endif  // ORVEX_API_DEBUG_TESTING_TRACE_RECORDING_H_
