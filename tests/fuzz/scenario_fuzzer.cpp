// Arbitrary bytes as a scenario file: parsing gives a scenario from which a phone can be created, or a sentence.
#include "backends/simulated/scenario/scenario.h"
#include "backends/simulated/simulated_phone.h"
#include "base/text/input_error.h"

#include <sys/mman.h>
#include <unistd.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static const int file = memfd_create("scenario.json", 0);
  static const std::string path = "/proc/self/fd/" + std::to_string(file);
  if (ftruncate(file, 0) != 0 || pwrite(file, data, size, 0) != static_cast<ssize_t>(size)) std::abort();
  try {
    const quazor::SimulatedPhone phone(quazor::readScenario(path), quazor::PhoneTime::kVirtual, 0);
  } catch (const quazor::InputError& error) {
    const std::string_view problem = error.what();
    if (problem.empty() || problem.find('\n') != std::string_view::npos) std::abort();
  }
  return 0;
}
