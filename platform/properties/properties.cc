#include "cutils/properties.h"

#include <stdlib.h>
#include <string.h>

#include <fstream>
#include <functional>
#include <map>
#include <mutex>
#include <string>
#include <string_view>

#include "android-base/logging.h"

namespace {

constexpr size_t kMaxValueLength = PROPERTY_VALUE_MAX - 1;
constexpr const char kSeedFileVariable[] = "ORVEX_PROPERTIES_FILE";

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

  void Seed(const std::string& path) {
    std::ifstream in(path);
    if (!in) {
      Warn(std::string("cannot read property file ") + path + " named by " + kSeedFileVariable);
      return;
    }
    std::string line;
    int number = 0;
    while (std::getline(in, line)) {
      ++number;
      const std::string_view text = Trim(line);
      if (text.empty() || text.front() == '#') continue;
      const size_t eq = text.find('=');
      const std::string_view key = eq == std::string_view::npos ? text : Trim(text.substr(0, eq));
      const std::string_view value =
          eq == std::string_view::npos ? std::string_view() : Trim(text.substr(eq + 1));
      if (eq == std::string_view::npos || Write(key, value) != 0) {
        Warn(path + ":" + std::to_string(number) + ": ignored property line: " + std::string(text));
      }
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
