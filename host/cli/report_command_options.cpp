#include "host/cli/report_command_options.h"

#include "contract/message_format.h"
#include "host/error/exit_code.h"
#include "host/report/report_format.h"
#include "host/run/deadlines.h"

#include <CLI/CLI.hpp>

#include <optional>
#include <string>

namespace quazor {

namespace {

// Why the command cannot write that format; empty if it can.
std::string problemOfFormat(const std::string& name) {
  const std::optional<Format> format = formatNamed(name);
  if (format == Format::kHtml || format == Format::kTrace) return {};
  if (!format) return name + " not in {html,trace}";
  return formatMessage(
      "this command writes html and trace; for %@, 'quazor analyze RECORD --output %@:FILE' judges the "
      "record again, and 'quazor run --output %@:FILE' writes it on a run",
      name, name, name);
}

}  // namespace

void addReportCommandOptions(CLI::App& command, ReportCommandTexts& texts) {
  command
      .add_option("--format", texts.format,
                  "html: one page for people, which needs no network; trace: a time line of diagnostics, stages, log "
                  "lines and frames, in the Trace Event Format that Perfetto, speedscope and Chrome open. Default html")
      ->type_name("FORMAT")
      ->check(CLI::Validator(problemOfFormat, ""));
  command.add_flag("--compare", texts.compare, "Make a page of what differs between two records");
  command.add_flag("--no-frames", texts.noFrames, "Leave the frames out of the page");
  command.add_option("--from", texts.from, "Leave out what ends before this time; 0 is the beginning of the run")
      ->type_name("SECONDS");
  command.add_option("--to", texts.to, "Leave out what begins after this time")->type_name("SECONDS");
}

RecordReport recordReportOf(const ReportCommandTexts& texts, const std::vector<std::string>& records) {
  RecordReport report;
  report.isTimeline = texts.format == "trace";
  report.frames = !texts.noFrames;
  report.isComparison = texts.compare;
  if (!texts.from.empty()) report.part.from = parseTime("--from", texts.from);
  if (!texts.to.empty()) report.part.to = parseTime("--to", texts.to);
  if (report.part.to < report.part.from) {
    throw CommandError(ExitCode::kUsage, "--to '" + texts.to + "': the time is before --from '" + texts.from + "'");
  }
  const auto require = [](bool isRight, const std::string& problem) {
    if (!isRight) throw CommandError(ExitCode::kUsage, problem);
  };
  if (report.isTimeline) {
    require(records.size() <= 1,
            "--format trace: a time line is of one record, but there are " + std::to_string(records.size()));
    require(!report.isComparison, "--compare applies only to --format html");
    require(report.frames, "--no-frames applies only to --format html");
  } else {
    require(!report.isComparison || records.size() == 2,
            "--compare takes two records, but there are " + std::to_string(records.size()));
    require(texts.from.empty(), "--from applies only to --format trace");
    require(texts.to.empty(), "--to applies only to --format trace");
  }
  return report;
}

Format formatOf(const RecordReport& report) { return report.isTimeline ? Format::kTrace : Format::kHtml; }

}  // namespace quazor
