// Misbehaviour: what a diagnostic of a test's plug-in does wrong, and when.
#pragma once

#include "contract/results.h"

#include <string_view>

namespace quazor::misbehaving {

// Every member is optional: a diagnostic that has none logs a line, measures "Answer" and passes.
struct Misbehaviour {
  void (*inDescription)() = nullptr;  // of the experiment
  void (*inSetup)() = nullptr;
  void (*inRun)() = nullptr;
  void (*inTeardown)() = nullptr;
  void (*inDestructor)() = nullptr;  // of the experiment, when its result has been told
  void (*inAnalysis)() = nullptr;

  // Fill the results, which are empty, in place of the usual.
  void (*measure)(QZExperimentResult& result) = nullptr;
  void (*find)(QZAnalysisResult& result) = nullptr;
};

// Registers the diagnostic `name`, with the experiment `name`Experiment and the analysis `name`Analysis. The experiment
// logs "`name` begins" in its setup, before anything else.
void addDiagnostic(std::string_view name, const Misbehaviour& misbehaviour);

// What several diagnostics do.
[[noreturn]] void sleepForEver();
void crash();

// Each registers the diagnostics of one kind.
void addEndings();      // that end their process, or never end
void addDescriptors();  // that use descriptors that are not theirs
void addProcesses();    // that make processes and change their own
void addResults();      // whose results and log are out of measure

}  // namespace quazor::misbehaving
