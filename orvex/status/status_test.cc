#include "orvex/status/status.h"

#include <errno.h>

#include <atomic>
#include <cstdlib>
#include <new>
#include <sstream>
#include <thread>
#include <vector>

#include "gmock/gmock.h"
#include "gtest/gtest.h"

// The replaced global operators below pair malloc with free; GCC cannot see
// that the replacement makes them match.
#pragma GCC diagnostic ignored "-Wmismatched-new-delete"

// Counts heap allocations made by this thread while counting is on.
namespace {
thread_local bool g_counting = false;
thread_local int g_allocations = 0;
}  // namespace

void* operator new(std::size_t size) {
  if (g_counting) ++g_allocations;
  if (void* p = std::malloc(size == 0 ? 1 : size)) return p;
  throw std::bad_alloc();
}
void operator delete(void* p) noexcept { std::free(p); }
void operator delete(void* p, std::size_t) noexcept { std::free(p); }

namespace orvex {
namespace {

template <typename Fn>
int AllocationsIn(Fn fn) {
  g_allocations = 0;
  g_counting = true;
  fn();
  g_counting = false;
  return g_allocations;
}

using ::testing::StartsWith;

TEST(StatusCodeTest, TextsOfEveryValueAndOutOfRange) {
  const std::vector<std::pair<int, std::string>> cases = {
      {0, "OK"},
      {1, "CANCELLED"},
      {2, "UNKNOWN"},
      {3, "INVALID_ARGUMENT"},
      {4, "DEADLINE_EXCEEDED"},
      {5, "NOT_FOUND"},
      {6, "ALREADY_EXISTS"},
      {7, "PERMISSION_DENIED"},
      {8, "RESOURCE_EXHAUSTED"},
      {9, "FAILED_PRECONDITION"},
      {10, "ABORTED"},
      {11, "OUT_OF_RANGE"},
      {12, "UNIMPLEMENTED"},
      {13, "INTERNAL"},
      {14, "UNAVAILABLE"},
      {15, "DATA_LOSS"},
      {16, "UNAUTHENTICATED"},
      {17, ""},
      {42, ""},
      {-1, ""},
  };
  for (const auto& [value, text] : cases) {
    SCOPED_TRACE(value);
    EXPECT_EQ(StatusCodeToString(static_cast<StatusCode>(value)), text);
    std::ostringstream os;
    os << static_cast<StatusCode>(value);
    EXPECT_EQ(os.str(), text);
  }
}

TEST(StatusTest, Representation) {
  EXPECT_EQ(Status().raw_rep_for_testing(), 0u);
  // A message given with code 0 is dropped.
  Status ok(StatusCode::kOk, "ignored");
  EXPECT_TRUE(ok.ok());
  EXPECT_EQ(ok.message(), "");
  EXPECT_EQ(ok.ToString(), "OK");

  // A message-less error is the inline word code << 2.
  Status not_found = NotFoundError("");
  EXPECT_EQ(not_found.raw_rep_for_testing(), 20u);
  EXPECT_EQ(not_found.ToString(), "NOT_FOUND: ");

  Status with_text = InvalidArgumentError("bad size");
  EXPECT_EQ(with_text.raw_rep_for_testing() & 1u, 1u);
  EXPECT_EQ(with_text.code(), StatusCode::kInvalidArgument);
  EXPECT_EQ(with_text.message(), "bad size");
  EXPECT_EQ(with_text.ToString(), "INVALID_ARGUMENT: bad size");

  // Copies share the record.
  Status copy = with_text;  // NOLINT(performance-unnecessary-copy-initialization)
  EXPECT_EQ(copy.raw_rep_for_testing(), with_text.raw_rep_for_testing());
}

TEST(StatusTest, AllocationCounts) {
  EXPECT_EQ(AllocationsIn([] {
              Status s;
              (void)s;
            }),
            0);
  EXPECT_EQ(AllocationsIn([] {
              Status s = NotFoundError("");
              (void)s;
            }),
            0);
  // The record and its text together: one allocation even past the
  // small-string size.
  EXPECT_EQ(AllocationsIn([] { Status s = NotFoundError("a message of 30 characters...."); }), 1);
  const Status shared = NotFoundError("copied message, not reallocated");
  EXPECT_EQ(AllocationsIn([&] {
              Status a = shared;  // NOLINT(performance-unnecessary-copy-initialization)
              Status b = a;
              Status c = std::move(b);
              EXPECT_FALSE(c.ok());
            }),
            0);
  EXPECT_EQ(AllocationsIn([] { (void)OkStatus().ToString(); }), 0);
}

TEST(StatusTest, NonCanonicalRawCode) {
  for (int raw : {42, 17, -1}) {
    SCOPED_TRACE(raw);
    for (std::string_view msg : {"", "m"}) {
      Status s(static_cast<StatusCode>(raw), msg);
      EXPECT_EQ(s.raw_code(), raw);
      EXPECT_EQ(s.code(), StatusCode::kUnknown);
      EXPECT_TRUE(IsUnknown(s));
      EXPECT_THAT(s.ToString(), StartsWith("UNKNOWN: "));
      EXPECT_FALSE(s.ok());
    }
  }
  EXPECT_EQ(status_internal::MapToLocalCode(16), StatusCode::kUnauthenticated);
  EXPECT_EQ(status_internal::MapToLocalCode(17), StatusCode::kUnknown);
  EXPECT_EQ(status_internal::MapToLocalCode(-5), StatusCode::kUnknown);
}

TEST(StatusTest, MovedFrom) {
  Status a = DataLossError("gone");
  Status b = std::move(a);
  EXPECT_EQ(a.raw_rep_for_testing(), 54u);  // NOLINT(bugprone-use-after-move)
  EXPECT_EQ(a.code(), StatusCode::kInternal);
  EXPECT_EQ(a.message(), "Status accessed after move.");
  EXPECT_EQ(a.ToString(), "INTERNAL: Status accessed after move.");
  EXPECT_EQ(b.message(), "gone");

  Status c;
  c = std::move(b);
  EXPECT_EQ(b.raw_rep_for_testing(), 54u);  // NOLINT(bugprone-use-after-move)
  EXPECT_EQ(c.message(), "gone");
  // Self-move keeps the value.
  Status& c_ref = c;
  c = std::move(c_ref);
  EXPECT_EQ(c.message(), "gone");
}

TEST(StatusTest, Equality) {
  EXPECT_EQ(Status(), OkStatus());
  EXPECT_EQ(NotFoundError("x"), NotFoundError("x"));
  EXPECT_NE(NotFoundError("x"), NotFoundError("y"));
  EXPECT_NE(NotFoundError("x"), AbortedError("x"));
  EXPECT_NE(NotFoundError("x"), NotFoundError("xx"));
  EXPECT_EQ(NotFoundError(""), NotFoundError(""));
  // An inline status and a record with the same code and empty message are
  // of different kinds.
  Status inline_status = NotFoundError("");
  Status record = NotFoundError("");
  record.PrepareToModify();
  EXPECT_EQ(record.raw_rep_for_testing() & 1u, 1u);
  EXPECT_EQ(record.code(), StatusCode::kNotFound);
  EXPECT_EQ(record.message(), "");
  EXPECT_NE(inline_status, record);
  // Moved-from compares by message against INTERNAL without a record.
  Status moved = InternalError("q");
  Status sink = std::move(moved);
  EXPECT_NE(moved, InternalError(""));  // NOLINT(bugprone-use-after-move)
}

TEST(StatusTest, PrepareToModify) {
  Status ok;
  ok.PrepareToModify();
  EXPECT_TRUE(ok.ok());

  Status shared = AbortedError("busy");
  Status other = shared;
  const uintptr_t before = shared.raw_rep_for_testing();
  shared.PrepareToModify();
  EXPECT_NE(shared.raw_rep_for_testing(), before);
  EXPECT_EQ(other.raw_rep_for_testing(), before);
  EXPECT_EQ(shared, other);  // Both records, same code and message.

  // A record held alone stays in place.
  const uintptr_t alone = shared.raw_rep_for_testing();
  shared.PrepareToModify();
  EXPECT_EQ(shared.raw_rep_for_testing(), alone);

  Status moved = AbortedError("x");
  Status sink = std::move(moved);
  moved.PrepareToModify();  // NOLINT(bugprone-use-after-move)
  EXPECT_EQ(moved.raw_code(), 13);
  EXPECT_EQ(moved.message(), "");
}

TEST(StatusTest, ConstructorsAndPredicates) {
  struct Case {
    Status (*make)(std::string_view);
    bool (*is)(const Status&);
    StatusCode code;
  };
  const std::vector<Case> cases = {
      {CancelledError, IsCancelled, StatusCode::kCancelled},
      {UnknownError, IsUnknown, StatusCode::kUnknown},
      {InvalidArgumentError, IsInvalidArgument, StatusCode::kInvalidArgument},
      {DeadlineExceededError, IsDeadlineExceeded, StatusCode::kDeadlineExceeded},
      {NotFoundError, IsNotFound, StatusCode::kNotFound},
      {AlreadyExistsError, IsAlreadyExists, StatusCode::kAlreadyExists},
      {PermissionDeniedError, IsPermissionDenied, StatusCode::kPermissionDenied},
      {ResourceExhaustedError, IsResourceExhausted, StatusCode::kResourceExhausted},
      {FailedPreconditionError, IsFailedPrecondition, StatusCode::kFailedPrecondition},
      {AbortedError, IsAborted, StatusCode::kAborted},
      {OutOfRangeError, IsOutOfRange, StatusCode::kOutOfRange},
      {UnimplementedError, IsUnimplemented, StatusCode::kUnimplemented},
      {InternalError, IsInternal, StatusCode::kInternal},
      {UnavailableError, IsUnavailable, StatusCode::kUnavailable},
      {DataLossError, IsDataLoss, StatusCode::kDataLoss},
      {UnauthenticatedError, IsUnauthenticated, StatusCode::kUnauthenticated},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(StatusCodeToString(c.code));
    Status s = c.make("msg");
    EXPECT_EQ(s.code(), c.code);
    EXPECT_EQ(s.message(), "msg");
    for (const Case& other : cases) {
      EXPECT_EQ(other.is(s), other.code == c.code) << StatusCodeToString(other.code);
    }
  }
}

TEST(StatusTest, Annotate) {
  EXPECT_TRUE(Annotate(OkStatus(), "x").ok());
  EXPECT_EQ(Annotate(InvalidArgumentError("a"), "b").message(), "a; b");
  EXPECT_EQ(Annotate(InvalidArgumentError(""), "b").message(), "b");
  EXPECT_EQ(Annotate(InvalidArgumentError(""), "b").code(), StatusCode::kInvalidArgument);
  Status base = InvalidArgumentError("a");
  Status same = Annotate(base, "");
  EXPECT_EQ(same.raw_rep_for_testing(), base.raw_rep_for_testing());
  // The canonical code is kept: raw 42 becomes UNKNOWN.
  Status annotated = Annotate(Status(static_cast<StatusCode>(42), "a"), "b");
  EXPECT_EQ(annotated.raw_code(), 2);
  EXPECT_EQ(annotated.message(), "a; b");
}

TEST(StatusTest, ErrnoMapping) {
  const std::vector<std::pair<int, StatusCode>> cases = {
      {0, StatusCode::kOk},
      {ECANCELED, StatusCode::kCancelled},
      {EINVAL, StatusCode::kInvalidArgument},
      {ENOPROTOOPT, StatusCode::kInvalidArgument},
      {ETIMEDOUT, StatusCode::kDeadlineExceeded},
      {ETIME, StatusCode::kDeadlineExceeded},
      {ENOENT, StatusCode::kNotFound},
      {ENOMEDIUM, StatusCode::kNotFound},
      {EEXIST, StatusCode::kAlreadyExists},
      {EALREADY, StatusCode::kAlreadyExists},
      {EACCES, StatusCode::kPermissionDenied},
      {ENOKEY, StatusCode::kPermissionDenied},
      {ENOSPC, StatusCode::kResourceExhausted},
      {ENODATA, StatusCode::kResourceExhausted},
      {EBUSY, StatusCode::kFailedPrecondition},
      {EISNAM, StatusCode::kFailedPrecondition},
      {EDEADLK, StatusCode::kAborted},
      {ERANGE, StatusCode::kOutOfRange},
      {EOVERFLOW, StatusCode::kOutOfRange},
      {ENOSYS, StatusCode::kUnimplemented},
      {EXDEV, StatusCode::kUnimplemented},
      {EINTR, StatusCode::kUnavailable},
      {EHOSTUNREACH, StatusCode::kUnavailable},
      {EIO, StatusCode::kUnknown},
      {ELOOP, StatusCode::kUnknown},
      {41, StatusCode::kUnknown},
      {58, StatusCode::kUnknown},
      {126, StatusCode::kPermissionDenied},
      {127, StatusCode::kUnknown},
      {-1, StatusCode::kUnknown},
      {1 << 30, StatusCode::kUnknown},
  };
  for (const auto& [errnum, code] : cases) {
    SCOPED_TRACE(errnum);
    EXPECT_EQ(StatusCodeFromErrno(errnum), code);
  }
  // No errno maps to INTERNAL, DATA_LOSS or UNAUTHENTICATED.
  for (int e = 0; e <= 126; ++e) {
    const StatusCode c = StatusCodeFromErrno(e);
    EXPECT_NE(c, StatusCode::kInternal) << e;
    EXPECT_NE(c, StatusCode::kDataLoss) << e;
    EXPECT_NE(c, StatusCode::kUnauthenticated) << e;
  }
}

TEST(StatusTest, StatusFromErrno) {
  errno = EPIPE;
  Status s = StatusFromErrno(ENOENT, "open /x");
  EXPECT_EQ(errno, EPIPE);
  EXPECT_EQ(s.code(), StatusCode::kNotFound);
  EXPECT_EQ(s.message(), "open /x: No such file or directory");
  EXPECT_EQ(StatusFromErrno(ENOENT, "").message(), ": No such file or directory");
  EXPECT_TRUE(StatusFromErrno(0, "ignored").ok());
  Status unknown = StatusFromErrno(4000, "m");
  EXPECT_EQ(unknown.code(), StatusCode::kUnknown);
  EXPECT_THAT(std::string(unknown.message()), StartsWith("m: Unknown error 4000"));
}

TEST(StatusTest, StreamAndStrings) {
  std::ostringstream os;
  os << UnavailableError("later") << "|" << OkStatus();
  EXPECT_EQ(os.str(), "UNAVAILABLE: later|OK");
  std::unique_ptr<std::string> empty(Status::EmptyString());
  std::unique_ptr<std::string> moved(Status::MovedFromString());
  EXPECT_EQ(*empty, "");
  EXPECT_EQ(*moved, "Status accessed after move.");
  EXPECT_EQ(moved->size(), 27u);
}

// Copies of one record made and dropped on many threads at once: the count
// must stay exact (run under ThreadSanitizer and AddressSanitizer).
TEST(StatusTest, RecordSharedAcrossThreads) {
  const Status original = ResourceExhaustedError("shared message of some length");
  constexpr int kThreads = 8;
  constexpr int kIterations = 20000;
  std::vector<std::thread> threads;
  for (int t = 0; t < kThreads; ++t) {
    threads.emplace_back([&original] {
      for (int i = 0; i < kIterations; ++i) {
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
