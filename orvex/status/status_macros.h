#ifndef ORVEX_STATUS_STATUS_MACROS_H_
#define ORVEX_STATUS_STATUS_MACROS_H_

// Propagation helpers.
//
// ORVEX_RETURN_IF_ERROR(expr): evaluates `expr` (a Status, a StatusOr<T> or
// a StatusBuilder); if it is not OK, returns it from the current function,
// which may return Status or any StatusOr<U>. More context can be streamed:
//
//   ORVEX_RETURN_IF_ERROR(buffer->Map(mode)) << "while mapping " << name;
//
// ORVEX_ASSIGN_OR_RETURN(lhs, rexpr): evaluates `rexpr` (a StatusOr<T>); on
// error returns its status, otherwise moves the value into `lhs`, which may
// be a declaration:
//
//   ORVEX_ASSIGN_OR_RETURN(auto image, Image::Make(...));
//
// `lhs` must not contain unparenthesised commas.

#include <utility>

#include "orvex/status/status.h"
#include "orvex/status/status_builder.h"
#include "orvex/status/statusor.h"

namespace orvex {
namespace status_macro_internal {

inline const Status& GetStatus(const Status& status) { return status; }
inline Status GetStatus(Status&& status) { return std::move(status); }
template <typename T>
const Status& GetStatus(const StatusOr<T>& status_or) {
  return status_or.status();
}
inline Status GetStatus(StatusBuilder&& builder) { return std::move(builder); }

}  // namespace status_macro_internal
}  // namespace orvex

#define ORVEX_INTERNAL_CONCAT_IMPL(a, b) a##b
#define ORVEX_INTERNAL_CONCAT(a, b) ORVEX_INTERNAL_CONCAT_IMPL(a, b)

#define ORVEX_RETURN_IF_ERROR(expr)                                                      \
  switch (0)                                                                             \
  case 0:                                                                                \
  default:                                                                               \
    if (::orvex::Status orvex_status_ = ::orvex::status_macro_internal::GetStatus(expr); \
        orvex_status_.ok()) {                                                            \
    } else /* NOLINT */                                                                  \
      return ::orvex::StatusBuilder(std::move(orvex_status_), ORVEX_LOC)

#define ORVEX_ASSIGN_OR_RETURN(lhs, rexpr) \
  ORVEX_INTERNAL_ASSIGN_OR_RETURN(ORVEX_INTERNAL_CONCAT(orvex_statusor_, __LINE__), lhs, rexpr)

#define ORVEX_INTERNAL_ASSIGN_OR_RETURN(statusor, lhs, rexpr)               \
  auto statusor = (rexpr);                                                  \
  if (!statusor.ok()) [[unlikely]] {                                        \
    return ::orvex::StatusBuilder(std::move(statusor).status(), ORVEX_LOC); \
  }                                                                         \
  lhs = std::move(statusor).value()

#endif  // ORVEX_STATUS_STATUS_MACROS_H_
