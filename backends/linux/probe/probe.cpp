#include "backends/linux/probe/probe.h"

#include "backends/linux/binding/binding.h"
#include "backends/linux/counters/counter_channels.h"
#include "backends/linux/display/display_connectors.h"
#include "backends/linux/probe/probe_absent.h"
#include "backends/linux/probe/probe_cameras.h"
#include "backends/linux/system/linux_error.h"
#include "base/text/hexadecimal.h"
#include "contract/message_format.h"

#include <algorithm>
#include <cerrno>
#include <optional>
#include <string_view>
#include <utility>

namespace quazor {
namespace {

using Json = nlohmann::ordered_json;

// Counters that many machines have, as entries of a binding.
std::vector<CounterFilesBinding> usualCounterFiles() {
  return {
      {"/sys/fs/cgroup/{group}/{subgroup}/{name}/cpu.stat", std::nullopt, std::nullopt, std::nullopt, "usage_usec"},
      {"/sys/class/net/{subgroup}/statistics/{name}", "net", std::nullopt, std::nullopt, std::nullopt},
      {"/sys/bus/iio/devices/{subgroup}/in_{name}_raw", "iio", std::nullopt, std::nullopt, std::nullopt},
      {"/proc/vmstat", "kernel", "vmstat", std::nullopt, "{name}"},
  };
}

Json entryOf(const CounterFilesBinding& files) {
  Json entry = {{"path", files.path}};
  if (files.group) entry["group"] = *files.group;
  if (files.subgroup) entry["subgroup"] = *files.subgroup;
  if (files.key) entry["key"] = *files.key;
  return entry;
}

std::string orUnknown(const std::string& word) { return word.empty() ? "not told" : word; }

class Probe {
 public:
  explicit Probe(const ProbeSources& sources) : sources_(sources) {}

  MachineProbe run() {
    binding_["$schema"] = "binding.schema.json";
    binding_["title"] = "This machine";
    tell("Cameras");
    ProbedCameras probed = probeCameras(sources_.kernel, sources_.devices, &lines_);
    bindCameras(std::move(probed.cameras));
    tell("HID devices");
    probeHid();
    tell("Displays");
    probeDisplays();
    tell("Counters");
    probeCounterFiles();
    probeTracepoints();
    binding_["absent"] = absentDiagnostics(binding_, probed.forbidden);
    // Names may contain arbitrary bytes; invalid UTF-8 is replaced.
    return {std::move(lines_), binding_.dump(2, ' ', false, Json::error_handler_t::replace) + "\n"};
  }

 private:
  void tell(std::string line) { lines_.push_back(std::move(line)); }

  void bindCameras(Json cameras) {
    if (cameras.empty()) return;
    Json back = Json::array();
    Json front = Json::array();
    for (const auto& [port, ignored] : cameras.items()) (port.starts_with("Back") ? back : front).push_back(port);
    Json groups = Json::object();
    if (back.size() > 1) groups["back"] = {{"cameras", back}, {"master", back[0]}};
    if (front.size() > 1) groups["front"] = {{"cameras", front}, {"master", front[0]}};
    binding_["cameras"] = std::move(cameras);
    if (!groups.empty()) binding_["groups"] = std::move(groups);
  }

  void probeHid() {
    const std::vector<HidrawNode> nodes = hidrawNodes(sources_.hid);
    if (!hasHidraw(sources_.hid)) {
      tell("  none: this kernel has no hidraw (CONFIG_HIDRAW), or its module hid is not loaded");
    } else if (nodes.empty()) {
      tell("  none: no HID device is connected, or its driver is not loaded");
    }
    for (const HidrawNode& node : nodes) {
      tell("  " + node.path.string() + (node.name.empty() ? "" : " (" + node.name + ")"));
      for (const HidUsage& usage : node.descriptor.topLevel) {
        tell("    usage page " + hexadecimalNumber(usage.page, 4) + ", usage " + hexadecimalNumber(usage.usage, 4));
      }
      tellReports("input", node.descriptor.inputReports);
      tellReports("feature", node.descriptor.featureReports);
      if (!node.problem.empty()) tell("    unsuitable: " + node.problem);
      if (node.noAccess.empty()) continue;
      tell("    unsuitable: " + node.noAccess);
      if (node.isForbidden) tell("    docs/linux.md has a udev rule that assigns it to a group.");
    }
    if (!nodes.empty()) tell("  They need no binding: plug-ins find them by usage page and usage.");
  }

  void tellReports(std::string_view kind, const std::map<std::uint8_t, std::uint32_t>& reports) {
    std::string text;
    for (const auto& [id, length] : reports) {
      text += (text.empty() ? "" : ", ") + hexadecimalNumber(id, 2) + formatMessage(" (%@ bytes)", length);
    }
    if (!text.empty()) tell("    " + std::string(kind) + " reports " + text);
  }

  void probeDisplays() {
    const std::vector<DisplayConnector> connectors = displayConnectors(sources_.sysfs);
    if (connectors.empty()) tell("  none: no graphics driver offers a connector (/sys/class/drm)");
    for (const DisplayConnector& one : connectors) {
      const bool isMain = one.isConnected() && !binding_.contains("display");
      if (isMain) binding_["display"] = {{"connector", one.name}};
      tell("  " + one.name + " of " + one.card + ": " + orUnknown(one.status) + ", " + orUnknown(one.enabled) +
           ", power mode " + orUnknown(one.dpms) + (one.isPowered() ? ": it is on" : ": it is off") +
           (isMain ? "; the main display below" : ""));
    }
  }

  void probeCounterFiles() {
    Json entries = Json::array();
    for (const CounterFilesBinding& files : usualCounterFiles()) {
      Binding only;
      only.counterFiles = {files};
      const std::string what = files.path + (files.key ? ", key " + *files.key : "");
      if (!channelsOf(only, what).empty()) entries.push_back(entryOf(files));
    }
    if (!entries.empty()) binding_["counterFiles"] = std::move(entries);
  }

  void probeTracepoints() {
    Binding all;
    all.tracepoints = {{"*", "*", std::nullopt, std::nullopt, std::nullopt}};
    const std::vector<CounterChannel> channels = channelsOf(all, "tracepoints");
    if (channels.empty()) {
      tell("    They require tracefs to be mounted at /sys/kernel/tracing and readable.");
      return;
    }
    FileDescriptor counter;
    const int failure = sources_.counters->openTracepoint(*channels.front().tracepoint, 0, &counter);
    if (failure != 0) {
      DiagnosticErrorPtr error;
      failSystemCall(&error, "perf_event_open", channels.front().file, failure);
      const bool isForbidden = failure == EACCES || failure == EPERM;
      tell((isForbidden ? "    This user may not count them: " : "    They cannot be counted: ") +
           error->localizedDescription());
      if (isForbidden) {
        tell("    The capability CAP_PERFMON, or a sysctl kernel.perf_event_paranoid of 0 or -1, allows it.");
      }
      return;
    }
    const auto isOfCameras = [](const CounterChannel& one) { return one.file == "v4l2:v4l2_dqbuf"; };
    if (std::ranges::none_of(channels, isOfCameras)) return;
    binding_["tracepoints"] = {{{"system", "v4l2"}, {"event", "v4l2_dqbuf"}}};
  }

  // The channels of a binding; reports their number, or the missing permission.
  std::vector<CounterChannel> channelsOf(const Binding& binding, const std::string& what) {
    DiagnosticErrorPtr error;
    std::optional<std::vector<CounterChannel>> channels = counterChannels(binding, *sources_.counters, &error);
    tell("  " + what + ": " + (channels ? std::to_string(channels->size()) : error->localizedDescription()));
    return std::move(channels).value_or(std::vector<CounterChannel>());
  }

  const ProbeSources& sources_;
  std::vector<std::string> lines_;
  Json binding_ = Json::object();
};

}  // namespace

ProbeSources sourcesOfRunningSystem() { return {systemVideoKernel(), {}, {}, systemCounters(), "/sys"}; }

MachineProbe probeMachine(const ProbeSources& sources) { return Probe(sources).run(); }

}  // namespace quazor
