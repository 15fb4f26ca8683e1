#include "orvex/status/log.h"

#include <pthread.h>
#include <signal.h>
#include <time.h>

#include <memory>

namespace orvex {
namespace log_internal {

FatalLogLine::FatalLogLine(const char* unit, int line) : unit_(unit), line_(line) {}

FatalLogLine::FatalLogLine(const char* unit, int line, std::string* check_text)
    : unit_(unit), line_(line) {
  std::unique_ptr<std::string> text(check_text);
  stream_ << "Check failed: " << *text;
}

namespace {

sigset_t PipeSignalSet() {
  sigset_t set;
  sigemptyset(&set);
  sigaddset(&set, SIGPIPE);
  return set;
}

bool SigpipePending() {
  sigset_t pending;
  return sigpending(&pending) == 0 && sigismember(&pending, SIGPIPE) == 1;
}

}  // namespace

SigpipeGuard::SigpipeGuard() noexcept {
  was_pending_ = SigpipePending();
  const sigset_t pipe_signal = PipeSignalSet();
  blocked_ = pthread_sigmask(SIG_BLOCK, &pipe_signal, &old_mask_) == 0;
}

SigpipeGuard::~SigpipeGuard() {
  if (!blocked_) return;
  if (!was_pending_ && SigpipePending()) {
    const sigset_t pipe_signal = PipeSignalSet();
    const struct timespec no_wait = {0, 0};
    while (sigtimedwait(&pipe_signal, nullptr, &no_wait) < 0 && errno == EINTR) {
    }
  }
  pthread_sigmask(SIG_SETMASK, &old_mask_, nullptr);
}

FatalLogLine::~FatalLogLine() {
  ErrnoSaver errno_saver;
  // The process ends with the abort below, not with a SIGPIPE.
  SigpipeGuard sigpipe_guard;
  if (android::base::ShouldLog(android::base::FATAL, nullptr)) {
    android::base::LogMessage(unit_, static_cast<unsigned>(line_), android::base::FATAL, nullptr,
                              -1)
            .stream()
        << stream_.str();
  }
  // The platform ends the process on a FATAL line; make sure of it even if a
  // logger was configured not to.
  std::abort();
}

}  // namespace log_internal
}  // namespace orvex
