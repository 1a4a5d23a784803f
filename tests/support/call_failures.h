// Calls of a simulated phone that are made to fail, and how such a failure reads in a run's text.
#pragma once

#include "backends/faults/call_interceptor.h"
#include "backends/faults/fault.h"
#include "tests/support/run_transcript.h"

#include <functional>
#include <string>
#include <string_view>

namespace quazor {

// The fault, which selects a call, as one that fails with that error or, without one, with nothing to give.
Fault failing(Fault fault, bool hasError, const FaultError& error = {"BenchErrorDomain", 7, "Broken."});

// How the chain of a run's error ends whose call failed with the default error of failing(), or with none.
std::string benchCause(bool hasError);

void replaceAll(std::string& text, std::string_view from, std::string_view to);

// What runAndTell() told a caller with a place for an error, as a caller without one is told it.
std::string toldWithoutPlace(std::string told);

// An observer of a phone's calls that adds each to the transcript, which must outlive it.
std::function<void(const PlatformCall&)> addingTo(RunTranscript& transcript);

}  // namespace quazor
