#include "backends/linux/capture/camera_checks.h"

#include "platform/capture_keys.h"
#include "platform/pixel_buffer.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <functional>
#include <limits>
#include <memory>
#include <span>
#include <string>

namespace quazor {
namespace {

using Keys = std::span<const std::string_view>;

constexpr std::array kLightKeys{capture_key::Mode, capture_key::StructuredLightPattern,
                                capture_key::StructuredLightCurrent};
constexpr std::array kOutputs{capture_key::PrimaryScaler};
constexpr std::array kOutputSettings{capture_key::AttachRaw};
constexpr std::array kHandlers{capture_key::PixelBufferHandler, capture_key::EventHandler};
constexpr std::array kSlaveKeys{capture_key::StreamingOutputsEnabled, capture_key::FrameSkippingEnabled,
                                capture_key::TimeMachineEnabled, capture_key::MasterToSlaveFrameRateRatio};

constexpr double kMinRate = 0.01;
constexpr double kMaxRate = 10'000;

bool isNumber(const Value& value) { return value.isNumber() && value.boolean() == nullptr; }

// A whole number that is not below 0.
bool isWhole(const Value& value) {
  if (!isNumber(value)) return false;
  const double number = toDouble(&value);
  return number >= 0 && number <= std::numeric_limits<std::uint32_t>::max() && number == std::trunc(number);
}

// The value is a dictionary, and all its keys are among `keys`.
bool isDictionaryOf(std::string_view object, std::string_view key, const Value& value, Keys keys,
                    DiagnosticErrorPtr* error) {
  const Dictionary* const entries = value.dictionary();
  if (entries == nullptr) {
    return refuseLinux(error, LinuxErrorCode::kBadValue, "%@: %@ takes a dictionary, not %@.", object, key, value);
  }
  for (const auto& [name, entry] : *entries) {
    if (std::ranges::find(keys, name) != keys.end()) continue;
    return refuseLinux(error, LinuxErrorCode::kBadValue, "%@: %@ has no entry %@.", object, key, name);
  }
  return true;
}

// The same, and no key is missing.
bool isFullDictionaryOf(std::string_view object, std::string_view key, const Value& value, Keys keys,
                        DiagnosticErrorPtr* error) {
  if (!isDictionaryOf(object, key, value, keys, error)) return false;
  for (const std::string_view name : keys) {
    if (value.dictionary()->contains(name)) continue;
    return refuseLinux(error, LinuxErrorCode::kBadValue, "%@: %@ needs the entry %@.", object, key, name);
  }
  return true;
}

// The value is a dictionary by output, and every entry of it fits.
bool isByOutput(std::string_view object, std::string_view key, const Value& value, DiagnosticErrorPtr* error,
                const std::function<bool(const std::string&, const Value&)>& fits) {
  if (!isDictionaryOf(object, key, value, kOutputs, error)) return false;
  return std::ranges::all_of(*value.dictionary(), [&](const auto& entry) { return fits(entry.first, entry.second); });
}

}  // namespace

bool isBoolean(std::string_view object, std::string_view key, const Value& value, DiagnosticErrorPtr* error) {
  if (value.boolean() != nullptr) return true;
  return refuseLinux(error, LinuxErrorCode::kBadValue, "%@: %@ takes a boolean, not %@.", object, key, value);
}

bool isIndex(std::string_view object, std::string_view key, const Value& value, DiagnosticErrorPtr* error) {
  if (isWhole(value)) return true;
  return refuseLinux(error, LinuxErrorCode::kBadValue, "%@: %@ takes a whole number from 0, not %@.", object, key,
                     value);
}

bool isRate(std::string_view object, std::string_view key, const Value& value, DiagnosticErrorPtr* error) {
  const double rate = toDouble(&value);
  if (isNumber(value) && rate >= kMinRate && rate <= kMaxRate) return true;
  return refuseLinux(error, LinuxErrorCode::kBadValue, "%@: %@ takes a number from %@ to %@, not %@.", object, key,
                     kMinRate, kMaxRate, value);
}

bool isLightSource(std::string_view object, const Value& value, DiagnosticErrorPtr* error) {
  if (!isFullDictionaryOf(object, capture_key::InfraredLightSourceConfiguration, value, kLightKeys, error)) {
    return false;
  }
  return std::ranges::all_of(*value.dictionary(),
                             [&](const auto& entry) { return isIndex(object, entry.first, entry.second, error); });
}

bool isOutputConfigurations(std::string_view object, const Value& value, DiagnosticErrorPtr* error) {
  return isByOutput(object, capture_key::VideoOutputConfigurations, value, error,
                    [&](const std::string& output, const Value& configuration) {
                      if (!isDictionaryOf(object, output, configuration, kOutputSettings, error)) return false;
                      const Value* const raw = configuration.dictionary()->find(capture_key::AttachRaw);
                      return raw == nullptr || isBoolean(object, capture_key::AttachRaw, *raw, error);
                    });
}

bool isOutputsEnabled(std::string_view object, const Value& value, DiagnosticErrorPtr* error) {
  return isByOutput(
      object, capture_key::VideoOutputsEnabled, value, error,
      [&](const std::string& output, const Value& enabled) { return isBoolean(object, output, enabled, error); });
}

bool isOutputHandlers(std::string_view object, const Value& value, DiagnosticErrorPtr* error) {
  return isByOutput(object, capture_key::VideoOutputHandlers, value, error,
                    [&](const std::string& output, const Value& handlers) {
                      if (!isDictionaryOf(object, output, handlers, kHandlers, error)) return false;
                      for (const auto& [kind, handler] : *handlers.dictionary()) {
                        const std::shared_ptr<Object> given = handler.object();
                        const bool fits = kind == capture_key::PixelBufferHandler
                                              ? std::dynamic_pointer_cast<PixelBufferHandler>(given) != nullptr
                                              : std::dynamic_pointer_cast<EventHandler>(given) != nullptr;
                        if (fits) continue;
                        return refuseLinux(error, LinuxErrorCode::kBadValue,
                                           "%@: %@ takes a handler of its kind, not %@.", object, kind, handler);
                      }
                      return true;
                    });
}

bool isSlaveConfiguration(std::string_view object, const Value& value, DiagnosticErrorPtr* error) {
  if (!isFullDictionaryOf(object, "a slave configuration", value, kSlaveKeys, error)) return false;
  for (const auto& [key, entry] : *value.dictionary()) {
    const bool isRatio = key == capture_key::MasterToSlaveFrameRateRatio;
    if (isRatio ? !isIndex(object, key, entry, error) : !isBoolean(object, key, entry, error)) return false;
    const bool isOn = isRatio || key == capture_key::StreamingOutputsEnabled;
    if (toDouble(&entry) == (isOn ? 1 : 0)) continue;
    return refuseLinux(error, LinuxErrorCode::kNotSupported, "%@: %@ can only be %@ here, not %@.", object, key,
                       isOn ? 1 : 0, entry);
  }
  return true;
}

}  // namespace quazor
