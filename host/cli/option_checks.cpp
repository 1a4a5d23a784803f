#include "host/cli/option_checks.h"

#include "contract/message_format.h"
#include "host/device/phone.h"
#include "host/error/exit_code.h"
#include "host/report/report_format.h"
#include "host/text/shell_word.h"
#include "host/text/table.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <optional>
#include <vector>

namespace quazor {

void refuseEmpty(const CLI::App& command, const char* option) {
  const CLI::Option* const given = command.get_option_no_throw(option);
  if (given == nullptr) return;
  const std::vector<std::string>& texts = given->results();
  if (std::find(texts.begin(), texts.end(), std::string()) == texts.end()) return;
  throw CommandError(ExitCode::kUsage, std::string(option) + ": the value is empty");
}

void checkPhone(const CLI::App& command, const std::filesystem::path& phone) {
  const std::optional<std::filesystem::path> binding = bindingNamed(phone);
  if (!binding) return;
  if (binding->empty())
    throw CommandError(ExitCode::kUsage, "--phone 'linux:': the name or file of the binding is missing");
  for (const char* option : {"--seed", "--realtime"}) {
    if (command.get_option(option)->count() == 0) continue;
    throw CommandError(ExitCode::kUsage, std::string(option) + " applies only to simulated phones; --phone '" +
                                             phone.string() + "' is this machine, which always runs in real time");
  }
}

void warnOfSuffixes(const Options& options, std::ostream& err) {
  if (options.command == Command::kPhone && options.names.front() == "probe") return;
  std::vector<OutputRequest> outputs = options.report.outputs;
  outputs.insert(outputs.begin(), {options.report.format, options.report.output});
  for (const OutputRequest& output : outputs) {
    const std::optional<Format> other = otherFormatOfSuffix(output);
    if (!other) continue;
    const std::string name(nameOf(*other));
    err << formatMessage("quazor: the %@ report goes to '%@', whose suffix suggests %@", nameOf(output.format),
                         printable(output.file.string()), name);
    if (writesSeveralFormats(options.command)) {
      err << "; for that, use --output " << printable(shellWord(name + ":" + output.file.string()));
    } else if (*other == Format::kText || *other == Format::kJson) {
      err << "; for that, use --format " << name;
    }
    err << '\n';
  }
}

void checkNames(const Options& options, const std::string& what) {
  const int ways = (options.names.empty() ? 0 : 1) + (options.all ? 1 : 0) + (options.onlyFailed ? 1 : 0);
  if (ways == 0) {
    throw CommandError(ExitCode::kUsage,
                       "name the " + what + " to run, or use --all; 'quazor list' shows what is available");
  }
  if (ways > 1 && !options.onlyFailed)
    throw CommandError(ExitCode::kUsage, "use either names of " + what + " or --all, not both");
  if (ways > 1) throw CommandError(ExitCode::kUsage, "--only failed cannot be combined with names or --all");
  if (!options.onlyFailed && !options.failedOf.empty()) {
    throw CommandError(ExitCode::kUsage, "--of requires --only failed");
  }
}

}  // namespace quazor
