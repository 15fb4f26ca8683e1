#ifndef PLATFORM_TESTING_REEXEC_DEATH_TEST_H_
#define PLATFORM_TESTING_REEXEC_DEATH_TEST_H_

// Test-only: switches the current death test to the "threadsafe" style, in
// which the child re-executes the test program and so starts with fresh
// process-wide state (read-once environment variables, singletons).
//
// Cross-built tests run under a user-mode emulator (qemu-user). There the
// re-execution is a host execve() of a foreign binary, which only works if
// the host registered the emulator with binfmt_misc. The build therefore
// passes the emulator's command line in ORVEX_TEST_EXEC_WRAPPER, and the
// child is started as "<wrapper> <test program> <arguments>" instead.

#include <cstdlib>
#include <sstream>
#include <string>
#include <vector>

#include "gtest/gtest.h"

namespace orvex_testing {

inline void UseReexecDeathTests() {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  const char* wrapper = std::getenv("ORVEX_TEST_EXEC_WRAPPER");
  if (wrapper == nullptr || *wrapper == '\0') return;
  std::vector<std::string> argv;
  std::istringstream words(wrapper);
  for (std::string word; words >> word;) argv.push_back(word);
  for (const std::string& arg : ::testing::internal::GetArgvs()) argv.push_back(arg);
  ::testing::internal::SetInjectableArgvs(argv);
}

}  // namespace orvex_testing

#endif  // PLATFORM_TESTING_REEXEC_DEATH_TEST_H_
