#ifndef ORVEX_API_DEBUG_PERF_TRACE_H_
#define ORVEX_API_DEBUG_PERF_TRACE_H_

// Trace markers in the Android system trace, camera category (tag bit 10).
//
//   {
//     orvex::ScopedTrace trace("ProcessFrame");   // begin ... end at scope exit
//     orvex::ScopedTrace::TraceInt("queue_depth", depth);
//   }
//   orvex::AsyncTraceBegin("capture", request_id);  // may end on another thread
//   orvex::AsyncTraceEnd("capture", request_id);
//   {
//     orvex::PerfTrace detail(5, "Detailed step");  // traced only when
//   }                                                // PerfTrace::trace_level_ >= 5
//
// The trace library's entry points are bound weakly: without it (or with its
// marker file closed, or the camera category off) every operation is a
// silent no-op. No operation allocates or reports a failure.
//
// Thread safety: every operation may be called from any thread. Synchronous
// sections nest per thread and must end on the thread that began them, in
// reverse order; asynchronous sections may end on any thread.

#include <atomic>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "orvex/base/export.h"

namespace orvex {

// Level of detail of a PerfTrace section. Larger values mean more detail; the
// fence waits of this library use 5.
enum class TraceLevel : int32_t {
  kAlways = 0,
};

// A synchronous trace section: begins at construction and ends at
// destruction. Has no state of its own.
class ORVEX_EXPORT ScopedTrace {
 public:
  explicit ScopedTrace(const char* name) { TraceBegin(name); }
  ~ScopedTrace() { TraceEnd(); }
  ScopedTrace(const ScopedTrace&) = delete;
  ScopedTrace& operator=(const ScopedTrace&) = delete;

  // Opens a section named `name` (NUL-terminated) on the calling thread.
  static void TraceBegin(const char* name);
  // Closes the innermost open section of the calling thread.
  static void TraceEnd();
  // Sets the counter `name` to `value`.
  static void TraceInt(const char* name, int32_t value);
  static void TraceInt64(const char* name, int64_t value);
};

// Begins / ends an asynchronous section; `name` and `cookie` must match at
// begin and end, and the cookie tells apart overlapping sections of a name.
ORVEX_EXPORT void AsyncTraceBegin(const std::string& name, int32_t cookie);
ORVEX_EXPORT void AsyncTraceEnd(const std::string& name, int32_t cookie);

// A section traced only when `level` <= PerfTrace::trace_level_ at
// construction. `name` must view a NUL-terminated string that outlives the
// object (a string literal in practice); it is not copied. A negative level
// is a contract violation and ends the process.
class ORVEX_EXPORT PerfTrace {
 public:
  PerfTrace(int level, std::string_view name) {
    if (level < static_cast<int>(TraceLevel::kAlways)) FailNegativeLevel(level);
    if (level > trace_level_.load(std::memory_order_relaxed)) return;
    scope_.emplace(name.data());
  }
  // Ends the section if one was begun, whatever trace_level_ has become.
  ~PerfTrace() = default;
  PerfTrace(const PerfTrace&) = delete;
  PerfTrace& operator=(const PerfTrace&) = delete;

  // Whether this object began a section.
  bool engaged() const { return scope_.has_value(); }

  // The highest level that is traced; 0 (kAlways only) at load. Set by the
  // code that embeds the library; a change affects later PerfTrace objects.
  static std::atomic<int32_t> trace_level_;

 private:
  [[noreturn]] static void FailNegativeLevel(int level);

  std::optional<ScopedTrace> scope_;
};

}  // namespace orvex

#endif  // ORVEX_API_DEBUG_PERF_TRACE_H_
