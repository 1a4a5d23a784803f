#include "host/run/isolation.h"

#include "host/error/exit_code.h"
#include "host/error/host_error.h"
#include "host/model/record_builder.h"
#include "host/testing/plugins/fake_diagnostic.h"
#include "host/testing/test_environment.h"
#include "host/testing/test_events.h"
#include "host/testing/test_phone.h"
#include "host/testing/test_refusals.h"
#include "host/testing/test_signals.h"
#include "host/testing/test_values.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <unistd.h>

#include <algorithm>
#include <sstream>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using fake::Behaviour;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

#if defined(QUAZOR_ADDRESS_SANITIZER) || defined(QUAZOR_THREAD_SANITIZER)
constexpr bool kHasSanitizer = true;
#else
constexpr bool kHasSanitizer = false;
#endif

std::filesystem::path plugin(const std::string& name) {
  return std::filesystem::path(QUAZOR_TEST_PLUGINS) / (name + "_plugin.so");
}

std::vector<Diagnostic> everything(const std::vector<Diagnostic>& catalogue) { return catalogue; }

class IsolationTest : public testing::Test {
 protected:
  PluginScan scan(const std::vector<std::string>& plugins) {
    for (const std::string& name : plugins) options_.plugins.push_back(plugin(name));
    return scanPlugins(options_, signals_, everything);
  }

  static std::vector<std::string> namesIn(const PluginScan& scan) {
    std::vector<std::string> names;
    for (const DescribedDiagnostic& one : scan.catalogue) names.push_back(one.diagnostic.name);
    return names;
  }

  const DefaultRequestsToEnd defaults_;
  WatchedSignals signals_;
  IsolationOptions options_;
};

using ScanTest = IsolationTest;

TEST_F(ScanTest, TellsWhatThePluginsHaveWithoutLoadingThemHere) {
  const std::size_t before = QZLab::defaultLab().registrations().size();
  const PluginScan all = scan({"working", "experiments"});
  EXPECT_EQ(QZLab::defaultLab().registrations().size(), before);
  EXPECT_THAT(all.failed, IsEmpty());
  EXPECT_FALSE(all.interrupted);
  EXPECT_THAT(namesIn(all), ElementsAre("Fake.One", "Fake.Two", "Broken.Nothing", "Broken.Factory",
                                        "Broken.Description", "FakeExperiment", "NoExperiment", "ThrowingFactory",
                                        "UndescribableExperiment", "Alone.Images", "Alone.Counts", "Alone.Nothing"));
  const DescribedDiagnostic& one = all.catalogue[0];
  EXPECT_EQ(one.diagnostic.summary, "Does as it is told.");
  EXPECT_EQ(one.diagnostic.analysisName, "FakeAnalysis");
  EXPECT_EQ(one.diagnostic.makeExperiment, nullptr);
  EXPECT_EQ(one.description.error, nullptr);
  EXPECT_TRUE(one.description.experiment.parameters().contains("duration"));
  EXPECT_EQ(textOf(all.catalogue[3].description.error),
            "QuazorHostErrorDomain 2 describing ThrowingFactory threw an exception: factory threw");
  EXPECT_TRUE(all.catalogue[5].diagnostic.experimentOnly);
  EXPECT_THAT(all.catalogue[5].diagnostic.usedBy, ElementsAre("Fake.One", "Fake.Two"));
}

TEST_F(ScanTest, AsksOnlyForTheDescriptionsThatAreWanted) {
  options_.plugins = {plugin("working")};
  const PluginScan some = scanPlugins(options_, signals_, [](const std::vector<Diagnostic>& catalogue) {
    return std::vector<Diagnostic>{catalogue[1]};
  });
  EXPECT_EQ(some.catalogue.size(), 9U);
  EXPECT_EQ(some.catalogue[0].description.experiment.summary(), "");
  EXPECT_EQ(some.catalogue[1].description.experiment.summary(), "Measures what it is told to.");
  EXPECT_EQ(some.catalogue[3].description.error, nullptr);
  for (std::size_t i = 0; i < some.catalogue.size(); ++i) EXPECT_EQ(some.catalogue[i].description.isAsked, i == 1) << i;
}

TEST_F(ScanTest, ThrowsTheRefusalsOfTheChoice) {
  options_.plugins = {plugin("working")};
  const auto refuse = [](const std::vector<Diagnostic>&) -> std::vector<Diagnostic> {
    throw CommandError(ExitCode::kUsage, "not that");
  };
  EXPECT_THROW(scanPlugins(options_, signals_, refuse), CommandError);
}

TEST_F(ScanTest, TellsWhichPluginsADiagnosticNeeds) {
  const PluginScan all = scan({"working", "combining", "experiments"});
  const auto pluginsOf = [&all](const std::string& name) {
    for (const DescribedDiagnostic& one : all.catalogue) {
      if (one.diagnostic.name == name) return one.diagnostic.plugins;
    }
    return std::vector<std::filesystem::path>();
  };
  EXPECT_THAT(pluginsOf("Fake.One"), ElementsAre(plugin("working")));
  EXPECT_THAT(pluginsOf("FakeExperiment"), ElementsAre(plugin("working")));
  EXPECT_THAT(pluginsOf("Combined"), ElementsAre(plugin("working"), plugin("combining")));
  EXPECT_THAT(pluginsOf("Combining.Own"), ElementsAre(plugin("combining")));
  EXPECT_THAT(pluginsOf("Alone.Images"), ElementsAre(plugin("experiments")));
}

TEST_F(ScanTest, ThrowsTheRefusalsOfTheLoader) {
  EXPECT_EQ(refusalOf(ExitCode::kCannotRead,
                      [&] {
                        scan({"working", "empty"});
                      }),
            "the plug-in '" + plugin("empty").string() + "' registers nothing");
}

TEST_F(ScanTest, LeavesOutAPluginThatEndsItsProcessWhileItIsLoaded) {
  const PluginScan rest = scan({"experiments", "fatal", "analysis"});
  EXPECT_THAT(namesIn(rest), ElementsAre("Alone.Images", "Alone.Counts", "Alone.Nothing"));
  ASSERT_EQ(rest.failed.size(), 1U);
  EXPECT_EQ(rest.failed[0].file, plugin("fatal"));
  EXPECT_EQ(textOf(rest.failed[0].error), "QuazorHostErrorDomain 6 loading the plug-in '" + plugin("fatal").string() +
                                              "' crashed: its process was terminated by signal 6 (SIGABRT)");
}

TEST_F(ScanTest, IsEmptyWhenNoPluginCanBeLoaded) {
  const PluginScan none = scan({"fatal"});
  EXPECT_THAT(none.catalogue, IsEmpty());
  EXPECT_EQ(none.failed.size(), 1U);
}

TEST_F(ScanTest, EndsALoadingThatTakesTooLong) {
  options_.deadlines = {{Stage::kLoad, 50ms}};
  const EnvironmentVariable way("FATAL_PLUGIN", "hang");
  const PluginScan none = scan({"fatal"});
  ASSERT_EQ(none.failed.size(), 1U);
  EXPECT_THAT(textOf(none.failed[0].error),
              testing::AllOf(testing::StartsWith("QuazorHostErrorDomain 8 loading the plug-in '"),
                             testing::EndsWith("exceeded its deadline of 0.05 s")));
}

TEST_F(ScanTest, LeavesOutAPluginThatWritesToItsProcessConnection) {
  constexpr const char* kDescribed =
      R"(={"says":"described","description":{"experiment":{"summary":"","parameters":[]},)"
      R"("analysis":{"summary":"","parameters":[]},"error":null,"isAsked":true}})";
  constexpr const char* kLines[] = {
      "=garbage", "=5", R"(={"says":5})", R"(={"says":"strange"})", R"(={"says":"catalogue","catalogue":[{}]})",
      kDescribed,
  };
  options_.plugins = {plugin("fatal")};
  for (const char* line : kLines) {
    const EnvironmentVariable way("FATAL_PLUGIN", line);
    const PluginScan none = scanPlugins(options_, signals_, everything);
    ASSERT_EQ(none.failed.size(), 1U) << line;
    EXPECT_THAT(textOf(none.failed[0].error),
                testing::EndsWith("closed or overwrote its process's connection to quazor"))
        << line;
    EXPECT_THAT(none.catalogue, IsEmpty()) << line;
  }
}

TEST_F(ScanTest, GoesOnBehindWhatEndsItsProcessWhileItIsDescribed) {
  const PluginScan all = scan({"undescribable", "unruly"});
  EXPECT_THAT(all.failed, IsEmpty());
  ASSERT_THAT(namesIn(all), ElementsAre("Fatal", "Unruly", "FatalExperiment", "UnrulyExperiment"));
  EXPECT_EQ(textOf(all.catalogue[0].description.error),
            "QuazorHostErrorDomain 7 describing Fatal ended its own process with exit code 4");
  EXPECT_EQ(all.catalogue[1].description.error, nullptr);
  EXPECT_TRUE(all.catalogue[1].description.experiment.parameters().contains("way"));
  EXPECT_THAT(textOf(all.catalogue[2].description.error),
              HasSubstr("describing FatalExperiment ended its own process"));
  EXPECT_EQ(all.catalogue[3].description.error, nullptr);
}

TEST_F(ScanTest, EndsWhenTheUserInterruptsIt) {
  const EnvironmentVariable way("FATAL_PLUGIN", "hang");
  ASSERT_EQ(::kill(::getpid(), SIGINT), 0);
  const PluginScan none = scan({"fatal", "working"});
  EXPECT_TRUE(none.interrupted);
}

class RunTest : public IsolationTest {
 protected:
  RunTest() {
    runOptions_.makePhone = [] { return std::make_unique<TestPhone>(); };
  }

  // Runs in a separate process and returns the record of the events.
  DiagnosticRecord run(const std::string& pluginName, const std::string& name,
                       const std::vector<std::string>& texts = {}, const QZExperimentResult* result = nullptr) {
    options_.plugins = {plugin(pluginName)};
    std::vector<ParameterOverride> settings;
    for (const std::string& text : texts) settings.push_back(parseOverride(text));
    DescribedDiagnostic diagnostic;
    diagnostic.diagnostic.name = name;
    for (const ParameterOverride& one : settings) {
      const QZNumberParameter parameter("", false);
      diagnostic.description.experiment.addParameter(parameter, one.name);
      diagnostic.description.analysis.addParameter(parameter, one.name);
    }
    const ResolvedParameters parameters = resolveParameters(diagnostic, {}, settings);
    events_.events.clear();
    RecordBuilder builder;
    builder.onEvent(beginningOf(name));
    goesOn_ =
        runIsolated(options_, signals_, diagnostic.diagnostic, parameters, runOptions_, result, progress_, events_);
    for (const RunEvent& event : events_.events) builder.onEvent(event);
    isCompleted_ = builder.isCompleted();
    for (const RunEvent& event : builder.ending(momentAt(99))) builder.onEvent(event);
    return builder.takeRecord();
  }

  DiagnosticRecord runUnruly(int way) {
    options_.deadlines = {{Stage::kRun, 1min}};
    return run("unruly", "Unruly", {"way=" + std::to_string(way)});
  }
  // Like run(), with a way of misbehaving that exceeds the deadline.
  DiagnosticRecord runUnrulyForTooLong(int way) {
    options_.deadlines = {{Stage::kRun, 100ms}};
    return run("unruly", "Unruly", {"way=" + std::to_string(way)});
  }

  static std::vector<std::string> logOf(const DiagnosticRecord& record) {
    std::vector<std::string> texts;
    for (const LogLine& line : record.log) texts.push_back(line.text);
    return texts;
  }

  RunOptions runOptions_;
  std::ostringstream terminal_;
  Progress progress_{nullptr};
  EventList events_;
  bool goesOn_ = false;
  bool isCompleted_ = false;
};

// The number that the next descriptor gets.
rlim_t nextDescriptor() {
  const int next = ::dup(STDIN_FILENO);
  ::close(next);
  return static_cast<rlim_t>(next);
}

TEST_F(RunTest, EndsInAnErrorWhereNoProcessCanBeMade) {
  const rlim_t next = nextDescriptor();
  rlimit before{};
  ASSERT_EQ(::getrlimit(RLIMIT_NOFILE, &before), 0);
  const rlimit few{next + 3, before.rlim_max};  // enough for one pipe, not for two
  ASSERT_EQ(::setrlimit(RLIMIT_NOFILE, &few), 0);
  const DiagnosticRecord record = run("working", "Fake.One", {"duration=2"});
  ASSERT_EQ(::setrlimit(RLIMIT_NOFILE, &before), 0);
  EXPECT_TRUE(goesOn_);
  EXPECT_EQ(record.verdict, Verdict::kError);
  EXPECT_EQ(defaultText(record.error),
            "QuazorHostErrorDomain code 12: the process of Fake.One could not be created: "
            "making a pipe: Too many open files");
  EXPECT_EQ(nextDescriptor(), next);
  EXPECT_EQ(run("working", "Fake.One", {"duration=2", "measured=90", "minimum=90"}).verdict, Verdict::kPass);
}

TEST_F(RunTest, TellsWhatARunInThisProcessWouldTell) {
  const DiagnosticRecord record = run("working", "Fake.One", {"duration=2", "measured=90", "minimum=90"});
  EXPECT_TRUE(goesOn_);
  EXPECT_TRUE(isCompleted_);
  EXPECT_EQ(record.verdict, Verdict::kPass);
  EXPECT_EQ(namesOf(events_.events),
            "stageBegan stageEnded stageBegan stageEnded stageBegan stageEnded stageBegan log log stageEnded measured "
            "collected collected stageBegan log stageEnded stageBegan stageEnded found faultsCounted "
            "diagnosticCompleted");
  EXPECT_EQ(std::get<StageStarted>(events_.events[0]).stage, Stage::kLoad);
  EXPECT_EQ(*record.measurements.find("Count"), Measurement(90, QZDimensionlessUnit::frames()));
  EXPECT_EQ(*record.auxiliaryData.find("list"), Value(Array{-1, 18446744073709551615U, 36.6F, 0.1, true, "text"}));
  EXPECT_EQ(record.durations.run, 2s);
  EXPECT_EQ(record.faults[0].fired, 3U);
  EXPECT_THAT(logOf(record), ElementsAre("an error line", "a default line of 90", "teardown"));
  EXPECT_EQ(run("working", "Fake.One", {"duration=2", "measured=90", "minimum=91"}).verdict, Verdict::kFail);
}

TEST_F(RunTest, TellsTheErrorsOfTheDiagnostic) {
  const DiagnosticRecord record = run("working", "Fake.One", {"duration=1", "experiment.behaviour=5"});
  EXPECT_EQ(textOf(record.error), "FakeDomain 2 run failed");
  EXPECT_EQ(textOf(record.error->underlyingError()), "DeepDomain -3 the cause");
  EXPECT_EQ(record.errorStage, Stage::kRun);
}

TEST_F(RunTest, AnalysesAResult) {
  QZExperimentResult result;
  result.measurements().set("Count", Measurement(7, QZDimensionlessUnit::frames()));
  const DiagnosticRecord record = run("working", "Fake.One", {"minimum=7"}, &result);
  EXPECT_EQ(record.verdict, Verdict::kPass);
  EXPECT_EQ(record.durations.run, std::nullopt);
  EXPECT_EQ(run("working", "Fake.One", {"minimum=8"}, &result).verdict, Verdict::kFail);
}

TEST_F(RunTest, LoadsOnlyThePluginsThatTheDiagnosticNeeds) {
  const PluginScan all = scan({"working", "combining"});
  const auto runNow = [&](const std::string& name, const std::vector<std::string>& plugins) {
    options_.plugins.clear();
    for (const std::string& one : plugins) options_.plugins.push_back(plugin(one));
    RecordBuilder builder;
    builder.onEvent(beginningOf(name));
    for (const DescribedDiagnostic& one : all.catalogue) {
      if (one.diagnostic.name != name) continue;
      const ResolvedParameters parameters = resolveParameters(one, {}, {parseOverride("experiment.duration=1")});
      runIsolated(options_, signals_, one.diagnostic, parameters, runOptions_, nullptr, progress_, builder);
    }
    for (const RunEvent& event : builder.ending(momentAt(99))) builder.onEvent(event);
    return textOf(builder.takeRecord().error);
  };
  EXPECT_EQ(runNow("Fake.One", {"fatal", "working", "combining"}), "");
  // Its plug-in has another diagnostic whose analysis is not loaded.
  EXPECT_EQ(runNow("Combining.Own", {"fatal", "working", "combining"}), "");
  EXPECT_EQ(runNow("Combined", {"fatal", "working", "combining"}), "");
  EXPECT_EQ(runNow("Combined", {"combining"}), "QuazorHostErrorDomain 3 the plug-ins no longer register Combined");
}

TEST_F(RunTest, FailsWhenThePluginsNoLongerHaveTheDiagnostic) {
  EXPECT_EQ(textOf(run("working", "Fake.Three").error),
            "QuazorHostErrorDomain 3 the plug-ins no longer register Fake.Three");
  EXPECT_EQ(textOf(run("empty", "Fake.One").error),
            "QuazorHostErrorDomain 3 the plug-in '" + plugin("empty").string() + "' registers nothing");
  EXPECT_TRUE(isCompleted_);
  EXPECT_TRUE(goesOn_);
}

TEST_F(RunTest, TurnsEachEndOfItsProcessIntoAFailureOfTheStage) {
  struct Row {
    const char* name;
    int way;
    const char* error;
  };
  constexpr Row kRows[] = {
      {"a crash", 1,
       "QuazorHostErrorDomain 6 the stage run of Unruly crashed: its process was terminated by signal 6 (SIGABRT)"},
      {"an exit", 2, "QuazorHostErrorDomain 7 the stage run of Unruly ended its own process with exit code 3"},
      {"a run that does not end", 3, "QuazorHostErrorDomain 8 the stage run of Unruly exceeded its deadline of 0.1 s"},
      {"a closed connection", 4,
       "QuazorHostErrorDomain 9 the stage run of Unruly closed or overwrote its process's connection to quazor"},
      {"garbage on the connection", 5,
       "QuazorHostErrorDomain 9 the stage run of Unruly closed or overwrote its process's connection to quazor"},
      {"a verdict of its own", 6,
       "QuazorHostErrorDomain 9 the stage run of Unruly closed or overwrote its process's connection to quazor"},
      {"a failure of quazor's own", 9,
       "QuazorHostErrorDomain 9 the stage run of Unruly closed or overwrote its process's connection to quazor"},
  };
  for (const Row& row : kRows) {
    const DiagnosticRecord record = row.way == 3 ? runUnrulyForTooLong(3) : runUnruly(row.way);
    EXPECT_EQ(textOf(record.error), row.error) << row.name;
    EXPECT_EQ(record.errorStage, Stage::kRun) << row.name;
    EXPECT_FALSE(isCompleted_) << row.name;
    EXPECT_TRUE(goesOn_) << row.name;
    // Earlier stages are kept.
    EXPECT_EQ(record.stages.size(), 4U) << row.name;
    EXPECT_EQ(logOf(record)[0], "an error line") << row.name;
  }
}

TEST_F(RunTest, EndsAPluginThatWritesALineWithoutEndToTheConnection) {
  const DiagnosticRecord record = runUnruly(15);
  EXPECT_EQ(textOf(record.error),
            "QuazorHostErrorDomain 9 the stage run of Unruly wrote more than 64 MiB in one line on its process's "
            "connection to quazor");
  EXPECT_EQ(record.errorStage, Stage::kRun);
  EXPECT_FALSE(isCompleted_);
  EXPECT_EQ(logOf(record)[0], "an error line");
}

TEST_F(RunTest, HasNoPassWhenThePluginSaysThatAllIsDone) {
  const DiagnosticRecord record = runUnruly(10);
  EXPECT_EQ(textOf(record.error), "QuazorHostErrorDomain 4 nothing was measured");
}

TEST_F(RunTest, TakesWhatThePluginPrintsForLogLines) {
  const DiagnosticRecord record = runUnruly(7);
  EXPECT_EQ(record.verdict, Verdict::kPass);
  EXPECT_THAT(logOf(record), testing::IsSupersetOf({"output: printed", "output: twice"}));
}

TEST_F(RunTest, KeepsNoMoreThanTenThousandLinesOfWhatThePluginPrints) {
  const DiagnosticRecord record = runUnruly(8);
  EXPECT_EQ(record.verdict, Verdict::kPass);
  const std::vector<std::string> log = logOf(record);
  EXPECT_EQ(std::count_if(log.begin(), log.end(), [](const std::string& line) { return line.starts_with("output: "); }),
            10'000);
  EXPECT_EQ(log.back(), "3 more lines of output were dropped");
}

TEST_F(RunTest, KeepsNoMoreThanFourMegabytesOfWhatThePluginPrints) {
  const std::vector<std::string> log = logOf(runUnruly(14));
  EXPECT_EQ(std::count_if(log.begin(), log.end(), [](const std::string& line) { return line.size() > 60'000; }), 66);
  EXPECT_EQ(log.back(), "34 more lines of output were dropped");
}

TEST_F(RunTest, EndsAStageAtItsDeadlineHoweverMuchItLogs) {
  const DiagnosticRecord record = runUnrulyForTooLong(13);
  EXPECT_THAT(textOf(record.error), HasSubstr("exceeded its deadline of 0.1 s"));
  EXPECT_THAT(logOf(record), testing::Contains("again"));
}

TEST_F(RunTest, CountsTheLogLinesBeyondTheLimitHoweverTheProcessEnds) {
  runOptions_.logLimit = {3, 1000};
  const std::vector<std::string> log = logOf(runUnrulyForTooLong(13));
  ASSERT_EQ(log.size(), 4U);
  EXPECT_THAT(log[3], testing::MatchesRegex("[0-9]+ more log lines were left out \\(--log-limit\\)"));
  runOptions_.logLimit = {1, 1000};
  EXPECT_THAT(logOf(run("working", "Fake.One", {"duration=2", "measured=90", "minimum=90"})),
              ElementsAre("an error line", "2 more log lines were left out (--log-limit)"));
}

TEST_F(RunTest, KeepsWhatThePluginPrintsBesideTheLimitOfItsLog) {
  runOptions_.logLimit = {1, 1000};
  EXPECT_THAT(logOf(runUnruly(7)), testing::IsSupersetOf({"output: printed", "output: twice"}));
}

TEST_F(RunTest, EndsWhenTheUserInterruptsIt) {
  ASSERT_EQ(::kill(::getpid(), SIGINT), 0);
  options_.deadlines.clear();
  const DiagnosticRecord record = run("unruly", "Unruly", {"way=3"});
  EXPECT_FALSE(goesOn_);
  EXPECT_FALSE(isCompleted_);
  EXPECT_EQ(record.error->code(), static_cast<std::int64_t>(HostErrorCode::kInterrupted));
  EXPECT_THAT(textOf(record.error), testing::EndsWith("of Unruly was interrupted"));
}

TEST_F(RunTest, EndsAPluginThatTakesMoreMemoryThanItMay) {
  if (kHasSanitizer) GTEST_SKIP() << "the sanitizer's own memory is more than any limit";
  options_.memory = std::uint64_t{2} << 30;
  const DiagnosticRecord record = runUnruly(11);
  EXPECT_EQ(textOf(record.error), "QuazorHostErrorDomain 2 run of UnrulyExperiment threw an exception: std::bad_alloc");
  options_.memory = 1;
  EXPECT_THAT(textOf(run("working", "Fake.One").error), HasSubstr("working_plugin.so' cannot be loaded: "));
}

TEST_F(RunTest, ShowsTheFramesOfThePhoneInTheOtherProcess) {
  class SlowPhone final : public Phone {
   public:
    Platform platform() const override {
      ::usleep(450'000);  // longer than the delay before progress is shown
      return nullPlatform();
    }
    std::vector<DeclaredFault> faults() const override { return {}; }
    std::uint64_t framesDelivered() const override { return 17; }
  };
  runOptions_.makePhone = [] { return std::make_unique<SlowPhone>(); };
  Progress progress(&terminal_);
  options_.plugins = {plugin("working")};
  Diagnostic diagnostic;
  diagnostic.name = "Fake.One";
  progress.start("Fake.One", {std::nullopt, 90});
  runIsolated(options_, signals_, diagnostic, {}, runOptions_, nullptr, progress, events_);
  progress.stop();
  EXPECT_THAT(terminal_.str(), HasSubstr(" s, 17 of 90 frames"));
}

}  // namespace
}  // namespace quazor
