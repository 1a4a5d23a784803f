// The cameras among what a machine has.
#pragma once

#include "backends/linux/video/video_kernel.h"
#include "backends/linux/video/video_nodes.h"

#include <nlohmann/json.hpp>

#include <memory>
#include <string>
#include <vector>

namespace quazor {

// Adds lines about all video nodes (see MachineProbe), and gives the entry "cameras" of a binding: those that fit, by
// the ports in their usual order.
nlohmann::ordered_json probeCameras(const std::shared_ptr<VideoKernel>& kernel, const DeviceRoots& roots,
                                    std::vector<std::string>* lines);

}  // namespace quazor
