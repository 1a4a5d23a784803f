// Any bytes as a scenario file: a scenario of which a phone can be made, or a sentence.
#include "backends/simulated/scenario/scenario.h"
#include "backends/simulated/simulated_phone.h"

#include <sys/mman.h>
#include <unistd.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <optional>
#include <string>

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static const int file = memfd_create("scenario.json", 0);
  static const std::string path = "/proc/self/fd/" + std::to_string(file);
  if (ftruncate(file, 0) != 0 || pwrite(file, data, size, 0) != static_cast<ssize_t>(size)) std::abort();
  std::string problem;
  const std::optional<quazor::Scenario> scenario = quazor::readScenario(path, &problem);
  if (!scenario) {
    if (problem.empty() || problem.find('\n') != std::string::npos) std::abort();
    return 0;
  }
  const quazor::SimulatedPhone phone(*scenario, quazor::PhoneTime::kVirtual, 0);
  return 0;
}
