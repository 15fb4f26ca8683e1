#ifndef ORVEX_STATUS_STATUS_H_
#define ORVEX_STATUS_STATUS_H_

// Status: the outcome of a fallible operation, OK or one of the canonical
// error codes with a message.
//
// A Status is one pointer-sized word:
//   0                 OK (empty message);
//   low bits 00       an error without a message, code = word >> 2;
//   54                the moved-from state (INTERNAL, "Status accessed after
//                     move.");
//   low bit 1         address + 1 of a shared, immutable record holding a
//                     reference count, the raw code and the message.
// OK and message-less errors never allocate; an error with a message makes
// one allocation (the record and its text together), and copies share it.
//
// Example:
//
//   orvex::Status Open(int fd) {
//     if (fd < 0) return orvex::InvalidArgumentError("negative descriptor");
//     return orvex::OkStatus();
//   }
//
// Thread safety: a Status is a value. Distinct Status objects that share a
// record may be copied and destroyed concurrently; one object must not be
// written by two threads at once.

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <ostream>
#include <string>
#include <string_view>

#include "orvex/base/export.h"

namespace orvex {

// The canonical error codes. Values are fixed; 17 and above (and negative
// values) are not canonical and read as kUnknown through Status::code().
enum class StatusCode : int32_t {
  kOk = 0,
  kCancelled = 1,
  kUnknown = 2,
  kInvalidArgument = 3,
  kDeadlineExceeded = 4,
  kNotFound = 5,
  kAlreadyExists = 6,
  kPermissionDenied = 7,
  kResourceExhausted = 8,
  kFailedPrecondition = 9,
  kAborted = 10,
  kOutOfRange = 11,
  kUnimplemented = 12,
  kInternal = 13,
  kUnavailable = 14,
  kDataLoss = 15,
  kUnauthenticated = 16,
};

// "OK", "CANCELLED", ... ; the empty string for a non-canonical value.
ORVEX_EXPORT std::string StatusCodeToString(StatusCode code);
ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, StatusCode code);

namespace status_internal {

// Maps any integer to a canonical code: 0..16 stay, the rest become kUnknown.
constexpr StatusCode MapToLocalCode(int value) {
  return (value >= 0 && value <= 16) ? static_cast<StatusCode>(value) : StatusCode::kUnknown;
}

// The shared record behind a Status with a message. The message bytes follow
// the record in the same allocation.
struct StatusRep {
  std::atomic<uint32_t> ref;
  uint32_t code;
  size_t size;

  const char* data() const { return reinterpret_cast<const char*>(this + 1); }
  std::string_view message() const { return {data(), size}; }
};

}  // namespace status_internal

class [[nodiscard]] ORVEX_EXPORT Status final {
 public:
  // OK.
  constexpr Status() noexcept = default;

  // An error of `code` with `message`. A record is allocated only when the
  // code is nonzero and the message non-empty; a message given with code 0
  // is dropped. Any 32-bit raw code may be stored (code() clamps it).
  Status(StatusCode code, std::string_view message) {
    const uintptr_t inline_word = InlineWord(static_cast<int32_t>(code));
    if (message.empty() || inline_word == 0) {
      rep_ = inline_word;
    } else {
      rep_ = NewRep(static_cast<int32_t>(code), message);
    }
  }

  Status(const Status& other) noexcept : rep_(other.rep_) { Ref(rep_); }
  Status& operator=(const Status& other) noexcept {
    if (rep_ != other.rep_) {
      Ref(other.rep_);
      Unref(rep_);
      rep_ = other.rep_;
    }
    return *this;
  }
  // Moving leaves the source in the moved-from state.
  Status(Status&& other) noexcept : rep_(other.rep_) { other.rep_ = kMovedFromRep; }
  Status& operator=(Status&& other) noexcept {
    if (this != &other) {
      Unref(rep_);
      rep_ = other.rep_;
      other.rep_ = kMovedFromRep;
    }
    return *this;
  }
  ~Status() { Unref(rep_); }

  bool ok() const { return rep_ == 0; }

  // The code as stored, which may lie outside the canonical range.
  int raw_code() const {
    if (IsRecord(rep_)) return static_cast<int32_t>(GetRep(rep_)->code);
    return static_cast<int32_t>(static_cast<uint32_t>(rep_ >> 2));
  }
  // The canonical code: raw_code() if it is 0..16, else kUnknown.
  StatusCode code() const { return status_internal::MapToLocalCode(raw_code()); }

  // Empty for OK and message-less errors; "Status accessed after move." for
  // a moved-from status. The view lives as long as this Status is unchanged.
  std::string_view message() const {
    if (IsRecord(rep_)) return GetRep(rep_)->message();
    if (rep_ == kMovedFromRep) return kMovedFromMessage;
    return {};
  }

  // "OK", or the canonical code's text, ": " and the message (the separator
  // is written even when the message is empty).
  std::string ToString() const { return ok() ? std::string("OK") : ToStringSlow(); }

  // Gives a non-OK status a record of its own that it may modify: inline and
  // moved-from statuses get a new record with their raw code and an empty
  // message; a shared record is copied. OK stays OK.
  void PrepareToModify();

  // Same word, or the same kind (record or not) with equal raw codes and
  // byte-equal messages.
  friend bool operator==(const Status& a, const Status& b) {
    return a.rep_ == b.rep_ || a.EqualsSlow(b);
  }
  friend bool operator!=(const Status& a, const Status& b) { return !(a == b); }

  // Newly allocated strings with the empty message and the moved-from text.
  static std::string* EmptyString();
  static std::string* MovedFromString();

  // The representation word, for tests and diagnostics.
  uintptr_t raw_rep_for_testing() const { return rep_; }

 private:
  static constexpr uintptr_t kMovedFromRep = (13u << 2) | 2u;  // 54
  static constexpr std::string_view kMovedFromMessage = "Status accessed after move.";

  static constexpr uintptr_t InlineWord(int32_t code) {
    return static_cast<uintptr_t>(static_cast<uint32_t>(code)) << 2;
  }
  static constexpr bool IsRecord(uintptr_t rep) { return (rep & 1u) != 0; }
  static status_internal::StatusRep* GetRep(uintptr_t rep) {
    return reinterpret_cast<status_internal::StatusRep*>(rep - 1);
  }
  static void Ref(uintptr_t rep) {
    if (IsRecord(rep)) GetRep(rep)->ref.fetch_add(1, std::memory_order_relaxed);
  }
  static void Unref(uintptr_t rep) {
    if (IsRecord(rep)) UnrefRecord(rep);
  }

  static uintptr_t NewRep(int32_t code, std::string_view message);
  static void UnrefRecord(uintptr_t rep);
  std::string ToStringSlow() const;
  bool EqualsSlow(const Status& other) const;

  uintptr_t rep_ = 0;
};

inline Status OkStatus() { return Status(); }

ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, const Status& status);

// Error constructors: the status of their code with `message`.
ORVEX_EXPORT Status CancelledError(std::string_view message);
ORVEX_EXPORT Status UnknownError(std::string_view message);
ORVEX_EXPORT Status InvalidArgumentError(std::string_view message);
ORVEX_EXPORT Status DeadlineExceededError(std::string_view message);
ORVEX_EXPORT Status NotFoundError(std::string_view message);
ORVEX_EXPORT Status AlreadyExistsError(std::string_view message);
ORVEX_EXPORT Status PermissionDeniedError(std::string_view message);
ORVEX_EXPORT Status ResourceExhaustedError(std::string_view message);
ORVEX_EXPORT Status FailedPreconditionError(std::string_view message);
ORVEX_EXPORT Status AbortedError(std::string_view message);
ORVEX_EXPORT Status OutOfRangeError(std::string_view message);
ORVEX_EXPORT Status UnimplementedError(std::string_view message);
ORVEX_EXPORT Status InternalError(std::string_view message);
ORVEX_EXPORT Status UnavailableError(std::string_view message);
ORVEX_EXPORT Status DataLossError(std::string_view message);
ORVEX_EXPORT Status UnauthenticatedError(std::string_view message);

// Predicates on the raw code. IsUnknown also holds for every raw code that
// code() clamps to kUnknown (negative or above 16).
inline bool IsCancelled(const Status& s) { return s.raw_code() == 1; }
inline bool IsUnknown(const Status& s) {
  return s.raw_code() == 2 || static_cast<uint32_t>(s.raw_code()) > 16u;
}
inline bool IsInvalidArgument(const Status& s) { return s.raw_code() == 3; }
inline bool IsDeadlineExceeded(const Status& s) { return s.raw_code() == 4; }
inline bool IsNotFound(const Status& s) { return s.raw_code() == 5; }
inline bool IsAlreadyExists(const Status& s) { return s.raw_code() == 6; }
inline bool IsPermissionDenied(const Status& s) { return s.raw_code() == 7; }
inline bool IsResourceExhausted(const Status& s) { return s.raw_code() == 8; }
inline bool IsFailedPrecondition(const Status& s) { return s.raw_code() == 9; }
inline bool IsAborted(const Status& s) { return s.raw_code() == 10; }
inline bool IsOutOfRange(const Status& s) { return s.raw_code() == 11; }
inline bool IsUnimplemented(const Status& s) { return s.raw_code() == 12; }
inline bool IsInternal(const Status& s) { return s.raw_code() == 13; }
inline bool IsUnavailable(const Status& s) { return s.raw_code() == 14; }
inline bool IsDataLoss(const Status& s) { return s.raw_code() == 15; }
inline bool IsUnauthenticated(const Status& s) { return s.raw_code() == 16; }

// Joins `message` to a status: OK stays OK; an empty message returns a copy;
// otherwise the result has the canonical code() and the message
// "<old>; <message>" (or just `message` when the old one is empty).
ORVEX_EXPORT Status Annotate(const Status& status, std::string_view message);

// Maps a Linux errno value to a canonical code; values outside 0..126 give
// kUnknown.
ORVEX_EXPORT StatusCode StatusCodeFromErrno(int errnum);

// The text strerror_r gives for `errnum` ("No such file or directory"), or
// "Unknown error <errnum>" when it gives none. errno is preserved.
ORVEX_EXPORT std::string ErrnoText(int errnum);

// The status of StatusCodeFromErrno(errnum) with the message
// "<message>: <strerror text>" (the separator is written even for an empty
// message). errnum 0 gives OK. errno is preserved.
ORVEX_EXPORT Status StatusFromErrno(int errnum, std::string_view message);

}  // namespace orvex

#endif  // ORVEX_STATUS_STATUS_H_
