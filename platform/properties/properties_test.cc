#include "cutils/properties.h"

#include <stdlib.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
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
  struct Case {
    std::string key, value;
    int result;
    std::string read;
  };
  // clang-format off
  const Case cases[] = {
      {"test.props.a", "value 1", 0, "value 1"}, {"test.props.a", "", 0, "d"},  // empty: unset
      {"test.props.len", longest, 0, longest}, {"test.props.len", too_long, -1, longest},
      {"ro.test.props.once", "", 0, "d"}, {"ro.test.props.once", "first", 0, "first"},
      {"ro.test.props.once", "second", -1, "first"}, {"a-b_c@d:e.F9zZA", "1", 0, "1"},
      {"", "1", -1, "d"}, {".a", "1", -1, "d"}, {"a.", "1", -1, "d"}, {"a..b", "1", -1, "d"},
      {"a b", "1", -1, "d"}, {"a/b", "1", -1, "d"}, {"a=b", "1", -1, "d"},
      {"\xc3\xa9", "1", -1, "d"}};
  // clang-format on
  for (const Case& c : cases) {
    SCOPED_TRACE(c.key + " = " + c.value);
    EXPECT_EQ(property_set(c.key.c_str(), c.value.c_str()), c.result);
    EXPECT_EQ(Get(c.key.c_str(), "d"), c.read);
  }
  EXPECT_EQ(Get("test.props.unset"), "");
  // A long default is cut to what fits in the caller's buffer.
  EXPECT_EQ(Get("test.props.unset", too_long.c_str()), too_long.substr(1));
  ASSERT_EQ(property_set("test.props.a", "x"), 0);
  EXPECT_EQ(property_set("test.props.a", nullptr), 0);
  EXPECT_EQ(Get("test.props.a", "d"), "d");
  EXPECT_EQ(property_set(nullptr, "1"), -1);
  EXPECT_EQ(Get(nullptr, "d"), "d");
  EXPECT_EQ(property_get_bool(nullptr, 1), 1);
}

// The first five values read as true, the next five as false, the rest as
// the default.
TEST(HostPropertiesTest, GetBool) {
  const char* const values[] = {"1",   "y",     "yes",  "on",  "true", "0",  "n", "no",
                                "off", "false", "TRUE", "Yes", "2",    " 1", ""};
  for (int i = 0; i < 15; ++i) {
    SCOPED_TRACE(values[i]);
    ASSERT_EQ(property_set("test.props.bool", values[i]), 0);
    EXPECT_EQ(property_get_bool("test.props.bool", 0), i < 5 ? 1 : 0);
    EXPECT_EQ(property_get_bool("test.props.bool", 1), i < 5 || i >= 10 ? 1 : 0);
  }
}

TEST(HostPropertiesTest, ConcurrentWritersAndReaders) {
  std::vector<std::thread> threads;
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([t] {
      const std::string key = "test.props.thread" + std::to_string(t);
      for (int i = 0; i < 500; ++i) {
        const std::string value = std::to_string(i);
        ASSERT_EQ(property_set(key.c_str(), value.c_str()), 0);
        ASSERT_EQ(Get(key.c_str()), value);
        ASSERT_EQ(property_set("test.props.shared", value.c_str()), 0);
        ASSERT_FALSE(Get("test.props.shared").empty());
      }
    });
  }
  for (auto& thread : threads) thread.join();
}

// Caps the address space a little above what is mapped now, so that an
// unbounded read fails fast instead of eating the host's memory. Sanitizer
// runtimes and an emulator reserve far more than they map, so not there.
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

// Writes the seed file "seed.prop" and a FIFO "fifo" into `dir`.
bool WriteSeedFiles(const std::string& dir) {
  std::ofstream out(dir + "/seed.prop", std::ios::binary);
  out << "# comment line\n\ntest.seed.plain=hello\n  test.seed.spaced  =  two words  \n"
      << "test.seed.empty=\ntest.seed.equals=a=b\nno equals sign here\nbad..key=1\n"
      << "test.seed.long=" << std::string(PROPERTY_VALUE_MAX, 'z') << "\n"
      << std::string("test.seed.nul=a\0b\n", 18) << "\x1b[2J\x7ftest.seed.esc=1\n"
      << "test.seed.huge=" << std::string(16 << 20, 'h') << "\n#" << std::string(1 << 20, 'c')
      << "\ntest.seed.edge=1" << std::string(1008, ' ')  // 1024 bytes: the longest taken
      << "\ntest.seed.last=1";
  out.close();
  return out && mkfifo((dir + "/fifo").c_str(), 0600) == 0;
}

// The store is seeded once, on first use, so each source is read in a fresh
// child process, under a time and a memory bound.
TEST(HostPropertiesDeathTest, SeedsFromFileNamedByEnvironment) {
  orvex_testing::UseReexecDeathTests();
  const auto refused = HasSubstr(" named by ORVEX_PROPERTIES_FILE is not a regular file; ignored");
  struct Case {
    std::string file;  // relative to a scratch directory
    ::testing::Matcher<const std::string&> log;
  };
  const Case cases[] = {
      {"seed.prop",
       AllOf(HasSubstr("seed.prop:7: ignored property line: no equals sign here\n"),
             HasSubstr("seed.prop:8: ignored property line: bad..key=1\n"),
             ContainsRegex("seed.prop:9: ignored property line: test.seed.long=z{65}\\.\\.\\.\n"),
             HasSubstr(
                 "seed.prop:10: ignored property line with a NUL byte: test.seed.nul=a\\x00b\n"),
             HasSubstr("seed.prop:11: ignored property line: \\x1b[2J\\x7ftest.seed.esc=1\n"),
             ContainsRegex("seed.prop:12: ignored property line of 16777231 bytes .*: "
                           "test.seed.huge=h{65}\\.\\.\\.\n"),
             Not(HasSubstr(":13:")), Not(HasSubstr(":14:")), Not(HasSubstr("read error")),
             Not(HasSubstr("\x1b")))},
      {"missing", ContainsRegex("cannot read property file .*/missing named by")},
      {"fifo", refused},
      {"/dev/zero", refused},
      {".", refused}};
  for (const Case& c : cases) {
    SCOPED_TRACE(c.file);
    EXPECT_EXIT(
        {
          std::string dir = ::testing::TempDir() + "orvex_props_XXXXXX";
          if (mkdtemp(dir.data()) == nullptr || !WriteSeedFiles(dir)) _exit(2);
          alarm(30);
          LimitAddressSpace();
          const std::string file = c.file.front() == '/' ? c.file : dir + "/" + c.file;
          setenv("ORVEX_PROPERTIES_FILE", file.c_str(), 1);
          std::string values;
          for (const char* key :
               {"plain", "spaced", "empty", "equals", "long", "nul", "huge", "edge", "last"}) {
            values += Get((std::string("test.seed.") + key).c_str()) + "|";
          }
          const bool ok =
              values == (c.file == "seed.prop" ? "hello|two words||a=b||||1|1|" : "|||||||||");
          std::filesystem::remove_all(dir);
          _exit(ok ? 0 : 1);
        },
        ::testing::ExitedWithCode(0), c.log);
  }
}

}  // namespace
