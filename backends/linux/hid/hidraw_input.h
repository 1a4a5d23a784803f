// HidrawInput: the way of input reports from a hidraw device to the receiver of one of its users.
#pragma once

#include "backends/linux/hid/hidraw_calls.h"
#include "backends/linux/system/descriptor_run_loop.h"
#include "backends/linux/system/file_descriptor.h"
#include "platform/hid.h"
#include "platform/run_loop.h"

#include <cstddef>
#include <cstdint>
#include <memory>
#include <mutex>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace quazor {

// The kernel keeps the reports (63 of them, then the newest are lost); the run loop of the user's thread waits for the
// descriptor, and its source reads one report after the other and hands it on. No thread and no queue stand between.
//
// Thread: calls come one at a time. The receiver is called without any lock, and may call everything here.
class HidrawInput final : public std::enable_shared_from_this<HidrawInput> {
 public:
  // What a source hands on before other sources of the loop have their turn: all that the kernel keeps.
  static constexpr std::size_t kMaxInARound = 64;
  // The kernel's largest report (HID_MAX_BUFFER_SIZE) with the byte of its ID.
  static constexpr std::size_t kMaxLength = 16385;

  // `calls` must not be null. `device` stands in messages. `numbered` says whether the device's reports begin with
  // their ID; where they do not, a 0 is put before each.
  HidrawInput(std::shared_ptr<HidrawCalls> calls, std::string device, bool numbered)
      : calls_(std::move(calls)), device_(std::move(device)), numbered_(numbered) {}
  HidrawInput(const HidrawInput&) = delete;
  HidrawInput& operator=(const HidrawInput&) = delete;

  // From now on reports are read from `descriptor`, whose reads must not wait.
  void open(std::shared_ptr<const FileDescriptor> descriptor);
  // Lets go of the descriptor; loops that wait for it let go of it at once.
  void close();
  // What is open, or null.
  std::shared_ptr<const FileDescriptor> descriptor() const;

  // Replaces the receiver. One that is running is destroyed when it has returned.
  void setReceiver(HidDevice::InputReportCallback receiver);
  // What the kernel has kept until now, while the device was scheduled nowhere, is thrown away. A loop that cannot wait
  // for descriptors (watchDescriptor) gets an error that says so in place of reports.
  void schedule(RunLoop& loop, std::string_view mode);
  void unschedule(RunLoop& loop, std::string_view mode);
  // The user is gone: nothing is received any more. Loops that the device is still scheduled on must be alive; each
  // lets go of its source the next time it runs. Thread: any, also while a loop calls the receiver.
  void retire();

 private:
  // A loop and a mode that the device is scheduled on. The handler of its source holds it.
  struct Place {
    RunLoop* loop = nullptr;
    std::string mode;
    std::weak_ptr<RunLoopSource> source;
    // While the device is open, since the loop's own thread first came here; null on a loop that cannot wait for it.
    std::shared_ptr<DescriptorWatch> watch;
  };
  struct Scheduled {
    std::shared_ptr<Place> place;
    std::shared_ptr<RunLoopSource> source;
  };
  using Receiver = std::shared_ptr<const HidDevice::InputReportCallback>;
  struct Input {
    std::span<const std::uint8_t> report;
    DiagnosticErrorPtr error;
    Receiver receiver;
  };

  bool deliver(Place& place);
  std::optional<Input> next(Place& place, std::span<std::uint8_t, kMaxLength> buffer);
  DiagnosticErrorPtr takeEnd(long size, int number);
  void watchOrSignal(const Scheduled& scheduled);
  bool watch(Place& place);
  void discardPending() const;
  long read(std::span<std::uint8_t> room) const;
  std::vector<Scheduled>::const_iterator find(const RunLoop& loop, std::string_view mode) const;
  bool isScheduled(const Place& place) const;

  const std::shared_ptr<HidrawCalls> calls_;
  const std::string device_;
  const bool numbered_;

  mutable std::mutex mutex_;  // guards what follows, and the watches of places
  std::shared_ptr<const FileDescriptor> descriptor_;
  bool ended_ = false;  // the user was told that nothing comes any more, since the device was opened
  Receiver receiver_;   // null when there is none
  std::vector<Scheduled> places_;
};

}  // namespace quazor
