// What can be called on the HID devices, the display and the run loops of the simulated phone: the vocabulary of
// faults, and the errors of the devices.
#pragma once

#include "contract/diagnostic_error.h"

#include <array>
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

// "0xAB", as scenarios and faults write a report's ID. Valid for ever.
std::string_view hidReportName(std::uint8_t id);

namespace sensor_operation {
inline constexpr std::string_view kCreateManager = "HidService.createManager";
inline constexpr std::string_view kEnumerate = "HidManager.enumerateDevicesMatching";
inline constexpr std::string_view kDevices = "HidManager.devices";
inline constexpr std::string_view kOpen = "HidDevice.open";
inline constexpr std::string_view kSetCallback = "HidDevice.setInputReportCallback";
inline constexpr std::string_view kSetFeature = "HidDevice.setFeatureReportWithID";
inline constexpr std::string_view kSchedule = "HidDevice.scheduleWithRunLoop";
inline constexpr std::string_view kUnschedule = "HidDevice.unscheduleFromRunLoop";
inline constexpr std::string_view kClose = "HidDevice.close";
inline constexpr std::string_view kMainDisplay = "FramebufferService.mainDisplay";
inline constexpr std::string_view kRegistryService = "Display.registryService";
inline constexpr std::string_view kRegistryProperty = "RegistryService.registryProperty";
inline constexpr std::string_view kCurrentRunLoop = "RunLoops.currentRunLoop";
}  // namespace sensor_operation

// What the property of a fault names.
enum class SensorProperty { kNone, kFeatureReport, kRegistryProperty };

struct SensorOperation {
  std::string_view name;
  bool onDevice;  // on a HID device; faults tell those apart by their names
  SensorProperty property;
};

// Faults reach all of them. One that makes an operation fail which has no answer keeps it from having any effect.
inline constexpr std::array kSensorOperations{
    SensorOperation{sensor_operation::kCreateManager, false, SensorProperty::kNone},
    SensorOperation{sensor_operation::kEnumerate, false, SensorProperty::kNone},
    SensorOperation{sensor_operation::kDevices, false, SensorProperty::kNone},
    SensorOperation{sensor_operation::kOpen, true, SensorProperty::kNone},
    SensorOperation{sensor_operation::kSetCallback, true, SensorProperty::kNone},
    SensorOperation{sensor_operation::kSetFeature, true, SensorProperty::kFeatureReport},
    SensorOperation{sensor_operation::kSchedule, true, SensorProperty::kNone},
    SensorOperation{sensor_operation::kUnschedule, true, SensorProperty::kNone},
    SensorOperation{sensor_operation::kClose, true, SensorProperty::kNone},
    SensorOperation{sensor_operation::kMainDisplay, false, SensorProperty::kNone},
    SensorOperation{sensor_operation::kRegistryService, false, SensorProperty::kNone},
    SensorOperation{sensor_operation::kRegistryProperty, false, SensorProperty::kRegistryProperty},
    SensorOperation{sensor_operation::kCurrentRunLoop, false, SensorProperty::kNone},
};

}  // namespace quazor
