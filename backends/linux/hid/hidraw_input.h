// HidrawInput: reads the inputs of a hidraw device for one user.
#pragma once

#include "backends/hid/hid_input_delivery.h"
#include "backends/linux/hid/hidraw_calls.h"
#include "backends/linux/system/descriptor_run_loop.h"
#include "backends/linux/system/file_descriptor.h"

#include <cstddef>
#include <cstdint>
#include <map>
#include <memory>
#include <span>
#include <string>
#include <utility>

namespace quazor {

// The kernel queues the reports (63 of them; after that it drops the newest). The run loop of the user's thread waits
// for the descriptor, and its source reads and delivers one report after the other; there is no other thread and no
// other queue. Reports that were queued while the device was not scheduled are discarded when it is scheduled. On a
// loop that cannot wait for descriptors (watchDescriptor) the receiver gets an error instead of reports.
//
// Thread: as HidInputDelivery.
class HidrawInput final : public HidInputDelivery {
 public:
  // The kernel's maximum report size (HID_MAX_BUFFER_SIZE) plus the ID byte.
  static constexpr std::size_t kMaxLength = 16385;

  // `calls` must not be null. `device` is its name in messages. `numbered` tells whether the device's reports begin
  // with their ID; otherwise a 0 is prepended to each.
  HidrawInput(std::shared_ptr<HidrawCalls> calls, std::string device, bool numbered)
      : calls_(std::move(calls)), device_(std::move(device)), numbered_(numbered) {}

  // Reads reports from `descriptor` from now on; its reads must not block.
  void open(std::shared_ptr<const FileDescriptor> descriptor);
  // Releases the descriptor; loops that wait for it release it at once.
  void close();
  // The open descriptor, or null.
  std::shared_ptr<const FileDescriptor> descriptor() const;

 private:
  std::shared_ptr<const HidInput> next(const Place& place) override;
  void onScheduled(const Place& place) override;
  void onUnscheduled(const Place& place) override { watches_.erase(&place); }
  void onRetired() override;
  void onRoundBegan(const Place& place) override;

  DiagnosticErrorPtr endedBy(long size, int number);
  void watchOrSignal(const Place& place);
  bool watch(const Place& place);
  void discardPending() const;
  long read(std::span<std::uint8_t> room) const;

  const std::shared_ptr<HidrawCalls> calls_;
  const std::string device_;
  const bool numbered_;

  std::shared_ptr<const FileDescriptor> descriptor_;
  bool ended_ = false;  // the user was informed of the end of input since the device was opened
  // The watches of an open device, created on the loop's own thread. Loops that cannot wait for descriptors have none.
  std::map<const Place*, std::shared_ptr<DescriptorWatch>> watches_;
};

}  // namespace quazor
