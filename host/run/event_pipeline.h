// The way of a run's events: to the records, then to the report.
#pragma once

#include "host/model/record_builder.h"
#include "host/record/record_file.h"
#include "host/report/run_report.h"

#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// Where a run's events go.
struct EventPipelineOptions {
  std::filesystem::path record;  // empty: none
  bool keepsLastRun = false;
  bool systemLog = false;
  ReportOptions report;
};

// What the user is told has been recorded before.
//
// Thread: any; it handles one event at a time.
class EventPipeline final : public RunEventSink {
 public:
  // Begins the records that were asked for. Throws a CommandError (kCannotWrite) for a record that cannot be begun.
  // `console` is borrowed.
  EventPipeline(const EventPipelineOptions& options, Console& console);

  void onEvent(const RunEvent& event) override;

  // Closes the diagnostic that is open, by what is known of it.
  void endDiagnostic();
  // Closes the run, and the diagnostic that is open if there is one, as interrupted, and then calls `leave` while
  // nothing else happens. Does nothing but that after the run's end. When an event does not end its way in time, as
  // when it is written to a pipe that nobody reads, `leave` is called all the same.
  void interruptAndLeave(const std::function<void()>& leave);

  ExitCode exitCode() const { return report_.exitCode(); }
  Progress& progress() { return report_.progress(); }

 private:
  void pass(const RunEvent& event);
  void endOpenDiagnostic();
  void interruptRun();

  std::vector<std::unique_ptr<RecordWriter>> records_;
  std::size_t required_ = 0;  // so many of them, from the first, were asked for
  std::uint64_t recorded_ = 0;
  std::shared_ptr<LogBackend> systemLog_;
  RecordBuilder builder_;
  RunReport report_;
  std::timed_mutex mutex_;
  bool ended_ = false;
};

}  // namespace quazor
