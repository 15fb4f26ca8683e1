#ifndef ORVEX_STATUS_STATUS_BUILDER_H_
#define ORVEX_STATUS_STATUS_BUILDER_H_

// StatusBuilder composes an error Status from a code, the source location
// that raised it and streamed message pieces, and converts implicitly to
// Status or StatusOr<T>. It can also log the final status, every time, every
// N-th time or at most once per period at its source location.
//
// Example:
//
//   orvex::Status CheckSize(int size) {
//     if (size < 0) {
//       return orvex::InvalidArgumentErrorBuilder(ORVEX_LOC) << "size " << size;
//     }
//     return orvex::OkStatus();
//   }
//
// Streaming into a builder over OK does nothing. A builder allocates nothing
// until the first piece of text is streamed into a non-OK builder. After an
// rvalue conversion the builder holds UNKNOWN with an empty message.
//
// Thread safety: a builder is a value used by one thread. The rate-limit
// tables are process-wide and internally synchronised.

#include <cstdint>
#include <memory>
#include <ostream>
#include <string>
#include <string_view>
#include <utility>

#include "absl/strings/internal/ostringstream.h"
#include "absl/time/time.h"
#include "orvex/base/export.h"
#include "orvex/status/status.h"

namespace orvex {

// The line and file of the code that makes an error. The file name is a
// static string, compared by address.
class SourceLocation {
 public:
  constexpr SourceLocation(uint32_t line, const char* file_name)
      : line_(line), file_name_(file_name) {}

  // The caller's location (when used as a default argument).
  static constexpr SourceLocation current(uint32_t line = __builtin_LINE(),
                                          const char* file_name = __builtin_FILE()) {
    return SourceLocation(line, file_name);
  }

  constexpr uint32_t line() const { return line_; }
  constexpr const char* file_name() const { return file_name_; }

 private:
  uint32_t line_;
  const char* file_name_;
};

// The location of the code that names it.
#define ORVEX_LOC ::orvex::SourceLocation(__LINE__, __FILE__)

class StatusBuilder;

// Where streamed text goes relative to the status's existing message.
enum class MessageJoinStyle : int32_t {
  kAnnotate = 0,  // "<old>; <new>" (just "<new>" when the old is empty)
  kAppend = 1,    // "<old><new>"
  kPrepend = 2,   // "<new><old>"
};

class [[nodiscard]] ORVEX_EXPORT StatusBuilder {
 public:
  // Logging modes and Android log severities of the builder's Rep.
  enum class LogMode : int32_t { kNone = 0, kAlways = 1, kEveryN = 2, kEveryPeriod = 3 };
  static constexpr int32_t kInfo = 2;
  static constexpr int32_t kWarning = 3;
  static constexpr int32_t kError = 4;
  static constexpr int32_t kFatal = 6;

  // A builder over an existing status; streamed text annotates it.
  StatusBuilder(const Status& status, SourceLocation location)
      : status_(status), location_(location) {}
  StatusBuilder(Status&& status, SourceLocation location)
      : status_(std::move(status)), location_(location) {}
  // A builder over the message-less error of `code`.
  StatusBuilder(StatusCode code, SourceLocation location)
      : status_(code, std::string_view()), location_(location) {}

  // Copies share the status record and deep-copy the message and settings.
  StatusBuilder(const StatusBuilder& other);
  StatusBuilder& operator=(const StatusBuilder& other);
  StatusBuilder(StatusBuilder&&) noexcept = default;
  StatusBuilder& operator=(StatusBuilder&&) noexcept = default;
  ~StatusBuilder();

  // Appends `value` with its stream operator (a Printable writes its
  // DebugStr()). Does nothing when the status is OK.
  template <typename T>
  StatusBuilder& operator<<(const T& value) & {
    if (status_.ok()) return *this;
    if (rep_ == nullptr) rep_ = std::make_unique<Rep>();
    rep_->stream << value;
    return *this;
  }
  template <typename T>
  StatusBuilder&& operator<<(const T& value) && {
    return std::move(*this << value);
  }

  // Logging settings (no effect on an OK builder).
  StatusBuilder& Log(int32_t severity) &;
  StatusBuilder&& Log(int32_t severity) && { return std::move(Log(severity)); }
  StatusBuilder& LogEveryN(int32_t severity, uint32_t n) &;
  StatusBuilder&& LogEveryN(int32_t severity, uint32_t n) && {
    return std::move(LogEveryN(severity, n));
  }
  StatusBuilder& LogEvery(int32_t severity, absl::Duration period) &;
  StatusBuilder&& LogEvery(int32_t severity, absl::Duration period) && {
    return std::move(LogEvery(severity, period));
  }
  StatusBuilder& SetJoinStyle(MessageJoinStyle style) &;
  StatusBuilder&& SetJoinStyle(MessageJoinStyle style) && { return std::move(SetJoinStyle(style)); }
  StatusBuilder& SetAppend() & { return SetJoinStyle(MessageJoinStyle::kAppend); }
  StatusBuilder&& SetAppend() && { return std::move(SetAppend()); }
  StatusBuilder& SetPrepend() & { return SetJoinStyle(MessageJoinStyle::kPrepend); }
  StatusBuilder&& SetPrepend() && { return std::move(SetPrepend()); }

  // Calls `adaptor(builder)` and returns its result.
  template <typename Adaptor>
  auto With(Adaptor&& adaptor) & -> decltype(std::forward<Adaptor>(adaptor)(*this)) {
    return std::forward<Adaptor>(adaptor)(*this);
  }
  template <typename Adaptor>
  auto With(Adaptor&& adaptor) && -> decltype(std::forward<Adaptor>(adaptor)(std::move(*this))) {
    return std::forward<Adaptor>(adaptor)(std::move(*this));
  }

  bool ok() const { return status_.ok(); }
  SourceLocation source_location() const { return location_; }

  // Without streamed text: a copy of the status. Otherwise a copy of the
  // builder is finished (joined, conditionally logged).
  operator Status() const&;  // NOLINT(google-explicit-constructor)
  operator Status() &&;      // NOLINT(google-explicit-constructor)

  // Joins the text to the status, logs as configured, leaves the builder
  // holding UNKNOWN and returns the joined status.
  Status CreateStatusAndConditionallyLog() &&;

 private:
  struct Rep {
    Rep() : stream(&text) {}
    Rep(const Rep& other);
    Rep& operator=(const Rep&) = delete;

    LogMode logging_mode = LogMode::kNone;
    int32_t log_severity = 0;
    uint32_t n = 0;
    absl::Duration period = absl::ZeroDuration();
    std::string text;
    absl::strings_internal::OStringStream stream;
    MessageJoinStyle join_style = MessageJoinStyle::kAnnotate;
  };

  Rep& GetRep();
  void ConditionallyLog(const Status& status) const;
  static Status JoinMessageToStatus(Status status, std::string_view text, MessageJoinStyle style);

  Status status_;
  SourceLocation location_;
  std::unique_ptr<Rep> rep_;
};

// Writes the converted status's ToString() ("OK" when OK). The const form
// converts a copy (which may log) and leaves the builder usable.
ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, const StatusBuilder& builder);
ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, StatusBuilder&& builder);

// Builders over the message-less error of each code at `location`.
#define ORVEX_INTERNAL_DECLARE_BUILDER(name, code)     \
  inline StatusBuilder name(SourceLocation location) { \
    return StatusBuilder(StatusCode::code, location);  \
  }
ORVEX_INTERNAL_DECLARE_BUILDER(CancelledErrorBuilder, kCancelled)
ORVEX_INTERNAL_DECLARE_BUILDER(UnknownErrorBuilder, kUnknown)
ORVEX_INTERNAL_DECLARE_BUILDER(InvalidArgumentErrorBuilder, kInvalidArgument)
ORVEX_INTERNAL_DECLARE_BUILDER(DeadlineExceededErrorBuilder, kDeadlineExceeded)
ORVEX_INTERNAL_DECLARE_BUILDER(NotFoundErrorBuilder, kNotFound)
ORVEX_INTERNAL_DECLARE_BUILDER(AlreadyExistsErrorBuilder, kAlreadyExists)
ORVEX_INTERNAL_DECLARE_BUILDER(PermissionDeniedErrorBuilder, kPermissionDenied)
ORVEX_INTERNAL_DECLARE_BUILDER(ResourceExhaustedErrorBuilder, kResourceExhausted)
ORVEX_INTERNAL_DECLARE_BUILDER(FailedPreconditionErrorBuilder, kFailedPrecondition)
ORVEX_INTERNAL_DECLARE_BUILDER(AbortedErrorBuilder, kAborted)
ORVEX_INTERNAL_DECLARE_BUILDER(OutOfRangeErrorBuilder, kOutOfRange)
ORVEX_INTERNAL_DECLARE_BUILDER(UnimplementedErrorBuilder, kUnimplemented)
ORVEX_INTERNAL_DECLARE_BUILDER(InternalErrorBuilder, kInternal)
ORVEX_INTERNAL_DECLARE_BUILDER(UnavailableErrorBuilder, kUnavailable)
ORVEX_INTERNAL_DECLARE_BUILDER(DataLossErrorBuilder, kDataLoss)
ORVEX_INTERNAL_DECLARE_BUILDER(UnauthenticatedErrorBuilder, kUnauthenticated)
#undef ORVEX_INTERNAL_DECLARE_BUILDER

// A builder over StatusFromErrno(errnum, message) at `location`.
inline StatusBuilder StatusBuilderFromErrno(int errnum, std::string_view message,
                                            SourceLocation location) {
  return StatusBuilder(StatusFromErrno(errnum, message), location);
}

}  // namespace orvex

#endif  // ORVEX_STATUS_STATUS_BUILDER_H_
