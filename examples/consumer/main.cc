// Uses the installed library through its public headers only.

#include <cstdio>

#include "orvex/status/status.h"
#include "orvex/status/statusor.h"

int main() {
  orvex::StatusOr<int> size = orvex::InvalidArgumentError("no frame yet");
  std::printf("consumer: %s\n", size.status().ToString().c_str());
  return orvex::IsInvalidArgument(size.status()) ? 0 : 1;
}
