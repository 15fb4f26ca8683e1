#include "android-base/logging.h"

#include <errno.h>
#include <signal.h>
#include <stdlib.h>
#include <unistd.h>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "platform/testing/reexec_death_test.h"

namespace {

using ::testing::ContainsRegex;

TEST(HostLoggingTest, OneLinePerMessageWithErrnoText) {
  ::testing::internal::CaptureStderr();
  errno = EBADF;
  {
    android::base::LogMessage m("api/thread/fence", 42, android::base::ERROR, "camtag", ENOENT);
    m.stream() << "first";
  }
  EXPECT_EQ(errno, EBADF);
  {
    android::base::LogMessage m("u", 1, android::base::INFO, nullptr, -1);
    m.stream() << "second";
  }
  const std::string out = ::testing::internal::GetCapturedStderr();
  EXPECT_THAT(out, ContainsRegex("^E camtag [0-9]+ [0-9]+ api/thread/fence:42\\] first: No such "
                                 "file or directory\n"));
  EXPECT_THAT(out, ContainsRegex("\nI [^ ]+ [0-9]+ [0-9]+ u:1\\] second\n$"));
}

TEST(HostLoggingTest, DefaultThresholdIsInfo) {
  // The test runs without ORVEX_LOG_SEVERITY set.
  if (getenv("ORVEX_LOG_SEVERITY") != nullptr) GTEST_SKIP() << "ORVEX_LOG_SEVERITY is set";
  EXPECT_FALSE(android::base::ShouldLog(android::base::DEBUG, nullptr));
  EXPECT_TRUE(android::base::ShouldLog(android::base::INFO, nullptr));
  EXPECT_TRUE(android::base::ShouldLog(android::base::FATAL, nullptr));
}

TEST(HostLoggingDeathTest, ThresholdFromEnvironmentAndFatalAborts) {
  // The threshold is read once per process: re-execute for a fresh one.
  orvex_testing::UseReexecDeathTests();
  EXPECT_EXIT(
      {
        setenv("ORVEX_LOG_SEVERITY", "error", 1);
        const bool warn = android::base::ShouldLog(android::base::WARNING, nullptr);
        const bool err = android::base::ShouldLog(android::base::ERROR, nullptr);
        _exit(!warn && err ? 0 : 1);
      },
      ::testing::ExitedWithCode(0), "");
  EXPECT_DEATH(android::base::LogMessage("f", 3, android::base::FATAL, nullptr, -1).stream()
                   << "the end",
               "F .* f:3\\] the end");
}

// A line that cannot be written is lost, and nothing else happens: no
// signal ends the process, errno is kept, and a signal of the same kind that
// was already pending stays pending.
TEST(HostLoggingDeathTest, UnwritableStderrLosesTheLineOnly) {
  EXPECT_EXIT(
      {
        int fds[2];
        if (pipe(fds) != 0 || dup2(fds[1], STDERR_FILENO) < 0) _exit(2);
        close(fds[0]);  // nobody reads: writing raises SIGPIPE by default
        errno = EDOM;
        android::base::LogMessage("u", 1, android::base::ERROR, nullptr, -1).stream() << "lost";
        const bool kept = errno == EDOM;
        sigset_t blocked;
        sigemptyset(&blocked);
        sigaddset(&blocked, SIGPIPE);
        sigprocmask(SIG_BLOCK, &blocked, nullptr);
        raise(SIGPIPE);
        android::base::LogMessage("u", 2, android::base::ERROR, nullptr, -1).stream() << "lost";
        sigset_t pending;
        sigpending(&pending);
        _exit(kept && sigismember(&pending, SIGPIPE) == 1 ? 0 : 1);
      },
      ::testing::ExitedWithCode(0), "");
  // Closed outright.
  EXPECT_EXIT(
      {
        close(STDERR_FILENO);
        errno = EDOM;
        android::base::LogMessage("u", 3, android::base::WARNING, nullptr, -1).stream() << "lost";
        _exit(errno == EDOM ? 0 : 1);
      },
      ::testing::ExitedWithCode(0), "");
}

}  // namespace
