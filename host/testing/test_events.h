// Events of runs for tests.
#pragma once

#include "host/model/run_event.h"

#include <chrono>
#include <string>
#include <vector>

namespace quazor {

// Stores all events.
class EventList final : public RunEventSink {
 public:
  void onEvent(const RunEvent& event) override { events.push_back(event); }

  std::vector<RunEvent> events;
};

// That many milliseconds after 2026-11-21 01:08:00 UTC.
inline Date momentAt(int milliseconds) {
  using namespace std::chrono;
  return Date(sys_days(year(2026) / 11 / 21)) + hours(1) + minutes(8) + std::chrono::milliseconds(milliseconds);
}

RunStarted runOf(std::vector<std::string> names);

DiagnosticStarted beginningOf(const std::string& name);

// A result that passes if its value is 90 or more.
QZMeasuredResult resultOf(double value);

// The events of a diagnostic that passes, from DiagnosticStarted to DiagnosticCompleted, of every possible kind.
std::vector<RunEvent> wholeDiagnostic(const std::string& name, double value);

// A complete run of the diagnostics Good (pass), Bad (fail), Strange (error, because its value is not a number) and
// Broken (error: its run failed).
std::vector<RunEvent> wholeRun();

// The names of the events in order, separated by spaces.
std::string namesOf(const std::vector<RunEvent>& events);

// The stages that the diagnostic began.
std::vector<Stage> stagesIn(const DiagnosticRecord& record);

}  // namespace quazor
