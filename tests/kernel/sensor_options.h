// The options of programs that are display sensors.
#pragma once

#include "tests/kernel/display_sensor.h"

#include <CLI/CLI.hpp>

#include <cstdint>
#include <set>
#include <vector>

namespace quazor {

struct SensorOptions {
  DisplaySensorConfig config;
  std::vector<unsigned> refuses;
  std::vector<unsigned> ignores;

  // The configuration after the command line was read.
  DisplaySensorConfig complete() const {
    DisplaySensorConfig sensor = config;
    for (const unsigned id : refuses) sensor.refuses.insert(static_cast<std::uint8_t>(id));
    for (const unsigned id : ignores) sensor.ignores.insert(static_cast<std::uint8_t>(id));
    return sensor;
  }
};

inline void addSensorOptions(CLI::App& command, SensorOptions& options) {
  DisplaySensorConfig& config = options.config;
  command.add_option("--name", config.name, "What the devices call themselves");
  command.add_option("--rate", config.rate, "Image reports per second")->check(CLI::Range(0.1, 10000.0));
  command.add_option("--length", config.length, "Bytes of each report; an image has 792")->check(CLI::Range(1, 4096));
  command.add_option("--first-frame", config.images.firstFrameID, "Frame ID of the first image; they count up");
  command.add_option("--temperature", config.images.temperature, "Degrees Celsius in every image");
  command.add_option("--refuse", options.refuses, "Feature reports answered with an error, by ID")
      ->check(CLI::Range(1, 255));
  command.add_option("--ignore", options.ignores, "Feature reports never answered, by ID")->check(CLI::Range(1, 255));
  command.add_flag("--always", config.alwaysStreams, "Send reports whenever open, whatever the feature reports say");
  command.add_option("--stop-after", config.stopsAfter, "After this many reports, send no more");
  command.add_option("--remove-after", config.removedAfter, "After this many reports, remove the device");
}

}  // namespace quazor
