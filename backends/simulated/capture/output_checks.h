// Checks of the properties that rule what a stream delivers and by which light.
//
// As in property_checks.h: false, and an error where the caller asked for one, when the value is refused.
#pragma once

#include "contract/diagnostic_error.h"
#include "contract/value.h"

#include <string_view>

namespace quazor {

// InfraredLightSourceConfiguration: a dictionary of Mode, StructuredLightPattern and StructuredLightCurrent, integers
// from 0 to 255, all three and no others. Mode 0 keeps the projector dark.
bool checkLightSource(std::string_view object, const Value& value, DiagnosticErrorPtr* error);
// VideoOutputConfigurations: by output, a dictionary that may hold AttachRaw, a boolean.
bool checkOutputConfigurations(std::string_view object, const Value& value, DiagnosticErrorPtr* error);
// VideoOutputsEnabled: by output, a boolean.
bool checkOutputsEnabled(std::string_view object, const Value& value, DiagnosticErrorPtr* error);
// VideoOutputHandlers: by output, a dictionary that may hold a PixelBufferHandler and an EventHandler.
bool checkOutputHandlers(std::string_view object, const Value& value, DiagnosticErrorPtr* error);

}  // namespace quazor
