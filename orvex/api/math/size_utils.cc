#include "orvex/api/math/size_utils.h"

#include "orvex/status/log.h"

namespace orvex {

size_t AlignToPower2(size_t value, size_t alignment) {
  ORVEX_CHECK(IsPowerOf2(alignment)) << "alignment value: " << alignment << " is not a power of 2";
  return (value + alignment - 1) & ~(alignment - 1);
}

}  // namespace orvex
