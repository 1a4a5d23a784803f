#include "backends/simulated/hid/hid_inbox.h"

#include <algorithm>
#include <utility>

namespace quazor {

void HidInbox::open() {
  const std::lock_guard lock(mutex_);
  open_ = true;
}

void HidInbox::close() {
  const std::lock_guard lock(mutex_);
  open_ = false;
  dropUnlessReceivable();
}

void HidInbox::setReceiver(HidDevice::InputReportCallback receiver) {
  Receiver replacement =
      receiver ? std::make_shared<const HidDevice::InputReportCallback>(std::move(receiver)) : nullptr;
  const std::lock_guard lock(mutex_);
  receiver_.swap(replacement);
}

void HidInbox::schedule(RunLoop& loop, std::string_view mode) {
  const auto place = std::make_shared<Place>();
  place->loop = &loop;
  place->mode = mode;
  // The handler does not keep the inbox, which ends with its user; then it ends its own source.
  const std::shared_ptr<RunLoopSource> source = loop.makeSource([weak = weak_from_this(), place] {
    const std::shared_ptr<HidInbox> self = weak.lock();
    if (self == nullptr || !self->deliver(*place)) place->loop->removeSource(place->source.lock(), place->mode);
  });
  place->source = source;
  {
    const std::lock_guard lock(mutex_);
    if (find(loop, mode) != places_.end()) return;
    places_.push_back({place, source});
    if (!waiting_.empty()) source->signal();  // what waits for another place may be left to this one
  }
  loop.addSource(source, mode);
}

void HidInbox::unschedule(RunLoop& loop, std::string_view mode) {
  std::shared_ptr<RunLoopSource> source;
  {
    const std::lock_guard lock(mutex_);
    const auto found = find(loop, mode);
    if (found == places_.end()) return;
    source = found->source;
    places_.erase(found);
    dropUnlessReceivable();
  }
  loop.removeSource(source, mode);
}

void HidInbox::retire() {
  Receiver receiver;
  const std::lock_guard lock(mutex_);
  receiver_.swap(receiver);
  open_ = false;
  for (const Scheduled& scheduled : places_) scheduled.source->signal();
  places_.clear();
  dropUnlessReceivable();
}

void HidInbox::take(std::shared_ptr<const HidInput> input) {
  const std::lock_guard lock(mutex_);
  if (waiting_.size() >= kDepth && input->error == nullptr) return;
  waiting_.push_back(std::move(input));
  dropUnlessReceivable();
  if (waiting_.empty()) return;
  for (const Scheduled& scheduled : places_) scheduled.source->signal();
}

void HidInbox::dropUnlessReceivable() {
  if (!open_ || places_.empty()) waiting_.clear();
}

bool HidInbox::isScheduled(const Place& place) const {
  return std::ranges::any_of(places_, [&](const Scheduled& scheduled) { return scheduled.place.get() == &place; });
}

std::vector<HidInbox::Scheduled>::const_iterator HidInbox::find(const RunLoop& loop, std::string_view mode) const {
  return std::ranges::find_if(places_, [&](const Scheduled& scheduled) {
    return scheduled.place->loop == &loop && scheduled.place->mode == mode;
  });
}

// Not more than wait now: a receiver that is slower than the device must not keep its loop from its time limit. What
// comes meanwhile signals the source again.
bool HidInbox::deliver(const Place& place) {
  std::size_t count = 0;
  {
    const std::lock_guard lock(mutex_);
    if (!isScheduled(place)) return false;
    count = waiting_.size();
  }
  while (count > 0 && deliverOne(place)) --count;
  return true;
}

// Looks at everything anew: the receiver may have changed all of it.
bool HidInbox::deliverOne(const Place& place) {
  std::shared_ptr<const HidInput> input;
  Receiver receiver;
  {
    const std::lock_guard lock(mutex_);
    if (waiting_.empty() || !isScheduled(place)) return false;
    input = std::move(waiting_.front());
    waiting_.pop_front();
    receiver = receiver_;
  }
  if (receiver != nullptr) (*receiver)(input->reportID, input->report, input->error);
  return true;
}

}  // namespace quazor
