#include "orvex/base/path.h"

#include <limits.h>
#include <stdlib.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <random>
#include <string>
#include <vector>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/base/testing/scratch_mount.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::IsOk;
using ::orvex::testing::StatusIs;

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
  EXPECT_EQ(AddSlash("/"), "/");

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

TEST(PathTest, CleanPathExamples) {
  struct Case {
    std::string_view in, out;
  };
  // clang-format off
  const Case cases[] = {
      {"", "."}, {".", "."}, {"./", "."}, {"/", "/"}, {"//", "/"}, {"a//b/./c/../", "a/b"},
      {"/../x", "/x"}, {"/../../x/..", "/"}, {"../x", "../x"}, {"../../x", "../../x"},
      {"a/../../x", "../x"}, {"a/..", "."}, {"a/b/../../..", ".."}, {"/a/b/", "/a/b"},
      {"x/./y/.", "x/y"}, {"...", "..."}, {"a/..b", "a/..b"}};
  // clang-format on
  for (const Case& c : cases) {
    SCOPED_TRACE(c.in);
    EXPECT_EQ(CleanPath(c.in), c.out);
  }
}

int CountDotDot(std::string_view path) {
  int count = 0;
  size_t start = 0;
  while (start <= path.size()) {
    size_t end = path.find('/', start);
    if (end == std::string_view::npos) end = path.size();
    if (path.substr(start, end - start) == "..") ++count;
    start = end + 1;
  }
  return count;
}

// Laws over generated paths: idempotent, no more ".." than the input, an
// absolute path stays absolute (and only it), and no empty, "." or
// mid-path ".." component survives.
TEST(PathTest, CleanPathLaws) {
  std::mt19937 rng(1234);
  const std::vector<std::string> pieces = {"a", "bc", ".", "..", "", "/", "//", "x.y", "..."};
  for (int i = 0; i < 5000; ++i) {
    std::string path;
    const int n = static_cast<int>(rng() % 8);
    for (int j = 0; j < n; ++j) {
      path += pieces[rng() % pieces.size()];
      if (rng() % 3 != 0) path += '/';
    }
    SCOPED_TRACE(path);
    const std::string clean = CleanPath(path);
    ASSERT_EQ(CleanPath(clean), clean);
    ASSERT_LE(CountDotDot(clean), CountDotDot(path));
    ASSERT_EQ(clean.front() == '/', !path.empty() && path.front() == '/');
    ASSERT_FALSE(clean.empty());
    if (clean != "/") {
      ASSERT_NE(clean.back(), '/');
    }
    ASSERT_EQ(clean.find("//"), std::string::npos);
    if (clean != ".") {
      ASSERT_EQ(("/" + clean + "/").find("/./"), std::string::npos);
    }
    // ".." may only lead a relative path.
    const size_t last_dotdot = ("/" + clean + "/").rfind("/../");
    if (last_dotdot != std::string::npos) {
      ASSERT_NE(clean.front(), '/');
      ASSERT_EQ(CountDotDot(clean.substr(0, last_dotdot + 2)),
                static_cast<int>((last_dotdot + 3) / 3));
    }
  }
}

class PathDirTest : public ::testing::Test {
 protected:
  void SetUp() override {
    root_ = ::testing::TempDir() + "orvex_path_XXXXXX";
    ASSERT_NE(mkdtemp(root_.data()), nullptr);
  }
  void TearDown() override { std::filesystem::remove_all(root_); }
  static bool IsDir(const std::string& path) {
    struct stat info;
    return stat(path.c_str(), &info) == 0 && S_ISDIR(info.st_mode);
  }
  std::string root_;
};

TEST_F(PathDirTest, CreatesMissingParents) {
  EXPECT_THAT(RecursivelyCreateDir(""), IsOk());
  EXPECT_THAT(RecursivelyCreateDir("."), IsOk());
  EXPECT_THAT(RecursivelyCreateDir("/"), IsOk());

  const std::string deep = root_ + "/a/b/c";
  const mode_t old_mask = umask(022);
  EXPECT_THAT(RecursivelyCreateDir(deep), IsOk());
  umask(old_mask);
  EXPECT_TRUE(IsDir(root_ + "/a/b"));
  EXPECT_TRUE(IsDir(deep));
  struct stat info;
  ASSERT_EQ(stat(deep.c_str(), &info), 0);
  EXPECT_EQ(info.st_mode & 0777, 0755u);

  // Existing directories, and paths that clean to them.
  EXPECT_THAT(RecursivelyCreateDir(deep), IsOk());
  EXPECT_THAT(RecursivelyCreateDir(root_ + "//a/./b/x/../"), IsOk());
  EXPECT_FALSE(IsDir(root_ + "/a/b/x"));
  EXPECT_THAT(RecursivelyCreateDir(root_ + "/a/b/d/"), IsOk());
  EXPECT_TRUE(IsDir(root_ + "/a/b/d"));
}

TEST_F(PathDirTest, SomethingElseInTheWay) {
  const std::string file = root_ + "/file";
  std::ofstream(file) << "x";
  ASSERT_EQ(symlink("missing", (root_ + "/dangling").c_str()), 0);
  ASSERT_EQ(symlink("loop", (root_ + "/loop").c_str()), 0);
  ASSERT_EQ(mkdir((root_ + "/dir").c_str(), 0777), 0);
  ASSERT_EQ(symlink("dir", (root_ + "/to_dir").c_str()), 0);
  struct Case {
    std::string path;
    std::string refused;  // the path in the error; empty: accepted
  };
  const std::vector<Case> cases = {
      {file, file},
      {file + "/sub/dir", file},
      {root_ + "/dangling", root_ + "/dangling"},
      {root_ + "/dangling/sub", root_ + "/dangling"},
      {root_ + "/loop/sub", root_ + "/loop"},
      {root_ + "/to_dir/sub", ""},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.path);
    if (c.refused.empty()) {
      EXPECT_THAT(RecursivelyCreateDir(c.path), IsOk());
      EXPECT_TRUE(IsDir(c.path));
    } else {
      EXPECT_THAT(RecursivelyCreateDir(c.path),
                  StatusIs(StatusCode::kAlreadyExists,
                           "Error creating directory " + c.refused + ": File exists"));
    }
  }
  EXPECT_FALSE(IsDir(root_ + "/missing"));
}

// Runs in a child process with a tmpfs of its own on root_: a read-only file
// system refuses new directories, while existing ones still count as made.
TEST_F(PathDirTest, ReadOnlyFileSystem) {
  if (!testing::ScratchMountsAvailable(root_)) {
    GTEST_SKIP() << "no private tmpfs mounts here: read-only file systems not exercised";
  }
  EXPECT_EXIT(
      {
        if (!testing::MountScratchTmpfs(root_, "size=16k") ||
            mkdir((root_ + "/kept").c_str(), 0777) != 0 || !testing::RemountReadOnly(root_)) {
          _exit(2);
        }
        const Status existing = RecursivelyCreateDir(root_ + "/kept/");
        const Status fresh = RecursivelyCreateDir(root_ + "/kept/new/dir");
        fprintf(stderr, "existing: %s\nfresh: %s\n", existing.ToString().c_str(),
                fresh.ToString().c_str());
        _exit(existing.ok() && !IsDir(root_ + "/kept/new") ? 0 : 1);
      },
      ::testing::ExitedWithCode(0),
      "existing: OK\nfresh: PERMISSION_DENIED: Error creating directory .*/kept/new: Read-only "
      "file system\n");
}

TEST_F(PathDirTest, OverlongPathFailsWithoutSideEffects) {
  std::string path = root_;
  while (path.size() < 400000) path += "/d";
  EXPECT_THAT(RecursivelyCreateDir(path),
              StatusIs(StatusCode::kInvalidArgument,
                       ::testing::AllOf(::testing::StartsWith("Error creating directory " + root_),
                                        ::testing::EndsWith(": File name too long"))));
  EXPECT_FALSE(IsDir(root_ + "/d"));
  // One component longer than any file system takes.
  EXPECT_THAT(RecursivelyCreateDir(root_ + "/d/" + std::string(NAME_MAX + 1, 'n') + "/e"),
              StatusIs(StatusCode::kInvalidArgument, ::testing::EndsWith(": File name too long")));
  EXPECT_FALSE(IsDir(root_ + "/d"));
  EXPECT_THAT(RecursivelyCreateDir(root_ + "/d/" + std::string(NAME_MAX, 'n')), IsOk());
  // Just under the limit the kernel decides: deep nesting works.
  path = root_;
  const std::string component = "/" + std::string(60, 'd');
  while (path.size() + component.size() < PATH_MAX) path += component;
  EXPECT_THAT(RecursivelyCreateDir(path), IsOk());
  EXPECT_TRUE(IsDir(path));
}

TEST(PathTest, ObfuscateReversesAndRoundTrips) {
  EXPECT_EQ(Obfuscate(""), "");
  std::mt19937 rng(99);
  for (size_t n = 1; n <= 40; ++n) {
    std::string text(n, '\0');
    for (char& c : text) c = static_cast<char>(rng() & 0xff);
    SCOPED_TRACE(n);
    const std::string scrambled = Obfuscate(text);
    ASSERT_EQ(scrambled.size(), n);
    EXPECT_EQ(Deobfuscate(scrambled), text);
    EXPECT_EQ(Obfuscate(scrambled), text);
    // Reversed, and every byte XORed with the same key.
    const uint8_t key = static_cast<uint8_t>(scrambled[n - 1]) ^ static_cast<uint8_t>(text[0]);
    for (size_t i = 0; i < n; ++i) {
      ASSERT_EQ(static_cast<uint8_t>(scrambled[n - 1 - i]),
                static_cast<uint8_t>(static_cast<uint8_t>(text[i]) ^ key));
    }
  }
  // The key depends on the length modulo 8 only.
  EXPECT_EQ(Obfuscate("a")[0] ^ 'a', Obfuscate("123456789")[0] ^ '9');
  EXPECT_NE(Obfuscate("a")[0] ^ 'a', Obfuscate("ab")[0] ^ 'b');
}

}  // namespace
}  // namespace orvex
