// Arbitrary bytes as a report descriptor: parsing gives values within their limits, or a reason.
#include "backends/linux/hid/hid_report_descriptor.h"
#include "base/text/input_error.h"

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <map>
#include <string_view>

namespace quazor {
namespace {

void require(bool holds) {
  if (!holds) std::abort();
}

void requireReports(const HidReportDescriptor& descriptor, const std::map<std::uint8_t, std::uint32_t>& reports) {
  const std::uint32_t id = descriptor.numbered ? 1 : 0;
  for (const auto& [number, length] : reports) {
    require(length >= id && length <= HidReportDescriptor::kMaxReport + id);
    require(descriptor.numbered || number == 0);
  }
}

}  // namespace
}  // namespace quazor

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  try {
    const quazor::HidReportDescriptor descriptor = quazor::parseHidReportDescriptor({data, size});
    quazor::require(descriptor.topLevel.size() <= size);
    quazor::requireReports(descriptor, descriptor.inputReports);
    quazor::requireReports(descriptor, descriptor.featureReports);
  } catch (const quazor::InputError& problem) {
    quazor::require(!std::string_view(problem.what()).empty());
  }
  return 0;
}
