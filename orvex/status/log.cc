#include "orvex/status/log.h"

#include <memory>

namespace orvex {
namespace log_internal {

FatalLogLine::FatalLogLine(const char* unit, int line) : unit_(unit), line_(line) {}

FatalLogLine::FatalLogLine(const char* unit, int line, std::string* check_text)
    : unit_(unit), line_(line) {
  std::unique_ptr<std::string> text(check_text);
  stream_ << "Check failed: " << *text;
}

FatalLogLine::~FatalLogLine() {
  ErrnoSaver errno_saver;
  if (android::base::ShouldLog(android::base::FATAL, nullptr)) {
    android::base::LogMessage(unit_, static_cast<unsigned>(line_), android::base::FATAL, nullptr,
                              -1)
            .stream()
        << stream_.str();
  }
  // The platform ends the process on a FATAL line; make sure of it even if a
  // logger was configured not to.
  std::abort();
}

}  // namespace log_internal
}  // namespace orvex
