// Makes every call and every pair of calls of a capture of sensor images go wrong in every way, and checks each run
// with the rules.
#include "backends/faults/operations.h"
#include "backends/simulated/scenario/scenario.h"
#include "tests/support/run_transcript.h"
#include "tests/sweeps/sensor_images_bench.h"
#include "tests/sweeps/sensor_images_oracle.h"
#include "tests/sweeps/sensor_images_phones.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <chrono>
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

using namespace std::chrono_literals;
using sensor_oracle::Known;
using sensor_oracle::Receiver;
using Nanoseconds = std::chrono::nanoseconds;

// The ways in which a call goes wrong. No report is due when a delay ends, except those due at the timeout.
struct Kind {
  const char* name;
  FaultAction action;
  bool hasError = false;
  Nanoseconds delay{0};
};
const Kind kFails{"fails", FaultAction::kFail, true};
const Kind kAnswersNothing{"answers nothing", FaultAction::kNothing};
const Kind kHangs{"hangs", FaultAction::kHang};
const Kind kIsLate{"is late", FaultAction::kDelay, false, 62'300us};
const Kind kIsVeryLate{"is very late", FaultAction::kDelay, false, 1'234'500us};

// A call that goes wrong: the nth of the operation, or all of them.
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
  fault.seconds = std::chrono::duration<double>(failure.kind.delay).count();
  return fault;
}

// The numbers of the first reports without an image.
std::set<std::uint64_t> reportsWithoutImage(const HidDeviceConfig& sensor) {
  const auto holdsImage = [](const HidReportShape& shape) {
    return !shape.error && shape.reportID.value_or(0x76) == 0x76 && shape.length.value_or(792) >= 792;
  };
  std::set<std::uint64_t> numbers;
  for (std::uint64_t number = 0; number < 100; ++number) {
    const auto single = sensor.single.find(number);
    if (!holdsImage(single == sensor.single.end() ? sensor.every : single->second)) numbers.insert(number);
  }
  if (sensor.removedAfter) numbers.insert(*sensor.removedAfter);
  return numbers;
}

Known knownOf(const Scenario& phone, const Request& request, const std::string& displayProblem) {
  Known known;
  known.receiver = request.receiver;
  known.images = request.images;
  known.timeout = request.timeout;
  known.othersUseTheLoop = request.others.source || request.others.stop;
  known.displayProblem = displayProblem;
  known.errors = {"SensorErrorDomain code -536870174: The sensor does not answer.",
                  "SimulatedHidErrorDomain code 4: display-sensor has been removed.",
                  "SimulatedHidErrorDomain code 5: display-sensor has no feature report 0xAC.",
                  "SimulatedHidErrorDomain code 6: Feature report 0xAB of display-sensor does not take the value 1."};
  if (phone.hidDevices.empty()) return known;
  known.firstFrameID = phone.hidDevices.front().images.firstFrameID;
  known.noImages = reportsWithoutImage(phone.hidDevices.front());
  return known;
}

constexpr std::array kPlaces{ErrorPlace::kGiven, ErrorPlace::kNone};

// Runs the phones and checks the runs with the rules.
class Runs {
 public:
  Runs(Scenario phone, Request request, const std::string& displayProblem, Dictionary parameters)
      : phone_(std::move(phone)), request_(request), known_(knownOf(phone_, request, displayProblem)) {
    made_.parameters = std::move(parameters);
    made_.receiver = request.receiver;
    made_.watched = std::chrono::seconds(request.timeout);
    made_.others = request.others;
    if (!phone_.hidDevices.empty()) {
      made_.period = Nanoseconds(static_cast<std::int64_t>(1e9 / phone_.hidDevices.front().rate));
    }
  }
  explicit Runs(const Sweep& sweep)
      : Runs(sweep.phone, sweep.request, sweep.displayProblem,
             {{"images", sweep.request.images}, {"timeout", sweep.request.timeout}}) {}

  std::uint64_t cases() const { return cases_; }

  // Performs and checks a run with a distinct seed.
  SensorRun check(const Failures& failures, ErrorPlace place) {
    std::vector<Fault> faults;
    Known known = known_;
    known.hasPlaceForError = place == ErrorPlace::kGiven;
    for (const Failure& failure : failures) {
      faults.push_back(faultOf(failure));
      if (failure.kind.hasError) known.errors.insert("SweepErrorDomain code -3: " + messageOf(failure));
      if (failure.kind.action == FaultAction::kNothing) known.mayFailSilently = true;
      if (failure.kind.action == FaultAction::kDelay) known.startsInTime = false;
    }
    SensorRun run = runSensor(phone_, made_, faults, place, ++cases_);
    EXPECT_EQ(brokenRule(known, run.told), "") << testing::PrintToString(failures) << '\n' << run.told;
    EXPECT_EQ(run.fired.size(), failures.size());
    const bool hung = run.told.find(" hangs\n") != std::string::npos;
    bool shouldHang = false;
    for (std::size_t i = 0; i < failures.size(); ++i) {
      shouldHang = shouldHang || (failures[i].kind.action == FaultAction::kHang && run.fired[i] > 0);
    }
    EXPECT_EQ(hung, shouldHang) << testing::PrintToString(failures) << '\n' << run.told;
    expectInTime(run, failures);
    return run;
  }

  // The same, with further seeds until each of the failures has occurred once.
  SensorRun checkHappening(const Failures& failures, ErrorPlace place) {
    const std::vector<std::uint64_t> once(failures.size(), 1);
    SensorRun run;
    for (int tries = 0; tries < 50; ++tries) {
      run = check(failures, place);
      if (run.fired == once || testing::Test::HasFailure()) return run;
    }
    ADD_FAILURE() << "did not happen: " << testing::PrintToString(failures);
    return run;
  }

 private:
  // No run takes longer than its timeout plus the delays and the other uses of the loop.
  void expectInTime(const SensorRun& run, const Failures& failures) const {
    if (request_.timeout >= kEndlessSeconds) return;
    Nanoseconds longest = std::chrono::seconds(request_.timeout) + request_.others.source.value_or(0ns);
    for (std::size_t i = 0; i < failures.size(); ++i) {
      longest += failures[i].kind.delay * static_cast<std::int64_t>(run.fired[i]);
    }
    EXPECT_LE(run.ended, longest) << testing::PrintToString(failures);
  }

  const Scenario phone_;
  const Request request_;
  const Known known_;
  SensorRequest made_;
  std::uint64_t cases_ = 0;
};

class SensorImagesSweep : public testing::TestWithParam<Sweep> {
 protected:
  void TearDown() override { std::cout << "[sweep] " << GetParam().name << ": " << runs.cases() << " cases\n"; }

  // The number of calls in a run without failures.
  std::size_t calls() { return runs.check({}, ErrorPlace::kGiven).calls; }

  Runs runs{GetParam()};
};

TEST_P(SensorImagesSweep, ARunWithoutFailuresEndsAsItShould) {
  const bool isStream = GetParam().request.receiver != Receiver::kExperiment;
  for (int seeds = 0; seeds < 5; ++seeds) {
    for (const ErrorPlace place : kPlaces) {
      const SensorRun run = runs.check({}, place);
      const std::string success = isStream ? "\nopened\n" : "\nreturned a result\n";
      EXPECT_EQ(run.told.find(success) != std::string::npos, GetParam().succeeds) << run.told;
    }
  }
}

TEST_P(SensorImagesSweep, EveryCallMayGoWrong) {
  const std::size_t calls = this->calls();
  ASSERT_GT(calls, 0U);
  for (std::uint64_t call = 1; call <= calls; ++call) {
    for (const Kind& kind : {kFails, kAnswersNothing, kHangs, kIsLate, kIsVeryLate}) {
      for (const ErrorPlace place : kPlaces) runs.checkHappening({{kind, call}}, place);
      ASSERT_FALSE(HasFailure());
    }
  }
  // A failure after the last call has no effect.
  EXPECT_EQ(runs.check({{kFails, calls + 1}}, ErrorPlace::kGiven).fired, std::vector<std::uint64_t>{0});
}

TEST_P(SensorImagesSweep, EveryOperationMayGoWrongAtEachOccurrenceAndAlways) {
  for (const Operation& operation : kOperations) {
    if (operation.service != OperationService::kSensors) continue;
    const std::string name(operation.name);
    const Kind isNoticed{"is noticed", FaultAction::kDelay};
    const std::uint64_t occurrences = runs.check({{isNoticed, {}, name}}, ErrorPlace::kGiven).fired.front();
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

// The second failure is one in the run that results from the first. If one of them is only a delay, both may apply to
// one call.
TEST_P(SensorImagesSweepOfPairs, EveryTwoCallsMayGoWrong) {
  const std::pair<Kind, Kind> pairs[] = {{kAnswersNothing, kFails},
                                         {kAnswersNothing, kHangs},
                                         {kAnswersNothing, kIsVeryLate},
                                         {kIsLate, kFails},
                                         {kIsLate, kIsVeryLate}};
  const std::size_t calls = this->calls();
  for (std::uint64_t first = 1; first <= calls; ++first) {
    for (const auto& [firstKind, secondKind] : pairs) {
      const bool mayMeet = firstKind.delay > 0ns || secondKind.delay > 0ns;
      const std::size_t last = runs.checkHappening({{firstKind, first}}, ErrorPlace::kGiven).calls;
      for (std::uint64_t second = mayMeet ? first : first + 1; second <= last; ++second) {
        runs.checkHappening({{firstKind, first}, {secondKind, second}}, ErrorPlace::kGiven);
        ASSERT_FALSE(HasFailure());
      }
    }
  }
}

std::string nameOfSweep(const testing::TestParamInfo<Sweep>& sweep) { return sweep.param.name; }
INSTANTIATE_TEST_SUITE_P(Phones, SensorImagesSweep, testing::ValuesIn(sensorSweeps()), nameOfSweep);

// Omits phones whose runs make the same calls in the same order as those of another phone.
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
  for (const Sweep& sweep : sensorSweeps()) {
    if (!likeAnother.contains(sweep.name)) sweeps.push_back(sweep);
  }
  EXPECT_EQ(sweeps.size() + likeAnother.size(), sensorSweeps().size());
  return sweeps;
}
INSTANTIATE_TEST_SUITE_P(Phones, SensorImagesSweepOfPairs, testing::ValuesIn(sweepsOfPairs()), nameOfSweep);

// A sensor that could not be closed continues to send after the run, but there is no receiver.
TEST(SensorImagesSweepOfTriples, ASensorThatCannotBeClosedTellsTheExperimentNothingAfterItsRun) {
  const std::set<std::string> names{"OneImage",   "TwoImages", "LastImageAtTheEndOfTheTime",
                                    "SharedLoop", "BusyLoop",  "LoopStopped"};
  std::uint64_t cases = 0;
  for (const Sweep& sweep : sensorSweeps()) {
    if (!names.contains(sweep.name)) continue;
    Runs runs(sweep);
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

// Whether a report that is due at the timeout arrives in time depends on the seed.
TEST(SensorImagesSweepOfSeeds, AReportAtTheEndOfTheTimeComesInTimeOrTooLate) {
  std::uint64_t cases = 0;
  for (const Sweep& sweep : sensorSweeps()) {
    Runs runs(sweep);
    std::set<std::string> told;
    for (int seeds = 0; seeds < 40; ++seeds) told.insert(runs.check({}, ErrorPlace::kGiven).told);
    EXPECT_EQ(told.size(), sweep.dependsOnSeed ? 2U : 1U) << sweep.name;
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
      Runs runs(withReports(4), request, "", parameters);
      runs.check({}, ErrorPlace::kGiven);
      ASSERT_FALSE(HasFailure()) << images.name << " images, " << timeout.name << " seconds";
      cases += runs.cases();
    }
  }
  std::cout << "[sweep] " << cases << " cases\n";
}

TEST(SensorImagesSweepOfDisplays, EveryPropertyOfTheDisplayMayBeMissingOrOdd) {
  const struct {
    const char* name;
    Dictionary properties;
    std::string problem;
  } rows[] = {
      {"nothing", {}, kNoPowerState},
      {"another property", {{"DSPLY debug info", 1}}, kNoPowerState},
      {"a number", {{"DSPLY Debug Info", 1}}, kNoPowerState},
      {"an empty dictionary", {{"DSPLY Debug Info", Dictionary()}}, kNoPowerState},
      {"no inner dictionary", {{"DSPLY Debug Info", Dictionary{{"DSPLY power info", 1}}}}, kNoPowerState},
      {"an empty inner dictionary",
       {{"DSPLY Debug Info", Dictionary{{"DSPLY power info", Dictionary()}}}},
       kNoPowerState},
      {"the entry in the outer dictionary",
       {{"DSPLY Debug Info", Dictionary{{"DSPLY power info panel", 1}}}},
       kNoPowerState},
      {"one", published(1), ""},
      {"two", published(2), ""},
      {"minus one", published(-1), ""},
      {"true", published(true), ""},
      {"a fraction", published(0.25), ""},
      {"zero", published(0), kNotPowered},
      {"zero as a double", published(0.0), kNotPowered},
      {"false", published(false), kNotPowered},
  };
  std::uint64_t cases = 0;
  for (const auto& row : rows) {
    Runs runs(withDisplay(row.properties), {}, row.problem, {{"images", 2}, {"timeout", 1}});
    std::size_t calls = 0;
    for (const ErrorPlace place : kPlaces) calls = runs.check({}, place).calls;
    for (std::uint64_t call = 1; call <= calls; ++call) {
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
