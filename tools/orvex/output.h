#ifndef ORVEX_TOOLS_ORVEX_OUTPUT_H_
#define ORVEX_TOOLS_ORVEX_OUTPUT_H_

// Where the tool's results go: standard output through a stream buffer that
// remembers why a write failed, and files that appear only complete.

#include <streambuf>
#include <string>
#include <string_view>

#include "orvex/status/status.h"

namespace orvex_tool {

// Writes all of `bytes` to `fd`, retrying short and interrupted writes.
// Returns 0 or the errno of the failure.
int WriteAll(int fd, std::string_view bytes);

// An output stream buffer over a file descriptor it does not own. The first
// failed write ends the output: later text is dropped and the stream goes
// bad. error() is that write's errno, or 0. Not thread-safe.
class FdOutputBuffer : public std::streambuf {
 public:
  explicit FdOutputBuffer(int fd);
  FdOutputBuffer(const FdOutputBuffer&) = delete;
  FdOutputBuffer& operator=(const FdOutputBuffer&) = delete;

  int error() const { return error_; }

 protected:
  int_type overflow(int_type c) override;
  int sync() override;

 private:
  int fd_;
  int error_ = 0;
  char buffer_[4096];
};

// Writes `bytes` to the file `path`. A new or regular file is written under
// a temporary name in the same directory and renamed over `path` once
// complete, so that a failure leaves neither a partial file nor a changed
// one; an existing device or FIFO (/dev/stdout) is written in place.
// Errors: the errno status "cannot write <path>: <errno text>".
orvex::Status WriteFileAtomically(const std::string& path, std::string_view bytes);

}  // namespace orvex_tool

#endif  // ORVEX_TOOLS_ORVEX_OUTPUT_H_
