// HidSensor: one simulated HID device, which all its users share.
#pragma once

#include "backends/simulated/hid/hid_inbox.h"
#include "backends/simulated/scenario/hid_config.h"
#include "contract/diagnostic_error.h"
#include "contract/value.h"
#include "platform/clock.h"
#include "platform/concurrency.h"

#include <chrono>
#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <span>
#include <vector>

namespace quazor {

// Sends input reports while somebody has it open and its feature reports are as the scenario wants them: the first one
// period after both have come to hold, then at the scenario's rate, to every user who has it open. Settings stay when
// it is closed. A device that is removed tells those who have it open by an error in a report's place.
//
// Thread: any. Reports are made on a queue of its own.
class HidSensor final : public std::enable_shared_from_this<HidSensor> {
 public:
  HidSensor(HidDeviceConfig traits, std::shared_ptr<Clock> clock, Concurrency& concurrency);
  HidSensor(const HidSensor&) = delete;
  HidSensor& operator=(const HidSensor&) = delete;

  const HidDeviceConfig& traits() const { return traits_; }
  // Whether it is there and has all entries of one of the dictionaries.
  bool matches(const std::vector<Dictionary>& matching) const;

  // Opens and closes it for the user whose inbox that is. Closing what is not open has no effect.
  bool open(const std::shared_ptr<HidInbox>& user, DiagnosticErrorPtr* error);
  void close(const std::shared_ptr<HidInbox>& user);
  bool setFeature(const std::shared_ptr<HidInbox>& user, std::uint8_t reportID, std::span<const std::uint8_t> payload,
                  DiagnosticErrorPtr* error);

 private:
  bool hasOpen(const std::shared_ptr<HidInbox>& user) const;
  bool checkFeature(std::uint8_t reportID, std::span<const std::uint8_t> payload, DiagnosticErrorPtr* error) const;
  bool isToStream() const;
  void startOrStop();
  void arm();
  void sendNext(std::uint64_t stretch);
  HidInput makeInput(std::uint64_t number);

  const HidDeviceConfig traits_;
  const std::shared_ptr<Clock> clock_;
  const std::shared_ptr<SerialQueue> queue_;

  mutable std::mutex mutex_;  // guards what follows
  bool gone_ = false;
  std::vector<std::shared_ptr<HidInbox>> users_;  // who has it open
  std::map<std::uint8_t, std::uint8_t> values_;   // of the feature reports
  std::uint64_t nextReport_ = 0;

  // Streaming without a break is a stretch; tasks of an earlier one do nothing.
  bool streaming_ = false;
  std::uint64_t stretch_ = 0;
  std::chrono::nanoseconds stretchStart_{0};
  std::uint64_t sentInStretch_ = 0;
};

}  // namespace quazor
