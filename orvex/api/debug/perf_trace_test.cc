// Without the host trace library every operation is a silent no-op.

#include "orvex/api/debug/perf_trace.h"

#include "cutils/trace.h"
#include "gtest/gtest.h"

#pragma weak atrace_marker_fd

namespace orvex {
namespace {

TEST(PerfTraceTest, WithoutTraceLibraryEveryOperationIsANoOp) {
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Waddress"
  ASSERT_EQ(&atrace_marker_fd, nullptr);
#pragma GCC diagnostic pop
  ScopedTrace outer("outer");
  ScopedTrace::TraceInt("counter", -7);
  ScopedTrace::TraceInt64("counter64", int64_t{1} << 40);
  AsyncTraceBegin("async", 3);
  AsyncTraceEnd("async", 3);
  PerfTrace always(0, "always");
  EXPECT_TRUE(always.engaged());
  EXPECT_FALSE(PerfTrace(5, "detail").engaged());  // trace_level_ is 0 at load
}

TEST(PerfTraceDeathTest, NegativeLevelIsFatal) {
  EXPECT_DEATH(PerfTrace(-1, "bad"),
               "perf_trace:16\\] Check failed: level >= TraceLevel::kAlways "
               "\\(level=-1, TraceLevel::kAlways=0\\) TraceLevel must be >= kAlways");
}

}  // namespace
}  // namespace orvex
