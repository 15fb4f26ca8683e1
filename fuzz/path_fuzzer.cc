// The path helpers on arbitrary text, checked against their contracts in
// orvex/base/path.h: CleanPath gives an idempotent canonical form that keeps
// an absolute path absolute and adds no ".."; Dirname, Basename, SplitPath,
// Extension, AddSlash and JoinPath agree with each other; Obfuscate is its
// own inverse.

#include <fuzzer/FuzzedDataProvider.h>

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "orvex/base/path.h"
#include "orvex/status/log.h"

namespace {

std::vector<std::string_view> Components(std::string_view path) {
  std::vector<std::string_view> parts;
  size_t start = 0;
  while (start <= path.size()) {
    size_t end = path.find('/', start);
    if (end == std::string_view::npos) end = path.size();
    parts.push_back(path.substr(start, end - start));
    start = end + 1;
  }
  return parts;
}

size_t CountDotDot(std::string_view path) {
  size_t n = 0;
  for (std::string_view part : Components(path)) n += part == "..";
  return n;
}

void CheckClean(std::string_view path) {
  const std::string clean = orvex::CleanPath(path);
  ORVEX_CHECK(orvex::CleanPath(clean) == clean) << "'" << path << "' -> '" << clean << "'";
  ORVEX_CHECK(!clean.empty());
  const bool absolute = !path.empty() && path.front() == '/';
  ORVEX_CHECK_EQ(absolute, clean.front() == '/') << "'" << path << "' -> '" << clean << "'";
  ORVEX_CHECK_LE(CountDotDot(clean), CountDotDot(path)) << "'" << path << "' -> '" << clean << "'";
  if (clean == "/" || clean == ".") return;
  // Canonical form: no empty or "." component, ".." only as a leading run
  // of a relative path.
  std::string_view body = clean;
  if (absolute) body.remove_prefix(1);
  bool leading = !absolute;
  for (std::string_view part : Components(body)) {
    ORVEX_CHECK(!part.empty() && part != ".") << "'" << path << "' -> '" << clean << "'";
    if (part != "..") leading = false;
    ORVEX_CHECK(part != ".." || leading) << "'" << path << "' -> '" << clean << "'";
  }
}

void CheckSplit(std::string_view path) {
  const std::string_view dir = orvex::Dirname(path);
  const std::string_view base = orvex::Basename(path);
  const auto split = orvex::SplitPath(path);
  ORVEX_CHECK(split.first == dir && split.second == base) << "'" << path << "'";
  ORVEX_CHECK(base.find('/') == std::string_view::npos) << "'" << path << "'";
  ORVEX_CHECK(path.ends_with(base)) << "'" << path << "'";
  const size_t slash = path.rfind('/');
  if (slash == std::string_view::npos) {
    ORVEX_CHECK(dir.empty() && base == path) << "'" << path << "'";
  } else if (slash == 0) {
    ORVEX_CHECK(dir == "/") << "'" << path << "'";
  } else {
    ORVEX_CHECK(std::string(dir) + "/" + std::string(base) == path) << "'" << path << "'";
  }
  // Joining the parts back gives the same path up to doubled or trailing
  // slashes, and exactly the path when it has neither.
  const std::string joined = orvex::JoinPath(dir, base);
  ORVEX_CHECK(orvex::CleanPath(joined) == orvex::CleanPath(path))
      << "'" << path << "' -> '" << joined << "'";
  if (!base.empty() && path.find("//") == std::string_view::npos) {
    ORVEX_CHECK(joined == path) << "'" << path << "' -> '" << joined << "'";
  }
  const std::string_view ext = orvex::Extension(path);
  ORVEX_CHECK(base.ends_with(ext) && ext.find('.') == std::string_view::npos) << "'" << path << "'";
  ORVEX_CHECK(ext.empty() || base.size() > ext.size()) << "'" << path << "'";
}

void CheckJoin(std::string_view a, std::string_view b) {
  const std::string joined = orvex::JoinPath(a, b);
  if (a.empty() || b.empty()) {
    ORVEX_CHECK(joined == (a.empty() ? b : a)) << "'" << a << "' + '" << b << "'";
    return;
  }
  ORVEX_CHECK(orvex::CleanPath(joined) == orvex::CleanPath(std::string(a) + "/" + std::string(b)))
      << "'" << a << "' + '" << b << "' -> '" << joined << "'";
  ORVEX_CHECK(orvex::Basename(joined) == orvex::Basename(b))
      << "'" << a << "' + '" << b << "' -> '" << joined << "'";
  ORVEX_CHECK(joined.size() + 1 >= a.size() + b.size() && joined.size() <= a.size() + b.size() + 1)
      << "'" << a << "' + '" << b << "' -> '" << joined << "'";

  const std::string slashed = orvex::AddSlash(a);
  ORVEX_CHECK(slashed == (a.back() == '/' ? std::string(a) : std::string(a) + "/"));
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  FuzzedDataProvider in(data, size);
  const std::string a = in.ConsumeRandomLengthString(512);
  const std::string b = in.ConsumeRandomLengthString(512);
  for (const std::string& path : {a, b}) {
    CheckClean(path);
    CheckSplit(path);
    const std::string scrambled = orvex::Obfuscate(path);
    ORVEX_CHECK_EQ(scrambled.size(), path.size());
    ORVEX_CHECK(orvex::Deobfuscate(scrambled) == path);
  }
  CheckJoin(a, b);
  ORVEX_CHECK(orvex::AddSlash("").empty());
  return 0;
}
