#include "diagnostics/camera_sync/camera_names.h"

#include "contract/message_format.h"
#include "platform/capture_keys.h"

namespace quazor {

std::optional<std::string_view> cameraNameForPortType(std::string_view portType) {
  if (portType == port_type::BackFacingCamera) return "BackWide";
  if (portType == port_type::FrontFacingCamera) return "Front";
  if (portType == port_type::BackFacingTelephotoCamera) return "BackTele";
  if (portType == port_type::FrontFacingInfraredCamera) return "FrontInfrared";
  if (portType == port_type::BackFacingSuperWideCamera) return "BackSuperWide";
  return std::nullopt;
}

std::string cameraKey(std::string_view cameraName, std::string_view quantity) {
  return formatMessage("%@.%@", cameraName, quantity);
}

}  // namespace quazor
