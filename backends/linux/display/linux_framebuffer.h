// The framebuffer service on DRM's sysfs: reports whether the main display is on.
#pragma once

#include "backends/linux/binding/binding.h"
#include "platform/framebuffer_service.h"

#include <filesystem>
#include <memory>

namespace quazor {

// The main display is the connector of the binding or, without one, the first connected connector by card and name.
//
// Its registry entry has one property, "DSPLY Debug Info": {"DSPLY power info": {"DSPLY power info panel": on}},
// updated on every read. The display is on only if its connector is connected and enabled and its power mode (DPMS) is
// On, because each of the three may also hold for a display that is off. The property is missing if the connector does
// not exist.
//
// Thread: any.
std::shared_ptr<FramebufferService> makeLinuxFramebuffer(const Binding& binding);
// The same, with another directory than /sys.
std::shared_ptr<FramebufferService> makeLinuxFramebuffer(const Binding& binding, const std::filesystem::path& sysfs);

}  // namespace quazor
