// A simulated phone for the projector fault experiment, and everything that can be observed of a run.
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

// A front camera, then the infrared camera "front-infrared" with a projector: 30 frames per second, an event after 10
// ms, and error counters from 1 to 6. The fault report has four of its five report channels: one that increases by 2 in
// the first millisecond of streaming, one in another group, one that is constant and one without a count.
Scenario projectorScenario();
// The infrared camera of such a scenario, for modification.
Camera& infraredCamera(Scenario& scenario);
// Sets the metadata of a frame of the infrared camera; frames are numbered from 1, like in the experiment.
void setFrame(Scenario& scenario, std::uint64_t number, FrameMetadata metadata);

// Metadata of a frame that the projector did not light.
FrameMetadata unlitFrame();
FrameMetadata unlitFrameForSafety();

struct ProjectorRequest {
  Value frameCount = 3;
  Value timeout = 0.21;
  std::chrono::milliseconds watched{250};  // the end of the observation, on the phone's clock
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

// Sets up a new experiment, runs it on a new phone in virtual time, lets time pass, and tears it down. The run and the
// teardown get an error variable, which contains callersOwnError() before each, or none.
ProjectorRun runProjector(const Scenario& scenario, const ProjectorRequest& request, const std::vector<Fault>& faults,
                          ErrorPlace place);

}  // namespace quazor
