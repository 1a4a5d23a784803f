// Checks of the properties that rule what a stream delivers and by which light.
// As in property_checks.h: each is true, or false with the refusal told.
#pragma once

#include "backends/capture/capture_back.h"
#include "contract/value.h"

#include <string_view>

namespace quazor {

// A camera without a projector has no InfraredLightSourceConfiguration.
bool checkProjector(const CameraInfo& camera, const Refuser& refuse);
// InfraredLightSourceConfiguration: a dictionary of Mode, StructuredLightPattern and StructuredLightCurrent, integers
// from 0 to 255, all three and no others. Mode 0 keeps the projector dark.
bool checkLightSource(std::string_view object, const Value& value, const Refuser& refuse);
// VideoOutputConfigurations: by output, a dictionary that may hold AttachRaw, a boolean.
bool checkOutputConfigurations(std::string_view object, const Value& value, const Refuser& refuse);
// VideoOutputsEnabled: by output, a boolean.
bool checkOutputsEnabled(std::string_view object, const Value& value, const Refuser& refuse);
// VideoOutputHandlers: by output, a dictionary that may hold a PixelBufferHandler and an EventHandler.
bool checkOutputHandlers(std::string_view object, const Value& value, const Refuser& refuse);

}  // namespace quazor
