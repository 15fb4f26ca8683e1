#include "orvex/status/log.h"

#include <dlfcn.h>
#include <errno.h>
#include <string.h>

#include <atomic>
#include <functional>
#include <string>
#include <vector>

#include "absl/time/time.h"
#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/status/status.h"
#include "orvex/status/status_builder.h"

#if ORVEX_TEST_INTERPOSE_PLATFORM
// A platform whose severity test disturbs errno, as a real one may (it can
// read configuration on the way). With a shared platform library this
// definition takes the place of the platform's for the whole process, the
// library's own log calls included; it counts its calls and forwards.
namespace {
std::atomic<int> should_log_calls{0};
std::atomic<int> should_log_errno{0};  // 0: leave errno alone
std::atomic<bool> should_log_refuses{false};
}  // namespace

namespace android::base {
bool ShouldLog(LogSeverity severity, const char* tag) {
  using ShouldLogFn = bool (*)(LogSeverity, const char*);
  static const auto real = reinterpret_cast<ShouldLogFn>(
      dlsym(RTLD_NEXT, "_ZN7android4base9ShouldLogENS0_11LogSeverityEPKc"));
  ++should_log_calls;
  const bool answer = !should_log_refuses && real(severity, tag);
  if (const int clobber = should_log_errno.load(); clobber != 0) errno = clobber;
  return answer;
}
}  // namespace android::base
#endif

namespace orvex {
namespace {

using ::testing::HasSubstr;

enum class Level { kAlways = 0, kHigh = 3 };

TEST(LogTest, LinesCarryUnitAndPreserveErrno) {
  ::testing::internal::CaptureStderr();
  errno = EMFILE;
  ORVEX_LOG(WARNING) << "low on " << 3 << " things";
  const int after = errno;
  const std::string out = ::testing::internal::GetCapturedStderr();
  EXPECT_EQ(after, EMFILE);
  EXPECT_THAT(out, HasSubstr("log_test.cc:"));
  EXPECT_THAT(out, HasSubstr("] low on 3 things\n"));
  EXPECT_EQ(out[0], 'W');
}

#if ORVEX_TEST_INTERPOSE_PLATFORM
// Every way the library logs leaves errno as the caller had it, even when the
// platform's severity test changes it, whether the line is written or not.
TEST(LogTest, ErrnoSurvivesEveryLogCall) {
  should_log_errno = EILSEQ;
  // Each round logs from its own location: rate limits count per location.
  SourceLocation loc(7, "errno_test.cc");
  const std::vector<std::pair<const char*, std::function<void()>>> calls = {
      {"INFO", [] { ORVEX_LOG(INFO) << "info"; }},
      {"WARNING", [] { ORVEX_LOG(WARNING) << "warning"; }},
      {"ERROR", [] { ORVEX_LOG(ERROR) << "error"; }},
      {"stream argument changing errno", [] { ORVEX_LOG(ERROR) << (errno = ENOSPC, "clobbered"); }},
      {"passing checks",
       [] {
         ORVEX_CHECK(errno == EDOM) << "seen by the condition";
         ORVEX_CHECK_EQ(errno, EDOM);
         ORVEX_CHECK_NE(1, 2);
         ORVEX_CHECK_LT(1, 2);
         ORVEX_CHECK_LE(2, 2);
         ORVEX_CHECK_GT(3, 2);
         ORVEX_CHECK_GE(3, 3);
       }},
      {"platform message with error text",
       [] {
         android::base::LogMessage("u", 1, android::base::ERROR, nullptr, ENOENT).stream() << "m";
       }},
      {"StatusBuilder Log",
       [&] { Status s = InternalErrorBuilder(loc).Log(StatusBuilder::kError) << "logged"; }},
      {"StatusBuilder LogEveryN",
       [&] {
         for (int i = 0; i < 3; ++i) {
           Status s = InternalErrorBuilder(loc).LogEveryN(StatusBuilder::kWarning, 2) << i;
         }
       }},
      {"StatusBuilder LogEvery",
       [&] {
         for (int i = 0; i < 2; ++i) {
           Status s = InternalErrorBuilder(loc).LogEvery(StatusBuilder::kInfo, absl::Hours(1));
         }
       }},
  };
  for (const bool refuse : {false, true}) {
    should_log_refuses = refuse;
    loc = SourceLocation(refuse ? 8 : 7, "errno_test.cc");
    for (const auto& [name, call] : calls) {
      SCOPED_TRACE(::testing::Message() << name << (refuse ? ", not logged" : ", logged"));
      const int calls_before = should_log_calls;
      ::testing::internal::CaptureStderr();
      errno = EDOM;
      call();
      const int after = errno;
      const std::string out = ::testing::internal::GetCapturedStderr();
      EXPECT_EQ(after, EDOM) << strerror(after);
      if (std::string_view(name) == "passing checks") {
        EXPECT_EQ(should_log_calls, calls_before);
      } else if (std::string_view(name).substr(0, 8) != "platform") {
        EXPECT_GT(should_log_calls, calls_before) << "the platform was not asked";
        EXPECT_EQ(out.empty(), refuse) << out;
      }
    }
  }
  should_log_refuses = false;

  // Text computed from errno inside the statement sees the caller's value.
  ::testing::internal::CaptureStderr();
  errno = EDOM;
  ORVEX_LOG(WARNING) << "errno text: " << strerror(errno);
  EXPECT_THAT(::testing::internal::GetCapturedStderr(),
              HasSubstr(std::string("] errno text: ") + strerror(EDOM) + "\n"));
  should_log_errno = 0;
}
#endif

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
  EXPECT_DEATH(ORVEX_LOG(FATAL) << "plain fatal", "plain fatal");
}

}  // namespace
}  // namespace orvex
