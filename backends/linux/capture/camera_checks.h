// Checks of the values that properties are set to. Each is true, or false with an error where the caller asked for one
// (kBadValue, or kNotSupported for what no camera here can do); `object` names the object whose property it is.
#pragma once

#include "backends/linux/system/linux_error.h"
#include "contract/message_format.h"
#include "contract/value.h"

#include <string_view>

namespace quazor {

// Stores an error where the caller asked for one, and is false.
template <class... Arguments>
bool refuseLinux(DiagnosticErrorPtr* error, LinuxErrorCode code, MessageFormat<Arguments...> format,
                 const Arguments&... arguments) {
  if (error != nullptr) failLinux(error, code, formatMessage<Arguments...>(format, arguments...));
  return false;
}

bool isBoolean(std::string_view object, std::string_view key, const Value& value, DiagnosticErrorPtr* error);
// A whole number from 0 to 2^32 - 1, of whatever kind.
bool isIndex(std::string_view object, std::string_view key, const Value& value, DiagnosticErrorPtr* error);
// A number from 0.01 to 10000.
bool isRate(std::string_view object, std::string_view key, const Value& value, DiagnosticErrorPtr* error);
// A dictionary of Mode, StructuredLightPattern and StructuredLightCurrent, whole numbers, all three and no others.
bool isLightSource(std::string_view object, const Value& value, DiagnosticErrorPtr* error);
// By output, a dictionary that may hold AttachRaw, a boolean.
bool isOutputConfigurations(std::string_view object, const Value& value, DiagnosticErrorPtr* error);
// By output, a boolean.
bool isOutputsEnabled(std::string_view object, const Value& value, DiagnosticErrorPtr* error);
// By output, a dictionary that may hold a PixelBufferHandler and an EventHandler.
bool isOutputHandlers(std::string_view object, const Value& value, DiagnosticErrorPtr* error);
// A dictionary of StreamingOutputsEnabled (true), FrameSkippingEnabled and TimeMachineEnabled (false) and
// MasterToSlaveFrameRateRatio (1), all four and no others. Video nodes stream side by side, each at its own rate, so
// anything else is not supported.
bool isSlaveConfiguration(std::string_view object, const Value& value, DiagnosticErrorPtr* error);

}  // namespace quazor
