// Finds the cameras of a machine.
#pragma once

#include "backends/linux/video/v4l2_api.h"
#include "backends/linux/video/v4l2_device_info.h"

#include <nlohmann/json.hpp>

#include <memory>
#include <string>
#include <vector>

namespace quazor {

struct ProbedCameras {
  nlohmann::ordered_json cameras;  // the entry "cameras" of a binding
  bool forbidden = false;          // this user may not open one of the nodes
};

// Adds lines about all video nodes (see MachineProbe) and returns the nodes that fit, assigned to the ports in their
// default order.
ProbedCameras probeCameras(const std::shared_ptr<V4l2Api>& kernel, const DeviceRoots& roots,
                           std::vector<std::string>* lines);

}  // namespace quazor
