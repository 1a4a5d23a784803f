#include "tests/fuzz/event_rules.h"

#include "base/json/json_line.h"
#include "host/model/record_builder.h"
#include "host/record/record_file.h"
#include "host/record/run_event_json.h"
#include "tests/fuzz/fuzzing.h"

#include <string>
#include <string_view>
#include <variant>

namespace quazor {
namespace {

// The host writes these itself.
bool isOfHost(const RunEvent& event) {
  const auto* const failed = std::get_if<Failed>(&event);
  return std::holds_alternative<RunStarted>(event) || std::holds_alternative<DiagnosticStarted>(event) ||
         std::holds_alternative<DiagnosticEnded>(event) || std::holds_alternative<RunEnded>(event) ||
         std::holds_alternative<FramesTraced>(event) || (failed != nullptr && !failed->stage);
}

}  // namespace

void requireSameWhenWritten(const RunEvent& event, std::uint64_t sequence) {
  const std::string line = recordLine(event, sequence);
  require(line.find('\n') == line.size() - 1, "an event takes one line");
  const RunEvent again = eventFrom(parseJsonLine(std::string_view(line).substr(0, line.size() - 1)));
  require(eventJson(again) == eventJson(event), "an event that is written is read as the same event");
  require(recordLine(again, sequence) == line, "an event has one line");
}

std::vector<RunEvent> completed(const std::vector<RunEvent>& events) {
  std::vector<RunEvent> run;
  RunStarted began;
  RecordBuilder builder;
  const auto add = [&](const RunEvent& event) {
    builder.onEvent(event);
    run.push_back(event);
  };
  const auto end = [&] {
    if (!builder.isOpen()) return;
    for (const RunEvent& event : builder.ending(builder.record().end)) add(event);
  };
  for (const RunEvent& event : events) {
    if (const auto* const started = std::get_if<DiagnosticStarted>(&event)) {
      end();
      began.names.push_back(started->name);
      add(event);
    } else if (builder.isOpen() && !builder.isCompleted() && !isOfHost(event)) {
      add(event);
    }
  }
  end();
  run.insert(run.begin(), began);
  run.emplace_back(RunEnded{std::nullopt, began.date});
  return run;
}

}  // namespace quazor
