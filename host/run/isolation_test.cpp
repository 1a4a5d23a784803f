#include "host/run/isolation.h"

#include "host/error/host_error.h"
#include "host/model/record_builder.h"
#include "host/run/plugin_scan.h"
#include "host/testing/plugins/fake_diagnostic.h"
#include "host/testing/test_descriptors.h"
#include "host/testing/test_environment.h"
#include "host/testing/test_events.h"
#include "host/testing/test_phone.h"
#include "host/testing/test_plugins.h"
#include "host/testing/test_signals.h"
#include "host/testing/test_values.h"
#include "tests/support/effort.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <sstream>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using fake::Behaviour;
using testing::ElementsAre;
using testing::EndsWith;
using testing::HasSubstr;
using testing::IsEmpty;

class IsolationTest : public testing::Test {
 protected:
  PluginScan scan(const std::vector<std::string>& plugins) {
    for (const std::string& name : plugins) options_.plugins.push_back(testPlugin(name));
    return scanPlugins(options_, signals_, [](const std::vector<Diagnostic>& catalogue) { return catalogue; });
  }

  const DefaultRequestsToEnd defaults_;
  WatchedSignals signals_;
  IsolationOptions options_;
};

class RunTest : public IsolationTest {
 protected:
  RunTest() {
    runOptions_.makePhone = [] { return std::make_unique<TestPhone>(); };
  }

  // Runs in a separate process and returns the record of the events.
  DiagnosticRecord run(const std::string& pluginName, const std::string& name,
                       const std::vector<std::string>& texts = {}, const QZExperimentResult* result = nullptr) {
    options_.plugins = {testPlugin(pluginName)};
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

TEST_F(RunTest, EndsInAnErrorWhereNoProcessCanBeMade) {
  const rlim_t next = nextDescriptor();
  std::optional<FewDescriptors> few(std::in_place);
  const DiagnosticRecord record = run("working", "Fake.One", {"duration=2"});
  few.reset();
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
    for (const std::string& one : plugins) options_.plugins.push_back(testPlugin(one));
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
            "QuazorHostErrorDomain 3 the plug-in '" + testPlugin("empty").string() + "' registers nothing");
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
      {"an exit with 113", 18,
       "QuazorHostErrorDomain 7 the stage run of Unruly ended its own process with exit code 113"},
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

TEST_F(RunTest, BelievesNoPluginThatSendsAllTheEventsOfAPass) {
  const DiagnosticRecord record = runUnruly(10);
  EXPECT_EQ(textOf(record.error),
            "QuazorHostErrorDomain 9 the stage run of Unruly closed or overwrote its process's connection to quazor");
  EXPECT_THAT(record.measuredResults, IsEmpty());
  EXPECT_FALSE(isCompleted_);
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

// The process may see the interrupt between two stages and end in order, or be ended inside one.
TEST_F(RunTest, EndsWhenTheUserInterruptsIt) {
  ASSERT_EQ(::kill(::getpid(), SIGINT), 0);
  options_.deadlines.clear();
  const DiagnosticRecord record = run("unruly", "Unruly", {"way=3"});
  EXPECT_FALSE(goesOn_);
  EXPECT_EQ(record.verdict, Verdict::kError);
  EXPECT_EQ(record.error->code(), static_cast<std::int64_t>(HostErrorCode::kInterrupted));
  EXPECT_THAT(textOf(record.error), testing::EndsWith("of Unruly was interrupted"));
}

TEST_F(RunTest, TearsDownAfterAnInterruptedRunThatReturnsInTimeAndDoesNotAnalyze) {
  const DiagnosticRecord record = runUnruly(16);
  EXPECT_FALSE(goesOn_);
  EXPECT_TRUE(isCompleted_);
  EXPECT_EQ(record.verdict, Verdict::kError);
  EXPECT_EQ(textOf(record.error), "QuazorHostErrorDomain 11 the stage run of Unruly was interrupted");
  EXPECT_EQ(record.errorStage, Stage::kRun);
  EXPECT_THAT(stagesIn(record),
              ElementsAre(Stage::kLoad, Stage::kDescribe, Stage::kSetup, Stage::kRun, Stage::kTeardown));
  EXPECT_NE(record.durations.teardown, std::nullopt);
  EXPECT_EQ(logOf(record).back(), "teardown");
}

TEST_F(RunTest, TellsThatThereWasNoTeardownAfterAnInterruptedRunThatDoesNotReturnInTime) {
  options_.grace = 100ms;
  const DiagnosticRecord record = runUnruly(17);
  EXPECT_FALSE(goesOn_);
  EXPECT_FALSE(isCompleted_);
  EXPECT_EQ(textOf(record.error), "QuazorHostErrorDomain 11 the stage run of Unruly was interrupted");
  EXPECT_EQ(stagesIn(record).back(), Stage::kRun);
  EXPECT_EQ(logOf(record).back(), "the teardown of Unruly was not reached");
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
    void traceFrames(FrameTrace& /*trace*/) override {}
  };
  runOptions_.makePhone = [] { return std::make_unique<SlowPhone>(); };
  Progress progress(&terminal_);
  options_.plugins = {testPlugin("working")};
  Diagnostic diagnostic;
  diagnostic.name = "Fake.One";
  progress.start("Fake.One", {std::nullopt, 90});
  runIsolated(options_, signals_, diagnostic, {}, runOptions_, nullptr, progress, events_);
  progress.stop();
  EXPECT_THAT(terminal_.str(), HasSubstr(" s, 17 of 90 frames"));
}

// Runs that send events of their own.
class SupervisedRunTest : public IsolationTest {
 protected:
  // Returns the error of the run of "One", or "" if it passes.
  std::string supervised(const std::function<void(RunEventSink& events)>& body) {
    Diagnostic diagnostic;
    diagnostic.name = "One";
    events_.events.clear();
    goesOn_ = superviseRun(options_, signals_, diagnostic, {}, body, shared_, progress_, events_);
    RecordBuilder builder;
    builder.onEvent(beginningOf("One"));
    for (const RunEvent& event : events_.events) builder.onEvent(event);
    for (const RunEvent& event : builder.ending(momentAt(99))) builder.onEvent(event);
    const DiagnosticRecord record = builder.takeRecord();
    EXPECT_EQ(record.verdict == Verdict::kPass, record.error == nullptr);
    errorStage_ = record.errorStage;
    return textOf(record.error);
  }

  static void send(RunEventSink& events, Stage stage) {
    events.onEvent(StageStarted{stage, momentAt(1)});
    events.onEvent(StageEnded{stage, 1s, momentAt(2)});
  }

  // Sends the events of a run that passes.
  static void pass(RunEventSink& events) {
    for (const Stage stage : kStages) send(events, stage);
    events.onEvent(ResultsReported{{resultOf(90)}});
    events.onEvent(DiagnosticCompleted{});
  }

  Progress progress_{nullptr};
  SharedRunState shared_;
  EventList events_;
  std::optional<Stage> errorStage_;
  bool goesOn_ = false;
};

TEST_F(SupervisedRunTest, PassesIfItsProcessEndsWell) {
  EXPECT_EQ(supervised(pass), "");
  EXPECT_TRUE(goesOn_);
  EXPECT_THAT(namesOf(events_.events), EndsWith("found diagnosticCompleted"));
}

TEST_F(SupervisedRunTest, PassesOnlyIfItsProcessEndsWell) {
  struct Row {
    const char* name;
    void (*end)();
    const char* error;
  };
  constexpr Row kRows[] = {
      {"a crash", [] { std::abort(); },
       "QuazorHostErrorDomain 6 One, after its results, crashed: its process was terminated by signal 6 (SIGABRT)"},
      {"an exit", [] { ::_exit(3); },
       "QuazorHostErrorDomain 7 One, after its results, ended its own process with exit code 3"},
      {"no end", [] { ::pause(); }, "QuazorHostErrorDomain 8 One, after its results, exceeded its deadline of 0.2 s"},
      {"an event", [] { ::usleep(300'000); },
       "QuazorHostErrorDomain 9 One, after its results, closed or overwrote its process's connection to quazor"},
  };
  for (const Row& row : kRows) {
    options_.deadlines = {{Stage::kAnalyze, std::string_view(row.name) == "no end" ? 200ms : 1min}};
    const std::string error = supervised([&row](RunEventSink& events) {
      pass(events);
      if (std::string_view(row.name) == "an event") events.onEvent(Logged{});
      row.end();
    });
    EXPECT_EQ(error, row.error) << row.name;
    EXPECT_EQ(errorStage_, Stage::kAnalyze) << row.name;
    EXPECT_TRUE(goesOn_) << row.name;
    EXPECT_THAT(namesOf(events_.events), EndsWith("found failed")) << row.name;
  }
}

// A plug-in can write to all the memory of its process, also to what is shared.
TEST_F(SupervisedRunTest, IsNotInterruptedByWhatItsProcessWritesToTheSharedMemory) {
  const auto body = [this](RunEventSink& /*events*/) {
    shared_.interrupted.set(1);
    std::abort();
  };
  EXPECT_THAT(supervised(body), HasSubstr("crashed: its process was terminated by signal 6 (SIGABRT)"));
  EXPECT_TRUE(goesOn_);
}

TEST_F(SupervisedRunTest, PassesThoughItIsInterruptedWhileItEnds) {
  const auto body = [parent = ::getpid()](RunEventSink& events) {
    pass(events);
    ::kill(parent, SIGINT);
    ::usleep(100'000);
  };
  EXPECT_EQ(supervised(body), "");
  EXPECT_TRUE(goesOn_);
  EXPECT_EQ(signals_.requestsToEnd(), 1);
}

TEST_F(SupervisedRunTest, IsInterruptedIfItDoesNotEndAfterItsResults) {
  const auto body = [parent = ::getpid()](RunEventSink& events) {
    pass(events);
    ::kill(parent, SIGINT);
    ::pause();
  };
  EXPECT_EQ(supervised(body), "QuazorHostErrorDomain 11 One, after its results, was interrupted");
  EXPECT_FALSE(goesOn_);
}

TEST_F(SupervisedRunTest, EndsARunThatStartsStagesForEver) {
  options_.deadlines = {{std::nullopt, 300ms}};
  const auto endless = [](RunEventSink& events) {
    for (int i = 0; i < 1000; ++i) {
      for (const Stage stage : kStages) send(events, stage);
      ::usleep(1000);
    }
  };
  EXPECT_THAT(supervised(endless), HasSubstr("closed or overwrote its process's connection to quazor"));
  EXPECT_EQ(errorStage_, Stage::kAnalyze);
  const auto repeating = [](RunEventSink& events) {
    for (int i = 0; i < 1000; ++i) {
      events.onEvent(StageStarted{Stage::kLoad, momentAt(1)});
      ::usleep(1000);
    }
  };
  EXPECT_THAT(supervised(repeating), HasSubstr("closed or overwrote its process's connection to quazor"));
  EXPECT_EQ(errorStage_, Stage::kLoad);
}

TEST_F(SupervisedRunTest, GivesTimeToResultsBetweenTwoStages) {
  options_.deadlines = {{std::nullopt, 600ms}};
  const auto slow = [](RunEventSink& events) {
    for (const Stage stage : {Stage::kLoad, Stage::kDescribe, Stage::kSetup, Stage::kRun}) send(events, stage);
    for (int i = 0; i < 4; ++i) {
      ::usleep(200'000);
      events.onEvent(AuxiliaryDataAdded{std::to_string(i), i});
    }
    send(events, Stage::kAnalyze);
    for (int i = 0; i < 4; ++i) {
      ::usleep(200'000);
      events.onEvent(ResultsReported{{resultOf(90)}});
    }
    events.onEvent(DiagnosticCompleted{});
  };
  EXPECT_EQ(supervised(slow), "");
}

TEST_F(SupervisedRunTest, GivesNoTimeToLogLinesBetweenTwoStages) {
  options_.deadlines = {{std::nullopt, 200ms}};
  const auto chatty = [](RunEventSink& events) {
    send(events, Stage::kLoad);
    for (int i = 0; i < 1000; ++i) {
      events.onEvent(Logged{});
      ::usleep(1000);
    }
  };
  EXPECT_THAT(supervised(chatty), HasSubstr("exceeded its deadline of 0.2 s"));
}

}  // namespace
}  // namespace quazor
