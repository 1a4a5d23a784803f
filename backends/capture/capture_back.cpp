#include "backends/capture/capture_back.h"

namespace quazor {

CaptureRun::~CaptureRun() = default;
CameraBack::~CameraBack() = default;
StreamingBack::~StreamingBack() = default;
CaptureBack::~CaptureBack() = default;

}  // namespace quazor
