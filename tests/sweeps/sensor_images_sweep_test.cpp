// Makes every call of a capture of sensor images go wrong in every way, and every two calls, and compares each run to
// the last word with what the oracle says it must be.
#include "backends/faults/operations.h"
#include "backends/simulated/scenario/scenario.h"
#include "tests/support/run_transcript.h"
#include "tests/sweeps/sensor_images_bench.h"
#include "tests/sweeps/sensor_images_oracle.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <iostream>
#include <limits>
#include <optional>
#include <ostream>
#include <set>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using sensor_oracle::Action;
using sensor_oracle::Phone;
using sensor_oracle::Power;
using sensor_oracle::Prediction;
using sensor_oracle::Receiver;
using sensor_oracle::Report;
using sensor_oracle::Request;
using sensor_oracle::Sensor;
using sensor_oracle::Time;

constexpr Time kMillisecond = 1'000'000;
constexpr std::uint64_t kEndlessSeconds = 9223372037;  // more than the clock counts

// One run on one phone.
struct Sweep {
  const char* name;
  bool succeeds;
  Phone phone = {};
  Request request = {};
  const char* scenario = nullptr;  // the file of a shipped phone like `phone`; null when it is made from `phone`
};
void PrintTo(const Sweep& sweep, std::ostream* out) { *out << sweep.name; }

Phone phoneWith(Sensor sensor) { return {.sensors = {std::move(sensor)}}; }
const Report kError{.error = kSensorFailed};

const Sweep kSweeps[] = {
    {"OneImage", true, {}, {.images = 1}},
    {"TwoImages", true},
    {"FiveImagesOfTheHealthyPhone",
     true,
     phoneWith({.rate = 60}),
     {.images = 5, .timeout = 2},
     QUAZOR_SCENARIOS "/healthy.json"},
    {"NoImageWanted", true, {}, {.images = 0}},
    {"AsManyImagesAsThereAre", true, phoneWith({.count = 2}), {}},
    {"TooFewImages", false, phoneWith({.count = 1}), {}},
    {"NoReports", false, phoneWith({.count = 0}), {}},
    {"SlowSensor", false, phoneWith({.rate = 3}), {.images = 3}},
    {"LastImageAtTheEndOfTheTime", false, {}, {.images = 20}},
    {"NoTime", false, {}, {.timeout = 0}},
    {"EndlessTime", true, phoneWith({.count = 2}), {.timeout = kEndlessSeconds}},
    {"EndlessWait", false, phoneWith({.count = 1}), {.timeout = kEndlessSeconds}},
    {"FrameIDsThatWrap", true, phoneWith({.firstFrameID = 0xFFFFFFFF}), {}},
    {"OtherReportsBetween",
     true,
     phoneWith({.single = {{0, {.id = 0x75}},
                           {1, {.length = 791}},
                           {3, {.id = 0x77, .length = 4}},
                           {4, {.length = 1}},
                           {5, {.length = 793}}}}),
     {}},
    {"OtherReportsOnly", false, phoneWith({.rate = 5, .every = {.id = 0x77}}), {}},
    {"ErrorAtOnce", false, phoneWith({.single = {{0, kError}}}), {}},
    {"ErrorInMidStream", false, phoneWith({.single = {{2, kError}}}), {.images = 3}},
    {"ErrorBehindTheLastImage", true, phoneWith({.single = {{2, kError}}}), {}},
    {"ErrorAtTheEndOfTheTime", false, phoneWith({.rate = 2, .single = {{1, kError}}}), {}},
    {"Removed", false, phoneWith({.removedAfter = 1}), {}},
    {"RemovedAtOnce", false, phoneWith({.removedAfter = 0}), {}},
    {"NoSensor", false, {.sensors = {}}, {}},
    {"OtherUsage", false, phoneWith({.usage = 0x25}), {}},
    {"OtherUsagePage", false, phoneWith({.usagePage = 0xFF01}), {}},
    {"TwoSensors", false, {.sensors = {Sensor{}, Sensor{}}}, {}},
    {"AnotherDevice", true, {.sensors = {Sensor{}, Sensor{.usagePage = 0x0C, .usage = 1}}}, {}},
    {"PowerModeRefused", false, phoneWith({.powerRefusal = kPowerRefused}), {}},
    {"StreamingModeRefused", false, phoneWith({.streamingRefusal = kStreamingRefused}), {}},
    {"NoDisplay", false, {.display = {.present = false}}, {}},
    {"NoRegistryEntry", false, {.display = {.hasRegistryEntry = false}}, {}},
    {"PowerUnknown", false, {.display = {.power = Power::kUnknown}}, {}},
    {"PropertyMissing", false, {.display = {.power = Power::kUnknown, .hasProperty = false}}, {}},
    {"DisplayOff", false, {.display = {.power = Power::kOff}}, {}},
    {"SharedLoop", true, {}, {.others = {.source = 0}}},
    {"BusyLoop", true, {}, {.others = {.source = 160 * kMillisecond}}},
    {"ErrorInABusyLoop", false, phoneWith({.single = {{2, kError}}}), {.others = {.source = 210 * kMillisecond}}},
    {"LoopBusyBeyondTheTime", false, {}, {.others = {.source = 1010 * kMillisecond}}},
    {"LoopStopped", true, {}, {.images = 5, .others = {.stop = 125 * kMillisecond}}},
    {"LoopStoppedBeforeTheFirstImage", true, {}, {.others = {.stop = 25 * kMillisecond}}},
    {"Stream", true, phoneWith({.rate = 6, .single = {{1, {.id = 0x75}}}}), {.receiver = Receiver::kListens}},
    {"StreamWithoutTime", true, {}, {.timeout = 0, .receiver = Receiver::kListens}},
    {"StreamThatFails", true, phoneWith({.single = {{1, kError}}}), {.receiver = Receiver::kListens}},
    {"StreamWithoutDelegate", true, phoneWith({.single = {{1, kError}}}), {.receiver = Receiver::kNone}},
    {"StreamClosedByItsDelegate", true, phoneWith({.rate = 6}), {.receiver = Receiver::kCloses}},
    {"StreamClosedByItsDelegateInABusyLoop",
     true,
     {},
     {.receiver = Receiver::kCloses, .others = {.source = 160 * kMillisecond}}},
    {"StreamOfNoSensor", false, {.sensors = {}}, {.receiver = Receiver::kListens}},
};

// How a call goes wrong. No report is due when a delay ends, unless it is due with the end of the time.
struct Kind {
  const char* name;
  FaultAction action;
  bool hasError = false;
  Time delay = 0;
};
const Kind kFails{"fails", FaultAction::kFail, true};
const Kind kAnswersNothing{"answers nothing", FaultAction::kNothing};
const Kind kHangs{"hangs", FaultAction::kHang};
const Kind kIsLate{"is late", FaultAction::kDelay, false, 62'300'000};
const Kind kIsVeryLate{"is very late", FaultAction::kDelay, false, 1'234'500'000};

// A call that goes wrong: the nth of the operation, or all.
struct Failure {
  Kind kind;
  std::optional<std::uint64_t> occurrence = {};
  std::string operation = "*";
};
void PrintTo(const Failure& failure, std::ostream* out) {
  *out << failure.operation << ' ' << (failure.occurrence ? std::to_string(*failure.occurrence) : "always") << ' '
       << failure.kind.name;
}
using Failures = std::vector<Failure>;

std::string messageOf(const Failure& failure) { return "The " + failure.operation + " call was made to fail."; }

Fault faultOf(const Failure& failure) {
  Fault fault;
  fault.operation = failure.operation;
  fault.occurrence = failure.occurrence;
  fault.action = failure.kind.action;
  if (failure.kind.hasError) fault.error = FaultError{"SweepErrorDomain", -3, messageOf(failure)};
  fault.seconds = static_cast<double>(failure.kind.delay) / 1e9;
  return fault;
}

sensor_oracle::Failure predictedOf(const Failure& failure) {
  const FaultAction action = failure.kind.action;
  return {failure.operation, failure.occurrence,
          action == FaultAction::kHang    ? Action::kHang
          : action == FaultAction::kDelay ? Action::kDelay
                                          : Action::kFail,
          failure.kind.hasError ? "SweepErrorDomain code -3: " + messageOf(failure) : "", failure.kind.delay};
}

constexpr std::array kPlaces{ErrorPlace::kGiven, ErrorPlace::kNone};

// Runs and compares.
class Comparison {
 public:
  Comparison(Phone phone, Request request, Scenario scenario, Dictionary parameters)
      : phone_(std::move(phone)), request_(request), scenario_(std::move(scenario)) {
    made_.parameters = std::move(parameters);
    made_.receiver = request.receiver;
    made_.watched = std::chrono::seconds(request.timeout);
    made_.others = request.others;
    if (!phone_.sensors.empty())
      made_.period = std::chrono::nanoseconds(std::chrono::seconds(1)) / phone_.sensors.front().rate;
  }

  std::uint64_t cases() const { return cases_; }

  std::vector<Prediction> predict(const Failures& failures, ErrorPlace place = ErrorPlace::kGiven) const {
    std::vector<sensor_oracle::Failure> predicted;
    for (const Failure& failure : failures) predicted.push_back(predictedOf(failure));
    return sensor_oracle::predict(phone_, request_, predicted, place == ErrorPlace::kGiven);
  }
  // How many calls the run makes at most.
  std::size_t calls(const Failures& failures) const {
    std::size_t most = 0;
    for (const Prediction& prediction : predict(failures)) most = std::max(most, prediction.calls);
    return most;
  }

  // A run under a seed of its own, which must be one of those that are predicted.
  SensorRun check(const Failures& failures, ErrorPlace place) {
    std::vector<Fault> faults;
    for (const Failure& failure : failures) faults.push_back(faultOf(failure));
    SensorRun run = runSensor(scenario_, made_, faults, place, ++cases_);
    const std::vector<Prediction> predictions = predict(failures, place);
    const auto same = std::ranges::find(predictions, run.told, &Prediction::told);
    const Prediction& prediction = same == predictions.end() ? predictions.front() : *same;
    EXPECT_EQ(run.told, prediction.told) << testing::PrintToString(failures);
    EXPECT_EQ(run.calls, prediction.calls) << testing::PrintToString(failures);
    EXPECT_EQ(run.fired, prediction.fired) << testing::PrintToString(failures);
    expectInTime(run, failures);
    return run;
  }

  // The same, under further seeds until each of the failures has happened once.
  void checkHappening(const Failures& failures, ErrorPlace place) {
    const std::vector<std::uint64_t> once(failures.size(), 1);
    for (int tries = 0; tries < 50; ++tries) {
      if (check(failures, place).fired == once || testing::Test::HasFailure()) return;
    }
    ADD_FAILURE() << "did not happen: " << testing::PrintToString(failures);
  }

 private:
  // No run takes longer than its timeout, what is late, and what others do with the loop.
  void expectInTime(const SensorRun& run, const Failures& failures) const {
    if (request_.timeout >= kEndlessSeconds) return;
    Time longest = static_cast<Time>(request_.timeout) * 1000 * kMillisecond + request_.others.source.value_or(0);
    for (std::size_t i = 0; i < failures.size(); ++i) {
      longest += failures[i].kind.delay * static_cast<Time>(run.fired[i]);
    }
    EXPECT_LE(run.ended.count(), longest) << testing::PrintToString(failures);
  }

  const Phone phone_;
  const Request request_;
  const Scenario scenario_;
  SensorRequest made_;
  std::uint64_t cases_ = 0;
};

Comparison comparisonOf(const Sweep& sweep) {
  Scenario scenario = scenarioOf(sweep.phone);
  if (sweep.scenario != nullptr) scenario = readScenario(sweep.scenario);
  return {sweep.phone,
          sweep.request,
          std::move(scenario),
          {{"images", sweep.request.images}, {"timeout", sweep.request.timeout}}};
}

class SensorImagesSweep : public testing::TestWithParam<Sweep> {
 protected:
  void TearDown() override { std::cout << "[sweep] " << GetParam().name << ": " << runs.cases() << " cases\n"; }

  Comparison runs = comparisonOf(GetParam());
};

TEST_P(SensorImagesSweep, ARunWithoutFailuresIsAsPredicted) {
  const bool isStream = GetParam().request.receiver.has_value();
  for (int seeds = 0; seeds < 5; ++seeds) {
    for (const ErrorPlace place : kPlaces) {
      const SensorRun run = runs.check({}, place);
      const std::string success = isStream ? "\nopened\n" : "\nreturned a result\n";
      EXPECT_EQ(run.told.find(success) != std::string::npos, GetParam().succeeds) << run.told;
    }
  }
}

TEST_P(SensorImagesSweep, EveryCallMayGoWrong) {
  const std::size_t calls = runs.calls({});
  ASSERT_GT(calls, 0U);
  for (std::uint64_t call = 1; call <= calls; ++call) {
    for (const Kind& kind : {kFails, kAnswersNothing, kHangs, kIsLate, kIsVeryLate}) {
      for (const ErrorPlace place : kPlaces) runs.checkHappening({{kind, call}}, place);
      ASSERT_FALSE(HasFailure());
    }
  }
  // One more than there are does nothing.
  EXPECT_EQ(runs.check({{kFails, calls + 1}}, ErrorPlace::kGiven).fired, std::vector<std::uint64_t>{0});
}

TEST_P(SensorImagesSweep, EveryOperationMayGoWrongAtEachOccurrenceAndAlways) {
  for (const Operation& operation : kOperations) {
    if (operation.service != OperationService::kSensors) continue;
    const std::string name(operation.name);
    std::uint64_t occurrences = 0;
    for (const Prediction& prediction : runs.predict({{{"", FaultAction::kDelay}, {}, name}})) {
      occurrences = std::max(occurrences, prediction.fired.front());
    }
    for (std::uint64_t nth = 1; nth <= occurrences; ++nth) {
      runs.checkHappening({{kFails, nth, name}}, ErrorPlace::kGiven);
    }
    if (occurrences == 0) continue;
    for (const Kind& kind : {kFails, kAnswersNothing, kHangs, kIsLate, kIsVeryLate}) {
      EXPECT_GT(runs.check({{kind, {}, name}}, ErrorPlace::kGiven).fired.front(), 0U) << name << ' ' << kind.name;
    }
    ASSERT_FALSE(HasFailure());
  }
}

class SensorImagesSweepOfPairs : public SensorImagesSweep {};

// The second one in the run that the first one leads to; when one of them only takes longer, they may meet one call.
TEST_P(SensorImagesSweepOfPairs, EveryTwoCallsMayGoWrong) {
  const std::pair<Kind, Kind> pairs[] = {{kAnswersNothing, kFails},
                                         {kAnswersNothing, kHangs},
                                         {kAnswersNothing, kIsVeryLate},
                                         {kIsLate, kFails},
                                         {kIsLate, kIsVeryLate}};
  const std::size_t calls = runs.calls({});
  for (std::uint64_t first = 1; first <= calls; ++first) {
    for (const auto& [firstKind, secondKind] : pairs) {
      const bool mayMeet = firstKind.delay != 0 || secondKind.delay != 0;
      const std::size_t last = runs.calls({{firstKind, first}});
      for (std::uint64_t second = mayMeet ? first : first + 1; second <= last; ++second) {
        runs.checkHappening({{firstKind, first}, {secondKind, second}}, ErrorPlace::kGiven);
        ASSERT_FALSE(HasFailure());
      }
    }
  }
}

std::string nameOfSweep(const testing::TestParamInfo<Sweep>& sweep) { return sweep.param.name; }
INSTANTIATE_TEST_SUITE_P(Phones, SensorImagesSweep, testing::ValuesIn(kSweeps), nameOfSweep);

// Without those that make the same calls in the same order as another one.
std::vector<Sweep> sweepsOfPairs() {
  const std::set<std::string> likeAnother{"OneImage",
                                          "FiveImagesOfTheHealthyPhone",
                                          "NoImageWanted",
                                          "TooFewImages",
                                          "SlowSensor",
                                          "EndlessTime",
                                          "FrameIDsThatWrap",
                                          "OtherUsage",
                                          "OtherUsagePage",
                                          "OtherReportsOnly",
                                          "RemovedAtOnce",
                                          "AsManyImagesAsThereAre",
                                          "ErrorBehindTheLastImage",
                                          "StreamClosedByItsDelegate",
                                          "AnotherDevice",
                                          "LoopStoppedBeforeTheFirstImage"};
  std::vector<Sweep> sweeps;
  for (const Sweep& sweep : kSweeps) {
    if (!likeAnother.contains(sweep.name)) sweeps.push_back(sweep);
  }
  EXPECT_EQ(sweeps.size() + likeAnother.size(), std::size(kSweeps));
  return sweeps;
}
INSTANTIATE_TEST_SUITE_P(Phones, SensorImagesSweepOfPairs, testing::ValuesIn(sweepsOfPairs()), nameOfSweep);

// What the sensor sends after the run, since it could not be closed, finds nobody any more.
TEST(SensorImagesSweepOfTriples, ASensorThatCannotBeClosedTellsTheExperimentNothingAfterItsRun) {
  const std::set<std::string> names{"OneImage",   "TwoImages", "LastImageAtTheEndOfTheTime",
                                    "SharedLoop", "BusyLoop",  "LoopStopped"};
  std::uint64_t cases = 0;
  for (const Sweep& sweep : kSweeps) {
    if (!names.contains(sweep.name)) continue;
    Comparison runs = comparisonOf(sweep);
    for (const Kind& kind : {kFails, kAnswersNothing}) {
      runs.checkHappening({{kind, 2, "HidDevice.setInputReportCallback"},
                           {kind, 1, "HidDevice.unscheduleFromRunLoop"},
                           {kind, 1, "HidDevice.close"}},
                          ErrorPlace::kGiven);
    }
    cases += runs.cases();
  }
  EXPECT_GE(cases, 2 * names.size());
  std::cout << "[sweep] " << cases << " cases\n";
}

// A report that is due with the end of the time is in time or not, as the seed will have it.
TEST(SensorImagesSweepOfSeeds, AReportAtTheEndOfTheTimeComesInTimeOrTooLate) {
  std::uint64_t cases = 0;
  for (const Sweep& sweep : kSweeps) {
    Comparison runs = comparisonOf(sweep);
    const std::vector<Prediction> predictions = runs.predict({});
    std::set<std::string> told;
    for (int seeds = 0; seeds < (predictions.size() > 1 ? 40 : 2); ++seeds) {
      told.insert(runs.check({}, ErrorPlace::kGiven).told);
    }
    EXPECT_EQ(told.size(), predictions.size()) << sweep.name;
    cases += runs.cases();
  }
  std::cout << "[sweep] " << cases << " cases\n";
}

TEST(SensorImagesSweepOfParameters, EveryParameterMayBeMissingOrOdd) {
  constexpr std::uint64_t kMaxCount = std::numeric_limits<std::uint64_t>::max();
  const struct {
    const char* name;
    std::optional<Value> value;
    std::uint64_t meaning;
  } rows[] = {
      {"missing", std::nullopt, 0},
      {"one", 1, 1},
      {"unsigned", std::uint64_t{2}, 2},
      {"true", true, 1},
      {"false", false, 0},
      {"a fraction", 2.999, 2},
      {"a 32-bit float", 1.5F, 1},
      {"less than one", 0.999, 0},
      {"a little below zero", -0.5, 0},
      {"minus three as a double", -3.0, 0},
      {"minus one", -1, kMaxCount},
      {"the least integer", std::numeric_limits<std::int64_t>::min(), std::uint64_t{1} << 63U},
      {"the largest number", kMaxCount, kMaxCount},
      {"a huge double", 1e300, kMaxCount},
      {"infinity", std::numeric_limits<double>::infinity(), kMaxCount},
      {"minus infinity", -std::numeric_limits<double>::infinity(), 0},
      {"not a number", std::numeric_limits<double>::quiet_NaN(), 0},
      {"a string", "2", 0},
      {"a list", Array{2}, 0},
      {"a dictionary", Dictionary{{"images", 2}}, 0},
      {"bytes", Bytes{2}, 0},
      {"a date", Date{}, 0},
  };
  std::uint64_t cases = 0;
  for (const auto& images : rows) {
    for (const auto& timeout : rows) {
      Dictionary parameters{{"Images", 7}, {"timeout ", 7}, {"duration", 7}};
      if (images.value) parameters.set("images", *images.value);
      if (timeout.value) parameters.set("timeout", *timeout.value);
      const Request request{.images = images.meaning, .timeout = timeout.meaning};
      const Phone phone = phoneWith({.count = 4});
      Comparison runs(phone, request, scenarioOf(phone), parameters);
      runs.check({}, ErrorPlace::kGiven);
      ASSERT_FALSE(HasFailure()) << images.name << " images, " << timeout.name << " seconds";
      cases += runs.cases();
    }
  }
  std::cout << "[sweep] " << cases << " cases\n";
}

TEST(SensorImagesSweepOfDisplays, EveryPropertyOfTheDisplayMayBeMissingOrOdd) {
  const auto published = [](const Value& power) {
    return Dictionary{
        {"DSPLY Debug Info", Dictionary{{"DSPLY power info", Dictionary{{"DSPLY power info panel", power}}}}}};
  };
  const struct {
    const char* name;
    Dictionary properties;
    Power power;
    bool hasProperty = true;
  } rows[] = {
      {"nothing", {}, Power::kUnknown, false},
      {"another property", {{"DSPLY debug info", 1}}, Power::kUnknown, false},
      {"a number", {{"DSPLY Debug Info", 1}}, Power::kUnknown},
      {"an empty dictionary", {{"DSPLY Debug Info", Dictionary()}}, Power::kUnknown},
      {"no inner dictionary", {{"DSPLY Debug Info", Dictionary{{"DSPLY power info", 1}}}}, Power::kUnknown},
      {"an empty inner dictionary",
       {{"DSPLY Debug Info", Dictionary{{"DSPLY power info", Dictionary()}}}},
       Power::kUnknown},
      {"the entry in the outer dictionary",
       {{"DSPLY Debug Info", Dictionary{{"DSPLY power info panel", 1}}}},
       Power::kUnknown},
      {"one", published(1), Power::kOn},
      {"two", published(2), Power::kOn},
      {"minus one", published(-1), Power::kOn},
      {"true", published(true), Power::kOn},
      {"a fraction", published(0.25), Power::kOn},
      {"zero", published(0), Power::kOff},
      {"zero as a double", published(0.0), Power::kOff},
      {"false", published(false), Power::kOff},
  };
  std::uint64_t cases = 0;
  for (const auto& row : rows) {
    const Phone phone{.display = {.power = row.power, .hasProperty = row.hasProperty}};
    Scenario scenario = scenarioOf(phone);
    scenario.display.properties = row.properties;
    Comparison runs(phone, {}, scenario, {{"images", 2}, {"timeout", 1}});
    for (const ErrorPlace place : kPlaces) runs.check({}, place);
    for (std::uint64_t call = 1; call <= runs.calls({}); ++call) {
      for (const Kind& kind : {kFails, kAnswersNothing, kHangs, kIsVeryLate}) {
        runs.checkHappening({{kind, call}}, ErrorPlace::kGiven);
      }
    }
    ASSERT_FALSE(HasFailure()) << row.name;
    cases += runs.cases();
  }
  std::cout << "[sweep] " << cases << " cases\n";
}

}  // namespace
}  // namespace quazor
