#include "host/run/diagnostic_run.h"

#include "contract/log_channel.h"
#include "host/model/record_builder.h"
#include "host/testing/plugins/fake_diagnostic.h"
#include "host/testing/test_events.h"
#include "host/testing/test_phone.h"
#include "host/testing/test_values.h"
#include "platform/platform.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using fake::Behaviour;
using testing::ElementsAre;

class DiagnosticRunTest : public testing::Test {
 protected:
  DiagnosticRunTest() {
    diagnostic_.diagnostic = {"Fake",
                              "Summary.",
                              "FakeExperiment",
                              "FakeAnalysis",
                              [] { return std::make_shared<fake::FakeExperiment>(); },
                              [] { return std::make_shared<fake::FakeAnalysis>(); }};
    options_.makePhone = [this] {
      ++phonesMade_;
      return std::make_unique<TestPhone>();
    };
  }

  DiagnosticRecord run(const std::vector<std::string>& texts = {"duration=2", "measured=90", "minimum=90"}) {
    const ResolvedParameters parameters = boundTo(texts);
    events_.events.clear();
    DiagnosticStarted began = beginningOf("Fake");
    began.experimentOnly = diagnostic_.diagnostic.experimentOnly;
    events_.onEvent(began);
    runDiagnostic(diagnostic_.diagnostic, parameters, options_, events_);
    return recordOfEvents();
  }

  ResolvedParameters boundTo(const std::vector<std::string>& texts) {
    diagnostic_.description = describeDiagnostic(diagnostic_.diagnostic);
    std::vector<ParameterOverride> settings;
    for (const std::string& text : texts) settings.push_back(parseOverride(text));
    return resolveParameters(diagnostic_, {}, settings);
  }

  // The record that the host builds from the events.
  DiagnosticRecord recordOfEvents() const {
    RecordBuilder builder;
    for (const RunEvent& event : events_.events) builder.onEvent(event);
    EXPECT_TRUE(builder.isCompleted());
    for (const RunEvent& event : builder.ending(momentAt(99))) builder.onEvent(event);
    return builder.takeRecord();
  }

  DiagnosticRecord runWith(Behaviour behaviour) {
    return run({"duration=2", "measured=90", "minimum=90", "behaviour=" + std::to_string(static_cast<int>(behaviour))});
  }

  DescribedDiagnostic diagnostic_;
  RunOptions options_;
  EventList events_;
  int phonesMade_ = 0;
};

TEST_F(DiagnosticRunTest, RecordsARunThatPasses) {
  const DiagnosticRecord record = run();
  EXPECT_EQ(record.verdict, Verdict::kPass);
  EXPECT_EQ(record.error, nullptr);
  ASSERT_EQ(record.measuredResults.size(), 2U);
  EXPECT_EQ(record.measuredResults[0].result.name(), "Count");
  EXPECT_EQ(record.measuredResults[0].verdict, ResultVerdict::kPass);
  EXPECT_EQ(record.measuredResults[1].verdict, ResultVerdict::kNone);
  EXPECT_EQ(*record.measurements.find("Count"), Measurement(90, QZDimensionlessUnit::frames()));
  EXPECT_EQ(*record.auxiliaryData.find("bytes"), Value(Bytes{0x00, 0xA5}));
  ASSERT_EQ(record.faults.size(), 1U);
  EXPECT_EQ(record.faults[0].fired, 3U);
}

TEST_F(DiagnosticRunTest, TellsEachStageWithItsBeginningAndEnd) {
  run();
  EXPECT_EQ(namesOf(events_.events),
            "diagnosticBegan stageBegan stageEnded stageBegan stageEnded stageBegan log log stageEnded measured "
            "collected collected stageBegan log stageEnded stageBegan stageEnded found faultsCounted "
            "diagnosticCompleted");
  std::vector<Stage> stages;
  std::optional<Stage> open;
  for (const RunEvent& event : events_.events) {
    if (const auto* const began = std::get_if<StageStarted>(&event)) {
      EXPECT_EQ(open, std::nullopt);
      open = began->stage;
      stages.push_back(began->stage);
    } else if (const auto* const ended = std::get_if<StageEnded>(&event)) {
      EXPECT_EQ(open, ended->stage);
      open.reset();
    }
  }
  EXPECT_EQ(open, std::nullopt);
  EXPECT_THAT(stages, ElementsAre(Stage::kDescribe, Stage::kSetup, Stage::kRun, Stage::kTeardown, Stage::kAnalyze));
}

TEST_F(DiagnosticRunTest, DatesEverythingByTheWallClock) {
  const auto before = std::chrono::system_clock::now();
  const DiagnosticRecord record = run();
  const auto after = std::chrono::system_clock::now();
  for (const StagePeriod& stage : record.stages) {
    EXPECT_LE(before, stage.begin);
    EXPECT_LE(stage.begin, stage.end);
    EXPECT_LE(*stage.end, after);
  }
  for (const LogLine& line : record.log) {
    EXPECT_LE(before, line.date);
    EXPECT_LE(line.date, after);
  }
}

TEST_F(DiagnosticRunTest, FailsOutsideALimit) {
  const DiagnosticRecord record = run({"duration=2", "measured=89", "minimum=90"});
  EXPECT_EQ(record.verdict, Verdict::kFail);
  EXPECT_EQ(record.error, nullptr);
  EXPECT_EQ(record.measuredResults[0].verdict, ResultVerdict::kFail);
}

TEST_F(DiagnosticRunTest, TimesTheStagesByThePhonesClock) {
  const DiagnosticRecord record = run({"duration=2.5", "measured=90"});
  EXPECT_EQ(record.durations.setup, 0ns);
  EXPECT_EQ(record.durations.run, 2500ms);
  EXPECT_EQ(record.durations.teardown, 0ns);
  EXPECT_EQ(record.durations.analysis, 0ns);
}

TEST_F(DiagnosticRunTest, KeepsTheLogLinesOfTheChosenLevel) {
  const auto textsOf = [](const DiagnosticRecord& record) {
    std::vector<std::string> texts;
    for (const LogLine& line : record.log) texts.push_back(line.text);
    return texts;
  };
  EXPECT_THAT(textsOf(run()), ElementsAre("an error line", "a default line of 90", "teardown"));
  options_.logLevel = LogLevel::kError;
  EXPECT_THAT(textsOf(run()), ElementsAre("an error line"));
  options_.logLevel = LogLevel::kDebug;
  const DiagnosticRecord record = run();
  EXPECT_THAT(textsOf(record), ElementsAre("an error line", "a default line of 90", "a debug line", "teardown"));
  EXPECT_EQ(record.log[1].time, 0ns);
  EXPECT_EQ(record.log[2].time, 2s);
}

TEST_F(DiagnosticRunTest, ClosesTheLogAfterwards) {
  run();
  EXPECT_FALSE(LogChannel::isEnabled(LogLevel::kError));
  const std::size_t told = events_.events.size();
  logError("too late");
  EXPECT_EQ(events_.events.size(), told);
}

TEST_F(DiagnosticRunTest, LetsThePhoneOfARunBeWatched) {
  std::shared_ptr<const Phone> watched;
  options_.watchPhone = [&](const std::shared_ptr<const Phone>& phone) {
    EXPECT_EQ(phonesMade_, 1);
    watched = phone;
  };
  run();
  ASSERT_NE(watched, nullptr);
  EXPECT_EQ(watched->framesDelivered(), 17U);
}

class ExperimentRunTest : public DiagnosticRunTest {
 protected:
  ExperimentRunTest() {
    diagnostic_.diagnostic.name = "FakeExperiment";
    diagnostic_.diagnostic.summary.clear();
    diagnostic_.diagnostic.experimentOnly = true;
    diagnostic_.diagnostic.analysisName.clear();
    diagnostic_.diagnostic.makeAnalysis = nullptr;
  }

  DiagnosticRecord runAlone(Behaviour behaviour) {
    return run({"duration=2", "measured=90", "behaviour=" + std::to_string(static_cast<int>(behaviour))});
  }
};

TEST_F(ExperimentRunTest, RecordsWhatAnExperimentMeasuresAndJudgesNothing) {
  const DiagnosticRecord record = runAlone(Behaviour::kNormal);
  EXPECT_TRUE(record.experimentOnly);
  EXPECT_EQ(record.verdict, Verdict::kPass);
  EXPECT_EQ(record.error, nullptr);
  EXPECT_EQ(*record.measurements.find("Count"), Measurement(90, QZDimensionlessUnit::frames()));
  EXPECT_TRUE(record.auxiliaryData.contains("list"));
  EXPECT_TRUE(record.measuredResults.empty());
  EXPECT_EQ(record.durations.run, 2s);
  EXPECT_EQ(record.durations.teardown, 0ns);
  EXPECT_EQ(record.durations.analysis, std::nullopt);
  EXPECT_EQ(record.faults.size(), 1U);
}

TEST_F(ExperimentRunTest, TakesAnyNumberForAResult) {
  EXPECT_EQ(run({"duration=2", "measured=-1"}).verdict, Verdict::kPass);
  EXPECT_EQ(runAlone(Behaviour::kNotANumber).verdict, Verdict::kPass);
  EXPECT_EQ(runAlone(Behaviour::kRunSucceedsWithError).verdict, Verdict::kPass);
}

TEST_F(ExperimentRunTest, EndsInTheErrorOfTheStageThatFails) {
  struct Row {
    const char* name;
    Behaviour behaviour;
    const char* error;
    std::size_t measurements;
  };
  constexpr Row kRows[] = {
      {"setup fails", Behaviour::kSetupFails, "FakeDomain 1 setup failed", 0},
      {"run fails", Behaviour::kRunFails, "FakeDomain 2 run failed", 0},
      {"run fails without an error", Behaviour::kRunFailsWithoutError,
       "QuazorHostErrorDomain 1 run of FakeExperiment failed without giving an error; the last error line of its log: "
       "an error line",
       0},
      {"run throws", Behaviour::kRunThrows,
       "QuazorHostErrorDomain 2 run of FakeExperiment threw an exception: run threw", 0},
      {"run throws an integer", Behaviour::kRunThrowsAnInteger,
       "QuazorHostErrorDomain 2 run of FakeExperiment threw something that is not a standard exception", 0},
      {"teardown fails", Behaviour::kTeardownFails, "FakeDomain 4 teardown failed", 1},
  };
  for (const Row& row : kRows) {
    const DiagnosticRecord record = runAlone(row.behaviour);
    EXPECT_EQ(record.verdict, Verdict::kError) << row.name;
    EXPECT_EQ(textOf(record.error), row.error) << row.name;
    EXPECT_EQ(record.measurements.size(), row.measurements) << row.name;
  }
}

TEST_F(DiagnosticRunTest, MakesAPhoneForEveryRun) {
  run();
  run();
  EXPECT_EQ(phonesMade_, 2);
}

// A behaviour, its error, and the stages that take place.
struct FailureRow {
  const char* name;
  Behaviour behaviour;
  const char* error;
  const char* stages;  // one letter per stage that took place: setup, run, teardown, analysis
  std::size_t results;
};

class FailureTest : public DiagnosticRunTest, public testing::WithParamInterface<FailureRow> {};

TEST_P(FailureTest, EndsInItsErrorAndSkipsWhatMakesNoSense) {
  const DiagnosticRecord record = runWith(GetParam().behaviour);
  EXPECT_EQ(record.verdict, Verdict::kError);
  EXPECT_EQ(textOf(record.error), GetParam().error);
  std::string stages;
  if (record.durations.setup) stages += 's';
  if (record.durations.run) stages += 'r';
  if (record.durations.teardown) stages += 't';
  if (record.durations.analysis) stages += 'a';
  EXPECT_EQ(stages, GetParam().stages);
  EXPECT_EQ(record.measuredResults.size(), GetParam().results);
}

constexpr FailureRow kFailures[] = {
    {"SetupFails", Behaviour::kSetupFails, "FakeDomain 1 setup failed", "s", 0},
    {"SetupFailsWithoutError", Behaviour::kSetupFailsWithoutError,
     "QuazorHostErrorDomain 1 setup of FakeExperiment failed without giving an error", "s", 0},
    {"SetupThrows", Behaviour::kSetupThrows,
     "QuazorHostErrorDomain 2 setup of FakeExperiment threw an exception: setup threw", "s", 0},
    {"SetupThrowsAnInteger", Behaviour::kSetupThrowsAnInteger,
     "QuazorHostErrorDomain 2 setup of FakeExperiment threw something that is not a standard exception", "s", 0},
    {"RunFails", Behaviour::kRunFails, "FakeDomain 2 run failed", "srt", 0},
    {"RunFailsWithoutError", Behaviour::kRunFailsWithoutError,
     "QuazorHostErrorDomain 1 run of FakeExperiment failed without giving an error; the last error line of its log: "
     "an error line",
     "srt", 0},
    {"RunThrows", Behaviour::kRunThrows, "QuazorHostErrorDomain 2 run of FakeExperiment threw an exception: run threw",
     "srt", 0},
    {"RunThrowsAnInteger", Behaviour::kRunThrowsAnInteger,
     "QuazorHostErrorDomain 2 run of FakeExperiment threw something that is not a standard exception", "srt", 0},
    {"TeardownFails", Behaviour::kTeardownFails, "FakeDomain 4 teardown failed", "srta", 2},
    {"TeardownThrows", Behaviour::kTeardownThrows,
     "QuazorHostErrorDomain 2 teardown of FakeExperiment threw an exception: teardown threw", "srta", 2},
    {"RunAndTeardownFail", Behaviour::kRunAndTeardownFail, "FakeDomain 2 run failed", "srt", 0},
    {"AnalysisSetupFails", Behaviour::kAnalysisSetupFails, "FakeDomain 5 analysis setup failed", "srta", 0},
    {"AnalysisSetupThrows", Behaviour::kAnalysisSetupThrows,
     "QuazorHostErrorDomain 2 setup of FakeAnalysis threw an exception: analysis setup threw", "srta", 0},
    {"AnalyzingFails", Behaviour::kAnalyzingFails, "FakeDomain 6 analyzing failed", "srta", 0},
    {"AnalyzingFailsWithoutError", Behaviour::kAnalyzingFailsWithoutError,
     "QuazorHostErrorDomain 1 analysis by FakeAnalysis failed without giving an error", "srta", 0},
    {"AnalyzingThrows", Behaviour::kAnalyzingThrows,
     "QuazorHostErrorDomain 2 analysis by FakeAnalysis threw an exception: analyzing threw", "srta", 0},
    {"NothingMeasured", Behaviour::kNothingMeasured, "QuazorHostErrorDomain 4 nothing was measured", "srta", 0},
    {"BoundInAnotherUnit", Behaviour::kBoundInAnotherUnit,
     "QuazorHostErrorDomain 5 the result Count cannot be judged: its lower bound is in 'errors' but its value is in "
     "'frames'",
     "srta", 2},
    {"NotANumber", Behaviour::kNotANumber,
     "QuazorHostErrorDomain 5 the result Count cannot be judged: its value is nan", "srta", 2},
};
INSTANTIATE_TEST_SUITE_P(Behaviours, FailureTest, testing::ValuesIn(kFailures),
                         [](const testing::TestParamInfo<FailureRow>& row) { return std::string(row.param.name); });

TEST_F(DiagnosticRunTest, DoesNotTakeAnErrorAfterASuccessForAFailure) {
  const DiagnosticRecord record = runWith(Behaviour::kRunSucceedsWithError);
  EXPECT_EQ(record.verdict, Verdict::kPass);
  EXPECT_EQ(record.error, nullptr);
}

TEST_F(DiagnosticRunTest, KeepsTheUnderlyingError) {
  const DiagnosticRecord record = runWith(Behaviour::kRunFails);
  ASSERT_NE(record.error, nullptr);
  EXPECT_EQ(textOf(record.error->underlyingError()), "DeepDomain -3 the cause");
}

TEST_F(DiagnosticRunTest, EndsInAnErrorWhenNothingIsMade) {
  diagnostic_.diagnostic.makeExperiment = [] { return nullptr; };
  const DiagnosticRecord record = run({});
  EXPECT_EQ(record.verdict, Verdict::kError);
  EXPECT_EQ(textOf(record.error), "QuazorHostErrorDomain 3 the factory of FakeExperiment returned no object");
  EXPECT_EQ(record.errorStage, Stage::kDescribe);
  EXPECT_EQ(record.durations.setup, std::nullopt);
}

TEST_F(DiagnosticRunTest, EndsInAnErrorWhenADescriptionThrows) {
  class Undescribable final : public fake::FakeExperiment {
   public:
    QZDescription experimentDescription() const override { throw std::runtime_error("description threw"); }
  };
  diagnostic_.diagnostic.makeExperiment = [] { return std::make_shared<Undescribable>(); };
  EXPECT_EQ(textOf(run({}).error),
            "QuazorHostErrorDomain 2 describing FakeExperiment threw an exception: description threw");
}

TEST_F(DiagnosticRunTest, EndsInAnErrorWhenAFactoryFailsOnlyForTheRun) {
  int made = 0;
  diagnostic_.diagnostic.makeAnalysis = [&made]() -> std::shared_ptr<QZAnalysis> {
    if (++made == 1) return std::make_shared<fake::FakeAnalysis>();
    return nullptr;
  };
  const DiagnosticRecord record = run();
  EXPECT_EQ(record.verdict, Verdict::kError);
  EXPECT_EQ(textOf(record.error), "QuazorHostErrorDomain 3 the factory of FakeAnalysis returned no object");
  EXPECT_EQ(record.errorStage, Stage::kAnalyze);
  EXPECT_EQ(record.measurements.size(), 1U);
}

TEST_F(DiagnosticRunTest, MakesANewExperimentOnThePhonesPlatform) {
  const Clock* clockSeen = nullptr;
  diagnostic_.diagnostic.makeExperiment = [&clockSeen] {
    clockSeen = installedPlatform().clock.get();
    return std::make_shared<fake::FakeExperiment>();
  };
  const Clock* clockOfRun = nullptr;
  options_.watchPhone = [&clockOfRun](const std::shared_ptr<const Phone>& phone) {
    clockOfRun = phone->platform().clock.get();
  };
  run();
  ASSERT_NE(clockOfRun, nullptr);
  EXPECT_EQ(clockSeen, clockOfRun);
  EXPECT_NE(installedPlatform().clock.get(), clockOfRun);
}

// Produces that many measurements and that many results.
class LargeDiagnosticTest : public DiagnosticRunTest {
 protected:
  class LargeExperiment final : public fake::FakeExperiment {
   public:
    explicit LargeExperiment(int count) : count_(count) {}

    std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* /*error*/) override {
      auto result = std::make_unique<QZExperimentResult>();
      for (int i = 0; i < count_; ++i) {
        result->measurements().set(std::to_string(i), Measurement(i, QZDimensionlessUnit::frames()));
      }
      return result;
    }

   private:
    const int count_;
  };

  class LargeAnalysis final : public QZAnalysis {
   public:
    QZDescription analysisDescription() const override { return QZDescription(""); }
    std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& result,
                                                              DiagnosticErrorPtr* /*error*/) override {
      auto analyzed = std::make_unique<QZAnalysisResult>();
      for (const auto& [name, measurement] : result.measurements()) {
        analyzed->measuredResults().emplace_back(name, measurement);
      }
      return analyzed;
    }
  };

  DiagnosticRecord runLarge(int count) {
    diagnostic_.diagnostic.makeExperiment = [count] { return std::make_shared<LargeExperiment>(count); };
    diagnostic_.diagnostic.makeAnalysis = [] { return std::make_shared<LargeAnalysis>(); };
    return run({});
  }

  template <class Event>
  std::size_t count() const {
    std::size_t count = 0;
    for (const RunEvent& event : events_.events) count += std::holds_alternative<Event>(event) ? 1 : 0;
    return count;
  }
};

TEST_F(LargeDiagnosticTest, TellsManyMeasurementsAndResultsInSeveralEvents) {
  struct Row {
    int measurements;
    std::size_t events;
  };
  for (const auto& [measurements, events] : {Row{0, 0}, Row{1, 1}, Row{500, 1}, Row{501, 2}, Row{1201, 3}}) {
    const DiagnosticRecord record = runLarge(measurements);
    EXPECT_EQ(count<MeasurementsAdded>(), events) << measurements;
    EXPECT_EQ(count<ResultsReported>(), events) << measurements;
    ASSERT_EQ(record.measurements.size(), static_cast<std::size_t>(measurements));
    ASSERT_EQ(record.measuredResults.size(), static_cast<std::size_t>(measurements));
    int i = 0;
    for (const auto& [name, measurement] : record.measurements) {
      EXPECT_EQ(measurement.value(), i);
      EXPECT_EQ(record.measuredResults[static_cast<std::size_t>(i)].result.name(), std::to_string(i));
      ++i;
    }
  }
}

class AnalyzeResultTest : public DiagnosticRunTest {
 protected:
  DiagnosticRecord analyze(const std::vector<std::string>& texts, LogLevel level = LogLevel::kDefault) {
    QZExperimentResult result;
    result.measurements().set("Count", Measurement(90, QZDimensionlessUnit::frames()));
    result.auxiliaryData().set("bytes", Bytes{1});
    const ResolvedParameters parameters = boundTo(texts);
    events_.events = {beginningOf("Fake")};
    analyzeResult(diagnostic_.diagnostic, parameters, result, level, events_);
    return recordOfEvents();
  }
};

TEST_F(AnalyzeResultTest, RunsOnlyTheAnalysisOnWhatIsGiven) {
  const DiagnosticRecord record = analyze({"minimum=90"});
  EXPECT_EQ(record.verdict, Verdict::kPass);
  EXPECT_EQ(phonesMade_, 0);
  EXPECT_EQ(namesOf(events_.events),
            "diagnosticBegan measured collected stageBegan stageEnded found diagnosticCompleted");
  EXPECT_EQ(record.durations.run, std::nullopt);
  EXPECT_EQ(record.durations.analysis, 0ns);
  EXPECT_EQ(analyze({"minimum=91"}).verdict, Verdict::kFail);
}

TEST_F(AnalyzeResultTest, TellsTheResultSoThatItCanBeAnalyzedAgain) {
  const DiagnosticRecord record = analyze({});
  EXPECT_EQ(*record.measurements.find("Count"), Measurement(90, QZDimensionlessUnit::frames()));
  EXPECT_EQ(*record.auxiliaryData.find("bytes"), Value(Bytes{1}));
}

TEST_F(AnalyzeResultTest, EndsInTheAnalysisError) {
  const DiagnosticRecord record =
      analyze({"analysis.behaviour=" + std::to_string(static_cast<int>(Behaviour::kAnalyzingFails))});
  EXPECT_EQ(textOf(record.error), "FakeDomain 6 analyzing failed");
  EXPECT_EQ(record.errorStage, Stage::kAnalyze);
}

TEST_F(AnalyzeResultTest, TellsTheLogLinesOfTheAnalysis) {
  diagnostic_.diagnostic.makeAnalysis = [] {
    logDebug("making");
    return std::make_shared<fake::FakeAnalysis>();
  };
  EXPECT_EQ(analyze({}, LogLevel::kDebug).log.size(), 1U);
  EXPECT_EQ(analyze({}, LogLevel::kDefault).log.size(), 0U);
  EXPECT_FALSE(LogChannel::isEnabled(LogLevel::kError));
}

TEST_F(DiagnosticRunTest, BeginsNoSetupRunOrAnalysisAfterAnInterruptButTheTeardown) {
  const std::vector<std::vector<Stage>> stages = {
      {Stage::kDescribe},
      {Stage::kDescribe, Stage::kSetup, Stage::kTeardown},
      {Stage::kDescribe, Stage::kSetup, Stage::kRun, Stage::kTeardown},
      {Stage::kDescribe, Stage::kSetup, Stage::kRun, Stage::kTeardown, Stage::kAnalyze},
  };
  for (std::size_t before = 0; before < stages.size(); ++before) {
    std::size_t asked = 0;
    options_.isInterrupted = [&asked, before] { return asked++ >= before; };
    EXPECT_EQ(stagesIn(run()), stages[before]) << before;
  }
}

}  // namespace
}  // namespace quazor
