// A plug-in that tells the capabilities of its processes: when it is loaded, described and run, it appends them to the
// file named in the environment.
#include "tests/misbehaving/misbehaviour.h"

#include <cstdlib>
#include <fstream>
#include <string>

namespace quazor::misbehaving {

namespace {

// The lines of proc(5), /proc/self/status, with the capabilities.
void tell(const std::string& when) {
  const char* const file = std::getenv("MISBEHAVIOUR_STATE");
  if (file == nullptr) return;
  std::ifstream status("/proc/self/status");
  std::ofstream out(file, std::ios::app);
  for (std::string line; std::getline(status, line);) {
    if (line.starts_with("Cap")) out << when << ' ' << line << '\n';
  }
}

[[gnu::constructor]] void registerAll() {
  tell("load");
  addDiagnostic("TellCapabilities", {.inDescription = [] { tell("describe"); }, .inRun = [] { tell("run"); }});
}

}  // namespace

}  // namespace quazor::misbehaving
