// Passes the events of a run to the records and then to the report.
#pragma once

#include "host/model/record_builder.h"
#include "host/record/record_file.h"
#include "host/report/run_report.h"
#include "host/run/log_limit.h"

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// The destinations of a run's events.
struct EventPipelineOptions {
  std::filesystem::path record;  // empty: none
  bool replacesRecord = false;   // an existing one
  bool tellsRecord = false;      // its file is told at the end of the run
  bool keepsLastRun = false;
  bool systemLog = false;
  ReportOptions report;
  LogLimit logLimit;  // of each diagnostic
};

// Every event is recorded before it is shown to the user. Log lines beyond the limit are neither recorded nor shown; a
// line at the end of the diagnostic tells their number.
//
// Thread: any; it handles one event at a time.
class EventPipeline final : public RunEventSink {
 public:
  // Creates the requested records. Throws a CommandError (kCannotWrite) if one cannot be created.
  // `console` is borrowed.
  EventPipeline(const EventPipelineOptions& options, Console& console);

  void onEvent(const RunEvent& event) override;

  // Ends the current diagnostic with the verdict that follows from its events.
  void endDiagnostic();
  // Ends the run and the current diagnostic, if any, as interrupted, and then calls `leave` while no other event is
  // processed. After the end of the run it only calls `leave`. If another event is stuck, for example in a pipe that is
  // not read, `leave` is called after a timeout.
  void interruptAndLeave(const std::function<void()>& leave);

  // The records of the diagnostics that have ended.
  const std::vector<DiagnosticRecord>& records() const { return report_.records(); }
  ExitCode exitCode() const { return report_.exitCode(); }
  // Throws a CommandError (kCannotWrite) if a requested record is incomplete.
  void requireRecords() const;
  // As in RunReport.
  void tellInterrupt(Stage stage, std::chrono::nanoseconds grace);
  void tellRemark(const std::string& remark);
  Progress& progress() { return report_.progress(); }

 private:
  // True for a log line beyond the limit.
  bool isLeftOut(const RunEvent& event);
  void pass(const RunEvent& event);
  void tellRecord();
  void endOpenDiagnostic();
  void interruptRun();

  Console& console_;
  const bool tellsRecord_;
  std::vector<std::unique_ptr<RecordWriter>> records_;
  std::size_t required_ = 0;  // the number of records that the user requested; they come first
  std::uint64_t recorded_ = 0;
  std::shared_ptr<LogBackend> systemLog_;
  const LogLimit logLimit_;
  LogCap logCap_;
  std::chrono::nanoseconds lastLine_{};  // its time
  RecordBuilder builder_;
  RunReport report_;
  std::timed_mutex mutex_;
  bool ended_ = false;
};

}  // namespace quazor
