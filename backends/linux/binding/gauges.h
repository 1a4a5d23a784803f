// What is known of the kernel's numbers that go up and down: their differences mean nothing.
#pragma once

#include <string_view>

namespace quazor {

// Why the number in that file, or that of `key` in a file of lines "KEY NUMBER", is no counter; empty when nothing says
// so. `file` is an absolute path of sysfs, procfs or a control group. By the kernel's own documents: Documentation/
// admin-guide/cgroup-v2.rst, hwmon/sysfs-interface.rst and ABI/testing/sysfs-bus-iio, sysfs-class-net,
// sysfs-class-net-queues, sysfs-class-power, sysfs-class-thermal; of /proc/vmstat by include/linux/mmzone.h and
// vm_event_item.h.
std::string_view gaugeReason(std::string_view file, std::string_view key);

}  // namespace quazor
