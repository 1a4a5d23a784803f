// Supervises a child process: its output, its deadline and its end.
#pragma once

#include "base/json/json_limits.h"
#include "host/system/child_process.h"

#include <chrono>
#include <cstddef>
#include <functional>
#include <optional>
#include <string>
#include <string_view>

namespace quazor {

// The callbacks for a child's output. All are called on the supervising thread.
struct Supervision {
  using Moment = std::chrono::steady_clock::time_point;

  // Handles a line of the connection, without its line end. Returns false if the line is not valid.
  std::function<bool(std::string_view line)> takeLine;
  // Handles a line of the child's standard output or standard error.
  std::function<void(std::string_view line)> takeOutput;
  // The time at which to end the child. Called again after each line from the child.
  std::function<Moment()> deadline;
  // True if no more output is expected and only the end of the child is awaited.
  std::function<bool()> isDone;
  // Called once, at the first request to end. True if the child may go on until the deadline, which may be another one
  // then; otherwise, and without this function, it is ended at once.
  std::function<bool()> mayFinish;
  // Called about ten times a second; may be empty.
  std::function<void()> tick;
  // True if the next tick should come as soon as possible; may be empty.
  std::function<bool()> isUrgent;
};

enum class SupervisionEnd {
  kEnded,           // the child ended by itself
  kDeadline,        // it was ended at the deadline
  kInterrupted,     // this process was asked to end, whether the child was ended or finished by itself
  kConnectionLost,  // it was ended because it closed the connection or wrote an invalid line to it
  kGuardLost,       // it was ended because its guard had ended
  kLineTooLong,     // it was ended because it wrote a line of more than kMaxLine bytes
};

struct Supervised {
  SupervisionEnd how = SupervisionEnd::kEnded;
  std::optional<ProcessEnd> end;  // nothing if the child could not be killed
  bool lostConnection = false;    // the child ended itself because its connection was gone
};

// Supervises the child until it has ended. To end it, sends SIGTERM to its process group and, half a second later,
// SIGKILL. At a second request to end, sends SIGKILL at once.
Supervised supervise(ChildProcess& child, WatchedSignals& signals, const Supervision& supervision);

}  // namespace quazor
