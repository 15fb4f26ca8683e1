#ifndef ORVEX_TOOLS_ORVEX_FILE_IO_H_
#define ORVEX_TOOLS_ORVEX_FILE_IO_H_

// Whole-file reads with a known size, for the commands that read dumps.
// Errors name the path. (All-or-nothing writes: output.h.)

#include <cstdint>
#include <string>
#include <string_view>

#include "orvex/status/statusor.h"

namespace orvex_tool {

// The bytes of `path`, which must hold exactly `expected` bytes. The size of
// a regular file is checked before anything is read, and no more than
// `expected` + 1 bytes are ever read (so a pipe or device that never ends
// costs nothing). INVALID_ARGUMENT "<path>: expected N bytes (<what>), found
// M" (or "found more" for a stream); the errno status when it cannot be
// opened or read.
orvex::StatusOr<std::string> ReadFileOfSize(const std::string& path, uint64_t expected,
                                            std::string_view what);

}  // namespace orvex_tool

#endif  // ORVEX_TOOLS_ORVEX_FILE_IO_H_
