// Any text as a profile: a profile, or a refusal with a sentence.
#include "host/error/exit_code.h"
#include "host/plugin/profile.h"

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  try {
    quazor::parseProfile("profile.json", std::string(reinterpret_cast<const char*>(data), size));
  } catch (const quazor::CommandError& refusal) {
    if (std::string(refusal.what()).empty()) std::abort();
  }
  return 0;
}
