// Misbehaviour: how and when the diagnostic of a test plug-in misbehaves.
#pragma once

#include "contract/results.h"

#include <string_view>

namespace quazor::misbehaving {

// Every member is optional: a diagnostic without any logs a line, measures "Answer" and passes.
struct Misbehaviour {
  void (*inDescription)() = nullptr;  // of the experiment
  void (*inSetup)() = nullptr;
  void (*inRun)() = nullptr;
  void (*inTeardown)() = nullptr;
  void (*inDestructor)() = nullptr;  // of the experiment, after its result was sent
  void (*inAnalysis)() = nullptr;

  // Fill the empty results instead of the default functions.
  void (*measure)(QZExperimentResult& result) = nullptr;
  void (*find)(QZAnalysisResult& result) = nullptr;
};

// Registers the diagnostic `name` with the experiment `name`Experiment and the analysis `name`Analysis. The experiment
// logs "`name` begins" first in its setup.
void addDiagnostic(std::string_view name, const Misbehaviour& misbehaviour);

// Used by several diagnostics.
[[noreturn]] void sleepForEver();
void crash();

// Each registers one group of diagnostics:
void addEndings();      // that end their process or never return
void addDescriptors();  // that use descriptors they do not own
void addProcesses();    // that create processes or modify their own
void addEscapes();      // that try to outlive the program
void addResults();      // with excessive results and logs

}  // namespace quazor::misbehaving
