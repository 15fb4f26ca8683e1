#include "orvex/api/debug/camera_latency_analyzer.h"

#include <errno.h>
#include <fcntl.h>
#include <stdio.h>
#include <stdlib.h>
#include <time.h>
#include <unistd.h>

#include <atomic>
#include <string>

#include "absl/container/flat_hash_map.h"
#include "absl/strings/match.h"
#include "absl/strings/str_cat.h"
#include "absl/strings/string_view.h"
#include "absl/time/clock.h"
#include "absl/time/time.h"
#include "orvex/api/sysprop/system_properties.h"
#include "orvex/base/path.h"
#include "orvex/status/log.h"
#include "orvex/status/status_builder.h"

namespace orvex {
namespace {

constexpr std::string_view kCloseSuffix = "-Close";
constexpr std::string_view kOverallEvent = "Overall";
constexpr std::string_view kFileExtension = ".cpa";
// Names tried for one prefix and second: the plain one, then _1 .. _999.
constexpr int kMaxNameAttempts = 1000;

absl::string_view ToAbsl(std::string_view text) { return {text.data(), text.size()}; }

bool EndsWithClose(std::string_view operation) {
  return absl::EndsWithIgnoreCase(ToAbsl(operation), ToAbsl(kCloseSuffix));
}

// "%Y-%m-%d_%H-%M-%S" of the current local time.
std::string LocalTimeText() {
  const time_t seconds = absl::ToTimeT(absl::Now());
  struct tm local = {};
  char text[40] = {};
  if (localtime_r(&seconds, &local) != nullptr) {
    strftime(text, sizeof(text), "%Y-%m-%d_%H-%M-%S", &local);
  }
  return text;
}

// Writes all of `bytes` to `fd`; 0 or the errno of the failure.
int WriteAll(int fd, const std::string& bytes) {
  const char* data = bytes.data();
  size_t left = bytes.size();
  while (left > 0) {
    const ssize_t n = write(fd, data, left);
    if (n < 0) {
      if (errno == EINTR) continue;
      return errno;
    }
    if (n == 0) return EIO;
    data += n;
    left -= static_cast<size_t>(n);
  }
  return 0;
}

// Moves `from` to `to` unless `to` exists; 0 or the errno of the failure
// (EEXIST when the name is taken).
int MoveNoReplace(const std::string& from, const std::string& to) {
  if (renameat2(AT_FDCWD, from.c_str(), AT_FDCWD, to.c_str(), RENAME_NOREPLACE) == 0) return 0;
  const int error = errno;
  if (error != EINVAL && error != ENOSYS && error != ENOTSUP) return error;
  // File systems without the no-replace flag: a hard link is made only when
  // the name is free, and the temporary name then goes.
  if (link(from.c_str(), to.c_str()) != 0) return errno;
  unlink(from.c_str());
  return 0;
}

// A temporary file in `directory`, hidden and unique within the system.
std::string TemporaryPath(std::string_view directory, std::string_view name) {
  static std::atomic<uint64_t> counter{0};
  return JoinPath(directory, absl::StrCat(".", std::string(name), ".tmp-", getpid(), "-",
                                          counter.fetch_add(1)));
}

}  // namespace

CameraLatencyAnalyzer::CameraLatencyAnalyzer() {
  const char* directory = getenv(kOutputDirectoryVariable);
  output_directory_ = (directory != nullptr && *directory != '\0')
                          ? std::string(directory)
                          : std::string(kDefaultOutputDirectory);
}

CameraLatencyAnalyzer& CameraLatencyAnalyzer::GetAnalyzer() {
  static CameraLatencyAnalyzer* const analyzer = new CameraLatencyAnalyzer();
  return *analyzer;
}

std::optional<float> CameraLatencyAnalyzer::LatencyThresholdMs(std::string_view operation) {
  const size_t dash = operation.rfind('-');
  const absl::string_view kind =
      ToAbsl(dash == std::string_view::npos ? operation : operation.substr(dash + 1));
  if (absl::EqualsIgnoreCase(kind, "Open")) return 300.0f;
  if (absl::EqualsIgnoreCase(kind, "Close")) return 250.0f;
  if (absl::EqualsIgnoreCase(kind, "Reconfiguration")) return 715.0f;
  return std::nullopt;
}

void CameraLatencyAnalyzer::InjectEvent(std::string_view operation,
                                        std::list<std::pair<std::string, float>> events) {
  InjectEvent(operation, std::move(events), nullptr);
}

void CameraLatencyAnalyzer::InjectEvent(std::string_view operation,
                                        std::list<std::pair<std::string, float>> events,
                                        std::string* written_path) {
  std::lock_guard<std::mutex> lock(mutex_);
  if (written_path != nullptr) written_path->clear();
  const CameraOperationLatencyData& record = latency_data_.emplace_back(
      CameraOperationLatencyData{std::string(operation), std::move(events)});

  if (const std::optional<float> threshold = LatencyThresholdMs(operation)) {
    for (const auto& [name, duration_ms] : record.events) {
      if (name == kOverallEvent && duration_ms >= *threshold) threshold_exceeded_ = true;
    }
  }

  if (!EndsWithClose(operation)) return;
  SystemProperties& properties = SystemProperties::GetInstance();
  const StatusOr<bool> auto_dump =
      properties.GetAs<bool>(kCameraPerformanceAnalyzerAutoDumpLatencyProperty);
  if (auto_dump.ok() && !*auto_dump) threshold_exceeded_ = false;
  if (threshold_exceeded_) {
    WriteLatencyData(true, written_path);
    return;
  }
  const StatusOr<bool> write_to_disk =
      properties.GetAs<bool>(kCameraPerformanceAnalyzerWriteToDiskProperty);
  WriteLatencyData(write_to_disk.ok() && *write_to_disk, written_path);
}

void CameraLatencyAnalyzer::WriteLatencyData(bool write_to_disk) {
  WriteLatencyData(write_to_disk, nullptr);
}

void CameraLatencyAnalyzer::WriteLatencyData(bool write_to_disk, std::string* written_path) {
  if (write_to_disk && !WriteProtoToDisk("camera-ended", written_path).ok()) {
    ORVEX_LOG(ERROR) << "[CPA] Not able to write camera-ended Proto to disk";
  }
  ClearLatencyData();
}

void CameraLatencyAnalyzer::ClearLatencyData() {
  latency_data_.clear();
  threshold_exceeded_ = false;
}

CameraPerformanceDataFile CameraLatencyAnalyzer::ConvertToProto() const {
  CameraPerformanceDataFile file;
  absl::flat_hash_map<std::string_view, CameraLatencyData*> by_operation;
  for (const CameraOperationLatencyData& record : latency_data_) {
    if (record.operation.empty()) continue;
    auto [it, inserted] = by_operation.try_emplace(record.operation, nullptr);
    if (inserted) {
      it->second = file.add_camera_latency_data();
      it->second->set_operation_case(record.operation);
    }
    for (const auto& [name, duration_ms] : record.events) {
      CameraLatencyDataType* event = it->second->add_latency_data();
      event->set_event_name(name);
      event->set_duration_ms(duration_ms);
    }
  }
  return file;
}

Status CameraLatencyAnalyzer::WriteProtoToDisk(std::string_view prefix) const {
  return WriteProtoToDisk(prefix, nullptr);
}

Status CameraLatencyAnalyzer::WriteProtoToDisk(std::string_view prefix,
                                               std::string* written_path) const {
  // The directory is made in its clean form, so the file must go through
  // that same form: with a symbolic link before a "..", the kernel resolves
  // the raw path to somewhere else.
  const std::string directory = CleanPath(output_directory());
  Status status = RecursivelyCreateDir(directory);
  if (!status.ok()) return status;

  const std::string stem = std::string(prefix) + "-" + LocalTimeText();
  const std::string first_path = JoinPath(directory, stem + std::string(kFileExtension));

  std::string bytes;
  if (!ConvertToProto().SerializeToString(&bytes)) {
    return InternalErrorBuilder(ORVEX_LOC) << "Failed to serialize latency data for " << first_path;
  }

  const std::string temporary = TemporaryPath(directory, stem);
  const int fd = open(temporary.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0666);
  if (fd < 0) return InternalErrorBuilder(ORVEX_LOC) << "Failed to open file: " << first_path;
  int error = WriteAll(fd, bytes);
  if (close(fd) != 0 && error == 0) error = errno;
  if (error != 0) {
    unlink(temporary.c_str());
    return StatusFromErrno(error, "Failed to write file: " + first_path);
  }

  for (int attempt = 0; attempt < kMaxNameAttempts; ++attempt) {
    const std::string path = attempt == 0
                                 ? first_path
                                 : JoinPath(directory, stem + "_" + std::to_string(attempt) +
                                                           std::string(kFileExtension));
    error = MoveNoReplace(temporary, path);
    if (error == 0) {
      ORVEX_LOG(INFO) << "[CPA] Camera latency data written to " << path;
      if (written_path != nullptr) *written_path = path;
      return OkStatus();
    }
    if (error != EEXIST) break;
  }
  unlink(temporary.c_str());
  if (error == EEXIST) {
    return AlreadyExistsErrorBuilder(ORVEX_LOC)
           << "No free file name left for " << first_path << " within this second";
  }
  return StatusFromErrno(error, "Failed to write file: " + first_path);
}

void CameraLatencyAnalyzer::SetOutputDirectory(std::string_view directory) {
  std::lock_guard<std::mutex> lock(directory_mutex_);
  output_directory_ =
      directory.empty() ? std::string(kDefaultOutputDirectory) : std::string(directory);
}

std::string CameraLatencyAnalyzer::output_directory() const {
  std::lock_guard<std::mutex> lock(directory_mutex_);
  return output_directory_;
}

}  // namespace orvex
