#include "backends/log/recording_log.h"

#include <utility>

namespace quazor {

std::ostream& operator<<(std::ostream& out, const LogRecord& record) {
  return out << static_cast<int>(record.level) << '/' << record.subsystem << '/' << record.category << '/'
             << record.text;
}

void RecordingLog::write(LogLevel level, std::string_view subsystem, std::string_view category, std::string_view text) {
  LogRecord record{level, std::string(subsystem), std::string(category), std::string(text)};
  const std::lock_guard lock(mutex_);
  records_.push_back(std::move(record));
}

std::vector<LogRecord> RecordingLog::records() const {
  const std::lock_guard lock(mutex_);
  return records_;
}

std::vector<LogRecord> RecordingLog::takeRecords() {
  const std::lock_guard lock(mutex_);
  return std::exchange(records_, {});
}

}  // namespace quazor
