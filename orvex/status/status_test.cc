#include "orvex/status/status.h"

#include <errno.h>

#include <cstdlib>
#include <sstream>
#include <thread>
#include <vector>

#include "gmock/gmock.h"
#include "gtest/gtest.h"

namespace orvex {
namespace {

TEST(StatusCodeTest, Texts) {
  std::string texts;
  std::ostringstream streamed;
  for (int value = -1; value <= 17; ++value) {
    texts += StatusCodeToString(static_cast<StatusCode>(value)) + "|";
    streamed << static_cast<StatusCode>(value) << "|";
  }
  const std::string want =
      "|OK|CANCELLED|UNKNOWN|INVALID_ARGUMENT|DEADLINE_EXCEEDED|NOT_FOUND|ALREADY_EXISTS|"
      "PERMISSION_DENIED|RESOURCE_EXHAUSTED|FAILED_PRECONDITION|ABORTED|OUT_OF_RANGE|"
      "UNIMPLEMENTED|INTERNAL|UNAVAILABLE|DATA_LOSS|UNAUTHENTICATED||";
  EXPECT_EQ(texts, want);
  EXPECT_EQ(streamed.str(), want);
}

// OK and message-less errors are a single word without a record; copies
// share the record.
TEST(StatusTest, Representation) {
  Status ok(StatusCode::kOk, "dropped");
  EXPECT_EQ(ok.raw_rep_for_testing(), 0u);
  EXPECT_EQ(ok.message(), "");
  EXPECT_EQ(ok.ToString(), "OK");
  EXPECT_EQ(NotFoundError("").raw_rep_for_testing(), 20u);
  EXPECT_EQ(NotFoundError("").ToString(), "NOT_FOUND: ");
  const Status with_text = InvalidArgumentError("bad size");
  EXPECT_EQ(with_text.raw_rep_for_testing() & 1u, 1u);
  EXPECT_EQ(with_text.ToString(), "INVALID_ARGUMENT: bad size");
  Status copy = with_text;  // NOLINT(performance-unnecessary-copy-initialization)
  EXPECT_EQ(Status(std::move(copy)).raw_rep_for_testing(), with_text.raw_rep_for_testing());
}

TEST(StatusTest, NonCanonicalRawCode) {
  for (int raw : {42, 17, -1}) {
    for (std::string_view msg : {"", "m"}) {
      SCOPED_TRACE(::testing::Message() << raw << " " << msg);
      Status s(static_cast<StatusCode>(raw), msg);
      EXPECT_EQ(s.raw_code(), raw);
      EXPECT_EQ(s.code(), StatusCode::kUnknown);
      EXPECT_TRUE(IsUnknown(s));
      EXPECT_EQ(s.ToString(), "UNKNOWN: " + std::string(msg));
    }
  }
  EXPECT_EQ(status_internal::MapToLocalCode(16), StatusCode::kUnauthenticated);
  EXPECT_EQ(status_internal::MapToLocalCode(17), StatusCode::kUnknown);
}

TEST(StatusTest, MovedFromAndPrepareToModify) {
  Status a = DataLossError("gone");
  Status b = std::move(a);
  EXPECT_EQ(a.raw_rep_for_testing(), 54u);  // NOLINT(bugprone-use-after-move)
  EXPECT_EQ(a.ToString(), "INTERNAL: Status accessed after move.");
  Status& self = b;
  b = std::move(self);
  EXPECT_EQ(b.message(), "gone");
  a.PrepareToModify();  // A record with the raw code and no message.
  EXPECT_EQ(a.raw_rep_for_testing() & 1u, 1u);
  EXPECT_EQ(a.ToString(), "INTERNAL: ");

  Status ok;
  ok.PrepareToModify();
  EXPECT_TRUE(ok.ok());
  // A shared record is copied; one held alone stays in place.
  const Status other = b;
  b.PrepareToModify();
  EXPECT_NE(b.raw_rep_for_testing(), other.raw_rep_for_testing());
  EXPECT_EQ(b, other);
  const uintptr_t alone = b.raw_rep_for_testing();
  b.PrepareToModify();
  EXPECT_EQ(b.raw_rep_for_testing(), alone);
}

TEST(StatusTest, Equality) {
  Status record = NotFoundError("");
  record.PrepareToModify();
  Status moved = InternalError("q");
  Status sink = std::move(moved);
  const struct {
    Status a, b;
    bool equal;
  } cases[] = {{OkStatus(), Status(), true},
               {NotFoundError("x"), NotFoundError("x"), true},
               {NotFoundError("x"), NotFoundError("y"), false},
               {NotFoundError("x"), NotFoundError("xx"), false},
               {NotFoundError("x"), AbortedError("x"), false},
               // Same code and message, but inline against a record.
               {NotFoundError(""), record, false},
               {moved, InternalError(""), false},  // NOLINT(bugprone-use-after-move)
               {moved, InternalError("Status accessed after move."), false}};
  for (const auto& c : cases) {
    SCOPED_TRACE(::testing::Message() << c.a << " vs " << c.b);
    EXPECT_EQ(c.a == c.b, c.equal);
    EXPECT_EQ(c.b == c.a, c.equal);
  }
}

TEST(StatusTest, ConstructorsAndPredicates) {
  // In code order, from CANCELLED (1) on.
  Status (*const makers[])(std::string_view) = {
      CancelledError,          UnknownError,       InvalidArgumentError,  DeadlineExceededError,
      NotFoundError,           AlreadyExistsError, PermissionDeniedError, ResourceExhaustedError,
      FailedPreconditionError, AbortedError,       OutOfRangeError,       UnimplementedError,
      InternalError,           UnavailableError,   DataLossError,         UnauthenticatedError};
  bool (*const predicates[])(const Status&) = {
      IsCancelled,          IsUnknown,       IsInvalidArgument,  IsDeadlineExceeded,
      IsNotFound,           IsAlreadyExists, IsPermissionDenied, IsResourceExhausted,
      IsFailedPrecondition, IsAborted,       IsOutOfRange,       IsUnimplemented,
      IsInternal,           IsUnavailable,   IsDataLoss,         IsUnauthenticated};
  for (int code = 1; code <= 16; ++code) {
    SCOPED_TRACE(code);
    const Status s = makers[code - 1]("msg");
    EXPECT_EQ(s.raw_code(), code);
    EXPECT_EQ(s.message(), "msg");
    for (int other = 1; other <= 16; ++other) EXPECT_EQ(predicates[other - 1](s), other == code);
  }
}

TEST(StatusTest, Annotate) {
  EXPECT_TRUE(Annotate(OkStatus(), "x").ok());
  EXPECT_EQ(Annotate(InvalidArgumentError("a"), "b"), InvalidArgumentError("a; b"));
  EXPECT_EQ(Annotate(InvalidArgumentError(""), "b"), InvalidArgumentError("b"));
  const Status base = InvalidArgumentError("a");
  EXPECT_EQ(Annotate(base, "").raw_rep_for_testing(), base.raw_rep_for_testing());
  // The canonical code is kept: raw 42 becomes UNKNOWN.
  EXPECT_EQ(Annotate(Status(static_cast<StatusCode>(42), "a"), "b"), UnknownError("a; b"));
}

TEST(StatusTest, Errno) {
  // One or two errno values of each code, unassigned ones and the ends.
  const int errnos[] = {
      0,      ECANCELED, EINVAL, ENOPROTOOPT, ETIMEDOUT, ENOENT, ENOMEDIUM,    EALREADY,
      EACCES, ENOSPC,    EISNAM, EDEADLK,     EOVERFLOW, EXDEV,  EHOSTUNREACH, EIO,
      41,     58,        126,    127,         -1};
  std::string codes;
  for (int errnum : errnos) codes += StatusCodeToString(StatusCodeFromErrno(errnum)) + " ";
  EXPECT_EQ(codes,
            "OK CANCELLED INVALID_ARGUMENT INVALID_ARGUMENT DEADLINE_EXCEEDED NOT_FOUND NOT_FOUND "
            "ALREADY_EXISTS PERMISSION_DENIED RESOURCE_EXHAUSTED FAILED_PRECONDITION ABORTED "
            "OUT_OF_RANGE UNIMPLEMENTED UNAVAILABLE UNKNOWN UNKNOWN UNKNOWN PERMISSION_DENIED "
            "UNKNOWN UNKNOWN ");
  errno = EPIPE;
  EXPECT_EQ(StatusFromErrno(ENOENT, "open /x"),
            NotFoundError("open /x: No such file or directory"));
  EXPECT_EQ(errno, EPIPE);
  EXPECT_EQ(StatusFromErrno(ENOENT, "").message(), ": No such file or directory");
  EXPECT_TRUE(StatusFromErrno(0, "ignored").ok());
  EXPECT_EQ(StatusFromErrno(4000, "m"), UnknownError("m: Unknown error 4000"));
}

TEST(StatusTest, StreamAndStrings) {
  std::ostringstream os;
  os << UnavailableError("later") << "|" << OkStatus();
  EXPECT_EQ(os.str(), "UNAVAILABLE: later|OK");
  EXPECT_EQ(*std::unique_ptr<std::string>(Status::EmptyString()), "");
  EXPECT_EQ(*std::unique_ptr<std::string>(Status::MovedFromString()),
            "Status accessed after move.");
}

// Copies of one record made and dropped on many threads at once: the count
// must stay exact (run under ThreadSanitizer and AddressSanitizer).
TEST(StatusTest, RecordSharedAcrossThreads) {
  const Status original = ResourceExhaustedError("shared message of some length");
  std::vector<std::thread> threads;
  for (int t = 0; t < 8; ++t) {
    threads.emplace_back([&original] {
      for (int i = 0; i < 20000; ++i) {
        Status copy = original;
        Status second = copy;
        Status moved = std::move(copy);
        if (moved.message().size() != 29u || second != original) std::abort();
      }
    });
  }
  // The last holder may be any thread: hand copies away and drop the source.
  auto* handed = new Status(original);
  std::thread dropper([handed] { delete handed; });
  for (auto& t : threads) t.join();
  dropper.join();
  EXPECT_EQ(original.message(), "shared message of some length");
}

}  // namespace
}  // namespace orvex
