#ifndef ORVEX_STATUS_STATUSOR_H_
#define ORVEX_STATUS_STATUSOR_H_

// StatusOr<T>: a value of T, or the error Status that explains its absence.
// It holds a value exactly when its status is OK.
//
// Example:
//
//   orvex::StatusOr<int> ParseLevel(std::string_view text);
//
//   orvex::StatusOr<int> level = ParseLevel("5");
//   if (!level.ok()) return level.status();
//   Use(*level);
//
// Constructing from an OK Status (or a builder that yields OK) holds
// INTERNAL "An OK status is not a valid constructor argument to StatusOr<T>"
// instead. Reading the value of a StatusOr that holds an error is a contract
// violation: one FATAL line "Attempting to fetch value instead of handling
// error <status>" and the process ends.
//
// Thread safety: a value type; const access from several threads is safe.

#include <initializer_list>
#include <new>
#include <type_traits>
#include <utility>

#include "orvex/base/export.h"
#include "orvex/status/status.h"
#include "orvex/status/status_builder.h"

namespace orvex {

template <typename T>
class StatusOr;

namespace status_internal {

// The status held by a StatusOr constructed from an OK status.
ORVEX_EXPORT Status OkStatusOrConstructorError();
// Writes the FATAL line for a value read from an error StatusOr.
[[noreturn]] ORVEX_EXPORT void CrashOnValueAccess(const Status& status);

template <typename T, typename U>
inline constexpr bool kIsValueArg =
    std::is_constructible_v<T, U&&> && !std::is_same_v<std::remove_cvref_t<U>, StatusOr<T>> &&
    !std::is_same_v<std::remove_cvref_t<U>, Status> &&
    !std::is_same_v<std::remove_cvref_t<U>, StatusBuilder> &&
    !std::is_same_v<std::remove_cvref_t<U>, std::in_place_t>;

template <typename T>
struct IsStatusOr : std::false_type {};
template <typename T>
struct IsStatusOr<StatusOr<T>> : std::true_type {};

}  // namespace status_internal

template <typename T>
class [[nodiscard]] StatusOr {
  static_assert(!std::is_reference_v<T>, "StatusOr<T&> is not supported");
  static_assert(!std::is_same_v<std::remove_cv_t<T>, Status>, "StatusOr<Status> is not supported");

 public:
  using value_type = T;

  // Holds UNKNOWN with an empty message.
  StatusOr() : status_(StatusCode::kUnknown, std::string_view()) {}

  // From a value: OK.
  template <typename U = T, std::enable_if_t<status_internal::kIsValueArg<T, U>, int> = 0>
  StatusOr(U&& value)  // NOLINT(google-explicit-constructor)
      : status_() {
    Construct(std::forward<U>(value));
  }

  template <typename... Args>
  explicit StatusOr(std::in_place_t, Args&&... args) : status_() {
    Construct(std::forward<Args>(args)...);
  }

  // From an error. An OK status is replaced by the INTERNAL error above.
  StatusOr(const Status& status)  // NOLINT(google-explicit-constructor)
      : status_(status) {
    EnsureNotOk();
  }
  StatusOr(Status&& status)  // NOLINT(google-explicit-constructor)
      : status_(std::move(status)) {
    EnsureNotOk();
  }
  // From a builder, converted to its status first.
  StatusOr(const StatusBuilder& builder)  // NOLINT(google-explicit-constructor)
      : status_(static_cast<Status>(builder)) {
    EnsureNotOk();
  }
  StatusOr(StatusBuilder&& builder)  // NOLINT(google-explicit-constructor)
      : status_(static_cast<Status>(std::move(builder))) {
    EnsureNotOk();
  }

  StatusOr(const StatusOr& other) : status_(other.status_) {
    if (other.ok()) Construct(other.value_);
  }
  // The source keeps its status (and a moved-from value), so that it stays
  // consistent: ok() still tells whether it holds a value to destroy.
  StatusOr(StatusOr&& other) noexcept(std::is_nothrow_move_constructible_v<T>)
      : status_(other.status_) {  // NOLINT(performance-move-constructor-init)
    if (other.ok()) Construct(std::move(other.value_));
  }

  // Conversions from StatusOr<U> whose value converts to T.
  template <typename U,
            std::enable_if_t<!std::is_same_v<T, U> && std::is_constructible_v<T, const U&>,
                             int> = 0>
  StatusOr(const StatusOr<U>& other)  // NOLINT(google-explicit-constructor)
      : status_(other.status_) {
    if (status_.ok()) Construct(other.value_);
  }
  template <typename U,
            std::enable_if_t<!std::is_same_v<T, U> && std::is_constructible_v<T, U&&>, int> = 0>
  StatusOr(StatusOr<U>&& other)  // NOLINT(google-explicit-constructor)
      : status_(other.status_) {
    if (status_.ok()) Construct(std::move(other.value_));
  }

  StatusOr& operator=(const StatusOr& other) {
    if (this == &other) return *this;
    if (other.ok()) {
      Assign(other.value_);
    } else {
      Clear();
      status_ = other.status_;
    }
    return *this;
  }
  StatusOr& operator=(StatusOr&& other) noexcept(
      std::is_nothrow_move_assignable_v<T>&& std::is_nothrow_move_constructible_v<T>) {
    if (this == &other) return *this;
    if (other.ok()) {
      Assign(std::move(other.value_));
    } else {
      Clear();
      status_ = other.status_;
    }
    return *this;
  }
  template <typename U = T,
            std::enable_if_t<status_internal::kIsValueArg<T, U> && std::is_assignable_v<T&, U&&>,
                             int> = 0>
  StatusOr& operator=(U&& value) {
    Assign(std::forward<U>(value));
    return *this;
  }
  StatusOr& operator=(Status status) {
    Clear();
    status_ = std::move(status);
    EnsureNotOk();
    return *this;
  }

  ~StatusOr() { Clear(); }

  bool ok() const { return status_.ok(); }
  const Status& status() const& { return status_; }
  Status status() && { return ok() ? OkStatus() : std::move(status_); }

  // REQUIRES: ok(); otherwise the process ends with a FATAL line.
  const T& value() const& {
    CheckValue();
    return value_;
  }
  T& value() & {
    CheckValue();
    return value_;
  }
  const T&& value() const&& {
    CheckValue();
    return std::move(value_);
  }
  T&& value() && {
    CheckValue();
    return std::move(value_);
  }

  // REQUIRES: ok() (checked as value() does).
  const T& operator*() const& { return value(); }
  T& operator*() & { return value(); }
  T&& operator*() && { return std::move(*this).value(); }
  const T* operator->() const { return &value(); }
  T* operator->() { return &value(); }

  template <typename U>
  T value_or(U&& default_value) const& {
    return ok() ? value_ : static_cast<T>(std::forward<U>(default_value));
  }
  template <typename U>
  T value_or(U&& default_value) && {
    return ok() ? std::move(value_) : static_cast<T>(std::forward<U>(default_value));
  }

  // Replaces the content with a value made from `args`.
  template <typename... Args>
  T& emplace(Args&&... args) {
    Clear();
    status_ = OkStatus();
    Construct(std::forward<Args>(args)...);
    return value_;
  }

 private:
  template <typename U>
  friend class StatusOr;

  // GCC cannot follow the ok() guard around copies out of the union and
  // reports the value as maybe uninitialized; the guard makes it safe.
#if defined(__GNUC__) && !defined(__clang__)
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wmaybe-uninitialized"
#endif
  template <typename... Args>
  void Construct(Args&&... args) {
    ::new (static_cast<void*>(&value_)) T(std::forward<Args>(args)...);
  }
#if defined(__GNUC__) && !defined(__clang__)
#pragma GCC diagnostic pop
#endif
  template <typename U>
  void Assign(U&& value) {
    if (ok()) {
      value_ = std::forward<U>(value);
    } else {
      Construct(std::forward<U>(value));
      status_ = OkStatus();
    }
  }
  void Clear() {
    if (ok()) value_.~T();
  }
  void EnsureNotOk() {
    if (status_.ok()) status_ = status_internal::OkStatusOrConstructorError();
  }
  void CheckValue() const {
    if (!ok()) [[unlikely]] {
      status_internal::CrashOnValueAccess(status_);
    }
  }

  Status status_;
  union {
    T value_;
  };
};

}  // namespace orvex

#endif  // ORVEX_STATUS_STATUSOR_H_
