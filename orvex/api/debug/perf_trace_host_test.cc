// Runs with the host trace library: markers reach the recorded trace.

#include <dlfcn.h>

#include <cerrno>
#include <cstdlib>
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

void SetTags(uint64_t tags) { __atomic_store_n(&atrace_enabled_tags, tags, __ATOMIC_RELAXED); }

TEST(HostTraceTest, SectionsCountersAndAsyncCookiesKeepTheirThreads) {
  TraceRecording recording;
  std::string worker;
  {
    ScopedTrace outer("outer \"quoted\"");
    std::thread([&] {
      worker = " @" + std::to_string(testing::CurrentTid());
      ScopedTrace inner("inner");
      AsyncTraceEnd("capture", -7);
    }).join();
    ScopedTrace::TraceInt("depth", -3);
    ScopedTrace::TraceInt64("bytes", int64_t{1} << 40);
  }
  AsyncTraceBegin("capture", 8);
  AsyncTraceEnd("capture", 8);
  EXPECT_THAT(recording.Stop(), ElementsAre("B outer \\\"quoted\\\"" + kMe, "B inner" + worker,
                                            "e capture #-7" + worker, "E" + worker,
                                            "C depth =-3" + kMe, "C bytes =1099511627776" + kMe,
                                            "E" + kMe, "b capture #8" + kMe, "e capture #8" + kMe));
}

TEST(HostTraceTest, CameraTagBitAndMarkerDescriptorGateEverything) {
  const struct {
    uint64_t tags;
    size_t events;
  } cases[] = {{ATRACE_TAG_CAMERA, 5}, {~uint64_t{ATRACE_TAG_CAMERA}, 0}, {0, 0}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.tags);
    TraceRecording recording;
    SetTags(c.tags);
    {
      ScopedTrace section("section");
      ScopedTrace::TraceInt("counter", 1);
      AsyncTraceBegin("async", 1);
      AsyncTraceEnd("async", 1);
    }
    EXPECT_EQ(recording.Stop().size(), c.events);
  }
  // Not recording: the marker descriptor is -1 and nothing is written.
  ASSERT_EQ(atrace_marker_fd, -1);
  SetTags(ATRACE_TAG_CAMERA);
  ScopedTrace section("unrecorded");
  SetTags(0);
}

TEST(HostTraceTest, PerfTraceLevelsGateSections) {
  TraceRecording recording;
  {
    PerfTrace always(0, "always");
    PerfTrace detail(5, "detail at 0");
  }
  {
    PerfTrace::trace_level_ = 5;
    PerfTrace detail(5, "detail at 5");
    // Lowering the level does not keep an engaged section open.
    PerfTrace::trace_level_ = 0;
  }
  EXPECT_THAT(recording.Stop(),
              ElementsAre("B always" + kMe, "E" + kMe, "B detail at 5" + kMe, "E" + kMe));
}

// A failed write or close is reported by the stop call, whether the disk
// fills part way (more events than the buffer holds) or at the end, and at
// exit.
TEST(HostTraceDeathTest, StopReportsFailedWrites) {
  for (int events : {1, 100}) {
    SCOPED_TRACE(events);
    ASSERT_EQ(orvex_host_trace_start("/dev/full"), 0);
    for (int i = 0; i < events; ++i) ScopedTrace::TraceInt("counter", i);
    EXPECT_EQ(orvex_host_trace_stop(), -1);
    EXPECT_EQ(errno, ENOSPC);
  }
  EXPECT_EXIT(
      {
        orvex_host_trace_start("/dev/full");
        exit(0);
      },
      ::testing::ExitedWithCode(0), "host trace: cannot write /dev/full: No space left on device");
}

// libcutils, linked after the recorder, defines the same entry points as
// no-ops: the tests above record all the same. Registered again with
// libcutils preloaded ahead of the recorder, where recording is refused.
TEST(HostTraceTest, LibcutilsAlongside) {
  ASSERT_NE(dlopen("libcutils.so.0", RTLD_NOW | RTLD_NOLOAD), nullptr);
  if (std::getenv("ORVEX_TEST_CUTILS_FIRST") == nullptr) {
    TraceRecording recording;
    { ScopedTrace section("beside libcutils"); }
    EXPECT_THAT(recording.Stop(), ElementsAre("B beside libcutils" + kMe, "E" + kMe));
    return;
  }
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
