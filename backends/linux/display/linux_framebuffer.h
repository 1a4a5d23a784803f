// The framebuffer service on DRM's sysfs: is the main display on?
#pragma once

#include "backends/linux/binding/binding.h"
#include "platform/framebuffer_service.h"

#include <filesystem>
#include <memory>

namespace quazor {

// The main display is the binding's connector or, where it names none, the first one that is connected, by card and
// name.
//
// Its registry entry has one property, "DSPLY Debug Info": {"DSPLY power info": {"DSPLY power info panel": on}}, read
// anew each time. The display is on only when its connector is connected and enabled and its power mode (DPMS) is On;
// each of the three alone says so of displays that are dark. There is no property while the connector is not there.
//
// Thread: any.
std::shared_ptr<FramebufferService> makeLinuxFramebuffer(const Binding& binding);
// The same, in another place than /sys.
std::shared_ptr<FramebufferService> makeLinuxFramebuffer(const Binding& binding, const std::filesystem::path& sysfs);

}  // namespace quazor
