// HidInbox: the pending inputs of a simulated device for one user.
#pragma once

#include "backends/hid/hid_input_delivery.h"

#include <cstddef>
#include <deque>
#include <memory>

namespace quazor {

// Inputs wait here in order until a loop on which the device is scheduled handles them. At most kDepth reports can
// wait; newer ones are lost. Reports are also lost while the device is not scheduled, and pending ones when it is
// unscheduled everywhere. Errors are lost only if the inbox is closed, so a user who schedules a removed device is
// informed.
//
// Thread: any for take(); as HidInputDelivery for all other functions.
class HidInbox final : public HidInputDelivery {
 public:
  static constexpr std::size_t kDepth = 64;

  void open();
  void close();
  void take(std::shared_ptr<const HidInput> input);

 private:
  std::shared_ptr<const HidInput> next(const Place& place) override;
  void onScheduled(const Place& place) override;
  void onUnscheduled(const Place& place) override;
  void onRetired() override;
  void onRoundBegan(const Place& place) override;
  void discardWhatIsLost();

  bool open_ = false;
  std::deque<std::shared_ptr<const HidInput>> waiting_;
};

}  // namespace quazor
