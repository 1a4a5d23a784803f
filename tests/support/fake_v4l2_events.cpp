// Waiting, events and time of the fake video driver.
#include "tests/support/fake_v4l2_api.h"

#include <cerrno>

namespace quazor {

short FakeV4l2Api::eventsOf(int descriptor) {
  if (const auto event = events_.find(descriptor); event != events_.end()) return event->second ? POLLIN : 0;
  const FakeNode& node = nodes_.at(descriptors_.at(descriptor));
  if (node.gone) return POLLPRI | POLLERR | POLLHUP;
  if (node.broken || !node.streaming) return POLLERR;
  if (!node.filled.empty()) return POLLIN;
  return node.queued.empty() ? POLLERR : 0;
}

int FakeV4l2Api::poll(std::span<pollfd> descriptors, std::chrono::nanoseconds timeout) {
  if (pollProblem != 0) {
    ++failedPolls;
    return -pollProblem;
  }
  std::unique_lock lock(mutex_);
  const std::chrono::nanoseconds end = now_ + timeout;
  int ready = 0;
  const auto look = [&] {
    ready = 0;
    for (pollfd& one : descriptors) {
      one.revents = eventsOf(one.fd);
      if (one.revents != 0) ++ready;
      if ((one.revents & POLLERR) != 0) ++pollsWithoutEffect_;
    }
    return ready > 0 || (timeout.count() >= 0 && now_ >= end);
  };
  if (look()) return ready;
  ++polling_;
  changed_.notify_all();
  changed_.wait(lock, look);
  --polling_;
  return ready;
}

int FakeV4l2Api::makeEvent() {
  const std::lock_guard lock(mutex_);
  if (makeEventProblem != 0) return -makeEventProblem;
  events_[++lastDescriptor_] = false;
  return lastDescriptor_;
}

void FakeV4l2Api::signalEvent(int event) {
  const std::lock_guard lock(mutex_);
  events_.at(event) = true;
  changed_.notify_all();
}

void FakeV4l2Api::clearEvent(int event) {
  const std::lock_guard lock(mutex_);
  events_.at(event) = false;
  changed_.notify_all();
}

std::chrono::nanoseconds FakeV4l2Api::now() {
  const std::lock_guard lock(mutex_);
  return now_;
}

}  // namespace quazor
