#include "backends/simulated/scenario/scenario_content.h"

#include "backends/capture/property_table.h"
#include "backends/faults/fault_reader.h"
#include "backends/faults/hid_report_name.h"
#include "backends/simulated/scenario/scenario_frames.h"
#include "backends/simulated/scenario/scenario_parts.h"
#include "backends/simulated/scenario/scenario_sensors.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <limits>
#include <string_view>
#include <vector>

namespace quazor {
namespace {

using Names = std::vector<std::string_view>;

constexpr std::uint64_t kMaxFrames = 1'000'000'000;

bool booleanOr(const JsonCursor& object, std::string_view key, bool otherwise) {
  const std::optional<JsonCursor> entry = object.find(key);
  return entry ? entry->boolean() : otherwise;
}

// Ids are used in paths, lists and command lines.
void checkId(const std::string& id, const JsonCursor& cursor) {
  const auto fits = [](char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '-' || c == '_';
  };
  if (id.empty() || !std::ranges::all_of(id, fits)) {
    cursor.fail("an id may only contain letters, digits, \"-\" and \"_\".");
  }
}

Names idsOf(const std::vector<Camera>& cameras) {
  Names ids;
  for (const Camera& camera : cameras) ids.push_back(camera.id);
  return ids;
}

CaptureDeviceConfig readDevice(const JsonCursor& cursor) {
  cursor.allowKeys({"plugInLoads", "present"});
  CaptureDeviceConfig device;
  device.plugInLoads = booleanOr(cursor, "plugInLoads", device.plugInLoads);
  device.present = booleanOr(cursor, "present", device.present);
  return device;
}

std::vector<CameraFormat> readFormats(const JsonCursor& cursor) {
  std::vector<CameraFormat> formats;
  for (const JsonCursor& element : cursor.elements()) {
    element.allowKeys({"maximumFrameRate"});
    formats.push_back({element.at("maximumFrameRate").positiveNumber(kMaxFrameRate)});
  }
  if (formats.empty()) cursor.fail("a camera must have at least one format.");
  return formats;
}

std::set<std::uint64_t> readDroppedFrames(const JsonCursor& cursor) {
  std::set<std::uint64_t> frames;
  for (const JsonCursor& element : cursor.elements()) {
    if (!frames.insert(element.integer(0, kMaxFrames)).second) element.fail("the frame is listed twice; remove one.");
  }
  return frames;
}

std::optional<Dictionary> readErrorCounters(const JsonCursor& cursor) {
  if (cursor.isString()) {
    constexpr std::array<std::string_view, 1> kWords{"unreadable"};
    cursor.oneOf(kWords, "a state of the counters");
    return std::nullopt;
  }
  Dictionary counters = Camera::defaultErrorCounters();
  for (const auto& [name, count] : cursor.entries()) {
    counters.set(name, count.integer(0, std::numeric_limits<std::uint64_t>::max()));
  }
  return counters;
}

Camera readCamera(const std::string& id, const JsonCursor& cursor) {
  checkId(id, cursor);
  cursor.allowKeys({"port", "formats", "multipleOutputs", "firstFrameOffset", "actualFrameRate", "deliversFrames",
                    "droppedFrames", "dropEvery", "inSessionStatus", "errorCounters", "errorCounterGrowth", "projector",
                    "delivery"});
  Camera camera;
  camera.id = id;
  camera.port = cursor.at("port").oneOf(kPortTypes, "a port type");
  camera.formats = readFormats(cursor.at("formats"));
  camera.multipleOutputs = booleanOr(cursor, "multipleOutputs", camera.multipleOutputs);
  camera.deliversFrames = booleanOr(cursor, "deliversFrames", camera.deliversFrames);
  camera.inSessionStatus = booleanOr(cursor, "inSessionStatus", camera.inSessionStatus);
  if (const auto offset = cursor.find("firstFrameOffset")) camera.firstFrameOffset = offset->integer(0, kMaxFrames);
  if (const auto rate = cursor.find("actualFrameRate")) camera.actualFrameRate = rate->positiveNumber(kMaxFrameRate);
  if (const auto frames = cursor.find("droppedFrames")) camera.droppedFrames = readDroppedFrames(*frames);
  if (const auto every = cursor.find("dropEvery")) camera.dropEvery = every->integer(1, kMaxFrames);
  if (const auto counters = cursor.find("errorCounters")) camera.errorCounters = readErrorCounters(*counters);
  if (const auto growth = cursor.find("errorCounterGrowth"))
    camera.errorCounterGrowth = readErrorCounterGrowth(*growth);
  if (const auto projector = cursor.find("projector")) camera.projector = readProjector(*projector);
  if (const auto delivery = cursor.find("delivery")) camera.delivery = readDelivery(*delivery);
  return camera;
}

CameraGroup readGroup(const std::string& id, const JsonCursor& cursor, const Scenario& scenario) {
  checkId(id, cursor);
  const Names cameras = idsOf(scenario.cameras);
  cursor.allowKeys({"cameras", "master", "masterConfiguration"});
  CameraGroup group;
  group.id = id;
  for (const JsonCursor& element : cursor.at("cameras").elements()) {
    std::string camera = element.oneOf(cameras, "a camera of this scenario");
    if (std::ranges::find(group.cameras, camera) != group.cameras.end()) {
      element.fail("the camera is listed twice; remove one.");
    }
    group.cameras.push_back(std::move(camera));
  }
  group.master = cursor.at("master").oneOf(Names(group.cameras.begin(), group.cameras.end()), "a camera of the group");
  group.masterConfiguration = booleanOr(cursor, "masterConfiguration", group.masterConfiguration);
  return group;
}

FaultTargets targetsOf(const Scenario& scenario) {
  FaultTargets targets;
  for (const Camera& camera : scenario.cameras) targets.streams.push_back(camera.id);
  for (const CameraGroup& group : scenario.groups) targets.groups.push_back(group.id);
  targets.hidDevices.emplace();
  targets.featureReports.emplace();
  targets.registryProperties.emplace();
  for (const HidDeviceConfig& device : scenario.hidDevices) {
    targets.hidDevices->push_back(device.name);
    for (const HidFeatureReport& report : device.featureReports) {
      targets.featureReports->emplace_back(hidReportName(report.id));
    }
  }
  for (const auto& [name, value] : scenario.display.properties) targets.registryProperties->push_back(name);
  return targets;
}

}  // namespace

Scenario scenarioOf(const JsonCursor& document) {
  document.allowKeys({"$schema", "title", "base", "device", "cameras", "groups", "reports", "hidDevices", "display",
                      "faults", "expect", "absent"});
  Scenario scenario;
  scenario.title = document.at("title").text();
  if (const auto schema = document.find("$schema")) schema->text();
  if (const auto device = document.find("device")) scenario.device = readDevice(*device);
  for (const auto& [id, camera] : document.at("cameras").entries()) {
    scenario.cameras.push_back(readCamera(id, camera));
  }
  for (const auto& [id, group] : document.at("groups").entries()) {
    scenario.groups.push_back(readGroup(id, group, scenario));
  }
  if (const auto reports = document.find("reports")) scenario.reports = readReports(*reports);
  if (const auto devices = document.find("hidDevices")) {
    for (const auto& [name, device] : devices->entries()) {
      checkId(name, device);
      scenario.hidDevices.push_back(readHidDevice(name, device));
    }
  }
  if (const auto display = document.find("display")) scenario.display = readDisplay(*display);
  if (const auto faults = document.find("faults")) scenario.faults = readFaults(*faults, targetsOf(scenario));
  return scenario;
}

}  // namespace quazor
