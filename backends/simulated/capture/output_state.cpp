#include "backends/simulated/capture/output_state.h"

#include "backends/simulated/capture/output_checks.h"
#include "backends/simulated/capture/property_checks.h"

#include <utility>

namespace quazor {
namespace {

// A camera without a projector has nothing to configure.
bool checkProjector(const CameraState& camera, DiagnosticErrorPtr* error) {
  if (camera.camera.projector) return true;
  return refuse(error, CaptureErrorCode::kUnsupported, "%@ has no projector, and no %@.", camera.camera.id,
                capture_key::InfraredLightSourceConfiguration);
}

template <class Handler>
std::shared_ptr<Handler> handlerIn(const Value* handlers, std::string_view kind) {
  const Value* handler = entryOf(handlers, kind);
  return handler == nullptr ? nullptr : std::dynamic_pointer_cast<Handler>(handler->object());
}

}  // namespace

bool isOutputProperty(std::string_view key) {
  return key == capture_key::AEEnabled || key == capture_key::InfraredLightSourceConfiguration ||
         key == capture_key::VideoOutputConfigurations || key == capture_key::VideoOutputsEnabled ||
         key == capture_key::VideoOutputHandlers;
}

std::optional<Value> readOutput(const CameraState& camera, std::string_view key, DiagnosticErrorPtr* error) {
  if (key == capture_key::AEEnabled) return camera.autoExposure;
  if (key == capture_key::VideoOutputConfigurations) return camera.outputConfigurations;
  if (key == capture_key::VideoOutputsEnabled) return camera.outputsEnabled;
  if (key == capture_key::VideoOutputHandlers) return camera.outputHandlers;
  if (!checkProjector(camera, error)) return std::nullopt;
  return camera.lightSource;
}

bool setOutput(CameraState& camera, const Value& value, std::string_view key, DiagnosticErrorPtr* error) {
  const std::string& id = camera.camera.id;
  if (key == capture_key::AEEnabled) {
    if (!checkBoolean(id, key, value, error)) return false;
    camera.autoExposure = value;
  } else if (key == capture_key::VideoOutputConfigurations) {
    if (!checkOutputConfigurations(id, value, error)) return false;
    camera.outputConfigurations = value;
  } else if (key == capture_key::VideoOutputsEnabled) {
    if (!checkOutputsEnabled(id, value, error)) return false;
    camera.outputsEnabled = value;
  } else if (key == capture_key::VideoOutputHandlers) {
    if (!checkOutputHandlers(id, value, error)) return false;
    camera.outputHandlers = value;
  } else {
    if (!checkProjector(camera, error) || !checkLightSource(id, value, error)) return false;
    camera.lightSource = value;
  }
  return true;
}

std::shared_ptr<FrameDelivery> makeDelivery(const CameraState& camera, std::size_t index,
                                            std::shared_ptr<PixelBufferPool> pool, std::shared_ptr<Clock> clock) {
  if (!toBoolean(entryOf(&camera.outputsEnabled, capture_key::PrimaryScaler))) return nullptr;
  const Value* handlers = entryOf(&camera.outputHandlers, capture_key::PrimaryScaler);
  FrameDelivery::Source source;
  source.frames = handlerIn<PixelBufferHandler>(handlers, capture_key::PixelBufferHandler);
  source.events = handlerIn<EventHandler>(handlers, capture_key::EventHandler);
  if (source.frames == nullptr && source.events == nullptr) return nullptr;
  source.index = index;
  source.camera = camera.camera;
  source.run = *camera.run;
  source.lit = toUnsigned(entryOf(&camera.lightSource, capture_key::Mode)) != 0;
  return std::make_shared<FrameDelivery>(std::move(source), std::move(pool), std::move(clock));
}

}  // namespace quazor
