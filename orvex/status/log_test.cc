#include "orvex/status/log.h"

#include <dlfcn.h>
#include <errno.h>
#include <pthread.h>
#include <signal.h>
#include <string.h>
#include <unistd.h>

#include <atomic>
#include <functional>
#include <string>
#include <vector>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/status/status.h"
#include "orvex/status/status_builder.h"

// A severity test that disturbs errno, as a platform's may (it can read
// configuration on the way). Defined here, it takes the place of libbase's
// for the whole process, the library's own log calls included; it counts its
// calls and forwards to libbase.
namespace {
std::atomic<int> should_log_calls{0};
std::atomic<int> should_log_errno{0};  // 0: leave errno alone
}  // namespace

namespace android::base {
bool ShouldLog(LogSeverity severity, const char* tag) {
  using ShouldLogFn = bool (*)(LogSeverity, const char*);
  static const auto real = reinterpret_cast<ShouldLogFn>(
      dlsym(RTLD_NEXT, "_ZN7android4base9ShouldLogENS0_11LogSeverityEPKc"));
  ++should_log_calls;
  const bool answer = real(severity, tag);
  if (const int clobber = should_log_errno.load(); clobber != 0) errno = clobber;
  return answer;
}
}  // namespace android::base

namespace orvex {
namespace {

using ::android::base::LogSeverity;
using ::testing::ElementsAre;
using ::testing::MatchesRegex;

// Collects what reaches libbase's logger, the way Android code captures its
// log: "<severity letter> <file>] <message>" per line.
class ScopedLogCapture {
 public:
  ScopedLogCapture() {
    android::base::SetLogger([this](android::base::LogId, LogSeverity severity, const char*,
                                    const char* file, unsigned int, const char* message) {
      lines_.push_back(std::string(1, "VDIWEFF"[severity]) + " " + file + "] " + message);
    });
  }
  ~ScopedLogCapture() { android::base::SetLogger(android::base::StderrLogger); }
  const std::vector<std::string>& lines() const { return lines_; }

 private:
  std::vector<std::string> lines_;
};

TEST(LogTest, LinesReachLibbaseAboveItsThreshold) {
  ::testing::internal::CaptureStderr();
  ORVEX_LOG(WARNING) << "low on " << 3 << " things";
  // libbase's own host layout on stderr.
  EXPECT_THAT(::testing::internal::GetCapturedStderr(),
              MatchesRegex("log_test W [0-9-]+ [0-9:]+ +[0-9]+ +[0-9]+ log_test:[0-9]+\\] "
                           "low on 3 things\n"));

  int evaluated = 0;
  auto text = [&](const char* t) {
    ++evaluated;
    return t;
  };
  ScopedLogCapture capture;
  {
    android::base::ScopedLogSeverity threshold(android::base::WARNING);
    ORVEX_LOG(INFO) << text("below the threshold");
    ORVEX_LOG(WARNING) << text("warning");
    ORVEX_LOG(ERROR) << text("error");
  }
  ORVEX_LOG(INFO) << text("info");
  // StatusBuilder's lines come from its own unit, with the caller's location
  // in the text.
  Status s = InternalErrorBuilder(SourceLocation(12, "api/unit.cc")).Log(StatusBuilder::kError);
  EXPECT_EQ(evaluated, 3);
  EXPECT_THAT(capture.lines(),
              ElementsAre("W log_test] warning", "E log_test] error", "I log_test] info",
                          MatchesRegex("E status_builder] .*api/unit.cc:12.*")));
}

// Every way the library logs leaves errno as the caller had it, even when the
// severity test changes it, whether the line is written or not.
TEST(LogTest, ErrnoSurvivesEveryLogCall) {
  should_log_errno = EILSEQ;
  const SourceLocation loc(7, "errno_test.cc");
  const std::vector<std::pair<const char*, std::function<void()>>> calls = {
      {"INFO", [] { ORVEX_LOG(INFO) << "info"; }},
      {"WARNING", [] { ORVEX_LOG(WARNING) << "warning"; }},
      {"ERROR", [] { ORVEX_LOG(ERROR) << "error"; }},
      {"stream argument changing errno", [] { ORVEX_LOG(ERROR) << (errno = ENOSPC, "clobbered"); }},
      {"passing checks",
       [] {
         ORVEX_CHECK(errno == EDOM) << "seen by the condition";
         ORVEX_CHECK_EQ(errno, EDOM);
       }},
      {"StatusBuilder Log",
       [&] { Status s = InternalErrorBuilder(loc).Log(StatusBuilder::kError) << "logged"; }},
  };
  for (const bool quiet : {false, true}) {
    android::base::ScopedLogSeverity threshold(quiet ? android::base::FATAL : android::base::INFO);
    for (const auto& [name, call] : calls) {
      SCOPED_TRACE(::testing::Message() << name << (quiet ? ", not logged" : ", logged"));
      const int calls_before = should_log_calls;
      ::testing::internal::CaptureStderr();
      errno = EDOM;
      call();
      const int after = errno;
      const std::string out = ::testing::internal::GetCapturedStderr();
      EXPECT_EQ(after, EDOM) << strerror(after);
      if (std::string_view(name) == "passing checks") {
        EXPECT_EQ(should_log_calls, calls_before);
      } else {
        EXPECT_GT(should_log_calls, calls_before) << "the platform was not asked";
        EXPECT_EQ(out.empty(), quiet) << out;
      }
    }
  }

  // Text computed from errno inside the statement sees the caller's value.
  ScopedLogCapture capture;
  errno = EDOM;
  ORVEX_LOG(WARNING) << "errno text: " << strerror(errno);
  EXPECT_THAT(capture.lines(),
              ElementsAre(std::string("W log_test] errno text: ") + strerror(EDOM)));
  should_log_errno = 0;
}

TEST(LogTest, PassingChecksDoNotEvaluateDetail) {
  int evaluated = 0;
  auto detail = [&] {
    ++evaluated;
    return "x";
  };
  ORVEX_CHECK(1 + 1 == 2) << detail();
  ORVEX_CHECK_EQ(2, 2) << detail();
  ORVEX_CHECK_NE(1, 2) << detail();
  ORVEX_CHECK_LT(1, 2) << detail();
  ORVEX_CHECK_LE(2, 2) << detail();
  ORVEX_CHECK_GT(3, 2) << detail();
  ORVEX_CHECK_GE(3, 3) << detail();
  EXPECT_EQ(evaluated, 0);
}

// Points stderr at a pipe nobody reads: libbase's logger writing there would
// end the process with SIGPIPE.
void StderrToDeadPipe() {
  int fds[2];
  if (pipe(fds) != 0 || dup2(fds[1], STDERR_FILENO) < 0) _exit(2);
  close(fds[0]);
}

// A line that cannot be written is lost, and nothing else happens: no signal
// ends the process, errno and the signal mask are kept, and a SIGPIPE
// already pending stays so.
TEST(LogDeathTest, UnwritableStderrLosesTheLineOnly) {
  EXPECT_EXIT(
      {
        StderrToDeadPipe();
        errno = EDOM;
        ORVEX_LOG(ERROR) << "lost";
        sigset_t mask;
        pthread_sigmask(SIG_SETMASK, nullptr, &mask);
        const bool kept = errno == EDOM && sigismember(&mask, SIGPIPE) == 0;
        sigset_t blocked;
        sigemptyset(&blocked);
        sigaddset(&blocked, SIGPIPE);
        sigprocmask(SIG_BLOCK, &blocked, nullptr);
        raise(SIGPIPE);
        ORVEX_LOG(ERROR) << "lost";
        sigset_t pending;
        sigpending(&pending);
        _exit(kept && sigismember(&pending, SIGPIPE) == 1 ? 0 : 1);
      },
      ::testing::ExitedWithCode(0), "");
  EXPECT_EXIT(
      {
        close(STDERR_FILENO);
        ORVEX_LOG(WARNING) << "lost";
        _exit(0);
      },
      ::testing::ExitedWithCode(0), "");
  // A FATAL line still ends the process by abort.
  EXPECT_EXIT(
      {
        StderrToDeadPipe();
        ORVEX_LOG(FATAL) << "lost";
      },
      ::testing::KilledBySignal(SIGABRT), "");
}

enum class Level { kAlways = 0 };

TEST(LogDeathTest, CheckTexts) {
  const int alignment = 3;
  EXPECT_DEATH(ORVEX_CHECK(alignment % 2 == 0) << "alignment value: " << alignment,
               "Check failed: alignment % 2 == 0 alignment value: 3");
  const Status forfeit_status = OkStatus();
  EXPECT_DEATH(ORVEX_CHECK_NE(forfeit_status, OkStatus()) << "Cannot forfeit",
               "Check failed: forfeit_status != OkStatus\\(\\) \\(forfeit_status=OK, "
               "OkStatus\\(\\)=OK\\) Cannot forfeit");
  const Level level = static_cast<Level>(-1);
  EXPECT_DEATH(ORVEX_CHECK_GE(level, Level::kAlways) << "TraceLevel must be >= kAlways",
               "Check failed: level >= Level::kAlways \\(level=-1, Level::kAlways=0\\) "
               "TraceLevel must be >= kAlways");
  const int* gain_lut = nullptr;
  EXPECT_DEATH(ORVEX_CHECK_NE(gain_lut, nullptr),
               "Check failed: gain_lut != nullptr \\(gain_lut=\\(null\\), nullptr=\\(null\\)\\) ");
  EXPECT_DEATH(ORVEX_LOG(FATAL) << "plain fatal", "log_test:[0-9]+\\] plain fatal");
}

}  // namespace
}  // namespace orvex
