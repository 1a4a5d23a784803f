#include "host/run_report.h"

#include "host/csv_report.h"
#include "host/experiment_report.h"
#include "host/json_report.h"
#include "host/output_file.h"
#include "host/table.h"
#include "host/text_report.h"
#include "host/value_json.h"

#include <chrono>
#include <sstream>
#include <utility>

namespace quazor {

namespace {

constexpr std::chrono::seconds kLongestWaitOfInterrupt{1};

}  // namespace

RunReport::RunReport(ReportOptions options, Console& console)
    : options_(std::move(options)), console_(console), progress_(console.showsProgress ? &console.err : nullptr) {}

void RunReport::begin(const std::string& name, const BoundParameters& parameters) {
  const std::lock_guard lock(mutex_);
  running_ = name;
  progress_.start(name, expectedProgressOf(parameters));
}

void RunReport::finish(DiagnosticRecord record) {
  const std::lock_guard lock(mutex_);
  progress_.stop();
  running_.reset();
  if (!options_.output.empty()) {
    printVerdict(console_.out, record, console_.colour);
  } else if (options_.format == Format::kText) {
    print(console_.out, record, console_.colour);
  }
  console_.out.flush();
  // A table has no place for errors.
  if (options_.format == Format::kCsv && record.error != nullptr) {
    console_.err << "quazor: " << printable(record.name) << " ended in an error\n" << errorText(record.error, "  ");
  }
  printUnfiredFaults(console_.err, record);
  records_.push_back(std::move(record));
}

ExitCode RunReport::conclude() {
  const std::lock_guard lock(mutex_);
  concluded_ = true;
  return writeEnd(std::nullopt);
}

void RunReport::interrupt(const std::function<void()>& leave) {
  const std::unique_lock lock(mutex_, kLongestWaitOfInterrupt);
  if (lock.owns_lock()) {
    if (concluded_) return;
    progress_.stop();
    writeEnd(running_.value_or(std::string()));
  }
  leave();
}

void RunReport::print(std::ostream& out, const DiagnosticRecord& record, bool colour) const {
  if (options_.ofExperiments) {
    printExperiment(out, record, {colour, console_.blocks});
  } else {
    printRecord(out, record, colour);
  }
}

void RunReport::printCounts(std::ostream& out) const {
  options_.ofExperiments ? printExperimentSummary(out, records_) : printSummary(out, records_);
}

ExitCode RunReport::writeEnd(const std::optional<std::string>& interrupted) {
  const bool toFile = !options_.output.empty();
  const bool summarized = toFile || options_.format == Format::kText;
  if (summarized && (records_.size() != 1 || interrupted)) printCounts(console_.out);
  if (!toFile && options_.format != Format::kText) console_.out << reportText(interrupted);
  console_.out.flush();
  if (interrupted && interrupted->empty()) {
    console_.err << "quazor: interrupted between two " << (options_.ofExperiments ? "experiments" : "diagnostics")
                 << '\n';
  }
  if (interrupted && !interrupted->empty()) {
    console_.err << "quazor: interrupted while " << printable(*interrupted) << " was running\n";
  }
  std::string problem = console_.out ? std::string() : "quazor: the standard output cannot be written\n";
  if (toFile) {
    if (const std::string why = writeOutputFile(options_.output, reportText(interrupted)); !why.empty()) {
      problem =
          "quazor: the output file '" + printable(options_.output.string()) + "' cannot be written: " + why + "\n";
    }
  }
  console_.err << problem << std::flush;
  return problem.empty() ? exitCodeOf(records_) : ExitCode::kCannotWrite;
}

std::string RunReport::reportText(const std::optional<std::string>& interrupted) const {
  if (options_.format == Format::kCsv) return experimentCsv(records_);
  if (options_.format == Format::kJson) {
    return documentText(options_.ofExperiments ? experimentDocument(records_, interrupted)
                                               : runDocument(records_, interrupted));
  }
  std::ostringstream text;
  for (const DiagnosticRecord& record : records_) print(text, record, false);
  if (records_.size() != 1 || interrupted) printCounts(text);
  if (interrupted && !interrupted->empty())
    text << "Interrupted while " << printable(*interrupted) << " was running.\n";
  return text.str();
}

ExitCode exitCodeOf(const std::vector<DiagnosticRecord>& records) {
  ExitCode code = ExitCode::kAllPassed;
  for (const DiagnosticRecord& record : records) {
    if (record.verdict == Verdict::kError) return ExitCode::kError;
    if (record.verdict == Verdict::kFail) code = ExitCode::kFailed;
  }
  return code;
}

}  // namespace quazor
