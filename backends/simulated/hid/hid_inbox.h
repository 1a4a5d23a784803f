// HidInbox: the inputs of a simulated device for one of its users.
#pragma once

#include "backends/hid/hid_input_delivery.h"

#include <cstddef>
#include <deque>
#include <memory>

namespace quazor {

// Inputs wait here until a loop on which the device is scheduled handles them, in the order in which they came. Not
// more than kDepth reports do: newer ones are lost then. Reports are also lost while the device is scheduled nowhere,
// and those that wait when it comes to that. Errors are lost only when the inbox is or gets closed, so a user who
// schedules a device that has been removed is told.
//
// Thread: take() any; all else as HidInputDelivery.
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
