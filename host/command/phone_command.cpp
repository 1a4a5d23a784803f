#include "host/command/commands.h"

#include "host/command/selection.h"
#include "host/device/phone.h"
#include "host/record/value_json.h"
#include "host/text/table.h"

#include <nlohmann/json.hpp>

#include <filesystem>
#include <string>
#include <utility>
#include <vector>

namespace quazor {

namespace {

// A phone that `--phone NAME` accepts.
struct ListedPhone {
  std::string name;
  std::string title;
  std::string from;
  std::filesystem::path file;
};

// "installed", "yours" for the user's own, "file" for one that was named by its path.
std::string originOf(const std::filesystem::path& file, const std::string& name, const Installation& installation) {
  if (file == std::filesystem::path(name)) return "file";
  const std::string folder = installation.defaultScenario().parent_path().string() + "/";
  return file.string().starts_with(folder) ? "installed" : "yours";
}

nlohmann::ordered_json documentOf(const std::vector<ListedPhone>& phones) {
  nlohmann::ordered_json list = nlohmann::ordered_json::array();
  for (const ListedPhone& one : phones) {
    list.push_back({{"name", one.name}, {"title", one.title}, {"from", one.from}, {"file", one.file.string()}});
  }
  return {{"schema", 1}, {"phones", std::move(list)}};
}

void printPhones(std::ostream& out, const std::vector<ListedPhone>& phones) {
  Table table({Table::Align::kLeft, Table::Align::kLeft, Table::Align::kLeft});
  table.addHeader({"Phone", "From", "Title"});
  for (const ListedPhone& one : phones) table.addRow({printable(one.name), one.from, printable(one.title)});
  if (!phones.empty()) table.print(out, "");
}

// A scenario that cannot be read does not hide the others.
ExitCode listPhones(const Options& options, const Installation& installation, Console& console) {
  const std::vector<std::string> patterns(options.names.begin() + 1, options.names.end());
  std::vector<ListedPhone> phones;
  ExitCode code = ExitCode::kAllPassed;
  for (const std::string& name : wantedScenarios(patterns, installation)) {
    const std::filesystem::path file = installation.scenario(name);
    try {
      std::string title = summaryOfScenario(file, installation.scenarioSource()).title;
      phones.push_back({name, std::move(title), originOf(file, name, installation), file});
    } catch (const InputError& problem) {
      console.err << "quazor: " << printable(name) << ": " << printable(problem.what()) << '\n';
      code = ExitCode::kCannotRead;
    }
  }
  std::ostringstream text = textFor(options.report, console);
  if (options.report.format == Format::kJson) {
    text << documentText(documentOf(phones));
  } else {
    printPhones(text, phones);
  }
  writeOutput(options.report, console, text.str());
  return code;
}

ExitCode probePhone(const Options& options, Console& console) {
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

}  // namespace

ExitCode phoneCommand(const Options& options, const Installation& installation, Console& console) {
  return options.names.front() == "probe" ? probePhone(options, console) : listPhones(options, installation, console);
}

}  // namespace quazor
