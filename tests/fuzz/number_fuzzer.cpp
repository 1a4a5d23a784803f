// Arbitrary text as a number on the command line: parsing gives a finite number, or a reason.
#include "host/text/parameter_number.h"
#include "tests/fuzz/fuzzing.h"

#include <cmath>
#include <cstddef>
#include <cstdint>
#include <optional>

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace quazor;
  const std::optional<Value> number = accepted([&] { return parseNumber(asText(data, size)); });
  if (number) require(std::isfinite(toDouble(&*number)), "a number is finite");
  return 0;
}
