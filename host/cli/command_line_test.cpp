#include "host/cli/command_line.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <iterator>
#include <sstream>

namespace quazor {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;

struct Parsed {
  std::optional<Options> options;
  ExitCode code = ExitCode::kInternal;
  std::string out;
  std::string err;
};

// The words of a line, between its blanks.
std::vector<std::string> wordsOf(const std::string& line) {
  std::istringstream in(line);
  return {std::istream_iterator<std::string>(in), {}};
}

Parsed parse(const std::vector<std::string>& arguments) {
  Parsed parsed;
  std::ostringstream out;
  std::ostringstream err;
  parsed.options = parseCommandLine(arguments, out, err, &parsed.code);
  parsed.out = out.str();
  parsed.err = err.str();
  return parsed;
}

TEST(ParseCommandLine, KnowsItsDefaults) {
  const std::optional<Options> options = parse({"run", "A"}).options;
  ASSERT_TRUE(options);
  EXPECT_EQ(options->command, Command::kRun);
  EXPECT_THAT(options->names, ElementsAre("A"));
  EXPECT_FALSE(options->all);
  EXPECT_THAT(options->plugins, ElementsAre());
  EXPECT_EQ(options->phone, "");
  EXPECT_FALSE(options->realTime);
  EXPECT_EQ(options->seed, 0U);
  EXPECT_TRUE(options->settings.empty());
  EXPECT_EQ(options->logLevel, std::nullopt);
  EXPECT_FALSE(options->systemLog);
  EXPECT_EQ(options->report.format, Format::kText);
  EXPECT_EQ(options->report.output, "");
  EXPECT_EQ(options->profile, "");
  EXPECT_FALSE(options->withoutProfile);
  EXPECT_TRUE(options->parameterFiles.empty());
  EXPECT_TRUE(options->records.empty());
  EXPECT_EQ(options->record, "");
  EXPECT_FALSE(options->onlyFailed);
  EXPECT_EQ(options->failedOf, "");
  EXPECT_TRUE(options->report.outputs.empty());
  EXPECT_EQ(options->report.shownLog, LogLevel::kError);
  EXPECT_TRUE(options->deadlines.empty());
#if !defined(QUAZOR_ADDRESS_SANITIZER) && !defined(QUAZOR_THREAD_SANITIZER)
  EXPECT_EQ(options->memory, std::uint64_t{4096} * 1024 * 1024);
#endif
  EXPECT_EQ(options->logLimit.lines, 1'000'000U);
  EXPECT_EQ(options->logLimit.bytes, std::uint64_t{64} * 1024 * 1024);
  EXPECT_FALSE(options->inProcess);
}

TEST(ParseCommandLine, ReadsEveryOption) {
  const std::optional<Options> options =
      parse(wordsOf("run --plugin a.so A --plugin b.so --phone p --realtime --seed 18446744073709551615 --set x=1 B "
                    "--set=analysis.y=2 --log-level debug "
                    "--system-log --format json --output o --profile f --parameters g --parameters=h --record r "
                    "--output junit:j --output csv:c --deadline run=5 --deadline 7 --memory 256 --in-process"))
          .options;
  ASSERT_TRUE(options);
  EXPECT_THAT(options->names, ElementsAre("A", "B"));
  EXPECT_THAT(options->plugins, ElementsAre("a.so", "b.so"));
  EXPECT_EQ(options->phone, "p");
  EXPECT_TRUE(options->realTime);
  EXPECT_EQ(options->seed, UINT64_MAX);
  ASSERT_EQ(options->settings.size(), 2U);
  EXPECT_EQ(options->settings[1].part, Part::kAnalysis);
  EXPECT_EQ(options->logLevel, LogLevel::kDebug);
  EXPECT_TRUE(options->systemLog);
  EXPECT_EQ(options->report.shownLog, LogLevel::kDebug);
  EXPECT_EQ(options->report.format, Format::kJson);
  EXPECT_EQ(options->report.output, "o");
  ASSERT_EQ(options->report.outputs.size(), 2U);
  EXPECT_EQ(options->report.outputs[0].format, Format::kJunit);
  EXPECT_EQ(options->report.outputs[0].file, "j");
  EXPECT_EQ(options->report.outputs[1].format, Format::kCsv);
  EXPECT_EQ(options->profile, "f");
  EXPECT_THAT(options->parameterFiles, ElementsAre("g", "h"));
  EXPECT_EQ(options->record, "r");
  ASSERT_EQ(options->deadlines.size(), 2U);
  EXPECT_EQ(options->deadlines[0].stage, Stage::kRun);
  EXPECT_EQ(options->deadlines[1].stage, std::nullopt);
  EXPECT_EQ(options->memory, std::uint64_t{256} * 1024 * 1024);
  EXPECT_TRUE(options->inProcess);
}

TEST(ParseCommandLine, ReadsHowMuchMemoryThereIs) {
  EXPECT_EQ(parse({"run", "A", "--memory", "none"}).options->memory, std::nullopt);
  EXPECT_EQ(parse({"list", "--memory", "1"}).options->memory, std::uint64_t{1024} * 1024);
  EXPECT_EQ(parse({"run", "A", "--memory", "17592186044415"}).options->memory, UINT64_MAX - 1024 * 1024 + 1);
}

TEST(ParseCommandLine, ReadsWhichFramesAreRecorded) {
  EXPECT_FALSE(parse({"run", "A", "--trace", "off"}).options->trace.isOn);
  EXPECT_EQ(parse({"run", "A"}).options->trace.framesPerStep, 100'000U);
  EXPECT_EQ(parse({"experiment", "E", "--trace", "frames"}).options->trace.framesPerStep, 100'000U);
  EXPECT_EQ(parse({"run", "A", "--trace", "frames=7"}).options->trace.framesPerStep, 7U);
  EXPECT_EQ(parse({"run", "A", "--trace", "frames=all"}).options->trace.framesPerStep, 0U);
  EXPECT_TRUE(parse({"run", "A", "--trace", "frames=all"}).options->trace.isOn);
  EXPECT_FALSE(parse({"run", "A", "--trace", "frames=all"}).options->trace.tasks);
  EXPECT_TRUE(parse({"run", "A", "--trace", "queues"}).options->trace.isOn);
  EXPECT_TRUE(parse({"run", "A", "--trace", "queues"}).options->trace.tasks);
  EXPECT_FALSE(parse({"analyze", "r"}).options->trace.isOn);
}

TEST(ParseCommandLine, ReadsHowMuchOfTheLogIsKept) {
  const auto limitOf = [](const std::string& text) {
    return parse({"run", "A", "--log-limit", text}).options->logLimit;
  };
  EXPECT_EQ(limitOf("none").lines, UINT64_MAX);
  EXPECT_EQ(limitOf("none").bytes, UINT64_MAX);
  EXPECT_EQ(limitOf("5").lines, 5U);
  EXPECT_EQ(limitOf("5").bytes, LogLimit().bytes);
  EXPECT_EQ(limitOf("1000000000,1048576").lines, 1'000'000'000U);
  EXPECT_EQ(limitOf("1000000000,1048576").bytes, std::uint64_t{1} << 40U);
  EXPECT_EQ(parse({"analyze", "r", "--log-limit", "7"}).options->logLimit.lines, 7U);
  EXPECT_EQ(parse({"experiment", "E", "--log-limit", "7"}).options->logLimit.lines, 7U);
}

TEST(ParseCommandLine, ReadsTheOptionsOfRecords) {
  const std::optional<Options> failed = parse({"run", "--only", "failed", "--of", "r"}).options;
  ASSERT_TRUE(failed);
  EXPECT_TRUE(failed->onlyFailed);
  EXPECT_EQ(failed->failedOf, "r");
  EXPECT_THAT(parse({"verify", "r"}).options->records, ElementsAre("r"));
  EXPECT_THAT(parse({"verify", "r", "s", "[t]"}).options->records, ElementsAre("r", "s", "[t]"));
  EXPECT_THAT(parse({"diff", "r", "[s]"}).options->records, ElementsAre("r", "[s]"));
  const std::optional<Options> analyze =
      parse({"analyze", "r", "--record", "s", "--set", "x=1", "--output", "ocp:o"}).options;
  ASSERT_TRUE(analyze);
  EXPECT_THAT(analyze->records, ElementsAre("r"));
  EXPECT_EQ(analyze->record, "s");
  EXPECT_EQ(analyze->settings.size(), 1U);
  EXPECT_EQ(analyze->report.outputs[0].format, Format::kOcp);
}

TEST(ParseCommandLine, TakesAFormatBeforeAFileOnlyWhereThereAreSeveral) {
  const std::optional<Options> options = parse({"list", "--format", "json", "--output", "json:o"}).options;
  ASSERT_TRUE(options);
  EXPECT_EQ(options->report.output, "json:o");
  EXPECT_TRUE(options->report.outputs.empty());
}

TEST(ParseCommandLine, ReadsTheOptionsOfExperiments) {
  const std::optional<Options> options =
      parse(wordsOf("experiment A B* --plugin a.so --phone p --realtime --seed 7 "
                    "--set x=1 --log-level error --system-log --format csv --output o --profile f"))
          .options;
  ASSERT_TRUE(options);
  EXPECT_EQ(options->command, Command::kExperiment);
  EXPECT_THAT(options->names, ElementsAre("A", "B*"));
  EXPECT_THAT(options->plugins, ElementsAre("a.so"));
  EXPECT_EQ(options->phone, "p");
  EXPECT_TRUE(options->realTime);
  EXPECT_EQ(options->seed, 7U);
  EXPECT_EQ(options->settings.size(), 1U);
  EXPECT_EQ(options->logLevel, LogLevel::kError);
  EXPECT_TRUE(options->systemLog);
  EXPECT_EQ(options->report.format, Format::kCsv);
  EXPECT_EQ(options->report.output, "o");
  EXPECT_EQ(options->profile, "f");
  EXPECT_TRUE(parse({"experiment", "--all"}).options->all);
}

TEST(ParseCommandLine, KnowsItsCommands) {
  struct Row {
    std::vector<std::string> arguments;
    Command command;
  };
  const Row rows[] = {{{"list"}, Command::kList},
                      {{"describe", "A"}, Command::kDescribe},
                      {{"run", "A"}, Command::kRun},
                      {{"experiment", "A"}, Command::kExperiment},
                      {{"verify", "r"}, Command::kVerify},
                      {{"analyze", "r"}, Command::kAnalyze},
                      {{"diff", "r", "s"}, Command::kDiff},
                      {{"report", "r", "s"}, Command::kReport},
                      {{"records", "list"}, Command::kRecords},
                      {{"explain", "206"}, Command::kExplain},
                      {{"doctor"}, Command::kDoctor},
                      {{"selftest"}, Command::kSelftest},
                      {{"new", "folder"}, Command::kNew},
                      {{"phone", "probe"}, Command::kPhone},
                      {{"completion", "bash"}, Command::kCompletion}};
  EXPECT_EQ(std::size(rows), std::size(kCommandNames));
  for (const Row& row : rows) {
    const std::optional<Options> options = parse(row.arguments).options;
    ASSERT_TRUE(options) << row.arguments[0];
    EXPECT_EQ(options->command, row.command) << row.arguments[0];
  }
}

TEST(ParseCommandLine, TakesPatternsAsTheyAre) {
  const std::optional<Options> options = parse({"run", "[AB]", "*", "A?"}).options;
  ASSERT_TRUE(options);
  EXPECT_THAT(options->names, ElementsAre("[AB]", "*", "A?"));
}

TEST(ParseCommandLine, TakesArgumentsWithControlCharactersAsTheyAre) {
  const std::optional<Options> options = parse({"verify", "\x01z", "\x01[z]", "[\x01]"}).options;
  ASSERT_TRUE(options);
  EXPECT_THAT(options->records, ElementsAre("\x01z", "\x01[z]", "[\x01]"));
}

TEST(ParseCommandLine, QuotesArgumentsInBracketsAsTheyAre) {
  EXPECT_THAT(parse({"run", "A", "--format", "[json]"}).err, HasSubstr("--format: [json] not in"));
  EXPECT_THAT(parse({"completion", "[bash]"}).err, HasSubstr("SHELL: [bash] not in"));
}

TEST(ParseCommandLine, TakesNoneForNoProfile) {
  const std::optional<Options> options = parse({"describe", "A", "--profile", "none"}).options;
  ASSERT_TRUE(options);
  EXPECT_TRUE(options->withoutProfile);
  EXPECT_EQ(options->command, Command::kDescribe);
}

TEST(ParseCommandLine, RefusesWrongUsage) {
  struct Row {
    std::vector<std::string> arguments;
    const char* problem;
  };
  const Row rows[] = {
      {{"rnu"}, "unknown command 'rnu'; did you mean 'run'? The commands are list, describe, run, experiment"},
      {{"analyze", "r", "--profil", "x"}, "unknown option '--profil'; did you mean '--profile'?\nRun 'quazor analyze"},
      {{"diff", "a", "b", "--formt", "json"}, "unknown option '--formt'\n"},
      {{"verify", "--recrd", "a"}, "unknown option '--recrd'"},
      {{"explain", "206", "--formt=json"}, "unknown option '--formt'; did you mean '--format'?"},
      {{"run", "--all", "--repeate", "3"}, "unknown option '--repeate'; did you mean '--repeat'?"},
      {{"--verison"}, "unknown option '--verison'; did you mean '--version'?"},
      {{"--plugin", "x", "run"}, "unknown option '--plugin'; options follow the command, as in 'quazor run --all'"},
      {{"run", "--tag", "--repeate", "--rael", "A"}, "unknown option '--rael'"},
      {{"fly"}, "unknown command 'fly'; the commands are list, describe, run, experiment"},
      {{"run"}, "name the diagnostics to run, or use --all"},
      {{"run", "A", "--all"}, "either names of diagnostics or --all"},
      {{"experiment"}, "name the experiments to run, or use --all"},
      {{"experiment", "A", "--all"}, "either names of experiments or --all"},
      {{"experiment", "A", "--format", "xml"}, "xml"},
      {{"list", "--format", "csv"}, "--format: csv not in {text,json}"},
      {{"describe", "A", "--format", "csv"}, "--format: csv not in {text,json}"},
      {{"describe"}, "NAME"},
      {{"doctor", "A"}, "A"},
      {{"list", "--realtime"}, "--realtime"},
      {{"run", "A", "--bogus"}, "--bogus"},
      {{"run", "A", "--seed"}, "--seed"},
      {{"run", "A", "--seed", ""}, "--seed ''"},
      {{"run", "A", "--seed", "-1"}, "--seed '-1'"},
      {{"run", "A", "--seed", "1.5"}, "--seed '1.5'"},
      {{"run", "A", "--seed", "7x"}, "--seed '7x'"},
      {{"run", "A", "--seed", "18446744073709551616"}, "an integer from 0 to 18446744073709551615"},
      {{"run", "A", "--seed", "1", "--seed", "2"}, "--seed"},
      {{"run", "A", "--format", "xml"}, "xml"},
      {{"run", "A", "--log-level", "loud"}, "loud"},
      {{"run", "A", "--set", "x"}, "expected [experiment.|analysis.]NAME=VALUE"},
      {{"run", "A", "--set", "x=nan"}, "'nan' is not a finite number"},
      {{"run", "A", "--output", ""}, "--output: the value is empty"},
      {{"run", "A", "--phone", ""}, "--phone: the value is empty"},
      {{"run", "A", "--profile", ""}, "--profile: the value is empty"},
      {{"run", "A", "--plugin", ""}, "--plugin: the value is empty"},
      {{"run", "A", "--output", "x", "--output", "y"},
       "--output 'x' and --output 'y': name the format of each additional report, as in --output junit:FILE"},
      {{"list", "--output", "x", "--output", "y"}, "--output 'x' and --output 'y': this command writes only one file"},
      {{"run", "A", "--output", "json:"}, "--output 'json:': the file name is missing"},
      {{"run", "A", "--output", "json:-"},
       "--output 'json:-': for a report on standard output, use --format json without --output (for a file of this "
       "name, "
       "write 'json:./-')"},
      {{"list", "--output", "-"},
       "--output '-': for a report on standard output, leave --output out (for a file of this name, write './-')"},
      {{"run", "A", "--parameters", ""}, "--parameters: the value is empty"},
      {{"run", "A", "--record", ""}, "--record: the value is empty"},
      {{"run", "--only", "failed", "--of", ""}, "--of: the value is empty"},
      {{"verify", ""}, "RECORD: the value is empty"},
      {{"run", "A", "--memory", ""}, "--memory: the value is empty"},
      {{"run", "A", "--memory", "0"}, "--memory '0': expected an integer from 1 to 17592186044415"},
      {{"run", "A", "--memory", "17592186044416"}, "--memory '17592186044416'"},
      {{"run", "A", "--memory", "much"}, "--memory 'much'"},
      {{"run", "A", "--log-limit", ""}, "--log-limit: the value is empty"},
      {{"run", "A", "--log-limit", "0"}, "--log-limit: LINES '0': expected an integer from 1 to 1000000000"},
      {{"run", "A", "--log-limit", "1000000001"}, "--log-limit: LINES '1000000001': expected an integer from 1 to"},
      {{"run", "A", "--log-limit", "99999999999999999999"}, "--log-limit: LINES '99999999999999999999': expected"},
      {{"run", "A", "--log-limit", "-1"}, "--log-limit: LINES '-1': expected"},
      {{"run", "A", "--log-limit", "1e6"}, "--log-limit: LINES '1e6': expected"},
      {{"run", "A", "--log-limit", "None"}, "--log-limit: LINES 'None': expected"},
      {{"run", "A", "--log-limit", ",5"}, "--log-limit: LINES '': expected"},
      {{"run", "A", "--log-limit", "5,"}, "--log-limit: MEBIBYTES '': expected an integer from 1 to 1048576"},
      {{"run", "A", "--log-limit", "5,0"}, "--log-limit: MEBIBYTES '0': expected"},
      {{"run", "A", "--log-limit", "5,1048577"}, "--log-limit: MEBIBYTES '1048577': expected"},
      {{"run", "A", "--log-limit", "5,6,7"}, "--log-limit: MEBIBYTES '6,7': expected"},
      {{"list", "--log-limit", "5"}, "--log-limit"},
      {{"run", "A", "--trace", "queue"}, "--trace 'queue': expected off, frames, frames=N, frames=all or queues"},
      {{"run", "A", "--trace", "frames=0"}, "--trace: N '0': expected an integer from 1 to 1000000000"},
      {{"run", "A", "--trace", "frames=-1"}, "--trace: N '-1': expected an integer"},
      {{"run", "A", "--trace", "frames="}, "--trace: N '': expected an integer"},
      {{"run", "A", "--trace", ""}, "--trace: the value is empty"},
      {{"analyze", "r", "--trace=off"}, "--trace"},
      {{"run", "A", "--deadline", "soon"}, "--deadline 'soon': 'soon' is not a number"},
      {{"run", "A", "--deadline", "runn=5"}, "unknown stage 'runn'"},
      {{"run", "--only", "passed"}, "--only: passed not in {failed}"},
      {{"run", "A", "--only", "failed"}, "--only failed cannot be combined with names or --all"},
      {{"run", "--all", "--only", "failed"}, "--only failed cannot be combined with names or --all"},
      {{"run", "A", "--of", "r"}, "--of requires --only failed"},
      {{"run", "--of", "r"}, "--of requires --only failed"},
      {{"verify"}, "RECORD"},
      {{"diff", "a", "b", "c"}, "c"},
      {{"diff", "a"}, "RECORD"},
      {{"new", ""}, "FOLDER"},
      {{"analyze"}, "RECORD"},
      {{"selftest", "--seeds", "0"}, "--seeds '0': expected an integer from 1 to 1000000"},
      {{"completion", "fish"}, "fish"},
      {{"verifi"}, "unknown command 'verifi'; did you mean 'verify'?"},
  };
  for (const Row& row : rows) {
    const Parsed parsed = parse(row.arguments);
    const std::string line = testing::PrintToString(row.arguments);
    EXPECT_FALSE(parsed.options) << line;
    EXPECT_EQ(parsed.code, ExitCode::kUsage) << line;
    EXPECT_EQ(parsed.out, "") << line;
    EXPECT_THAT(parsed.err, testing::AllOf(testing::StartsWith("quazor: "), HasSubstr(row.problem))) << line;
  }
}

TEST(ParseCommandLine, AnswersForHelpAndVersion) {
  const Parsed help = parse({"--help"});
  EXPECT_FALSE(help.options);
  EXPECT_EQ(help.code, ExitCode::kAllPassed);
  EXPECT_THAT(help.out, testing::AllOf(HasSubstr("quazor run --all"), HasSubstr("130  interrupted")));
  EXPECT_EQ(help.err, "");
  EXPECT_THAT(parse({"run", "--help"}).out, testing::AllOf(HasSubstr("--seed"), HasSubstr("--phone")));
  const Parsed version = parse({"--version"});
  EXPECT_EQ(version.code, ExitCode::kAllPassed);
  EXPECT_THAT(version.out, testing::StartsWith("quazor "));
}

// The lines of the text that begin with that prefix, without it.
std::vector<std::string> linesAfter(const std::string& prefix, const std::string& text) {
  std::istringstream lines(text);
  std::vector<std::string> found;
  for (std::string line; std::getline(lines, line);) {
    if (line.starts_with(prefix)) found.push_back(line.substr(prefix.size()));
  }
  return found;
}

TEST(Help, SaysWhatAnIncompleteRecordIsForEachCommand) {
  EXPECT_THAT(linesAfter("  3    ", parse({"verify", "--help"}).out),
              testing::ElementsAre("the record has no end of a run; one that was interrupted and ended has one"));
  EXPECT_THAT(linesAfter("  3    ", parse({"analyze", "--help"}).out),
              testing::ElementsAre("all passed, but the recorded run was interrupted or did not end"));
}

TEST(Help, OfACommandHasItsOwnExamplesAndExitCodes) {
  std::size_t examples = 0;
  for (const std::string_view name : kCommandNames) {
    const std::string help = parse({std::string(name), "--help"}).out;
    for (const std::string& example : linesAfter("  quazor ", help)) {
      EXPECT_TRUE(example == name || example.starts_with(std::string(name) + " ")) << name << ": " << example;
      ++examples;
    }
    EXPECT_THAT(help, HasSubstr("\nExit codes:\n  0    ")) << name;
    EXPECT_THAT(help, HasSubstr("\n  64   the command line is invalid\n")) << name;
    EXPECT_EQ(linesAfter("  3    ", help).size(), name == "verify" || name == "analyze" ? 1U : 0U) << name;
    EXPECT_THAT(linesAfter("  0    ", help), testing::SizeIs(1)) << name;
  }
  EXPECT_EQ(examples, linesAfter("  quazor ", parse({"--help"}).out).size());
}

TEST(ParseCommandLine, HelpsWhenCalledWithNothing) {
  const Parsed parsed = parse({});
  EXPECT_FALSE(parsed.options);
  EXPECT_EQ(parsed.code, ExitCode::kUsage);
  EXPECT_THAT(parsed.err, HasSubstr("Examples:"));
  EXPECT_EQ(parsed.out, "");
}

}  // namespace
}  // namespace quazor
