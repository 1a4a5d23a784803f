#include "platform/hid.h"

namespace QUAZOR_CONTRACT {

HidDevice::~HidDevice() = default;
HidManager::~HidManager() = default;
HidService::~HidService() = default;

}  // namespace QUAZOR_CONTRACT
