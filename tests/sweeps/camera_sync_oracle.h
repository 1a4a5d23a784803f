// A second opinion on camera synchronisation: what a run must do and say, worked out from numbers and strings alone.
//
// Nothing here knows the experiment, the platform or the simulated phone.
#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace quazor::oracle {

struct PhoneCamera {
  std::string id;
  std::string port;
  std::uint64_t firstFrameOffset = 0;
  std::string errorCounters;  // their text
};

struct PhoneGroup {
  std::string id;
  std::vector<std::size_t> cameras;  // positions in Phone::cameras
  std::size_t master = 0;            // likewise
  bool masterConfiguration = true;
};

struct Phone {
  std::vector<PhoneCamera> cameras;
  std::vector<PhoneGroup> groups;
};

// What a run is asked for; whole frames and seconds.
struct Request {
  std::vector<std::string> ports;
  std::vector<int> formatIndexes;
  int frameRate = 30;
  int seconds = 2;
};

// Which calls fail, by their number in the run, from 1, and with what error's text; nothing for none of its own. Every
// call counts but the sleep.
using Failures = std::map<std::size_t, std::optional<std::string>>;

struct Prediction {
  std::string told;       // as tests/support/run_transcript.h tells a run
  std::size_t calls = 0;  // how many calls that can fail the run makes
};

Prediction predictRun(const Phone& phone, const Request& request, const Failures& failures, bool hasPlaceForError);

}  // namespace quazor::oracle
