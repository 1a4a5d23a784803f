// An oracle for camera synchronisation: predicts the trace of a run from numbers and strings.
//
// It does not use the experiment, the platform or the simulated phone.
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
  std::string errorCounters;  // as text
};

struct PhoneGroup {
  std::string id;
  std::vector<std::size_t> cameras;  // indexes of Phone::cameras
  std::size_t master = 0;            // the same
  bool masterConfiguration = true;
};

struct Phone {
  std::vector<PhoneCamera> cameras;
  std::vector<PhoneGroup> groups;
};

// The parameters of a run, in whole frames and seconds.
struct Request {
  std::vector<std::string> ports;
  std::vector<int> formatIndexes;
  int frameRate = 30;
  int seconds = 2;
};

// The failing calls, by their number in the run starting at 1, and the texts of their errors; nothing for a failure
// without an error. All calls count except the sleep.
using Failures = std::map<std::size_t, std::optional<std::string>>;

struct Prediction {
  std::string told;       // in the format of tests/support/run_transcript.h
  std::size_t calls = 0;  // the number of calls that can fail
};

Prediction predictRun(const Phone& phone, const Request& request, const Failures& failures, bool hasPlaceForError);

}  // namespace quazor::oracle
