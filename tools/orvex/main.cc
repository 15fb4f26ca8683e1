// The orvex developer tool. See tool.h for the commands and exit status.

#include <stdlib.h>
#include <unistd.h>

#include <algorithm>
#include <iostream>
#include <string>
#include <vector>

#include "absl/strings/match.h"
#include "absl/strings/str_split.h"
#include "android-base/logging.h"
#include "tools/orvex/tool.h"

namespace {

// libbase reads the log threshold from ANDROID_LOG_TAGS as "*:<level>"
// words only, and ends the program on anything else, such as the per-tag
// levels common on devices.
bool HostLogTagsUsable(const char* tags) {
  if (tags == nullptr) return true;
  const std::vector<absl::string_view> words = absl::StrSplit(tags, ' ');
  return std::all_of(words.begin(), words.end(), [](absl::string_view word) {
    return word.size() == 3 && absl::StartsWith(word, "*:") &&
           absl::StrContains("vdiwefs", word.substr(2));
  });
}

}  // namespace

int main(int argc, char** argv) {
  if (const char* tags = getenv("ANDROID_LOG_TAGS"); !HostLogTagsUsable(tags)) {
    std::cerr << "orvex: ignoring ANDROID_LOG_TAGS=\"" << tags
              << "\": libbase takes only \"*:<level>\" (level v, d, i, w, e, f or s)\n";
    unsetenv("ANDROID_LOG_TAGS");
  }
  android::base::InitLogging(argv);
  std::vector<std::string> args(argv + 1, argv + argc);
  return orvex_tool::RunTool(args, STDOUT_FILENO, std::cerr, isatty(STDERR_FILENO) == 1);
}
