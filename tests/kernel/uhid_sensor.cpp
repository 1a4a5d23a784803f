// Creates display sensors with /dev/uhid and reports their activity.
//
// Prints "started NUMBER" for each device when the kernel has created it, and at the end one line of JSON:
//   {"devices": [{"sent": 181, "features": [{"id": 171, "data": "ab01"}, ...], "removed": false}, ...]}
// Ends after --seconds, when all devices are removed, or on SIGTERM or SIGINT. The exit code is 0, or 1 after a message
// on standard error.
#include "tests/kernel/ending_signals.h"
#include "tests/kernel/sensor_options.h"
#include "tests/kernel/uhid_device.h"

#include <CLI/CLI.hpp>

#include <fcntl.h>
#include <poll.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <iostream>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using Time = UhidSensor::Time;
using Sensors = std::vector<std::unique_ptr<UhidSensor>>;

struct Options {
  std::size_t devices = 1;
  std::string uhid = "/dev/uhid";
  double seconds = 0;
  SensorOptions sensor;
};

int failed(const std::string& what) {
  std::cerr << "uhid_sensor: " << what << ": " << std::strerror(errno) << '\n';
  return 1;
}

void tell(const Sensors& sensors) {
  std::cout << "{\"devices\": [";
  for (const auto& one : sensors) std::cout << (one == sensors.front() ? "" : ", ") << one->sensor().activity();
  std::cout << "]}" << std::endl;
}

// The time until the next due action or the end.
timespec timeLeft(const Sensors& sensors, Time end) {
  Time nearest = end;
  for (const auto& sensor : sensors) nearest = std::min(nearest, sensor->due().value_or(end));
  return timeUntil(nearest);
}

bool allAreGone(const Sensors& sensors) {
  return std::ranges::all_of(sensors, [](const auto& one) { return one->sensor().isGone(); });
}

int serve(const Sensors& sensors, const FileDescriptor& signals, Time end) {
  while (monotonicNow() < end && !allAreGone(sensors)) {
    std::vector<pollfd> asked{{signals.get(), POLLIN, 0}};
    for (const auto& sensor : sensors) asked.push_back({sensor->descriptor(), POLLIN, 0});
    const timespec left = timeLeft(sensors, end);
    if (::ppoll(asked.data(), asked.size(), &left, nullptr) < 0) return failed("ppoll");
    if (asked.front().revents != 0) break;
    for (std::size_t i = 0; i < sensors.size(); ++i) {
      UhidSensor& sensor = *sensors[i];
      const bool hadStarted = sensor.isStarted();
      if (asked[i + 1].revents != 0 && !sensor.handleEvent(monotonicNow())) return failed("an event");
      if (sensor.isStarted() && !hadStarted) std::cout << "started " << i << std::endl;
      if (!sensor.act(monotonicNow())) return failed("a report");
    }
  }
  return 0;
}

int run(const Options& options) {
  const FileDescriptor signals = endingSignals();
  Sensors sensors;
  for (std::size_t i = 0; i < options.devices; ++i) {
    FileDescriptor uhid(::open(options.uhid.c_str(), O_RDWR | O_CLOEXEC));
    if (!uhid) return failed(options.uhid);
    sensors.push_back(std::make_unique<UhidSensor>(std::move(uhid), options.sensor.complete()));
    if (!sensors.back()->create()) return failed("creating a device");
  }
  const Time end =
      options.seconds > 0
          ? monotonicNow() + std::chrono::duration_cast<Time>(std::chrono::duration<double>(options.seconds))
          : Time::max();
  const int code = serve(sensors, signals, end);
  tell(sensors);
  return code;
}

}  // namespace
}  // namespace quazor

int main(int argc, char** argv) {
  quazor::Options options;
  CLI::App command("Makes display sensors out of /dev/uhid, and tells what they did.");
  command.add_option("--devices", options.devices, "How many, all alike")->check(CLI::Range(1, 16));
  command.add_option("--uhid", options.uhid, "The kernel's file for devices of programs");
  command.add_option("--seconds", options.seconds, "How long; 0: until a signal")->check(CLI::NonNegativeNumber);
  quazor::addSensorOptions(command, options.sensor);
  CLI11_PARSE(command, argc, argv);
  return quazor::run(options);
}
