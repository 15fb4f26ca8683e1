#include "orvex/status/log.h"

#include <errno.h>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/status/status.h"

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
