// Arbitrary text as a number on the command line: parsing gives a finite number, or a reason.
#include "base/text/input_error.h"
#include "host/text/parameter_number.h"

#include <cmath>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string_view>

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  try {
    const quazor::Value number = quazor::parseNumber({reinterpret_cast<const char*>(data), size});
    if (!std::isfinite(quazor::toDouble(&number))) std::abort();
  } catch (const quazor::InputError& problem) {
    if (std::string_view(problem.what()).empty()) std::abort();
  }
  return 0;
}
