#include "host/cli/timeline_options.h"

#include "host/error/exit_code.h"
#include "host/run/deadlines.h"

#include <CLI/CLI.hpp>

namespace quazor {

void addTimelineOptions(CLI::App& command, TimelineTexts& texts) {
  command
      .add_option("--format", texts.format,
                  "trace: a time line of diagnostics, stages, log lines and frames, in the Trace Event Format that "
                  "Perfetto, speedscope and Chrome open")
      ->type_name("trace")
      ->required()
      ->check(CLI::IsMember({"trace"}));
  command.add_option("--from", texts.from, "Leave out what ends before this time; 0 is the beginning of the run")
      ->type_name("SECONDS");
  command.add_option("--to", texts.to, "Leave out what begins after this time")->type_name("SECONDS");
}

TimelinePart timelinePartOf(const TimelineTexts& texts) {
  TimelinePart part;
  if (!texts.from.empty()) part.from = parseTime("--from", texts.from);
  if (!texts.to.empty()) part.to = parseTime("--to", texts.to);
  if (part.to < part.from) {
    throw CommandError(ExitCode::kUsage, "--to '" + texts.to + "': the time is before --from '" + texts.from + "'");
  }
  return part;
}

}  // namespace quazor
