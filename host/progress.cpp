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

ExpectedProgress expectedProgressOf(const BoundParameters& parameters) {
  const auto above0 = [&parameters](std::string_view wanted) -> const Value* {
    for (const BoundParameter& one : parameters.experiment) {
      if (one.name == wanted && one.value && toDouble(&*one.value) > 0) return &*one.value;
    }
    return nullptr;
  };
  ExpectedProgress expected;
  const Value* const duration = above0("duration");
  const Value* const seconds = duration != nullptr ? duration : above0("timeout");
  if (seconds != nullptr) expected.seconds = toDouble(seconds);
  const std::uint64_t frames = toUnsigned(above0("frameCount"));
  if (frames > 0) expected.frames = frames;
  return expected;
}

std::string progressText(const std::string& name, double elapsedSeconds, const ExpectedProgress& expected,
                         std::optional<std::uint64_t> frames) {
  std::string text = "Running " + printable(name) + ": " + secondsText(elapsedSeconds);
  if (expected.seconds) text += " of " + secondsText(*expected.seconds);
  if (expected.frames && frames) text += formatMessage(", %@ of %@ frames", *frames, *expected.frames);
  return text;
}

void Progress::start(const std::string& name, const ExpectedProgress& expected) {
  if (terminal_ == nullptr) return;
  {
    const std::lock_guard lock(mutex_);
    running_ = true;
  }
  thread_ = std::thread([this, name, expected] { show(name, expected); });
}

void Progress::countFrames(std::function<std::uint64_t()> count) {
  const std::lock_guard lock(mutex_);
  if (running_) frames_.swap(count);
}

void Progress::stop() {
  std::function<std::uint64_t()> frames;  // destroyed after the lock is given back
  {
    const std::lock_guard lock(mutex_);
    running_ = false;
    frames.swap(frames_);
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

void Progress::show(const std::string& name, const ExpectedProgress& expected) {
  const SteadyClock::time_point begin = SteadyClock::now();
  std::unique_lock lock(mutex_);
  for (std::chrono::milliseconds due = kQuietTime;; due += kPeriod) {
    if (wake_.wait_until(lock, begin + due, [this] { return !running_; })) return;
    const double elapsed = std::chrono::duration<double>(SteadyClock::now() - begin).count();
    const std::optional<std::uint64_t> frames = frames_ ? std::optional(frames_()) : std::nullopt;
    erase();
    *terminal_ << progressText(name, elapsed, expected, frames) << std::flush;
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
