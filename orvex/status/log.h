#ifndef ORVEX_STATUS_LOG_H_
#define ORVEX_STATUS_LOG_H_

// Logging and contract checks of the library.
//
// Every line goes to Android's base logging library (libbase): the severity
// is tested first with ShouldLog() (nothing is formatted when it answers
// false), then one LogMessage is written with the source unit and line, no
// tag and no error number. The threshold, the line layout and where lines go
// are libbase's (on a host: stderr, INFO and up unless the program changes
// it with SetMinimumLogSeverity or InitLogging and ANDROID_LOG_TAGS).
//
// Guarantees of our own, whatever the logger does: errno seen by the caller
// is unchanged by a log statement, and a line written to a pipe whose reader
// has gone is lost instead of ending the process with SIGPIPE.
//
//   ORVEX_LOG(WARNING) << "buffer " << id << " is not mapped";
//   ORVEX_CHECK(fd >= 0) << "bad descriptor";
//     -> "Check failed: fd >= 0 bad descriptor"
//   ORVEX_CHECK_EQ(a, b) << "detail";
//     -> "Check failed: a == b (a=1, b=2) detail"
//
// A failed check writes one FATAL line and ends the process; nothing runs
// after it. Check values print with their stream operator, except that
// enumerations print as integers, nullptr prints as "(null)" and bool prints
// as "true"/"false".
//
// Thread safety: all macros may be used from any thread.

#include <errno.h>
#include <signal.h>

#include <cstddef>
#include <cstdlib>
#include <ostream>
#include <sstream>
#include <string>
#include <type_traits>

#include "android-base/logging.h"
#include "orvex/base/export.h"

namespace orvex {
namespace log_internal {

// The source unit of a file path, worked out while compiling: the path after
// its last "orvex/" directory, without the extension
// (".../orvex/api/debug/perf_trace.cc" gives "api/debug/perf_trace"). Any
// build, CMake or an Android tree, names units alike.
template <size_t N>
struct SourceUnit {
  consteval SourceUnit(const char (&path)[N]) {  // NOLINT: converts a literal
    constexpr char kRoot[] = "orvex/";
    constexpr size_t kRootLength = sizeof(kRoot) - 1;
    size_t begin = 0;
    for (size_t i = 0; i + kRootLength < N; ++i) {
      bool match = i == 0 || path[i - 1] == '/';
      for (size_t k = 0; k < kRootLength && match; ++k) match = path[i + k] == kRoot[k];
      if (match) begin = i + kRootLength;
    }
    size_t end = N - 1;
    for (size_t i = N - 1; i > begin && path[i - 1] != '/'; --i) {
      if (path[i - 1] == '.') {
        end = i - 1;
        break;
      }
    }
    for (size_t i = begin; i < end; ++i) text[i - begin] = path[i];
  }
  char text[N] = {};
};

template <SourceUnit kUnit>
constexpr const char* SourceUnitText() {
  return kUnit.text;
}

// Keeps the caller's errno across a log statement.
class ErrnoSaver {
 public:
  ErrnoSaver() noexcept : saved_(errno) {}
  ~ErrnoSaver() { errno = saved_; }
  ErrnoSaver(const ErrnoSaver&) = delete;
  ErrnoSaver& operator=(const ErrnoSaver&) = delete;

 private:
  int saved_;
};

// The platform's severity test. A platform may change errno while it decides
// (it can read its configuration on the way), so the caller's value is kept
// here too: a line that is not written leaves errno alone, and the text of a
// line that is written sees the caller's errno.
inline bool ShouldLog(android::base::LogSeverity severity) {
  ErrnoSaver errno_saver;
  return android::base::ShouldLog(severity, nullptr);
}

// Holds SIGPIPE back from the calling thread while a line is written: a
// logger writing to a pipe nobody reads (libbase's stderr logger does) would
// otherwise end the process. A SIGPIPE the write raised is discarded; one
// that was pending before stays pending. Changes errno.
class ORVEX_EXPORT SigpipeGuard {
 public:
  SigpipeGuard() noexcept;
  ~SigpipeGuard();
  SigpipeGuard(const SigpipeGuard&) = delete;
  SigpipeGuard& operator=(const SigpipeGuard&) = delete;

 private:
  sigset_t old_mask_;
  bool blocked_;
  bool was_pending_;
};

// One log line. Members are destroyed in reverse order: the platform message
// is written first, then SIGPIPE is released, then errno restored.
class LogLine {
 public:
  LogLine(const char* unit, int line, android::base::LogSeverity severity)
      : message_(unit, static_cast<unsigned>(line), severity, nullptr, -1) {}
  std::ostream& stream() { return message_.stream(); }

 private:
  ErrnoSaver errno_saver_;
  SigpipeGuard sigpipe_guard_;
  android::base::LogMessage message_;
};

// A FATAL line: written when the object dies, then the process ends.
class ORVEX_EXPORT FatalLogLine {
 public:
  FatalLogLine(const char* unit, int line);
  // Writes "Check failed: " followed by *check_text (which it takes over).
  FatalLogLine(const char* unit, int line, std::string* check_text);
  [[noreturn]] ~FatalLogLine();
  FatalLogLine(const FatalLogLine&) = delete;
  FatalLogLine& operator=(const FatalLogLine&) = delete;
  std::ostream& stream() { return stream_; }

 private:
  const char* unit_;
  int line_;
  std::ostringstream stream_;
};

// Lets a log statement be used where a void expression is expected.
struct Voidify {
  void operator&(std::ostream&) {}
};

template <typename T>
void PrintCheckValue(std::ostream& os, const T& v) {
  if constexpr (std::is_same_v<T, std::nullptr_t>) {
    os << "(null)";
  } else if constexpr (std::is_same_v<T, bool>) {
    os << (v ? "true" : "false");
  } else if constexpr (std::is_enum_v<T>) {
    os << static_cast<long long>(static_cast<std::underlying_type_t<T>>(v));
  } else if constexpr (std::is_same_v<T, signed char> || std::is_same_v<T, unsigned char>) {
    os << static_cast<int>(v);
  } else if constexpr (std::is_pointer_v<T>) {
    if (v == nullptr) {
      os << "(null)";
    } else {
      os << static_cast<const void*>(v);
    }
  } else {
    os << v;
  }
}

// Builds "a op b (a=<value>, b=<value>) " for a failed comparison. The
// result is handed to FatalLogLine, which never returns.
template <typename A, typename B>
std::string* MakeCheckOpString(const A& a, const B& b, const char* a_text, const char* op,
                               const char* b_text) {
  std::ostringstream os;
  os << a_text << ' ' << op << ' ' << b_text << " (" << a_text << '=';
  PrintCheckValue(os, a);
  os << ", " << b_text << '=';
  PrintCheckValue(os, b);
  os << ") ";
  return new std::string(os.str());
}

#define ORVEX_INTERNAL_DEFINE_CHECK_OP(name, op)                                    \
  template <typename A, typename B>                                                 \
  inline std::string* Check##name##Impl(const A& a, const B& b, const char* a_text, \
                                        const char* b_text) {                       \
    if (__builtin_expect(static_cast<bool>(a op b), 1)) return nullptr;             \
    return MakeCheckOpString(a, b, a_text, #op, b_text);                            \
  }
ORVEX_INTERNAL_DEFINE_CHECK_OP(EQ, ==)
ORVEX_INTERNAL_DEFINE_CHECK_OP(NE, !=)
ORVEX_INTERNAL_DEFINE_CHECK_OP(LT, <)
ORVEX_INTERNAL_DEFINE_CHECK_OP(LE, <=)
ORVEX_INTERNAL_DEFINE_CHECK_OP(GT, >)
ORVEX_INTERNAL_DEFINE_CHECK_OP(GE, >=)
#undef ORVEX_INTERNAL_DEFINE_CHECK_OP

}  // namespace log_internal
}  // namespace orvex

// Log lines name the unit of the file that logs; a build may set its own.
#ifndef ORVEX_SOURCE_UNIT
#define ORVEX_SOURCE_UNIT (::orvex::log_internal::SourceUnitText<__FILE__>())
#endif

// ORVEX_LOG(severity): severity is one of INFO, WARNING, ERROR, FATAL.
#define ORVEX_LOG(severity) ORVEX_INTERNAL_LOG_##severity

#define ORVEX_INTERNAL_LOG_AT(severity)                                                            \
  !::orvex::log_internal::ShouldLog(::android::base::severity)                                     \
      ? (void)0                                                                                    \
      : ::orvex::log_internal::Voidify() &                                                         \
            ::orvex::log_internal::LogLine(ORVEX_SOURCE_UNIT, __LINE__, ::android::base::severity) \
                .stream()
#define ORVEX_INTERNAL_LOG_INFO ORVEX_INTERNAL_LOG_AT(INFO)
#define ORVEX_INTERNAL_LOG_WARNING ORVEX_INTERNAL_LOG_AT(WARNING)
#define ORVEX_INTERNAL_LOG_ERROR ORVEX_INTERNAL_LOG_AT(ERROR)
#define ORVEX_INTERNAL_LOG_FATAL \
  ::orvex::log_internal::FatalLogLine(ORVEX_SOURCE_UNIT, __LINE__).stream()

// ORVEX_CHECK(condition) << detail: "Check failed: <condition> <detail>".
#define ORVEX_CHECK(condition)                                              \
  while (__builtin_expect(!static_cast<bool>(condition), 0))                \
  ::orvex::log_internal::FatalLogLine(ORVEX_SOURCE_UNIT, __LINE__).stream() \
      << "Check failed: " #condition " "

#define ORVEX_INTERNAL_CHECK_OP(name, a, b)                              \
  while (std::string* orvex_check_text_ =                                \
             ::orvex::log_internal::Check##name##Impl((a), (b), #a, #b)) \
  ::orvex::log_internal::FatalLogLine(ORVEX_SOURCE_UNIT, __LINE__, orvex_check_text_).stream()

#define ORVEX_CHECK_EQ(a, b) ORVEX_INTERNAL_CHECK_OP(EQ, a, b)
#define ORVEX_CHECK_NE(a, b) ORVEX_INTERNAL_CHECK_OP(NE, a, b)
#define ORVEX_CHECK_LT(a, b) ORVEX_INTERNAL_CHECK_OP(LT, a, b)
#define ORVEX_CHECK_LE(a, b) ORVEX_INTERNAL_CHECK_OP(LE, a, b)
#define ORVEX_CHECK_GT(a, b) ORVEX_INTERNAL_CHECK_OP(GT, a, b)
#define ORVEX_CHECK_GE(a, b) ORVEX_INTERNAL_CHECK_OP(GE, a, b)

#endif  // ORVEX_STATUS_LOG_H_
