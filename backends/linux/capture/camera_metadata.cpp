#include "backends/linux/capture/camera_metadata.h"

#include <utility>

namespace quazor {

std::optional<std::uint64_t> fieldIn(std::span<const std::uint8_t> buffer, const MetadataField& field) {
  if (buffer.size() < std::size_t{field.offset} + field.bytes) return std::nullopt;
  std::uint64_t number = 0;
  for (std::size_t i = field.bytes; i-- > 0;) number = number << 8 | buffer[field.offset + i];
  if (field.shift >= 64) return 0;
  return number >> field.shift & field.mask.value_or(~std::uint64_t{0});
}

std::unique_ptr<CameraMetadata> CameraMetadata::make(const MetadataBinding& binding, const CameraControls& camera,
                                                     DiagnosticErrorPtr* error) {
  std::unique_ptr<CameraMetadata> metadata(new CameraMetadata(binding));
  for (const MetadataControl& one : binding.controls) {
    std::optional<CameraControl> control = camera.control(one.control, error);
    if (!control) return nullptr;
    metadata->controls_.push_back({one.key, std::move(*control)});
  }
  return metadata;
}

Dictionary CameraMetadata::readControls() const {
  Dictionary values;
  for (const Control& one : controls_) {
    if (const std::optional<std::int64_t> value = one.control.read(nullptr)) values.set(one.key, *value);
  }
  return values;
}

Dictionary CameraMetadata::dictionaryOf(const CapturedFrame& frame, bool* complete) const {
  Dictionary dictionary = binding_.constants;
  *complete = true;
  const auto leaveOut = [&](const std::string& key) {
    dictionary.erase(key);
    *complete = false;
  };
  const auto buffer = frame.paired ? std::span<const std::uint8_t>(*frame.paired) : std::span<const std::uint8_t>();
  for (const MetadataField& field : binding_.fields) {
    if (const std::optional<std::uint64_t> number = fieldIn(buffer, field)) {
      dictionary.set(field.key, *number);
    } else {
      leaveOut(field.key);
    }
  }
  for (const Control& one : controls_) {
    if (const Value* value = frame.controls.find(one.key)) {
      dictionary.set(one.key, *value);
    } else {
      leaveOut(one.key);
    }
  }
  return dictionary;
}

}  // namespace quazor
