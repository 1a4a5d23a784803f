// A second opinion on runs of the projector fault and the report channel presence experiments: what they must do and
// say, worked out from numbers and strings alone.
//
// Nothing here knows the experiments, the platform or the simulated phone.
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
  std::uint64_t countedWhenStreaming = 0;  // in the first millisecond of a stream
};

// What is wrong with a frame. The fields of a dark one are those of its CSV line behind the time.
enum class FrameFault { kDark, kDarkForSafety, kNoMetadata, kNoDictionary, kIncomplete };
struct PhoneFrame {
  FrameFault fault = FrameFault::kDark;
  std::string csvFields;
};

struct Phone {
  std::vector<PhoneStream> streams;
  std::array<int, 6> errorCounters{};  // in the order of a result
  std::vector<PhoneChannel> channels;
  std::map<std::uint64_t, PhoneFrame> frames;  // the frames that are not lit, by number from 1
  bool sendsFrames = true;                     // 30 a second
  std::optional<int> eventAfterTenMilliseconds;
};

// Times are in seconds from the start of the stream, which takes none. Neither time may be that of a frame.
struct Request {
  std::uint64_t frameCount = 3;
  double timeout = 0.21;
  double watched = 0.25;
};

// Which calls fail, by their number in the run, from 1, and with what error's text; nothing for none of its own. The
// teardown's call counts; the narrowing of the channels does not.
using Failures = std::map<std::size_t, std::optional<std::string>>;

struct Prediction {
  std::string
      told;  // as tests/sweeps/projector_bench.h tells a run, or tests/support/run_transcript.h one of the presence
  std::size_t calls = 0;  // how many calls that can fail are made
};

Prediction predictFaultRun(const Phone& phone, const Request& request, const Failures& failures, bool hasPlaceForError);
Prediction predictPresenceRun(const std::vector<PhoneChannel>& channels, const Failures& failures,
                              bool hasPlaceForError);

}  // namespace quazor::projector_oracle
