#include "host/command/answer.h"

#include "host/system/output_file.h"

namespace quazor {

void writeOutput(const ReportOptions& report, Console& console, const std::string& answer) {
  if (report.output.empty()) {
    console.out << answer << std::flush;
    if (!console.out) throw CommandError(ExitCode::kCannotWrite, "standard output cannot be written");
    return;
  }
  writeOutputFile(report.output, answer);
}

}  // namespace quazor
