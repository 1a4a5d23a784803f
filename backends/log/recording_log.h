// RecordingLog: keeps log lines in memory.
#pragma once

#include "contract/log_channel.h"

#include <mutex>
#include <ostream>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// A log line as the back-end got it.
struct LogRecord {
  LogLevel level = LogLevel::kDefault;
  std::string subsystem;
  std::string category;
  std::string text;

  friend bool operator==(const LogRecord&, const LogRecord&) = default;
};

// For tests that compare records: on failure they are printed as level/subsystem/category/text.
std::ostream& operator<<(std::ostream& out, const LogRecord& record);

// Keeps every line, in the order in which they came, until it is taken.
// Thread: any.
class RecordingLog final : public LogBackend {
 public:
  void write(LogLevel level, std::string_view subsystem, std::string_view category, std::string_view text) override;

  // A copy of what is kept.
  std::vector<LogRecord> records() const;
  // What is kept; from then on it is kept no more.
  std::vector<LogRecord> takeRecords();

 private:
  mutable std::mutex mutex_;        // nothing else is called while it is held
  std::vector<LogRecord> records_;  // guarded by mutex_
};

}  // namespace quazor
