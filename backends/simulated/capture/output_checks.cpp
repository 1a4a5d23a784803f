#include "backends/simulated/capture/output_checks.h"

#include "backends/simulated/capture/property_checks.h"
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

// The value is a dictionary whose entries are among `keys`.
bool checkDictionary(std::string_view object, std::string_view key, const Value& value, Keys keys,
                     DiagnosticErrorPtr* error) {
  const Dictionary* entries = value.dictionary();
  if (entries == nullptr) {
    return refuse(error, CaptureErrorCode::kWrongType, "%@: %@ must be a dictionary, not %@.", object, key,
                  described(value));
  }
  for (const auto& [name, entry] : *entries) {
    if (std::ranges::find(keys, name) != keys.end()) continue;
    const Array known(keys.begin(), keys.end());
    return refuse(error, CaptureErrorCode::kOutOfRange, "%@: %@ has no entry %@; it may have %@.", object, key, name,
                  Value(known));
  }
  return true;
}

template <class Handler>
bool checkHandler(std::string_view object, std::string_view key, const Value& value, DiagnosticErrorPtr* error) {
  if (std::dynamic_pointer_cast<Handler>(value.object()) != nullptr) return true;
  return refuse(error, CaptureErrorCode::kWrongType, "%@: %@ must be a handler of its kind, not %@.", object, key,
                described(value));
}

}  // namespace

bool checkLightSource(std::string_view object, const Value& value, DiagnosticErrorPtr* error) {
  constexpr std::string_view kKey = capture_key::InfraredLightSourceConfiguration;
  if (!checkDictionary(object, kKey, value, kLightSettings, error)) return false;
  for (const std::string_view setting : kLightSettings) {
    const Value* entry = value.dictionary()->find(setting);
    if (entry == nullptr) {
      return refuse(error, CaptureErrorCode::kOutOfRange, "%@: %@ must have %@.", object, kKey, setting);
    }
    if (!checkIndex(object, setting, *entry, kMaxLightSetting, error)) return false;
  }
  return true;
}

bool checkOutputConfigurations(std::string_view object, const Value& value, DiagnosticErrorPtr* error) {
  if (!checkDictionary(object, capture_key::VideoOutputConfigurations, value, kOutputs, error)) return false;
  for (const auto& [output, configuration] : *value.dictionary()) {
    if (!checkDictionary(object, output, configuration, kOutputSettings, error)) return false;
    for (const auto& [setting, entry] : *configuration.dictionary()) {
      if (!checkBoolean(object, setting, entry, error)) return false;
    }
  }
  return true;
}

bool checkOutputsEnabled(std::string_view object, const Value& value, DiagnosticErrorPtr* error) {
  if (!checkDictionary(object, capture_key::VideoOutputsEnabled, value, kOutputs, error)) return false;
  for (const auto& [output, enabled] : *value.dictionary()) {
    if (!checkBoolean(object, output, enabled, error)) return false;
  }
  return true;
}

bool checkOutputHandlers(std::string_view object, const Value& value, DiagnosticErrorPtr* error) {
  if (!checkDictionary(object, capture_key::VideoOutputHandlers, value, kOutputs, error)) return false;
  for (const auto& [output, handlers] : *value.dictionary()) {
    if (!checkDictionary(object, output, handlers, kHandlers, error)) return false;
    for (const auto& [kind, handler] : *handlers.dictionary()) {
      const bool fits = kind == capture_key::PixelBufferHandler
                            ? checkHandler<PixelBufferHandler>(object, kind, handler, error)
                            : checkHandler<EventHandler>(object, kind, handler, error);
      if (!fits) return false;
    }
  }
  return true;
}

}  // namespace quazor
