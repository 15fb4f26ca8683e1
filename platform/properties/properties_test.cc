#include "cutils/properties.h"

#include <stdlib.h>
#include <unistd.h>

#include <fstream>
#include <string>
#include <thread>
#include <vector>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "platform/testing/reexec_death_test.h"

namespace {

std::string Get(const char* key, const char* default_value = nullptr) {
  char value[PROPERTY_VALUE_MAX];
  memset(value, 'x', sizeof(value));
  const int length = property_get(key, value, default_value);
  EXPECT_EQ(static_cast<size_t>(length), strlen(value)) << key;
  return value;
}

TEST(HostPropertiesTest, SetGetAndEmptyReadsAsUnset) {
  EXPECT_EQ(Get("test.props.unset"), "");
  EXPECT_EQ(Get("test.props.unset", "fallback"), "fallback");
  ASSERT_EQ(property_set("test.props.a", "value 1"), 0);
  EXPECT_EQ(Get("test.props.a", "fallback"), "value 1");
  ASSERT_EQ(property_set("test.props.a", ""), 0);
  EXPECT_EQ(Get("test.props.a"), "");
  EXPECT_EQ(Get("test.props.a", "fallback"), "fallback");
  ASSERT_EQ(property_set("test.props.a", nullptr), 0);
  EXPECT_EQ(Get("test.props.a", "d"), "d");
}

TEST(HostPropertiesTest, ValueLengthLimit) {
  const std::string longest(PROPERTY_VALUE_MAX - 1, 'v');
  ASSERT_EQ(property_set("test.props.len", longest.c_str()), 0);
  EXPECT_EQ(Get("test.props.len"), longest);
  const std::string too_long(PROPERTY_VALUE_MAX, 'w');
  EXPECT_EQ(property_set("test.props.len", too_long.c_str()), -1);
  EXPECT_EQ(Get("test.props.len"), longest);
  // A long default is cut to what fits in the caller's buffer.
  EXPECT_EQ(Get("test.props.len_unset", too_long.c_str()), too_long.substr(0, longest.size()));
}

TEST(HostPropertiesTest, KeyRules) {
  for (const char* key : {"", ".a", "a.", "a..b", "a b", "a/b", "a=b", "\xc3\xa9"}) {
    SCOPED_TRACE(key);
    EXPECT_EQ(property_set(key, "1"), -1);
  }
  EXPECT_EQ(property_set(nullptr, "1"), -1);
  EXPECT_EQ(Get(nullptr, "d"), "d");
  EXPECT_EQ(property_set("vendor.camera.debug.camera_performance_analyzer.auto_dump_latency", "1"),
            0);
  EXPECT_EQ(property_set("a-b_c@d:e.F9", "1"), 0);

  EXPECT_EQ(property_set("ro.test.props.once", ""), 0);
  EXPECT_EQ(property_set("ro.test.props.once", "first"), 0);
  EXPECT_EQ(property_set("ro.test.props.once", "second"), -1);
  EXPECT_EQ(Get("ro.test.props.once"), "first");
}

TEST(HostPropertiesTest, GetBool) {
  struct Case {
    const char* value;
    int8_t expected_with_default_0;
    int8_t expected_with_default_1;
  };
  const Case cases[] = {{"1", 1, 1},    {"y", 1, 1},     {"yes", 1, 1},  {"on", 1, 1},
                        {"true", 1, 1}, {"0", 0, 0},     {"n", 0, 0},    {"no", 0, 0},
                        {"off", 0, 0},  {"false", 0, 0}, {"TRUE", 0, 1}, {"Yes", 0, 1},
                        {"2", 0, 1},    {" 1", 0, 1},    {"", 0, 1}};
  for (const Case& c : cases) {
    SCOPED_TRACE(c.value);
    ASSERT_EQ(property_set("test.props.bool", c.value), 0);
    EXPECT_EQ(property_get_bool("test.props.bool", 0), c.expected_with_default_0);
    EXPECT_EQ(property_get_bool("test.props.bool", 1), c.expected_with_default_1);
  }
  EXPECT_EQ(property_get_bool(nullptr, 1), 1);
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
        const std::string shared = Get("test.props.shared");
        ASSERT_FALSE(shared.empty());
      }
    });
  }
  for (auto& thread : threads) thread.join();
}

// The store is seeded once, on first use, so seeding runs in a fresh child
// process where nothing has touched the store yet.
TEST(HostPropertiesDeathTest, SeedsFromFileNamedByEnvironment) {
  orvex_testing::UseReexecDeathTests();
  std::string dir = ::testing::TempDir() + "orvex_props_XXXXXX";
  ASSERT_NE(mkdtemp(dir.data()), nullptr);
  const std::string path = dir + "/seed.prop";
  {
    std::ofstream out(path);
    out << "# comment line\n"
        << "\n"
        << "test.seed.plain=hello\n"
        << "  test.seed.spaced  =  two words  \n"
        << "test.seed.empty=\n"
        << "test.seed.equals=a=b\n"
        << "no equals sign here\n"
        << "bad..key=1\n"
        << "test.seed.long=" << std::string(PROPERTY_VALUE_MAX, 'z') << "\n"
        << "persist.vendor.camera.fatp.enable=true\n"
        << "test.seed.last=1";
  }
  EXPECT_EXIT(
      {
        setenv("ORVEX_PROPERTIES_FILE", path.c_str(), 1);
        const bool ok = Get("test.seed.plain") == "hello" &&
                        Get("test.seed.spaced") == "two words" &&
                        Get("test.seed.empty", "d") == "d" && Get("test.seed.equals") == "a=b" &&
                        Get("test.seed.long").empty() &&
                        property_get_bool("persist.vendor.camera.fatp.enable", 0) == 1 &&
                        Get("test.seed.last") == "1";
        _exit(ok ? 0 : 1);
      },
      ::testing::ExitedWithCode(0),
      "seed.prop:7: ignored property line: no equals sign here(.|\n)*"
      "seed.prop:8: ignored property line: bad..key=1(.|\n)*seed.prop:9: ignored");
  EXPECT_EXIT(
      {
        setenv("ORVEX_PROPERTIES_FILE", (path + ".missing").c_str(), 1);
        _exit(Get("test.seed.plain").empty() ? 0 : 1);
      },
      ::testing::ExitedWithCode(0), "cannot read property file .*seed.prop.missing");
  unlink(path.c_str());
  rmdir(dir.c_str());
}

}  // namespace
