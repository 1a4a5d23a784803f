// RecordingLog: keeps log lines in memory.
#pragma once

#include "contract/log_channel.h"

#include <mutex>
#include <ostream>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// A log line as the backend received it.
struct LogRecord {
  LogLevel level = LogLevel::kDefault;
  std::string subsystem;
  std::string category;
  std::string text;

  friend bool operator==(const LogRecord&, const LogRecord&) = default;
};

// Tests print records as level/subsystem/category/text when a comparison fails.
std::ostream& operator<<(std::ostream& out, const LogRecord& record);

// Keeps all lines in order until they are taken.
// Thread: any.
class RecordingLog final : public LogBackend {
 public:
  void write(LogLevel level, std::string_view subsystem, std::string_view category, std::string_view text) override;

  // A copy of the kept records.
  std::vector<LogRecord> records() const;
  // Moves out the kept records.
  std::vector<LogRecord> takeRecords();

 private:
  mutable std::mutex mutex_;        // nothing else is called while it is held
  std::vector<LogRecord> records_;  // guarded by mutex_
};

}  // namespace quazor
