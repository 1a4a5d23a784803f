#include "backends/linux/hid/hidraw_input.h"

#include "backends/linux/system/linux_error.h"

#include <array>
#include <cerrno>
#include <utility>

namespace quazor {

void HidrawInput::open(std::shared_ptr<const FileDescriptor> descriptor) {
  const std::lock_guard lock(mutex_);
  descriptor_ = std::move(descriptor);
  ended_ = false;
  for (const Scheduled& scheduled : places()) watchOrSignal(*scheduled.place);
}

void HidrawInput::close() {
  const std::lock_guard lock(mutex_);
  descriptor_.reset();
  for (auto& [place, watch] : std::exchange(watches_, {})) {
    watch.reset();
    // The loop of another thread may be sleeping, and keeps the descriptor open until it wakes.
    signal(*place);
  }
}

std::shared_ptr<const FileDescriptor> HidrawInput::descriptor() const {
  const std::lock_guard lock(mutex_);
  return descriptor_;
}

void HidrawInput::onScheduled(const Place& place) {
  if (descriptor_ == nullptr) return;
  if (places().size() == 1) discardPending();
  watchOrSignal(place);
}

void HidrawInput::onRetired() {
  descriptor_.reset();
  watches_.clear();
}

void HidrawInput::onRoundBegan(const Place& place) {
  if (const auto found = watches_.find(&place); found != watches_.end()) found->second->arm();
}

// Makes the loop wait for the descriptor, or on another thread signals the source, which then does so.
void HidrawInput::watchOrSignal(const Place& place) {
  if (!ended_ && !watch(place)) signal(place);
}

// False if the loop cannot wait for descriptors or belongs to another thread.
bool HidrawInput::watch(const Place& place) {
  std::shared_ptr<DescriptorWatch> watch = watchDescriptor(*place.loop, descriptor_, place.source.lock());
  if (watch == nullptr) return false;
  watch->arm();
  watches_[&place] = std::move(watch);
  return true;
}

// Each read returns one report; the kernel discards what does not fit.
void HidrawInput::discardPending() const {
  std::array<std::uint8_t, 1> byte{};
  for (std::size_t i = 0; i < kMaxInARound && read(byte) > 0; ++i) {
  }
}

// Even a non-blocking read can be interrupted: hidraw checks for signals before it checks for reports.
long HidrawInput::read(std::span<std::uint8_t> room) const {
  long size = -1;
  do {
    size = calls_->read(descriptor_->get(), room);
  } while (size < 0 && errno == EINTR);
  return size;
}

std::shared_ptr<const HidInput> HidrawInput::next(const Place& place) {
  if (descriptor_ == nullptr || ended_) return nullptr;
  if (!watches_.contains(&place) && !watch(place)) {
    ended_ = true;
    DiagnosticErrorPtr error;
    failLinux(&error, LinuxErrorCode::kNotSupported,
              device_ + " cannot be scheduled on this run loop: it cannot wait for file descriptors.");
    return std::make_shared<const HidInput>(HidInput{{}, std::move(error)});
  }
  std::array<std::uint8_t, kMaxLength> buffer;
  const std::size_t idBytes = numbered_ ? 0 : 1;
  buffer.front() = 0;
  const long size = read(std::span(buffer).subspan(idBytes));
  if (size < 0 && errno == EAGAIN) return nullptr;
  if (size <= 0) return std::make_shared<const HidInput>(HidInput{{}, endedBy(size, errno)});
  return std::make_shared<const HidInput>(
      HidInput{Bytes(buffer.data(), buffer.data() + idBytes + static_cast<std::size_t>(size)), nullptr});
}

// The error for a read without a report. A removed device first returns its pending reports, then EIO.
DiagnosticErrorPtr HidrawInput::endedBy(long size, int number) {
  ended_ = true;
  watches_.clear();
  DiagnosticErrorPtr error;
  if (size == 0 || number == EIO || number == ENODEV) {
    failLinux(&error, LinuxErrorCode::kDeviceGone, device_ + " has been removed.");
  } else {
    failSystemCall(&error, "read", device_, number);
  }
  return error;
}

}  // namespace quazor
