// What must hold of any capture of the display sensor's images, whatever goes wrong on the way: a run makes the calls,
// ends and reports errors as the answers that it got demand.
//
// Nothing here knows the experiment, the stream, the platform or the simulated phone: it reads the text of a run.
#pragma once

#include <cstdint>
#include <set>
#include <string>

namespace quazor::sensor_oracle {

// What the sensor puts into its images.
inline constexpr double kAmplitude = 1200;
inline constexpr double kOffsetI = 40;
inline constexpr double kOffsetQ = -25;
inline constexpr double kPhaseStep = 7.5;        // degrees
inline constexpr double kPhaseStepPerImage = 3;  // likewise
inline constexpr const char* kCelsius = "36.6";

// Who receives the images of a stream that is opened without an experiment.
enum class Receiver { kExperiment, kNone, kListens, kCloses };

// What is known of a run beforehand.
struct Known {
  Receiver receiver = Receiver::kExperiment;
  std::uint64_t images = 2;   // that are wanted
  std::uint64_t timeout = 1;  // seconds
  bool hasPlaceForError = true;
  bool othersUseTheLoop = false;          // there is another source on it, or it is stopped by somebody else
  std::string displayProblem = {};        // what the display's property says against a run; empty: nothing
  std::uint32_t firstFrameID = 1;         // of the report number 0
  std::set<std::uint64_t> noImages = {};  // the numbers of reports that hold no image
  std::set<std::string> errors = {};      // all that calls and reports can give, as text
  bool mayFailSilently = false;           // a call may fail without an error
  bool startsInTime = true;               // nothing delays the calls: the first image is that of the first report
};

// The first rule that a run breaks, `told` as tests/sweeps/sensor_images_bench.h tells it; the empty text when it
// breaks none.
std::string brokenRule(const Known& known, const std::string& told);

}  // namespace quazor::sensor_oracle
