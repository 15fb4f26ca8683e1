// Runs without the host trace library: the weakly bound entry points stay
// unresolved and every operation must be a silent no-op.

#include "orvex/api/debug/perf_trace.h"

#include <string>

#include "cutils/trace.h"
#include "gtest/gtest.h"

#pragma weak atrace_marker_fd
#pragma weak atrace_enabled_tags
#pragma weak atrace_begin_body

namespace orvex {
namespace {

class LevelGuard {
 public:
  explicit LevelGuard(int level) : saved_(PerfTrace::trace_level_.exchange(level)) {}
  ~LevelGuard() { PerfTrace::trace_level_ = saved_; }

 private:
  int saved_;
};

TEST(PerfTraceWithoutTraceLibraryTest, EveryOperationIsANoOp) {
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Waddress"
  ASSERT_EQ(&atrace_marker_fd, nullptr);
  ASSERT_EQ(&atrace_enabled_tags, nullptr);
  ASSERT_EQ(&atrace_begin_body, nullptr);
#pragma GCC diagnostic pop
  LevelGuard level(10);
  {
    ScopedTrace outer("outer");
    ScopedTrace::TraceBegin("manual");
    ScopedTrace::TraceEnd();
    ScopedTrace::TraceInt("counter", -7);
    ScopedTrace::TraceInt64("counter64", int64_t{1} << 40);
    AsyncTraceBegin("async", 3);
    AsyncTraceEnd("async", 3);
    PerfTrace detail(5, "detail");
    EXPECT_TRUE(detail.engaged());
  }
  SUCCEED();
}

TEST(PerfTraceTest, LevelGatesTheSectionAtConstruction) {
  EXPECT_EQ(PerfTrace::trace_level_.load(), 0);
  struct Case {
    int trace_level;
    int level;
    bool engaged;
  };
  const Case cases[] = {{0, 0, true}, {0, 5, false}, {5, 5, true}, {7, 5, true}, {4, 5, false}};
  for (const Case& c : cases) {
    SCOPED_TRACE(testing::Message() << "trace_level=" << c.trace_level << " level=" << c.level);
    LevelGuard level(c.trace_level);
    PerfTrace trace(c.level, "gated");
    EXPECT_EQ(trace.engaged(), c.engaged);
  }
}

TEST(PerfTraceDeathTest, NegativeLevelIsFatal) {
  EXPECT_DEATH(PerfTrace(-1, "bad"),
               "api/debug/perf_trace:16\\] Check failed: level >= TraceLevel::kAlways "
               "\\(level=-1, TraceLevel::kAlways=0\\) TraceLevel must be >= kAlways");
}

}  // namespace
}  // namespace orvex
