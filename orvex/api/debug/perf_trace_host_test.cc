// Runs with the host trace library: markers reach the recorded trace.

#include <dlfcn.h>

#include <pthread.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <sstream>
#include <string>
#include <thread>

#include "cutils/trace.h"
#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/debug/perf_trace.h"
#include "orvex/api/debug/testing/trace_recording.h"

namespace orvex {
namespace {

using ::orvex::testing::TraceRecording;
using ::testing::ElementsAre;

const std::string kMe = " @" + std::to_string(testing::CurrentTid());

// Markers keep their threads; a PerfTrace section follows the level it was made at.
TEST(HostTraceTest, MarkersThreadsAndLevels) {
  TraceRecording recording;
  std::string worker;
  {
    ScopedTrace outer("outer \"quoted\"");
    std::thread([&] {
      pthread_setname_np(pthread_self(), "worker");
      worker = " @" + std::to_string(testing::CurrentTid());
      ScopedTrace inner("inner");
      AsyncTraceEnd("capture", -7);
    }).join();
    ScopedTrace::TraceInt("depth", -3);
    ScopedTrace::TraceInt64("bytes", int64_t{1} << 40);
  }
  AsyncTraceBegin("capture", 8);
  AsyncTraceEnd("capture", 8);
  // Marker texts that other writers put on the descriptor; malformed ones are dropped.
  for (const char* text : {"B|1|begun", "C|1|n|-5", "C|1|n", "C|1|n|x", "S|1|a|7", "F|1|a|7"}) {
    ASSERT_GT(write(atrace_marker_fd, text, strlen(text)), 0);
  }
  {
    PerfTrace always(0, "always");
    PerfTrace detail(5, "detail at 0");
  }
  {
    PerfTrace::trace_level_ = 5;
    PerfTrace detail(5, "detail at 5");
    PerfTrace::trace_level_ = 0;  // still ends the section begun
  }
  orvex_host_trace_flush();
  EXPECT_THAT(
      recording.Stop(),
      ElementsAre("B outer \\\"quoted\\\"" + kMe, "B inner" + worker, "e capture #-7" + worker,
                  "E" + worker, "C depth =-3" + kMe, "C bytes =1099511627776" + kMe, "E" + kMe,
                  "b capture #8" + kMe, "e capture #8" + kMe, "B begun" + kMe, "C n =-5" + kMe,
                  "b a #7" + kMe, "e a #7" + kMe, "B always" + kMe, "E" + kMe,
                  "B detail at 5" + kMe, "E" + kMe));
  std::ostringstream file;
  file << std::ifstream(::testing::TempDir() + "trace_" + std::to_string(getpid()) + ".json")
              .rdbuf();
  EXPECT_THAT(file.str(), ::testing::HasSubstr("{\"name\":\"worker\"}"));  // thread names
}

TEST(HostTraceTest, CameraTagBitAndMarkerDescriptorGateEverything) {
  // 0: all on; 1: camera tag off; 2: marker closed; 3: no tag named by the environment
  for (int off = 0; off < 4; ++off) {
    if (off == 3) setenv("ORVEX_TRACE_TAGS", "0", 1);
    TraceRecording recording;
    if (off == 1) atrace_enabled_tags = ~uint64_t{ATRACE_TAG_CAMERA};
    const int marker_fd = atrace_marker_fd;
    if (off == 2) atrace_marker_fd = -1;
    {
      ScopedTrace section("section");
      ScopedTrace::TraceInt("counter", 1);
      AsyncTraceBegin("async", 1);
      AsyncTraceEnd("async", 1);
    }
    atrace_marker_fd = marker_fd;
    EXPECT_EQ(recording.Stop().size(), off == 0 ? 5u : 0u) << off;
    unsetenv("ORVEX_TRACE_TAGS");
  }
}

// A failed write is reported by the stop call, whether the disk fills part
// way (more events than the buffer holds) or, at exit, at the end.
TEST(HostTraceDeathTest, StopReportsFailedWrites) {
  ASSERT_EQ(orvex_host_trace_start("/dev/full"), 0);
  for (int i = 0; i < 100; ++i) ScopedTrace::TraceInt("counter", i);
  EXPECT_EQ(orvex_host_trace_stop(), -1);
  EXPECT_EQ(errno, ENOSPC);
  EXPECT_EXIT((orvex_host_trace_start("/dev/full"), exit(0)), ::testing::ExitedWithCode(0),
              "host trace: cannot write /dev/full: No space left on device");
}

// libcutils defines the same entry points as no-ops: linked after the recorder
// it changes nothing; preloaded ahead of it (second registration), recording is refused.
TEST(HostTraceTest, LibcutilsAlongside) {
  ASSERT_NE(dlopen("libcutils.so.0", RTLD_NOW | RTLD_NOLOAD), nullptr);
  if (std::getenv("ORVEX_TEST_CUTILS_FIRST") == nullptr) return;  // the tests above record
  const std::string path = ::testing::TempDir() + "refused.json";
  EXPECT_EQ(orvex_host_trace_start(path.c_str()), -1);
  EXPECT_EQ(errno, ENOTSUP);
  EXPECT_EQ(atrace_marker_fd, -1);
}

// Registered a second time with ORVEX_TRACE_FILE set (see CMakeLists.txt).
TEST(HostTraceEnvironmentTest, RecordsFromLoadIntoTheNamedFile) {
  const char* path = std::getenv("ORVEX_TRACE_FILE");
  if (path == nullptr) GTEST_SKIP() << "ORVEX_TRACE_FILE is not set";
  ASSERT_NE(atrace_marker_fd, -1);
  { ScopedTrace section("from environment"); }
  orvex_host_trace_stop();
  EXPECT_THAT(TraceRecording::ReadEvents(path), ElementsAre("B from environment" + kMe, "E" + kMe));
}

}  // namespace
}  // namespace orvex
