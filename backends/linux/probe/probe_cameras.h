// The cameras among what a machine has.
#pragma once

#include "backends/linux/video/v4l2_api.h"
#include "backends/linux/video/v4l2_device_info.h"

#include <nlohmann/json.hpp>

#include <memory>
#include <string>
#include <vector>

namespace quazor {

// Adds lines about all video nodes (see MachineProbe), and gives the entry "cameras" of a binding: those that fit, by
// the ports in their usual order.
nlohmann::ordered_json probeCameras(const std::shared_ptr<V4l2Api>& kernel, const DeviceRoots& roots,
                                    std::vector<std::string>* lines);

}  // namespace quazor
