// The platform for experiments that are only described.
#pragma once

#include "platform/platform.h"

namespace quazor {

// Services that do nothing: there is no capture plug-in, no report channel, no HID facility, no display and no run
// loop. The clock stays at zero, queues destroy their tasks without running them, and no call blocks.
Platform nullPlatform();

}  // namespace quazor
