#include "host/model/run_log.h"

#include "host/model/run_event.h"
#include "host/text/timestamp.h"

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

thread_local const RunLog* RunLog::ownerOfThisThread = nullptr;

RunLog::RunLog(std::shared_ptr<const Clock> clock, RunEventSink& events)
    : clock_(std::move(clock)), begin_(clock_->now()), events_(&events) {}

void RunLog::write(LogLevel level, std::string_view /*subsystem*/, std::string_view /*category*/,
                   std::string_view text) {
  if (ownerOfThisThread != nullptr && ownerOfThisThread != this) return;
  const std::lock_guard lock(mutex_);
  if (events_ != nullptr) events_->onEvent(Logged{{clock_->now() - begin_, level, std::string(text), dateNow()}});
}

void RunLog::close() {
  const std::lock_guard lock(mutex_);
  events_ = nullptr;
}

}  // namespace quazor
