#include "cutils/properties.h"

#include <errno.h>
#include <stdlib.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <thread>
#include <vector>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "platform/testing/reexec_death_test.h"

namespace {

using ::testing::AllOf;
using ::testing::ContainsRegex;
using ::testing::HasSubstr;
using ::testing::Not;

std::string Get(const char* key, const char* default_value = nullptr) {
  char value[PROPERTY_VALUE_MAX];
  memset(value, 'x', sizeof(value));
  const int length = property_get(key, value, default_value);
  EXPECT_EQ(static_cast<size_t>(length), strlen(value)) << key;
  return value;
}

// Each row sets a value, then reads it back with the default "d".
TEST(HostPropertiesTest, SetThenGet) {
  const std::string longest(PROPERTY_VALUE_MAX - 1, 'v');
  const std::string too_long(PROPERTY_VALUE_MAX, 'w');
  // clang-format off
  const struct { const char *key, *value; int result; std::string read; } cases[] = {
      {"test.props.a", "value 1", 0, "value 1"}, {"test.props.a", "", 0, "d"},  // empty: unset
      {"test.props.a", "x", 0, "x"}, {"test.props.a", nullptr, 0, "d"}, {nullptr, "1", -1, "d"},
      {"test.props.len", longest.c_str(), 0, longest},
      {"test.props.len", too_long.c_str(), -1, longest},
      {"ro.test.props.once", "", 0, "d"}, {"ro.test.props.once", "first", 0, "first"},
      {"ro.test.props.once", "second", -1, "first"}, {"a-b_c@d:e.F09zZA", "1", 0, "1"},
      {"", "1", -1, "d"}, {".a", "1", -1, "d"}, {"a.", "1", -1, "d"}, {"a..b", "1", -1, "d"},
      {"a b", "1", -1, "d"}, {"\xc3\xa9", "1", -1, "d"}};
  // clang-format on
  for (const auto& c : cases) {
    SCOPED_TRACE(::testing::PrintToString(c.key) + " = " + ::testing::PrintToString(c.value));
    EXPECT_EQ(property_set(c.key, c.value), c.result);
    EXPECT_EQ(Get(c.key, "d"), c.read);
  }
  EXPECT_EQ(Get("test.props.unset"), "");
  // A long default is cut to what fits in the caller's buffer.
  EXPECT_EQ(Get("test.props.unset", too_long.c_str()), too_long.substr(1));
  // The first five values read as true, the next five as false, the rest as the default.
  const char* const values[] = {"1",  "y",   "yes",   "on",   "true", "0", "n",
                                "no", "off", "false", "TRUE", " 1",   ""};
  for (size_t i = 0; i < std::size(values); ++i) {
    SCOPED_TRACE(values[i]);
    ASSERT_EQ(property_set("test.props.bool", values[i]), 0);
    EXPECT_EQ(property_get_bool("test.props.bool", 0), i < 5 ? 1 : 0);
    EXPECT_EQ(property_get_bool("test.props.bool", 1), i < 5 || i >= 10 ? 1 : 0);
  }
  EXPECT_EQ(property_get_bool(nullptr, 1), 1);
}

// Each thread writes its own key and a shared one, and reads both back.
TEST(HostPropertiesTest, ConcurrentWritersAndReaders) {
  std::vector<std::thread> threads;
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([key = "test.props.thread" + std::to_string(t)] {
      for (int i = 0; i < 500; ++i) {
        const std::string value = std::to_string(i);
        ASSERT_EQ(property_set(key.c_str(), value.c_str()), 0);
        ASSERT_EQ(property_set("test.props.shared", "x"), 0);
        ASSERT_EQ(Get(key.c_str()) + Get("test.props.shared"), value + "x");
      }
    });
  }
  for (auto& thread : threads) thread.join();
}

// Caps the address space a little above what is mapped now: an unbounded read
// fails fast (not with sanitizers or an emulator, which reserve far more).
void LimitAddressSpace() {
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)
  if (getenv("ORVEX_TEST_EXEC_WRAPPER") != nullptr) return;
  rlim_t pages = 0;
  std::ifstream("/proc/self/statm") >> pages;
  const rlim_t bytes = pages * static_cast<rlim_t>(sysconf(_SC_PAGESIZE)) + (8 << 20);
  const struct rlimit limit = {bytes, bytes};
  setrlimit(RLIMIT_AS, &limit);
#endif
}

// The store is seeded on first use: each source is read in a fresh child, time and memory bound.
TEST(HostPropertiesDeathTest, SeedsFromFileNamedByEnvironment) {
  orvex_testing::UseReexecDeathTests();
  const auto refused = HasSubstr(" named by ORVEX_PROPERTIES_FILE is not a regular file; ignored");
  const std::pair<std::string, ::testing::Matcher<const std::string&>> cases[] = {
      {"seed.prop",
       AllOf(
           HasSubstr("seed.prop:7: ignored property line: no equals sign here\n"),
           HasSubstr("seed.prop:8: ignored property line: bad..key=1\n"),
           HasSubstr("seed.prop:9: ignored property line with a NUL byte: test.seed.nul=a\\x00b\n"),
           HasSubstr("seed.prop:10: ignored property line: \\x1b[2J\\x7ftest.seed.esc=1\n"),
           ContainsRegex("seed.prop:11: ignored property line of 16777231 bytes .*: "
                         "test.seed.huge=h{65}\\.\\.\\.\n"),
           Not(HasSubstr("prop:12:")), Not(HasSubstr("prop:13:")), Not(HasSubstr("read error")),
           Not(HasSubstr("\x1b")))},
      {"missing", ContainsRegex("cannot read property file .*/missing named by")},
      {"/proc/self/mem", HasSubstr("/proc/self/mem: read error after line 0 (errno ")},
      {"fifo", refused},
      {"/dev/zero", refused}};
  for (const auto& [file, log] : cases) {
    SCOPED_TRACE(file);
    EXPECT_EXIT(
        {
          std::string dir = ::testing::TempDir() + "orvex_props_XXXXXX";
          if (mkdtemp(dir.data()) == nullptr || mkfifo((dir + "/fifo").c_str(), 0600) != 0) {
            _exit(2);
          }
          std::ofstream(dir + "/seed.prop", std::ios::binary)
              << "# comment line\n\ntest.seed.plain=hello\n  test.seed.spaced  =  two words  \n"
              << "test.seed.empty=\ntest.seed.equals=a=b\nno equals sign here\nbad..key=1\n"
              << std::string("test.seed.nul=a\0b\n", 18) << "\x1b[2J\x7ftest.seed.esc=1\n"
              << "test.seed.huge=" << std::string(16 << 20, 'h') << "\n#"
              << std::string(1 << 20, 'c') << "\ntest.seed.edge=1"
              << std::string(1008, ' ')  // 1024 bytes: the longest taken
              << "\ntest.seed.last=1";
          alarm(30);
          LimitAddressSpace();
          setenv("ORVEX_PROPERTIES_FILE", (file[0] == '/' ? file : dir + "/" + file).c_str(), 1);
          close(STDIN_FILENO);  // the file may open as descriptor 0
          errno = EINTR;        // left over: the end of the file still ends the read
          std::string values;
          for (const char* key : {"plain", "spaced", "equals", "nul", "huge", "edge", "last"}) {
            values += Get((std::string("test.seed.") + key).c_str()) + "|";
          }
          const bool ok =
              values == (file == "seed.prop" ? "hello|two words|a=b|||1|1|" : "|||||||");
          std::filesystem::remove_all(dir);
          _exit(ok ? 0 : 1);
        },
        ::testing::ExitedWithCode(0), log);
  }
}

}  // namespace
