#include "orvex/status/status_builder.h"

#include <mutex>

#include "absl/container/flat_hash_map.h"
#include "orvex/status/log.h"

namespace orvex {
namespace {

using LocationKey = std::pair<const char*, uint32_t>;

// Per-location counters for every-N logging.
struct EveryNTable {
  std::mutex mu;
  absl::flat_hash_map<LocationKey, uint32_t> counters;
};
// Per-location next allowed time for every-period logging.
struct EveryPeriodTable {
  std::mutex mu;
  absl::flat_hash_map<LocationKey, absl::Time> next_log_time;
};

EveryNTable& GetEveryNTable() {
  static auto* table = new EveryNTable;
  return *table;
}
EveryPeriodTable& GetEveryPeriodTable() {
  static auto* table = new EveryPeriodTable;
  return *table;
}

android::base::LogSeverity ToAndroidSeverity(int32_t severity) {
  switch (severity) {
    case StatusBuilder::kInfo:
      return android::base::INFO;
    case StatusBuilder::kWarning:
      return android::base::WARNING;
    case StatusBuilder::kError:
      return android::base::ERROR;
    default:
      return android::base::FATAL;
  }
}

}  // namespace

StatusBuilder::Rep::Rep(const Rep& other)
    : logging_mode(other.logging_mode),
      log_severity(other.log_severity),
      n(other.n),
      period(other.period),
      text(other.text),
      stream(&text),
      join_style(other.join_style) {}

StatusBuilder::StatusBuilder(const StatusBuilder& other)
    : status_(other.status_),
      location_(other.location_),
      rep_(other.rep_ == nullptr ? nullptr : std::make_unique<Rep>(*other.rep_)) {}

StatusBuilder& StatusBuilder::operator=(const StatusBuilder& other) {
  if (this == &other) return *this;
  status_ = other.status_;
  location_ = other.location_;
  rep_ = other.rep_ == nullptr ? nullptr : std::make_unique<Rep>(*other.rep_);
  return *this;
}

StatusBuilder::~StatusBuilder() = default;

StatusBuilder::Rep& StatusBuilder::GetRep() {
  if (rep_ == nullptr) rep_ = std::make_unique<Rep>();
  return *rep_;
}

StatusBuilder& StatusBuilder::Log(int32_t severity) & {
  if (status_.ok()) return *this;
  Rep& rep = GetRep();
  rep.logging_mode = LogMode::kAlways;
  rep.log_severity = severity;
  return *this;
}

StatusBuilder& StatusBuilder::LogEveryN(int32_t severity, uint32_t n) & {
  if (status_.ok()) return *this;
  Rep& rep = GetRep();
  rep.logging_mode = LogMode::kEveryN;
  rep.log_severity = severity;
  rep.n = n;
  return *this;
}

StatusBuilder& StatusBuilder::LogEvery(int32_t severity, absl::Duration period) & {
  if (status_.ok()) return *this;
  Rep& rep = GetRep();
  rep.logging_mode = LogMode::kEveryPeriod;
  rep.log_severity = severity;
  rep.period = period;
  return *this;
}

StatusBuilder& StatusBuilder::SetJoinStyle(MessageJoinStyle style) & {
  if (status_.ok()) return *this;
  GetRep().join_style = style;
  return *this;
}

StatusBuilder::operator Status() const& {
  if (rep_ == nullptr) return status_;
  return StatusBuilder(*this).CreateStatusAndConditionallyLog();
}

StatusBuilder::operator Status() && {
  if (rep_ == nullptr) return std::move(status_);
  return std::move(*this).CreateStatusAndConditionallyLog();
}

Status StatusBuilder::CreateStatusAndConditionallyLog() && {
  if (rep_ == nullptr) return std::move(status_);
  Status result = JoinMessageToStatus(std::move(status_), rep_->text, rep_->join_style);
  ConditionallyLog(result);
  // A builder read after conversion reads as UNKNOWN, never as OK.
  status_ = UnknownError("");
  rep_.reset();
  return result;
}

Status StatusBuilder::JoinMessageToStatus(Status status, std::string_view text,
                                          MessageJoinStyle style) {
  if (text.empty()) return status;
  if (style == MessageJoinStyle::kAnnotate) return Annotate(status, text);
  if (style == MessageJoinStyle::kPrepend) {
    return Status(status.code(), std::string(text).append(status.message()));
  }
  return Status(status.code(), std::string(status.message()).append(text));
}

void StatusBuilder::ConditionallyLog(const Status& status) const {
  const Rep& rep = *rep_;
  switch (rep.logging_mode) {
    case LogMode::kNone:
      return;
    case LogMode::kAlways:
      break;
    case LogMode::kEveryN: {
      EveryNTable& table = GetEveryNTable();
      uint32_t count;
      {
        std::lock_guard<std::mutex> lock(table.mu);
        uint32_t& counter = table.counters[{location_.file_name(), location_.line()}];
        count = counter;
        counter = count + 1;  // Unsigned: wraps after 2^32 occurrences.
      }
      const bool log = rep.n == 0 ? count == 0 : count % rep.n == 0;
      if (!log) return;
      break;
    }
    case LogMode::kEveryPeriod: {
      const absl::Time now = absl::Now();
      EveryPeriodTable& table = GetEveryPeriodTable();
      {
        std::lock_guard<std::mutex> lock(table.mu);
        auto [it, inserted] = table.next_log_time.try_emplace(
            LocationKey{location_.file_name(), location_.line()}, absl::UnixEpoch());
        if (now < it->second) return;
        it->second = now + rep.period;
      }
      break;
    }
  }

  const android::base::LogSeverity severity = ToAndroidSeverity(rep.log_severity);
  log_internal::ErrnoSaver errno_saver;
  if (!android::base::ShouldLog(severity, nullptr)) return;
  std::string text = location_.file_name() != nullptr ? location_.file_name() : "";
  text.append(":").append(std::to_string(location_.line())).append(": ").append(status.ToString());
  if (severity == android::base::FATAL) {
    log_internal::FatalLogLine(ORVEX_SOURCE_UNIT, __LINE__).stream() << text;
  }
  log_internal::LogLine(ORVEX_SOURCE_UNIT, __LINE__, severity).stream() << text;
}

std::ostream& operator<<(std::ostream& os, const StatusBuilder& builder) {
  return os << static_cast<Status>(builder).ToString();
}

std::ostream& operator<<(std::ostream& os, StatusBuilder&& builder) {
  return os << static_cast<Status>(std::move(builder)).ToString();
}

}  // namespace orvex
