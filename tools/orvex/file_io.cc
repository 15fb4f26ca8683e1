#include "tools/orvex/file_io.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>

#include "fmt/format.h"

namespace orvex_tool {
namespace {

// Closes the descriptor when the scope ends.
class FdCloser {
 public:
  explicit FdCloser(int fd) : fd_(fd) {}
  ~FdCloser() {
    if (fd_ >= 0) close(fd_);
  }
  FdCloser(const FdCloser&) = delete;
  FdCloser& operator=(const FdCloser&) = delete;
  // Closes now; the errno of a failed close, else 0.
  int Close() {
    const int result = close(fd_);
    fd_ = -1;
    return result == 0 ? 0 : errno;
  }

 private:
  int fd_;
};

}  // namespace

orvex::StatusOr<std::string> ReadFileOfSize(const std::string& path, uint64_t expected,
                                            std::string_view what) {
  const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC);
  if (fd == -1) return orvex::StatusFromErrno(errno, fmt::format("cannot open {}", path));
  FdCloser closer(fd);
  auto wrong_size = [&](std::string_view found) {
    return orvex::InvalidArgumentError(
        fmt::format("{}: expected {} bytes ({}), found {}", path, expected, what, found));
  };
  struct stat info = {};
  if (fstat(fd, &info) == 0 && S_ISREG(info.st_mode) &&
      static_cast<uint64_t>(info.st_size) != expected) {
    return wrong_size(fmt::format("{}", info.st_size));
  }
  // The buffer grows with what arrives, never past one byte more than asked.
  std::string bytes;
  char chunk[65536];
  while (bytes.size() <= expected) {
    const size_t want =
        static_cast<size_t>(std::min<uint64_t>(sizeof(chunk), expected + 1 - bytes.size()));
    const ssize_t n = read(fd, chunk, want);
    if (n == 0) break;
    if (n < 0) {
      if (errno == EINTR) continue;
      return orvex::StatusFromErrno(errno, fmt::format("cannot read {}", path));
    }
    bytes.append(chunk, static_cast<size_t>(n));
  }
  if (bytes.size() > expected) return wrong_size("more");
  if (bytes.size() < expected) return wrong_size(fmt::format("{}", bytes.size()));
  return bytes;
}

}  // namespace orvex_tool
