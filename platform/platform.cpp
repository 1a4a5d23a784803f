#include "platform/platform.h"

#include <utility>

namespace QUAZOR_CONTRACT {

namespace {

Platform& currentPlatform() {
  // Never destroyed: experiments that outlive the main function may still use its services.
  static auto* const platform = new Platform;
  return *platform;
}

}  // namespace

// Defines the destructors out of line, so that the virtual tables exist only in this library.

CaptureObject::~CaptureObject() = default;
CaptureStream::~CaptureStream() = default;
SynchronizedStreamsGroup::~SynchronizedStreamsGroup() = default;
CaptureDevice::~CaptureDevice() = default;
CapturePlugIn::~CapturePlugIn() = default;
CaptureService::~CaptureService() = default;

SerialQueue::~SerialQueue() = default;
Semaphore::~Semaphore() = default;
Concurrency::~Concurrency() = default;

RegistryService::~RegistryService() = default;
Display::~Display() = default;
FramebufferService::~FramebufferService() = default;

HidDevice::~HidDevice() = default;
HidManager::~HidManager() = default;
HidService::~HidService() = default;

ReportSnapshot::~ReportSnapshot() = default;
ReportChannelSet::~ReportChannelSet() = default;
ReportFacility::~ReportFacility() = default;

RunLoopSource::~RunLoopSource() = default;
RunLoopObserver::~RunLoopObserver() = default;
RunLoop::~RunLoop() = default;
RunLoops::~RunLoops() = default;

void installPlatform(Platform platform) { currentPlatform() = std::move(platform); }

const Platform& installedPlatform() { return currentPlatform(); }

}  // namespace QUAZOR_CONTRACT
