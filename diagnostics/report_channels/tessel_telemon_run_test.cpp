// Complete runs on a simulated phone: healthy ones, and one for every call that can fail.
#include "diagnostics/report_channels/tessel_telemon_experiment.h"

#include "backends/simulated/simulated_phone.h"
#include "diagnostics/report_channels/tessel_telemon_analysis.h"
#include "tests/support/call_failures.h"
#include "tests/support/run_transcript.h"

#include <gtest/gtest.h>

#include <optional>
#include <ostream>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace quazor {
namespace {

ReportChannelConfig channel(std::string group, std::string subGroup, std::string name,
                            std::optional<std::uint64_t> count) {
  ReportChannelConfig channel;
  channel.group = std::move(group);
  channel.subGroup = std::move(subGroup);
  channel.name = std::move(name);
  channel.count = count;
  return channel;
}

Scenario scenarioOf(std::vector<ReportChannelConfig> channels) {
  Scenario scenario;
  scenario.title = "A phone with report channels";
  scenario.reports = std::move(channels);
  return scenario;
}

// Six channels; the presence report includes the first three.
std::vector<ReportChannelConfig> sixChannels() {
  return {channel("K42ISP", "K42ISP Events", "Number Fenk NTC", 3),
          channel("The K42ISP of old", "K42ISP Events of old", "Number ZE FAULT_A", 0),
          channel("K42ISP", "All K42ISP Events", "Number KT EN_PIN_STATE", 18446744073709549568U),
          channel("Camera", "K42ISP Events", "Number ZE FAULT_B", 1),
          channel("K42ISP", "K42ISP events", "Number ZE FAULT_C", 1),
          channel("k42isp", "K42ISP Events", "Number ZE FAULT_D", 1)};
}

// Makes the first call of the operation fail.
struct Failure {
  const char* operation;
  bool hasError;
};

void expectTold(std::string told, const Scenario& scenario, const std::optional<Failure>& failure = std::nullopt) {
  for (const ErrorPlace place : {ErrorPlace::kGiven, ErrorPlace::kNone}) {
    RunTranscript transcript;
    SimulatedPhone phone(scenario, PhoneTime::kVirtual, 1);
    phone.observeCalls(addingTo(transcript));
    if (failure) {
      Fault fault;
      fault.operation = failure->operation;
      fault.occurrence = 1;
      phone.addFault(failing(fault, failure->hasError));
    }
    if (place == ErrorPlace::kNone) told = toldWithoutPlace(told);
    QZTesselTelemonExperiment experiment(phone.platform());
    EXPECT_EQ(runAndTell(experiment, place, transcript), told);
    if (failure) {
      EXPECT_EQ(phone.faultStatus().front().fired, 1U);
    }
  }
}

// Of the channels of sixChannels() that have all of them a count.
constexpr const char* kThreeSamples = R"(ReportFacility reportWithOnlySimpleChannels
ReportChannelSet reportByFilteringChannels 3
ReportChannelSet snapshot
returned a result
error untouched
Number Fenk NTC = 3 events
Number ZE FAULT_A = 0 events
Number KT EN_PIN_STATE = 18446744073709549568 events
)";

TEST(TesselTelemonRun, SamplesTheChannelsOnce) { expectTold(kThreeSamples, scenarioOf(sixChannels())); }

TEST(TesselTelemonRun, FindsNothingOnAPhoneWithoutSuchChannels) {
  const std::string told = R"(ReportFacility reportWithOnlySimpleChannels
ReportChannelSet reportByFilteringChannels 0
ReportChannelSet snapshot
returned a result
error untouched
)";
  expectTold(told, scenarioOf({}));
  expectTold(told, scenarioOf({channel("Camera", "K42ISP Events", "Number ZE FAULT_B", 1)}));
}

TEST(TesselTelemonRun, LetsALaterChannelOfTheSameNameWin) {
  expectTold(R"(ReportFacility reportWithOnlySimpleChannels
ReportChannelSet reportByFilteringChannels 3
ReportChannelSet snapshot
returned a result
error untouched
Number ZE FAULT_A = 5 events
Number ZE FAULT_B = 4 events
)",
             scenarioOf({channel("K42ISP", "K42ISP Events", "Number ZE FAULT_A", 3),
                         channel("K42ISP", "K42ISP Events", "Number ZE FAULT_B", 4),
                         channel("K42ISP", "K42ISP Events 2", "Number ZE FAULT_A", 5)}));
}

TEST(TesselTelemonRun, FailsWithoutChannels) {
  for (const bool hasError : {true, false}) {
    expectTold(std::string(R"(ReportFacility reportWithOnlySimpleChannels -> failed
returned nothing
error QZTelemonErrorDomain code 100: Could not get simple channels.)") +
                   benchCause(hasError) + "\n",
               scenarioOf(sixChannels()), Failure{"ReportFacility.reportWithOnlySimpleChannels", hasError});
  }
}

TEST(TesselTelemonRun, FailsWithoutASnapshot) {
  for (const bool hasError : {true, false}) {
    expectTold(std::string(R"(ReportFacility reportWithOnlySimpleChannels
ReportChannelSet reportByFilteringChannels 3
ReportChannelSet snapshot -> failed
returned nothing
error QZTelemonErrorDomain code 100: Could not sample the report.)") +
                   benchCause(hasError) + "\n",
               scenarioOf(sixChannels()), Failure{"ReportChannelSet.snapshot", hasError});
  }
}

TEST(TesselTelemonRun, FailsAtTheFirstChannelWithoutACount) {
  std::vector<ReportChannelConfig> channels = sixChannels();
  const std::string told = R"(ReportFacility reportWithOnlySimpleChannels
ReportChannelSet reportByFilteringChannels 3
ReportChannelSet snapshot
returned nothing
error QZTelemonErrorDomain code 100: Could not get the count of )";
  channels[2].count = std::nullopt;
  expectTold(told + "Number KT EN_PIN_STATE.\n", scenarioOf(channels));
  channels[1].count = std::nullopt;
  expectTold(told + "Number ZE FAULT_A.\n", scenarioOf(channels));
  channels[0].count = std::nullopt;
  channels[0].name = "%@ 100 %d";
  expectTold(told + "%@ 100 %d.\n", scenarioOf(channels));
}

TEST(TesselTelemonRun, LeavesChannelsOutsideTheReportWithoutACountAlone) {
  std::vector<ReportChannelConfig> channels = sixChannels();
  for (std::size_t i = 3; i < channels.size(); ++i) channels[i].count = std::nullopt;
  expectTold(kThreeSamples, scenarioOf(channels));
}

TEST(TesselTelemonRun, IsAnalysedUpToTheFirstNameThatWasNotMeasured) {
  const SimulatedPhone phone(scenarioOf(sixChannels()), PhoneTime::kVirtual, 1);
  const auto result = QZTesselTelemonExperiment(phone.platform()).run(nullptr);
  ASSERT_NE(result, nullptr);
  DiagnosticErrorPtr error;
  EXPECT_EQ(QZTesselTelemonAnalysis().analyzeExperimentResult(*result, &error), nullptr);
  EXPECT_EQ(errorChain(error), "QZErrorDomain code 6: Missing measurement for Number Vok INT_ADC_READY_LATCH");
}

}  // namespace
}  // namespace quazor
