// Finds the cameras of a machine.
#pragma once

#include "backends/linux/video/v4l2_api.h"
#include "backends/linux/video/v4l2_device_info.h"

#include <nlohmann/json.hpp>

#include <memory>
#include <string>
#include <vector>

namespace quazor {

// Adds lines about all video nodes (see MachineProbe) and returns the entry "cameras" of a binding: the nodes that fit,
// assigned to the ports in their default order.
nlohmann::ordered_json probeCameras(const std::shared_ptr<V4l2Api>& kernel, const DeviceRoots& roots,
                                    std::vector<std::string>* lines);

}  // namespace quazor
