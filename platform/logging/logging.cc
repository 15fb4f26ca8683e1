#include "android-base/logging.h"

#include <errno.h>
#include <pthread.h>
#include <signal.h>
#include <string.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cctype>
#include <cstdlib>
#include <string>

namespace android {
namespace base {
namespace {

class ErrnoRestorer {
 public:
  ErrnoRestorer() : saved_(errno) {}
  ~ErrnoRestorer() { errno = saved_; }
  ErrnoRestorer(const ErrnoRestorer&) = delete;
  ErrnoRestorer& operator=(const ErrnoRestorer&) = delete;

 private:
  int saved_;
};

LogSeverity ParseMinSeverity(const char* text) {
  if (text == nullptr || *text == '\0') return INFO;
  switch (std::tolower(static_cast<unsigned char>(*text))) {
    case 'v':
      return VERBOSE;
    case 'd':
      return DEBUG;
    case 'i':
      return INFO;
    case 'w':
      return WARNING;
    case 'e':
      return ERROR;
    case 'f':
      return FATAL;
    default:
      return INFO;
  }
}

LogSeverity MinSeverity() {
  static const LogSeverity min_severity = ParseMinSeverity(std::getenv("ORVEX_LOG_SEVERITY"));
  return min_severity;
}

char SeverityLetter(LogSeverity severity) {
  static constexpr char kLetters[] = "VDIWEFF";
  if (severity < VERBOSE || severity > FATAL) return '?';
  return kLetters[severity];
}

const char* DefaultTag() {
  return program_invocation_short_name != nullptr ? program_invocation_short_name : "orvex";
}

std::string ErrnoText(int error) {
  char buf[128];
  // GNU strerror_r may return a static string instead of filling buf.
  const char* text = strerror_r(error, buf, sizeof(buf));
  return text != nullptr ? text : "";
}

// Writes `line` to stderr; a line that cannot be written is lost. A reader
// that has gone away must not end the process: SIGPIPE is blocked for the
// write, and one the write raised is taken back unless one was pending
// already.
void WriteLine(const std::string& line) {
  sigset_t pipe_signal;
  sigemptyset(&pipe_signal);
  sigaddset(&pipe_signal, SIGPIPE);
  sigset_t pending;
  const bool was_pending = sigpending(&pending) == 0 && sigismember(&pending, SIGPIPE) == 1;
  sigset_t old_mask;
  const bool blocked = pthread_sigmask(SIG_BLOCK, &pipe_signal, &old_mask) == 0;
  bool broken_pipe = false;
  const char* p = line.data();
  size_t left = line.size();
  while (left > 0) {
    const ssize_t n = write(STDERR_FILENO, p, left);
    if (n < 0 && errno == EINTR) continue;
    if (n <= 0) {
      broken_pipe = n < 0 && errno == EPIPE;
      break;
    }
    p += n;
    left -= static_cast<size_t>(n);
  }
  if (!blocked) return;
  if (broken_pipe && !was_pending) {
    const struct timespec no_wait = {0, 0};
    while (sigtimedwait(&pipe_signal, nullptr, &no_wait) < 0 && errno == EINTR) {
    }
  }
  pthread_sigmask(SIG_SETMASK, &old_mask, nullptr);
}

}  // namespace

bool ShouldLog(LogSeverity severity, const char* /*tag*/) {
  ErrnoRestorer restorer;
  return severity >= FATAL || severity >= MinSeverity();
}

LogMessage::LogMessage(const char* file, unsigned int line, LogSeverity severity, const char* tag,
                       int error)
    : file_(file),
      line_(line),
      severity_(severity),
      tag_(tag),
      error_(error),
      saved_errno_(errno) {}

LogMessage::~LogMessage() {
  std::string line;
  line.reserve(128);
  line += SeverityLetter(severity_);
  line += ' ';
  line += tag_ != nullptr ? tag_ : DefaultTag();
  line += ' ';
  line += std::to_string(getpid());
  line += ' ';
  line += std::to_string(static_cast<long>(syscall(SYS_gettid)));
  line += ' ';
  line += file_ != nullptr ? file_ : "?";
  line += ':';
  line += std::to_string(line_);
  line += "] ";
  line += buffer_.str();
  if (error_ >= 0) {
    line += ": ";
    line += ErrnoText(error_);
  }
  line += '\n';
  if (severity_ >= FATAL || severity_ >= MinSeverity()) WriteLine(line);
  if (severity_ == FATAL) std::abort();
  errno = saved_errno_;
}

}  // namespace base
}  // namespace android
