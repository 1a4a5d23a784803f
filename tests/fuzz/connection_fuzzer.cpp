// Arbitrary lines as the events that a plug-in's process sends: each is an event that is the same when it is written
// again, or is refused, and the record that they make has the verdict that verification derives from it.
#include "base/json/json_line.h"
#include "host/record/run_event_json.h"
#include "host/record/verification.h"
#include "tests/fuzz/event_rules.h"
#include "tests/fuzz/fuzzing.h"

#include <optional>
#include <string>
#include <vector>

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace quazor;
  DiagnosticStarted started;
  started.name = "Diagnostic";
  std::vector<RunEvent> events = {started};
  for (const std::string& line : linesOf(asText(data, size))) {
    const std::optional<RunEvent> event = accepted([&] { return eventFrom(parseJsonLine(line)); });
    if (!event) break;  // the host ends the process
    requireSameWhenWritten(*event, events.size());
    events.push_back(*event);
  }
  require(problemsOf(completed(events)).empty(), "the verdict follows from what the process sent");
  return 0;
}
