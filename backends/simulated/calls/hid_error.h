// The errors of the simulated HID devices.
#pragma once

#include "contract/diagnostic_error.h"

#include <cstdint>
#include <string_view>

namespace quazor {

inline constexpr std::string_view SimulatedHidErrorDomain = "SimulatedHidErrorDomain";

// The codes of the domain.
enum class HidErrorCode : std::int64_t {
  kInjected = 1,       // a fault of the scenario asked for a failure and gave no error of its own
  kAlreadyOpen = 2,    // the device is open
  kNotOpen = 3,        // the device has to be opened first
  kGone = 4,           // the device has been removed from the phone
  kUnknownReport = 5,  // the device has no feature report of that ID
  kRefusedReport = 6   // the report is malformed, or its value is not one that the device takes
};

// Tells a refusal: stores an error of the device where the caller asked for one, and is false.
template <class... Arguments>
bool refuse(DiagnosticErrorPtr* error, HidErrorCode code, MessageFormat<Arguments...> format,
            const Arguments&... arguments) {
  fail(error, SimulatedHidErrorDomain, static_cast<std::int64_t>(code), nullptr, format, arguments...);
  return false;
}

}  // namespace quazor
