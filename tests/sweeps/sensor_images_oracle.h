// Rules for every capture of the display sensor's images, with any failures: the results of earlier calls determine the
// next calls, the end of the run and the reported errors.
//
// It does not use the experiment, the stream, the platform or the simulated phone; it reads the trace of a run.
#pragma once

#include <cstdint>
#include <set>
#include <string>

namespace quazor::sensor_oracle {

// The content of the sensor's images.
inline constexpr double kAmplitude = 1200;
inline constexpr double kOffsetI = 40;
inline constexpr double kOffsetQ = -25;
inline constexpr double kPhaseStep = 7.5;        // degrees
inline constexpr double kPhaseStepPerImage = 3;  // the same
inline constexpr const char* kCelsius = "36.6";

// The receiver of the images of a stream that is opened without an experiment.
enum class Receiver { kExperiment, kNone, kListens, kCloses };

// The facts about a run that are known in advance.
struct Known {
  Receiver receiver = Receiver::kExperiment;
  std::uint64_t images = 2;   // requested
  std::uint64_t timeout = 1;  // seconds
  bool hasPlaceForError = true;
  bool othersUseTheLoop = false;          // another source is added to it, or it is stopped by another user
  std::string displayProblem = {};        // why the display's property prevents a run; empty: it does not
  std::uint32_t firstFrameID = 1;         // of report number 0
  std::set<std::uint64_t> noImages = {};  // the numbers of reports without an image
  std::set<std::string> errors = {};      // all errors that calls and reports can have, as text
  bool mayFailSilently = false;           // a call may fail without an error
  bool startsInTime = true;               // no call is delayed: the first image is that of the first report
};

// The first rule that a run breaks; empty if it breaks none. `told` is in the format of
// tests/sweeps/sensor_images_bench.h.
std::string brokenRule(const Known& known, const std::string& told);

}  // namespace quazor::sensor_oracle
