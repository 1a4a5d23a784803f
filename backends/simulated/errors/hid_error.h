// The errors of the simulated HID devices.
#pragma once

#include "contract/diagnostic_error.h"

#include <cstdint>
#include <string_view>

namespace quazor {

inline constexpr std::string_view SimulatedHidErrorDomain = "SimulatedHidErrorDomain";

// The codes of the domain.
enum class HidErrorCode : std::int64_t {
  kInjected = 1,       // a fault of the scenario requested a failure and gave no error of its own
  kAlreadyOpen = 2,    // the device is open
  kNotOpen = 3,        // the device must be opened first
  kGone = 4,           // the device has been removed from the phone
  kUnknownReport = 5,  // the device has no feature report with that ID
  kRefusedReport = 6   // the report is malformed or the device does not accept its value
};

// Stores an error of the device unless `error` is null, and returns false.
template <class... Arguments>
bool refuse(DiagnosticErrorPtr* error, HidErrorCode code, MessageFormat<Arguments...> format,
            const Arguments&... arguments) {
  fail(error, SimulatedHidErrorDomain, static_cast<std::int64_t>(code), nullptr, format, arguments...);
  return false;
}

}  // namespace quazor
