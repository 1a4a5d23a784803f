#include "host/command_line.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

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
}

TEST(ParseCommandLine, ReadsEveryOption) {
  const std::optional<Options> options = parse({"run",
                                                "--plugin",
                                                "a.so",
                                                "A",
                                                "--plugin",
                                                "b.so",
                                                "--phone",
                                                "p",
                                                "--realtime",
                                                "--seed",
                                                "18446744073709551615",
                                                "--set",
                                                "x=1",
                                                "B",
                                                "--set=analysis.y=2",
                                                "--log-level",
                                                "debug",
                                                "--system-log",
                                                "--format",
                                                "json",
                                                "--output",
                                                "o",
                                                "--profile",
                                                "f"})
                                             .options;
  ASSERT_TRUE(options);
  EXPECT_THAT(options->names, ElementsAre("A", "B"));
  EXPECT_THAT(options->plugins, ElementsAre("a.so", "b.so"));
  EXPECT_EQ(options->phone, "p");
  EXPECT_TRUE(options->realTime);
  EXPECT_EQ(options->seed, UINT64_MAX);
  ASSERT_EQ(options->settings.size(), 2U);
  EXPECT_EQ(options->settings[1].half, Half::kAnalysis);
  EXPECT_EQ(options->logLevel, LogLevel::kDebug);
  EXPECT_TRUE(options->systemLog);
  EXPECT_EQ(options->report.format, Format::kJson);
  EXPECT_EQ(options->report.output, "o");
  EXPECT_EQ(options->profile, "f");
}

TEST(ParseCommandLine, ReadsTheOptionsOfExperiments) {
  const std::optional<Options> options =
      parse({"experiment",   "A",        "B*",  "--plugin", "a.so", "--phone",     "p",
             "--realtime",   "--seed",   "7",   "--set",    "x=1",  "--log-level", "error",
             "--system-log", "--format", "csv", "--output", "o",    "--profile",   "f"})
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
  EXPECT_TRUE(options->report.ofExperiments);
  EXPECT_EQ(options->report.output, "o");
  EXPECT_EQ(options->profile, "f");
  EXPECT_TRUE(parse({"experiment", "--all"}).options->all);
}

TEST(ParseCommandLine, KnowsItsCommands) {
  struct Row {
    std::vector<std::string> arguments;
    Command command;
    bool ofExperiments;
  };
  const Row rows[] = {{{"list"}, Command::kList, false},
                      {{"describe", "A"}, Command::kDescribe, false},
                      {{"run", "A"}, Command::kRun, false},
                      {{"experiment", "A"}, Command::kExperiment, true}};
  for (const Row& row : rows) {
    const std::optional<Options> options = parse(row.arguments).options;
    ASSERT_TRUE(options) << row.arguments[0];
    EXPECT_EQ(options->command, row.command) << row.arguments[0];
    EXPECT_EQ(options->report.ofExperiments, row.ofExperiments) << row.arguments[0];
  }
}

TEST(ParseCommandLine, TakesPatternsAsTheyAre) {
  const std::optional<Options> options = parse({"run", "[AB]", "*", "A?"}).options;
  ASSERT_TRUE(options);
  EXPECT_THAT(options->names, ElementsAre("[AB]", "*", "A?"));
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
      {{"rnu"}, "there is no command 'rnu'; did you mean 'run'?"},
      {{"fly"}, "there is no command 'fly'; the commands are list, describe, run, experiment"},
      {{"run"}, "name the diagnostics to run, or give --all"},
      {{"run", "A", "--all"}, "either names of diagnostics or --all"},
      {{"experiment"}, "name the experiments to run, or give --all"},
      {{"experiment", "A", "--all"}, "either names of experiments or --all"},
      {{"experiment", "A", "--format", "xml"}, "xml"},
      {{"run", "A", "--format", "csv"},
       "--format csv is for 'quazor experiment'; 'run' gives its report as text or json"},
      {{"list", "--format", "csv"}, "'list' gives its report as text or json"},
      {{"describe", "A", "--format", "csv"}, "'describe' gives its report as text or json"},
      {{"describe"}, "NAME"},
      {{"list", "A"}, "A"},
      {{"list", "--realtime"}, "--realtime"},
      {{"run", "A", "--bogus"}, "--bogus"},
      {{"run", "A", "--seed"}, "--seed"},
      {{"run", "A", "--seed", ""}, "--seed ''"},
      {{"run", "A", "--seed", "-1"}, "--seed '-1'"},
      {{"run", "A", "--seed", "1.5"}, "--seed '1.5'"},
      {{"run", "A", "--seed", "7x"}, "--seed '7x'"},
      {{"run", "A", "--seed", "18446744073709551616"}, "a whole number from 0 to 18446744073709551615"},
      {{"run", "A", "--seed", "1", "--seed", "2"}, "--seed"},
      {{"run", "A", "--format", "xml"}, "xml"},
      {{"run", "A", "--log-level", "loud"}, "loud"},
      {{"run", "A", "--set", "x"}, "it must have the form"},
      {{"run", "A", "--set", "x=nan"}, "'nan' is not a finite number"},
      {{"run", "A", "--output", ""}, "--output: its value is empty"},
      {{"run", "A", "--phone", ""}, "--phone: its value is empty"},
      {{"run", "A", "--profile", ""}, "--profile: its value is empty"},
      {{"run", "A", "--plugin", ""}, "--plugin: its value is empty"},
      {{"run", "A", "--output", "x", "--output", "y"}, "--output"},
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

TEST(ParseCommandLine, HelpsWhenCalledWithNothing) {
  const Parsed parsed = parse({});
  EXPECT_FALSE(parsed.options);
  EXPECT_EQ(parsed.code, ExitCode::kUsage);
  EXPECT_THAT(parsed.err, HasSubstr("Examples:"));
  EXPECT_EQ(parsed.out, "");
}

}  // namespace
}  // namespace quazor
