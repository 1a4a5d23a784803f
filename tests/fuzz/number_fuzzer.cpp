// Any text as a number of the command line: a number that is finite, or a reason.
#include "host/text/parameter_number.h"

#include <cmath>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <optional>
#include <string>
#include <string_view>

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  std::string problem;
  const std::optional<quazor::Value> number =
      quazor::parseNumber(std::string_view(reinterpret_cast<const char*>(data), size), &problem);
  if (number ? !std::isfinite(quazor::toDouble(&*number)) : problem.empty()) std::abort();
  return 0;
}
