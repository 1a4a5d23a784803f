// The capture service of every backend: who may do what when, with which values. What a camera then does is the back's.
#pragma once

#include "backends/capture/capture_back.h"
#include "platform/capture_service.h"

#include <memory>

namespace quazor {

// Each device that its plug-ins hand out is a user of its own of the same cameras. A device's streams and groups are
// made with it and are the same objects on every path that leads to them. What a user controls is free again when its
// device, groups and streams are gone.
//
// Thread: any.
std::shared_ptr<CaptureService> makeCheckedCapture(std::shared_ptr<CaptureBack> back);

}  // namespace quazor
