// Linked into every test program of a coverage build. A FATAL line ends the
// process with abort(), which skips the exit handler that writes the
// coverage counters, so the code a death test runs would count as never
// executed. This handler writes the counters first, then lets the signal
// end the process as before.
#include <csignal>

// From libgcov (gcov.h declares it without C linkage).
extern "C" void __gcov_dump(void);  // NOLINT(bugprone-reserved-identifier)

namespace {

extern "C" void FlushCoverageAndAbort(int signal_number) {
  __gcov_dump();
  std::signal(signal_number, SIG_DFL);
  std::raise(signal_number);
}

[[maybe_unused]] const bool kInstalled = [] {
  std::signal(SIGABRT, FlushCoverageAndAbort);
  return true;
}();

}  // namespace
