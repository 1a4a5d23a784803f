#include "host/run_log.h"

#include <utility>

namespace quazor {

std::string_view nameOf(LogLevel level) {
  switch (level) {
    case LogLevel::kError: return "error";
    case LogLevel::kDefault: return "default";
    case LogLevel::kDebug: break;
  }
  return "debug";
}

RunLog::RunLog(std::shared_ptr<const Clock> clock, std::vector<Listener> listeners)
    : clock_(std::move(clock)), begin_(clock_->now()), listeners_(std::move(listeners)) {}

void RunLog::write(LogLevel level, std::string_view subsystem, std::string_view category, std::string_view text) {
  LogLine line{clock_->now() - begin_, level, std::string(text)};
  {
    const std::lock_guard lock(mutex_);
    lines_.push_back(std::move(line));
  }
  for (const Listener& listener : listeners_) {
    if (level <= listener.level) listener.backend->write(level, subsystem, category, text);
  }
}

std::vector<LogLine> RunLog::lines() const {
  const std::lock_guard lock(mutex_);
  return lines_;
}

}  // namespace quazor
