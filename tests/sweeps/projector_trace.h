// The trace of a run of the projector fault experiment on the hand-written camera, and its verification.
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

// A frame or an event that the camera delivers. Its number is its index in the plan, and its time stamp in seconds.
struct Delivery {
  bool isEvent = false;
  FrameKind kind = FrameKind::kLit;  // for a frame
  std::size_t thread = 0;            // the camera's threads are independent; each delivers its own items in order
  std::chrono::nanoseconds at{0};    // after the start
};

// The input of a run.
struct ProjectorPlan {
  std::vector<Delivery> deliveries;
  std::uint64_t stopCount = 1;
  double timeout = 10;          // seconds
  bool timerIsSlow = false;     // an expired timeout may reach its queue at any later time
  bool cameraIsSlow = false;    // everything else may run during a call of the camera
  bool stops = true;            // false: stopping the stream fails
  bool countersAreRead = true;  // false: the stream has no error counters
};
std::string describe(const ProjectorPlan& plan);

// The trace of a run.
struct ProjectorRun {
  // In order, in the format of RunTranscript: the log lines and
  //   frame 3 attachment MetadataDictionary    at the end of reading frame 3
  //   stream get ErrorCounters                 at the beginning of the call
  //   stream stop                              at the end of the call
  //   semaphore signal
  //   host release                             the host releases the experiment after its run
  std::vector<std::string> lines;
  std::vector<std::size_t> delivered;  // the numbers of the items that reached the handlers, in order
  std::unique_ptr<QZExperimentResult> result;
  DiagnosticErrorPtr error;
  std::vector<int> references;    // to the buffer of each delivery, at the end
  bool experimentIsGone = false;  // at the end
};

// A short description of the first error in the run; empty if it is correct. Checks the trace with a small model of the
// rules, so it accepts every order of events that the rules allow.
std::string problemOf(const ProjectorPlan& plan, const ProjectorRun& run);

}  // namespace quazor
