// The time line of a run in the Trace Event Format (JSON) that Chrome's tracing, Perfetto and speedscope open.
// docs/timeline.md is the public description.
#pragma once

#include "host/model/run_event.h"

#include <chrono>
#include <cstddef>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

namespace quazor {

// A part of a time line: what touches it is shown.
struct TimelinePart {
  std::chrono::nanoseconds from = std::chrono::nanoseconds::min();
  std::chrono::nanoseconds to = std::chrono::nanoseconds::max();

  bool isEverything() const { return from == std::chrono::nanoseconds::min() && to == std::chrono::nanoseconds::max(); }
};

// The largest time line that is written. Viewers load it into memory several times over.
inline constexpr std::size_t kMaxTimeline = 200'000'000;  // bytes

// Thread: any.
class TimelineTooLarge : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// Time 0 is the beginning of the run. A diagnostic begins at its own date, or where the one before it ends if that is
// later, as on a simulated phone, whose clock runs ahead of the wall clock. Within a diagnostic the phone's clock
// counts: a stage begins where the one before it ended. Stages that this clock does not measure have their time by the
// wall clock. A run that did not end has a time line up to its last event.
//
// Thread: one at a time.
class Timeline final : public RunEventSink {
 public:
  explicit Timeline(const TimelinePart& part = {}, std::size_t most = kMaxTimeline);
  ~Timeline() override;

  // Events after those that do not fit are left out.
  void onEvent(const RunEvent& event) override;

  // The whole text, after the last event. Throws a TimelineTooLarge if it would be longer than `most` bytes.
  const std::string& text();

  // After text(): true if no diagnostic and nothing that belongs to one is in the part.
  bool isEmpty() const;
  // After text(): where the whole time line ends.
  std::chrono::nanoseconds end() const;

 private:
  class Writer;

  std::unique_ptr<Writer> writer_;
};

// The time line of these events.
std::string timelineText(const std::vector<RunEvent>& events, const TimelinePart& part = {},
                         std::size_t most = kMaxTimeline);

}  // namespace quazor
