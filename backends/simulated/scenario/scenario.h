// Scenario: a complete simulated phone as data. data/scenarios/scenario.schema.json describes the files.
#pragma once

#include "backends/faults/fault.h"
#include "backends/simulated/scenario/display_config.h"
#include "backends/simulated/scenario/frame_config.h"
#include "backends/simulated/scenario/hid_config.h"
#include "backends/simulated/scenario/report_config.h"
#include "contract/value.h"

#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

namespace quazor {

class JsonDocument;

// The maximum frame rate, in frames per second. Rates have a resolution of a millionth.
inline constexpr double kMaxFrameRate = 1000;

struct CameraFormat {
  double maximumFrameRate = 30;
};

struct Camera {
  std::string id;    // the name of the camera in the scenario and in faults
  std::string port;  // its port type (platform/capture_keys.h)
  std::vector<CameraFormat> formats;
  bool multipleOutputs = true;  // supports MultipleOutputSupportEnabled

  // Streaming. Frames are numbered from 0, the first one that the camera could deliver.
  std::uint64_t firstFrameOffset = 0;     // frames of the master before the camera's first, in a synchronised start
  std::optional<double> actualFrameRate;  // overrides the rate that was set
  bool deliversFrames = true;             // false: the stream runs without frames
  std::set<std::uint64_t> droppedFrames;  // the numbers of lost frames
  std::uint64_t dropEvery = 0;            // every nth frame is lost; 0: none
  bool inSessionStatus = true;            // false: the session's status omits the camera
  std::optional<Dictionary> errorCounters = defaultErrorCounters();  // nothing: cannot be read
  Dictionary errorCounterGrowth;       // errors per second in the latest run of the stream, by counter
  std::optional<Projector> projector;  // nothing: the camera has none
  DeliveryConfig delivery;

  // All counters of the hardware, at 0.
  static Dictionary defaultErrorCounters();
};

// Cameras that can run in one synchronised session.
struct CameraGroup {
  std::string id;
  std::vector<std::string> cameras;  // ids, in order
  std::string master;                // the id of one of the cameras
  bool masterConfiguration = true;   // supports SlaveConfigurationByPortType in MasterConfiguration
};

struct CaptureDeviceConfig {
  bool plugInLoads = true;  // false: creating a capture plug-in fails
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
  // The document of the file after its base was merged in. The host reads the key `expect` from it, the expected
  // outcome of runs, which the phone ignores. Null if the scenario is not from a file.
  std::shared_ptr<const JsonDocument> document;
  std::vector<std::filesystem::path> bases{};  // the files that the scenario is based on, the nearest first
};

// Finds the scenario of a name, which is not a file's; empty if there is none.
using ScenarioFinder = std::function<std::filesystem::path(const std::filesystem::path& name)>;

// Reads a scenario file and the scenarios that it is based on: files relative to the one that names them, or else those
// that `find` knows by this name. Throws InputError: one sentence without a line end that
// contains the file, the line if it is in this file, the JSON path of the invalid value, the problem and the
// expectation. Thread: any.
Scenario readScenario(const std::filesystem::path& file, const ScenarioFinder& find = nullptr);

}  // namespace quazor
