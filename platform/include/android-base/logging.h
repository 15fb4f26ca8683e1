#ifndef ORVEX_PLATFORM_ANDROID_BASE_LOGGING_H_
#define ORVEX_PLATFORM_ANDROID_BASE_LOGGING_H_

// Host stand-in for the two entry points of Android's base logging facility
// that liborvex_base calls: ShouldLog() and LogMessage. An Android build uses
// the platform's own header and library instead.
//
// Host behaviour: every message is one line on stderr,
//   "<S> <tag> <pid> <tid> <file>:<line>] <text>"
// where <S> is the severity letter (V D I W E F). The minimum severity that
// is written comes from the ORVEX_LOG_SEVERITY environment variable (a name
// such as "warning" or its first letter; default INFO), read once. FATAL
// messages are always written and then abort the process. A line that cannot
// be written is lost; a reader that has gone away does not end the process
// with SIGPIPE.
//
// Thread safety: all functions may be called from any thread; each line is
// written with a single write(2), so lines from different threads never mix.
// errno is preserved across every call.

#include <ostream>
#include <sstream>

namespace android {
namespace base {

enum LogSeverity {
  VERBOSE = 0,
  DEBUG = 1,
  INFO = 2,
  WARNING = 3,
  ERROR = 4,
  FATAL_WITHOUT_ABORT = 5,
  FATAL = 6,
};

// Returns true when a message of `severity` would be written. `tag` may be
// null for the process's default tag. FATAL always answers true.
__attribute__((visibility("default"))) bool ShouldLog(LogSeverity severity, const char* tag);

// Collects one message and writes it when destroyed. `error` >= 0 appends
// ": " and the text of that errno value; -1 appends nothing. A FATAL message
// aborts the process after it is written.
class __attribute__((visibility("default"))) LogMessage {
 public:
  LogMessage(const char* file, unsigned int line, LogSeverity severity, const char* tag, int error);
  ~LogMessage();
  LogMessage(const LogMessage&) = delete;
  LogMessage& operator=(const LogMessage&) = delete;

  std::ostream& stream() { return buffer_; }

 private:
  const char* file_;
  unsigned int line_;
  LogSeverity severity_;
  const char* tag_;
  int error_;
  int saved_errno_;
  std::ostringstream buffer_;
};

}  // namespace base
}  // namespace android

#endif  // ORVEX_PLATFORM_ANDROID_BASE_LOGGING_H_
