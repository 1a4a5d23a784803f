#include "backends/hid/hid_input_delivery.h"

#include <algorithm>
#include <cstdint>
#include <utility>

namespace quazor {

void HidInputDelivery::setReceiver(HidDevice::InputReportCallback receiver) {
  Receiver replacement =
      receiver ? std::make_shared<const HidDevice::InputReportCallback>(std::move(receiver)) : nullptr;
  const std::lock_guard lock(mutex_);
  receiver_.swap(replacement);
}

void HidInputDelivery::schedule(RunLoop& loop, std::string_view mode) {
  const auto place = std::make_shared<Place>();
  place->loop = &loop;
  place->mode = mode;
  // The handler must not extend the lifetime of this object. Once the object is gone, the handler removes its own
  // source.
  const std::shared_ptr<RunLoopSource> source = loop.makeSource([weak = weak_from_this(), place] {
    const std::shared_ptr<HidInputDelivery> self = weak.lock();
    if (self == nullptr || !self->deliver(*place)) place->loop->removeSource(place->source.lock(), place->mode);
  });
  place->source = source;
  {
    const std::lock_guard lock(mutex_);
    if (find(loop, mode) != places_.end()) return;
    places_.push_back({place, source});
    onScheduled(*place);
  }
  loop.addSource(source, mode);
}

void HidInputDelivery::unschedule(RunLoop& loop, std::string_view mode) {
  std::shared_ptr<RunLoopSource> source;
  {
    const std::lock_guard lock(mutex_);
    const auto found = find(loop, mode);
    if (found == places_.end()) return;
    // NOLINTNEXTLINE(performance-unnecessary-copy-initialization): the original is erased
    const Scheduled scheduled = *found;
    places_.erase(found);
    onUnscheduled(*scheduled.place);
    source = scheduled.source;
  }
  loop.removeSource(source, mode);
}

void HidInputDelivery::retire() {
  Receiver receiver;
  const std::lock_guard lock(mutex_);
  receiver_.swap(receiver);
  onRetired();
  for (const Scheduled& scheduled : places_) scheduled.source->signal();
  places_.clear();
}

void HidInputDelivery::signal(const Place& place) {
  if (const std::shared_ptr<RunLoopSource> source = place.source.lock()) source->signal();
}

std::vector<HidInputDelivery::Scheduled>::const_iterator HidInputDelivery::find(const RunLoop& loop,
                                                                                std::string_view mode) const {
  return std::ranges::find_if(places_, [&](const Scheduled& scheduled) {
    return scheduled.place->loop == &loop && scheduled.place->mode == mode;
  });
}

bool HidInputDelivery::isScheduled(const Place& place) const {
  return std::ranges::any_of(places_, [&](const Scheduled& scheduled) { return scheduled.place.get() == &place; });
}

// Handles the source of a place. Returns false if the device is no longer scheduled there. The number of inputs per
// round is limited: a receiver that is slower than the device must not starve other sources or the loop's time limit.
bool HidInputDelivery::deliver(const Place& place) {
  {
    const std::lock_guard lock(mutex_);
    if (!isScheduled(place)) return false;
    onRoundBegan(place);
  }
  for (std::size_t i = 0; i < kMaxInARound && deliverNext(place); ++i) {
  }
  return true;
}

// Checks all state again, because the receiver may have changed it.
bool HidInputDelivery::deliverNext(const Place& place) {
  std::shared_ptr<const HidInput> input;
  Receiver receiver;
  {
    const std::lock_guard lock(mutex_);
    if (!isScheduled(place)) return false;
    input = next(place);
    if (input == nullptr) return false;
    receiver = receiver_;
  }
  const std::uint8_t reportID = input->report.empty() ? std::uint8_t{0} : input->report.front();
  if (receiver != nullptr) (*receiver)(reportID, input->report, input->error);
  return true;
}

}  // namespace quazor
