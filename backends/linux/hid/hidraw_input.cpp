#include "backends/linux/hid/hidraw_input.h"

#include "backends/linux/system/linux_error.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <utility>

namespace quazor {

void HidrawInput::open(std::shared_ptr<const FileDescriptor> descriptor) {
  const std::lock_guard lock(mutex_);
  descriptor_ = std::move(descriptor);
  ended_ = false;
  for (const Scheduled& scheduled : places_) watchOrSignal(scheduled);
}

void HidrawInput::close() {
  const std::lock_guard lock(mutex_);
  descriptor_.reset();
  for (const Scheduled& scheduled : places_) {
    if (scheduled.place->watch == nullptr) continue;
    scheduled.place->watch.reset();
    // On another thread than this the loop may sleep, and keeps the descriptor open until it wakes.
    scheduled.source->signal();
  }
}

std::shared_ptr<const FileDescriptor> HidrawInput::descriptor() const {
  const std::lock_guard lock(mutex_);
  return descriptor_;
}

void HidrawInput::setReceiver(HidDevice::InputReportCallback receiver) {
  Receiver replacement =
      receiver ? std::make_shared<const HidDevice::InputReportCallback>(std::move(receiver)) : nullptr;
  const std::lock_guard lock(mutex_);
  receiver_.swap(replacement);
}

void HidrawInput::schedule(RunLoop& loop, std::string_view mode) {
  const auto place = std::make_shared<Place>();
  place->loop = &loop;
  place->mode = mode;
  // The handler does not keep this object, which ends with its user; then it ends its own source.
  const std::shared_ptr<RunLoopSource> source = loop.makeSource([weak = weak_from_this(), place] {
    const std::shared_ptr<HidrawInput> self = weak.lock();
    if (self == nullptr || !self->deliver(*place)) place->loop->removeSource(place->source.lock(), place->mode);
  });
  place->source = source;
  {
    const std::lock_guard lock(mutex_);
    if (find(loop, mode) != places_.end()) return;
    if (descriptor_ != nullptr && places_.empty()) discardPending();
    places_.push_back({place, source});
    if (descriptor_ != nullptr) watchOrSignal(places_.back());
  }
  loop.addSource(source, mode);
}

void HidrawInput::unschedule(RunLoop& loop, std::string_view mode) {
  std::shared_ptr<RunLoopSource> source;
  {
    const std::lock_guard lock(mutex_);
    const auto found = find(loop, mode);
    if (found == places_.end()) return;
    source = found->source;
    found->place->watch.reset();
    places_.erase(found);
  }
  loop.removeSource(source, mode);
}

void HidrawInput::retire() {
  Receiver receiver;
  const std::lock_guard lock(mutex_);
  receiver_.swap(receiver);
  descriptor_.reset();
  for (const Scheduled& scheduled : places_) {
    scheduled.place->watch.reset();
    scheduled.source->signal();
  }
  places_.clear();
}

// Has the loop wait for the descriptor. When this is not the loop's thread, its source does so there.
void HidrawInput::watchOrSignal(const Scheduled& scheduled) {
  if (!ended_ && !watch(*scheduled.place)) scheduled.source->signal();
}

// False when this is no loop that can wait for descriptors, or not its thread.
bool HidrawInput::watch(Place& place) {
  place.watch = watchDescriptor(*place.loop, descriptor_, place.source.lock());
  if (place.watch != nullptr) place.watch->arm();
  return place.watch != nullptr;
}

// The kernel gives one report for each read, and drops what does not fit.
void HidrawInput::discardPending() const {
  std::array<std::uint8_t, 1> byte{};
  for (std::size_t i = 0; i < kMaxInARound && read(byte) > 0; ++i) {
  }
}

// A read that never waits can be interrupted nevertheless: hidraw looks for signals before it looks for reports.
long HidrawInput::read(std::span<std::uint8_t> room) const {
  long size = -1;
  do {
    size = calls_->read(descriptor_->get(), room);
  } while (size < 0 && errno == EINTR);
  return size;
}

std::vector<HidrawInput::Scheduled>::const_iterator HidrawInput::find(const RunLoop& loop,
                                                                      std::string_view mode) const {
  return std::ranges::find_if(places_, [&](const Scheduled& scheduled) {
    return scheduled.place->loop == &loop && scheduled.place->mode == mode;
  });
}

bool HidrawInput::isScheduled(const Place& place) const {
  return std::ranges::any_of(places_, [&](const Scheduled& scheduled) { return scheduled.place.get() == &place; });
}

// Handles a place's source: false when the device is not scheduled there any more. A receiver that is slower than the
// device must not keep its loop from its other sources and its time limit, so a round has an end.
bool HidrawInput::deliver(Place& place) {
  {
    const std::lock_guard lock(mutex_);
    if (!isScheduled(place)) return false;
    // Now, and not afterwards: the receiver may run the loop.
    if (place.watch != nullptr) place.watch->arm();
  }
  std::array<std::uint8_t, kMaxLength> buffer;
  for (std::size_t i = 0; i < kMaxInARound; ++i) {
    const std::optional<Input> input = next(place, buffer);
    if (!input) break;
    if (input->receiver == nullptr) continue;
    (*input->receiver)(input->report.empty() ? std::uint8_t{0} : input->report.front(), input->report, input->error);
  }
  return true;
}

// Looks at everything anew: the receiver may have changed all of it.
std::optional<HidrawInput::Input> HidrawInput::next(Place& place, std::span<std::uint8_t, kMaxLength> buffer) {
  const std::lock_guard lock(mutex_);
  if (!isScheduled(place) || descriptor_ == nullptr || ended_) return std::nullopt;
  if (place.watch == nullptr && !watch(place)) {
    ended_ = true;
    DiagnosticErrorPtr error;
    failLinux(&error, LinuxErrorCode::kNotSupported,
              device_ + " cannot be scheduled on this run loop: it cannot wait for file descriptors.");
    return Input{{}, std::move(error), receiver_};
  }
  const std::size_t idBytes = numbered_ ? 0 : 1;
  buffer.front() = 0;
  const long size = read(buffer.subspan(idBytes));
  if (size < 0 && errno == EAGAIN) return std::nullopt;
  if (size <= 0) return Input{{}, takeEnd(size, errno), receiver_};
  return Input{buffer.first(idBytes + static_cast<std::size_t>(size)), nullptr, receiver_};
}

// What a read says that gave no report. A device that was removed gives what is kept, and then EIO.
DiagnosticErrorPtr HidrawInput::takeEnd(long size, int number) {
  ended_ = true;
  for (const Scheduled& scheduled : places_) scheduled.place->watch.reset();
  DiagnosticErrorPtr error;
  if (size == 0 || number == EIO || number == ENODEV) {
    failLinux(&error, LinuxErrorCode::kDeviceGone, device_ + " has been removed.");
  } else {
    failSystemCall(&error, "read", device_, number);
  }
  return error;
}

}  // namespace quazor
