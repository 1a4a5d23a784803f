#include "host/run/frame_teller.h"

#include "contract/message_format.h"
#include "host/text/timestamp.h"

#include <cstddef>
#include <utility>

namespace quazor {

namespace {

using namespace std::chrono_literals;
using SteadyClock = std::chrono::steady_clock;

// So a host that is killed leaves a record with all frames but those of the last seconds.
constexpr std::chrono::seconds kLongest = 10s;

}  // namespace

bool FrameTeller::update() {
  const bool isUrgent = collect(false);
  const Moment now = SteadyClock::now();
  for (std::size_t i = 0; i < collected_.size(); ++i) {
    if (!collected_[i].event.frames.empty() && now - collected_[i].since >= kLongest) tell(i);
  }
  return isUrgent;
}

void FrameTeller::end() {
  collect(true);
  for (std::size_t i = 0; i < drain_.size(); ++i) tell(i);
  if (const std::uint64_t streams = drain_.withoutRing(); streams > 0) {
    events_.onEvent(Logged{{{},
                            LogLevel::kDefault,
                            formatMessage("%@ more streams or queues are not recorded: there are more than %@", streams,
                                          FrameRings::kMaxStreams),
                            dateNow()},
                           true});
  }
}

bool FrameTeller::collect(bool isLast) {
  return drain_.drain(isLast, [this](std::size_t stream, const TracedFrame& frame, std::uint64_t step) {
    if (collected_.size() <= stream) collected_.resize(stream + 1);
    Collected& collected = collected_[stream];
    if (collected.event.step != step) tell(stream);
    if (collected.event.frames.empty()) collected.since = SteadyClock::now();
    collected.event.step = step;
    collected.event.frames.push_back(frame);
    if (collected.event.frames.size() == kMaxTracedFrames) tell(stream);
  });
}

void FrameTeller::tell(std::size_t stream) {
  if (collected_.size() <= stream) collected_.resize(stream + 1);
  FramesTraced& event = collected_[stream].event;
  event.lost = drain_.takeLost(stream);
  if (event.frames.empty() && event.lost == 0) return;
  event.stream = drain_.nameOf(stream);
  event.kind = drain_.kindOf(stream);
  events_.onEvent(event);
  event.frames.clear();
}

}  // namespace quazor
