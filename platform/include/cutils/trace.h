#ifndef ORVEX_PLATFORM_CUTILS_TRACE_H_
#define ORVEX_PLATFORM_CUTILS_TRACE_H_

// The seven entry points of Android's trace facility that liborvex_base
// uses. On Android they come from the platform's utility library; on the
// host from liborvex_host_trace (platform/trace), which records them as a
// Chrome JSON trace when ORVEX_TRACE_FILE names an output file.
//
// atrace_marker_fd is the open trace marker file, or -1 when tracing is not
// available; atrace_enabled_tags is the mask of enabled categories. Writers
// and readers of these two variables use relaxed atomic accesses.
//
// Thread safety: every function may be called from any thread.

#include <stdint.h>

#define ATRACE_TAG_ALWAYS (1ULL << 0)
#define ATRACE_TAG_CAMERA (1ULL << 10)

#ifdef __cplusplus
extern "C" {
#endif

extern int atrace_marker_fd;
extern uint64_t atrace_enabled_tags;

// Opens a synchronous section on the calling thread.
void atrace_begin_body(const char* name);
// Sets a counter.
void atrace_int_body(const char* name, int32_t value);
void atrace_int64_body(const char* name, int64_t value);
// Begins / ends an asynchronous section identified by name and cookie.
void atrace_async_begin_body(const char* name, int32_t cookie);
void atrace_async_end_body(const char* name, int32_t cookie);

#ifdef __cplusplus
}  // extern "C"
#endif

#endif  // ORVEX_PLATFORM_CUTILS_TRACE_H_
