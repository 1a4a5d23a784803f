// HidInbox: the way of input reports from a simulated device to the receiver of one of its users.
#pragma once

#include "contract/value.h"
#include "platform/hid.h"
#include "platform/run_loop.h"

#include <cstddef>
#include <cstdint>
#include <deque>
#include <memory>
#include <mutex>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// What comes from a device: a report, or else an error.
struct HidInput {
  std::uint8_t reportID = 0;
  Bytes report;
  DiagnosticErrorPtr error;
};

// Reports wait here until a loop on which the device is scheduled handles them, in the order in which they came. Not
// more than kDepth do: newer ones are lost then, errors never. What comes while the inbox is closed or scheduled
// nowhere is lost, and so is what waits when it comes to that.
//
// Thread: take() any; all else that of the loops, one at a time. The receiver is called without any lock.
class HidInbox final : public std::enable_shared_from_this<HidInbox> {
 public:
  static constexpr std::size_t kDepth = 64;

  HidInbox() = default;
  HidInbox(const HidInbox&) = delete;
  HidInbox& operator=(const HidInbox&) = delete;

  void open();
  void close();
  // Replaces the receiver. One that is running is destroyed when it has returned.
  void setReceiver(HidDevice::InputReportCallback receiver);
  void schedule(RunLoop& loop, std::string_view mode);
  void unschedule(RunLoop& loop, std::string_view mode);
  // The user is gone, on whatever thread: nothing is received any more. Loops that the device is still scheduled on
  // must be alive; each lets go of its source the next time it runs.
  void retire();

  void take(std::shared_ptr<const HidInput> input);

 private:
  // A loop and a mode that the device is scheduled on. The handler of its source holds it.
  struct Place {
    RunLoop* loop = nullptr;
    std::string mode;
    std::weak_ptr<RunLoopSource> source;
  };
  struct Scheduled {
    std::shared_ptr<const Place> place;
    std::shared_ptr<RunLoopSource> source;
  };
  using Receiver = std::shared_ptr<const HidDevice::InputReportCallback>;

  // Handles a place's source: false when the device is not scheduled there any more.
  bool deliver(const Place& place);
  bool deliverOne(const Place& place);
  bool isScheduled(const Place& place) const;
  std::vector<Scheduled>::const_iterator find(const RunLoop& loop, std::string_view mode) const;
  void dropUnlessReceivable();

  std::mutex mutex_;  // guards what follows; also held while sources are signalled, so that none is after unschedule()
  bool open_ = false;
  Receiver receiver_;  // null when there is none
  std::vector<Scheduled> places_;
  std::deque<std::shared_ptr<const HidInput>> waiting_;
};

}  // namespace quazor
