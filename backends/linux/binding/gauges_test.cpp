#include "backends/linux/binding/gauges.h"

#include <gtest/gtest.h>

namespace quazor {
namespace {

TEST(GaugeReason, TellsGaugesFromCounters) {
  const struct {
    const char* file;
    const char* key;
    bool isGauge;
  } kRows[] = {
      {"/proc/vmstat", "nr_free_pages", true},
      {"/proc/vmstat", "workingset_nodes", true},
      {"/proc/vmstat", "pgfault", false},
      {"/proc/meminfo", "MemFree:", true},
      {"/proc/loadavg", "", true},
      {"/proc/other", "nr_x", false},
      {"/sys/fs/cgroup/a/b/cpu.stat", "usage_usec", false},
      {"/sys/fs/cgroup/a/memory.current", "", true},
      {"/sys/fs/cgroup/a/pids.max", "", true},
      {"/sys/fs/cgroup/a/memory.min", "", true},
      {"/sys/fs/cgroup/a/memory.low", "", true},
      {"/sys/fs/cgroup/a/memory.high", "", true},
      {"/sys/fs/cgroup/a/cpu.weight", "", true},
      {"/sys/fs/cgroup/a/cgroup.stat", "nr_descendants", true},
      {"/sys/fs/cgroup/a/memory.stat", "anon", true},
      {"/sys/fs/cgroup/a/memory.stat", "pgfault", false},
      {"/sys/fs/cgroup/a/memory.stat", "workingset_refault_file", false},
      {"/sys/fs/cgroup/a/memory.stat", "thp_fault_alloc", false},
      {"/sys/fs/cgroup/a/memory.stat", "zswpin", false},
      {"/sys/fs/cgroup/a/memory.stat", "zswapped", true},
      {"/sys/fs/cgroup/memory.stat", "anon", true},
      {"/sys/fs/cgroup/memory.stat", "pgfault", false},
      {"/sys/fs/cgroup/cgroup.stat", "nr_descendants", true},
      {"/sys/fs/cgroup/a/cgroup.events", "populated", true},
      {"/sys/fs/cgroup/a/memory.events", "oom_kill", false},
      {"/sys/fs/cgroup/class/net/power_supply/temp/cpu.stat", "usage_usec", false},
      {"/sys/class/hwmon/hwmon0/temp1_input", "", true},
      {"/sys/devices/platform/x/hwmon/hwmon0/energy1_input", "", false},
      {"/sys/bus/iio/devices/iio:device0/in_voltage0_raw", "", true},
      {"/sys/bus/iio/devices/iio:device0/in_temp_input", "", true},
      {"/sys/bus/iio/devices/iio:device0/in_count0_raw", "", false},
      {"/sys/bus/iio/devices/iio:device0/in_steps_input", "", false},
      {"/sys/bus/iio/devices/iio:device0/in_energy_input", "", false},
      {"/sys/class/thermal/thermal_zone0/temp", "", true},
      {"/sys/class/thermal/cooling_device0/cur_state", "", true},
      {"/sys/class/power_supply/BAT0/charge_now", "", true},
      {"/sys/class/power_supply/BAT0/cycle_count", "", false},
      {"/sys/devices/system/cpu/cpu0/cpufreq/scaling_cur_freq", "", true},
      {"/sys/class/backlight/panel/brightness", "", true},
      {"/sys/class/net/lo/statistics/rx_packets", "", false},
      {"/sys/class/net/eth0/carrier_changes", "", false},
      {"/sys/class/net/eth0/mtu", "", true},
      {"/sys/class/net/eth0/queues/tx-0/tx_timeout", "", false},
      {"/sys/class/net/eth0/queues/tx-0/xps_cpus", "", true},
      {"/sys/class/net/eth0/device/errors/ecc", "", false},
      {"/sys/devices/platform/x/errors/mipi", "", false},
  };
  for (const auto& row : kRows) EXPECT_EQ(!gaugeReason(row.file, row.key).empty(), row.isGauge) << row.file << row.key;
}

}  // namespace
}  // namespace quazor
