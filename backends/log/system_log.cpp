#include "backends/log/system_log.h"

#include "base/text/utf8.h"

#include <syslog.h>

#include <utility>

namespace quazor {

namespace {

// Truncates between UTF-8 characters, whose first byte is followed by at most three.
std::string_view cut(std::string_view text, std::size_t size) {
  if (text.size() <= size) return text;
  for (int i = 0; i < 3 && continuesUtf8(text[size]); ++i) --size;
  return text.substr(0, size);
}

void systemSyslog(int priority, const std::string& line) { ::syslog(priority | LOG_USER, "%s", line.c_str()); }

}  // namespace

SystemLog::SystemLog() : SystemLog(systemSyslog) { ::openlog(kIdentifier, LOG_PID, LOG_USER); }

SystemLog::SystemLog(Syslog syslog) : syslog_(std::move(syslog)) {}

int SystemLog::priorityOf(LogLevel level) {
  switch (level) {
    case LogLevel::kError: return LOG_ERR;
    case LogLevel::kDefault: return LOG_NOTICE;
    case LogLevel::kDebug: return LOG_DEBUG;
  }
  return LOG_NOTICE;
}

void SystemLog::write(LogLevel level, std::string_view /*subsystem*/, std::string_view category,
                      std::string_view text) {
  syslog_(priorityOf(level), std::string(category) + ": " + std::string(cut(text, kMaxTextLength)));
}

}  // namespace quazor
