#include "host/report/progress.h"

#include "contract/message_format.h"
#include "host/text/display_width.h"
#include "host/text/table.h"

#include <cmath>
#include <utility>

namespace quazor {

namespace {

using namespace std::chrono_literals;
using SteadyClock = std::chrono::steady_clock;

constexpr std::chrono::milliseconds kQuietTime = 300ms;
constexpr std::chrono::milliseconds kPeriod = 100ms;
constexpr std::size_t kMinName = 12;  // fewer columns of a name do not tell which one it is

// Rounded to one decimal.
std::string secondsText(double seconds) { return defaultText(std::round(seconds * 10) / 10) + " s"; }

}  // namespace

ExpectedProgress expectedProgressOf(const ResolvedParameters& parameters) {
  const auto above0 = [&parameters](std::string_view wanted) -> const Value* {
    for (const ResolvedParameter& one : parameters.experiment) {
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
                         std::optional<std::uint64_t> frames, std::size_t columns) {
  std::string numbers = ": " + secondsText(elapsedSeconds);
  if (expected.seconds) numbers += " of " + secondsText(*expected.seconds);
  if (expected.frames && frames) numbers += formatMessage(", %@ of %@ frames", *frames, *expected.frames);
  const std::string begin = "Running ";
  const std::string shown = printable(name);
  const std::size_t rest = begin.size() + numbers.size();
  if (columns >= rest + kMinName) return begin + shortened(shown, columns - rest) + numbers;
  return shortened(shown, columns > numbers.size() ? columns - numbers.size() : 0) + numbers;
}

std::size_t StatusLine::columns() const {
  // Some terminals go to the next line as soon as the last column is written.
  return terminal_ == nullptr ? 0 : columnsOf(*terminal_) - 1;
}

void StatusLine::show(const std::string& text) {
  erase();
  if (terminal_ == nullptr) return;
  *terminal_ << shortened(showsOnlyAscii(*terminal_) ? asciiText(text) : text, columns()) << std::flush;
  isThere_ = true;
}

void StatusLine::erase() {
  if (!isThere_) return;
  *terminal_ << "\r\033[K" << std::flush;
  isThere_ = false;
}

void Progress::start(const std::string& name, const ExpectedProgress& expected) {
  running_ = true;
  name_ = name;
  expected_ = expected;
  begin_ = SteadyClock::now();
  nextUpdate_ = begin_ + kQuietTime;
}

void Progress::countFrames(std::function<std::uint64_t()> count) {
  if (running_) frames_ = std::move(count);
}

void Progress::update() {
  if (!running_ || !line_.isShown()) return;
  const SteadyClock::time_point now = SteadyClock::now();
  if (now < nextUpdate_) return;
  nextUpdate_ = now + kPeriod;
  const double elapsed = std::chrono::duration<double>(now - begin_).count();
  const std::optional<std::uint64_t> frames = frames_ ? std::optional(frames_()) : std::nullopt;
  line_.show(progressText(name_, elapsed, expected_, frames, line_.columns()));
}

void Progress::stop() {
  running_ = false;
  frames_ = nullptr;
  line_.erase();
}

void Progress::printAbove(const std::function<void()>& write) {
  line_.erase();
  write();
}

}  // namespace quazor
