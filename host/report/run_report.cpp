#include "host/report/run_report.h"

#include "backends/log/standard_error_log.h"
#include "contract/message_format.h"
#include "host/report/run_identity.h"
#include "host/report/text_report.h"
#include "host/report/variation_report.h"
#include "host/system/output_file.h"
#include "host/text/display_width.h"
#include "host/text/table.h"
#include "host/text/terminal.h"

#include <algorithm>
#include <chrono>
#include <utility>

namespace quazor {

namespace {

constexpr std::size_t kMaxNameInLine = 200;  // so that the line fits where it takesText()

// Tells people who wait for a repeated run how far it is.
std::string suffixOf(const DiagnosticStarted& diagnostic, const RunStarted& run) {
  DiagnosticRecord record;
  record.trial = {diagnostic.attempt, run.attempts, diagnostic.repetition, run.repetitions};
  if (diagnostic.attempt <= 1) record.verdict = Verdict::kPass;
  const std::string trial = trialText(record);
  return trial.empty() ? trial : ", " + trial;
}

bool isRequested(Format format, const ReportOptions& options) {
  return options.format == format ||
         std::any_of(options.outputs.begin(), options.outputs.end(),
                     [format](const OutputRequest& output) { return output.format == format; });
}

const std::string& textOf(Timeline& timeline) {
  try {
    return timeline.text();
  } catch (const TimelineTooLarge& refusal) {
    throw CommandError(ExitCode::kCannotWrite,
                       std::string(refusal.what()) +
                           ", which few viewers open, and is not written; 'quazor report RECORD --format trace' makes "
                           "one of a part of a record, with --from SECONDS and --to SECONDS");
  }
}

}  // namespace

RunReport::RunReport(ReportOptions options, Console& console)
    : options_(std::move(options)),
      console_(console),
      progress_(console.showsProgress ? &console.err : nullptr),
      keepsFrames_(isRequested(Format::kHtml, options_)) {
  if (isRequested(Format::kTrace, options_)) timeline_.emplace(TimelinePart{}, options_.maxTimeline);
}

void RunReport::onEvent(const RunEvent& event) {
  if (timeline_) timeline_->onEvent(event);
  if (const auto* const began = std::get_if<RunStarted>(&event)) {
    run_ = *began;
    if (options_.output.empty() && options_.format == Format::kText) printRun(console_.out, run_);
  } else if (const auto* const diagnostic = std::get_if<DiagnosticStarted>(&event)) {
    const auto place = std::find(run_.names.begin(), run_.names.end(), diagnostic->name);
    number_ = static_cast<std::size_t>(place - run_.names.begin()) + 1;
    if (!records_.empty() && records_.back().trial.repetition != diagnostic->repetition) endRepetition();
    running_ = diagnostic->name + suffixOf(*diagnostic, run_);
    progress_.start(running_, expectedProgressOf(diagnostic->parameters));
  } else if (const auto* const logged = std::get_if<Logged>(&event)) {
    const LogLine& line = logged->line;
    if (line.level > options_.shownLog) return;
    progress_.printAbove([&] {
      console_.err << readableLogLine(line.date, line.level, sharedLog().category(), printableLines(line.text))
                   << std::flush;
    });
  } else if (const auto* const heartbeat = std::get_if<Heartbeat>(&event)) {
    tell(*heartbeat);
  } else if (const auto* const traced = std::get_if<FramesTraced>(&event)) {
    if (!keepsFrames_) return;
    RunStreams& streams = traced->kind == TracedKind::kFrames ? streams_ : queues_;
    streams.resize(records_.size() + 1);
    addFrames(streams.back(), FramesTraced(*traced));
  } else if (const auto* const ended = std::get_if<RunEnded>(&event)) {
    finishRun(*ended);
  }
}

void RunReport::addRecord(DiagnosticRecord record) {
  progress_.stop();
  if (!options_.output.empty()) {
    if (options_.text.verbose || !isOnlyCounted(record)) printVerdict(console_.out, record, console_.colour);
  } else if (options_.format == Format::kText) {
    printReport(console_.out, run_, record, {console_.colour, console_.blocks, options_.text.verbose}, shown_);
  }
  console_.out.flush();
  // The CSV table of measurements has no column for errors.
  if (options_.format == Format::kCsv && run_.ofExperiments && record.error != nullptr) {
    console_.err << "quazor: " << printable(record.name) << " ended in an error\n" << errorText(record.error, "  ");
  }
  if (options_.format == Format::kCsv && run_.ofExperiments && record.skip) {
    console_.err << "quazor: " << printable(record.name) << " was skipped, " << printable(textOf(*record.skip)) << '\n';
  }
  printUnfiredFaults(console_.err, record);
  records_.push_back(std::move(record));
}

void RunReport::endRepetition() {
  if (options_.text.verbose || (options_.output.empty() && options_.format != Format::kText)) return;
  printRepetitionEnd(console_.out, records_, records_.size());
  console_.out.flush();
}

// The run does not wait for the reader of its heartbeats.
void RunReport::tell(const Heartbeat& event) {
  if (console_.showsProgress || (console_.takesText && !console_.takesText())) return;
  const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(event.elapsed).count();
  console_.err << formatMessage("quazor: running %@ (%@ of %@), stage %@, for %@ s\n",
                                shortened(printable(running_), kMaxNameInLine), number_,
                                std::max(run_.names.size(), number_), nameOf(event.stage), seconds)
               << std::flush;
}

// The teardown does not wait for the reader of that line.
void RunReport::tellInterrupt(Stage stage, std::chrono::nanoseconds grace) {
  if (console_.takesText && !console_.takesText()) return;
  const std::string time = defaultText(std::chrono::duration<double>(grace).count());
  const std::string rest =
      stage == Stage::kTeardown
          ? "its teardown goes on to its end"
          : formatMessage("its %@ may take up to %@ s (--grace) to return, and then its teardown follows",
                          nameOf(stage), time);
  progress_.printAbove([&] {
    console_.err << formatMessage("quazor: interrupting %@: %@; a second Ctrl-C ends it at once\n",
                                  shortened(printable(running_), kMaxNameInLine), rest)
                 << std::flush;
  });
}

// The run does not wait for the reader of a remark, which the report repeats.
void RunReport::tellRemark(const std::string& remark) {
  if (console_.takesText && !console_.takesText()) return;
  progress_.printAbove([&] { console_.err << "quazor: " << printable(remark) << '\n' << std::flush; });
}

void RunReport::finishRun(const RunEnded& event) {
  progress_.stop();
  endRepetition();
  const bool toFile = !options_.output.empty();
  const std::optional<std::string>& interrupted = event.interrupted;
  if (toFile || options_.format == Format::kText) {
    printEnd(console_.out, run_, records_, interrupted, options_.text, console_.colour);
  }
  if (!toFile && options_.format != Format::kText) writeReport({options_.format, {}}, interrupted);
  console_.out.flush();
  if (interrupted) console_.err << "quazor: " << interruptionText(run_, *interrupted) << '\n';
  if (!console_.out) {
    console_.err << "quazor: standard output cannot be written\n";
    allWritten_ = false;
  }
  if (toFile) writeReport({options_.format, options_.output}, interrupted);
  for (const OutputRequest& output : options_.outputs) writeReport(output, interrupted);
  console_.err.flush();
}

void RunReport::writeReport(const OutputRequest& output, const std::optional<std::string>& interrupted) {
  const auto write = [&](const std::string& text) {
    output.file.empty() ? writeUnfolded(console_.out, text) : writeOutputFile(output.file, text);
  };
  try {
    if (output.format == Format::kTrace) {
      write(textOf(*timeline_));
    } else {
      write(reportText(output.format, run_, records_, interrupted, options_.text, streams_, queues_));
    }
  } catch (const CommandError& problem) {
    console_.err << "quazor: " << printable(problem.what()) << '\n';
    allWritten_ = false;
  }
}

ExitCode RunReport::exitCode() const {
  if (!allWritten_) return ExitCode::kCannotWrite;
  ExitRules rules = options_.exitRules;
  rules.acceptFlaky = run_.acceptFlaky;
  return exitCodeOf(records_, rules);
}

}  // namespace quazor
