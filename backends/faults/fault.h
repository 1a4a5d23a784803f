// Fault: an injected failure of a platform's calls.
#pragma once

#include <nlohmann/json_fwd.hpp>

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace quazor {

enum class FaultAction {
  kFail,     // the call fails with the fault's error, or with one of the service
  kNothing,  // the call fails without an error
  kHang,     // the call never returns: an exception in virtual time, an endless wait in real time
  kDelay     // the call is delayed by `seconds`, on the platform's clock
};

// The error of a call that fails because of a fault.
struct FaultError {
  std::string domain;
  std::int64_t code = 0;
  std::string message;

  friend bool operator==(const FaultError&, const FaultError&) = default;
};

// Selects calls and determines their failure. A selector without a value matches every call.
//
// If several faults match one call, delays add up, and the first other fault applies.
struct Fault {
  std::string operation;                // for example "CaptureStream.start"; "*" matches every operation that can fail
  std::optional<std::string> object;    // the name of a camera, a group or a HID device
  std::optional<std::string> property;  // the key that the call reads or sets, or a feature report ("0xAB")
  std::optional<std::uint64_t> occurrence;  // the nth matching call, starting at 1
  FaultAction action = FaultAction::kFail;
  std::optional<FaultError> error;  // for kFail
  double seconds = 0;               // for kDelay

  friend bool operator==(const Fault&, const Fault&) = default;
};

// A fault and the number of calls that it has changed. A fault that never fired proves nothing.
struct FaultStatus {
  Fault fault;
  std::uint64_t fired = 0;
};

// The fault in the form of a file (fault_reader.h).
nlohmann::ordered_json faultJson(const Fault& fault);

// The word for an action in files.
std::string_view faultActionName(FaultAction action);

}  // namespace quazor
