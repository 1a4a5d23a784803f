#include "host/command_line.h"

#include "frame/contract.h"
#include "host/nearest_name.h"
#include "host/table.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <charconv>
#include <memory>
#include <system_error>
#include <utility>

namespace quazor {

namespace {

const std::vector<std::string> kCommands = {"list", "describe", "run", "experiment"};

constexpr const char* kExamples = R"(Examples:
  quazor list                                     what there is
  quazor describe 'CameraSync*'                   what the diagnostics do, and their parameters
  quazor run --all                                all of them, on the healthy phone
  quazor run CameraSyncDiagnostic.Back --set duration=10
  quazor run --all --phone my_phone.json --format json --output report.json
  quazor experiment CameraSyncExperiment.Back     what it measures, without judging it
)";

constexpr const char* kExitCodes = R"(Exit codes:
  0    all diagnostics passed, all experiments returned a result
  1    a diagnostic failed its limits
  2    a diagnostic or experiment ended in an error
  64   the command line is wrong
  66   a plug-in, scenario or profile cannot be read or loaded
  70   quazor itself failed
  73   the report cannot be written
  130  interrupted)";

// The texts of a command line as CLI11 collects them, before they are checked.
struct RawOptions {
  std::vector<std::string> names;
  std::vector<std::string> plugins;
  std::vector<std::string> settings;
  std::string profile;
  std::string phone;
  std::string seed = "0";
  std::string logLevel;
  std::string format = "text";
  std::string output;
  bool all = false;
  bool realTime = false;
  bool systemLog = false;
};

void addRepeatable(CLI::App& command, const std::string& name, std::vector<std::string>& texts,
                   const std::string& description, const std::string& form) {
  // One text each time: what follows it is a diagnostic's name.
  command.add_option(name, texts, description)->allow_extra_args(false)->type_name(form);
}

void addNames(CLI::App& command, std::vector<std::string>& names, const std::string& whose) {
  command.add_option("NAME", names, whose + " name, or a pattern (*, ?, [...]) for several")->type_name("");
}

// CLI11 takes a name that is all in brackets for a list of names; with a mark before it, it stays a pattern.
constexpr char kMark = '\x01';

std::vector<std::string> marked(std::vector<std::string> arguments) {
  for (std::string& argument : arguments) {
    if (argument.starts_with('[') && argument.ends_with(']')) argument.insert(argument.begin(), kMark);
  }
  return arguments;
}

void removeMarks(RawOptions& raw) {
  const auto removeMark = [](std::string& text) {
    if (text.starts_with(kMark)) text.erase(0, 1);
  };
  for (std::vector<std::string>* texts : {&raw.names, &raw.plugins, &raw.settings}) {
    std::for_each(texts->begin(), texts->end(), removeMark);
  }
  for (std::string* text : {&raw.profile, &raw.phone, &raw.seed, &raw.output}) removeMark(*text);
}

void addCommonOptions(CLI::App& command, RawOptions& raw, const std::string& formats) {
  addRepeatable(command, "--plugin", raw.plugins, "Load this plug-in, not the installed one; may be repeated", "FILE");
  command.add_option("--format", raw.format, "The form of the report: text (default)" + formats)
      ->type_name("FORMAT")
      ->check(CLI::IsMember({"text", "json", "csv"}));
  command.add_option("--output", raw.output, "Write the report to this file")->type_name("FILE");
}

void addParameterOptions(CLI::App& command, RawOptions& raw) {
  command.add_option("--profile", raw.profile, "Take parameter values from this file; none: from no file")
      ->type_name("FILE");
  addRepeatable(command, "--set", raw.settings, "Set a parameter, wherever it is declared; may be repeated",
                "[experiment.|analysis.]NAME=VALUE");
}

void addRunOptions(CLI::App& command, RawOptions& raw, const std::string& what) {
  command.add_flag("--all", raw.all, "Run all " + what);
  command
      .add_option("--phone", raw.phone, "Run on the phone of this scenario: a file, or the name of an installed one")
      ->type_name("FILE");
  command.add_flag("--realtime", raw.realTime, "Let the phone's time pass as real time does");
  command.add_option("--seed", raw.seed, "Choose the order of what happens at the same time; 0 by default")
      ->type_name("N");
  command
      .add_option("--log-level", raw.logLevel,
                  "Show log lines up to this level (error, default, debug) on the standard error stream, and keep them "
                  "in JSON; without it, error is shown and default kept")
      ->type_name("LEVEL")
      ->check(CLI::IsMember({"error", "default", "debug"}));
  command.add_flag("--system-log", raw.systemLog, "Send log lines to the system's log too");
}

std::uint64_t parseSeed(const std::string& text) {
  std::uint64_t seed = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), seed);
  if (error != std::errc() || end != text.data() + text.size()) {
    throw Refusal(ExitCode::kUsage, "--seed '" + text + "': it must be a whole number from 0 to 18446744073709551615");
  }
  return seed;
}

std::optional<LogLevel> logLevelOf(const std::string& text) {
  if (text == "error") return LogLevel::kError;
  if (text == "default") return LogLevel::kDefault;
  if (text == "debug") return LogLevel::kDebug;
  return std::nullopt;
}

// CLI11 takes an option with an empty text as one that was given; none of ours has a use for it.
void refuseEmpty(const CLI::App& command, const char* option) {
  const CLI::Option* const given = command.get_option_no_throw(option);
  if (given == nullptr) return;
  const std::vector<std::string>& texts = given->results();
  if (std::find(texts.begin(), texts.end(), std::string()) == texts.end()) return;
  throw Refusal(ExitCode::kUsage, std::string(option) + ": its value is empty");
}

Command commandOf(const std::string& name) {
  if (name == "describe") return Command::kDescribe;
  if (name == "run") return Command::kRun;
  return name == "experiment" ? Command::kExperiment : Command::kList;
}

Format formatOf(const std::string& command, const std::string& text) {
  if (text == "json") return Format::kJson;
  if (text == "text") return Format::kText;
  if (command == "experiment") return Format::kCsv;
  throw Refusal(ExitCode::kUsage,
                "--format csv is for 'quazor experiment'; '" + command + "' gives its report as text or json");
}

// Diagnostics or experiments: either names, or --all.
void checkNames(const Options& options, const std::string& what) {
  if (options.names.empty() && !options.all) {
    throw Refusal(ExitCode::kUsage, "name the " + what + " to run, or give --all; 'quazor list' shows what there is");
  }
  if (options.all && !options.names.empty()) {
    throw Refusal(ExitCode::kUsage, "give either names of " + what + " or --all");
  }
}

Options optionsOf(const CLI::App& command, const RawOptions& raw) {
  for (const char* option : {"--plugin", "--output", "--profile", "--phone"}) refuseEmpty(command, option);
  Options options;
  options.command = commandOf(command.get_name());
  options.names = raw.names;
  options.all = raw.all;
  options.plugins.assign(raw.plugins.begin(), raw.plugins.end());
  options.phone = raw.phone;
  options.realTime = raw.realTime;
  options.seed = parseSeed(raw.seed);
  for (const std::string& text : raw.settings) options.settings.push_back(parseSetting(text));
  options.logLevel = logLevelOf(raw.logLevel);
  options.systemLog = raw.systemLog;
  const bool ofExperiments = options.command == Command::kExperiment;
  options.report = {formatOf(command.get_name(), raw.format), raw.output, ofExperiments};
  options.withoutProfile = raw.profile == "none";
  if (!options.withoutProfile) options.profile = raw.profile;
  if (ofExperiments || options.command == Command::kRun) {
    checkNames(options, ofExperiments ? "experiments" : "diagnostics");
  }
  return options;
}

// A first word that is no command gets a better answer than CLI11's.
void refuseUnknownCommand(const std::vector<std::string>& arguments) {
  if (arguments.empty() || arguments.front().starts_with('-')) return;
  const std::string& word = arguments.front();
  if (std::find(kCommands.begin(), kCommands.end(), word) != kCommands.end()) return;
  throw Refusal(ExitCode::kUsage, "there is no command '" + word + "'" + didYouMean(word, kCommands) +
                                      "; the commands are list, describe, run, experiment");
}

void declareCommands(CLI::App& app, RawOptions& raw) {
  app.require_subcommand(1);
  app.footer(std::string(kExamples) + "\n" + kExitCodes);
  app.set_version_flag("--version",
                       "quazor " QUAZOR_VERSION ", plug-in contract " + std::to_string(QUAZOR_CONTRACT_VERSION));
  CLI::App& list = *app.add_subcommand("list", "List the diagnostics, and the experiments that none of them uses");
  addCommonOptions(list, raw, " or json");
  CLI::App& describe = *app.add_subcommand("describe", "Describe diagnostics or experiments, and their parameters");
  addNames(describe, raw.names, "A diagnostic's or experiment's");
  describe.get_option("NAME")->required();
  addCommonOptions(describe, raw, " or json");
  addParameterOptions(describe, raw);
  CLI::App& run = *app.add_subcommand("run", "Run diagnostics: measure, and judge by limits");
  addNames(run, raw.names, "A diagnostic's");
  addRunOptions(run, raw, "diagnostics");
  addCommonOptions(run, raw, " or json");
  addParameterOptions(run, raw);
  CLI::App& experiment = *app.add_subcommand("experiment", "Run experiments alone: measure, and judge nothing");
  addNames(experiment, raw.names, "An experiment's");
  addRunOptions(experiment, raw, "experiments");
  addCommonOptions(experiment, raw, ", json or csv");
  addParameterOptions(experiment, raw);
}

}  // namespace

std::optional<Options> parseCommandLine(const std::vector<std::string>& arguments, std::ostream& out, std::ostream& err,
                                        ExitCode* code) {
  CLI::App app("Hardware diagnostics for a phone's cameras and sensors.", "quazor");
  RawOptions raw;
  declareCommands(app, raw);
  *code = ExitCode::kUsage;
  if (arguments.empty()) {
    err << app.help();
    return std::nullopt;
  }
  try {
    refuseUnknownCommand(arguments);
    // CLI11 takes them from the back.
    std::vector<std::string> texts = marked(arguments);
    std::reverse(texts.begin(), texts.end());
    app.parse(std::move(texts));
    removeMarks(raw);
    *code = ExitCode::kAllPassed;
    return optionsOf(*app.get_subcommands().front(), raw);
  } catch (const CLI::Success& answer) {
    app.exit(answer, out, err);
    *code = ExitCode::kAllPassed;
  } catch (const CLI::ParseError& refusal) {
    err << "quazor: " << printable(refusal.what()) << "\nquazor --help shows how to call it.\n";
    *code = ExitCode::kUsage;
  } catch (const Refusal& refusal) {
    err << "quazor: " << printable(refusal.what()) << '\n';
    *code = refusal.code();
  }
  return std::nullopt;
}

}  // namespace quazor
