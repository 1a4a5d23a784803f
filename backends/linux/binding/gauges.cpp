#include "backends/linux/binding/gauges.h"

#include "backends/linux/binding/name_pattern.h"

#include <string>
#include <vector>

namespace quazor {
namespace {

constexpr std::string_view kStock = "it is a current amount";
constexpr std::string_view kReading = "it is a reading of a sensor";
constexpr std::string_view kSetting = "it is a setting";
constexpr std::string_view kState = "it is a current state";

struct Rule {
  std::string_view file;
  std::string_view key;     // "*" matches any key, and a file with one number
  std::string_view reason;  // empty: it is a counter
};

// The first matching rule applies.
constexpr Rule kRules[] = {
    // Some of these count events, but their names do not show which.
    {"/proc/vmstat", "nr_*", kStock},
    {"/proc/vmstat", "workingset_nodes", kStock},
    {"/proc/meminfo", "*", kStock},
    {"/proc/loadavg", "*", kStock},
    {"/sys/fs/cgroup*/memory.stat", "pg*", {}},  // of a control group or of the root
    {"/sys/fs/cgroup*/memory.stat", "workingset_*", {}},
    {"/sys/fs/cgroup*/memory.stat", "thp_*", {}},
    {"/sys/fs/cgroup*/memory.stat", "zswp*", {}},
    {"/sys/fs/cgroup*/memory.stat", "*", kStock},
    {"/sys/fs/cgroup*/cgroup.stat", "*", kStock},
    {"/sys/fs/cgroup*/cgroup.events", "*", kState},
    {"/sys/fs/cgroup/*.current", "*", kStock},
    {"/sys/fs/cgroup/*.max", "*", kSetting},
    {"/sys/fs/cgroup/*.min", "*", kSetting},
    {"/sys/fs/cgroup/*.low", "*", kSetting},
    {"/sys/fs/cgroup/*.high", "*", kSetting},
    {"/sys/fs/cgroup/*.weight", "*", kSetting},
    {"/sys/fs/cgroup/*", "*", {}},  // for any name of a control group
    {"/sys/*hwmon*/energy*_input", "*", {}},
    {"/sys/*hwmon*_input", "*", kReading},
    {"/sys/*iio:device*/in_count*_raw", "*", {}},
    {"/sys/*iio:device*/in_steps_input", "*", {}},
    {"/sys/*iio:device*/in_energy*_input", "*", {}},
    {"/sys/*iio:device*_raw", "*", kReading},
    {"/sys/*iio:device*_input", "*", kReading},
    {"/sys/*/thermal_zone*/temp", "*", kReading},
    {"/sys/*/cooling_device*/cur_state", "*", kSetting},
    {"/sys/*/power_supply/*/cycle_count", "*", {}},
    {"/sys/*/power_supply/*", "*", kReading},
    {"/sys/*/cpufreq/*_freq", "*", kReading},
    {"/sys/*/brightness", "*", kSetting},
    {"/sys/*/net/*/statistics/*", "*", {}},
    {"/sys/*/net/*/carrier_*", "*", {}},
    {"/sys/*/net/*/queues/*/tx_timeout", "*", {}},
    {"/sys/*/net/*/device/*", "*", {}},  // statistics of the driver
    {"/sys/*/net/*", "*", kSetting},
};

struct ParsedRule {
  NamePattern file;
  NamePattern key;
  std::string_view reason;
};

std::vector<ParsedRule> parsedRules() {
  std::vector<ParsedRule> rules;
  for (const Rule& rule : kRules) {
    rules.push_back({NamePattern::parse(rule.file), NamePattern::parse(rule.key), rule.reason});
  }
  return rules;
}

}  // namespace

std::string_view gaugeReason(std::string_view file, std::string_view key) {
  static const std::vector<ParsedRule> kParsed = parsedRules();
  for (const ParsedRule& rule : kParsed) {
    if (rule.file.matches(file) && rule.key.matches(key)) return rule.reason;
  }
  return {};
}

}  // namespace quazor
