// Scenario: a whole simulated phone, as data. data/scenarios/scenario.schema.json describes the files.
#pragma once

#include "backends/faults/fault.h"
#include "backends/simulated/scenario/display_config.h"
#include "backends/simulated/scenario/frame_config.h"
#include "backends/simulated/scenario/hid_config.h"
#include "backends/simulated/scenario/report_config.h"
#include "contract/value.h"

#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

namespace quazor {

class JsonDocument;

// Frame rates, in frames per second, are kept to a millionth and are at most this.
inline constexpr double kMaxFrameRate = 1000;

struct CameraFormat {
  double maximumFrameRate = 30;
};

struct Camera {
  std::string id;    // names the camera in the scenario and in faults
  std::string port;  // its port type (platform/capture_keys.h)
  std::vector<CameraFormat> formats;
  bool multipleOutputs = true;  // takes MultipleOutputSupportEnabled

  // Streaming. Frame numbers count from 0, the first that the camera could deliver.
  std::uint64_t firstFrameOffset = 0;     // frames of the master before the camera's first, when all start as one
  std::optional<double> actualFrameRate;  // instead of the one that was set
  bool deliversFrames = true;             // false: runs, and no frame comes
  std::set<std::uint64_t> droppedFrames;  // the numbers of frames that are lost
  std::uint64_t dropEvery = 0;            // every nth frame is lost; 0: none
  bool inSessionStatus = true;            // false: the session's status leaves the camera out
  std::optional<Dictionary> errorCounters = defaultErrorCounters();  // nothing: cannot be read
  Dictionary errorCounterGrowth;       // errors per second of the stream's present or last stretch, by counter
  std::optional<Projector> projector;  // nothing: the camera has none
  DeliveryConfig delivery;

  // All of the counters that the hardware has, at 0.
  static Dictionary defaultErrorCounters();
};

// Cameras that can run as one synchronised session.
struct CameraGroup {
  std::string id;
  std::vector<std::string> cameras;  // ids, in the group's order
  std::string master;                // the id of one of them
  bool masterConfiguration = true;   // supports SlaveConfigurationByPortType in MasterConfiguration
};

struct CaptureDeviceConfig {
  bool plugInLoads = true;  // false: no capture plug-in can be made
  bool present = true;      // false: the plug-in finds no device
};

struct Scenario {
  std::string title;
  CaptureDeviceConfig device;
  std::vector<Camera> cameras;
  std::vector<CameraGroup> groups;
  std::vector<ReportChannelConfig> reports;
  std::vector<HidDeviceConfig> hidDevices;
  DisplayConfig display;
  std::vector<Fault> faults;
  // The file's document, with its base merged in, for the key that no phone reads: `expect`, what runs should end in.
  // Null for a scenario that is in no file.
  std::shared_ptr<const JsonDocument> document;
};

// Reads a scenario file and the files it is based on. Throws InputError, one sentence without a line end: the
// file, the line where it is the file's own, the JSON path of a wrong value, what is wrong and what would be right. Any
// thread.
Scenario readScenario(const std::filesystem::path& file);

}  // namespace quazor
