// Watching over a child process: what it says, how long it takes, how it ends.
#pragma once

#include "host/system/child_process.h"

#include <chrono>
#include <cstddef>
#include <functional>
#include <optional>
#include <string>
#include <string_view>

namespace quazor {

// The longest line of the connection, in octets; a few more may come.
inline constexpr std::size_t kMaxEvent = std::size_t{64} << 20U;

// What is to be done with what a child says. All are called on the watching thread.
struct Supervision {
  using Moment = std::chrono::steady_clock::time_point;

  // Takes a line of the connection, without its end; false when it is none that the child should write.
  std::function<bool(std::string_view line)> takeLine;
  // Takes a line of the child's standard output or error stream.
  std::function<void(std::string_view line)> takeOutput;
  // When the child is to be ended, unless it says something before; asked again after whatever it says.
  std::function<Moment()> deadline;
  // True when the child has said all it has to say: it is only waited for.
  std::function<bool()> isDone;
  // Called about ten times a second; may be empty.
  std::function<void()> tick;
};

enum class SupervisionEnd {
  kEnded,           // the child ended by itself
  kDeadline,        // it was ended at the deadline
  kInterrupted,     // it was ended because this process was asked to end
  kConnectionLost,  // it was ended because it had closed the connection, or had written what is no line of it
  kLineTooLong,     // it was ended because it had written a line of more than kMaxEvent octets to it
};

struct Supervised {
  SupervisionEnd how = SupervisionEnd::kEnded;
  std::optional<ProcessEnd> end;  // nothing when it did not end in spite of everything
};

// Watches over the child until it has ended. A child that is to be ended gets SIGTERM and, half a second later,
// SIGKILL, with its whole process group; a second request to end leaves the half second out.
Supervised supervise(ChildProcess& child, WatchedSignals& signals, const Supervision& supervision);

}  // namespace quazor
