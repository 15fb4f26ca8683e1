#include "orvex/base/path.h"

#include <limits.h>
#include <stdlib.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <string>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::IsOk;

TEST(PathTest, SplitFunctions) {
  struct Case {
    std::string_view path, dir, base, ext;
  };
  // clang-format off
  const Case cases[] = {
      {"", "", "", ""}, {"x", "", "x", ""}, {"/", "/", "", ""}, {"/x", "/", "x", ""},
      {"//x", "/", "x", ""}, {"a/b", "a", "b", ""}, {"a/b/", "a/b", "", ""},
      {"/a/b.c", "/a", "b.c", "c"}, {"a.b/c", "a.b", "c", ""}, {"a/.rc", "a", ".rc", "rc"},
      {"f.tar.gz", "", "f.tar.gz", "gz"}, {"dot.", "", "dot.", ""}};
  // clang-format on
  for (const Case& c : cases) {
    SCOPED_TRACE(c.path);
    EXPECT_EQ(Dirname(c.path), c.dir);
    EXPECT_EQ(Basename(c.path), c.base);
    EXPECT_EQ(SplitPath(c.path), std::make_pair(c.dir, c.base));
    EXPECT_EQ(Extension(c.path), c.ext);
  }
}

TEST(PathTest, AddSlashAndJoinPath) {
  EXPECT_EQ(AddSlash(""), "");
  EXPECT_EQ(AddSlash("a"), "a/");
  EXPECT_EQ(AddSlash("a/"), "a/");
  struct Case {
    std::string_view a, b, joined;
  };
  // clang-format off
  const Case cases[] = {
      {"", "", ""}, {"", "b", "b"}, {"a", "", "a"}, {"a", "b", "a/b"}, {"a/", "b", "a/b"},
      {"a", "/b", "a/b"}, {"a/", "/b", "a/b"}, {"/", "/x", "/x"}, {"/", "x", "/x"},
      {"a", "/", "a/"}, {"/data/vendor", "camera/profiler", "/data/vendor/camera/profiler"}};
  // clang-format on
  for (const Case& c : cases) {
    SCOPED_TRACE(std::string(c.a) + " + " + std::string(c.b));
    EXPECT_EQ(JoinPath(c.a, c.b), c.joined);
  }
}

TEST(PathTest, CleanPath) {
  struct Case {
    std::string_view in, out;
  };
  // clang-format off
  const Case cases[] = {
      {"", "."}, {".", "."}, {"./", "."}, {"/", "/"}, {"//", "/"}, {"a//b/./c/../", "a/b"},
      {"/../x", "/x"}, {"/../../x/..", "/"}, {"../x", "../x"}, {"../../x", "../../x"},
      {"a/../../x", "../x"}, {"a/..", "."}, {"a/b/../../..", ".."}, {"/a/b/", "/a/b"},
      {"x/./y/.", "x/y"}, {"...", "..."}, {"a/..b", "a/..b"}, {"/a/../..", "/"}};
  // clang-format on
  for (const Case& c : cases) {
    SCOPED_TRACE(c.in);
    EXPECT_EQ(CleanPath(c.in), c.out);
    EXPECT_EQ(CleanPath(c.out), c.out);
  }
}

// Reversed, every byte XORed with one key chosen by the length modulo 8.
TEST(PathTest, ObfuscateReversesWithOneKeyPerLength) {
  EXPECT_EQ(Obfuscate(""), "");
  for (const std::string text : {"a", "123456789", "ab", "\xff\x01 binary\x80", "odd length"}) {
    SCOPED_TRACE(text);
    const std::string scrambled = Obfuscate(text);
    ASSERT_EQ(scrambled.size(), text.size());
    EXPECT_EQ(Deobfuscate(scrambled), text);
    const char key = static_cast<char>(scrambled.back() ^ text.front());
    for (size_t i = 0; i < text.size(); ++i) EXPECT_EQ(scrambled.rbegin()[i], text[i] ^ key);
  }
  EXPECT_EQ(Obfuscate("a")[0] ^ 'a', Obfuscate("123456789")[0] ^ '9');
  EXPECT_NE(Obfuscate("a")[0] ^ 'a', Obfuscate("ab")[0] ^ 'b');
}

bool IsDir(const std::string& path) {
  struct stat info;
  return stat(path.c_str(), &info) == 0 && S_ISDIR(info.st_mode);
}

TEST(PathDirTest, RecursivelyCreateDir) {
  std::string r = ::testing::TempDir() + "orvex_path_XXXXXX";
  ASSERT_NE(mkdtemp(r.data()), nullptr);
  std::ofstream(r + "/file") << "x";
  ASSERT_EQ(symlink("missing", (r + "/dangling").c_str()), 0);
  ASSERT_EQ(symlink("loop", (r + "/loop").c_str()), 0);
  ASSERT_EQ(mkdir((r + "/dir").c_str(), 0777), 0);
  ASSERT_EQ(symlink("dir", (r + "/to_dir").c_str()), 0);
  std::string too_long = r, deep = r;
  while (too_long.size() < 400000) too_long += "/d";
  while (deep.size() + 61 < PATH_MAX) deep += "/" + std::string(60, 'd');
  const std::string exists = "ALREADY_EXISTS: Error creating directory " + r;
  struct Case {
    std::string path;
    std::string result;  // "OK" or a regular expression for the error
  };
  // clang-format off
  const Case cases[] = {
      {"", "OK"}, {".", "OK"}, {"/", "OK"}, {r + "/a/b/c", "OK"}, {r + "/a/b/c", "OK"},
      {r + "//a/./b/x/../", "OK"}, {r + "/a/b/d/", "OK"}, {r + "/to_dir/sub", "OK"},
      {r + "/o/" + std::string(NAME_MAX, 'n'), "OK"}, {deep, "OK"},
      {r + "/file", exists + "/file: File exists"},
      {r + "/file/sub/dir", exists + "/file: File exists"},
      {r + "/dangling", exists + "/dangling: File exists"},
      {r + "/dangling/sub", exists + "/dangling: File exists"},
      {r + "/loop/sub", exists + "/loop: File exists"},
      {r + std::string("/n\0/x", 5),
       "INVALID_ARGUMENT: Error creating directory .*/n\\\\x00/x: path contains a NUL byte"},
      {r + "/p/" + std::string(NAME_MAX + 1, 'n') + "/e",
       "INVALID_ARGUMENT: Error creating directory .*/p/n+/e: File name too long"},
      {too_long, "INVALID_ARGUMENT: Error creating directory " + r + "/d/d/.*: File name too "
                 "long"}};
  // clang-format on
  const mode_t old_mask = umask(022);
  for (const Case& c : cases) {
    SCOPED_TRACE(c.path.substr(0, 200));
    const Status status = RecursivelyCreateDir(c.path);
    EXPECT_THAT(status.ToString(), ::testing::MatchesRegex(c.result));
    EXPECT_TRUE(!status.ok() || IsDir(CleanPath(c.path)));
  }
  umask(old_mask);
  struct stat info;
  ASSERT_EQ(stat((r + "/a/b/c").c_str(), &info), 0);
  EXPECT_EQ(info.st_mode & 0777, 0755u);
  for (const char* made_by_mistake : {"/a/b/x", "/missing", "/n", "/p", "/d"}) {
    EXPECT_FALSE(IsDir(r + made_by_mistake)) << made_by_mistake;
  }
  std::filesystem::remove_all(r);
}

}  // namespace
}  // namespace orvex
