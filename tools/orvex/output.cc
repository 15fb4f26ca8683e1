#include "tools/orvex/output.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>

#include "fmt/format.h"

namespace orvex_tool {

int WriteAll(int fd, std::string_view bytes) {
  while (!bytes.empty()) {
    const ssize_t n = write(fd, bytes.data(), bytes.size());
    if (n < 0 && errno == EINTR) continue;
    if (n < 0) return errno;
    if (n == 0) return EIO;
    bytes.remove_prefix(static_cast<size_t>(n));
  }
  return 0;
}

FdOutputBuffer::FdOutputBuffer(int fd) : fd_(fd) { setp(buffer_, buffer_ + sizeof(buffer_)); }

FdOutputBuffer::int_type FdOutputBuffer::overflow(int_type c) {
  if (sync() != 0) return traits_type::eof();
  if (traits_type::eq_int_type(c, traits_type::eof())) return traits_type::not_eof(c);
  *pptr() = traits_type::to_char_type(c);
  pbump(1);
  return c;
}

int FdOutputBuffer::sync() {
  if (error_ == 0) error_ = WriteAll(fd_, std::string_view(pbase(), pptr() - pbase()));
  setp(buffer_, buffer_ + sizeof(buffer_));
  return error_ == 0 ? 0 : -1;
}

orvex::Status WriteFileAtomically(const std::string& path, std::string_view bytes) {
  const auto failed = [&](int error) {
    return orvex::StatusFromErrno(error, fmt::format("cannot write {}", path));
  };
  struct stat existing;
  if (stat(path.c_str(), &existing) == 0 && !S_ISREG(existing.st_mode) &&
      !S_ISDIR(existing.st_mode)) {
    const int fd = open(path.c_str(), O_WRONLY | O_CLOEXEC);
    if (fd < 0) return failed(errno);
    int error = WriteAll(fd, bytes);
    if (close(fd) != 0 && error == 0) error = errno;
    return error == 0 ? orvex::OkStatus() : failed(error);
  }

  // A hidden name beside the target; O_EXCL never takes over another's file.
  const std::filesystem::path target(path);
  std::string temporary;
  int fd = -1;
  for (int attempt = 0; fd < 0; ++attempt) {
    temporary = (target.parent_path() /
                 fmt::format(".{}.{}-{}.tmp", target.filename().string(), getpid(), attempt))
                    .string();
    fd = open(temporary.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0666);
    if (fd < 0 && (errno != EEXIST || attempt == 99)) return failed(errno);
  }
  int error = WriteAll(fd, bytes);
  if (close(fd) != 0 && error == 0) error = errno;
  if (error == 0 && rename(temporary.c_str(), path.c_str()) != 0) error = errno;
  if (error != 0) {
    unlink(temporary.c_str());
    return failed(error);
  }
  return orvex::OkStatus();
}

}  // namespace orvex_tool
