#include "backends/capture/output_checks.h"

#include "backends/capture/property_checks.h"
#include "platform/pixel_buffer.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <vector>

namespace quazor {
namespace {

using Keys = std::span<const std::string_view>;

constexpr std::uint64_t kMaxLightSetting = 255;
constexpr std::array kLightSettings{capture_key::Mode, capture_key::StructuredLightPattern,
                                    capture_key::StructuredLightCurrent};
constexpr std::array kOutputs{capture_key::PrimaryScaler};
constexpr std::array kOutputSettings{capture_key::AttachRaw};
constexpr std::array kHandlers{capture_key::PixelBufferHandler, capture_key::EventHandler};

// True if the value is a dictionary whose keys are all in `keys`.
bool checkDictionary(std::string_view object, std::string_view key, const Value& value, Keys keys,
                     const Refuser& refuse) {
  const Dictionary* entries = value.dictionary();
  if (entries == nullptr) {
    return refuse(CaptureRefusal::kWrongType, "%@: %@ must be a dictionary, not %@.", object, key, described(value));
  }
  for (const auto& [name, entry] : *entries) {
    if (std::ranges::find(keys, name) != keys.end()) continue;
    const Array known(keys.begin(), keys.end());
    return refuse(CaptureRefusal::kOutOfRange, "%@: %@ has no entry %@; it may have %@.", object, key, name,
                  Value(known));
  }
  return true;
}

template <class Handler>
bool checkHandler(std::string_view object, std::string_view key, const Value& value, const Refuser& refuse) {
  if (std::dynamic_pointer_cast<Handler>(value.object()) != nullptr) return true;
  return refuse(CaptureRefusal::kWrongType, "%@: %@ must be a handler of its kind, not %@.", object, key,
                described(value));
}

}  // namespace

bool checkProjector(const CameraInfo& camera, const Refuser& refuse) {
  if (camera.hasProjector) return true;
  return refuse(CaptureRefusal::kUnsupported, "%@ has no projector, and no %@.", camera.name,
                capture_key::InfraredLightSourceConfiguration);
}

bool checkLightSource(std::string_view object, const Value& value, const Refuser& refuse) {
  constexpr std::string_view kKey = capture_key::InfraredLightSourceConfiguration;
  if (!checkDictionary(object, kKey, value, kLightSettings, refuse)) return false;
  for (const std::string_view setting : kLightSettings) {
    const Value* entry = value.dictionary()->find(setting);
    if (entry == nullptr) {
      return refuse(CaptureRefusal::kOutOfRange, "%@: %@ must have %@.", object, kKey, setting);
    }
    if (!checkIndex(object, setting, *entry, kMaxLightSetting, refuse)) return false;
  }
  return true;
}

bool checkOutputConfigurations(std::string_view object, const Value& value, const Refuser& refuse) {
  if (!checkDictionary(object, capture_key::VideoOutputConfigurations, value, kOutputs, refuse)) return false;
  for (const auto& [output, configuration] : *value.dictionary()) {
    if (!checkDictionary(object, output, configuration, kOutputSettings, refuse)) return false;
    for (const auto& [setting, entry] : *configuration.dictionary()) {
      if (!checkBoolean(object, setting, entry, refuse)) return false;
    }
  }
  return true;
}

bool checkOutputsEnabled(std::string_view object, const Value& value, const Refuser& refuse) {
  if (!checkDictionary(object, capture_key::VideoOutputsEnabled, value, kOutputs, refuse)) return false;
  for (const auto& [output, enabled] : *value.dictionary()) {
    if (!checkBoolean(object, output, enabled, refuse)) return false;
  }
  return true;
}

bool checkOutputHandlers(std::string_view object, const Value& value, const Refuser& refuse) {
  if (!checkDictionary(object, capture_key::VideoOutputHandlers, value, kOutputs, refuse)) return false;
  for (const auto& [output, handlers] : *value.dictionary()) {
    if (!checkDictionary(object, output, handlers, kHandlers, refuse)) return false;
    for (const auto& [kind, handler] : *handlers.dictionary()) {
      const bool fits = kind == capture_key::PixelBufferHandler
                            ? checkHandler<PixelBufferHandler>(object, kind, handler, refuse)
                            : checkHandler<EventHandler>(object, kind, handler, refuse);
      if (!fits) return false;
    }
  }
  return true;
}

}  // namespace quazor
