// An oracle for runs of the projector fault and the report channel presence experiments: predicts their traces from
// numbers and strings.
//
// It does not use the experiments, the platform or the simulated phone.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace quazor::projector_oracle {

struct PhoneStream {
  std::string id;
  std::string port;
};

struct PhoneChannel {
  std::string group;
  std::string subGroup;
  std::string name;
  std::optional<std::uint64_t> count;      // before a run
  std::uint64_t countedWhenStreaming = 0;  // in the first millisecond of streaming
};

// The defects of a frame. The fields of a dark frame are those of its CSV line after the time.
enum class FrameFault { kDark, kDarkForSafety, kNoMetadata, kNoDictionary, kIncomplete };
struct PhoneFrame {
  FrameFault fault = FrameFault::kDark;
  std::string csvFields;
};

struct Phone {
  std::vector<PhoneStream> streams;
  std::array<int, 6> errorCounters{};  // in the order of the measurements
  std::vector<PhoneChannel> channels;
  std::map<std::uint64_t, PhoneFrame> frames;  // frames that are not lit, by number starting at 1
  bool sendsFrames = true;                     // 30 per second
  std::optional<int> eventAfterTenMilliseconds;
};

// Times are in seconds since the start of the stream, which takes no time. No time may coincide with a frame.
struct Request {
  std::uint64_t frameCount = 3;
  double timeout = 0.21;
  double watched = 0.25;
};

// The failing calls, by their number in the run starting at 1, and the texts of their errors; nothing for a failure
// without an error. The teardown's call counts; the filtering of the channels does not.
using Failures = std::map<std::size_t, std::optional<std::string>>;

struct Prediction {
  // In the format of tests/sweeps/projector_bench.h or, for the presence, of tests/support/run_transcript.h.
  std::string told;
  std::size_t calls = 0;  // the number of calls that can fail
};

Prediction predictFaultRun(const Phone& phone, const Request& request, const Failures& failures, bool hasPlaceForError);
Prediction predictPresenceRun(const std::vector<PhoneChannel>& channels, const Failures& failures,
                              bool hasPlaceForError);

}  // namespace quazor::projector_oracle
