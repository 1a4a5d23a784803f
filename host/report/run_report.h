// RunReport: prints and writes the reports of a run, during the run and at its end.
#pragma once

#include "contract/log_channel.h"
#include "host/error/exit_code.h"
#include "host/model/diagnostic_record.h"
#include "host/model/run_event.h"
#include "host/model/trials.h"
#include "host/report/progress.h"
#include "host/report/report_format.h"
#include "host/report/timeline.h"

#include <chrono>
#include <cstddef>
#include <functional>
#include <optional>
#include <ostream>
#include <string>
#include <vector>

namespace quazor {

// The output streams of the program, borrowed.
struct Console {
  std::ostream& out;
  std::ostream& err;
  bool colour = false;         // `out` supports colour
  bool showsProgress = false;  // `err` is a terminal
  bool blocks = false;         // `out` supports UTF-8 and block elements
  // False if a short text to `err` would have to wait for its reader; empty: never.
  std::function<bool()> takesText{};
};

struct ReportOptions {
  Format format = Format::kText;
  // The destination of the report in that format; empty for the console.
  std::filesystem::path output;
  std::vector<OutputRequest> outputs{};  // additional reports
  LogLevel shownLog = LogLevel::kError;  // lines up to this level go to the console's error stream
  ExitRules exitRules{};
  TextContent text{};
  std::size_t maxTimeline = kMaxTimeline;  // bytes
};

// The text report is printed after each diagnostic, all other formats at the end of the run. If the report goes to a
// file, it is written at the end and the console shows one line per diagnostic. What passes in a run with repetitions
// is only counted, in a line for each repetition, unless the report is verbose.
//
// Thread: one at a time.
class RunReport final : public RunEventSink {
 public:
  // `console` is borrowed.
  RunReport(ReportOptions options, Console& console);

  void onEvent(const RunEvent& event) override;
  // Hands over the record of the diagnostic that has ended.
  void addRecord(DiagnosticRecord record);

  // Tells the user that the running diagnostic is interrupted in that stage, and how long that may take.
  void tellInterrupt(Stage stage, std::chrono::nanoseconds grace);

  // Tells the user something about the run that goes on.
  void tellRemark(const std::string& remark);

  // The records so far.
  const std::vector<DiagnosticRecord>& records() const { return records_; }
  // The exit code after the end of the run; kCannotWrite if a report could not be written.
  ExitCode exitCode() const;

  Progress& progress() { return progress_; }

 private:
  void tell(const Heartbeat& event);
  // After the last record of a repetition.
  void endRepetition();
  void finishRun(const RunEnded& event);
  // To the console if the name of the file is empty.
  void writeReport(const OutputRequest& output, const std::optional<std::string>& interrupted);

  const ReportOptions options_;
  Console& console_;
  Progress progress_;
  ShownFailures shown_;
  RunStarted run_;
  std::string running_;     // the diagnostic that began last
  std::size_t number_ = 0;  // its place among those to run
  std::vector<DiagnosticRecord> records_;
  const bool keepsFrames_;  // for a page
  RunStreams streams_;
  RunStreams queues_;
  std::optional<Timeline> timeline_;  // if one is requested
  bool allWritten_ = true;
};

}  // namespace quazor
