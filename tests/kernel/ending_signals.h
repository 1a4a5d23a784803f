// How the rig's programs wait and end.
#pragma once

#include "backends/linux/system/file_descriptor.h"

#include <sys/signalfd.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <ctime>

namespace quazor {

inline std::chrono::nanoseconds monotonicNow() { return std::chrono::steady_clock::now().time_since_epoch(); }

// A descriptor for the signals that end a program: SIGTERM and SIGINT.
inline FileDescriptor endingSignals() {
  sigset_t signals;
  sigemptyset(&signals);
  sigaddset(&signals, SIGTERM);
  sigaddset(&signals, SIGINT);
  sigprocmask(SIG_BLOCK, &signals, nullptr);
  return FileDescriptor(::signalfd(-1, &signals, SFD_CLOEXEC));
}

// The time until a moment, for ppoll(); zero if it is over.
inline timespec timeUntil(std::chrono::nanoseconds moment) {
  const auto left = std::max(moment - monotonicNow(), std::chrono::nanoseconds::zero());
  return {static_cast<std::time_t>(left / std::chrono::seconds(1)),
          static_cast<long>((left % std::chrono::seconds(1)).count())};
}

}  // namespace quazor
