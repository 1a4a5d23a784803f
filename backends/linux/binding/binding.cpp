#include "backends/linux/binding/binding.h"

#include "backends/faults/fault_reader.h"
#include "backends/linux/binding/binding_counters.h"
#include "backends/linux/binding/binding_media.h"
#include "base/json/json_cursor.h"
#include "platform/capture_keys.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <initializer_list>
#include <limits>
#include <string_view>
#include <system_error>
#include <utility>

namespace quazor {
namespace {

constexpr std::array kPorts{port_type::BackFacingCamera, port_type::BackFacingTelephotoCamera,
                            port_type::BackFacingSuperWideCamera, port_type::FrontFacingCamera,
                            port_type::FrontFacingInfraredCamera};
constexpr std::uint64_t kMinBuffers = 2;
constexpr std::uint64_t kMaxBuffers = 32;     // VIDEO_MAX_FRAME of linux/videodev2.h
constexpr std::size_t kMaxDriverLength = 15;  // without the null, in v4l2_capability
constexpr std::size_t kMaxCardLength = 31;
constexpr std::size_t kMaxBusInfoLength = 31;
constexpr std::uint64_t kMaxUsbInterface = 255;
constexpr std::uint64_t kLastMetadataByte = 16777215;  // offset in a buffer

// An optional comment key. If present, it must be a string.
void checkRemark(const JsonCursor& cursor, std::string_view key) {
  if (const auto remark = cursor.find(key)) static_cast<void>(remark->text());
}

// The members of an object whose keys are names.
std::vector<std::pair<std::string, JsonCursor>> namedEntries(const JsonCursor& cursor) {
  std::vector<std::pair<std::string, JsonCursor>> entries = cursor.entries();
  for (const auto& [name, ignored] : entries) {
    if (name.empty()) cursor.fail("an entry has an empty name.");
  }
  return entries;
}

std::optional<std::string> findControl(const JsonCursor& cursor, std::string_view key) {
  const std::optional<JsonCursor> found = cursor.find(key);
  return found ? std::optional(readControlName(found->text(), *found)) : std::nullopt;
}

VideoNodeMatch readMatch(const JsonCursor& cursor) {
  cursor.allowKeys({"driver", "card", "busInfo", "usbInterface", "path", "name"});
  VideoNodeMatch match{findDeviceText(cursor, "driver", kMaxDriverLength),
                       findDeviceText(cursor, "card", kMaxCardLength),
                       findDeviceText(cursor, "busInfo", kMaxBusInfoLength)};
  if (const auto interface = cursor.find("usbInterface")) {
    match.usbInterface = static_cast<std::uint32_t>(interface->integer(0, kMaxUsbInterface));
  }
  if (const auto path = cursor.find("path")) {
    match.path = readPathText(*path);
    if (!match.path->starts_with("/sys/"))
      path->fail("must be the device's path in sysfs, such as \"/sys/devices/...\".");
  }
  match.name = findDeviceText(cursor, "name", kMaxEntityLength);
  if (!match.driver && !match.card && !match.busInfo && !match.path && !match.name) {
    cursor.fail(
        "give at least one of \"driver\", \"card\", \"busInfo\", \"path\" and \"name\"; 'quazor phone probe' shows "
        "them.");
  }
  return match;
}

std::vector<ControlSetting> readSettings(const JsonCursor& cursor) {
  std::vector<ControlSetting> settings;
  for (const auto& [name, value] : namedEntries(cursor)) {
    settings.push_back(
        {readControlName(name, value), value.isBoolean() ? std::int64_t{value.boolean()} : value.integer()});
  }
  return settings;
}

// Drivers pad shorter codes with spaces.
std::string readFourcc(const JsonCursor& cursor) {
  constexpr std::string_view kBigEndian = "-BE";
  constexpr std::size_t kLength = 4;
  std::string code = cursor.text();
  const bool isBigEndian = code.size() > kLength && code.ends_with(kBigEndian);
  if (isBigEndian) code.resize(code.size() - kBigEndian.size());
  const bool isPrintable = std::ranges::all_of(code, [](char one) { return one >= ' ' && one <= '~'; });
  if (code.size() > kLength || !isPrintable) {
    cursor.fail("must be the code of a format, such as \"YUYV\"; 'quazor phone probe' shows the camera's codes.");
  }
  code.resize(kLength, ' ');
  return isBigEndian ? code + std::string(kBigEndian) : code;
}

MetadataField readField(const std::string& key, const JsonCursor& cursor) {
  cursor.allowKeys({"offset", "bytes", "shift", "mask"});
  MetadataField field;
  field.key = key;
  field.offset = static_cast<std::uint32_t>(cursor.at("offset").integer(0, kLastMetadataByte));
  if (const auto bytes = cursor.find("bytes")) {
    field.bytes = static_cast<std::uint32_t>(bytes->integer(1, 8));
    if ((field.bytes & (field.bytes - 1)) != 0) bytes->fail("must be 1, 2, 4 or 8.");
  }
  if (const auto shift = cursor.find("shift")) {
    field.shift = static_cast<std::uint32_t>(shift->integer(0, field.bytes * 8U - 1));
  }
  if (const auto mask = cursor.find("mask")) {
    const std::uint32_t bits = field.bytes * 8U - field.shift;  // the bits that remain after the shift
    field.mask = mask->integer(1, std::numeric_limits<std::uint64_t>::max() >> (64U - bits));
  }
  return field;
}

MetadataBinding readMetadata(const JsonCursor& cursor) {
  cursor.allowKeys({"constants", "node", "format", "pairing", "fields", "controls"});
  MetadataBinding metadata;
  if (const auto constants = cursor.find("constants")) {
    for (const auto& [key, value] : namedEntries(*constants)) metadata.constants.set(key, value.scalar());
  }
  if (const auto node = cursor.find("node")) metadata.node = readMatch(*node);
  if (const auto format = cursor.find("format")) {
    if (!metadata.node) format->fail("\"format\" requires a metadata \"node\".");
    metadata.format = readFourcc(*format);
  }
  if (const auto pairing = cursor.find("pairing")) {
    if (!metadata.node) pairing->fail("\"pairing\" requires a metadata \"node\".");
    constexpr std::array<std::string_view, 2> kPairings{"timestamp", "sequence"};
    metadata.pairing = pairing->oneOf(kPairings, "a way to pair frames and metadata") == kPairings[0]
                           ? MetadataPairing::kTimestamp
                           : MetadataPairing::kSequence;
  }
  if (const auto fields = cursor.find("fields")) {
    if (!metadata.node) fields->fail("\"fields\" requires a metadata \"node\".");
    for (const auto& [key, value] : namedEntries(*fields)) metadata.fields.push_back(readField(key, value));
  }
  if (metadata.node && metadata.fields.empty()) {
    cursor.at("node").fail("a metadata \"node\" requires \"fields\"; add them or remove the node.");
  }
  if (const auto controls = cursor.find("controls")) {
    for (const auto& [key, value] : namedEntries(*controls)) {
      metadata.controls.push_back({key, readControlName(value.text(), value)});
    }
  }
  return metadata;
}

ProjectorBinding readProjector(const JsonCursor& cursor) {
  cursor.allowKeys({"on", "off", "modeControl", "patternControl", "currentControl"});
  ProjectorBinding projector;
  if (const auto on = cursor.find("on")) projector.on = readSettings(*on);
  projector.off = readSettings(cursor.at("off"));
  if (projector.off.empty()) cursor.at("off").fail("name the controls that switch the projector off.");
  for (const ControlSetting& setting : projector.on) {
    if (std::ranges::find(projector.off, setting.control, &ControlSetting::control) != projector.off.end()) continue;
    cursor.at("on").at(setting.control).fail("\"off\" must also set this control, to switch the projector off again.");
  }
  projector.modeControl = findControl(cursor, "modeControl");
  projector.patternControl = findControl(cursor, "patternControl");
  projector.currentControl = findControl(cursor, "currentControl");
  return projector;
}

ErrorCounterBinding readErrorCounter(const std::string& name, const JsonCursor& cursor) {
  cursor.allowKeys({"file", "control"});
  ErrorCounterBinding counter;
  counter.name = name;
  counter.control = findControl(cursor, "control");
  if (const auto file = cursor.find("file")) counter.file = readPathText(*file);
  if (counter.file.has_value() == counter.control.has_value()) {
    cursor.fail("give either \"file\" or \"control\" as the source of the count.");
  }
  return counter;
}

std::uint32_t readFormatIndex(const std::string& key, const JsonCursor& cursor) {
  std::uint32_t index = 0;
  const char* const end = key.data() + key.size();
  const auto [parsed, problem] = std::from_chars(key.data(), end, index);
  if (problem == std::errc() && parsed == end && std::to_string(index) == key) return index;
  cursor.fail(inQuotes(key) + " is not a format index; expected a whole number, such as \"16\".");
}

std::vector<FormatBinding> readFormats(const JsonCursor& cursor, const CameraBinding& camera) {
  std::vector<FormatBinding> formats;
  for (const auto& [key, value] : cursor.entries()) {
    value.allowKeys({"format", "size", "interval"});
    FormatBinding format;
    format.index = readFormatIndex(key, value);
    format.fourcc = readFourcc(value.at("format"));
    format.width = camera.width;
    format.height = camera.height;
    if (const auto size = value.find("size")) readSize(*size, &format.width, &format.height);
    if (const auto interval = value.find("interval")) format.interval = readInterval(*interval);
    formats.push_back(std::move(format));
  }
  if (formats.empty()) cursor.fail("map at least one format index, or remove the key.");
  return formats;
}

CameraBinding readCamera(const std::string& port, const JsonCursor& cursor) {
  if (std::ranges::find(kPorts, port) == kPorts.end()) {
    cursor.fail(inQuotes(port) + " is not a port" + suggestion(port, kPorts));
  }
  cursor.allowKeys({"description", "node", "size", "formats", "buffers", "controls", "metadata", "projector",
                    "errorCounters", "media"});
  checkRemark(cursor, "description");
  CameraBinding camera;
  camera.port = port;
  camera.node = readMatch(cursor.at("node"));
  readSize(cursor.at("size"), &camera.width, &camera.height);
  if (const auto formats = cursor.find("formats")) camera.formats = readFormats(*formats, camera);
  if (const auto buffers = cursor.find("buffers")) {
    camera.buffers = static_cast<std::uint32_t>(buffers->integer(kMinBuffers, kMaxBuffers));
  }
  if (const auto controls = cursor.find("controls")) camera.controls = readSettings(*controls);
  if (const auto metadata = cursor.find("metadata")) camera.metadata = readMetadata(*metadata);
  if (const auto projector = cursor.find("projector")) camera.projector = readProjector(*projector);
  if (const auto counters = cursor.find("errorCounters")) {
    for (const auto& [name, value] : namedEntries(*counters)) {
      camera.errorCounters.push_back(readErrorCounter(name, value));
    }
  }
  if (const auto media = cursor.find("media")) camera.media = readMedia(*media);
  return camera;
}

std::vector<CameraBinding> readCameras(const JsonCursor& cursor) {
  std::vector<CameraBinding> cameras;
  for (const auto& [port, value] : cursor.entries()) {
    CameraBinding camera = readCamera(port, value);
    if (camera.media) requireSameLinks(value.at("media"), camera, cameras);
    const auto isSame = [&camera](const CameraBinding& other) { return other.node == camera.node; };
    if (const auto same = std::ranges::find_if(cameras, isSame); same != cameras.end()) {
      value.at("node").fail(
          "this is the node of " + inQuotes(same->port) +
          "; every camera needs its own node. Distinguish them, for example by busInfo or usbInterface.");
    }
    cameras.push_back(std::move(camera));
  }
  return cameras;
}

GroupBinding readGroup(const std::string& name, const JsonCursor& cursor, const std::vector<CameraBinding>& cameras) {
  cursor.allowKeys({"description", "cameras", "master"});
  checkRemark(cursor, "description");
  std::vector<std::string_view> ports;
  ports.reserve(cameras.size());
  for (const CameraBinding& camera : cameras) ports.push_back(camera.port);
  GroupBinding group;
  group.name = name;
  for (const JsonCursor& element : cursor.at("cameras").elements()) {
    const std::string port = element.oneOf(ports, "a camera of this binding");
    if (std::ranges::find(group.ports, port) != group.ports.end())
      element.fail("the camera is listed twice; remove one.");
    group.ports.push_back(port);
  }
  if (group.ports.empty()) cursor.at("cameras").fail("a group needs at least one camera.");
  const std::vector<std::string_view> members(group.ports.begin(), group.ports.end());
  group.master = cursor.at("master").oneOf(members, "a camera of the group");
  return group;
}

// HID devices, their reports and display properties are only known at run time.
FaultTargets targetsOf(const Binding& binding) {
  FaultTargets targets;
  for (const CameraBinding& camera : binding.cameras) targets.streams.push_back(camera.port);
  for (const GroupBinding& group : binding.groups) targets.groups.push_back(group.name);
  return targets;
}

Binding bindingOf(const JsonCursor& document) {
  document.allowKeys({"$schema", "title", "description", "cameras", "groups", "counterFiles", "tracepoints", "display",
                      "faults", "absent", "expect"});
  checkRemark(document, "$schema");
  checkRemark(document, "description");
  Binding binding;
  binding.title = document.at("title").text();
  if (const auto cameras = document.find("cameras")) binding.cameras = readCameras(*cameras);
  if (const auto groups = document.find("groups")) {
    for (const auto& [name, group] : namedEntries(*groups)) {
      binding.groups.push_back(readGroup(name, group, binding.cameras));
    }
  }
  if (const auto files = document.find("counterFiles")) binding.counterFiles = readAllCounterFiles(*files);
  if (const auto tracepoints = document.find("tracepoints")) binding.tracepoints = readAllTracepoints(*tracepoints);
  if (const auto display = document.find("display")) {
    display->allowKeys({"description", "connector"});
    checkRemark(*display, "description");
    const JsonCursor connector = display->at("connector");
    binding.display = DisplayBinding{connector.text()};
    if (binding.display->connector.find('/') != std::string::npos || binding.display->connector.starts_with("card")) {
      connector.fail("must be the name of the connector without its card, such as \"HDMI-A-1\".");
    }
  }
  if (const auto faults = document.find("faults")) binding.faults = readFaults(*faults, targetsOf(binding));
  return binding;
}

}  // namespace

std::string textOf(const PadName& pad) { return pad.entity + ":" + std::to_string(pad.pad); }

Binding readBinding(const std::filesystem::path& file) { return bindingOf(JsonCursor(JsonDocument::read(file))); }

}  // namespace quazor
