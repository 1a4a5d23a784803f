// CameraSettings: the property values of a stream.
#pragma once

#include "contract/value.h"
#include "platform/capture_keys.h"
#include "platform/pixel_buffer.h"

#include <memory>
#include <optional>
#include <string_view>

namespace quazor {

// Values are stored with the numeric type with which they were set. A user who takes control of a stream gets new
// settings.
//
// Thread: one at a time.
struct CameraSettings {
  Value formatIndex{0U};
  std::optional<Value> minimumRate;
  std::optional<Value> maximumRate;
  Value multipleOutputs{false};
  Value slaveConfiguration{Dictionary{}};
  Value autoExposure{true};
  Value lightSource = darkness();
  Value outputConfigurations{Dictionary{}};
  Value outputsEnabled{Dictionary{}};
  Value outputHandlers{Dictionary{}};

  // The InfraredLightSourceConfiguration with all light sources off.
  static Value darkness();
  // The handler of the primary output; null if the output is not enabled or has no handler.
  std::shared_ptr<PixelBufferHandler> frameHandler() const {
    return handler<PixelBufferHandler>(capture_key::PixelBufferHandler);
  }
  std::shared_ptr<EventHandler> eventHandler() const { return handler<EventHandler>(capture_key::EventHandler); }

 private:
  template <class Handler>
  std::shared_ptr<Handler> handler(std::string_view kind) const {
    const Value* const found = enabledHandler(kind);
    return found == nullptr ? nullptr : std::dynamic_pointer_cast<Handler>(found->object());
  }
  const Value* enabledHandler(std::string_view kind) const;
};

}  // namespace quazor
