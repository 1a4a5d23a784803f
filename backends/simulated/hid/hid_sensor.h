// HidSensor: a simulated HID device, shared by all its users.
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

// Sends input reports while a user has the device open and its feature reports have the values that the scenario
// requires: the first report one period after both conditions are met, the others at the scenario's rate, to every user
// who has it open. Settings persist while it is closed. When the device is removed, those who have it open receive an
// error instead of a report.
//
// Thread: any. Reports are generated on the device's own queue.
class HidSensor final : public std::enable_shared_from_this<HidSensor> {
 public:
  HidSensor(HidDeviceConfig config, std::shared_ptr<Clock> clock, Concurrency& concurrency);
  HidSensor(const HidSensor&) = delete;
  HidSensor& operator=(const HidSensor&) = delete;

  const HidDeviceConfig& config() const { return config_; }
  // True if the device is present and matches all entries of one of the dictionaries.
  bool matches(const std::vector<Dictionary>& matching) const;

  // Open and close the device for the user with that inbox. Closing a device that is not open has no effect.
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
  void sendNext(std::uint64_t period);
  HidInput makeInput(std::uint64_t number);

  const HidDeviceConfig config_;
  const std::shared_ptr<Clock> clock_;
  const std::shared_ptr<SerialQueue> queue_;

  mutable std::mutex mutex_;  // guards the members below
  bool gone_ = false;
  std::vector<std::shared_ptr<HidInbox>> users_;  // those who have it open
  std::map<std::uint8_t, std::uint8_t> values_;   // by feature report
  std::uint64_t nextReport_ = 0;

  // Identifies a period of uninterrupted streaming; tasks of an earlier period do nothing.
  bool streaming_ = false;
  std::uint64_t period_ = 0;
  std::chrono::nanoseconds periodStart_{0};
  std::uint64_t sentInPeriod_ = 0;
};

}  // namespace quazor
