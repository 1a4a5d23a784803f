#include "host/cli/command_line.h"

#include "base/text/name_list.h"
#include "contract/contract.h"
#include "host/cli/help_texts.h"
#include "host/cli/option_checks.h"
#include "host/cli/option_values.h"
#include "host/device/phone.h"
#include "host/text/table.h"
#include "host/text/terminal.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <charconv>
#include <memory>
#include <system_error>
#include <utility>

namespace quazor {

namespace {

// Arguments as CLI11 collects them, before validation.
struct RawOptions {
  std::vector<std::string> names;
  std::vector<std::string> plugins;
  std::vector<std::string> settings;
  std::vector<std::string> limits;
  std::vector<std::string> tags;
  std::vector<std::string> parameterFiles;
  std::vector<std::string> records;
  std::vector<std::string> outputs;
  std::vector<std::string> deadlines;
  std::string profile;
  std::string phone;
  std::string record;
  std::string only;
  std::string of;
  std::string seed = "0";
  std::string seeds = "3";
  std::string memory;
  std::string grace;
  std::string heartbeat = "30";
  std::string what;
  std::string logLevel;
  std::string logLimit;
  std::string trace = "frames";
  std::string format = "text";
  ChoiceTexts choice;
  ReportCommandTexts report;
  RecordsCommandTexts ofStore;
  std::string store;
  bool all = false;
  bool replace = false;
  bool realTime = false;
  bool systemLog = false;
  bool inProcess = false;
  bool verbose = false;
};

void addRepeatable(CLI::App& command, const std::string& name, std::vector<std::string>& texts,
                   const std::string& description, const std::string& form) {
  // Each occurrence takes one value; the next argument is the name of a diagnostic.
  command.add_option(name, texts, description)->allow_extra_args(false)->type_name(form);
}

void addNames(CLI::App& command, std::vector<std::string>& names, const std::string& whose) {
  command.add_option("NAME", names, whose + " name, or a pattern (*, ?, [...]) for several")->type_name("");
}

// CLI11 reads an argument in brackets as a list. A leading mark keeps such an argument a pattern. An argument that
// begins with the mark gets another.
constexpr char kMark = '\x01';

std::vector<std::string> marked(std::vector<std::string> arguments) {
  for (std::string& argument : arguments) {
    const bool isList = argument.starts_with('[') && argument.ends_with(']');
    if (isList || argument.starts_with(kMark)) argument.insert(argument.begin(), kMark);
  }
  return arguments;
}

// The text of an error that may quote marked arguments.
std::string withoutMarks(std::string text) {
  for (std::size_t at = text.find(kMark); at != std::string::npos; at = text.find(kMark, at + 1)) text.erase(at, 1);
  return text;
}

void removeMarks(RawOptions& raw) {
  const auto removeMark = [](std::string& text) {
    if (text.starts_with(kMark)) text.erase(0, 1);
  };
  for (std::vector<std::string>* texts :
       {&raw.names, &raw.plugins, &raw.settings, &raw.limits, &raw.tags, &raw.parameterFiles, &raw.records,
        &raw.outputs, &raw.deadlines, &raw.choice.except, &raw.choice.skips}) {
    std::for_each(texts->begin(), texts->end(), removeMark);
  }
  for (std::string* text : {&raw.profile, &raw.phone, &raw.record, &raw.of, &raw.seed, &raw.seeds, &raw.memory,
                            &raw.logLimit, &raw.trace, &raw.grace, &raw.choice.settle, &raw.choice.attempts,
                            &raw.choice.repetitions, &raw.report.from, &raw.report.to}) {
    removeMark(*text);
  }
  for (std::string* const text : textsOf(raw.ofStore)) removeMark(*text);
}

void addPlugins(CLI::App& command, RawOptions& raw) {
  addRepeatable(command, "--plugin", raw.plugins,
                "Load this plug-in instead of those in the folders of plug-ins: a file, or the name of one in these "
                "folders; repeatable. The environment variable QUAZOR_PLUGIN_PATH names more folders",
                "FILE|NAME");
}

void addOutput(CLI::App& command, RawOptions& raw) {
  addRepeatable(command, "--output", raw.outputs, "Write the report to this file", "FILE");
}

void addReportOptions(CLI::App& command, RawOptions& raw, const std::vector<std::string>& formats) {
  command.add_option("--format", raw.format, "Report format: " + listText(formats))
      ->type_name("FORMAT")
      ->check(CLI::IsMember(formats).description(""));
  if (formats.size() <= 2) return addOutput(command, raw);
  addRepeatable(command, "--output", raw.outputs,
                "Write the report to this file. FORMAT:FILE writes an additional report; repeatable", "[FORMAT:]FILE");
}

void addProcessOptions(CLI::App& command, RawOptions& raw) {
  command.add_flag(
      "--in-process", raw.inProcess,
      "Load plug-ins into the quazor process, for use with a debugger. Deadlines are off, and a crash in a "
      "plug-in ends quazor");
  addRepeatable(
      command, "--deadline", raw.deadlines,
      "Time limit for one stage (load, describe, setup, run, teardown, analyze), or for every stage; repeatable",
      "[STAGE=]SECONDS");
  command.add_option("--memory", raw.memory, "Memory limit for each plug-in process; default 4096")
      ->type_name("MEBIBYTES|none");
}

void addGrace(CLI::App& command, RawOptions& raw) {
  command
      .add_option("--grace", raw.grace,
                  "How long a setup or run may still take after an interrupt, before its teardown; default 5")
      ->type_name("SECONDS");
}

void addParameterOptions(CLI::App& command, RawOptions& raw) {
  // A record has the values of the default profile of its run.
  const bool isAnalysis = command.get_name() == "analyze";
  command
      .add_option(
          "--profile", raw.profile,
          "Read parameter values and limits from this file or installed profile, for example strict (for 3 s)" +
              std::string(isAnalysis ? ". They count more than those of the record; without it, no profile is read"
                                     : ", instead of the default profile; 'none' skips it"))
      ->type_name("FILE|NAME");
  addRepeatable(command, "--parameters", raw.parameterFiles,
                "Read more parameter values and limits from this file or installed profile, in addition to --profile" +
                    std::string(isAnalysis ? "" : " or the default profile") + "; repeatable",
                "FILE|NAME");
  addRepeatable(command, "--set", raw.settings,
                "Set a parameter of every selected diagnostic that declares it; repeatable. The environment variable "
                "QUAZOR_SET holds settings in the same form, separated by spaces. Precedence, highest first: --set, "
                "QUAZOR_SET, --parameters, --profile",
                "[experiment.|analysis.]NAME=VALUE");
}

void addTags(CLI::App& command, RawOptions& raw) {
  addRepeatable(
      command, "--tag", raw.tags,
      "Keep this in the record and the reports, for example serial=C02X; repeatable. The environment variable "
      "QUAZOR_TAGS holds tags in the same form, separated by spaces",
      "KEY=VALUE");
}

void addVerbose(CLI::App& command, RawOptions& raw) {
  command.add_flag("--verbose", raw.verbose,
                   "Show every result in text reports, not only those that fail, warn or have a limit of your own");
}

void addLimits(CLI::App& command, RawOptions& raw) {
  addRepeatable(command, "--limit", raw.limits,
                "Also judge results by this limit, such as 'BackTele.Total >= 90', '*.FrameOffset in [-2, 2]' or "
                "'A.Total == B.Total +- 1'; repeatable. It cannot relax a diagnostic's own limits; an analysis has it "
                "in place of the record's on the same results",
                "[DIAGNOSTIC:]RESULT OP NUMBER [UNIT] [+- TOLERANCE]");
}

void addLogOptions(CLI::App& command, RawOptions& raw) {
  command
      .add_option("--log-level", raw.logLevel,
                  "Print log lines up to this level (error, default, debug) to standard error and include them in "
                  "reports. Without this option, errors are printed and reports include default")
      ->type_name("LEVEL")
      ->check(CLI::IsMember({"error", "default", "debug"}).description(""));
  addLogLimit(command, raw.logLimit);
  command.add_flag("--system-log", raw.systemLog,
                   "Also send log lines to the systemd journal, or to syslog if there is no journal");
}

void addRecord(CLI::App& command, RawOptions& raw) {
  command
      .add_option(
          "--record", raw.record,
          "Record every event of the run in this new file as it happens, or in one of its own in the folder DIR")
      ->type_name("FILE|DIR/");
  command.add_flag("--replace", raw.replace, "Replace the file of --record if it exists");
}

void addRunOptions(CLI::App& command, RawOptions& raw, const std::string& what) {
  command.add_flag("--all", raw.all, "Run all " + what);
  addChoiceOptions(command, raw.choice, what);
  command
      .add_option("--phone", raw.phone,
                  "Device under test: a scenario file for a simulated phone, or linux: and a binding file for this "
                  "machine. The name of an installed scenario or binding works too")
      ->type_name("[linux:]FILE");
  command.add_flag("--realtime", raw.realTime, "Run the simulated phone in real time");
  command.add_option("--seed", raw.seed, "Seed for the order of simultaneous events; default 0")->type_name("N");
  addRecord(command, raw);
  addTrace(command, raw.trace);
  addLogOptions(command, raw);
}

void addRecords(CLI::App& command, RawOptions& raw, int least, int most, const std::string& what) {
  command.add_option("RECORD", raw.records, what)->type_name("")->required()->expected(least, most);
}

Command commandOf(const std::string& name) {
  const auto found = std::find(std::begin(kCommandNames), std::end(kCommandNames), name);
  return static_cast<Command>(found - std::begin(kCommandNames));
}

ReportOptions reportOf(const RawOptions& raw, bool isOfRun) {
  ReportOptions report;
  report.format = *formatNamed(raw.format);
  for (const std::string& text : raw.outputs) {
    OutputRequest output = isOfRun ? parseOutput(text, report.format) : OutputRequest{report.format, text};
    refuseNoFile(text, output);
    if (output.file != text) {
      report.outputs.push_back(std::move(output));
    } else if (report.output.empty()) {
      report.output = output.file;
    } else {
      throw CommandError(ExitCode::kUsage,
                         "--output '" + report.output.string() + "' and --output '" + text +
                             (isOfRun ? "': name the format of each additional report, as in --output junit:FILE"
                                      : "': this command writes only one file"));
    }
  }
  return report;
}

// "list" and the phones to list, or "probe".
std::vector<std::string> namesOfPhoneCommand(const CLI::App& command, const RawOptions& raw) {
  if (raw.what == "probe" && !raw.names.empty())
    throw CommandError(ExitCode::kUsage, "'quazor phone probe' takes no name, but got '" + raw.names.front() + "'");
  if (raw.what == "probe" && command.get_option("--format")->count() > 0) {
    throw CommandError(ExitCode::kUsage, "--format applies only to 'quazor phone list'; a binding is JSON");
  }
  std::vector<std::string> names = raw.names;
  names.insert(names.begin(), raw.what);
  return names;
}

Options optionsOf(const CLI::App& command, const RawOptions& raw) {
  for (const char* option : {"--plugin", "--output", "--profile", "--parameters", "--phone",  "--record", "--of",
                             "RECORD",   "FOLDER",   "--memory",  "--log-limit",  "--trace",  "--grace",  "--heartbeat",
                             "--settle", "--except", "--skip",    "--attempts",   "--repeat", "--from",   "--to"}) {
    refuseEmpty(command, option);
  }
  Options options;
  options.command = commandOf(command.get_name());
  options.names = raw.names;
  if (options.command == Command::kPhone) options.names = namesOfPhoneCommand(command, raw);
  options.all = raw.all;
  options.plugins.assign(raw.plugins.begin(), raw.plugins.end());
  options.parameterFiles.assign(raw.parameterFiles.begin(), raw.parameterFiles.end());
  options.records.assign(raw.records.begin(), raw.records.end());
  options.record = raw.record;
  options.replace = raw.replace;
  if (raw.replace && raw.record.empty()) throw CommandError(ExitCode::kUsage, "--replace requires --record");
  options.onlyFailed = raw.only == "failed";
  options.failedOf = raw.of;
  options.phone = raw.phone;
  checkPhone(command, options.phone);
  options.realTime = raw.realTime;
  options.choice = choiceOf(raw.choice);
  if (options.command == Command::kReport) options.ofRecords = recordReportOf(raw.report, raw.records);
  if (options.command == Command::kRecords) options.ofStore = recordsRequestOf(raw.ofStore);
  options.store = storeOf(raw.store, options.record);
  options.inProcess = raw.inProcess;
  options.seed = parseWhole("--seed", raw.seed, 0, UINT64_MAX);
  if (const CLI::Option* const seed = command.get_option_no_throw("--seed")) options.hasSeed = seed->count() > 0;
  options.seeds = parseWhole("--seeds", raw.seeds, 1, 1'000'000);
  options.memory = memoryOf(raw.memory);
  for (const std::string& text : raw.settings) options.settings.push_back(parseOverride(text));
  options.limits = limitsOfCommandLine(raw.limits);
  for (const std::string& text : raw.deadlines) options.deadlines.push_back(parseDeadline(text));
  if (!raw.grace.empty()) options.grace = parseGrace(raw.grace);
  if (command.get_option_no_throw("--heartbeat") != nullptr) options.heartbeat = parseHeartbeat(raw.heartbeat);
  options.logLevel = logLevelOf(raw.logLevel);
  options.logLimit = logLimitOf(raw.logLimit);
  if (command.get_option_no_throw("--trace") != nullptr) options.trace = traceOf(raw.trace);
  options.systemLog = raw.systemLog;
  if (command.get_option_no_throw("--tag") != nullptr) {
    options.tags = tagsOf(raw.tags, options.command != Command::kAnalyze);  // those of the record are kept
  }
  options.report = reportOf(raw, writesSeveralFormats(options.command));
  if (options.command == Command::kReport) options.report.format = formatOf(options.ofRecords);
  options.report.exitRules.allowSkips = options.choice.allowSkips;
  options.report.text.verbose = raw.verbose;
  options.report.shownLog = options.logLevel.value_or(LogLevel::kError);
  options.withoutProfile = raw.profile == "none";
  if (!options.withoutProfile) options.profile = raw.profile;
  if (options.command == Command::kRun) checkNames(options, "diagnostics");
  if (options.command == Command::kExperiment) checkNames(options, "experiments");
  return options;
}

void declareLookingCommands(CLI::App& app, RawOptions& raw) {
  CLI::App& list = *app.add_subcommand("list", "List diagnostics, and experiments that no diagnostic uses");
  addNames(list, raw.names, "A diagnostic's or experiment's");
  addPlugins(list, raw);
  addReportOptions(list, raw, {"text", "json"});
  addProcessOptions(list, raw);
  CLI::App& describe = *app.add_subcommand("describe", "Describe diagnostics or experiments and their parameters");
  addNames(describe, raw.names, "A diagnostic's or experiment's");
  describe.get_option("NAME")->required();
  addPlugins(describe, raw);
  addReportOptions(describe, raw, {"text", "json"});
  addParameterOptions(describe, raw);
  addProcessOptions(describe, raw);
}

void declareRunningCommands(CLI::App& app, RawOptions& raw) {
  const std::vector<std::string> formats = formatNames();
  CLI::App& run = *app.add_subcommand("run", "Run diagnostics: measure, then compare the results with their limits");
  addNames(run, raw.names, "A diagnostic's");
  run.add_option("--only", raw.only,
                 "failed: rerun the diagnostics that did not pass in the last run, or in the record given with --of, "
                 "with the same settings, seed and tags. After --repeat or --attempts, the seed is that of the first "
                 "entry that did not pass")
      ->type_name("failed")
      ->check(CLI::IsMember({"failed"}).description(""));
  run.add_option("--of", raw.of, "The record that --only refers to")->type_name("RECORD");
  addRunOptions(run, raw, "diagnostics");
  addStore(run, raw.store);
  CLI::App& experiment = *app.add_subcommand("experiment", "Run experiments only: measure without judging");
  addNames(experiment, raw.names, "An experiment's");
  addRunOptions(experiment, raw, "experiments");
  CLI::App& analyze =
      *app.add_subcommand("analyze", "Analyze the measurements in a record again and judge the new results");
  addRecords(analyze, raw, 1, 1, "The record");
  addRecord(analyze, raw);
  addLogOptions(analyze, raw);
  for (CLI::App* const command : {&run, &experiment}) addGrace(*command, raw);
  for (CLI::App* const command : {&run, &experiment, &analyze}) {
    addPlugins(*command, raw);
    addReportOptions(*command, raw, formats);
    addParameterOptions(*command, raw);
    addProcessOptions(*command, raw);
    addHeartbeat(*command, raw.heartbeat);
    addTags(*command, raw);
  }
  for (CLI::App* const command : {&run, &analyze}) {
    addLimits(*command, raw);
    addVerbose(*command, raw);
  }
}

void declareOtherCommands(CLI::App& app, RawOptions& raw) {
  CLI::App& verify = *app.add_subcommand("verify", "Check that the verdicts in records follow from their data");
  addRecords(verify, raw, 1, CLI::detail::expected_max_vector_size, "The records, or folders of them");
  CLI::App& diff = *app.add_subcommand("diff", "Show the differences between two records");
  addRecords(diff, raw, 2, 2, "The two records");
  CLI::App& report = *app.add_subcommand("report", "Make a page of records for people, or a time line of one");
  addRecords(report, raw, 1, CLI::detail::expected_max_vector_size, "The records, or folders of them");
  addReportCommandOptions(report, raw.report);
  addOutput(report, raw);
  addOutput(declareRecordsCommand(app, raw.ofStore, raw.format), raw);
  CLI::App& explain = *app.add_subcommand("explain", "Explain an error, a diagnostic or a result, and what to do next");
  explain
      .add_option("WHAT", raw.names,
                  "Name of a diagnostic or result, or CODE or DOMAIN:CODE of an error; omit to list all titles")
      ->type_name("");
  addReportOptions(explain, raw, {"text", "json"});
  CLI::App& doctor =
      *app.add_subcommand("doctor",
                          "Check the installation: plug-ins, profile, phones, bindings, last record. With --plugin, "
                          "judge that plug-in instead: names, summaries, results, explanations, phones, cost");
  addPlugins(doctor, raw);
  addParameterOptions(doctor, raw);
  addProcessOptions(doctor, raw);
  CLI::App& selftest =
      *app.add_subcommand("selftest", "Run the diagnostics on phones with known faults and report which they detect");
  addNames(selftest, raw.names, "A phone's");
  selftest.add_option("--seeds", raw.seeds, "Number of seeds (event orders) to try on each phone; default 3")
      ->type_name("N");
  addPlugins(selftest, raw);
  addReportOptions(selftest, raw, {"text", "json"});
  addProcessOptions(selftest, raw);
  addGrace(selftest, raw);
  addLogLimit(selftest, raw.logLimit);
  CLI::App& phone =
      *app.add_subcommand("phone", "List the simulated phones, or find this machine's devices for a binding");
  phone.add_option("WHAT", raw.what, "list: the simulated phones that --phone accepts; probe: this machine's devices")
      ->type_name("list|probe")
      ->required()
      ->check(CLI::IsMember({"list", "probe"}).description(""));
  phone.add_option("PHONE", raw.names, "list: a phone's name, or a pattern (*, ?, [...]) for several")->type_name("");
  addReportOptions(phone, raw, {"text", "json"});
  CLI::App& completion = *app.add_subcommand("completion", "Print the completion script for bash or zsh");
  completion.add_option("SHELL", raw.names, "bash or zsh")
      ->type_name("")
      ->required()
      ->check(CLI::IsMember({"bash", "zsh"}).description(""));
  CLI::App& project = *app.add_subcommand("new", "Make the project of a plug-in, with a diagnostic, phones and a test");
  project.add_option("FOLDER", raw.names, "Where to make it; its last part is the plug-in's name")
      ->type_name("")
      ->required()
      ->expected(1);
}

// On a narrow terminal the description of an option is below it, with this indentation.
constexpr std::size_t kNarrow = 70;
constexpr std::size_t kNarrowColumn = 6;

void declareCommands(CLI::App& app, RawOptions& raw) {
  app.require_subcommand(1);
  app.footer(helpFooter());
  app.set_version_flag("--version",
                       "quazor " QUAZOR_VERSION ", plug-in contract " + std::to_string(QUAZOR_CONTRACT_VERSION));
  declareLookingCommands(app, raw);
  declareRunningCommands(app, raw);
  declareOtherCommands(app, raw);
  for (CLI::App* const command : app.get_subcommands({})) command->footer(helpFooter(command->get_name()));
}

}  // namespace

std::vector<OptionSummary> optionsOfCommand(const std::string& command) {
  CLI::App app;
  RawOptions raw;
  declareCommands(app, raw);
  std::vector<OptionSummary> options;
  const std::vector<CLI::App*> found =
      app.get_subcommands([&command](CLI::App* one) { return one->get_name() == command; });
  if (found.empty()) return options;
  for (const CLI::Option* const option : std::as_const(*found.front()).get_options()) {
    if (option->get_lnames().empty()) continue;  // positional
    options.push_back({"--" + option->get_lnames().front(), option->get_items_expected_max() > 0});
  }
  return options;
}

std::optional<Options> parseCommandLine(const std::vector<std::string>& given, std::ostream& out, std::ostream& err,
                                        ExitCode* code) {
  CLI::App app("Hardware diagnostics for a phone's cameras and sensors.", "quazor");
  RawOptions raw;
  const bool isNarrow = columnsOf(out) < kNarrow;
  if (isNarrow) app.get_formatter()->column_width(kNarrowColumn);
  declareCommands(app, raw);
  *code = ExitCode::kUsage;
  if (given.empty()) {
    err << app.help();
    return std::nullopt;
  }
  try {
    const std::vector<std::string> arguments = withHelpAsOption(given);
    refuseUnknownCommand(arguments);
    // CLI11 expects the arguments in reverse order.
    std::vector<std::string> texts = marked(arguments);
    std::reverse(texts.begin(), texts.end());
    app.parse(std::move(texts));
    removeMarks(raw);
    *code = ExitCode::kAllPassed;
    Options options = optionsOf(*app.get_subcommands().front(), raw);
    warnOfSuffixes(options, err);
    return options;
  } catch (const CLI::Success& answer) {
    app.exit(answer, out, err);
    *code = ExitCode::kAllPassed;
  } catch (const CLI::ParseError& refusal) {
    const std::string unknown = unknownOptionIn(given);
    err << "quazor: " << printable(unknown.empty() ? withoutMarks(refusal.what()) : unknown) << "\nRun '"
        << helpCommandFor(given) << "' for usage.\n";
    *code = ExitCode::kUsage;
  } catch (const CommandError& refusal) {
    err << "quazor: " << printable(refusal.what()) << '\n';
    *code = refusal.code();
  }
  return std::nullopt;
}

}  // namespace quazor
