#include "backends/capture/camera_settings.h"

namespace quazor {

Value CameraSettings::darkness() {
  Dictionary dark;
  for (const std::string_view key :
       {capture_key::Mode, capture_key::StructuredLightPattern, capture_key::StructuredLightCurrent}) {
    dark.set(key, 0);
  }
  return dark;
}

const Value* CameraSettings::enabledHandler(std::string_view kind) const {
  if (!toBoolean(entryOf(&outputsEnabled, capture_key::PrimaryScaler))) return nullptr;
  return entryOf(entryOf(&outputHandlers, capture_key::PrimaryScaler), kind);
}

}  // namespace quazor
