// Arbitrary bytes as a report descriptor: parsing gives values within their limits, or a reason.
#include "backends/linux/hid/hid_report_descriptor.h"
#include "tests/fuzz/fuzzing.h"

#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>

namespace quazor {
namespace {

void requireReports(const HidReportDescriptor& descriptor, const std::map<std::uint8_t, std::uint32_t>& reports) {
  const std::uint32_t id = descriptor.numbered ? 1 : 0;
  for (const auto& [number, length] : reports) {
    require(length >= id && length <= HidReportDescriptor::kMaxReport + id, "a report has a length within the limits");
    require(descriptor.numbered || number == 0, "only numbered reports have a number");
  }
}

}  // namespace
}  // namespace quazor

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace quazor;
  const std::optional<HidReportDescriptor> descriptor = accepted([&] {
    return parseHidReportDescriptor({data, size});
  });
  if (!descriptor) return 0;
  require(descriptor->topLevel.size() <= size, "a collection takes bytes");
  requireReports(*descriptor, descriptor->inputReports);
  requireReports(*descriptor, descriptor->featureReports);
  return 0;
}
