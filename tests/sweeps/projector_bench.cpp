#include "tests/sweeps/projector_bench.h"

#include "backends/faults/operations.h"
#include "backends/simulated/simulated_phone.h"
#include "contract/message_format.h"
#include "diagnostics/projector_fault/tessel_fault_experiment.h"
#include "platform/capture_keys.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <memory>
#include <utility>

namespace quazor {

namespace {

ReportChannelConfig channel(std::string group, std::string subGroup, std::string name) {
  ReportChannelConfig channel;
  channel.group = std::move(group);
  channel.subGroup = std::move(subGroup);
  channel.name = std::move(name);
  return channel;
}

std::string toldError(ErrorPlace place, const DiagnosticErrorPtr& error) {
  if (place == ErrorPlace::kNone) return "no place for an error\n";
  if (error == callersOwnError()) return "error untouched\n";
  if (error == nullptr) return "error emptied\n";
  return "error " + errorChain(error) + '\n';
}

std::string toldTeardown(QZTesselFaultExperiment& experiment, ErrorPlace place) {
  DiagnosticErrorPtr error = callersOwnError();
  const bool tornDown = experiment.teardown(place == ErrorPlace::kGiven ? &error : nullptr);
  return (tornDown ? "torn down\n" : "not torn down\n") + toldError(place, error);
}

std::string toldBuffers(const SimulatedPhone& phone) {
  std::string told;
  for (const SimulatedPhone::HeldBuffer& buffer : phone.buffersHeld()) {
    told += (told.empty() ? buffer.camera + ' ' : ", ") + std::to_string(buffer.frame + 1);
  }
  return "buffers held: " + (told.empty() ? "none" : told) + '\n';
}

}  // namespace

Scenario projectorScenario() {
  Scenario scenario;
  scenario.title = "A phone whose projector can be tried";
  Camera front;
  front.id = "front";
  front.port = port_type::FrontFacingCamera;
  front.formats.resize(2);
  Camera infrared;
  infrared.id = "front-infrared";
  infrared.port = port_type::FrontFacingInfraredCamera;
  infrared.formats.resize(2);
  infrared.errorCounters = Dictionary{{"I2CErrorCount", 1},  {"MIPIErrorCount", 2}, {"LPDPErrorCount", 3},
                                      {"UARTErrorCount", 4}, {"SIFErrorCount", 5},  {"ProjectorErrorCount", 6}};
  infrared.projector = Projector{};
  infrared.delivery.events = {{std::chrono::milliseconds(10), 1}};
  scenario.cameras = {front, infrared};

  scenario.reports = {channel("K42ISP", "K42ISP Events", "Number ZE FAULT_A"),
                      channel("K42ISP", "K42ISP Events of old", "Number ZE FAULT_B"),
                      channel("Camera", "K42ISP Events", "Number ZE FAULT_C"),
                      channel("K42ISP", "K42ISP Events", "Number Fenk NTC"),
                      channel("K42ISP", "K42ISP Events", "Number Dwna NTC")};
  scenario.reports[0].count = 7;
  scenario.reports[0].steps = {{std::chrono::milliseconds(1), 2}};
  scenario.reports[2].count = 40;
  scenario.reports[2].steps = {{std::chrono::milliseconds(1), 5}};
  scenario.reports[4].count = std::nullopt;
  return scenario;
}

Camera& infraredCamera(Scenario& scenario) {
  return *std::ranges::find(scenario.cameras, port_type::FrontFacingInfraredCamera, &Camera::port);
}

void setFrame(Scenario& scenario, std::uint64_t number, FrameMetadata metadata) {
  infraredCamera(scenario).projector->frames[number - 1] = std::move(metadata);
}

FrameMetadata unlitFrame() {
  FrameMetadata metadata;
  metadata.overrides = {{std::string(capture_key::InfraredLightSource), 0}};
  return metadata;
}

FrameMetadata unlitFrameForSafety() {
  FrameMetadata metadata = unlitFrame();
  metadata.overrides.set("HardwareEvents", 8192);
  return metadata;
}

std::string toldMeasurements(int frames, int faultA, int faultC) {
  return formatMessage(R"(FrameCount = %d frames
I2C = 1 errors
MIPI = 2 errors
LPDP = 3 errors
UART = 4 errors
SIF = 5 errors
Projector = 6 errors
Number ZE FAULT_A = %d events
Number ZE FAULT_C = %d events
Number Fenk NTC = 0 events
Number Dwna NTC = 0 events
)",
                       frames, faultA, faultC);
}

std::string toldResult(int frames, int faultA, int faultC) {
  return R"(front-infrared get ErrorCounters
front-infrared stop
ReportChannelSet snapshot
ReportSnapshot snapshotWithBaseline
returned a result
error untouched
)" + toldMeasurements(frames, faultA, faultC);
}

std::string toldEnd(const std::string& held) { return kTornDown + ("buffers held: " + held + '\n'); }

ProjectorRun runProjector(const Scenario& scenario, const ProjectorRequest& request, const std::vector<Fault>& faults,
                          ErrorPlace place) {
  RunTranscript transcript;
  ProjectorRun run;
  SimulatedPhone phone(scenario, PhoneTime::kVirtual, request.seed);
  phone.observeCalls([&, addCall = addingTo(transcript)](const PlatformCall& call) {
    addCall(call);
    if (call.operation != report_operation::kFilter) ++run.calls;
  });
  for (const Fault& fault : faults) phone.addFault(fault);
  const auto experiment = std::make_shared<QZTesselFaultExperiment>(phone.platform());
  EXPECT_TRUE(experiment->setupWithParameters({{"frameCount", request.frameCount}, {"timeout", request.timeout}},
                                              nullptr, nullptr));
  run.told = runAndTell(*experiment, place, transcript);

  const std::size_t before = transcript.text().size();
  phone.scheduler()->blockUntil(request.watched, "the bench watches");
  const std::string tornDown = toldTeardown(*experiment, place);
  run.told += "afterwards\n" + transcript.text().substr(before) + tornDown + toldBuffers(phone);
  EXPECT_EQ(phone.strayReleases(), 0U);
  for (const FaultStatus& status : phone.faultStatus()) run.fired.push_back(status.fired);
  return run;
}

}  // namespace quazor
