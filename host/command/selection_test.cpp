#include "host/command/selection.h"

#include "host/error/exit_code.h"
#include "host/testing/test_directory.h"
#include "host/testing/test_environment.h"
#include "host/testing/test_signals.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <functional>

namespace quazor {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

std::filesystem::path plugin(const std::string& name) {
  return std::filesystem::path(QUAZOR_TEST_PLUGINS) / (name + "_plugin.so");
}

std::string profileText(const std::string& diagnostics) {
  return R"({"schema": 1, "diagnostics": )" + diagnostics + "}";
}

class SelectionTest : public testing::Test {
 protected:
  SelectionTest() {
    options_.command = Command::kRun;
    options_.plugins = {plugin("working")};
    directory_.write(std::filesystem::path(QUAZOR_DATA_DIRECTORY) / "profiles/default.json",
                     profileText(R"({"Fake.*": {"experiment": {"duration": 1, "measured": 1}}, "Other": {}})"));
  }

  Selection selectNow() const { return select(options_, Installation(directory_.path() / "bin" / "quazor")); }

  std::vector<std::string> selected() const {
    std::vector<std::string> names;
    for (const ResolvedDiagnostic& one : selectNow().diagnostics) names.push_back(one.described.diagnostic.name);
    return names;
  }

  std::string refusal(ExitCode code) const {
    try {
      selectNow();
    } catch (const CommandError& refusal) {
      EXPECT_EQ(refusal.code(), code) << refusal.what();
      return refusal.what();
    } catch (const InputError& problem) {  // from reading a file
      EXPECT_EQ(ExitCode::kCannotRead, code) << problem.what();
      return problem.what();
    }
    return "accepted";
  }

  // "VALUE from SOURCE" of a parameter of the first diagnostic's experiment.
  std::string parameter(const std::string& name) const {
    const Selection selection = selectNow();
    for (const ResolvedParameter& one : selection.diagnostics[0].parameters.experiment) {
      if (one.name == name) return one.value ? defaultText(*one.value) + " from " + one.source : "not set";
    }
    return "not declared";
  }

  const DefaultRequestsToEnd defaults_;
  const EnvironmentVariable noSettings_{kSettingsVariable, nullptr};
  TestDirectory directory_;
  Options options_;
};

TEST_F(SelectionTest, FindsNamesAndPatterns) {
  options_.names = {"Fake.Two", "Broken.*"};
  EXPECT_THAT(selected(), ElementsAre("Fake.Two", "Broken.Nothing", "Broken.Factory", "Broken.Description"));
  options_.names = {"Fake.Oen"};
  EXPECT_THAT(refusal(ExitCode::kUsage), HasSubstr("did you mean 'Fake.One'?"));
}

TEST_F(SelectionTest, FindsAllOfWhatTheCommandIsFor) {
  options_.all = true;
  EXPECT_EQ(selected().size(), 5U);
  options_.command = Command::kExperiment;
  EXPECT_THAT(selected(), ElementsAre("FakeExperiment", "NoExperiment", "ThrowingFactory", "UndescribableExperiment"));
}

TEST_F(SelectionTest, RefusesAllWhereThereIsNone) {
  options_.all = true;
  options_.plugins = {plugin("analysis")};
  EXPECT_EQ(refusal(ExitCode::kUsage), "the loaded plug-ins have no diagnostics");
  options_.command = Command::kExperiment;
  EXPECT_EQ(refusal(ExitCode::kUsage), "the loaded plug-ins have no experiments");
  options_.command = Command::kRun;
  options_.plugins = {plugin("experiments")};
  EXPECT_EQ(refusal(ExitCode::kUsage),
            "the loaded plug-ins have no diagnostics, only experiments; run them with 'quazor experiment --all'");
}

TEST_F(SelectionTest, DescribesDiagnosticsAndExperiments) {
  options_.command = Command::kDescribe;
  options_.names = {"Fake.One", "FakeExperiment"};
  const Selection selection = selectNow();
  ASSERT_EQ(selection.diagnostics.size(), 2U);
  EXPECT_FALSE(selection.diagnostics[0].described.diagnostic.experimentOnly);
  EXPECT_TRUE(selection.diagnostics[1].described.diagnostic.experimentOnly);
  EXPECT_EQ(selection.diagnostics[1].described.summary(), "Measures what it is told to.");
}

TEST_F(SelectionTest, TakesParametersFromTheLastPlaceThatHasThem) {
  options_.names = {"Fake.One"};
  EXPECT_EQ(parameter("duration"), "1 from profile default.json");
  EXPECT_EQ(parameter("measured"), "1 from profile default.json");
  EXPECT_EQ(parameter("behaviour"), "not set");
  const auto more = directory_.write("more.json", profileText(R"({"Fake.One": {"experiment": {"measured": 2}}})"));
  options_.parameterFiles = {more};
  EXPECT_EQ(parameter("duration"), "1 from profile default.json");
  EXPECT_EQ(parameter("measured"), "2 from profile more.json");
  const EnvironmentVariable settings(kSettingsVariable, "measured=3");
  EXPECT_EQ(parameter("measured"), "3 from environment");
  options_.settings = {parseOverride("measured=4")};
  EXPECT_EQ(parameter("measured"), "4 from command line");
  options_.profile = directory_.write("mine.json", profileText(R"({"Fake.One": {"experiment": {"duration": 5}}})"));
  EXPECT_EQ(parameter("duration"), "5 from profile mine.json");
  options_.withoutProfile = true;
  EXPECT_EQ(parameter("duration"), "not set");
}

TEST_F(SelectionTest, RefusesWhatIsWrongWithParameters) {
  options_.names = {"Fake.One"};
  // Only the installed profile may name diagnostics that are not loaded.
  const auto other = directory_.write("other.json", profileText(R"({"Other": {}})"));
  options_.profile = other;
  EXPECT_THAT(refusal(ExitCode::kCannotRead),
              HasSubstr("other.json:1: diagnostics.Other: no diagnostic has this name; expected one of \"Fake.One\""));
  options_.profile.clear();
  options_.parameterFiles = {other};
  EXPECT_THAT(refusal(ExitCode::kCannotRead),
              HasSubstr("other.json:1: diagnostics.Other: no diagnostic has this name; expected one of \"Fake.One\""));
  options_.parameterFiles = {directory_.path() / "nothing.json"};
  EXPECT_THAT(refusal(ExitCode::kCannotRead), HasSubstr("nothing.json"));
  options_.parameterFiles.clear();
  options_.settings = {parseOverride("measurd=1")};
  EXPECT_THAT(refusal(ExitCode::kUsage), HasSubstr("--set 'measurd=1'"));
  options_.settings.clear();
  const EnvironmentVariable settings(kSettingsVariable, "measurd=1");
  EXPECT_THAT(refusal(ExitCode::kUsage), HasSubstr("QUAZOR_SET 'measurd=1'"));
}

TEST_F(SelectionTest, AsksOnlyWhatIsSelectedForItsDescription) {
  struct Row {
    const char* name;
    Command command;
    std::vector<std::string> names;
  };
  const Row rows[] = {
      {"a diagnostic", Command::kRun, {"Unruly"}},
      {"an experiment", Command::kExperiment, {"UnrulyExperiment"}},
      {"a description", Command::kDescribe, {"Unruly"}},
      {"a description by a pattern", Command::kDescribe, {"Unr*"}},
  };
  // Describing the other diagnostic ends the process, which becomes an error.
  options_.plugins = {plugin("undescribable"), plugin("unruly")};
  for (const Row& row : rows) {
    options_.command = row.command;
    options_.names = row.names;
    std::vector<std::string> asked;
    const Installation installation(directory_.path() / "bin" / "quazor");
    const std::vector<DescribedDiagnostic> all = scanForSelection(options_, installation).catalogue;
    for (const DescribedDiagnostic& one : all) {
      if (one.description.isAsked) asked.push_back(one.diagnostic.name);
    }
    EXPECT_THAT(asked, ElementsAre(row.command == Command::kExperiment ? "UnrulyExperiment" : "Unruly")) << row.name;
    EXPECT_EQ(selectNow().diagnostics.size(), 1U) << row.name;
  }
  options_.all = true;
  options_.names.clear();
  options_.command = Command::kRun;
  const Selection selection = selectNow();
  ASSERT_EQ(selection.diagnostics.size(), 2U);
  EXPECT_NE(selection.diagnostics[0].described.description.error, nullptr);
  EXPECT_EQ(selection.diagnostics[1].described.description.error, nullptr);
}

TEST_F(SelectionTest, AsksWhatElseAnEntryFitsBeforeItRefusesAParameter) {
  options_.plugins = {plugin("working"), plugin("unruly")};
  options_.names = {"Fake.One"};
  const auto withEntry = [this](const char* text) { options_.parameterFiles = {directory_.write("p.json", text)}; };
  const std::string only = profileText(R"({"Fake.*": {"experiment": {"way": 1}}})");
  withEntry(only.c_str());
  EXPECT_THAT(refusal(ExitCode::kCannotRead),
              HasSubstr("p.json:1: diagnostics.Fake.*.experiment.way: no experiment of \"Fake.*\" has this parameter"));
  const std::string wide = profileText(R"({"[FU]*[!x]": {"experiment": {"way": 1}}})");
  withEntry(wide.c_str());
  EXPECT_THAT(selected(), ElementsAre("Fake.One"));
  // In a child process, because plug-ins stay loaded.
  const pid_t child = ::fork();
  if (child == 0) {
    options_.inProcess = true;
    const bool isAccepted = selected().size() == 1;
    ::_exit(isAccepted ? 0 : 1);
  }
  int status = -1;
  ASSERT_EQ(::waitpid(child, &status, 0), child);
  EXPECT_EQ(status, 0);
}

TEST_F(SelectionTest, GoesOnWithoutAPluginThatCannotBeLoaded) {
  options_.plugins = {plugin("fatal"), plugin("working")};
  options_.names = {"Fake.One", "Fatal.One", "Fatal.*"};
  const Selection selection = selectNow();
  EXPECT_EQ(selection.diagnostics.size(), 1U);
  ASSERT_EQ(selection.failed.size(), 1U);
  EXPECT_EQ(selection.failed[0].file, plugin("fatal"));
  options_.plugins = {plugin("fatal")};
  EXPECT_THAT(selected(), IsEmpty());
  options_.settings = {parseOverride("duration=1")};  // may belong to that plug-in
  EXPECT_THAT(selected(), IsEmpty());
  options_.names.clear();
  options_.all = true;
  EXPECT_THAT(selected(), IsEmpty());
}

TEST_F(SelectionTest, IsInterruptedWhileThePluginsAreLoaded) {
  options_.plugins = {plugin("fatal")};
  const EnvironmentVariable hang("FATAL_PLUGIN", "hang");
  sigset_t interrupt;
  sigemptyset(&interrupt);
  sigaddset(&interrupt, SIGINT);
  ::sigprocmask(SIG_BLOCK, &interrupt, nullptr);
  ::kill(::getpid(), SIGINT);
  EXPECT_EQ(refusal(ExitCode::kInterrupted), "interrupted while loading the plug-ins");
  ::sigprocmask(SIG_UNBLOCK, &interrupt, nullptr);
}

TEST_F(SelectionTest, LoadsPluginsIntoThisProcessOnlyWhenAskedTo) {
  options_.names = {"Fake.*"};
  const std::size_t before = QZLab::defaultLab().registrations().size();
  EXPECT_EQ(selected().size(), 2U);
  EXPECT_EQ(QZLab::defaultLab().registrations().size(), before);
  // In a child process, because plug-ins stay loaded.
  const pid_t child = ::fork();
  if (child == 0) {
    options_.inProcess = true;
    const Selection selection = selectNow();
    const bool isLoaded = QZLab::defaultLab().registrations().size() > before;
    ::_exit(selection.diagnostics.size() == 2 && selection.diagnostics[0].described.diagnostic.makeExperiment &&
                    isLoaded
                ? 0
                : 1);
  }
  int status = -1;
  ASSERT_EQ(::waitpid(child, &status, 0), child);
  EXPECT_EQ(status, 0);
}

TEST_F(SelectionTest, IsolatesTheInstalledPluginWhenNoneIsNamed) {
  const Installation installation(directory_.path() / "bin" / "quazor");
  options_.plugins.clear();
  options_.memory = 5;
  options_.deadlines = {{Stage::kRun, std::chrono::seconds(1)}};
  const IsolationOptions isolation = isolationOf(options_, installation);
  EXPECT_THAT(isolation.plugins, ElementsAre(installation.shippedPlugin()));
  EXPECT_EQ(isolation.memory, 5U);
  EXPECT_EQ(isolation.deadlines.size(), 1U);
  EXPECT_FALSE(isolation.unasked);
  directory_.write(std::filesystem::path(QUAZOR_PLUGIN_DIRECTORY) / "shipped.so", "");
  EXPECT_TRUE(isolationOf(options_, installation).unasked);
  options_.plugins = {"a.so", "b.so"};
  EXPECT_FALSE(isolationOf(options_, installation).unasked);
  EXPECT_THAT(isolationOf(options_, installation).plugins, ElementsAre("a.so", "b.so"));
}

}  // namespace
}  // namespace quazor
