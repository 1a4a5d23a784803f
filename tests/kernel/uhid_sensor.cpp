// Creates display sensors with /dev/uhid and reports their activity.
//
// Prints "started NUMBER" for each device when the kernel has created it, and at the end one line of JSON:
//   {"devices": [{"sent": 181, "features": [{"id": 171, "data": "ab01"}, ...], "removed": false}, ...]}
// Ends after --seconds, when all devices are removed, or on SIGTERM or SIGINT. The exit code is 0, or 1 after a message
// on standard error.
#include "tests/kernel/uhid_device.h"

#include "contract/message_format.h"

#include <CLI/CLI.hpp>

#include <fcntl.h>
#include <poll.h>
#include <sys/signalfd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstring>
#include <iostream>
#include <memory>
#include <optional>
#include <set>
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
  UhidSensorConfig traits;
  std::vector<unsigned> refuses;
  std::vector<unsigned> ignores;
};

Time now() { return std::chrono::steady_clock::now().time_since_epoch(); }

int failed(const std::string& what) {
  std::cerr << "uhid_sensor: " << what << ": " << std::strerror(errno) << '\n';
  return 1;
}

std::string toldOf(const UhidSensor& sensor) {
  std::string text = "{\"sent\": " + std::to_string(sensor.sent()) + ", \"features\": [";
  for (const UhidFeatureReport& feature : sensor.features()) {
    if (&feature != &sensor.features().front()) text += ", ";
    text += "{\"id\": " + std::to_string(feature.id) + ", \"data\": \"" + defaultText(Value(feature.data)) + "\"}";
  }
  return text + "], \"removed\": " + (sensor.isGone() ? "true" : "false") + "}";
}

void tell(const Sensors& sensors) {
  std::cout << "{\"devices\": [";
  for (const auto& sensor : sensors) std::cout << (sensor == sensors.front() ? "" : ", ") << toldOf(*sensor);
  std::cout << "]}" << std::endl;
}

// A descriptor for the signals that end this program.
FileDescriptor endingSignals() {
  sigset_t signals;
  sigemptyset(&signals);
  sigaddset(&signals, SIGTERM);
  sigaddset(&signals, SIGINT);
  sigprocmask(SIG_BLOCK, &signals, nullptr);
  return FileDescriptor(::signalfd(-1, &signals, SFD_CLOEXEC));
}

// The time until the next due action or the end.
timespec timeLeft(const Sensors& sensors, Time end) {
  Time nearest = end;
  for (const auto& sensor : sensors) nearest = std::min(nearest, sensor->due().value_or(end));
  const Time left = std::max(nearest - now(), Time::zero());
  return {static_cast<std::time_t>(left / std::chrono::seconds(1)),
          static_cast<long>((left % std::chrono::seconds(1)).count())};
}

bool allAreGone(const Sensors& sensors) {
  return std::ranges::all_of(sensors, [](const auto& sensor) { return sensor->isGone(); });
}

int serve(const Sensors& sensors, const FileDescriptor& signals, Time end) {
  while (now() < end && !allAreGone(sensors)) {
    std::vector<pollfd> asked{{signals.get(), POLLIN, 0}};
    for (const auto& sensor : sensors) asked.push_back({sensor->descriptor(), POLLIN, 0});
    const timespec left = timeLeft(sensors, end);
    if (::ppoll(asked.data(), asked.size(), &left, nullptr) < 0) return failed("ppoll");
    if (asked.front().revents != 0) break;
    for (std::size_t i = 0; i < sensors.size(); ++i) {
      UhidSensor& sensor = *sensors[i];
      const bool hadStarted = sensor.isStarted();
      if (asked[i + 1].revents != 0 && !sensor.handleEvent(now())) return failed("an event");
      if (sensor.isStarted() && !hadStarted) std::cout << "started " << i << std::endl;
      if (!sensor.act(now())) return failed("a report");
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
    sensors.push_back(std::make_unique<UhidSensor>(std::move(uhid), options.traits));
    if (!sensors.back()->create()) return failed("creating a device");
  }
  const Time end = options.seconds > 0
                       ? now() + std::chrono::duration_cast<Time>(std::chrono::duration<double>(options.seconds))
                       : Time::max();
  const int code = serve(sensors, signals, end);
  tell(sensors);
  return code;
}

std::set<std::uint8_t> idsOf(const std::vector<unsigned>& numbers) {
  std::set<std::uint8_t> ids;
  for (const unsigned number : numbers) ids.insert(static_cast<std::uint8_t>(number));
  return ids;
}

}  // namespace
}  // namespace quazor

int main(int argc, char** argv) {
  quazor::Options options;
  quazor::UhidSensorConfig& traits = options.traits;
  CLI::App command("Makes display sensors out of /dev/uhid, and tells what they did.");
  command.add_option("--devices", options.devices, "How many, all alike")->check(CLI::Range(1, 16));
  command.add_option("--uhid", options.uhid, "The kernel's file for devices of programs");
  command.add_option("--seconds", options.seconds, "How long; 0: until a signal")->check(CLI::NonNegativeNumber);
  command.add_option("--name", traits.name, "What the devices call themselves");
  command.add_option("--rate", traits.rate, "Image reports per second")->check(CLI::Range(0.1, 10000.0));
  command.add_option("--length", traits.length, "Bytes of each report; an image has 792")->check(CLI::Range(1, 4096));
  command.add_option("--first-frame", traits.images.firstFrameID, "Frame ID of the first image; they count up");
  command.add_option("--temperature", traits.images.temperature, "Degrees Celsius in every image");
  command.add_option("--refuse", options.refuses, "Feature reports answered with an error, by ID")
      ->check(CLI::Range(1, 255));
  command.add_option("--ignore", options.ignores, "Feature reports never answered, by ID")->check(CLI::Range(1, 255));
  command.add_flag("--always", traits.alwaysStreams, "Send reports whenever open, whatever the feature reports say");
  command.add_option("--stop-after", traits.stopsAfter, "After this many reports, send no more");
  command.add_option("--remove-after", traits.removedAfter, "After this many reports, remove the device");
  CLI11_PARSE(command, argc, argv);
  traits.refuses = quazor::idsOf(options.refuses);
  traits.ignores = quazor::idsOf(options.ignores);
  return quazor::run(options);
}
