// Runs with the host trace library: markers reach the recorded trace.

#include <cstdlib>
#include <thread>
#include <vector>

#include "cutils/trace.h"
#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/debug/perf_trace.h"
#include "orvex/api/debug/testing/trace_recording.h"

namespace orvex {
namespace {

using ::orvex::testing::CurrentTid;
using ::orvex::testing::TraceEvent;
using ::orvex::testing::TraceRecording;

// "ph name" for each event, for compact comparisons.
std::vector<std::string> Summary(const std::vector<TraceEvent>& events) {
  std::vector<std::string> out;
  for (const TraceEvent& e : events) {
    std::string s(1, e.ph);
    if (!e.name.empty()) s += " " + e.name;
    if (!e.id.empty()) s += " #" + e.id;
    if (e.value.has_value()) s += " =" + std::to_string(*e.value);
    out.push_back(s);
  }
  return out;
}

void SetTags(uint64_t tags) { __atomic_store_n(&atrace_enabled_tags, tags, __ATOMIC_RELAXED); }

class LevelGuard {
 public:
  explicit LevelGuard(int level) : saved_(PerfTrace::trace_level_.exchange(level)) {}
  ~LevelGuard() { PerfTrace::trace_level_ = saved_; }

 private:
  int saved_;
};

TEST(HostTraceTest, SectionsNestCountersAndAsyncCookiesAreRecorded) {
  TraceRecording recording;
  {
    ScopedTrace outer("outer \"quoted\"");
    ScopedTrace inner("inner");
    ScopedTrace::TraceInt("depth", -3);
    ScopedTrace::TraceInt64("bytes", int64_t{1} << 40);
  }
  AsyncTraceBegin("capture", 7);
  AsyncTraceBegin("capture", 8);
  std::thread([] { AsyncTraceEnd("capture", 7); }).join();
  AsyncTraceEnd("capture", 8);
  const std::vector<TraceEvent> events = recording.Stop();
  EXPECT_THAT(Summary(events),
              ::testing::ElementsAre("B outer \\\"quoted\\\"", "B inner", "C depth =-3",
                                     "C bytes =1099511627776", "E", "E", "b capture #7",
                                     "b capture #8", "e capture #7", "e capture #8"));
  ASSERT_EQ(events.size(), 10u);
  for (size_t i : {0, 1, 4, 5, 6, 9}) EXPECT_EQ(events[i].tid, CurrentTid()) << i;
  EXPECT_NE(events[8].tid, CurrentTid());
}

TEST(HostTraceTest, SectionEndsAreAttributedToTheirThread) {
  TraceRecording recording;
  long worker_tid = 0;
  ScopedTrace::TraceBegin("main");
  std::thread([&] {
    worker_tid = CurrentTid();
    ScopedTrace worker("worker");
  }).join();
  ScopedTrace::TraceEnd();
  const std::vector<TraceEvent> events = recording.Stop();
  ASSERT_THAT(Summary(events), ::testing::ElementsAre("B main", "B worker", "E", "E"));
  EXPECT_EQ(events[1].tid, worker_tid);
  EXPECT_EQ(events[2].tid, worker_tid);
  EXPECT_EQ(events[3].tid, CurrentTid());
}

TEST(HostTraceTest, CameraTagBitAndMarkerDescriptorGateEverything) {
  struct Case {
    const char* label;
    uint64_t tags;
    bool traced;
  };
  const Case cases[] = {{"camera only", ATRACE_TAG_CAMERA, true},
                        {"all but camera", ~ATRACE_TAG_CAMERA, false},
                        {"none", 0, false}};
  for (const Case& c : cases) {
    SCOPED_TRACE(c.label);
    TraceRecording recording;
    SetTags(c.tags);
    {
      ScopedTrace section("section");
      ScopedTrace::TraceInt("counter", 1);
      AsyncTraceBegin("async", 1);
      AsyncTraceEnd("async", 1);
    }
    EXPECT_EQ(recording.Stop().size(), c.traced ? 5u : 0u);
  }
  // Not recording: the marker descriptor is -1.
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
    LevelGuard level(5);
    PerfTrace detail(5, "detail at 5");
    // Lowering the level does not keep an engaged section open.
    PerfTrace::trace_level_ = 0;
  }
  EXPECT_THAT(Summary(recording.Stop()),
              ::testing::ElementsAre("B always", "E", "B detail at 5", "E"));
}

// Registered a second time with ORVEX_TRACE_FILE set (see CMakeLists.txt).
TEST(HostTraceEnvironmentTest, RecordsFromLoadIntoTheNamedFile) {
  const char* path = std::getenv("ORVEX_TRACE_FILE");
  if (path == nullptr) GTEST_SKIP() << "ORVEX_TRACE_FILE is not set";
  ASSERT_NE(atrace_marker_fd, -1);
  { ScopedTrace section("from environment"); }
  orvex_host_trace_stop();
  EXPECT_THAT(Summary(TraceRecording::ReadEvents(path)),
              ::testing::ElementsAre("B from environment", "E"));
}

}  // namespace
}  // namespace orvex
