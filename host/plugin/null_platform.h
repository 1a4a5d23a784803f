// The platform of experiments that are only asked for their description.
#pragma once

#include "platform/platform.h"

namespace quazor {

// Services without anything behind them: there is no capture plug-in, no report channel, no HID facility, no display
// and no run loop, the clock stands at zero, queues destroy their tasks without running them, and nothing ever blocks.
Platform nullPlatform();

}  // namespace quazor
