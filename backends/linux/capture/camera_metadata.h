// CameraMetadata: builds the metadata dictionary of a frame.
#pragma once

#include "backends/linux/binding/binding.h"
#include "backends/linux/capture/camera_controls.h"
#include "backends/linux/capture/camera_pairing.h"
#include "contract/value.h"

#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <vector>

namespace quazor {

// The value of the field; nothing if the buffer is too short.
std::optional<std::uint64_t> fieldIn(std::span<const std::uint8_t> buffer, const MetadataField& field);

// Thread: one at a time.
class CameraMetadata final {
 public:
  // Returns null and an error if the binding names a control that the camera does not have.
  static std::unique_ptr<CameraMetadata> make(const MetadataBinding& binding, const CameraControls& camera,
                                              DiagnosticErrorPtr* error);

  // The controls that are read with every frame; omits those that cannot be read.
  Dictionary readControls() const;

  // The frame's dictionary: constants, then fields, then controls. Omits the key of a missing field or control, even if
  // a constant has the same key, and then sets `complete` to false.
  Dictionary dictionaryOf(const CapturedFrame& frame, bool* complete) const;

 private:
  struct Control {
    std::string key;
    CameraControl control;
  };

  explicit CameraMetadata(const MetadataBinding& binding) : binding_(binding) {}

  const MetadataBinding binding_;
  std::vector<Control> controls_;
};

}  // namespace quazor
