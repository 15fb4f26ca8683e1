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

TEST(PathTest, StringFunctions) {
  // clang-format off
  const struct { std::string_view path, dir, base, ext; } splits[] = {
      {"", "", "", ""}, {"x", "", "x", ""}, {"/", "/", "", ""}, {"/x", "/", "x", ""},
      {"//x", "/", "x", ""}, {"a/b", "a", "b", ""}, {"a/b/", "a/b", "", ""},
      {"/a/b.c", "/a", "b.c", "c"}, {"a.b/c", "a.b", "c", ""}, {"a/.rc", "a", ".rc", "rc"},
      {"f.tar.gz", "", "f.tar.gz", "gz"}, {"dot.", "", "dot.", ""}};
  const struct { std::string_view a, b, joined; } joins[] = {
      {"", "", ""}, {"", "b", "b"}, {"a", "", "a"}, {"a", "b", "a/b"}, {"a/", "b", "a/b"},
      {"a", "/b", "a/b"}, {"a/", "/b", "a/b"}, {"/", "/x", "/x"}, {"a", "/", "a/"}};
  const std::pair<std::string_view, std::string_view> cleans[] = {
      {"", "."}, {".", "."}, {"./", "."}, {"/", "/"}, {"//", "/"}, {"a//b/./c/../", "a/b"},
      {"/../x", "/x"}, {"/../../x/..", "/"}, {"../x", "../x"}, {"../../x", "../../x"},
      {"a/../../x", "../x"}, {"a/..", "."}, {"a/b/../../..", ".."}, {"/a/b/", "/a/b"},
      {"...", "..."}, {"a/..b", "a/..b"}, {"/a/../..", "/"}};
  // clang-format on
  for (const auto& c : splits) {
    SCOPED_TRACE(c.path);
    EXPECT_EQ(SplitPath(c.path), std::make_pair(c.dir, c.base));
    EXPECT_EQ(Dirname(c.path), c.dir);
    EXPECT_EQ(Basename(c.path), c.base);
    EXPECT_EQ(Extension(c.path), c.ext);
  }
  for (const auto& c : joins) EXPECT_EQ(JoinPath(c.a, c.b), c.joined) << c.a << " + " << c.b;
  for (const auto& [in, out] : cleans) {
    EXPECT_EQ(CleanPath(in), out) << in;
    EXPECT_EQ(CleanPath(out), out) << in;
  }
  for (const auto& [in, out] : {std::pair{"", ""}, {"a", "a/"}, {"a/", "a/"}}) {
    EXPECT_EQ(AddSlash(in), out) << in;
  }
}

// Reversed, every byte XORed with the key that the length modulo 8 picks.
TEST(PathTest, ObfuscateReversesWithOneKeyPerLength) {
  EXPECT_EQ(Obfuscate(""), "");
  for (const auto& [text, scrambled] : {std::pair<std::string, std::string>{"ab", "\x1c\x1f"},
                                        {"123456789", "\xfa\xfb\xf4\xf5\xf6\xf7\xf0\xf1\xf2"},
                                        {"\xff\x01 bin\x80", "\x01\xef\xe8\xe3\xa1\x80\x7e"}}) {
    EXPECT_EQ(Obfuscate(text), scrambled) << text;
    EXPECT_EQ(Deobfuscate(scrambled), text) << text;
  }
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
  ASSERT_EQ(mkdir((r + "/dir").c_str(), 0777), 0);
  ASSERT_EQ(symlink("dir", (r + "/to_dir").c_str()), 0);
  std::string too_long = r;
  while (too_long.size() < 400000) too_long += "/d";
  const std::string exists = "ALREADY_EXISTS: Error creating directory ";
  // Relative paths start from `r`.
  // clang-format off
  const std::pair<std::string, std::string> cases[] = {
      {"", "OK"}, {".", "OK"}, {"/", "OK"}, {r + "/a/b/c", "OK"}, {r + "/a/b/c", "OK"},
      {r + "//a/./b/x/../", "OK"}, {r + "/a/b/d/", "OK"}, {r + "/to_dir/sub", "OK"},
      {r + "/o/" + std::string(NAME_MAX, 'n'), "OK"}, {"rel/sub", "OK"},
      {r + "/file/sub/dir", exists + r + "/file: File exists"},
      {"file/sub", exists + "file: File exists"},
      {r + "/dangling/sub", exists + r + "/dangling: File exists"},
      {r + std::string("/n\0/x", 5),
       "INVALID_ARGUMENT: Error creating directory .*/n\\\\x00/x: path contains a NUL byte"},
      {r + "/p/" + std::string(NAME_MAX + 1, 'n') + "/e",
       "INVALID_ARGUMENT: Error creating directory .*/p/n+/e: File name too long"},
      {too_long, "INVALID_ARGUMENT: Error creating directory " + r + "/d/d/.*: File name too "
                 "long"}};
  // clang-format on
  const std::filesystem::path old_dir = std::filesystem::current_path();
  std::filesystem::current_path(r);
  const mode_t old_mask = umask(0);
  for (const auto& [path, result] : cases) {
    SCOPED_TRACE(path.substr(0, 200));
    const Status status = RecursivelyCreateDir(path);
    EXPECT_THAT(status.ToString(), ::testing::MatchesRegex(result));
    EXPECT_TRUE(!status.ok() || IsDir(CleanPath(path)));
  }
  umask(old_mask);
  std::filesystem::current_path(old_dir);
  struct stat info;
  ASSERT_EQ(stat((r + "/a/b/c").c_str(), &info), 0);
  EXPECT_EQ(info.st_mode & 0777, 0777u);
  for (const char* stray : {"/a/b/x", "/missing", "/n", "/p", "/d"}) EXPECT_FALSE(IsDir(r + stray));
  std::filesystem::remove_all(r);
}

}  // namespace
}  // namespace orvex
