#include "tests/sweeps/camera_sync_bench.h"

#include "backends/simulated/simulated_phone.h"
#include "diagnostics/camera_sync/camera_sync_experiment.h"
#include "platform/capture_keys.h"
#include "tests/support/call_failures.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <ostream>
#include <utility>
#include <vector>

namespace quazor {

namespace {

Camera camera(std::string id, std::string_view port, std::uint64_t firstFrameOffset, int errors) {
  Camera camera;
  camera.id = std::move(id);
  camera.port = port;
  camera.formats.resize(20);
  camera.firstFrameOffset = firstFrameOffset;
  camera.errorCounters = Dictionary{{"I2CErrorCount", errors}};
  return camera;
}

// The offset of the nth occurrence of the line; the test fails if there is none.
std::size_t findLine(std::string_view text, std::string_view line, std::uint64_t occurrence) {
  const std::string wanted = std::string(line) + '\n';
  std::size_t at = 0;
  while (at < text.size()) {
    if (text.substr(at).starts_with(wanted) && --occurrence == 0) return at;
    at = text.find('\n', at);
    if (at != std::string_view::npos) ++at;
  }
  ADD_FAILURE() << "the healthy run has no line " << line;
  return 0;
}

std::string expectedText(const FaultRow& row, std::string_view healthyRun) {
  std::string_view line = row.told;
  line = line.substr(0, line.find('\n'));
  constexpr std::string_view kFailed = " -> failed";
  EXPECT_TRUE(line.ends_with(kFailed)) << row.name;
  line.remove_suffix(kFailed.size());
  const std::size_t at = findLine(healthyRun, line, row.call.occurrence);
  std::string text = std::string(healthyRun.substr(0, at)) + row.told;
  if (!row.resumesAt.empty()) {
    const std::string_view rest = healthyRun.substr(at);
    text += rest.substr(findLine(rest, row.resumesAt, 1));
  }
  return text;
}

}  // namespace

Scenario cameraSyncScenario() {
  Scenario scenario;
  scenario.title = "A phone whose cameras can be synchronised";
  scenario.cameras = {camera("back-wide", port_type::BackFacingCamera, 0, 11),
                      camera("back-tele", port_type::BackFacingTelephotoCamera, 1, 22),
                      camera("back-super-wide", port_type::BackFacingSuperWideCamera, 2, 33),
                      camera("front", port_type::FrontFacingCamera, 0, 44),
                      camera("front-infrared", port_type::FrontFacingInfraredCamera, 3, 55)};
  CameraGroup back;
  back.id = "back-cameras";
  back.cameras = {"back-wide", "back-tele", "back-super-wide"};
  back.master = "back-wide";
  CameraGroup front;
  front.id = "front-cameras";
  front.cameras = {"front", "front-infrared"};
  front.master = "front";
  scenario.groups = {back, front};
  return scenario;
}

Scenario withoutMasterConfiguration(Scenario scenario) {
  for (CameraGroup& group : scenario.groups) group.masterConfiguration = false;
  return scenario;
}

Camera& cameraOf(Scenario& scenario, std::string_view id) {
  return *std::find_if(scenario.cameras.begin(), scenario.cameras.end(),
                       [&](const Camera& candidate) { return candidate.id == id; });
}

BenchRun runOnBench(Side side, const Scenario& scenario, const std::optional<Fault>& fault, ErrorPlace place) {
  const std::vector<std::string> backPorts{std::string(port_type::BackFacingCamera),
                                           std::string(port_type::BackFacingTelephotoCamera),
                                           std::string(port_type::BackFacingSuperWideCamera)};
  const std::vector<std::string> frontPorts{std::string(port_type::FrontFacingCamera),
                                            std::string(port_type::FrontFacingInfraredCamera)};
  const bool isBack = side == Side::kBack;

  RunTranscript transcript;
  SimulatedPhone phone(scenario, PhoneTime::kVirtual, 1);
  phone.observeCalls(addingTo(transcript));
  if (fault) phone.addFault(*fault);
  QZCameraSyncExperiment experiment(isBack ? backPorts : frontPorts, isBack ? Array{16, 14, 9} : Array{1, 0}, 30,
                                    phone.platform());
  EXPECT_TRUE(experiment.setupWithParameters({{"duration", 2}}, nullptr, nullptr));
  BenchRun run;
  run.told = runAndTell(experiment, place, transcript);
  if (fault) run.fired = phone.faultStatus().back().fired;
  return run;
}

void PrintTo(const FaultRow& row, std::ostream* out) { *out << row.name; }

void expectToldWithFault(const FaultRow& row, Side side, const Scenario& scenario, std::string_view healthyRun) {
  const std::string expected = expectedText(row, healthyRun);
  for (const bool hasError : {true, false}) {
    Fault fault;
    fault.operation = row.call.operation;
    fault.object = row.call.object;
    fault.property = row.call.property;
    fault.occurrence = row.call.occurrence;
    fault = failing(fault, hasError);
    std::string told = expected;
    replaceAll(told, "{error}", hasError ? "BenchErrorDomain code 7: Broken." : "(null)");
    replaceAll(told, "{cause}", benchCause(hasError));
    SCOPED_TRACE(row.name + (hasError ? ", with an error of its own" : ", without an error of its own"));

    const BenchRun withPlace = runOnBench(side, scenario, fault, ErrorPlace::kGiven);
    EXPECT_EQ(withPlace.told, told);
    EXPECT_EQ(withPlace.fired, 1U);
    const BenchRun withoutPlace = runOnBench(side, scenario, fault, ErrorPlace::kNone);
    EXPECT_EQ(withoutPlace.told, toldWithoutPlace(told));
    EXPECT_EQ(withoutPlace.fired, 1U);
  }
}

void expectTold(std::string_view expected, Side side, const Scenario& scenario) {
  EXPECT_EQ(runOnBench(side, scenario, std::nullopt, ErrorPlace::kGiven).told, expected);
  EXPECT_EQ(runOnBench(side, scenario, std::nullopt, ErrorPlace::kNone).told, toldWithoutPlace(std::string(expected)));
}

std::string healthyUpTo(std::string_view healthyRun, std::string_view line, std::string_view rest) {
  return std::string(healthyRun.substr(0, findLine(healthyRun, line, 1))) + std::string(rest);
}

}  // namespace quazor
