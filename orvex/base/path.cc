#include "orvex/base/path.h"

#include <errno.h>
#include <limits.h>
#include <sys/stat.h>
#include <sys/types.h>

#include <array>
#include <cstdint>
#include <vector>

#include "absl/strings/escaping.h"

namespace orvex {
namespace {

// The scrambling keys. Changing them makes earlier scrambled text
// unreadable.
constexpr std::array<uint8_t, 8> kScrambleKeys = {0x5a, 0xc3, 0x7e, 0x19, 0xa4, 0x3d, 0xe6, 0x81};

// Makes one directory; an existing directory counts as made.
Status CreateOneDir(const std::string& path) {
  if (mkdir(path.c_str(), 0777) == 0) return OkStatus();
  const int error = errno;
  Status status = StatusFromErrno(error, "Error creating directory " + path);
  if (IsAlreadyExists(status)) {
    struct stat info;
    if (stat(path.c_str(), &info) == 0 && S_ISDIR(info.st_mode)) return OkStatus();
  }
  return status;
}

// True when a component of `path` is longer than any file system takes.
bool HasOverlongComponent(std::string_view path) {
  size_t start = 0;
  while (start < path.size()) {
    size_t end = path.find('/', start);
    if (end == std::string_view::npos) end = path.size();
    if (end - start > NAME_MAX) return true;
    start = end + 1;
  }
  return false;
}

bool IsTrivialDir(std::string_view clean) { return clean.empty() || clean == "." || clean == "/"; }

}  // namespace

std::string_view Dirname(std::string_view path) { return SplitPath(path).first; }

std::string_view Basename(std::string_view path) { return SplitPath(path).second; }

std::pair<std::string_view, std::string_view> SplitPath(std::string_view path) {
  const size_t slash = path.rfind('/');
  if (slash == std::string_view::npos) return {path.substr(0, 0), path};
  if (slash == 0) return {path.substr(0, 1), path.substr(1)};
  return {path.substr(0, slash), path.substr(slash + 1)};
}

std::string_view Extension(std::string_view path) {
  const std::string_view base = Basename(path);
  const size_t dot = base.rfind('.');
  if (dot == std::string_view::npos) return base.substr(0, 0);
  return base.substr(dot + 1);
}

std::string AddSlash(std::string_view path) {
  std::string result(path);
  if (!result.empty() && result.back() != '/') result += '/';
  return result;
}

std::string JoinPath(std::string_view a, std::string_view b) {
  if (a.empty()) return std::string(b);
  if (b.empty()) return std::string(a);
  const bool a_slash = a.back() == '/';
  const bool b_slash = b.front() == '/';
  std::string result;
  result.reserve(a.size() + b.size() + 1);
  result.append(a);
  if (a_slash && b_slash) {
    b.remove_prefix(1);
  } else if (!a_slash && !b_slash) {
    result += '/';
  }
  result.append(b);
  return result;
}

std::string CleanPath(std::string_view path) {
  const bool absolute = !path.empty() && path.front() == '/';
  std::vector<std::string_view> parts;
  size_t start = 0;
  while (start <= path.size()) {
    size_t end = path.find('/', start);
    if (end == std::string_view::npos) end = path.size();
    const std::string_view part = path.substr(start, end - start);
    start = end + 1;
    if (part.empty() || part == ".") continue;
    if (part == "..") {
      if (!parts.empty() && parts.back() != "..") {
        parts.pop_back();
      } else if (!absolute) {
        parts.push_back(part);
      }
      continue;
    }
    parts.push_back(part);
  }
  std::string result;
  if (absolute) result.push_back('/');
  for (size_t i = 0; i < parts.size(); ++i) {
    if (i > 0) result += '/';
    result.append(parts[i]);
  }
  if (result.empty()) result.push_back('.');
  return result;
}

// Equivalent to: create the directory; if that fails, create its parent the
// same way, then try the directory once more. The walk up is a loop rather
// than recursion so that no input can exhaust the stack. A path the kernel
// can never accept (too long, or with a component longer than NAME_MAX)
// fails before any of its parents is made, and so does one with a NUL byte,
// which the kernel would silently cut short.
Status RecursivelyCreateDir(std::string_view path) {
  if (path.empty()) return OkStatus();
  if (path.find('\0') != std::string_view::npos) {
    return InvalidArgumentError("Error creating directory " +
                                absl::CHexEscape(absl::string_view(path.data(), path.size())) +
                                ": path contains a NUL byte");
  }
  std::string current = CleanPath(path);
  if (current.size() >= PATH_MAX || HasOverlongComponent(current)) {
    return StatusFromErrno(ENAMETOOLONG, "Error creating directory " + current);
  }
  std::vector<std::string> pending;  // directories to retry, innermost first
  while (!IsTrivialDir(current)) {
    if (CreateOneDir(current).ok()) break;
    std::string parent(Dirname(current));
    pending.push_back(std::move(current));
    current = std::move(parent);
  }
  for (auto it = pending.rbegin(); it != pending.rend(); ++it) {
    Status status = CreateOneDir(*it);
    if (!status.ok()) return status;
  }
  return OkStatus();
}

std::string Obfuscate(std::string_view text) {
  const size_t n = text.size();
  std::string result(n, '\0');
  if (n == 0) return result;
  const uint8_t key = kScrambleKeys[n % kScrambleKeys.size()];
  for (size_t i = 0; i < n; ++i) {
    result[n - 1 - i] = static_cast<char>(static_cast<uint8_t>(text[i]) ^ key);
  }
  return result;
}

std::string Deobfuscate(std::string_view text) { return Obfuscate(text); }

}  // namespace orvex
