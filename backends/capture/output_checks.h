// Checks of the properties for outputs and light sources. Like those in property_checks.h, each returns true, or stores
// the refusal and returns false.
#pragma once

#include "backends/capture/capture_back.h"
#include "contract/value.h"

#include <string_view>

namespace quazor {

// A camera without a projector has no InfraredLightSourceConfiguration.
bool checkProjector(const CameraInfo& camera, const Refuser& refuse);
// InfraredLightSourceConfiguration: a dictionary of exactly Mode, StructuredLightPattern and StructuredLightCurrent,
// integers from 0 to 255. Mode 0 keeps the projector off.
bool checkLightSource(std::string_view object, const Value& value, const Refuser& refuse);
// VideoOutputConfigurations: for each output, a dictionary that may contain AttachRaw, a boolean.
bool checkOutputConfigurations(std::string_view object, const Value& value, const Refuser& refuse);
// VideoOutputsEnabled: for each output, a boolean.
bool checkOutputsEnabled(std::string_view object, const Value& value, const Refuser& refuse);
// VideoOutputHandlers: for each output, a dictionary that may contain a PixelBufferHandler and an EventHandler.
bool checkOutputHandlers(std::string_view object, const Value& value, const Refuser& refuse);

}  // namespace quazor
