#include "host/testing/test_events.h"

#include "host/model/record_builder.h"
#include "host/record/run_event_json.h"
#include "host/testing/test_records.h"

#include <limits>
#include <utility>

namespace quazor {

namespace {

using namespace std::chrono_literals;

void append(std::vector<RunEvent>& events, std::vector<RunEvent> more) {
  events.insert(events.end(), std::make_move_iterator(more.begin()), std::make_move_iterator(more.end()));
}

// Completes the events of the diagnostic in progress with those that end it.
std::vector<RunEvent> closed(std::vector<RunEvent> events) {
  RecordBuilder builder;
  for (const RunEvent& event : events) builder.onEvent(event);
  append(events, builder.ending(momentAt(90)));
  return events;
}

}  // namespace

RunStarted runOf(std::vector<std::string> names) {
  return {"0.1.0", 2, momentAt(0), {"p.so"}, "phone.json", 5, false, std::move(names)};
}

DiagnosticStarted beginningOf(const std::string& name) {
  DiagnosticStarted began{name, "Its summary.", "E", "A", false, {}, 5, momentAt(1)};
  began.parameters.experiment.push_back({"duration", QZNumberParameter("How long.", true), Value(3), "command line"});
  began.parameters.analysis.push_back({"gain", QZNumberParameter("How much.", false), std::nullopt, ""});
  return began;
}

QZMeasuredResult resultOf(double value) { return resultWithMinimum(value, 90); }

std::vector<RunEvent> wholeDiagnostic(const std::string& name, double value) {
  const LogLine line{250ms, LogLevel::kError, "a line", momentAt(4)};
  return {beginningOf(name),
          StageStarted{Stage::kSetup, momentAt(2)},
          StageEnded{Stage::kSetup, 0ns, momentAt(3)},
          StageStarted{Stage::kRun, momentAt(3)},
          Logged{line},
          StageEnded{Stage::kRun, 3s, momentAt(5)},
          MeasurementsAdded{{{"Raw", Measurement(value, QZDimensionlessUnit::frames())}}},
          AuxiliaryDataAdded{"bytes", Bytes{0xA5}},
          StageStarted{Stage::kAnalyze, momentAt(6)},
          StageEnded{Stage::kAnalyze, std::nullopt, momentAt(7)},
          ResultsReported{{resultOf(value)}},
          FaultsCounted{{{{{"operation", "CaptureStream.start"}}, 1}}},
          DiagnosticCompleted{}};
}

std::vector<RunEvent> wholeRun() {
  std::vector<RunEvent> events = {runOf({"Good", "Bad", "Strange", "Broken"})};
  append(events, closed(wholeDiagnostic("Good", 90)));
  append(events, closed(wholeDiagnostic("Bad", 89)));
  append(events, closed(wholeDiagnostic("Strange", std::numeric_limits<double>::quiet_NaN())));
  append(events, closed({beginningOf("Broken"), StageStarted{Stage::kRun, momentAt(2)},
                         Failed{Stage::kRun, errorWithMessage("Domain", -1, "it failed", nullptr)},
                         StageEnded{Stage::kRun, 1s, momentAt(5)}, DiagnosticCompleted{}}));
  events.emplace_back(RunEnded{std::nullopt, momentAt(99)});
  return events;
}

std::string namesOf(const std::vector<RunEvent>& events) {
  std::string names;
  for (const RunEvent& event : events) {
    names += (names.empty() ? "" : " ") + eventJson(event)["event"].get<std::string>();
  }
  return names;
}

std::vector<Stage> stagesIn(const DiagnosticRecord& record) {
  std::vector<Stage> stages;
  for (const StagePeriod& one : record.stages) stages.push_back(one.stage);
  return stages;
}

}  // namespace quazor
