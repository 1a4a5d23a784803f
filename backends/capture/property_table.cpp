#include "backends/capture/property_table.h"

#include <algorithm>

namespace quazor {

std::span<const CaptureProperty> propertiesOf(CaptureObjectKind kind) {
  switch (kind) {
    case CaptureObjectKind::kDevice: return kDeviceProperties;
    case CaptureObjectKind::kGroup: return kGroupProperties;
    case CaptureObjectKind::kStream: return kStreamProperties;
  }
  return {};
}

const CaptureProperty* findProperty(CaptureObjectKind kind, std::string_view key) {
  const std::span<const CaptureProperty> properties = propertiesOf(kind);
  const auto found = std::ranges::find(properties, key, &CaptureProperty::key);
  return found == properties.end() ? nullptr : &*found;
}

}  // namespace quazor
