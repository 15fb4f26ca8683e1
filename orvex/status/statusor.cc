#include "orvex/status/statusor.h"

#include "orvex/status/log.h"

namespace orvex {
namespace status_internal {

Status OkStatusOrConstructorError() {
  return InternalError("An OK status is not a valid constructor argument to StatusOr<T>");
}

void CrashOnValueAccess(const Status& status) {
  ORVEX_LOG(FATAL) << "Attempting to fetch value instead of handling error " << status.ToString();
  __builtin_unreachable();
}

}  // namespace status_internal
}  // namespace orvex
