#include "orvex/status/status.h"

#include <errno.h>

#include <cstdlib>
#include <memory>
#include <sstream>
#include <thread>
#include <vector>

#include "gtest/gtest.h"

namespace orvex {
namespace {

// The word: 0 for OK, code << 2 without message, 54 after a move, else a record's
// address + 1 (1 below). Raw codes outside 0..16 are kept but read as UNKNOWN.
TEST(StatusTest, RepresentationAndAccessors) {
  Status moved = DataLossError("gone");
  const Status sink = std::move(moved);
  // clang-format off
  const struct { Status s; uintptr_t word; int raw; std::string text; } cases[] = {
      {Status(StatusCode::kOk, "dropped"), 0, 0, "OK"}, {NotFoundError(""), 20, 5, "NOT_FOUND: "},
      {InvalidArgumentError("bad size"), 1, 3, "INVALID_ARGUMENT: bad size"},
      {moved, 54, 13, "INTERNAL: Status accessed after move."},  // NOLINT(bugprone-use-after-move)
      {UnauthenticatedError(""), 16 << 2, 16, "UNAUTHENTICATED: "},
      {Status(static_cast<StatusCode>(17), ""), 17 << 2, 17, "UNKNOWN: "},
      {Status(static_cast<StatusCode>(-1), "m"), 1, -1, "UNKNOWN: m"}};
  // clang-format on
  for (const auto& c : cases) {
    SCOPED_TRACE(c.text);
    EXPECT_EQ(c.word == 1 ? c.s.raw_rep_for_testing() & 3u : c.s.raw_rep_for_testing(), c.word);
    EXPECT_EQ(c.s.raw_code(), c.raw);
    EXPECT_EQ(c.s.ToString(), c.text);
    EXPECT_EQ(c.text.rfind(StatusCodeToString(c.s.code()), 0), 0u);
    EXPECT_EQ(IsUnknown(c.s), c.text.starts_with("UNKNOWN"));
  }
}

// PrepareToModify gives a status a record of its own; equality tells it from an inline word.
TEST(StatusTest, PrepareToModifyMoveAndEquality) {
  Status ok, record = NotFoundError(""), b = DataLossError("gone");
  ok.PrepareToModify();
  record.PrepareToModify();
  EXPECT_TRUE(ok.ok());
  EXPECT_EQ(record.code(), StatusCode::kNotFound);
  EXPECT_EQ(record.message(), "");
  const Status shared = b;
  b.PrepareToModify();
  const uintptr_t alone = b.raw_rep_for_testing();
  b.PrepareToModify();
  EXPECT_NE(alone, shared.raw_rep_for_testing());
  EXPECT_EQ(b.raw_rep_for_testing(), alone);
  Status& self = b;
  b = std::move(self);
  Status moved = InternalError("q");
  const Status sink = std::move(moved);
  EXPECT_EQ(*std::unique_ptr<std::string>(Status::MovedFromString()), moved.message());  // NOLINT
  EXPECT_EQ(*std::unique_ptr<std::string>(Status::EmptyString()), "");
  // clang-format off
  const struct { Status a, b; bool equal; } cases[] = {
      {b, shared, true}, {NotFoundError("x"), NotFoundError("y"), false},
      {NotFoundError("x"), AbortedError("x"), false}, {NotFoundError(""), record, false},
      {moved, InternalError(""), false}, {moved, InternalError("Status accessed after move."), false}};
  // clang-format on
  for (const auto& c : cases) {
    SCOPED_TRACE(::testing::Message() << c.a << " vs " << c.b);
    EXPECT_EQ(c.a == c.b, c.equal);
    EXPECT_EQ(c.b != c.a, !c.equal);
  }
}

// Code texts, then each error constructor's code and the predicates.
TEST(StatusTest, CodesConstructorsAndPredicates) {
  Status (*const makers[])(std::string_view) = {
      CancelledError,          UnknownError,       InvalidArgumentError,  DeadlineExceededError,
      NotFoundError,           AlreadyExistsError, PermissionDeniedError, ResourceExhaustedError,
      FailedPreconditionError, AbortedError,       OutOfRangeError,       UnimplementedError,
      InternalError,           UnavailableError,   DataLossError,         UnauthenticatedError};
  bool (*const is[])(const Status&) = {
      IsCancelled,          IsUnknown,       IsInvalidArgument,  IsDeadlineExceeded,
      IsNotFound,           IsAlreadyExists, IsPermissionDenied, IsResourceExhausted,
      IsFailedPrecondition, IsAborted,       IsOutOfRange,       IsUnimplemented,
      IsInternal,           IsUnavailable,   IsDataLoss,         IsUnauthenticated};
  std::string texts;
  std::ostringstream streamed;
  for (int value = -1; value <= 17; ++value) {
    texts += StatusCodeToString(static_cast<StatusCode>(value)) + "|";
    streamed << static_cast<StatusCode>(value) << "|";
    if (value < 1 || value > 16) continue;
    const Status s = makers[value - 1]("msg");
    EXPECT_EQ(s, Status(static_cast<StatusCode>(value), "msg")) << value;
    for (int o = 1; o <= 16; ++o) EXPECT_EQ(is[o - 1](s), o == value) << value << " " << o;
  }
  const std::string want =
      "|OK|CANCELLED|UNKNOWN|INVALID_ARGUMENT|DEADLINE_EXCEEDED|NOT_FOUND|ALREADY_EXISTS|"
      "PERMISSION_DENIED|RESOURCE_EXHAUSTED|FAILED_PRECONDITION|ABORTED|OUT_OF_RANGE|"
      "UNIMPLEMENTED|INTERNAL|UNAVAILABLE|DATA_LOSS|UNAUTHENTICATED||";
  EXPECT_EQ(texts, want);
  EXPECT_EQ(streamed.str(), want);
}

TEST(StatusTest, Annotate) {
  EXPECT_TRUE(Annotate(OkStatus(), "x").ok());
  EXPECT_EQ(Annotate(InvalidArgumentError("a"), "b"), InvalidArgumentError("a; b"));
  EXPECT_EQ(Annotate(InvalidArgumentError(""), "b"), InvalidArgumentError("b"));
  const Status base = InvalidArgumentError("a");
  EXPECT_EQ(Annotate(base, "").raw_rep_for_testing(), base.raw_rep_for_testing());
  EXPECT_EQ(Annotate(Status(static_cast<StatusCode>(42), "a"), "b"), UnknownError("a; b"));
}

TEST(StatusTest, Errno) {
  const int errnos[] = {0,      ECANCELED, EINVAL,  ETIMEDOUT, ENOENT, EALREADY,     EACCES,
                        ENOSPC, EISNAM,    EDEADLK, EOVERFLOW, EXDEV,  EHOSTUNREACH, EIO,
                        41,     126,       127,     -1};
  std::string codes;
  for (int errnum : errnos) codes += StatusCodeToString(StatusCodeFromErrno(errnum)) + " ";
  EXPECT_EQ(codes,
            "OK CANCELLED INVALID_ARGUMENT DEADLINE_EXCEEDED NOT_FOUND ALREADY_EXISTS "
            "PERMISSION_DENIED RESOURCE_EXHAUSTED FAILED_PRECONDITION ABORTED OUT_OF_RANGE "
            "UNIMPLEMENTED UNAVAILABLE UNKNOWN UNKNOWN PERMISSION_DENIED UNKNOWN UNKNOWN ");
  errno = EPIPE;
  EXPECT_EQ(StatusFromErrno(ENOENT, ""), NotFoundError(": No such file or directory"));
  EXPECT_EQ(StatusFromErrno(4000, "m"), UnknownError("m: Unknown error 4000"));
  EXPECT_EQ(errno, EPIPE);
  EXPECT_TRUE(StatusFromErrno(0, "ignored").ok());
}

// Copies of one record made and dropped on many threads at once, the last
// holder being whichever thread ends last: the count must stay exact.
TEST(StatusTest, RecordSharedAcrossThreads) {
  std::vector<std::thread> threads;
  const auto* original = new Status(ResourceExhaustedError("shared"));
  for (int t = 0; t < 8; ++t) {
    threads.emplace_back([copy = *original] {
      for (int i = 0; i < 20000; ++i) {
        Status again = copy;
        if (Status(std::move(again)).message() != "shared") std::abort();
      }
    });
  }
  delete original;
  for (auto& t : threads) t.join();
}

}  // namespace
}  // namespace orvex
