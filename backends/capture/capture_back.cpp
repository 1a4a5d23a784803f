#include "backends/capture/capture_back.h"

namespace quazor {

CaptureRun::~CaptureRun() = default;
CameraBack::~CameraBack() = default;
StreamingBack::~StreamingBack() = default;
CaptureBack::~CaptureBack() = default;

void CaptureBack::perform(const CaptureCall&, DiagnosticErrorPtr*, const std::function<bool()>& body) const { body(); }

}  // namespace quazor
