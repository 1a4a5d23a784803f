// A second opinion on captures of the display sensor's images: what a run must do and say, worked out from numbers and
// strings alone.
//
// Nothing here knows the experiment, the stream, the platform or the simulated phone.
#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace quazor::sensor_oracle {

// Nanoseconds of the phone's clock, which is at 0 when a run begins.
using Time = std::int64_t;

enum class Power { kOn, kOff, kUnknown };

struct Display {
  bool present = true;
  bool hasRegistryEntry = true;
  Power power = Power::kOn;
  bool hasProperty = true;  // false: the power is unknown because nothing is published at all
};

// An input report; one that is not empty in `error` is that error and no report.
struct Report {
  int id = 0x76;
  std::size_t length = 792;
  std::string error = {};
};

// What all sensors put into their images.
inline constexpr double kAmplitude = 1200;
inline constexpr double kOffsetI = 40;
inline constexpr double kOffsetQ = -25;
inline constexpr double kPhaseStep = 7.5;        // degrees
inline constexpr double kPhaseStepPerImage = 3;  // likewise
inline constexpr const char* kCelsius = "36.6";

struct Sensor {
  int usagePage = 0xFF00;
  int usage = 0x24;
  std::string powerRefusal = {};      // the error that it refuses the power mode with; empty when it takes it
  std::string streamingRefusal = {};  // likewise for the streaming mode
  std::int64_t rate = 20;             // reports per second
  std::optional<std::uint64_t> count = {};
  std::optional<std::uint64_t> removedAfter = {};  // the number, from 0, of the report in whose place it is removed
  Report every = {};
  std::map<std::uint64_t, Report> single = {};
  std::uint32_t firstFrameID = 1;
};

struct Phone {
  Display display = {};
  std::vector<Sensor> sensors = {Sensor{}};  // the first is the one that a run opens, "display-sensor"
};

// What others do with the loop of the run.
struct Others {
  std::optional<Time> source = {};  // there is another source, signalled before the run, that takes so long to handle
  std::optional<Time> stop = {};    // when the loop is stopped
};

// Who receives the images of a stream that is opened without an experiment.
enum class Receiver { kNone, kListens, kCloses };

struct Request {
  std::uint64_t images = 2;
  std::uint64_t timeout = 1;              // seconds
  std::optional<Receiver> receiver = {};  // nothing: the experiment; else a stream alone, watched for the timeout
  Others others = {};
};

enum class Action { kFail, kHang, kDelay };

// A call that goes wrong: the nth of the operation, from 1, or all of them.
struct Failure {
  std::string operation = "*";
  std::optional<std::uint64_t> occurrence = {};
  Action action = Action::kFail;
  std::string error = {};  // the text of the error that the call gives; empty for none
  Time delay = 0;
};

struct Prediction {
  std::string told;                  // as tests/sweeps/sensor_images_bench.h tells a run
  std::size_t calls = 0;             // how many calls return
  std::vector<std::uint64_t> fired;  // how often each failure happens

  friend bool operator==(const Prediction&, const Prediction&) = default;
};

// All that may come of a run: two predictions when it matters whether a report that is due at the end of a wait is in
// time, else one. The first one has the report in time.
std::vector<Prediction> predict(const Phone& phone, const Request& request, const std::vector<Failure>& failures,
                                bool hasPlaceForError);

}  // namespace quazor::sensor_oracle
