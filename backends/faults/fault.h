// Fault: one thing that is made to go wrong on a platform.
#pragma once

#include <nlohmann/json_fwd.hpp>

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace quazor {

enum class FaultAction {
  kFail,     // the call fails with an error: the fault's, or one of the service
  kNothing,  // the call fails and has no error to give
  kHang,     // the call never returns: an exception in virtual time, a wait without end in real time
  kDelay     // the call is made `seconds` late, by the platform's clock
};

// An error that a fault makes a call fail with.
struct FaultError {
  std::string domain;
  std::int64_t code = 0;
  std::string message;

  friend bool operator==(const FaultError&, const FaultError&) = default;
};

// Which calls, and what happens to them. A selector that is not set takes every call.
//
// When several faults take one call, delays add up, and the first of the others in their order decides.
struct Fault {
  std::string operation;                    // such as "CaptureStream.start"; "*" is every operation that can fail
  std::optional<std::string> object;        // the name of a camera, a group or a HID device
  std::optional<std::string> property;      // the key that the call reads or sets, or a feature report ("0xAB")
  std::optional<std::uint64_t> occurrence;  // the nth call, from 1, among those that the other selectors take
  FaultAction action = FaultAction::kFail;
  std::optional<FaultError> error;  // of kFail
  double seconds = 0;               // of kDelay

  friend bool operator==(const Fault&, const Fault&) = default;
};

// A fault and how many calls it has changed. One that never fired has proved nothing.
struct FaultStatus {
  Fault fault;
  std::uint64_t fired = 0;
};

// The fault as a file has it (fault_reader.h).
nlohmann::ordered_json faultJson(const Fault& fault);

// The word of a file for an action.
std::string_view faultActionName(FaultAction action);

}  // namespace quazor
