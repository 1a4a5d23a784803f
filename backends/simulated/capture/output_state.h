// The properties that rule what a camera's stream delivers, and the delivery they make.
#pragma once

#include "backends/simulated/capture/capture_hardware.h"

#include <cstddef>
#include <memory>
#include <optional>
#include <string_view>

namespace quazor {

// AEEnabled, InfraredLightSourceConfiguration, and the three about video outputs.
bool isOutputProperty(std::string_view key);

// REQUIRES, for both: isOutputProperty(key). A refusal is told as refuse() does (capture_error.h).
std::optional<Value> readOutput(const CameraState& camera, std::string_view key, DiagnosticErrorPtr* error);
bool setOutput(CameraState& camera, const Value& value, std::string_view key, DiagnosticErrorPtr* error);

// The delivery of the stretch that the camera begins; null when no output with a handler is enabled. `index` is the
// camera's.
std::shared_ptr<FrameDelivery> makeDelivery(const CameraState& camera, std::size_t index,
                                            std::shared_ptr<PixelBufferPool> pool, std::shared_ptr<Clock> clock);

}  // namespace quazor
