// What happened in a run of the projector fault experiment on the fake camera, and whether it was right.
#pragma once

#include "contract/diagnostic_contract.h"
#include "contract/value.h"
#include "tests/support/fake_camera.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// A frame or an event that the camera delivers. Its number is its place in the plan; it is of that second.
struct Delivery {
  bool isEvent = false;
  FrameKind kind = FrameKind::kLit;  // of a frame
  std::size_t thread = 0;            // the camera's threads deliver independently, each its own in the plan's order
  std::chrono::nanoseconds at{0};    // after the start
};

// What a run is given.
struct ProjectorPlan {
  std::vector<Delivery> deliveries;
  std::uint64_t stopCount = 1;
  double timeout = 10;          // seconds
  bool timerIsSlow = false;     // a timeout that is due may reach its queue at any later moment
  bool cameraIsSlow = false;    // everything else may go on while the camera does what it is asked for
  bool stops = true;            // the stream lets itself be stopped
  bool countersAreRead = true;  // the stream has error counters
};
std::string describe(const ProjectorPlan& plan);

// What happened.
struct ProjectorRun {
  // In order, as RunTranscript tells it: the log's lines and
  //   frame 3 attachment MetadataDictionary    as the reading of frame 3 ends
  //   stream get ErrorCounters                 as it begins
  //   stream stop                              as it ends
  //   semaphore signal
  //   host release                             the host lets go of the experiment, after its run
  std::vector<std::string> lines;
  std::vector<std::size_t> delivered;  // the numbers of what reached the handlers, in order
  std::unique_ptr<QZExperimentResult> result;
  DiagnosticErrorPtr error;
  std::vector<int> references;    // to the buffer of each delivery, when all is over
  bool experimentIsGone = false;  // when all is over
};

// What is wrong with the run, in a few words; empty when nothing is. Judges by the rules alone: it follows the lines
// with a small model of its own, and so needs no knowledge of the order in which things came to happen.
std::string problemOf(const ProjectorPlan& plan, const ProjectorRun& run);

}  // namespace quazor
