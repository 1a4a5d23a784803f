// Known kernel values that rise and fall, so that their differences are meaningless.
#pragma once

#include <string_view>

namespace quazor {

// The reason why the number in that file, or of `key` in a file with lines "KEY NUMBER", is not a counter; empty if
// none is known. `file` is an absolute path in sysfs, procfs or a control group. Sources: the kernel's
// Documentation/admin-guide/cgroup-v2.rst, hwmon/sysfs-interface.rst and ABI/testing/sysfs-bus-iio, sysfs-class-net,
// sysfs-class-net-queues, sysfs-class-power, sysfs-class-thermal; for /proc/vmstat include/linux/mmzone.h and
// vm_event_item.h.
std::string_view gaugeReason(std::string_view file, std::string_view key);

}  // namespace quazor
