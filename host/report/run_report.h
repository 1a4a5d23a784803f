// RunReport: what a run of diagnostics or experiments prints and writes, as it goes and at its end.
#pragma once

#include "contract/log_channel.h"
#include "host/error/exit_code.h"
#include "host/model/diagnostic_record.h"
#include "host/model/run_event.h"
#include "host/report/progress.h"
#include "host/report/report_format.h"

#include <optional>
#include <ostream>
#include <string>
#include <vector>

namespace quazor {

// Where the program writes. The streams are borrowed.
struct Console {
  std::ostream& out;
  std::ostream& err;
  bool colour = false;         // on `out`
  bool showsProgress = false;  // on `err`: it is a terminal
  bool blocks = false;         // text may be UTF-8, with block elements in it
};

struct ReportOptions {
  Format format = Format::kText;
  // Where the report in that format goes; empty for the console.
  std::filesystem::path output;
  std::vector<OutputRequest> outputs{};  // further reports
  LogLevel shownLog = LogLevel::kError;  // lines up to this level go to the console's error stream
};

// The text report goes out diagnostic by diagnostic, every other one at the end. With an output file the report goes
// there at the end, and the console gets one line a diagnostic.
//
// Thread: one at a time.
class RunReport final : public RunEventSink {
 public:
  // `console` is borrowed.
  RunReport(ReportOptions options, Console& console);

  void onEvent(const RunEvent& event) override;
  // Hands over the record of the diagnostic that has ended.
  void addRecord(DiagnosticRecord record);

  // What the run came to, once it has ended: kCannotWrite when not all reports could be written.
  ExitCode exitCode() const;

  Progress& progress() { return progress_; }

 private:
  void finishRun(const RunEnded& event);
  void writeFile(const OutputRequest& output, const std::optional<std::string>& interrupted);

  const ReportOptions options_;
  Console& console_;
  Progress progress_;
  RunStarted run_;
  std::vector<DiagnosticRecord> records_;
  bool allWritten_ = true;
};

// The exit code for the verdicts: an error wins over a failure.
ExitCode exitCodeOf(const std::vector<DiagnosticRecord>& records);

}  // namespace quazor
