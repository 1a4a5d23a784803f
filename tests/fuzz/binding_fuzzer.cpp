// Arbitrary JSON as a binding: reading gives a binding within the limits of its devices, or a sentence.
#include "backends/linux/binding/binding.h"
#include "backends/linux/binding/gauges.h"
#include "backends/linux/binding/name_pattern.h"
#include "tests/fuzz/fuzzing.h"

#include <algorithm>
#include <bit>
#include <limits>
#include <optional>
#include <set>
#include <string>

namespace quazor {
namespace {

void requireSettings(const std::vector<ControlSetting>& settings) {
  for (const ControlSetting& one : settings) {
    require(!one.control.empty() && one.control.size() <= 63 + 1 + 31, "a control has a name of V4L2");
  }
}

void requirePad(const PadName& pad) {
  require(!pad.entity.empty() && pad.entity.size() <= 63 && pad.pad <= 65535, "a pad has an entity");
}

void requireMedia(const MediaBinding& media) {
  require(media.device.driver || media.device.model || media.device.busInfo, "a media controller is selected");
  for (const LinkBinding& link : media.links) {
    requirePad(link.source);
    requirePad(link.sink);
  }
  for (const PadBinding& pad : media.pads) {
    requirePad(pad.pad);
    require(pad.format || pad.crop || pad.interval, "a pad has a setting");
    require(!pad.format || (pad.format->code > 0 && pad.format->width > 0 && pad.format->height > 0),
            "frames have a format and a size");
    require(!pad.crop || (pad.crop->width > 0 && pad.crop->height > 0), "a crop leaves something");
  }
  const std::set<std::string> subdevices(media.subdevices.begin(), media.subdevices.end());
  require(subdevices.size() == media.subdevices.size(), "a sub-device is named once");
}

void requireCamera(const CameraBinding& camera) {
  const VideoNodeMatch& node = camera.node;
  require(node.driver || node.card || node.busInfo || node.path || node.name, "a camera has a node");
  if (camera.media) requireMedia(*camera.media);
  require(camera.width > 0 && camera.height > 0, "a camera has a size");
  require(camera.buffers >= 2 && camera.buffers <= 32, "a camera has as many buffers as V4L2 allows");
  requireSettings(camera.controls);
  require(camera.metadata.node.has_value() == !camera.metadata.fields.empty(), "fields and their node go together");
  for (const MetadataField& field : camera.metadata.fields) {
    require(std::has_single_bit(field.bytes) && field.bytes <= 8, "a field has the size of an integer");
    require(field.shift < field.bytes * 8, "a shift leaves some bits");
    const std::uint32_t bits = field.bytes * 8 - field.shift;
    require(!field.mask || (*field.mask != 0 && static_cast<std::uint32_t>(std::bit_width(*field.mask)) <= bits),
            "a mask selects bits that are there");
  }
  if (camera.projector) {
    require(!camera.projector->off.empty(), "a projector can be switched off");
    requireSettings(camera.projector->on);
    requireSettings(camera.projector->off);
  }
  for (const ErrorCounterBinding& counter : camera.errorCounters) {
    require(counter.file.has_value() != counter.control.has_value(), "a counter has one source");
  }
}

void requireCounterFiles(const CounterFilesBinding& files) {
  require(files.path.starts_with('/') && files.path.find("/../") == std::string::npos, "a path is absolute");
  const NamePattern path = NamePattern::parse(files.path);
  ChannelNames names;
  if (path.match(files.path, &names) && path.isLiteral()) {
    require(!names.group && !names.subgroup && !names.name, "a path without placeholders names nothing");
  }
  require(path.hasPlaceholder("group") != files.group.has_value(), "a channel has one group");
  require(path.hasPlaceholder("subgroup") != files.subgroup.has_value(), "a channel has one subgroup");
  const bool keyIsName = files.key == "{name}";
  require((path.hasPlaceholder("name") || keyIsName) != files.name.has_value(), "a channel has one name");
  if (path.isLiteral() && !keyIsName) {
    require(gaugeReason(files.path, files.key.value_or("")).empty(), "a channel counts");
  }
}

void requireBinding(const Binding& binding) {
  require(!binding.title.empty(), "a binding has a title");
  std::set<std::string> ports;
  for (const CameraBinding& camera : binding.cameras) {
    require(ports.insert(camera.port).second, "a port has one camera");
    requireCamera(camera);
  }
  for (const GroupBinding& group : binding.groups) {
    require(!group.ports.empty() && !group.name.empty(), "a group has a name and cameras");
    require(std::ranges::find(group.ports, group.master) != group.ports.end(), "the master is in its group");
    for (const std::string& port : group.ports) require(ports.contains(port), "a group consists of cameras");
  }
  for (const CounterFilesBinding& files : binding.counterFiles) requireCounterFiles(files);
  for (const TracepointBinding& one : binding.tracepoints) {
    require(NamePattern::parse(one.system).matches(one.system) && NamePattern::parse(one.event).matches(one.event),
            "a pattern matches itself");
  }
  for (const Fault& fault : binding.faults) {
    require(fault.seconds >= 0 && fault.seconds <= std::numeric_limits<double>::max(), "a delay is a time");
    require(!fault.occurrence || *fault.occurrence > 0, "occurrences are counted from 1");
  }
}

}  // namespace
}  // namespace quazor

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace quazor;
  static const MemoryFile file("binding.json");
  file.write(data, size);
  if (const std::optional<Binding> binding = acceptedDocument([] { return readBinding(file.path()); })) {
    requireBinding(*binding);
  }
  return 0;
}
