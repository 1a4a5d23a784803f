#include "host/system/process_end.h"

#include <signal.h>
#include <string.h>

namespace quazor {

std::string textOf(const ProcessEnd& end) {
  const std::string number = std::to_string(end.number);
  if (!end.bySignal) return "exit code " + number;
  const char* const name = ::sigabbrev_np(end.number);
  return "signal " + number + (name == nullptr ? std::string() : " (SIG" + std::string(name) + ")");
}

}  // namespace quazor
