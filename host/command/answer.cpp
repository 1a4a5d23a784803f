#include "host/command/answer.h"

#include "host/system/output_file.h"

namespace quazor {

void writeOutput(const ReportOptions& report, Console& console, const std::string& answer) {
  if (report.output.empty()) {
    console.out << answer << std::flush;
    if (!console.out) throw CommandError(ExitCode::kCannotWrite, "standard output cannot be written");
    return;
  }
  const std::string problem = writeOutputFile(report.output, answer);
  if (problem.empty()) return;
  throw CommandError(ExitCode::kCannotWrite,
                     "the output file '" + report.output.string() + "' cannot be written: " + problem);
}

}  // namespace quazor
