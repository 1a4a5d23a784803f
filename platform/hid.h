// Human interface devices: finding and opening devices, sending feature reports, receiving input reports.
//
// Thread: every call is synchronous on the caller's thread and may block as long as the device takes. One thread at a
//   time calls into one device. Input reports arrive on the thread of the run loop on which the device is scheduled,
//   while that loop runs.
// Ownership: objects are shared; a device stays usable for as long as the caller holds it, even without its manager.
// Errors: a call that fails returns false and stores the device's error if the caller passed a pointer and the device
//   has an error to give. Calls do not throw.
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
  // Receives a report: its ID and all its bytes, including the ID as the first byte. If `error` is set there is no
  // report: the ID is 0 and the data is empty. The bytes are valid only during the call.
  using InputReportCallback =
      std::function<void(std::uint8_t reportID, std::span<const std::uint8_t> data, const DiagnosticErrorPtr& error)>;

  ~HidDevice() override;

  // Opens the device for this client. Fails if the device is already open or was removed.
  [[nodiscard]] virtual bool open(DiagnosticErrorPtr* error) = 0;
  // Replaces the receiver of input reports; an empty one removes it. The receiver may call this itself; it is then
  // destroyed only after it has returned.
  virtual void setInputReportCallback(InputReportCallback callback) = 0;
  // Sends a feature report. `payload` is the whole report, including its ID as the first byte.
  [[nodiscard]] virtual bool setFeatureReportWithID(std::uint8_t reportID, std::span<const std::uint8_t> payload,
                                                    DiagnosticErrorPtr* error) = 0;
  // Delivers input reports and device errors through `runLoop` in this mode from now on. `runLoop` must live until the
  // device is unscheduled from it. While the device is open and not scheduled, reports are lost and errors are kept.
  virtual void scheduleWithRunLoop(RunLoop& runLoop, std::string_view mode) = 0;
  // Stops delivery through the loop. No effect if the device is not scheduled there.
  virtual void unscheduleFromRunLoop(RunLoop& runLoop, std::string_view mode) = 0;
  // Closes the device; no effect if it is not open. `options` is reserved and must be 0.
  virtual void close(std::uint32_t options) = 0;
};

// One client's view of the devices of the system.
// Thread: one at a time.
class QUAZOR_EXPORT HidManager : public Object {
 public:
  ~HidManager() override;

  // Selects the devices that match at least one of the dictionaries. A device must have all entries of a dictionary.
  virtual void enumerateDevicesMatching(const std::vector<Dictionary>& matching) = 0;
  // Returns the matching devices, each once.
  virtual std::vector<std::shared_ptr<HidDevice>> devices() = 0;
};

// Thread: any.
class QUAZOR_EXPORT HidService {
 public:
  HidService() = default;
  HidService(const HidService&) = delete;
  HidService& operator=(const HidService&) = delete;
  virtual ~HidService();

  // Returns a new manager, or null if the system has no HID facility.
  virtual std::shared_ptr<HidManager> createManager() = 0;
};

}  // namespace QUAZOR_CONTRACT
