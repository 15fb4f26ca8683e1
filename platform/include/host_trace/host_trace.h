#ifndef ORVEX_PLATFORM_HOST_TRACE_HOST_TRACE_H_
#define ORVEX_PLATFORM_HOST_TRACE_HOST_TRACE_H_

// Control of the host trace library (liborvex_host_trace), which provides
// the Android trace entry points of cutils/trace.h on a development host and
// records them as Chrome JSON trace events (an array of events, one per line)
// that the Perfetto UI and chrome://tracing open.
//
// At load the library starts recording into the file named by the
// environment variable ORVEX_TRACE_FILE, if set; ORVEX_TRACE_TAGS (a number,
// 0x-prefixed for hexadecimal) chooses the enabled categories, by default
// ATRACE_TAG_ALWAYS | ATRACE_TAG_CAMERA. The file is completed at process
// exit, and a failed write is then reported on stderr. Without
// ORVEX_TRACE_FILE, atrace_marker_fd stays -1 and every entry point does
// nothing until orvex_host_trace_start() is called.
//
// Recorded: sections (ph "B"/"E"), counters ("C", args.value), asynchronous
// sections ("b"/"e", id = cookie), each with a timestamp in microseconds of
// the monotonic clock, the process id and the thread id, plus thread-name
// metadata. Section ends written as the one-byte "E" marker to
// atrace_marker_fd are attributed to the writing thread: the library
// interposes write(2) and forwards every call to the kernel unchanged.
//
// The process must bind the trace entry points to this library: link it
// ahead of any other library that defines them (Debian's libcutils does, as
// no-ops) or preload it with LD_PRELOAD. Otherwise recording is refused.
//
// Thread safety: the entry points may be called from any thread. start and
// stop must not race with each other.

#ifdef __cplusplus
extern "C" {
#endif

// Starts recording into `path` (created or truncated), finishing any current
// recording first (stop it before to learn whether it was written in full).
// Returns 0, or -1 with errno set when the file cannot be opened or (ENOTSUP,
// explained on stderr) another library's trace entry points come first in the
// process; recording then stays off.
int orvex_host_trace_start(const char* path);

// Finishes the current recording: closes the event array and the file and
// sets atrace_marker_fd to -1 and atrace_enabled_tags to 0. Returns 0, or -1
// with errno set to the first error met while writing, flushing or closing
// the file (a full disk, a file-size limit): the file is then cut short and
// is no valid JSON. Returns 0 when not recording.
int orvex_host_trace_stop(void);

// Writes buffered events to the file; a failure is reported by the next
// orvex_host_trace_stop().
void orvex_host_trace_flush(void);

#ifdef __cplusplus
}  // extern "C"
#endif

#endif  // ORVEX_PLATFORM_HOST_TRACE_HOST_TRACE_H_
