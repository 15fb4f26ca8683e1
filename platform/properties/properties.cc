#include "cutils/properties.h"

#include <errno.h>
#include <fcntl.h>
#include <stdlib.h>
#include <string.h>
#include <sys/stat.h>
#include <unistd.h>

#include <functional>
#include <map>
#include <mutex>
#include <string>
#include <string_view>

#include "android-base/logging.h"

namespace {

constexpr size_t kMaxValueLength = PROPERTY_VALUE_MAX - 1;
constexpr const char kSeedFileVariable[] = "ORVEX_PROPERTIES_FILE";
// Longest seed file line taken: a long key, "=", a value of the longest
// length and room for spacing. Longer lines are refused unread.
constexpr size_t kMaxSeedLineLength = 1024;
// How much of a refused line, or of the file name, a warning quotes.
constexpr size_t kQuotedLineLength = 80;
constexpr size_t kQuotedPathLength = 256;

bool IsKeyChar(char c) {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '.' ||
         c == '-' || c == '_' || c == '@' || c == ':';
}

bool IsValidKey(std::string_view key) {
  if (key.empty() || key.front() == '.' || key.back() == '.') return false;
  char previous = '\0';
  for (char c : key) {
    if (!IsKeyChar(c) || (c == '.' && previous == '.')) return false;
    previous = c;
  }
  return true;
}

std::string_view Trim(std::string_view text) {
  constexpr std::string_view kSpace = " \t\r\n\f\v";
  const size_t first = text.find_first_not_of(kSpace);
  if (first == std::string_view::npos) return {};
  const size_t last = text.find_last_not_of(kSpace);
  return text.substr(first, last - first + 1);
}

// At most `limit` bytes of `text`, then "..." if there was more. Bytes other
// than printable ASCII, and the backslash, are written as \xNN so that a
// binary file cannot send control sequences to the log.
std::string Quote(std::string_view text, size_t limit) {
  std::string quoted;
  for (size_t i = 0; i < text.size() && i < limit; ++i) {
    const unsigned char c = static_cast<unsigned char>(text[i]);
    if (c >= 0x20 && c < 0x7f && c != '\\') {
      quoted.push_back(static_cast<char>(c));
    } else {
      constexpr char kHex[] = "0123456789abcdef";
      quoted.append({'\\', 'x', kHex[c >> 4], kHex[c & 0xf]});
    }
  }
  if (text.size() > limit) quoted.append("...");
  return quoted;
}

void Warn(const std::string& text) {
  android::base::LogMessage(__FILE__, __LINE__, android::base::WARNING, nullptr, -1).stream()
      << text;
}

// The process-wide store. Deliberately never destroyed, so that property
// calls made while other static objects are torn down stay valid.
class PropertyStore {
 public:
  static PropertyStore& Instance() {
    static PropertyStore* const store = new PropertyStore();
    return *store;
  }

  // The stored value, or the empty string when the key is unset.
  std::string Read(std::string_view key) const {
    std::lock_guard<std::mutex> lock(mu_);
    auto it = values_.find(key);
    return it == values_.end() ? std::string() : it->second;
  }

  int Write(std::string_view key, std::string_view value) {
    if (!IsValidKey(key) || value.size() > kMaxValueLength) return -1;
    std::lock_guard<std::mutex> lock(mu_);
    auto it = values_.find(key);
    if (it == values_.end()) {
      values_.emplace(std::string(key), std::string(value));
      return 0;
    }
    // Read-only properties keep their first non-empty value.
    if (key.substr(0, 3) == "ro." && !it->second.empty()) return -1;
    it->second.assign(value);
    return 0;
  }

 private:
  PropertyStore() {
    const char* path = getenv(kSeedFileVariable);
    if (path != nullptr && *path != '\0') Seed(path);
  }

  // Reads `path` line by line. Only a regular file is read, and it is read
  // without ever holding more than one bounded line, so that a FIFO, a device
  // or a huge line can neither stall nor exhaust the process on its first
  // property call.
  void Seed(const std::string& path) {
    const std::string where = Quote(path, kQuotedPathLength);
    // Non-blocking, so that opening a FIFO without a writer returns at once.
    const int fd = open(path.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    if (fd < 0) {
      Warn("cannot read property file " + where + " named by " + kSeedFileVariable);
      return;
    }
    struct stat info;
    if (fstat(fd, &info) != 0 || !S_ISREG(info.st_mode)) {
      Warn("property file " + where + " named by " + kSeedFileVariable +
           " is not a regular file; ignored");
      close(fd);
      return;
    }
    std::string line;   // the first kMaxSeedLineLength + 1 bytes of the line
    size_t length = 0;  // the whole line's length
    size_t number = 0;
    char buffer[4096];
    for (;;) {
      const ssize_t n = read(fd, buffer, sizeof(buffer));
      if (n < 0 && errno == EINTR) continue;
      if (n < 0) {
        Warn(where + ": read error after line " + std::to_string(number) + " (errno " +
             std::to_string(errno) + "); the rest is ignored");
        break;
      }
      if (n == 0) break;
      for (ssize_t i = 0; i < n; ++i) {
        if (buffer[i] == '\n') {
          SeedLine(where, ++number, line, length);
          line.clear();
          length = 0;
        } else {
          if (length++ <= kMaxSeedLineLength) line.push_back(buffer[i]);
        }
      }
    }
    if (length > 0) SeedLine(where, ++number, line, length);
    close(fd);
  }

  // One line of a seed file: `line` holds at most kMaxSeedLineLength + 1 of
  // its `length` bytes.
  void SeedLine(const std::string& where, size_t number, std::string_view line, size_t length) {
    const std::string_view text = Trim(line);
    if (!text.empty() && text.front() == '#') return;  // a comment, however long
    const std::string prefix = where + ":" + std::to_string(number) + ": ";
    if (length > kMaxSeedLineLength) {
      Warn(prefix + "ignored property line of " + std::to_string(length) +
           " bytes (longest taken: " + std::to_string(kMaxSeedLineLength) +
           "): " + Quote(text, kQuotedLineLength));
      return;
    }
    if (text.empty()) return;
    // A value with a NUL byte would read back shorter than its length.
    if (text.find('\0') != std::string_view::npos) {
      Warn(prefix + "ignored property line with a NUL byte: " + Quote(text, kQuotedLineLength));
      return;
    }
    const size_t eq = text.find('=');
    if (eq == std::string_view::npos ||
        Write(Trim(text.substr(0, eq)), Trim(text.substr(eq + 1))) != 0) {
      Warn(prefix + "ignored property line: " + Quote(text, kQuotedLineLength));
    }
  }

  mutable std::mutex mu_;
  std::map<std::string, std::string, std::less<>> values_;
};

size_t CopyOut(std::string_view text, char* out) {
  const size_t n = text.size() < kMaxValueLength ? text.size() : kMaxValueLength;
  if (n > 0) memcpy(out, text.data(), n);  // an empty view may have no data pointer
  out[n] = '\0';
  return n;
}

bool ParseBool(std::string_view text, bool* out) {
  if (text == "1" || text == "y" || text == "yes" || text == "on" || text == "true") {
    *out = true;
    return true;
  }
  if (text == "0" || text == "n" || text == "no" || text == "off" || text == "false") {
    *out = false;
    return true;
  }
  return false;
}

}  // namespace

extern "C" {

int property_get(const char* key, char* value, const char* default_value) {
  const std::string stored = key != nullptr ? PropertyStore::Instance().Read(key) : std::string();
  if (!stored.empty()) return static_cast<int>(CopyOut(stored, value));
  return static_cast<int>(CopyOut(
      default_value != nullptr ? std::string_view(default_value) : std::string_view(), value));
}

int property_set(const char* key, const char* value) {
  if (key == nullptr) return -1;
  return PropertyStore::Instance().Write(key, value != nullptr ? value : "");
}

int8_t property_get_bool(const char* key, int8_t default_value) {
  if (key == nullptr) return default_value;
  bool result = false;
  if (!ParseBool(PropertyStore::Instance().Read(key), &result)) return default_value;
  return result ? 1 : 0;
}

}  // extern "C"
