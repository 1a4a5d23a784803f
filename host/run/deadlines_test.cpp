#include "host/run/deadlines.h"

#include "host/error/exit_code.h"
#include "host/testing/test_refusals.h"
#include "tests/support/thrown_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>

namespace quazor {
namespace {

using namespace std::chrono_literals;

constexpr auto kYear = 365 * 24h;

ResolvedParameters withParameters(const std::vector<std::pair<std::string, Value>>& values) {
  ResolvedParameters parameters;
  for (const auto& [name, value] : values) {
    parameters.experiment.push_back({name, QZNumberParameter("", true), value, ""});
  }
  return parameters;
}

TEST(ParseDeadline, TakesSecondsOfOneStageOrOfAll) {
  struct Row {
    const char* text;
    std::optional<Stage> stage;
    std::chrono::nanoseconds time;
  };
  const Row rows[] = {
      {"5", std::nullopt, 5s},
      {"0.25", std::nullopt, 250ms},
      {"1e-9", std::nullopt, 1ns},
      {"load=1", Stage::kLoad, 1s},
      {"describe=1", Stage::kDescribe, 1s},
      {"setup=1", Stage::kSetup, 1s},
      {"run=90", Stage::kRun, 90s},
      {"teardown=1", Stage::kTeardown, 1s},
      {"analyze=1", Stage::kAnalyze, 1s},
      {"analyse=1", Stage::kAnalyze, 1s},
      {"1e300", std::nullopt, kYear},
      {"run=31536001", Stage::kRun, kYear},
  };
  for (const Row& row : rows) {
    const DeadlineSetting setting = parseDeadline(row.text);
    EXPECT_EQ(setting.stage, row.stage) << row.text;
    EXPECT_EQ(setting.time, row.time) << row.text;
  }
}

TEST(ParseGrace, TakesSeconds) {
  EXPECT_EQ(parseGrace("5"), 5s);
  EXPECT_EQ(parseGrace("0"), 0s);
  EXPECT_EQ(parseGrace("0.25"), 250ms);
  EXPECT_EQ(parseGrace("1e300"), kYear);
  EXPECT_EQ(parseHeartbeat("0"), 0s);
  EXPECT_EQ(parseHeartbeat("1"), 1s);
  EXPECT_EQ(parseHeartbeat("2.5"), 2500ms);
  for (const std::string text : {"0.5", "-1", "1e-3"}) {
    EXPECT_EQ(refusalOf(ExitCode::kUsage, [&text] { parseHeartbeat(text); }),
              "--heartbeat '" + text + "': the time must be at least 1 second, or 0 for no heartbeat");
  }
  EXPECT_EQ(refusalOf(ExitCode::kUsage, [] { parseGrace("-1"); }), "--grace '-1': the time must not be less than zero");
  EXPECT_EQ(refusalOf(ExitCode::kUsage, [] { parseGrace("soon"); }), "--grace 'soon': 'soon' is not a number");
}

TEST(ParseDeadline, RefusesOtherTexts) {
  constexpr RefusedText kRows[] = {
      {"", "a number is missing"},
      {"run=", "a number is missing"},
      {"soon", "'soon' is not a number"},
      {"5s", "'5s' is not a number"},
      {"nan", "not a finite number"},
      {"inf", "not a finite number"},
      {"1e999", "outside the range of numbers"},
      {"0", "the time must be greater than zero"},
      {"-1", "the time must be greater than zero"},
      {"run=-0.0", "the time must be greater than zero"},
      {"1e-30", "the time must be greater than zero"},
      {"=5", "unknown stage ''"},
      {"runn=5", "unknown stage 'runn'; the stages are load, describe, setup, run, teardown and analyze"},
      {"Run=5", "unknown stage 'Run'"},
      {"run=5=6", "'5=6' is not a number"},
  };
  for (const auto& row : kRows) {
    const std::string refusal = refusalOf(ExitCode::kUsage, [&] { parseDeadline(row.text); });
    EXPECT_THAT(refusal, testing::StartsWith("--deadline '" + std::string(row.text) + "': ")) << row.text;
    EXPECT_THAT(refusal, testing::HasSubstr(row.problem)) << row.text;
  }
}

TEST(Deadlines, AreAMinuteWhereNothingIsKnown) {
  const Deadlines deadlines({}, {});
  for (const Stage stage : kStages) EXPECT_EQ(deadlines.of(stage), 60s) << nameOf(stage);
}

TEST(Deadlines, GiveARunAMinuteMoreThanTwiceTheTimeItIsToldToTake) {
  EXPECT_EQ(Deadlines(withParameters({{"duration", 3}}), {}).of(Stage::kRun), 66s);
  EXPECT_EQ(Deadlines(withParameters({{"timeout", 10}}), {}).of(Stage::kRun), 80s);
  EXPECT_EQ(Deadlines(withParameters({{"timeout", 10}, {"duration", 0.5}}), {}).of(Stage::kRun), 61s);
  EXPECT_EQ(Deadlines(withParameters({{"duration", -3}}), {}).of(Stage::kRun), 60s);
  EXPECT_EQ(Deadlines(withParameters({{"duration", 3}}), {}).of(Stage::kSetup), 60s);
  for (const double much : {1e300, std::numeric_limits<double>::max(), std::numeric_limits<double>::infinity()}) {
    EXPECT_EQ(Deadlines(withParameters({{"duration", much}}), {}).of(Stage::kRun), kYear + 60s) << much;
  }
}

TEST(Deadlines, TakeWhatIsSetOfOneStageForMoreThanWhatIsSetOfAll) {
  const ResolvedParameters parameters = withParameters({{"duration", 3}});
  const Deadlines all(parameters, {parseDeadline("5")});
  for (const Stage stage : kStages) EXPECT_EQ(all.of(stage), 5s) << nameOf(stage);
  for (const auto& settings : {std::vector{parseDeadline("run=7"), parseDeadline("5")},
                               std::vector{parseDeadline("5"), parseDeadline("run=7")}}) {
    const Deadlines both(parameters, settings);
    EXPECT_EQ(both.of(Stage::kRun), 7s);
    EXPECT_EQ(both.of(Stage::kAnalyze), 5s);
  }
  const Deadlines one(parameters, {parseDeadline("analyze=1"), parseDeadline("analyze=2")});
  EXPECT_EQ(one.of(Stage::kAnalyze), 2s);
  EXPECT_EQ(one.of(Stage::kRun), 66s);
}

}  // namespace
}  // namespace quazor
