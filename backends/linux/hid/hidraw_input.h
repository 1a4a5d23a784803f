// HidrawInput: the inputs of a hidraw device for one of its users.
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

// The kernel keeps the reports (63 of them, then the newest are lost); the run loop of the user's thread waits for the
// descriptor, and its source reads one report after the other and hands it on. No thread and no queue stand between.
// What the kernel has kept while the device was scheduled nowhere is thrown away when it is scheduled. A loop that
// cannot wait for descriptors (watchDescriptor) gets an error that says so in place of reports.
//
// Thread: as HidInputDelivery.
class HidrawInput final : public HidInputDelivery {
 public:
  // The kernel's largest report (HID_MAX_BUFFER_SIZE) with the byte of its ID.
  static constexpr std::size_t kMaxLength = 16385;

  // `calls` must not be null. `device` stands in messages. `numbered` says whether the device's reports begin with
  // their ID; where they do not, a 0 is put before each.
  HidrawInput(std::shared_ptr<HidrawCalls> calls, std::string device, bool numbered)
      : calls_(std::move(calls)), device_(std::move(device)), numbered_(numbered) {}

  // From now on reports are read from `descriptor`, whose reads must not wait.
  void open(std::shared_ptr<const FileDescriptor> descriptor);
  // Lets go of the descriptor; loops that wait for it let go of it at once.
  void close();
  // What is open, or null.
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
  bool ended_ = false;  // the user was told that nothing comes any more, since the device was opened
  // While the device is open, since the loop's own thread first came to the place; none for loops that cannot wait.
  std::map<const Place*, std::shared_ptr<DescriptorWatch>> watches_;
};

}  // namespace quazor
