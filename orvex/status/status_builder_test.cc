#include "orvex/status/status_builder.h"

#include <errno.h>

#include <sstream>
#include <thread>
#include <vector>

#include "absl/strings/str_split.h"
#include "absl/time/clock.h"
#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/status/status_matchers.h"
#include "orvex/status/statusor.h"

namespace orvex {
namespace {

using ::orvex::testing::StatusIs;
using ::testing::HasSubstr;

// Counts the lines written to stderr while `fn` runs.
template <typename Fn>
std::vector<std::string> CapturedLines(Fn fn) {
  ::testing::internal::CaptureStderr();
  fn();
  const std::string out = ::testing::internal::GetCapturedStderr();
  std::vector<std::string> lines = absl::StrSplit(out, '\n', absl::SkipEmpty());
  return lines;
}

TEST(StatusBuilderTest, BuildersMakeTheirCodesAndStreamAnyType) {
  // In code order, from CANCELLED (1) on.
  StatusBuilder (*const builders[])(SourceLocation) = {
      CancelledErrorBuilder,        UnknownErrorBuilder,           InvalidArgumentErrorBuilder,
      DeadlineExceededErrorBuilder, NotFoundErrorBuilder,          AlreadyExistsErrorBuilder,
      PermissionDeniedErrorBuilder, ResourceExhaustedErrorBuilder, FailedPreconditionErrorBuilder,
      AbortedErrorBuilder,          OutOfRangeErrorBuilder,        UnimplementedErrorBuilder,
      InternalErrorBuilder,         UnavailableErrorBuilder,       DataLossErrorBuilder,
      UnauthenticatedErrorBuilder};
  for (int code = 1; code <= 16; ++code) {
    SCOPED_TRACE(code);
    // Without text: the inline error, shared by the conversion.
    EXPECT_EQ(Status(builders[code - 1](ORVEX_LOC)).raw_rep_for_testing(),
              static_cast<uintptr_t>(code) << 2);
    Status with_text = builders[code - 1](ORVEX_LOC) << "n=" << 3;
    EXPECT_THAT(with_text, StatusIs(static_cast<StatusCode>(code), "n=3"));
  }
  Status s = InvalidArgumentErrorBuilder(ORVEX_LOC)
             << "a" << std::string("b") << std::string_view("c") << 1 << -2L << 3UL << ' '
             << absl::Milliseconds(33) << ' ' << NotFoundError("x");
  EXPECT_EQ(s.message(), "abc1-23 33ms NOT_FOUND: x");
}

TEST(StatusBuilderTest, OkBuilderStaysOk) {
  StatusBuilder b(OkStatus(), ORVEX_LOC);
  b << "text" << 5;
  b.Log(StatusBuilder::kError).LogEveryN(StatusBuilder::kError, 2).SetPrepend();
  b.LogEvery(StatusBuilder::kError, absl::Seconds(1));
  EXPECT_TRUE(Status(b).ok());
  std::ostringstream os;
  os << b;
  EXPECT_EQ(os.str(), "OK");
}

TEST(StatusBuilderTest, JoinStyles) {
  const Status base = AbortedError("x");
  EXPECT_EQ(Status(StatusBuilder(base, ORVEX_LOC) << "y").message(), "x; y");
  EXPECT_EQ(Status(StatusBuilder(base, ORVEX_LOC).SetAppend() << "y").message(), "xy");
  EXPECT_EQ(Status(StatusBuilder(base, ORVEX_LOC).SetPrepend() << "y").message(), "yx");
  // Raw code 42 becomes UNKNOWN when text is joined in any style.
  const Status odd(static_cast<StatusCode>(42), "x");
  EXPECT_EQ(Status(StatusBuilder(odd, ORVEX_LOC).SetAppend() << "y").raw_code(), 2);
  // Empty text: the status unchanged, record shared.
  Status same = StatusBuilder(base, ORVEX_LOC).SetAppend() << "";
  EXPECT_EQ(same.raw_rep_for_testing(), base.raw_rep_for_testing());
}

TEST(StatusBuilderTest, CopiesAndConversions) {
  StatusBuilder b = NotFoundErrorBuilder(ORVEX_LOC);
  b << "frame " << 12;
  // Printing or converting a const builder does not consume it.
  std::ostringstream os;
  os << static_cast<const StatusBuilder&>(b);
  EXPECT_EQ(os.str(), "NOT_FOUND: frame 12");
  EXPECT_EQ(Status(b), Status(b));
  // Copies are independent.
  StatusBuilder copy = b;
  copy << " more";
  StatusBuilder assigned = InternalErrorBuilder(ORVEX_LOC);
  assigned = copy;
  assigned << "!";
  StatusBuilder& self = copy;
  copy = self;
  EXPECT_EQ(Status(b).message(), "frame 12");
  EXPECT_EQ(Status(copy).message(), "frame 12 more");
  EXPECT_EQ(Status(assigned).message(), "frame 12 more!");

  // Converting an rvalue consumes it: the builder then reads UNKNOWN.
  EXPECT_EQ(std::move(b).CreateStatusAndConditionallyLog().message(), "frame 12");
  EXPECT_THAT(Status(b), StatusIs(StatusCode::kUnknown, ""));  // NOLINT(bugprone-use-after-move)
  std::ostringstream consumed;
  consumed << std::move(copy);
  EXPECT_EQ(consumed.str(), "NOT_FOUND: frame 12 more");
}

TEST(StatusBuilderTest, FromErrnoAndWith) {
  Status s = StatusBuilderFromErrno(EACCES, "open", ORVEX_LOC) << "as camera";
  EXPECT_THAT(s, StatusIs(StatusCode::kPermissionDenied, "open: Permission denied; as camera"));
  auto policy = [](StatusBuilder&& b) { return StatusOr<int>(std::move(b) << " policy"); };
  StatusOr<int> r = InternalErrorBuilder(ORVEX_LOC).With(policy);
  EXPECT_THAT(r, StatusIs(StatusCode::kInternal, " policy"));
}

TEST(StatusBuilderTest, LogAlwaysWritesLocationAndStatus) {
  errno = ENOTDIR;
  const SourceLocation loc(77, "fake/file.cc");
  auto lines = CapturedLines([&] {
    Status s = StatusBuilder(DataLossError("bits"), loc).Log(StatusBuilder::kWarning) << "tail";
    (void)s;
  });
  EXPECT_EQ(errno, ENOTDIR);
  ASSERT_EQ(lines.size(), 1u);
  EXPECT_THAT(lines[0], HasSubstr("fake/file.cc:77: DATA_LOSS: bits; tail"));
  EXPECT_THAT(lines[0], ::testing::ContainsRegex("^[^ ]+ W "));  // tag, then severity
}

TEST(StatusBuilderTest, EveryNCountsPerLocation) {
  static const char kFile[] = "every_n.cc";
  auto occur = [](uint32_t line, uint32_t n) {
    Status s = StatusBuilder(AbortedError("e"), SourceLocation(line, kFile))
                   .LogEveryN(StatusBuilder::kError, n)
               << "x";
    (void)s;
  };
  std::vector<int> logged;
  for (int i = 1; i <= 8; ++i) {
    if (!CapturedLines([&] { occur(10, 3); }).empty()) logged.push_back(i);
  }
  EXPECT_EQ(logged, (std::vector<int>{1, 4, 7}));
  // Another line of the same file has its own counter.
  EXPECT_EQ(CapturedLines([&] { occur(11, 3); }).size(), 1u);
  // N = 0: only the first occurrence logs.
  EXPECT_EQ(CapturedLines([&] { occur(12, 0); }).size(), 1u);
  EXPECT_EQ(CapturedLines([&] { occur(12, 0); }).size(), 0u);
}

TEST(StatusBuilderTest, EveryPeriod) {
  static const char kFile[] = "every_period.cc";
  auto occur = [](uint32_t line, absl::Duration period) {
    Status s = StatusBuilder(AbortedError("e"), SourceLocation(line, kFile))
                   .LogEvery(StatusBuilder::kError, period)
               << "x";
    (void)s;
  };
  EXPECT_EQ(CapturedLines([&] { occur(20, absl::Hours(1)); }).size(), 1u);
  EXPECT_EQ(CapturedLines([&] { occur(20, absl::Hours(1)); }).size(), 0u);
  EXPECT_EQ(CapturedLines([&] { occur(21, absl::Hours(1)); }).size(), 1u);
  // Once the period has passed it logs again.
  EXPECT_EQ(CapturedLines([&] { occur(22, absl::Milliseconds(1)); }).size(), 1u);
  absl::SleepFor(absl::Milliseconds(5));
  EXPECT_EQ(CapturedLines([&] { occur(22, absl::Milliseconds(1)); }).size(), 1u);
}

// The rate-limit tables are shared by all threads: the total count of
// every-N lines must be exact under contention.
TEST(StatusBuilderTest, EveryNIsExactAcrossThreads) {
  static const char kFile[] = "every_n_threads.cc";
  constexpr int kThreads = 4;
  constexpr int kPerThread = 250;
  auto lines = CapturedLines([&] {
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) {
      threads.emplace_back([] {
        for (int i = 0; i < kPerThread; ++i) {
          Status s = StatusBuilder(AbortedError("e"), SourceLocation(5, kFile))
                         .LogEveryN(StatusBuilder::kError, 10)
                     << "x";
          (void)s;
        }
      });
    }
    for (auto& t : threads) t.join();
  });
  EXPECT_EQ(lines.size(), static_cast<size_t>(kThreads * kPerThread / 10));
}

TEST(StatusBuilderDeathTest, FatalSeverityEndsProcess) {
  EXPECT_DEATH(
      {
        Status s = StatusBuilder(InternalError("boom"), SourceLocation(9, "f.cc")).Log(6) << "!";
        (void)s;
      },
      "f.cc:9: INTERNAL: boom; !");
}

}  // namespace
}  // namespace orvex
