#include "contract/log_channel.h"

#include <utility>

namespace QUAZOR_CONTRACT {

LogBackend::~LogBackend() = default;

std::atomic<int> LogChannel::threshold_{0};

LogChannel::LogChannel(std::string subsystem, std::string category)
    : subsystem_(std::move(subsystem)), category_(std::move(category)) {}

void LogChannel::write(LogLevel level, std::string_view text) {
  std::shared_ptr<LogBackend> backend;
  {
    const std::lock_guard lock(mutex_);
    backend = backend_;
  }
  if (backend != nullptr) backend->write(level, subsystem_, category_, text);
}

void LogChannel::setBackend(std::shared_ptr<LogBackend> backend, LogLevel level) {
  {
    const std::lock_guard lock(mutex_);
    threshold_.store(backend == nullptr ? 0 : static_cast<int>(level), std::memory_order_relaxed);
    backend_.swap(backend);
  }
  // The previous backend is destroyed here, outside the lock.
}

LogChannel& sharedLog() {
  // Never destroyed: a task that outlives the host's main function may still write a line.
  static auto* const channel = new LogChannel("org.quazor.camera-sensor-diagnostics", "quazor");
  return *channel;
}

}  // namespace QUAZOR_CONTRACT
