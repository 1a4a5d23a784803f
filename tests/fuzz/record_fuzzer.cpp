// Arbitrary lines as a record: reading gives events that are written again as the same events, or a reason; everything
// that works on records works on them.
#include "base/json/json_line.h"
#include "host/record/record_file.h"
#include "host/record/run_event_json.h"
#include "host/record/verification.h"
#include "host/report/page/page.h"
#include "host/report/record_difference.h"
#include "host/report/report_format.h"
#include "tests/fuzz/event_rules.h"
#include "tests/fuzz/fuzzing.h"

#include <optional>
#include <variant>
#include <vector>

namespace quazor {
namespace {

void requireReports(const std::filesystem::path& file) {
  const RecordedRun run = runIn(file);
  require(differencesOf(run, run).empty(), "a run does not differ from itself");
  const std::optional<std::string> interrupted = run.ended ? run.ended->interrupted : std::nullopt;
  TextContent text;
  text.page = [](const ShownRun& shown) { return reportPage({shown}, {}); };
  for (const Format format : kRecordFormats) {
    require(!reportText(format, run.began, run.records, interrupted, text, run.streams).empty() || run.records.empty(),
            "a run can be reported in every format");
  }
}

void requireProblems(const std::vector<RunEvent>& events) {
  for (const std::string& problem : problemsOf(events)) require(!problem.empty(), "a problem is a sentence");
  require(problemsOf(completed(events)).empty(), "a run that ends as the host ends it follows from its data");
}

}  // namespace
}  // namespace quazor

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace quazor;
  static const MemoryFile file("record.jsonl");
  file.write(data, size);
  const std::optional<StoredRecord> stored = accepted([] { return readRecord(file.path()); });
  require(accepted([] { return runIn(file.path()); }).has_value() == stored.has_value(),
          "a record is read for every purpose or for none");
  if (!stored) return 0;
  require(stored->events.size() + (stored->cutOff ? 1 : 0) == linesOf(asText(data, size)).size(),
          "every line is an event");
  for (std::size_t i = 0; i < stored->events.size(); ++i) requireSameWhenWritten(stored->events[i], i);
  requireProblems(stored->events);
  requireReports(file.path());
  return 0;
}
