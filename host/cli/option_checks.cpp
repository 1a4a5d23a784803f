#include "host/cli/option_checks.h"

#include "base/text/nearest_name.h"
#include "contract/message_format.h"
#include "host/device/phone.h"
#include "host/error/exit_code.h"
#include "host/report/report_format.h"
#include "host/text/shell_word.h"
#include "host/text/table.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <cstddef>
#include <optional>
#include <string>
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
    // Records have the suffix of OCP reports.
    const std::string suggested = *other == Format::kOcp ? "a record or " + name : name;
    err << formatMessage("quazor: the %@ report goes to '%@', whose suffix suggests %@", nameOf(output.format),
                         printable(output.file.string()), suggested);
    if (writesSeveralFormats(options.command)) {
      const std::string file = output.file.string();
      err << "; for that, use ";
      if (*other == Format::kOcp) err << "--record " << printable(shellWord(file)) << " or ";
      err << "--output " << printable(shellWord(formatMessage("%@:%@", name, file)));
    } else if (*other == Format::kText || *other == Format::kJson) {
      err << "; for that, use --format " << name;
    }
    err << '\n';
  }
}

void checkNames(const Options& options, const std::string& what) {
  if (!options.onlyFailed && !options.failedOf.empty()) {
    throw CommandError(ExitCode::kUsage, "--of requires --only failed");
  }
  const int ways = (options.names.empty() ? 0 : 1) + (options.all ? 1 : 0) + (options.onlyFailed ? 1 : 0);
  if (ways == 0) {
    throw CommandError(ExitCode::kUsage,
                       "name the " + what + " to run, or use --all; 'quazor list' shows what is available");
  }
  if (ways > 1 && !options.onlyFailed)
    throw CommandError(ExitCode::kUsage, "use either names of " + what + " or --all, not both");
  if (ways > 1) throw CommandError(ExitCode::kUsage, "--only failed cannot be combined with names or --all");
}

namespace {

// Like unknownOptionIn(), for what stands in front of the command.
std::string unknownOptionOfProgram(const std::string& argument) {
  const std::vector<std::string> known = {"--help", "--version"};
  const std::string option = argument.substr(0, argument.find('='));
  if (option == "--" || std::find(known.begin(), known.end(), option) != known.end()) return {};
  const std::string suggestion = didYouMean(option, known);
  return "unknown option '" + option + "'" +
         (suggestion.empty() ? "; options follow the command, as in 'quazor run --all'" : suggestion);
}

}  // namespace

std::string unknownOptionIn(const std::vector<std::string>& arguments) {
  if (arguments.front().starts_with("--")) return unknownOptionOfProgram(arguments.front());
  const std::vector<OptionSummary> options = optionsOfCommand(arguments.front());
  if (options.empty()) return {};
  std::vector<std::string> names;
  names.reserve(options.size());
  for (const OptionSummary& one : options) names.push_back(one.name);
  for (std::size_t i = 1; i < arguments.size() && arguments[i] != "--"; ++i) {
    if (!arguments[i].starts_with("--")) continue;
    const std::string name = arguments[i].substr(0, arguments[i].find('='));
    const auto known =
        std::find_if(options.begin(), options.end(), [&name](const OptionSummary& one) { return one.name == name; });
    if (known == options.end()) return "unknown option '" + name + "'" + didYouMean(name, names);
    if (known->takesValue && name == arguments[i]) ++i;
  }
  return {};
}

}  // namespace quazor
