// Arbitrary text as a profile: parsing gives a profile, or an error with a sentence.
#include "base/text/input_error.h"
#include "host/plugin/profile.h"

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  try {
    quazor::parseProfile("profile.json", std::string(reinterpret_cast<const char*>(data), size));
  } catch (const quazor::InputError& problem) {
    if (std::string(problem.what()).empty()) std::abort();
  }
  return 0;
}
