#include "orvex/api/debug/perf_trace.h"

#include <unistd.h>

#include <cstdint>
#include <string>

#include "cutils/trace.h"
#include "orvex/status/log.h"

namespace orvex {

std::atomic<int32_t> PerfTrace::trace_level_{0};

void PerfTrace::FailNegativeLevel(int level) {
  ORVEX_LOG(FATAL) << "Check failed: level >= TraceLevel::kAlways (level=" << level
                   << ", TraceLevel::kAlways=0) TraceLevel must be >= kAlways";
}

}  // namespace orvex

// The trace library is optional: its entry points are bound weakly, so their
// addresses are null when it is not loaded. cutils/trace.h declares the
// functions only inside its inline wrappers (which would start the trace
// library's own set-up); the library calls them directly, behind its own
// enabled test.
#pragma weak atrace_marker_fd
#pragma weak atrace_enabled_tags
extern "C" {
__attribute__((weak)) void atrace_begin_body(const char* name);
__attribute__((weak)) void atrace_int_body(const char* name, int32_t value);
__attribute__((weak)) void atrace_int64_body(const char* name, int64_t value);
__attribute__((weak)) void atrace_async_begin_body(const char* name, int32_t cookie);
__attribute__((weak)) void atrace_async_end_body(const char* name, int32_t cookie);
}

namespace orvex {
namespace {

// The marker descriptor and tag mask are read as they are, without starting
// the trace library's own initialisation.
inline bool MarkerOpenAndCameraEnabled() {
  if (__atomic_load_n(&atrace_marker_fd, __ATOMIC_RELAXED) == -1) return false;
  if (&atrace_enabled_tags == nullptr) return false;
  return (__atomic_load_n(&atrace_enabled_tags, __ATOMIC_RELAXED) & ATRACE_TAG_CAMERA) != 0;
}

// Enabled test for an operation that calls `body`.
template <typename Fn>
inline bool Enabled(Fn* body) {
  // The weak symbols' addresses are tested on purpose.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Waddress"
  if (&atrace_marker_fd == nullptr || body == nullptr) return false;
#pragma GCC diagnostic pop
  return MarkerOpenAndCameraEnabled();
}

}  // namespace

void ScopedTrace::TraceBegin(const char* name) {
  if (Enabled(&atrace_begin_body)) atrace_begin_body(name);
}

void ScopedTrace::TraceEnd() {
  if (&atrace_marker_fd == nullptr || !MarkerOpenAndCameraEnabled()) return;
  const char end = 'E';
  // A marker that cannot be written is lost; tracing never fails the caller.
  [[maybe_unused]] const ssize_t written =
      write(__atomic_load_n(&atrace_marker_fd, __ATOMIC_RELAXED), &end, 1);
}

void ScopedTrace::TraceInt(const char* name, int32_t value) {
  if (Enabled(&atrace_int_body)) atrace_int_body(name, value);
}

void ScopedTrace::TraceInt64(const char* name, int64_t value) {
  if (Enabled(&atrace_int64_body)) atrace_int64_body(name, value);
}

void AsyncTraceBegin(const std::string& name, int32_t cookie) {
  if (Enabled(&atrace_async_begin_body)) atrace_async_begin_body(name.c_str(), cookie);
}

void AsyncTraceEnd(const std::string& name, int32_t cookie) {
  if (Enabled(&atrace_async_end_body)) atrace_async_end_body(name.c_str(), cookie);
}

}  // namespace orvex
