#include "orvex/status/log.h"

#include <dlfcn.h>
#include <errno.h>
#include <pthread.h>
#include <signal.h>
#include <unistd.h>

#include <atomic>
#include <functional>
#include <string>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/status/status_builder.h"

// Replaces libbase's severity test in the whole process: counts its calls and
// disturbs errno, as a platform's may while it reads its configuration.
static std::atomic<int> should_log_calls{0};

namespace android::base {
bool ShouldLog(LogSeverity severity, const char* tag) {
  static const auto real = reinterpret_cast<bool (*)(LogSeverity, const char*)>(
      dlsym(RTLD_NEXT, "_ZN7android4base9ShouldLogENS0_11LogSeverityEPKc"));
  ++should_log_calls;
  const bool answer = real(severity, tag);
  errno = EILSEQ;
  return answer;
}
}  // namespace android::base

namespace orvex {
namespace {

using ::testing::MatchesRegex;

// Streamed text: says whether it sees the caller's errno, then changes errno.
const char* Text() {
  const char* seen = errno == EDOM ? "errno kept" : "errno lost";
  errno = ENOSPC;
  return seen;
}

// Logging asks the platform, writes one line naming its unit only above the threshold and keeps
// errno, even if the severity test or text changes it; a passing check does none of it.
TEST(LogTest, LinesAndErrno) {
  // clang-format off
  const struct { bool asks; const char* line; std::function<void()> call; } calls[] = {
      {true, "I [^]]* log_test:[0-9]+\\] errno kept", [] { ORVEX_LOG(INFO) << Text(); }},
      {true, "W [^]]* log_test:[0-9]+\\] errno kept", [] { ORVEX_LOG(WARNING) << Text(); }},
      {true, "E [^]]* log_test:[0-9]+\\] errno kept", [] { ORVEX_LOG(ERROR) << Text(); }},
      {true, "E [^]]* status_builder:[0-9]+\\] f.cc:7: INTERNAL: x",
       [] { Status s = InternalErrorBuilder(SourceLocation(7, "f.cc")).Log(4) << "x"; }},
      {false, "", [] { ORVEX_CHECK(errno == EDOM) << Text(); ORVEX_CHECK_EQ(errno, EDOM) << Text(); }},
      {false, "", [] { ORVEX_CHECK_LE(2, 2) << Text(); ORVEX_CHECK_GE(3, 3) << Text(); }}};
  // clang-format on
  for (const bool quiet : {false, true}) {
    android::base::ScopedLogSeverity threshold(quiet ? android::base::FATAL : android::base::INFO);
    for (const auto& c : calls) {
      SCOPED_TRACE(::testing::Message() << c.line << (quiet ? ", not logged" : ", logged"));
      const int calls_before = should_log_calls;
      ::testing::internal::CaptureStderr();
      errno = EDOM;
      c.call();
      const int after = errno;
      const std::string out = ::testing::internal::GetCapturedStderr();
      EXPECT_EQ(after, EDOM);
      EXPECT_EQ(should_log_calls > calls_before, c.asks);
      if (quiet || !c.asks) {
        EXPECT_EQ(out, "");
      } else {
        EXPECT_THAT(out, MatchesRegex(std::string("[^ ]+ ") + c.line + "\n"));
      }
    }
  }
}

// Points stderr at a pipe nobody reads: a write there raises SIGPIPE.
void StderrToDeadPipe() {
  int fds[2];
  if (pipe(fds) != 0 || dup2(fds[1], STDERR_FILENO) < 0) _exit(2);
  close(fds[0]);
}

// A line that cannot be written is lost, nothing more: errno and the signal mask are kept, a
// pending SIGPIPE stays pending, and a FATAL line still ends the process by abort.
TEST(LogDeathTest, UnwritableStderrLosesTheLineOnly) {
  EXPECT_EXIT(
      {
        StderrToDeadPipe();
        errno = EDOM;
        ORVEX_LOG(ERROR) << "lost";
        sigset_t mask;
        pthread_sigmask(SIG_SETMASK, nullptr, &mask);
        const bool kept = errno == EDOM && sigismember(&mask, SIGPIPE) == 0;
        sigaddset(&mask, SIGPIPE);
        sigprocmask(SIG_BLOCK, &mask, nullptr);
        raise(SIGPIPE);
        ORVEX_LOG(ERROR) << "lost";
        sigpending(&mask);
        _exit(kept && sigismember(&mask, SIGPIPE) == 1 ? 0 : 1);
      },
      ::testing::ExitedWithCode(0), "");
  EXPECT_EXIT((StderrToDeadPipe(), ORVEX_LOG(FATAL) << "lost"), ::testing::KilledBySignal(SIGABRT),
              "");
}

enum class Level { kAlways = 0 };

TEST(LogDeathTest, FatalTexts) {
  const int alignment = 3;
  const Status forfeit_status = OkStatus();
  const Level level = static_cast<Level>(-1);
  const int* gain_lut = nullptr;
  EXPECT_DEATH(ORVEX_CHECK(alignment % 2 == 0) << "alignment value: " << alignment,
               "Check failed: alignment % 2 == 0 alignment value: 3");
  EXPECT_DEATH(
      ORVEX_CHECK_NE(forfeit_status, OkStatus()),
      "Check failed: forfeit_status != OkStatus\\(\\) \\(forfeit_status=OK, OkStatus\\(\\)=OK\\) ");
  EXPECT_DEATH(ORVEX_CHECK_GE(level, Level::kAlways),
               "Check failed: level >= Level::kAlways \\(level=-1, Level::kAlways=0\\) ");
  EXPECT_DEATH(ORVEX_CHECK_NE(gain_lut, nullptr),
               "Check failed: gain_lut != nullptr \\(gain_lut=\\(null\\), nullptr=\\(null\\)\\) ");
}

}  // namespace
}  // namespace orvex
