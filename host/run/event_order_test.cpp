#include "host/run/event_order.h"

#include "host/error/host_error.h"
#include "host/testing/test_events.h"

#include <gtest/gtest.h>

namespace quazor {
namespace {

using Events = std::vector<RunEvent>;

StageStarted started(Stage stage) { return {stage, momentAt(0)}; }
StageEnded ended(Stage stage) { return {stage, std::nullopt, momentAt(0)}; }
Failed failedIn(std::optional<Stage> stage) { return {stage, hostError(HostErrorCode::kException, "failed")}; }

// The number of events that are accepted before the first that is not, or all.
std::size_t accepted(const Events& events) {
  EventOrder order;
  for (std::size_t i = 0; i < events.size(); ++i) {
    if (!order.accepts(events[i])) return i;
  }
  return events.size();
}

Events during(Stage stage, const Events& more = {}) {
  Events events = {started(stage)};
  events.insert(events.end(), more.begin(), more.end());
  events.emplace_back(ended(stage));
  return events;
}

Events joined(const std::vector<Events>& parts) {
  Events all;
  for (const Events& part : parts) all.insert(all.end(), part.begin(), part.end());
  return all;
}

TEST(EventOrder, AcceptsEveryKindOfRun) {
  const Events measured = {MeasurementsAdded{}, AuxiliaryDataAdded{"key", 1}, MeasurementsAdded{}};
  const Events found = {ResultsReported{}, ResultsReported{}};
  const Events last = {FaultsCounted{}, DiagnosticCompleted{}};
  const Events load = during(Stage::kLoad);
  const Events describe = during(Stage::kDescribe);
  const Events setup = during(Stage::kSetup);
  const Events run = during(Stage::kRun, {Logged{}});
  const Events teardown = during(Stage::kTeardown, {failedIn(Stage::kTeardown)});
  const Events analyze = during(Stage::kAnalyze);
  const Events runs[] = {
      joined({load, describe, setup, run, measured, teardown, analyze, found, last}),
      joined({load, describe, setup, run, {Logged{}}, measured, analyze, found, last}),
      joined({load, during(Stage::kDescribe, {failedIn(Stage::kDescribe)}), last}),
      joined({load, describe, setup, during(Stage::kRun, {failedIn(Stage::kRun)}), teardown, last}),
      joined({load, measured, analyze, found, {DiagnosticCompleted{}}}),
      joined({during(Stage::kLoad, {failedIn(Stage::kLoad)}), {DiagnosticCompleted{}}}),
  };
  for (const Events& events : runs) EXPECT_EQ(accepted(events), events.size()) << namesOf(events);
}

TEST(EventOrder, RefusesEveryOtherOrder) {
  const Events load = during(Stage::kLoad);
  const Events run = during(Stage::kRun);
  const Events analyze = during(Stage::kAnalyze);
  // The last event of each is refused.
  const Events orders[] = {
      {started(Stage::kDescribe)},
      {ended(Stage::kLoad)},
      {MeasurementsAdded{}},
      {FaultsCounted{}},
      {DiagnosticCompleted{}},
      {RunStarted{}},
      {DiagnosticStarted{}},
      {DiagnosticEnded{}},
      {RunEnded{}},
      {FramesTraced{}},
      {started(Stage::kLoad), FramesTraced{}},
      {started(Stage::kLoad), started(Stage::kLoad)},
      {started(Stage::kLoad), started(Stage::kDescribe)},
      {started(Stage::kLoad), ended(Stage::kDescribe)},
      {started(Stage::kLoad), MeasurementsAdded{}},
      {started(Stage::kLoad), FaultsCounted{}},
      {started(Stage::kLoad), DiagnosticCompleted{}},
      {started(Stage::kLoad), failedIn(std::nullopt)},
      {started(Stage::kLoad), failedIn(Stage::kRun)},
      joined({load, {started(Stage::kLoad)}}),
      joined({load, {ended(Stage::kLoad)}}),
      joined({load, {failedIn(Stage::kLoad)}}),
      joined({load, {ResultsReported{}}}),
      joined({load, {started(Stage::kAnalyze), ResultsReported{}}}),
      joined({load, run, {started(Stage::kSetup)}}),
      joined({load, run, {started(Stage::kRun)}}),
      joined({load, run, analyze, {MeasurementsAdded{}}}),
      joined({load, run, analyze, {AuxiliaryDataAdded{"key", 1}}}),
      joined({load, {FaultsCounted{}, FaultsCounted{}}}),
      joined({load, {DiagnosticCompleted{}, DiagnosticCompleted{}}}),
      joined({load, {DiagnosticCompleted{}, Logged{}}}),
  };
  for (const Events& events : orders) EXPECT_EQ(accepted(events) + 1, events.size()) << namesOf(events);
}

TEST(EventOrder, TellsTheStage) {
  EventOrder order;
  EXPECT_EQ(order.stage(), Stage::kLoad);
  EXPECT_FALSE(order.isBetweenStages());
  EXPECT_TRUE(order.accepts(started(Stage::kLoad)));
  EXPECT_FALSE(order.isBetweenStages());
  EXPECT_TRUE(order.accepts(ended(Stage::kLoad)));
  EXPECT_TRUE(order.isBetweenStages());
  EXPECT_TRUE(order.accepts(started(Stage::kAnalyze)));
  EXPECT_EQ(order.stage(), Stage::kAnalyze);
  EXPECT_FALSE(order.accepts(started(Stage::kAnalyze)));
  EXPECT_FALSE(order.isBetweenStages());
  EXPECT_TRUE(order.accepts(ended(Stage::kAnalyze)));
  EXPECT_FALSE(order.isCompleted());
  EXPECT_TRUE(order.accepts(DiagnosticCompleted{}));
  EXPECT_TRUE(order.isCompleted());
  EXPECT_EQ(order.stage(), Stage::kAnalyze);
}

}  // namespace
}  // namespace quazor
