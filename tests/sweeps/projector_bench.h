// A simulated phone to run the projector fault experiment on, and all that can be seen of such a run.
#pragma once

#include "backends/faults/fault.h"
#include "backends/simulated/scenario/scenario.h"
#include "contract/value.h"
#include "tests/support/run_transcript.h"
#include "tests/sweeps/call_sweep.h"

#include <chrono>
#include <cstdint>
#include <string>
#include <vector>

namespace quazor {

// A front camera, then the infrared camera, "front-infrared", with a projector: 30 frames per second, an event after
// 10 ms, and 1 to 6 errors on its counters. Five report channels, of which the fault report has four: one that counts
// 2 up in the first millisecond of streaming, one in another group, one that stands still and one without a count.
Scenario projectorScenario();
// The infrared camera of such a scenario, to change it.
Camera& infraredCamera(Scenario& scenario);
// Makes the metadata of the infrared camera's frame special; frames count from 1, as the experiment counts them.
void setFrame(Scenario& scenario, std::uint64_t number, FrameMetadata metadata);

// Frames that no projector lit.
FrameMetadata unlitFrame();
FrameMetadata unlitFrameForSafety();

struct ProjectorRequest {
  Value frameCount = 3;
  Value timeout = 0.21;
  std::chrono::milliseconds watched{250};  // when, on the phone's clock, the bench stops to watch
  std::uint64_t seed = 1;
};

// The run as runAndTell() tells it; then "afterwards" and what happens on the phone until `watched`; then
//   torn down | not torn down
//   error untouched | error emptied | error (as errorChain()) | no place for an error
//   buffers held: front-infrared 3, 4 | buffers held: none
// Frames count from 1 here too, and the teardown's calls among those that can fail.
using ProjectorRun = SweptRun;

// What is told of the result of a run on projectorScenario() that got these frames and whose two counters that count
// came to these events: its measurements, and before them how it is got.
std::string toldMeasurements(int frames, int faultA, int faultC);
std::string toldResult(int frames, int faultA, int faultC);

// What is told of a teardown that goes well, without and with the line of the buffers.
inline constexpr const char* kTornDown = "device invalidate\ntorn down\nerror untouched\n";
std::string toldEnd(const std::string& held = "none");

// Sets a new experiment up, runs it on a new phone in virtual time, lets time pass, and tears it down. The place for an
// error is the run's and, holding callersOwnError() once more, the teardown's.
ProjectorRun runProjector(const Scenario& scenario, const ProjectorRequest& request, const std::vector<Fault>& faults,
                          ErrorPlace place);

}  // namespace quazor
