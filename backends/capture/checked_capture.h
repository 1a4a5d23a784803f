// The capture service of every backend: checks who may do what and when, and all values. The back operates the cameras.
#pragma once

#include "backends/capture/capture_back.h"
#include "platform/capture_service.h"

#include <memory>

namespace quazor {

// Each device returned by its plug-ins is a separate user of the same cameras. A device's streams and groups are
// created with it, and every path to them leads to the same objects. When a user's device, groups and streams are
// destroyed, its control is released.
//
// Thread: any.
std::shared_ptr<CaptureService> makeCheckedCapture(std::shared_ptr<CaptureBack> back);

}  // namespace quazor
