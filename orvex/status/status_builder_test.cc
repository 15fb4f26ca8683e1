#include "orvex/status/status_builder.h"

#include <errno.h>

#include <algorithm>
#include <sstream>
#include <thread>
#include <vector>

#include "absl/time/clock.h"
#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/status/status_matchers.h"
#include "orvex/status/statusor.h"

namespace orvex {
namespace {

using ::orvex::testing::StatusIs;

// Lines logged by `threads` threads making `times` errors each at `line`,
// every n-th time or, given a period, at most once per period.
size_t Logged(uint32_t line, uint32_t n, absl::Duration period = absl::ZeroDuration(),
              int threads = 1, int times = 1) {
  ::testing::internal::CaptureStderr();
  std::vector<std::thread> workers;
  for (int t = 0; t < threads; ++t) {
    workers.emplace_back([=] {
      for (int i = 0; i < times; ++i) {
        StatusBuilder b(AbortedError("e"), SourceLocation(line, "rate_limit.cc"));
        b.LogEveryN(StatusBuilder::kError, n);
        if (period != absl::ZeroDuration()) b.LogEvery(StatusBuilder::kError, period);
        Status s = std::move(b) << "x";
      }
    });
  }
  for (auto& w : workers) w.join();
  const std::string out = ::testing::internal::GetCapturedStderr();
  return std::count(out.begin(), out.end(), '\n');
}

TEST(StatusBuilderTest, BuildersStreamingAndWith) {
  StatusBuilder (*const builders[])(SourceLocation) = {
      CancelledErrorBuilder,        UnknownErrorBuilder,           InvalidArgumentErrorBuilder,
      DeadlineExceededErrorBuilder, NotFoundErrorBuilder,          AlreadyExistsErrorBuilder,
      PermissionDeniedErrorBuilder, ResourceExhaustedErrorBuilder, FailedPreconditionErrorBuilder,
      AbortedErrorBuilder,          OutOfRangeErrorBuilder,        UnimplementedErrorBuilder,
      InternalErrorBuilder,         UnavailableErrorBuilder,       DataLossErrorBuilder,
      UnauthenticatedErrorBuilder};
  // Without text: the inline error of the code.
  for (uintptr_t code = 1; code <= 16; ++code) {
    EXPECT_EQ(Status(builders[code - 1](ORVEX_LOC)).raw_rep_for_testing(), code << 2) << code;
  }
  Status s = InvalidArgumentErrorBuilder(ORVEX_LOC)
             << "a" << std::string_view("b") << -2L << ' ' << absl::Milliseconds(33) << ' '
             << NotFoundError("x");
  EXPECT_THAT(s, StatusIs(StatusCode::kInvalidArgument, "ab-2 33ms NOT_FOUND: x"));
  s = StatusBuilderFromErrno(EACCES, "open", ORVEX_LOC) << "as camera";
  EXPECT_THAT(s, StatusIs(StatusCode::kPermissionDenied, "open: Permission denied; as camera"));
  auto policy = [](StatusBuilder&& b) { return StatusOr<int>(std::move(b) << " policy"); };
  StatusOr<int> r = InternalErrorBuilder(ORVEX_LOC).With(policy);
  EXPECT_THAT(r, StatusIs(StatusCode::kInternal, " policy"));
}

TEST(StatusBuilderTest, JoinStyles) {
  const Status base = AbortedError("x");
  EXPECT_EQ(Status(StatusBuilder(base, ORVEX_LOC) << "y").message(), "x; y");
  EXPECT_EQ(Status(StatusBuilder(base, ORVEX_LOC).SetAppend() << "y").message(), "xy");
  EXPECT_EQ(Status(StatusBuilder(base, ORVEX_LOC).SetPrepend() << "y").message(), "yx");
  const Status odd(static_cast<StatusCode>(42), "x");  // joined, it reads UNKNOWN
  EXPECT_EQ(Status(StatusBuilder(odd, ORVEX_LOC).SetAppend() << "y").raw_code(), 2);
  Status same = StatusBuilder(base, ORVEX_LOC).SetAppend() << "";  // unchanged, shared
  EXPECT_EQ(same.raw_rep_for_testing(), base.raw_rep_for_testing());
  StatusBuilder ok(OkStatus(), ORVEX_LOC);  // ignores text and settings
  ok.Log(StatusBuilder::kError).LogEveryN(StatusBuilder::kError, 2).SetPrepend() << "text";
  ok.LogEvery(StatusBuilder::kError, absl::Seconds(1));
  EXPECT_TRUE(Status(ok).ok());
}

// Copies are independent; printing a const builder leaves it, converting an
// rvalue consumes it (it then reads UNKNOWN).
TEST(StatusBuilderTest, CopiesAndConversions) {
  StatusBuilder b = NotFoundErrorBuilder(ORVEX_LOC) << "frame " << 12;
  StatusBuilder copy = StatusBuilder(b) << " more";
  StatusBuilder assigned = InternalErrorBuilder(ORVEX_LOC);
  assigned = copy;
  assigned << "!";
  StatusBuilder& self = assigned;
  assigned = self;
  std::ostringstream os;
  os << static_cast<const StatusBuilder&>(b) << "|" << std::move(copy);
  EXPECT_EQ(os.str(), "NOT_FOUND: frame 12|NOT_FOUND: frame 12 more");
  EXPECT_EQ(Status(assigned).message(), "frame 12 more!");
  EXPECT_EQ(std::move(b).CreateStatusAndConditionallyLog().message(), "frame 12");
  EXPECT_THAT(Status(b), StatusIs(StatusCode::kUnknown, ""));  // NOLINT(bugprone-use-after-move)
}

// A logged line names the location and the status at the chosen severity; the
// rate limits count per location.
TEST(StatusBuilderTest, Logging) {
  ::testing::internal::CaptureStderr();
  std::string lines;
  for (const auto& [severity, letter] : {std::pair{StatusBuilder::kInfo, " I "},
                                         {StatusBuilder::kWarning, " W "},
                                         {StatusBuilder::kError, " E "}}) {
    Status s = StatusBuilder(DataLossError("e"), SourceLocation(77, "f.cc")).Log(severity) << "t";
    lines += std::string("[^ ]+") + letter + "[^]]*] f.cc:77: DATA_LOSS: e; t\n";
  }
  EXPECT_THAT(::testing::internal::GetCapturedStderr(), ::testing::MatchesRegex(lines));
  std::string logged;  // one digit per occurrence
  for (int i = 0; i < 8; ++i) logged += std::to_string(Logged(10, 3));
  logged += std::to_string(Logged(11, 3));  // another line: its own counter
  for (int i = 0; i < 2; ++i) logged += std::to_string(Logged(12, 0));  // N = 0: the first only
  for (uint32_t line : {20u, 20u, 21u}) logged += std::to_string(Logged(line, 0, absl::Hours(1)));
  logged += std::to_string(Logged(22, 0, absl::Milliseconds(1)));
  absl::SleepFor(absl::Milliseconds(5));  // the period passes
  logged += std::to_string(Logged(22, 0, absl::Milliseconds(1)));
  EXPECT_EQ(logged, "1001001011010111");
  // The tables are shared by all threads: the count stays exact.
  EXPECT_EQ(Logged(30, 10, absl::ZeroDuration(), 4, 250), 100u);
}

TEST(StatusBuilderDeathTest, FatalSeverityEndsProcess) {
  EXPECT_DEATH(
      { Status s = StatusBuilder(InternalError("boom"), SourceLocation(9, "f.cc")).Log(6) << "!"; },
      "f.cc:9: INTERNAL: boom; !");
}

}  // namespace
}  // namespace orvex
