// Generated plug-ins with arbitrary behaviour: the verdict of every run equals that of an oracle.
#include "host/model/record_builder.h"
#include "host/run/diagnostic_run.h"
#include "host/testing/test_events.h"
#include "host/testing/test_oracle.h"
#include "host/testing/test_phone.h"
#include "host/testing/test_values.h"
#include "tests/support/effort.h"

#include <gtest/gtest.h>

#include <iostream>
#include <limits>
#include <stdexcept>

namespace quazor {
namespace {

// The outcome of an operation of a plug-in.
enum class Way { kWorks, kWorksWithAnError, kFails, kFailsWithoutError, kThrows, kThrowsAnInteger };

bool works(Way way) { return way == Way::kWorks || way == Way::kWorksWithAnError; }

bool perform(Way way, DiagnosticErrorPtr* error) {
  if (way == Way::kThrows) throw std::runtime_error("it threw");
  if (way == Way::kThrowsAnInteger) throw 42;
  if (way == Way::kFails || way == Way::kWorksWithAnError) makeError("D", 1, "m").swap(*error);
  return works(way);
}

// The behaviour of one diagnostic.
struct Script {
  Way makeExperiment{}, describeExperiment{}, setup{}, run{}, teardown{};
  bool hasTeardown = false;
  Way makeAnalysis{}, describeAnalysis{}, analysisSetup{}, analyze{};
  bool hasAnalysisSetup = false;
  bool experimentOnly = false;
  std::vector<QZMeasuredResult> results;
};

bool failsToBeMade(Way make, Way describe) {
  // A description is a return value, so only an exception makes it fail.
  return !works(make) || describe == Way::kThrows || describe == Way::kThrowsAnInteger;
}

Verdict scriptedVerdict(const Script& script) {
  const bool runs = !failsToBeMade(script.makeExperiment, script.describeExperiment) && works(script.setup);
  bool hasError = !runs || !works(script.run) || (script.hasTeardown && !works(script.teardown));
  if (script.experimentOnly) return hasError ? Verdict::kError : Verdict::kPass;
  hasError = hasError || failsToBeMade(script.makeAnalysis, script.describeAnalysis) ||
             (script.hasAnalysisSetup && !works(script.analysisSetup)) || !works(script.analyze);
  return oracleVerdict(script.results, hasError, true);
}

QZDescription describe(Way way) {
  if (way == Way::kThrows || way == Way::kThrowsAnInteger) static_cast<void>(perform(way, nullptr));
  return QZDescription("A script.");
}

class ScriptedExperiment : public QZExperiment {
 public:
  explicit ScriptedExperiment(const Script& script) : script_(script) {}

  QZDescription experimentDescription() const override { return describe(script_.describeExperiment); }
  bool setupWithParameters(const Dictionary&, QZDiagnosticHost*, DiagnosticErrorPtr* error) override {
    return perform(script_.setup, error);
  }
  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* error) override {
    return perform(script_.run, error) ? std::make_unique<QZExperimentResult>() : nullptr;
  }

 protected:
  const Script& script_;
};

class ExperimentWithTeardown final : public ScriptedExperiment, public QZTeardown {
 public:
  using ScriptedExperiment::ScriptedExperiment;
  bool teardown(DiagnosticErrorPtr* error) override { return perform(script_.teardown, error); }
};

class ScriptedAnalysis : public QZAnalysis {
 public:
  explicit ScriptedAnalysis(const Script& script) : script_(script) {}

  QZDescription analysisDescription() const override { return describe(script_.describeAnalysis); }
  std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult&,
                                                            DiagnosticErrorPtr* error) override {
    if (!perform(script_.analyze, error)) return nullptr;
    auto result = std::make_unique<QZAnalysisResult>();
    result->measuredResults() = script_.results;
    return result;
  }

 protected:
  const Script& script_;
};

class AnalysisWithSetup final : public ScriptedAnalysis, public QZAnalysisSetup {
 public:
  using ScriptedAnalysis::ScriptedAnalysis;
  bool setupWithParameters(const Dictionary&, QZDiagnosticHost*, DiagnosticErrorPtr* error) override {
    return perform(script_.analysisSetup, error);
  }
};

template <class Made, class Plain, class Full>
std::shared_ptr<Made> make(const Script& script, Way way, bool full) {
  DiagnosticErrorPtr ignored;
  if (!perform(way, &ignored)) return nullptr;
  if (full) return std::make_shared<Full>(script);
  return std::make_shared<Plain>(script);
}

Diagnostic diagnosticOf(const Script& script) {
  return {"Scripted",
          "S",
          "E",
          "A",
          [&script] {
            return make<QZExperiment, ScriptedExperiment, ExperimentWithTeardown>(script, script.makeExperiment,
                                                                                  script.hasTeardown);
          },
          [&script] {
            return make<QZAnalysis, ScriptedAnalysis, AnalysisWithSetup>(script, script.makeAnalysis,
                                                                         script.hasAnalysisSetup);
          },
          script.experimentOnly,
          {}};
}

class RandomScripts {
 public:
  explicit RandomScripts(std::uint64_t seed) : random_(seed) {}

  Script script() {
    Script script;
    for (Way* way : {&script.makeExperiment, &script.describeExperiment, &script.setup, &script.run, &script.teardown,
                     &script.makeAnalysis, &script.describeAnalysis, &script.analysisSetup, &script.analyze}) {
      *way = random_.chance(94) ? static_cast<Way>(random_.below(2)) : static_cast<Way>(random_.below(6));
    }
    script.hasTeardown = random_.chance(50);
    script.hasAnalysisSetup = random_.chance(50);
    script.experimentOnly = random_.chance(10);
    if (random_.chance(5)) return script;
    for (std::uint64_t i = 1 + random_.below(4); i > 0; --i) script.results.push_back(result());
    return script;
  }

 private:
  double number() {
    constexpr double kOdd[] = {std::numeric_limits<double>::quiet_NaN(), std::numeric_limits<double>::infinity(),
                               -std::numeric_limits<double>::infinity(), -0.0,
                               std::numeric_limits<double>::denorm_min()};
    return random_.chance(5) ? kOdd[random_.below(std::size(kOdd))] : static_cast<double>(random_.below(4));
  }

  std::shared_ptr<const QZBound> bound(double usual) {
    if (random_.chance(30)) return nullptr;
    const QZUnit& unit = random_.chance(97) ? QZDimensionlessUnit::frames() : QZDimensionlessUnit::errors();
    return std::make_shared<const QZBound>(Measurement(random_.chance(80) ? usual : number(), unit),
                                           random_.chance(30));
  }

  QZMeasuredResult result() {
    QZMeasuredResult result("R", Measurement(number(), QZDimensionlessUnit::frames()));
    if (random_.chance(20)) return result;
    QZLimit limit("L");
    limit.setLowerBound(bound(0));
    limit.setUpperBound(bound(3));
    result.setLimit(limit);
    return result;
  }

  RandomValues random_;
};

TEST(GeneratedRuns, HaveTheVerdictOfTheOracle) {
  const int runs = roundsOf(10'000);
  RandomScripts random(1);
  RunOptions options;
  options.makePhone = [] { return std::make_unique<TestPhone>(); };
  int count[3] = {};
  int results = 0;
  for (int i = 0; i < runs; ++i) {
    const Script script = random.script();
    EventList events;
    DiagnosticStarted began = beginningOf("Scripted");
    began.experimentOnly = script.experimentOnly;
    events.onEvent(began);
    runDiagnostic(diagnosticOf(script), {}, options, events);
    RecordBuilder builder;
    for (const RunEvent& event : events.events) {
      // Until the plug-in's part is completed the only possible verdict is an error.
      ASSERT_EQ(std::get<DiagnosticEnded>(builder.ending({}).back()).verdict, Verdict::kError) << i;
      builder.onEvent(event);
    }
    ASSERT_TRUE(builder.isCompleted()) << i;
    const auto ended = std::get<DiagnosticEnded>(builder.ending({}).back());
    ASSERT_EQ(ended.verdict, scriptedVerdict(script)) << i;
    ++count[static_cast<int>(ended.verdict)];
    results += static_cast<int>(builder.record().measuredResults.size());
  }
  for (const int one : count) EXPECT_GT(one, runs / 20);
  std::cout << runs << " generated runs with " << results << " results: " << count[0] << " pass, " << count[1]
            << " fail, " << count[2] << " error\n";
}

}  // namespace
}  // namespace quazor
