// Host implementation of the Android trace entry points: records markers as
// Chrome JSON trace events. See host_trace/host_trace.h.

#include "host_trace/host_trace.h"

#include <dlfcn.h>
#include <errno.h>
#include <fcntl.h>
#include <pthread.h>
#include <sys/syscall.h>
#include <time.h>
#include <unistd.h>

#include <cinttypes>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <mutex>
#include <string>
#include <string_view>
#include <unordered_set>

#include "cutils/trace.h"

#define HOST_TRACE_EXPORT __attribute__((visibility("default")))

extern "C" {
HOST_TRACE_EXPORT int atrace_marker_fd = -1;
HOST_TRACE_EXPORT uint64_t atrace_enabled_tags = 0;
}

namespace {

constexpr uint64_t kDefaultTags = ATRACE_TAG_ALWAYS | ATRACE_TAG_CAMERA;

// The process binds each trace entry point to the first loaded library that
// defines it. Debian's libcutils defines them all as no-ops: loaded ahead of
// this library, it would take every marker but the section ends written to
// the descriptor, so recording is refused instead of producing a broken
// trace. Links that put this library first, or a preload, avoid that. (The
// two variables are not checked: whichever definition wins, every library
// uses the same one, possibly the program's copy.)
bool EntryPointsAreOurs() {
  Dl_info ours, bound;
  void* const begin = dlsym(RTLD_DEFAULT, "atrace_begin_body");
  if (dladdr(&kDefaultTags, &ours) == 0 || begin == nullptr || dladdr(begin, &bound) == 0) {
    return false;
  }
  if (bound.dli_fbase == ours.dli_fbase) return true;
  std::fprintf(stderr,
               "host trace: the trace entry points are bound to %s, loaded ahead of %s; link or "
               "preload (LD_PRELOAD) the recorder first\n",
               bound.dli_fname, ours.dli_fname);
  return false;
}

// The file being recorded and the threads already named in it.
class Recorder {
 public:
  int Start(const char* path) {
    std::lock_guard<std::mutex> lock(mutex_);
    FinishLocked();
    if (!EntryPointsAreOurs()) {
      errno = ENOTSUP;
      return -1;
    }
    FILE* file = std::fopen(path, "w");
    if (file == nullptr) return -1;
    if (marker_fd_ == -1) {
      // Kept open for the life of the process: a marker written while
      // recording stops must never reach a reused descriptor.
      marker_fd_ = open("/dev/null", O_WRONLY | O_CLOEXEC);
      if (marker_fd_ == -1) {
        const int saved = errno;
        std::fclose(file);
        errno = saved;
        return -1;
      }
    }
    file_ = file;
    path_ = path;
    write_error_ = 0;
    named_threads_.clear();
    std::fputs("[\n", file_);
    first_event_ = true;
    std::string process = "{\"name\":\"process_name\",\"ph\":\"M\",\"pid\":";
    process += std::to_string(getpid());
    process += ",\"tid\":0,\"args\":{\"name\":";
    AppendJsonString(&process, program_invocation_short_name);
    process += "}}";
    EmitLocked(process);
    __atomic_store_n(&atrace_enabled_tags, TagsFromEnvironment(), __ATOMIC_RELAXED);
    __atomic_store_n(&atrace_marker_fd, marker_fd_, __ATOMIC_RELAXED);
    return 0;
  }

  // 0, or -1 with errno set to the first write or close error of the
  // recording just finished.
  int Stop() {
    std::lock_guard<std::mutex> lock(mutex_);
    const int error = FinishLocked();
    if (error == 0) return 0;
    errno = error;
    return -1;
  }

  void Flush() {
    std::lock_guard<std::mutex> lock(mutex_);
    if (file_ != nullptr && std::fflush(file_) != 0) NoteWriteErrorLocked();
  }

  // The file of the current or last recording.
  std::string path() {
    std::lock_guard<std::mutex> lock(mutex_);
    return path_;
  }

  // Records one event of phase `ph` for the calling thread. `name` is
  // omitted when null; `id` and `value` are written when given.
  void Record(char ph, const char* name, size_t name_size, const char* id, const int64_t* value) {
    const int64_t now_ns = MonotonicNanoseconds();
    const long tid = static_cast<long>(syscall(SYS_gettid));
    std::string event = "{";
    if (name != nullptr) {
      event += "\"name\":";
      AppendJsonString(&event, std::string_view(name, name_size));
      event += ",\"cat\":\"camera\",";
    }
    event += "\"ph\":\"";
    event += ph;
    char buf[96];
    std::snprintf(buf, sizeof(buf), "\",\"ts\":%" PRId64 ".%03d,\"pid\":%d,\"tid\":%ld",
                  now_ns / 1000, static_cast<int>(now_ns % 1000), static_cast<int>(getpid()), tid);
    event += buf;
    if (id != nullptr) {
      event += ",\"id\":\"";
      event += id;
      event += '"';
    }
    if (value != nullptr) {
      event += ",\"args\":{\"value\":";
      event += std::to_string(*value);
      event += '}';
    }
    event += '}';

    std::lock_guard<std::mutex> lock(mutex_);
    if (file_ == nullptr) return;
    if (named_threads_.insert(tid).second) EmitThreadNameLocked(tid);
    EmitLocked(event);
  }

 private:
  static int64_t MonotonicNanoseconds() {
    timespec ts;
    clock_gettime(CLOCK_MONOTONIC, &ts);
    return static_cast<int64_t>(ts.tv_sec) * 1000000000 + ts.tv_nsec;
  }

  static uint64_t TagsFromEnvironment() {
    const char* text = std::getenv("ORVEX_TRACE_TAGS");
    if (text == nullptr || *text == '\0') return kDefaultTags;
    char* end = nullptr;
    errno = 0;
    const unsigned long long tags = std::strtoull(text, &end, 0);
    if (errno != 0 || *end != '\0') return kDefaultTags;
    return static_cast<uint64_t>(tags);
  }

  static void AppendJsonString(std::string* out, std::string_view text) {
    *out += '"';
    for (const char c : text) {
      const unsigned char u = static_cast<unsigned char>(c);
      if (c == '"' || c == '\\') {
        *out += '\\';
        *out += c;
      } else if (u < 0x20) {
        char buf[8];
        std::snprintf(buf, sizeof(buf), "\\u%04x", u);
        *out += buf;
      } else {
        *out += c;
      }
    }
    *out += '"';
  }

  void EmitThreadNameLocked(long tid) {
    char name[32] = "";
    if (pthread_getname_np(pthread_self(), name, sizeof(name)) != 0) name[0] = '\0';
    std::string event = "{\"name\":\"thread_name\",\"ph\":\"M\",\"pid\":";
    event += std::to_string(getpid());
    event += ",\"tid\":";
    event += std::to_string(tid);
    event += ",\"args\":{\"name\":";
    AppendJsonString(&event, name);
    event += "}}";
    EmitLocked(event);
  }

  // Keeps the first failure: once a write has failed the file is cut short
  // and later events are not written.
  void NoteWriteErrorLocked() {
    if (write_error_ == 0) write_error_ = errno != 0 ? errno : EIO;
  }

  void EmitLocked(const std::string& event) {
    if (write_error_ != 0) return;
    if ((!first_event_ && std::fputs(",\n", file_) == EOF) ||
        std::fwrite(event.data(), 1, event.size(), file_) != event.size()) {
      NoteWriteErrorLocked();
    }
    first_event_ = false;
  }

  // Closes the event array and the file; returns 0 or the errno of the first
  // failed write, flush or close.
  int FinishLocked() {
    if (file_ == nullptr) return 0;
    __atomic_store_n(&atrace_marker_fd, -1, __ATOMIC_RELAXED);
    __atomic_store_n(&atrace_enabled_tags, uint64_t{0}, __ATOMIC_RELAXED);
    if (write_error_ == 0 && (std::fputs("\n]\n", file_) == EOF || std::fflush(file_) != 0)) {
      NoteWriteErrorLocked();
    }
    if (std::fclose(file_) != 0) NoteWriteErrorLocked();
    file_ = nullptr;
    const int error = write_error_;
    write_error_ = 0;
    return error;
  }

  std::mutex mutex_;
  FILE* file_ = nullptr;
  std::string path_;
  int write_error_ = 0;
  int marker_fd_ = -1;
  bool first_event_ = true;
  std::unordered_set<long> named_threads_;
};

// Never destroyed: markers may arrive from other threads during exit.
Recorder& GetRecorder() {
  static Recorder* const recorder = new Recorder();
  return *recorder;
}

// Parses text written to the marker descriptor: "E" (optionally "E|pid"),
// "B|pid|name", "C|pid|name|value", "S|pid|name|cookie", "F|pid|name|cookie".
void RecordMarkerText(const char* text, size_t size) {
  if (size == 0) return;
  std::string_view line(text, size);
  while (!line.empty() && (line.back() == '\n' || line.back() == '\0')) line.remove_suffix(1);
  if (line.empty()) return;
  const char kind = line[0];
  if (kind == 'E') {
    GetRecorder().Record('E', nullptr, 0, nullptr, nullptr);
    return;
  }
  // Skip "<kind>|<pid>|".
  size_t first = line.find('|');
  size_t second = first == std::string_view::npos ? first : line.find('|', first + 1);
  if (second == std::string_view::npos) return;
  std::string_view rest = line.substr(second + 1);
  if (kind == 'B') {
    GetRecorder().Record('B', rest.data(), rest.size(), nullptr, nullptr);
    return;
  }
  const size_t last = rest.rfind('|');
  if (last == std::string_view::npos) return;
  const std::string_view name = rest.substr(0, last);
  const std::string number(rest.substr(last + 1));
  char* end = nullptr;
  const long long parsed = std::strtoll(number.c_str(), &end, 10);
  if (number.empty() || *end != '\0') return;
  const int64_t value = parsed;
  if (kind == 'C') {
    GetRecorder().Record('C', name.data(), name.size(), nullptr, &value);
  } else if (kind == 'S' || kind == 'F') {
    GetRecorder().Record(kind == 'S' ? 'b' : 'e', name.data(), name.size(), number.c_str(),
                         nullptr);
  }
}

void RecordAsync(char ph, const char* name, int32_t cookie) {
  const std::string id = std::to_string(cookie);
  GetRecorder().Record(ph, name, std::strlen(name), id.c_str(), nullptr);
}

__attribute__((constructor)) void StartFromEnvironment() {
  const char* path = std::getenv("ORVEX_TRACE_FILE");
  if (path == nullptr || *path == '\0') return;
  if (GetRecorder().Start(path) != 0) {
    std::fprintf(stderr, "host trace: cannot open %s: %s\n", path, std::strerror(errno));
  }
}

__attribute__((destructor)) void FinishAtExit() {
  if (GetRecorder().Stop() != 0) {
    const int error = errno;
    std::fprintf(stderr, "host trace: cannot write %s: %s\n", GetRecorder().path().c_str(),
                 std::strerror(error));
  }
}

}  // namespace

extern "C" {

HOST_TRACE_EXPORT void atrace_begin_body(const char* name) {
  GetRecorder().Record('B', name, std::strlen(name), nullptr, nullptr);
}

HOST_TRACE_EXPORT void atrace_int_body(const char* name, int32_t value) {
  const int64_t wide = value;
  GetRecorder().Record('C', name, std::strlen(name), nullptr, &wide);
}

HOST_TRACE_EXPORT void atrace_int64_body(const char* name, int64_t value) {
  GetRecorder().Record('C', name, std::strlen(name), nullptr, &value);
}

HOST_TRACE_EXPORT void atrace_async_begin_body(const char* name, int32_t cookie) {
  RecordAsync('b', name, cookie);
}

HOST_TRACE_EXPORT void atrace_async_end_body(const char* name, int32_t cookie) {
  RecordAsync('e', name, cookie);
}

HOST_TRACE_EXPORT int orvex_host_trace_start(const char* path) { return GetRecorder().Start(path); }

HOST_TRACE_EXPORT int orvex_host_trace_stop(void) { return GetRecorder().Stop(); }

HOST_TRACE_EXPORT void orvex_host_trace_flush(void) { GetRecorder().Flush(); }

// Interposes write(2) so that markers written to atrace_marker_fd are
// recorded with the writing thread's id; every call still reaches the kernel
// unchanged.
HOST_TRACE_EXPORT ssize_t write(int fd, const void* buf, size_t count) {
  const int marker_fd = __atomic_load_n(&atrace_marker_fd, __ATOMIC_RELAXED);
  if (marker_fd != -1 && fd == marker_fd && buf != nullptr) {
    const int saved = errno;
    RecordMarkerText(static_cast<const char*>(buf), count);
    errno = saved;
  }
  return static_cast<ssize_t>(syscall(SYS_write, fd, buf, count));
}

}  // extern "C"
