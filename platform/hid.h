// Human interface devices: matching, opening, feature reports out, input reports in.
//
// Thread: every call is synchronous on the caller's thread and may block as long as the device takes. One thread at a
//   time calls into one device. Input reports come on the thread of the run loop that the device is scheduled on, while
//   that loop runs.
// Ownership: objects are shared; a device stays usable for as long as the caller holds it, the manager need not.
// Errors: a call that fails returns false and then stores the device's own error where the caller gave a place for one;
//   it may have none to give, and stores nothing. Nothing is thrown.
#pragma once

#include "contract/contract.h"
#include "contract/diagnostic_error.h"
#include "contract/value.h"
#include "platform/run_loop.h"

#include <cstdint>
#include <functional>
#include <memory>
#include <span>
#include <string_view>
#include <vector>

namespace QUAZOR_CONTRACT {

// Keys of a matching dictionary: the usage page and the usage of the device's primary top-level collection, as its
// report descriptor gives them (USB HID 1.11, 6.2.2), both numbers.
inline constexpr std::string_view kHidPrimaryUsagePage = "PrimaryUsagePage";
inline constexpr std::string_view kHidPrimaryUsage = "PrimaryUsage";

// Thread: one at a time; input reports come on the thread of the run loop that the device is scheduled on.
class QUAZOR_EXPORT HidDevice : public Object {
 public:
  // A report that came in: its ID and all its bytes, the ID first. With an error there is no report, the ID is 0 and
  // the data empty. The bytes are valid during the call.
  using InputReportCallback =
      std::function<void(std::uint8_t reportID, std::span<const std::uint8_t> data, const DiagnosticErrorPtr& error)>;

  ~HidDevice() override;

  // Opens the device for this user. Refused when it is open or gone.
  virtual bool open(DiagnosticErrorPtr* error) = 0;
  // Replaces the receiver of input reports; an empty one removes it. May be called by the receiver itself, which is
  // then destroyed only after it has returned.
  virtual void setInputReportCallback(InputReportCallback callback) = 0;
  // Sends a feature report. `payload` is the whole report, the byte of its ID first.
  virtual bool setFeatureReportWithID(std::uint8_t reportID, std::span<const std::uint8_t> payload,
                                      DiagnosticErrorPtr* error) = 0;
  // From now on input reports and errors of the device come through the loop, in this mode; it must be alive until the
  // device is unscheduled from it. While the device is open and not scheduled, reports are lost and errors are kept.
  virtual void scheduleWithRunLoop(RunLoop& runLoop, std::string_view mode) = 0;
  // The loop calls the receiver no more. Without effect on a device that is not scheduled there.
  virtual void unscheduleFromRunLoop(RunLoop& runLoop, std::string_view mode) = 0;
  // Closes the device; without effect when it is not open. `options` has no bit that is in use: 0.
  virtual void close(std::uint32_t options) = 0;
};

// One user's view of the devices of the system.
// Thread: one at a time.
class QUAZOR_EXPORT HidManager : public Object {
 public:
  ~HidManager() override;

  // Looks for the devices that match one of the dictionaries; a dictionary matches a device that has all its entries.
  virtual void enumerateDevicesMatching(const std::vector<Dictionary>& matching) = 0;
  // What was found, each device once.
  virtual std::vector<std::shared_ptr<HidDevice>> devices() = 0;
};

// Thread: any.
class QUAZOR_EXPORT HidService {
 public:
  HidService() = default;
  HidService(const HidService&) = delete;
  HidService& operator=(const HidService&) = delete;
  virtual ~HidService();

  // A new manager, or null when the system has no HID facility.
  virtual std::shared_ptr<HidManager> createManager() = 0;
};

}  // namespace QUAZOR_CONTRACT
