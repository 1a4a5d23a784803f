// ProcessEnd: how a process ended.
#pragma once

#include <string>

namespace quazor {

// By an exit code or by a signal.
struct ProcessEnd {
  bool bySignal = false;
  int number = 0;  // the exit code or the signal
};

// "exit code 3", "signal 11 (SIGSEGV)".
std::string textOf(const ProcessEnd& end);

}  // namespace quazor
