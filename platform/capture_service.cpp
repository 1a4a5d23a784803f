#include "platform/capture_service.h"

namespace QUAZOR_CONTRACT {

CaptureObject::~CaptureObject() = default;
CaptureStream::~CaptureStream() = default;
SynchronizedStreamsGroup::~SynchronizedStreamsGroup() = default;
CaptureDevice::~CaptureDevice() = default;
CapturePlugIn::~CapturePlugIn() = default;
CaptureService::~CaptureService() = default;

}  // namespace QUAZOR_CONTRACT
