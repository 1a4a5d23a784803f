// report: a page of records, or a time line of one.
#include "host/command/report_command.h"

#include "contract/message_format.h"
#include "host/command/commands.h"
#include "host/command/explanations.h"
#include "host/model/incomplete_run.h"
#include "host/record/record_file.h"
#include "host/record/record_place.h"
#include "host/report/page/comparison.h"
#include "host/report/page/page.h"
#include "host/report/timeline.h"
#include "host/system/user_directory.h"
#include "host/text/table.h"

#include <filesystem>
#include <optional>
#include <utility>
#include <vector>

namespace quazor {

namespace {

void tellThatTheRunDidNotEnd(const std::filesystem::path& file, std::string_view what, Console& console) {
  console.err << "quazor: " << printable(file.string()) << ": the run did not end; the " << what
              << " ends with the record\n";
}

void writeTimeline(const Options& options, Console& console) {
  const std::filesystem::path& file = options.records.front();
  refuseFolderAsRecord(file);
  const StoredRecord record = readRecord(file);
  const TimelinePart& part = options.ofRecords.part;
  Timeline timeline(part);
  for (const RunEvent& event : record.events) timeline.onEvent(event);
  try {
    writeOutput(options.report, console, timeline.text());
  } catch (const TimelineTooLarge& refusal) {
    throw CommandError(ExitCode::kUsage,
                       formatMessage("%@: %@, which few viewers open; --from SECONDS and --to SECONDS "
                                     "choose a part of it",
                                     file.string(), refusal.what()));
  }
  if (timeline.isEmpty() && !part.isEverything()) {
    const std::chrono::duration<double> end = timeline.end();
    console.err << formatMessage(
        "quazor: %@: nothing happens in the part that --from and --to choose; the time line "
        "goes from 0 to %@ s\n",
        printable(file.string()), end.count());
  }
  if (!std::holds_alternative<RunEnded>(record.events.back())) tellThatTheRunDidNotEnd(file, "time line", console);
}

ShownRun shownRun(const RecordedRun& run, const std::filesystem::path& file) {
  ShownRun shown{run.began, run.records, run.streams};
  shown.queues = &run.queues;
  shown.file = file.string();
  shown.hasEnded = run.ended.has_value();
  if (run.ended) {
    shown.interrupted = run.ended->interrupted;
  } else if (run.isLastOpen) {
    shown.interrupted = run.records.back().name;
  }
  return shown;
}

PageOptions pageOptions(const Installation& installation) {
  PageOptions options;
  options.adviceOf = explanationFinder(installation.explanations());
  options.library = plotLibraryIn(sharedDataDirectories());
  return options;
}

void writeComparison(const Options& options, Console& console) {
  const RecordedRun before = runIn(options.records[0]);
  const RecordedRun after = runIn(options.records[1]);
  writeOutput(options.report, console,
              comparisonPage({before, options.records[0].string()}, {after, options.records[1].string()},
                             options.ofRecords.frames));
}

void writePage(const Options& options, const Installation& installation, Console& console) {
  const std::vector<std::filesystem::path> files = recordsIn(options.records);
  std::vector<RecordedRun> runs;
  runs.reserve(files.size());
  std::vector<ShownRun> shown;
  for (const std::filesystem::path& file : files) {
    RecordedRun& run = runs.emplace_back(runIn(file));
    if (run.ended) run.records = withInterruptedOfAnalysis(run.began, std::move(run.records), run.ended->interrupted);
    shown.push_back(shownRun(run, file));
    if (!run.ended) tellThatTheRunDidNotEnd(file, "page", console);
  }
  PageOptions content = pageOptions(installation);
  content.frames = options.ofRecords.frames;
  writeOutput(options.report, console, reportPage(shown, content));
}

}  // namespace

std::function<std::string(const ShownRun& run)> pageWriter(const Installation& installation) {
  return [options = pageOptions(installation)](const ShownRun& run) { return reportPage({run}, options); };
}

ExitCode reportCommand(const Options& options, const Installation& installation, Console& console) {
  if (options.ofRecords.isTimeline) {
    writeTimeline(options, console);
  } else if (options.ofRecords.isComparison) {
    writeComparison(options, console);
  } else {
    writePage(options, installation, console);
  }
  return ExitCode::kAllPassed;
}

}  // namespace quazor
