#include "backends/log/standard_error_log.h"

#include "contract/message_format.h"

#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <utility>

namespace quazor {

namespace {

std::string_view nameOf(LogLevel level) {
  switch (level) {
    case LogLevel::kError: return "error";
    case LogLevel::kDefault: return "default";
    case LogLevel::kDebug: return "debug";
  }
  return "unknown";
}

// The default text of a date, with milliseconds in place of the offset.
std::string timeText(Date date) {
  constexpr std::size_t kUpToTheSecond = 19;  // 2026-11-21 01:08:00
  const auto milliseconds =
      std::chrono::floor<std::chrono::milliseconds>(date) - std::chrono::floor<std::chrono::seconds>(date);
  const std::string digits = std::to_string(milliseconds.count());
  return defaultText(date).substr(0, kUpToTheSecond) + "." + std::string(3 - digits.size(), '0') + digits;
}

// Writes all bytes unless the descriptor reports an error.
void writeAll(int descriptor, std::string_view bytes) {
  while (!bytes.empty()) {
    const ssize_t written = ::write(descriptor, bytes.data(), bytes.size());
    if (written > 0) {
      bytes.remove_prefix(static_cast<std::size_t>(written));
    } else if (errno != EINTR) {
      return;
    }
  }
}

}  // namespace

std::string readableLogLine(Date date, LogLevel level, std::string_view category, std::string_view text) {
  while (text.ends_with('\n')) text.remove_suffix(1);
  std::string line = timeText(date);
  line += ' ';
  line += nameOf(level);
  line += ' ';
  line += category;
  line += ": ";
  for (const char character : text) {
    line += character;
    if (character == '\n') line += "    ";
  }
  line += '\n';
  return line;
}

StandardErrorLog::StandardErrorLog(std::shared_ptr<const Clock> clock, int descriptor)
    : clock_(std::move(clock)), descriptor_(descriptor) {}

void StandardErrorLog::write(LogLevel level, std::string_view /*subsystem*/, std::string_view category,
                             std::string_view text) {
  const std::string line = readableLogLine(clock_->date(), level, category, text);
  const std::lock_guard lock(mutex_);
  writeAll(descriptor_, line);
}

}  // namespace quazor
