#include "orvex/status/status.h"

#include <errno.h>
#include <string.h>

#include <array>
#include <cstdio>
#include <initializer_list>
#include <new>

#include "orvex/status/log.h"

namespace orvex {
namespace {

constexpr std::array<std::string_view, 17> kCodeTexts = {
    "OK",
    "CANCELLED",
    "UNKNOWN",
    "INVALID_ARGUMENT",
    "DEADLINE_EXCEEDED",
    "NOT_FOUND",
    "ALREADY_EXISTS",
    "PERMISSION_DENIED",
    "RESOURCE_EXHAUSTED",
    "FAILED_PRECONDITION",
    "ABORTED",
    "OUT_OF_RANGE",
    "UNIMPLEMENTED",
    "INTERNAL",
    "UNAVAILABLE",
    "DATA_LOSS",
    "UNAUTHENTICATED",
};

std::string_view CodeText(StatusCode code) {
  const auto value = static_cast<int32_t>(code);
  if (value < 0 || value > 16) return {};
  return kCodeTexts[static_cast<size_t>(value)];
}

// errno 0..126 to canonical code; built once at compile time.
constexpr std::array<StatusCode, 127> MakeErrnoTable() {
  std::array<StatusCode, 127> t{};
  for (auto& c : t) c = StatusCode::kUnknown;
  t[0] = StatusCode::kOk;
  t[ECANCELED] = StatusCode::kCancelled;
  for (int e : {E2BIG, EFAULT, EINVAL, ENOTTY, ESPIPE, EDOM, ENAMETOOLONG, ENOSTR, EILSEQ, ENOTSOCK,
                EDESTADDRREQ, EPROTOTYPE, ENOPROTOOPT}) {
    t[static_cast<size_t>(e)] = StatusCode::kInvalidArgument;
  }
  for (int e : {ETIME, ETIMEDOUT}) t[static_cast<size_t>(e)] = StatusCode::kDeadlineExceeded;
  for (int e : {ENOENT, ESRCH, ENXIO, ENODEV, ENOMEDIUM}) {
    t[static_cast<size_t>(e)] = StatusCode::kNotFound;
  }
  for (int e : {EEXIST, ENOTUNIQ, EADDRNOTAVAIL, EALREADY}) {
    t[static_cast<size_t>(e)] = StatusCode::kAlreadyExists;
  }
  for (int e : {EPERM, EACCES, EROFS, ENOKEY}) {
    t[static_cast<size_t>(e)] = StatusCode::kPermissionDenied;
  }
  for (int e : {ENOMEM, ENFILE, EMFILE, ENOSPC, EMLINK, ENODATA, ENOSR, EUSERS, ENOBUFS, EDQUOT}) {
    t[static_cast<size_t>(e)] = StatusCode::kResourceExhausted;
  }
  for (int e : {EBADF, ECHILD, ENOTBLK, EBUSY, ENOTDIR, EISDIR, ETXTBSY, EPIPE, ENOTEMPTY, EUNATCH,
                EBADFD, EADDRINUSE, EISCONN, ENOTCONN, ESHUTDOWN, EISNAM}) {
    t[static_cast<size_t>(e)] = StatusCode::kFailedPrecondition;
  }
  for (int e : {EDEADLK, ESTALE}) t[static_cast<size_t>(e)] = StatusCode::kAborted;
  for (int e : {EFBIG, ERANGE, ECHRNG, EOVERFLOW}) {
    t[static_cast<size_t>(e)] = StatusCode::kOutOfRange;
  }
  for (int e : {EXDEV, ENOSYS, ENOPKG, EPROTONOSUPPORT, ESOCKTNOSUPPORT, EOPNOTSUPP, EPFNOSUPPORT,
                EAFNOSUPPORT}) {
    t[static_cast<size_t>(e)] = StatusCode::kUnimplemented;
  }
  for (int e : {EINTR, EAGAIN, ENOLCK, ENONET, ENOLINK, ECOMM, ENETDOWN, ENETUNREACH, ENETRESET,
                ECONNABORTED, ECONNRESET, ECONNREFUSED, EHOSTDOWN, EHOSTUNREACH}) {
    t[static_cast<size_t>(e)] = StatusCode::kUnavailable;
  }
  return t;
}
constexpr std::array<StatusCode, 127> kErrnoTable = MakeErrnoTable();

// strerror_r comes in two flavours; both are handled.
[[maybe_unused]] const char* StrerrorResult(int result, const char* buf) {
  return result == 0 ? buf : "";
}
[[maybe_unused]] const char* StrerrorResult(const char* result, const char* /*buf*/) {
  return result != nullptr ? result : "";
}

// Concatenates views into one string with a single allocation.
std::string Concat(std::initializer_list<std::string_view> pieces) {
  size_t size = 0;
  for (std::string_view p : pieces) size += p.size();
  std::string out;
  out.reserve(size);
  for (std::string_view p : pieces) out.append(p);
  return out;
}

}  // namespace

std::string StatusCodeToString(StatusCode code) { return std::string(CodeText(code)); }

std::ostream& operator<<(std::ostream& os, StatusCode code) { return os << CodeText(code); }

uintptr_t Status::NewRep(int32_t code, std::string_view message) {
  void* memory = ::operator new(sizeof(status_internal::StatusRep) + message.size());
  auto* rep = new (memory) status_internal::StatusRep;
  rep->ref.store(1, std::memory_order_relaxed);
  rep->code = static_cast<uint32_t>(code);
  rep->size = message.size();
  memcpy(reinterpret_cast<char*>(rep + 1), message.data(), message.size());
  return reinterpret_cast<uintptr_t>(rep) + 1;
}

void Status::UnrefRecord(uintptr_t word) {
  status_internal::StatusRep* rep = GetRep(word);
  // A count of 1 means nobody else can reach the record: free it without the
  // read-modify-write.
  if (rep->ref.load(std::memory_order_acquire) == 1 ||
      rep->ref.fetch_sub(1, std::memory_order_acq_rel) == 1) {
    rep->~StatusRep();
    ::operator delete(rep);
  }
}

std::string Status::ToStringSlow() const { return Concat({CodeText(code()), ": ", message()}); }

bool Status::EqualsSlow(const Status& other) const {
  if (IsRecord(rep_) != IsRecord(other.rep_)) return false;
  return raw_code() == other.raw_code() && message() == other.message();
}

void Status::PrepareToModify() {
  if (ok()) return;
  if (IsRecord(rep_)) {
    status_internal::StatusRep* rep = GetRep(rep_);
    if (rep->ref.load(std::memory_order_acquire) == 1) return;
    const uintptr_t copy = NewRep(static_cast<int32_t>(rep->code), rep->message());
    UnrefRecord(rep_);
    rep_ = copy;
    return;
  }
  // Inline or moved-from: a record with the raw code and an empty message.
  // NewRep cannot be used for the empty message, since it would still be
  // inline; build the record directly.
  const int32_t code = raw_code();
  void* memory = ::operator new(sizeof(status_internal::StatusRep));
  auto* rep = new (memory) status_internal::StatusRep;
  rep->ref.store(1, std::memory_order_relaxed);
  rep->code = static_cast<uint32_t>(code);
  rep->size = 0;
  rep_ = reinterpret_cast<uintptr_t>(rep) + 1;
}

std::string* Status::EmptyString() { return new std::string(); }
std::string* Status::MovedFromString() { return new std::string(kMovedFromMessage); }

std::ostream& operator<<(std::ostream& os, const Status& status) { return os << status.ToString(); }

#define ORVEX_DEFINE_ERROR(name, code) \
  Status name(std::string_view message) { return Status(StatusCode::code, message); }
ORVEX_DEFINE_ERROR(CancelledError, kCancelled)
ORVEX_DEFINE_ERROR(UnknownError, kUnknown)
ORVEX_DEFINE_ERROR(InvalidArgumentError, kInvalidArgument)
ORVEX_DEFINE_ERROR(DeadlineExceededError, kDeadlineExceeded)
ORVEX_DEFINE_ERROR(NotFoundError, kNotFound)
ORVEX_DEFINE_ERROR(AlreadyExistsError, kAlreadyExists)
ORVEX_DEFINE_ERROR(PermissionDeniedError, kPermissionDenied)
ORVEX_DEFINE_ERROR(ResourceExhaustedError, kResourceExhausted)
ORVEX_DEFINE_ERROR(FailedPreconditionError, kFailedPrecondition)
ORVEX_DEFINE_ERROR(AbortedError, kAborted)
ORVEX_DEFINE_ERROR(OutOfRangeError, kOutOfRange)
ORVEX_DEFINE_ERROR(UnimplementedError, kUnimplemented)
ORVEX_DEFINE_ERROR(InternalError, kInternal)
ORVEX_DEFINE_ERROR(UnavailableError, kUnavailable)
ORVEX_DEFINE_ERROR(DataLossError, kDataLoss)
ORVEX_DEFINE_ERROR(UnauthenticatedError, kUnauthenticated)
#undef ORVEX_DEFINE_ERROR

Status Annotate(const Status& status, std::string_view message) {
  if (status.ok()) return status;
  if (message.empty()) return status;
  if (status.message().empty()) return Status(status.code(), message);
  return Status(status.code(), Concat({status.message(), "; ", message}));
}

StatusCode StatusCodeFromErrno(int errnum) {
  if (errnum < 0 || errnum >= static_cast<int>(kErrnoTable.size())) return StatusCode::kUnknown;
  return kErrnoTable[static_cast<size_t>(errnum)];
}

std::string ErrnoText(int errnum) {
  log_internal::ErrnoSaver errno_saver;
  char buf[100];
  buf[0] = '\0';
  std::string text = StrerrorResult(strerror_r(errnum, buf, sizeof(buf)), buf);
  if (text.empty()) {
    snprintf(buf, sizeof(buf), "Unknown error %d", errnum);
    text = buf;
  }
  return text;
}

Status StatusFromErrno(int errnum, std::string_view message) {
  const StatusCode code = StatusCodeFromErrno(errnum);
  if (code == StatusCode::kOk) return OkStatus();
  return Status(code, Concat({message, ": ", ErrnoText(errnum)}));
}

}  // namespace orvex
