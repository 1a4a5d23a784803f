// Events of runs for tests.
#pragma once

#include "host/model/run_event.h"

#include <chrono>
#include <string>
#include <vector>

namespace quazor {

// Keeps what it takes.
class EventList final : public RunEventSink {
 public:
  void onEvent(const RunEvent& event) override { events.push_back(event); }

  std::vector<RunEvent> events;
};

// So many milliseconds after 2026-11-21 01:08:00 UTC.
inline Date momentAt(int milliseconds) {
  using namespace std::chrono;
  return Date(sys_days(year(2026) / 11 / 21)) + hours(1) + minutes(8) + std::chrono::milliseconds(milliseconds);
}

RunStarted runOf(std::vector<std::string> names);

DiagnosticStarted beginningOf(const std::string& name);

// A result that passes when its value is 90 or more.
QZMeasuredResult resultOf(double value);

// Of a diagnostic's run as it goes well, from DiagnosticStarted to DiagnosticCompleted, with every kind of event that
// there is in it.
std::vector<RunEvent> wholeDiagnostic(const std::string& name, double value);

// The diagnostics Good (pass), Bad (fail), Strange (error, as its value is not a number) and Broken (error: its run
// failed), in a whole run.
std::vector<RunEvent> wholeRun();

// The names of events in their order, separated by blanks.
std::string namesOf(const std::vector<RunEvent>& events);

}  // namespace quazor
