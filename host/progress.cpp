#include "host/progress.h"

#include "frame/message_format.h"
#include "host/table.h"

#include <cmath>
#include <utility>

namespace quazor {

namespace {

using namespace std::chrono_literals;
using SteadyClock = std::chrono::steady_clock;

constexpr std::chrono::milliseconds kQuietTime = 300ms;
constexpr std::chrono::milliseconds kPeriod = 100ms;

// With at most one digit after the point.
std::string secondsText(double seconds) { return defaultText(std::round(seconds * 10) / 10) + " s"; }

}  // namespace

std::optional<double> expectedSeconds(const BoundParameters& parameters) {
  for (const std::string_view wanted : {"duration", "timeout"}) {
    for (const BoundParameter& one : parameters.experiment) {
      if (one.name == wanted && one.value && toDouble(&*one.value) > 0) return toDouble(&*one.value);
    }
  }
  return std::nullopt;
}

std::string progressText(const std::string& name, double elapsedSeconds, std::optional<double> expectedSeconds) {
  std::string text = "Running " + printable(name) + ": " + secondsText(elapsedSeconds);
  if (expectedSeconds) text += " of " + secondsText(*expectedSeconds);
  return text;
}

void Progress::start(const std::string& name, std::optional<double> expectedSeconds) {
  if (terminal_ == nullptr) return;
  {
    const std::lock_guard lock(mutex_);
    running_ = true;
  }
  thread_ = std::thread([this, name, expectedSeconds] { show(name, expectedSeconds); });
}

void Progress::stop() {
  {
    const std::lock_guard lock(mutex_);
    running_ = false;
    erase();
  }
  wake_.notify_all();
  if (thread_.joinable()) thread_.join();
}

void Progress::aside(const std::function<void()>& write) {
  const std::lock_guard lock(mutex_);
  erase();
  write();
}

void Progress::show(const std::string& name, std::optional<double> expectedSeconds) {
  const SteadyClock::time_point begin = SteadyClock::now();
  std::unique_lock lock(mutex_);
  for (std::chrono::milliseconds due = kQuietTime;; due += kPeriod) {
    if (wake_.wait_until(lock, begin + due, [this] { return !running_; })) return;
    const double elapsed = std::chrono::duration<double>(SteadyClock::now() - begin).count();
    erase();
    *terminal_ << progressText(name, elapsed, expectedSeconds) << std::flush;
    shown_ = true;
  }
}

void Progress::erase() {
  if (!shown_) return;
  *terminal_ << "\r\033[K" << std::flush;
  shown_ = false;
}

void LogBesideProgress::write(LogLevel level, std::string_view subsystem, std::string_view category,
                              std::string_view text) {
  progress_.aside([&] { backend_->write(level, subsystem, category, text); });
}

}  // namespace quazor
