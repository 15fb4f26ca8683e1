#include "orvex/api/debug/camera_latency_analyzer.h"

#include <cutils/properties.h>
#include <signal.h>
#include <stdlib.h>
#include <sys/resource.h>
#include <time.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <regex>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/sysprop/system_properties.h"
#include "orvex/base/path.h"
#include "orvex/base/testing/scratch_mount.h"
#include "orvex/status/status_matchers.h"
#include "platform/testing/reexec_death_test.h"

namespace orvex {
namespace {

namespace fs = std::filesystem;
using ::orvex::testing::IsOk;
using ::orvex::testing::StatusIs;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using Events = std::list<std::pair<std::string, float>>;

void SetProperty(const char* key, const char* value) { ASSERT_EQ(property_set(key, value), 0); }

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
  std::stringstream bytes;
  bytes << in.rdbuf();
  return bytes.str();
}

class LatencyAnalyzerTest : public ::testing::Test {
 protected:
  void SetUp() override {
    root_ = ::testing::TempDir() + "orvex_cpa_XXXXXX";
    ASSERT_NE(mkdtemp(root_.data()), nullptr);
    out_ = root_ + "/vendor/camera/profiler";  // made by the analyzer
    SystemProperties::GetInstance().SetFake(false);
    SetProperty(kCameraPerformanceAnalyzerAutoDumpLatencyProperty, "");
    SetProperty(kCameraPerformanceAnalyzerWriteToDiskProperty, "");
    analyzer_.SetOutputDirectory(out_);
    analyzer_.ClearLatencyData();
  }
  void TearDown() override {
    analyzer_.ClearLatencyData();
    analyzer_.SetOutputDirectory("");
    SetProperty(kCameraPerformanceAnalyzerAutoDumpLatencyProperty, "");
    SetProperty(kCameraPerformanceAnalyzerWriteToDiskProperty, "");
    fs::remove_all(root_);
  }

  // Every entry of the output directory (hidden ones included), sorted.
  std::vector<std::string> Files() const {
    std::vector<std::string> names;
    std::error_code error;
    for (const auto& entry : fs::directory_iterator(out_, error)) {
      names.push_back(entry.path().filename());
    }
    std::sort(names.begin(), names.end());
    return names;
  }

  CameraPerformanceDataFile Parse(const std::string& name) const {
    CameraPerformanceDataFile file;
    EXPECT_TRUE(file.ParseFromString(ReadFile(out_ + "/" + name))) << name;
    return file;
  }

  int RecordedOperations() const { return analyzer_.ConvertToProto().camera_latency_data_size(); }

  CameraLatencyAnalyzer& analyzer_ = CameraLatencyAnalyzer::GetAnalyzer();
  std::string root_;
  std::string out_;
};

TEST(LatencyThresholdTest, OperationKinds) {
  struct Case {
    const char* operation;
    float threshold;  // 0: not checked
  };
  // clang-format off
  const Case cases[] = {
      {"Open", 300}, {"Camera-Open", 300}, {"camera0-OPEN", 300}, {"Close", 250},
      {"Camera-Close", 250}, {"Reconfiguration", 715}, {"Camera-reconfiguration", 715},
      {"Camera-Open-Close", 250}, {"OpenCamera", 0}, {"Camera-Opened", 0}, {"Camera-Open ", 0},
      {"Warmup", 0}, {"", 0}, {"Camera-", 0}};
  // clang-format on
  for (const Case& c : cases) {
    SCOPED_TRACE(c.operation);
    const std::optional<float> threshold = CameraLatencyAnalyzer::LatencyThresholdMs(c.operation);
    if (c.threshold == 0) {
      EXPECT_FALSE(threshold.has_value());
    } else {
      EXPECT_EQ(threshold, c.threshold);
    }
  }
}

TEST_F(LatencyAnalyzerTest, ConvertToProtoGroupsByExactName) {
  EXPECT_EQ(analyzer_.ConvertToProto().SerializeAsString(), "");
  analyzer_.InjectEvent("Camera-Open", {{"Overall", 100.5f}, {"A", 1}});
  analyzer_.InjectEvent("", {{"Dropped", 5}});
  analyzer_.InjectEvent("Camera-Reconfiguration", {{"Overall", 10}});
  analyzer_.InjectEvent("Camera-Open", {{"B", 2}});
  analyzer_.InjectEvent("camera-open", {{"C", 3}});
  analyzer_.InjectEvent("NoEvents", {});

  const CameraPerformanceDataFile file = analyzer_.ConvertToProto();
  EXPECT_EQ(file.camera_data_size(), 0);
  EXPECT_FALSE(file.has_graph_representation());
  std::vector<std::string> described;
  for (const CameraLatencyData& data : file.camera_latency_data()) {
    std::string text = data.operation_case() + ":";
    for (const CameraLatencyDataType& event : data.latency_data()) {
      text += " " + event.event_name() + "=" + std::to_string(event.duration_ms());
    }
    described.push_back(text);
  }
  EXPECT_THAT(described, ElementsAre("Camera-Open: Overall=100.500000 A=1.000000 B=2.000000",
                                     "Camera-Reconfiguration: Overall=10.000000",
                                     "camera-open: C=3.000000", "NoEvents:"));
  // Nothing is written before a close.
  EXPECT_THAT(Files(), ElementsAre());
  // Cleared records make an empty, zero-byte file.
  analyzer_.ClearLatencyData();
  ASSERT_THAT(analyzer_.WriteProtoToDisk("camera-ended"), IsOk());
  ASSERT_EQ(Files().size(), 1u);
  EXPECT_EQ(fs::file_size(out_ + "/" + Files()[0]), 0u);
}

TEST_F(LatencyAnalyzerTest, WritesAtCloseThroughSystemProperties) {
  SetProperty(kCameraPerformanceAnalyzerWriteToDiskProperty, "true");
  const std::string before = TimeText(time(nullptr));
  analyzer_.InjectEvent("Camera-Open", {{"Overall", 120}, {"PowerUp", 40}});
  analyzer_.InjectEvent("", {{"Ignored", 1}});
  analyzer_.InjectEvent("Camera-Close", {{"Overall", 30}});
  const std::string after = TimeText(time(nullptr));

  EXPECT_EQ(RecordedOperations(), 0);
  const std::vector<std::string> files = Files();
  ASSERT_EQ(files.size(), 1u);
  EXPECT_TRUE(
      std::regex_match(files[0], std::regex(R"(camera-ended-\d{4}-\d\d-\d\d_\d\d-\d\d-\d\d\.cpa)")))
      << files[0];
  const std::string stamp = files[0].substr(13, 19);
  EXPECT_GE(stamp, before);
  EXPECT_LE(stamp, after);

  const CameraPerformanceDataFile file = Parse(files[0]);
  ASSERT_EQ(file.camera_latency_data_size(), 2);
  EXPECT_EQ(file.camera_latency_data(0).operation_case(), "Camera-Open");
  EXPECT_EQ(file.camera_latency_data(0).latency_data(1).event_name(), "PowerUp");
  EXPECT_EQ(file.camera_latency_data(0).latency_data(1).duration_ms(), 40);
  EXPECT_EQ(file.camera_latency_data(1).operation_case(), "Camera-Close");
}

TEST_F(LatencyAnalyzerTest, OnlyHyphenCloseEndsTheSession) {
  SetProperty(kCameraPerformanceAnalyzerWriteToDiskProperty, "1");
  struct Case {
    const char* operation;
    bool closes;
  };
  const Case cases[] = {
      {"Camera-Close", true},   {"CAMERA-CLOSE", true},   {"x-cLoSe", true},
      {"-Close", true},         {"CameraClose", false},   {"Close", false},
      {"Camera-Close ", false}, {"Camera-Closed", false}, {"Camera-Close-Open", false}};
  size_t files = 0;
  for (const Case& c : cases) {
    SCOPED_TRACE(c.operation);
    analyzer_.ClearLatencyData();
    analyzer_.InjectEvent(c.operation, {{"Step", 1}});
    if (c.closes) ++files;
    EXPECT_EQ(RecordedOperations(), c.closes ? 0 : 1);
    EXPECT_EQ(Files().size(), files);
  }
}

// Each session: the operation under test, a fast reconfiguration (the slow
// flag spans the session) and, unless the operation closes, a fast close.
TEST_F(LatencyAnalyzerTest, CloseDecision) {
  struct Case {
    const char* auto_dump;      // "" = unset
    const char* write_to_disk;  // "" = unset
    const char* operation;
    const char* event;
    float duration_ms;
    bool written;
  };
  // clang-format off
  const Case cases[] = {
      {"", "", "Camera-Open", "Overall", 299.9f, false},
      {"", "", "Camera-Open", "Overall", 300, true},
      {"false", "", "Camera-Open", "Overall", 1000, false},
      {"maybe", "", "Camera-Open", "Overall", 1000, true},   // unreadable auto-dump: on
      {"0", "1", "Camera-Open", "Overall", 10, true},
      {"", "no", "Camera-Reconfiguration", "Overall", 715, true},
      {"", "TRUE", "Camera-Open", "Overall", 10, false},     // unreadable write-to-disk: off
      {"", "", "Camera-Reconfiguration", "Overall", 714.9f, false},
      {"", "", "Camera-Open", "overall", 1000, false},
      {"", "", "Camera-Open", "Startup", 5000, false},
      {"", "", "Warmup", "Overall", 99999, false},
      {"", "", "Camera-Close", "Overall", 250, true},
      {"", "", "Camera-Close", "Overall", 249.9f, false}};
  // clang-format on
  size_t files = 0;
  for (const Case& c : cases) {
    SCOPED_TRACE(std::string(c.operation) + " " + c.event + " " + std::to_string(c.duration_ms) +
                 " auto_dump=" + c.auto_dump + " write_to_disk=" + c.write_to_disk);
    SetProperty(kCameraPerformanceAnalyzerAutoDumpLatencyProperty, c.auto_dump);
    SetProperty(kCameraPerformanceAnalyzerWriteToDiskProperty, c.write_to_disk);
    analyzer_.InjectEvent("Camera-Reconfiguration", {{"Overall", 1}});
    analyzer_.InjectEvent(c.operation, {{c.event, c.duration_ms}});
    if (std::string_view(c.operation) != "Camera-Close") {
      analyzer_.InjectEvent("Camera-Reconfiguration", {{"Overall", 1}});
      analyzer_.InjectEvent("Camera-Close", {{"Overall", 1}});
    }
    if (c.written) ++files;
    EXPECT_EQ(Files().size(), files);
    EXPECT_EQ(RecordedOperations(), 0);
  }
}

TEST_F(LatencyAnalyzerTest, ThresholdFlagIsClearedWithTheRecords) {
  // Auto-dump off: the slow session is dropped and so is its flag.
  SetProperty(kCameraPerformanceAnalyzerAutoDumpLatencyProperty, "off");
  analyzer_.InjectEvent("Camera-Open", {{"Overall", 1000}});
  analyzer_.InjectEvent("Camera-Close", {{"Overall", 1}});
  SetProperty(kCameraPerformanceAnalyzerAutoDumpLatencyProperty, "");
  analyzer_.InjectEvent("Camera-Close", {{"Overall", 1}});
  EXPECT_THAT(Files(), ElementsAre());

  analyzer_.InjectEvent("Camera-Open", {{"Overall", 1000}});
  analyzer_.WriteLatencyData(false);
  analyzer_.InjectEvent("Camera-Close", {{"Overall", 1}});
  EXPECT_THAT(Files(), ElementsAre());

  analyzer_.InjectEvent("Camera-Open", {{"Overall", 1000}});
  analyzer_.ClearLatencyData();
  analyzer_.InjectEvent("Camera-Close", {{"Overall", 1}});
  EXPECT_THAT(Files(), ElementsAre());
}

TEST_F(LatencyAnalyzerTest, SameSecondFilesAreNeverReplaced) {
  // Occupy the names of the next few seconds so that the write collides
  // whenever it happens.
  ASSERT_THAT(RecursivelyCreateDir(out_), IsOk());
  const time_t now = time(nullptr);
  std::vector<std::string> taken;
  for (time_t t = now; t < now + 4; ++t) {
    taken.push_back("camera-ended-" + TimeText(t) + ".cpa");
    std::ofstream(out_ + "/" + taken.back()) << "earlier session";
  }
  analyzer_.InjectEvent("Camera-Open", {{"Overall", 5}});
  ASSERT_THAT(analyzer_.WriteProtoToDisk("camera-ended"), IsOk());
  ASSERT_THAT(analyzer_.WriteProtoToDisk("camera-ended"), IsOk());

  std::vector<std::string> added;
  for (const std::string& name : Files()) {
    if (std::find(taken.begin(), taken.end(), name) == taken.end()) added.push_back(name);
  }
  for (const std::string& name : taken) EXPECT_EQ(ReadFile(out_ + "/" + name), "earlier session");
  ASSERT_EQ(added.size(), 2u);
  for (const std::string& name : added) {
    SCOPED_TRACE(name);
    EXPECT_TRUE(std::regex_match(name, std::regex(R"(camera-ended-[0-9_-]{19}_[12]\.cpa)")));
    EXPECT_EQ(Parse(name).camera_latency_data(0).operation_case(), "Camera-Open");
  }
}

TEST_F(LatencyAnalyzerTest, WriteFailuresAreReportedAndRecordsCleared) {
  std::ofstream(root_ + "/plain_file") << "x";
  out_ = root_ + "/plain_file/profiler";
  analyzer_.SetOutputDirectory(out_);
  EXPECT_EQ(analyzer_.output_directory(), out_);
  analyzer_.InjectEvent("Camera-Open", {{"Overall", 5}});
  EXPECT_THAT(analyzer_.WriteProtoToDisk("camera-ended"),
              StatusIs(StatusCode::kAlreadyExists,
                       "Error creating directory " + root_ + "/plain_file: File exists"));

  // A directory that exists but where no file can be made, root or not.
  analyzer_.SetOutputDirectory("/proc");
  EXPECT_THAT(
      analyzer_.WriteProtoToDisk("camera-ended"),
      StatusIs(StatusCode::kInternal,
               ::testing::MatchesRegex("Failed to open file: /proc/camera-ended-[0-9_-]+\\.cpa")));

  ::testing::internal::CaptureStderr();
  analyzer_.WriteLatencyData(true);
  const std::string log = ::testing::internal::GetCapturedStderr();
  EXPECT_THAT(log, HasSubstr(" camera_latency_analyzer:"));
  EXPECT_THAT(log, HasSubstr("] [CPA] Not able to write camera-ended Proto to disk\n"));
  EXPECT_EQ(RecordedOperations(), 0);

  // A close whose write failed names no file.
  SetProperty(kCameraPerformanceAnalyzerWriteToDiskProperty, "1");
  std::string written = "stale";
  analyzer_.InjectEvent("Camera-Close", {}, &written);
  EXPECT_EQ(written, "");
}

TEST_F(LatencyAnalyzerTest, ConcurrentInjections) {
  SetProperty(kCameraPerformanceAnalyzerWriteToDiskProperty, "1");
  std::vector<std::thread> threads;
  std::vector<std::string> written(8);  // by each close
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([this, t, &written] {
      for (int i = 0; i < 100; ++i) {
        analyzer_.InjectEvent("T" + std::to_string(t) + "-Open", {{"Overall", 1}, {"I", 1}});
        if (i % 50 == 49)
          analyzer_.InjectEvent("T-Close", {{"Overall", 1}}, &written[t * 2 + i / 50]);
      }
    });
  }
  for (auto& thread : threads) thread.join();
  // Eight closes, each writing what was recorded before it and naming its
  // own file; every file is complete and no temporary file is left.
  const std::vector<std::string> files = Files();
  EXPECT_EQ(files.size(), 8u);
  std::sort(written.begin(), written.end());
  for (size_t i = 0; i < files.size(); ++i) EXPECT_EQ(written[i], out_ + "/" + files[i]);
  int opens = 0;
  for (const std::string& name : files) {
    ASSERT_NE(name.front(), '.') << name;
    const CameraPerformanceDataFile file = Parse(name);
    for (const CameraLatencyData& data : file.camera_latency_data()) {
      if (data.operation_case() != "T-Close") opens += data.latency_data_size() / 2;
    }
  }
  EXPECT_EQ(opens, 400);
}

using LatencyAnalyzerDeathTest = LatencyAnalyzerTest;

// Sets the soft limit of `resource`, keeping the hard one.
void SetLimit(int resource, rlim_t value) {
  struct rlimit limit;
  getrlimit(resource, &limit);
  limit.rlim_cur = value;
  setrlimit(resource, &limit);
}

// Runs in a child process: a file-size limit makes the write fail part way.
TEST_F(LatencyAnalyzerDeathTest, FailedWriteIsAnErrorAndLeavesNoFile) {
  ASSERT_THAT(RecursivelyCreateDir(out_), IsOk());
  Events events;
  for (int i = 0; i < 50; ++i) events.emplace_back("LongEventName" + std::to_string(i), 1.0f);
  analyzer_.InjectEvent("Camera-Open", std::move(events));
  EXPECT_EXIT(
      {
        signal(SIGXFSZ, SIG_IGN);
        SetLimit(RLIMIT_FSIZE, 64);
        const Status status = analyzer_.WriteProtoToDisk("camera-ended");
        SetLimit(RLIMIT_FSIZE, RLIM_INFINITY);
        fprintf(stderr, "status: %s\n", status.ToString().c_str());
        const bool nothing_left = Files().empty();
        _exit(!status.ok() && nothing_left ? 0 : 1);
      },
      ::testing::ExitedWithCode(0),
      "status: [A-Z_]+: Failed to write file: .*/camera-ended-.*\\.cpa: File too large");
}

// Runs in a child process with a 16 KiB tmpfs of its own on the scratch root.
TEST_F(LatencyAnalyzerDeathTest, FullAndReadOnlyDisks) {
  if (!testing::ScratchMountsAvailable(root_)) {
    GTEST_SKIP() << "no private tmpfs mounts here: full and read-only disks not exercised";
  }
  analyzer_.InjectEvent("Camera-Open", {{"Overall", 5}, {"Sensor", 2}});
  const auto report = [](const char* what, const Status& status) {
    fprintf(stderr, "%s: %s\n", what, status.ToString().c_str());
  };
  EXPECT_EXIT(
      {
        if (!testing::MountScratchTmpfs(root_, "size=16k") || !RecursivelyCreateDir(out_).ok()) {
          _exit(2);
        }
        // An earlier session's file, and ballast until the disk is full.
        const std::string earlier = out_ + "/camera-ended-" + TimeText(time(nullptr)) + ".cpa";
        std::ofstream(earlier) << "earlier session";
        {
          std::ofstream ballast(out_ + "/ballast");
          const std::string page(4096, 'b');
          for (int i = 0; i < 8 && ballast; ++i) ballast << page << std::flush;
        }
        report("full", analyzer_.WriteProtoToDisk("camera-ended"));
        const std::vector<std::string> after_full = Files();
        const bool kept = ReadFile(earlier) == "earlier session";

        // Space freed: the records are still there to write.
        fs::remove(out_ + "/ballast");
        report("freed", analyzer_.WriteProtoToDisk("camera-ended"));
        const size_t written = Files().size();

        // Read-only: no file in the directory, no directory below it.
        if (!testing::RemountReadOnly(root_)) _exit(3);
        report("read-only", analyzer_.WriteProtoToDisk("camera-ended"));
        analyzer_.SetOutputDirectory(out_ + "/sub");
        report("read-only below", analyzer_.WriteProtoToDisk("camera-ended"));
        _exit(after_full.size() == 2 && kept && written == 2 ? 0 : 1);
      },
      ::testing::ExitedWithCode(0),
      "full: RESOURCE_EXHAUSTED: Failed to write file: .*/camera-ended-[0-9_-]+\\.cpa: No space "
      "left on device\n"
      "(.*\n)?freed: OK\n"
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
        const bool property_names =
            std::string_view(kCameraPerformanceAnalyzerAutoDumpLatencyProperty) ==
                "vendor.camera.debug.camera_performance_analyzer.auto_dump_latency" &&
            std::string_view(kCameraPerformanceAnalyzerWriteToDiskProperty) ==
                "vendor.camera.debug.camera_performance_analyzer.write_to_disk";
        setenv(CameraLatencyAnalyzer::kOutputDirectoryVariable, "/tmp/somewhere/else", 1);
        CameraLatencyAnalyzer& analyzer = CameraLatencyAnalyzer::GetAnalyzer();
        const bool from_env = analyzer.output_directory() == "/tmp/somewhere/else";
        analyzer.SetOutputDirectory("");
        _exit(property_names && from_env &&
                      analyzer.output_directory() == "/data/vendor/camera/profiler"
                  ? 0
                  : 1);
      },
      ::testing::ExitedWithCode(0), "");
}

}  // namespace
}  // namespace orvex
