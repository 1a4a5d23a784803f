#include "host/command/commands.h"

#include "host/device/phone.h"
#include "host/text/table.h"

namespace quazor {

ExitCode phoneCommand(const Options& options, Console& console) {
  const PhoneProbe probe = probeThisMachine();
  for (const std::string& line : probe.lines) console.out << printable(line) << '\n';
  if (options.report.output.empty()) {
    console.out << "\nStarter binding: save it, set which camera is which, and run with --phone linux:FILE.\n\n";
  }
  ReportOptions binding = options.report;
  binding.format = Format::kJson;
  writeOutput(binding, console, probe.binding);
  if (!options.report.output.empty()) {
    console.out << "\nThe starter binding is in " << printable(options.report.output.string())
                << ": set which camera is which, and run with --phone linux:FILE.\n";
  }
  console.out.flush();
  return ExitCode::kAllPassed;
}

}  // namespace quazor
