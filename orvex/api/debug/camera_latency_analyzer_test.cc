#include "orvex/api/debug/camera_latency_analyzer.h"

#include <cutils/properties.h>
#include <signal.h>
#include <stdlib.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <time.h>
#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "absl/strings/str_cat.h"
#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/base/path.h"
#include "orvex/base/testing/scratch_mount.h"
#include "orvex/status/status_matchers.h"
#include "platform/testing/reexec_death_test.h"

namespace orvex {
namespace {

namespace fs = std::filesystem;
using ::orvex::testing::IsOk;
using ::testing::ElementsAre;
using ::testing::MatchesRegex;
using Events = std::list<std::pair<std::string, float>>;

// "%Y-%m-%d_%H-%M-%S" of local time `seconds`.
std::string TimeText(time_t seconds) {
  struct tm local = {};
  localtime_r(&seconds, &local);
  char text[40] = {};
  strftime(text, sizeof(text), "%Y-%m-%d_%H-%M-%S", &local);
  return text;
}

std::string ReadFile(const std::string& path) {
  std::ifstream in(path, std::ios::binary);
  std::ostringstream bytes;
  bytes << in.rdbuf();
  return bytes.str();
}

// Sets both profiler switches through the real system properties; "" unsets.
void SetSwitches(const char* auto_dump, const char* write_to_disk) {
  ASSERT_EQ(property_set(kCameraPerformanceAnalyzerAutoDumpLatencyProperty, auto_dump), 0);
  ASSERT_EQ(property_set(kCameraPerformanceAnalyzerWriteToDiskProperty, write_to_disk), 0);
}

class LatencyAnalyzerTest : public ::testing::Test {
 protected:
  void SetUp() override {
    root_ = ::testing::TempDir() + "orvex_cpa_XXXXXX";
    ASSERT_NE(mkdtemp(root_.data()), nullptr);
    out_ = root_ + "/vendor/camera/profiler";  // made by the analyzer
    SetSwitches("", "");
    analyzer_.SetOutputDirectory(out_);
    analyzer_.ClearLatencyData();
  }
  void TearDown() override { fs::remove_all(root_); }

  // Every entry of `dir` (hidden ones included), sorted.
  std::vector<std::string> Files(const std::string& dir = "") const {
    std::vector<std::string> names;
    std::error_code error;
    for (const auto& entry : fs::directory_iterator(dir.empty() ? out_ : dir, error)) {
      names.push_back(entry.path().filename());
    }
    std::sort(names.begin(), names.end());
    return names;
  }

  // The operations of file `name`, each as "operation: event=duration ...".
  std::vector<std::string> Describe(const std::string& name) const {
    CameraPerformanceDataFile file;
    EXPECT_TRUE(file.ParseFromString(ReadFile(out_ + "/" + name))) << name;
    std::vector<std::string> described;
    for (const CameraLatencyData& data : file.camera_latency_data()) {
      described.push_back(data.operation_case() + ":");
      for (const CameraLatencyDataType& event : data.latency_data()) {
        absl::StrAppend(&described.back(), " ", event.event_name(), "=", event.duration_ms());
      }
    }
    return described;
  }

  int RecordedOperations() const { return analyzer_.ConvertToProto().camera_latency_data_size(); }

  CameraLatencyAnalyzer& analyzer_ = CameraLatencyAnalyzer::GetAnalyzer();
  std::string root_;
  std::string out_;
};

// Records grouped by exact name in order of first appearance, nameless ones
// left out, written at a close under the local time; records cleared after.
TEST_F(LatencyAnalyzerTest, WritesTheSessionAtClose) {
  SetSwitches("", "true");
  const std::string before = TimeText(time(nullptr));
  analyzer_.InjectEvent("Camera-Open", {{"Overall", 100.5f}, {"A", 1}});
  analyzer_.InjectEvent("", {{"Dropped", 5}});
  analyzer_.InjectEvent("Camera-Reconfiguration", {{"Overall", 10}});
  analyzer_.InjectEvent("Camera-Open", {{"B", 2}});
  analyzer_.InjectEvent("camera-open", {{"C", 3}});
  analyzer_.InjectEvent("NoEvents", {});
  EXPECT_THAT(Files(), ElementsAre());  // nothing is written before a close
  analyzer_.InjectEvent("Camera-Close", {{"Overall", 30}});
  const std::string after = TimeText(time(nullptr));
  EXPECT_EQ(RecordedOperations(), 0);
  ASSERT_EQ(Files().size(), 1u);
  const std::string name = Files()[0];
  EXPECT_THAT(name,
              MatchesRegex("camera-ended-[0-9]{4}(-[0-9]{2}){2}_[0-9]{2}(-[0-9]{2}){2}\\.cpa"));
  EXPECT_GE(name.substr(13, 19), before);
  EXPECT_LE(name.substr(13, 19), after);
  EXPECT_THAT(Describe(name), ElementsAre("Camera-Open: Overall=100.5 A=1 B=2",
                                          "Camera-Reconfiguration: Overall=10", "camera-open: C=3",
                                          "NoEvents:", "Camera-Close: Overall=30"));
  // No records make an empty, zero-byte file.
  ASSERT_THAT(analyzer_.WriteProtoToDisk("empty"), IsOk());
  ASSERT_EQ(Files().size(), 2u);
  EXPECT_EQ(ReadFile(out_ + "/" + Files()[1]), "");
}

// Each row is a session: a fast reconfiguration, the operation under test,
// an optional reset, another fast reconfiguration (the slow flag spans the
// session) and a fast close. An operation that closes by itself makes a
// session of its own, and so one more file when that is written.
TEST_F(LatencyAnalyzerTest, CloseDecision) {
  enum Reset { kNone, kClear, kDrop };  // ClearLatencyData, WriteLatencyData(false)
  struct Case {
    const char *auto_dump, *write_to_disk, *operation;  // "": property unset
    float overall_ms;
    size_t files;
    Reset reset = kNone;
    const char* event = "Overall";
  };
  // clang-format off
  const Case cases[] = {
      {"", "", "Open", 299.9f, 0}, {"", "", "Open", 300, 1}, {"false", "", "Open", 1000, 0},
      {"", "", "Open", 10, 0}, {"", "", "Open", 1000, 0, kClear}, {"", "", "Open", 1000, 0, kDrop},
      {"maybe", "", "Open", 1000, 1},  // unreadable auto-dump: on
      {"", "TRUE", "Open", 10, 0},     // unreadable write-to-disk: off
      {"0", "1", "Open", 10, 1}, {"", "no", "Reconfiguration", 715, 1},
      {"", "", "Reconfiguration", 714.9f, 0}, {"", "", "Open", 1000, 0, kNone, "overall"},
      {"", "", "Open", 5000, 0, kNone, "Startup"}, {"", "", "Warmup", 99999, 0},
      {"", "", "Close", 250, 1}, {"", "", "camera0-OPEN", 300, 1}, {"", "", "Camera-", 1e6, 0},
      {"", "", "Camera-Opened", 1e6, 0}, {"", "", "OpenCamera", 1e6, 0},
      {"", "", "Camera-Open-Close", 250, 1},  // the close threshold
      {"", "", "Camera-Close", 249.9f, 0}, {"", "1", "CAMERA-CLOSE", 1, 2},
      {"", "1", "x-cLoSe", 1, 2}, {"", "1", "-Close", 1, 2}, {"", "1", "CameraClose", 1, 1},
      {"", "1", "Close", 1, 1},
      {"", "1", "Camera-Close ", 1, 1}, {"", "1", "Camera-Closed", 1, 1},
      {"", "1", "Camera-Close-Open", 1, 1}};
  // clang-format on
  size_t files = 0;
  for (const Case& c : cases) {
    SCOPED_TRACE(::testing::Message() << "row " << &c - cases);
    SetSwitches(c.auto_dump, c.write_to_disk);
    analyzer_.InjectEvent("Camera-Reconfiguration", {{"Overall", 1}});
    analyzer_.InjectEvent(c.operation, {{c.event, c.overall_ms}});
    if (c.reset == kClear) analyzer_.ClearLatencyData();
    if (c.reset == kDrop) analyzer_.WriteLatencyData(false);
    analyzer_.InjectEvent("Camera-Reconfiguration", {{"Overall", 1}});
    analyzer_.InjectEvent("Camera-Close", {{"Overall", 1}});
    files += c.files;
    EXPECT_EQ(Files().size(), files);
    EXPECT_EQ(RecordedOperations(), 0);
  }
}

// Output directories, good and bad. A failure is returned by
// WriteProtoToDisk, and logged by WriteLatencyData, which drops the records.
TEST_F(LatencyAnalyzerTest, OutputDirectories) {
  std::ofstream(root_ + "/plain_file") << "x";
  ASSERT_EQ(mkdir((root_ + "/a").c_str(), 0777), 0);
  ASSERT_EQ(mkdir((root_ + "/a/b").c_str(), 0777), 0);
  ASSERT_EQ(symlink("a/b", (root_ + "/lx").c_str()), 0);
  struct Case {
    std::string directory;
    std::string result;  // "OK" or a regular expression for the error
    std::string written_in;
  };
  const Case cases[] = {
      // Made and written in its clean form, "newdir" beside "lx", not in "a".
      {root_ + "/lx/../newdir", "OK", root_ + "/newdir"},
      {root_ + "/plain_file/profiler",
       "ALREADY_EXISTS: Error creating directory " + root_ + "/plain_file: File exists", ""},
      {root_ + std::string("/nul\0", 5), "INVALID_ARGUMENT: Error creating directory .*", ""},
      // Exists, but no file can be made there, root or not.
      {"/proc", "INTERNAL: Failed to open file: /proc/camera-ended-[0-9_-]+\\.cpa", ""}};
  for (const Case& c : cases) {
    SCOPED_TRACE(c.directory);
    analyzer_.SetOutputDirectory(c.directory);
    analyzer_.InjectEvent("Camera-Open", {{"Overall", 5}});
    EXPECT_THAT(analyzer_.WriteProtoToDisk("camera-ended").ToString(), MatchesRegex(c.result));
    EXPECT_TRUE(c.written_in.empty() || Files(c.written_in).size() == 1u);
    ::testing::internal::CaptureStderr();
    analyzer_.WriteLatencyData(true);
    const std::string log = ::testing::internal::GetCapturedStderr();
    EXPECT_EQ(RecordedOperations(), 0);
    EXPECT_EQ(
        log.find(" camera_latency_analyzer:") != std::string::npos &&
            log.find("] [CPA] Not able to write camera-ended Proto to disk\n") != std::string::npos,
        c.written_in.empty())
        << log;
  }
  // A close whose write fails names no file.
  SetSwitches("", "1");
  analyzer_.SetOutputDirectory(root_ + "/plain_file/profiler");
  std::string written = "stale";
  analyzer_.InjectEvent("Camera-Close", {}, &written);
  EXPECT_EQ(written, "");
  EXPECT_THAT(Files(root_), ElementsAre("a", "lx", "newdir", "plain_file"));
  EXPECT_THAT(Files(root_ + "/a"), ElementsAre("b"));
  analyzer_.SetOutputDirectory("");
  EXPECT_EQ(analyzer_.output_directory(), "/data/vendor/camera/profiler");
}

TEST_F(LatencyAnalyzerTest, ConcurrentInjections) {
  SetSwitches("", "1");
  std::vector<std::thread> threads;
  std::vector<std::string> written(8);  // by each close
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([this, t, &written] {
      for (int i = 0; i < 100; ++i) {
        analyzer_.InjectEvent("T" + std::to_string(t) + "-Open", {{"I", 1}});
        if (i % 50 == 49) analyzer_.InjectEvent("T-Close", {}, &written[t * 2 + i / 50]);
      }
    });
  }
  for (auto& thread : threads) thread.join();
  // Eight closes, each writing what was recorded before it (one event per
  // open) and naming its own file; every file is complete and no temporary
  // file is left.
  const std::vector<std::string> files = Files();
  EXPECT_EQ(files.size(), 8u);
  std::sort(written.begin(), written.end());
  for (size_t i = 0; i < files.size(); ++i) EXPECT_EQ(written[i], out_ + "/" + files[i]);
  int opens = 0;
  for (const std::string& name : files) {
    ASSERT_NE(name.front(), '.') << name;
    for (const std::string& operation : Describe(name)) {
      opens += std::count(operation.begin(), operation.end(), '=');
    }
  }
  EXPECT_EQ(opens, 400);
}

using LatencyAnalyzerDeathTest = LatencyAnalyzerTest;

// In child processes: a file-size limit makes the write fail part way
// (no file is left, the records and an earlier file of the same second stay),
// and a read-only tmpfs of the child's own refuses the file and a directory.
TEST_F(LatencyAnalyzerDeathTest, FailingDisks) {
  ASSERT_THAT(RecursivelyCreateDir(out_), IsOk());
  Events events;
  for (int i = 0; i < 50; ++i) events.emplace_back("LongEventName" + std::to_string(i), 1.0f);
  analyzer_.InjectEvent("Camera-Open", std::move(events));
  const auto write = [this] { return analyzer_.WriteProtoToDisk("camera-ended").ToString(); };
  EXPECT_EXIT(
      {
        const std::string earlier = out_ + "/camera-ended-" + TimeText(time(nullptr)) + ".cpa";
        std::ofstream(earlier) << "earlier session";
        signal(SIGXFSZ, SIG_IGN);
        struct rlimit limit;
        getrlimit(RLIMIT_FSIZE, &limit);
        limit.rlim_cur = 64;
        setrlimit(RLIMIT_FSIZE, &limit);
        const std::string limited = write();
        const bool kept = Files().size() == 1 && ReadFile(earlier) == "earlier session";
        limit.rlim_cur = RLIM_INFINITY;  // stderr is a file too
        setrlimit(RLIMIT_FSIZE, &limit);
        fprintf(stderr, "limited: %s\nunlimited: %s\n", limited.c_str(), write().c_str());
        _exit(kept && Files().size() == 2 ? 0 : 1);
      },
      ::testing::ExitedWithCode(0),
      "limited: [A-Z_]+: Failed to write file: .*/camera-ended-[0-9_-]+\\.cpa: File too large\n"
      "unlimited: OK\n");
  if (!testing::ScratchMountsAvailable(root_)) {
    GTEST_SKIP() << "no private tmpfs mounts here: read-only disks not exercised";
  }
  EXPECT_EXIT(
      {
        if (!testing::MountScratchTmpfs(root_, "size=16k") || !RecursivelyCreateDir(out_).ok() ||
            !testing::RemountReadOnly(root_)) {
          _exit(2);
        }
        fprintf(stderr, "read-only: %s\n", write().c_str());
        analyzer_.SetOutputDirectory(out_ + "/sub");
        fprintf(stderr, "read-only below: %s\n", write().c_str());
        _exit(0);
      },
      ::testing::ExitedWithCode(0),
      "read-only: INTERNAL: Failed to open file: .*/camera-ended-[0-9_-]+\\.cpa\n"
      "read-only below: PERMISSION_DENIED: Error creating directory .*/profiler/sub: Read-only "
      "file system\n");
}

// The environment is read when the analyzer is first used, so this runs in
// a fresh process.
TEST(LatencyAnalyzerEnvironmentDeathTest, OutputDirectoryFromEnvironment) {
  orvex_testing::UseReexecDeathTests();
  EXPECT_EXIT(
      {
        setenv(CameraLatencyAnalyzer::kOutputDirectoryVariable, "/tmp/somewhere/else", 1);
        CameraLatencyAnalyzer& analyzer = CameraLatencyAnalyzer::GetAnalyzer();
        _exit(analyzer.output_directory() == "/tmp/somewhere/else" ? 0 : 1);
      },
      ::testing::ExitedWithCode(0), "");
}

}  // namespace
}  // namespace orvex
