#include "orvex/api/debug/camera_latency_analyzer.h"

#include <cutils/properties.h>
#include <signal.h>
#include <stdlib.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "absl/strings/str_cat.h"
#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/base/path.h"
#include "orvex/base/testing/scratch_mount.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

namespace fs = std::filesystem;
using ::orvex::testing::IsOk;
using ::testing::MatchesRegex;

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

  // Every entry of `dir` (hidden ones included).
  std::set<std::string> Files(const std::string& dir = "") const {
    std::set<std::string> names;
    std::error_code error;
    for (const auto& entry : fs::directory_iterator(dir.empty() ? out_ : dir, error)) {
      names.insert(entry.path().filename());
    }
    return names;
  }

  // File `name` as "operation: event=duration ...; " per operation.
  std::string Describe(const std::string& name) const {
    CameraPerformanceDataFile file;
    std::ifstream in(out_ + "/" + name, std::ios::binary);
    EXPECT_TRUE(file.ParseFromIstream(&in)) << name;
    std::string described;
    for (const CameraLatencyData& data : file.camera_latency_data()) {
      absl::StrAppend(&described, data.operation_case(), ":");
      for (const CameraLatencyDataType& event : data.latency_data()) {
        absl::StrAppend(&described, " ", event.event_name(), "=", event.duration_ms());
      }
      described += "; ";
    }
    return described;
  }

  int RecordedOperations() const { return analyzer_.ConvertToProto().camera_latency_data_size(); }

  CameraLatencyAnalyzer& analyzer_ = CameraLatencyAnalyzer::GetAnalyzer();
  std::string root_;
  std::string out_;
};

// Grouped by exact name in order of first use, nameless ones left out.
TEST_F(LatencyAnalyzerTest, WritesTheSessionAtClose) {
  SetSwitches("", "true");
  analyzer_.InjectEvent("Camera-Open", {{"Overall", 100.5f}, {"A", 1}});
  analyzer_.InjectEvent("", {{"Dropped", 5}});
  analyzer_.InjectEvent("Camera-Reconfiguration", {{"Overall", 10}});
  analyzer_.InjectEvent("Camera-Open", {{"B", 2}});
  analyzer_.InjectEvent("camera-open", {{"C", 3}});
  analyzer_.InjectEvent("NoEvents", {});
  analyzer_.InjectEvent("Camera-Close", {{"Overall", 30}});
  ASSERT_EQ(Files().size(), 1u);
  const std::string name = *Files().begin();
  EXPECT_THAT(name,
              MatchesRegex("camera-ended-[0-9]{4}(-[0-9]{2}){2}_[0-9]{2}(-[0-9]{2}){2}\\.cpa"));
  EXPECT_EQ(Describe(name),
            "Camera-Open: Overall=100.5 A=1 B=2; Camera-Reconfiguration: Overall=10; camera-open: "
            "C=3; NoEvents:; Camera-Close: Overall=30; ");
}

// Per session (fast operations around the one under test), the files written.
TEST_F(LatencyAnalyzerTest, CloseDecision) {
  enum Reset { kNone, kClear, kDrop };  // ClearLatencyData, WriteLatencyData(false)
  // clang-format off
  const struct {  // "": property unset
    const char *auto_dump, *write_to_disk, *operation; float overall_ms; size_t files;
    Reset reset = kNone; const char* event = "Overall";
  } cases[] = {
      {"", "", "Open", 299.9f, 0}, {"", "", "Open", 300, 1}, {"false", "", "Open", 1000, 0},
      {"", "", "Open", 1000, 0, kClear}, {"", "", "Open", 1000, 0, kDrop}, {"0", "1", "Open", 9, 1},
      {"maybe", "", "Open", 1000, 1}, {"", "TRUE", "Open", 10, 0},  // unreadable: on, off
      {"", "no", "Reconfiguration", 715, 1}, {"", "", "Reconfiguration", 714.9f, 0},
      {"", "", "Open", 1000, 0, kNone, "overall"}, {"", "", "Warmup", 99999, 0},
      {"", "", "Close", 250, 1}, {"", "", "Camera-Close", 249.9f, 0}, {"", "", "cam-OPEN", 300, 1},
      {"", "1", "CAMERA-CLOSE", 1, 2}, {"", "1", "CameraClose", 1, 1}, {"", "1", "A-Closed", 1, 1}};
  // clang-format on
  size_t files = 0;
  for (const auto& c : cases) {
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

// The clean path is written ("newdir" beside "lx"); failures are logged, records dropped.
TEST_F(LatencyAnalyzerTest, OutputDirectories) {
  std::ofstream(root_ + "/plain_file") << "x";
  ASSERT_EQ(mkdir((root_ + "/a").c_str(), 0777), 0);
  ASSERT_EQ(mkdir((root_ + "/a/b").c_str(), 0777), 0);
  ASSERT_EQ(symlink("a/b", (root_ + "/lx").c_str()), 0);
  const std::pair<std::string, std::string> cases[] = {
      {root_ + "/lx/../newdir", "OK"},
      {root_ + "/plain_file/profiler",
       "ALREADY_EXISTS: Error creating directory " + root_ + "/plain_file: File exists"},
      {"/proc", "INTERNAL: Failed to open file: /proc/camera-ended-[0-9_-]+\\.cpa"}};
  for (const auto& [directory, result] : cases) {
    SCOPED_TRACE(directory);
    analyzer_.SetOutputDirectory(directory);
    analyzer_.InjectEvent("Camera-Open", {{"Overall", 5}});
    EXPECT_THAT(analyzer_.WriteProtoToDisk("camera-ended").ToString(), MatchesRegex(result));
    ::testing::internal::CaptureStderr();
    analyzer_.WriteLatencyData(true);
    const std::string log = ::testing::internal::GetCapturedStderr();
    EXPECT_EQ(RecordedOperations(), 0);
    EXPECT_EQ(log.find("[CPA] Not able to write camera-ended Proto to disk\n") != log.npos,
              result != "OK")
        << log;
  }
  EXPECT_EQ(Files(root_ + "/newdir").size(), 2u);
  EXPECT_THAT(Files(root_ + "/a"), ::testing::ElementsAre("b"));
  analyzer_.SetOutputDirectory("");
  EXPECT_EQ(analyzer_.output_directory(), "/data/vendor/camera/profiler");
}

// Every close writes a complete file of its own and names it; no temporary file stays.
TEST_F(LatencyAnalyzerTest, ConcurrentInjections) {
  SetSwitches("", "1");
  std::vector<std::thread> threads;
  std::vector<std::string> written(8);
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([this, t, &written] {
      for (int i = 0; i < 100; ++i) {
        analyzer_.InjectEvent("T" + std::to_string(t) + "-Open", {{"I", 1}});
        if (i % 50 == 49) analyzer_.InjectEvent("T-Close", {}, &written[t * 2 + i / 50]);
      }
    });
  }
  for (auto& thread : threads) thread.join();
  ASSERT_EQ(Files().size(), 8u);
  int opens = 0;
  for (const std::string& name : Files()) {
    EXPECT_EQ(std::count(written.begin(), written.end(), out_ + "/" + name), 1) << name;
    const std::string described = Describe(name);
    opens += std::count(described.begin(), described.end(), '=');
  }
  EXPECT_EQ(opens, 400);
}

using LatencyAnalyzerDeathTest = LatencyAnalyzerTest;

// A write failing part way leaves no file; a read-only disk refuses the file.
TEST_F(LatencyAnalyzerDeathTest, FailingDisks) {
  ASSERT_THAT(RecursivelyCreateDir(out_), IsOk());
  analyzer_.InjectEvent("Camera-Open", {{std::string(200, 'x'), 1.0f}});
  const auto write = [this] { return analyzer_.WriteProtoToDisk("camera-ended").ToString(); };
  EXPECT_EXIT(
      {
        signal(SIGXFSZ, SIG_IGN);
        struct rlimit limit;
        getrlimit(RLIMIT_FSIZE, &limit);
        limit.rlim_cur = 64;
        setrlimit(RLIMIT_FSIZE, &limit);
        const std::string limited = write();
        limit.rlim_cur = RLIM_INFINITY;  // stderr is a file too
        setrlimit(RLIMIT_FSIZE, &limit);
        fprintf(stderr, "%s, %zu files\n", limited.c_str(), Files().size());
        _exit(0);
      },
      ::testing::ExitedWithCode(0),
      "[A-Z_]+: Failed to write file: .*/camera-ended-[0-9_-]+\\.cpa: File too large, 0 files\n");
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
        _exit(0);
      },
      ::testing::ExitedWithCode(0),
      "read-only: INTERNAL: Failed to open file: .*/camera-ended-[0-9_-]+\\.cpa\n");
}

}  // namespace
}  // namespace orvex
