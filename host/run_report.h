// RunReport: what a run of diagnostics or experiments prints and writes, as it goes and at its end.
#pragma once

#include "host/diagnostic_run.h"
#include "host/exit_code.h"
#include "host/progress.h"

#include <filesystem>
#include <functional>
#include <mutex>
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

enum class Format { kText, kJson, kCsv };

struct ReportOptions {
  Format format = Format::kText;  // kCsv is for experiments only
  std::filesystem::path output;   // where the report goes; empty for the console
  bool ofExperiments = false;     // of experiments on their own
};

// The text report goes out record by record, the JSON document or CSV table at the end. With an output file the report
// goes there at the end, and the console gets one line a diagnostic.
//
// The interrupt may come on any thread at any time; the others calls are the running thread's.
class RunReport {
 public:
  // `console` is borrowed.
  RunReport(ReportOptions options, Console& console);

  // `name` runs from now on.
  void begin(const std::string& name, const BoundParameters& parameters);
  // What began is over.
  void finish(DiagnosticRecord record);
  // Nothing more will run: writes what stands at the end.
  ExitCode conclude();
  // Writes what has been finished and what was interrupted, then calls `leave`, while no other call gets through. Does
  // nothing after conclude(). When another call does not end in time, such as one that writes to a pipe that nobody
  // reads, `leave` is called without a word.
  void interrupt(const std::function<void()>& leave);

  Progress& progress() { return progress_; }

 private:
  void print(std::ostream& out, const DiagnosticRecord& record, bool colour) const;
  void printCounts(std::ostream& out) const;
  ExitCode writeEnd(const std::optional<std::string>& interrupted);
  std::string reportText(const std::optional<std::string>& interrupted) const;

  const ReportOptions options_;
  Console& console_;
  Progress progress_;
  std::timed_mutex mutex_;  // guards what follows, and the order of what is written
  std::vector<DiagnosticRecord> records_;
  std::optional<std::string> running_;
  bool concluded_ = false;
};

// The exit code for the verdicts: an error wins over a failure.
ExitCode exitCodeOf(const std::vector<DiagnosticRecord>& records);

}  // namespace quazor
