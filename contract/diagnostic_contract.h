// The contract of experiments and analyses with the host.
//
// The host makes an experiment by its factory, asks its description, sets it up, runs it and, where it has a teardown,
// tears it down, after a failed run too. Then it makes the analysis, asks its description, sets it up where it has a
// setup, and hands it the experiment's result. No instance serves a second run.
//
// Thread: the host calls an instance's operations one at a time, on one thread of its own, and each blocks until it
//   is done.
// Errors: an operation that fails returns false or null and, when the caller gave it a place, stores an error there.
//   Nothing is thrown.
#pragma once

#include "contract/contract.h"
#include "contract/diagnostic_error.h"
#include "contract/results.h"
#include "contract/value.h"

#include <memory>

namespace QUAZOR_CONTRACT {

// The host as an experiment or analysis may see it in its setup. It offers nothing yet.
// Thread: one at a time.
class QUAZOR_EXPORT QZDiagnosticHost {
 public:
  virtual ~QZDiagnosticHost();
};

// Drives hardware and collects measurements.
// Thread: the host's, one call at a time.
class QUAZOR_EXPORT QZExperiment {
 public:
  QZExperiment() = default;
  QZExperiment(const QZExperiment&) = delete;
  QZExperiment& operator=(const QZExperiment&) = delete;
  virtual ~QZExperiment();

  virtual QZDescription experimentDescription() const = 0;
  // The result, which the caller owns, or null.
  virtual std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* error) = 0;
  // `parameters` holds a number per declared parameter; one that is missing reads as 0. `host` may be null. The
  // default takes no parameters and succeeds.
  virtual bool setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* host, DiagnosticErrorPtr* error);
};

// The optional last operation of an experiment; one that has it inherits this too.
// Thread: the host's, as QZExperiment.
class QUAZOR_EXPORT QZTeardown {
 public:
  virtual ~QZTeardown();

  virtual bool teardown(DiagnosticErrorPtr* error) = 0;
};

// Turns an experiment's result into measured results with limits.
// Thread: the host's, one call at a time.
class QUAZOR_EXPORT QZAnalysis {
 public:
  QZAnalysis() = default;
  QZAnalysis(const QZAnalysis&) = delete;
  QZAnalysis& operator=(const QZAnalysis&) = delete;
  virtual ~QZAnalysis();

  virtual QZDescription analysisDescription() const = 0;
  // The result, which the caller owns, or null.
  virtual std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& result,
                                                                    DiagnosticErrorPtr* error) = 0;
};

// The optional setup of an analysis; one that has it inherits this too.
// Thread: the host's, as QZAnalysis.
class QUAZOR_EXPORT QZAnalysisSetup {
 public:
  virtual ~QZAnalysisSetup();

  // As QZExperiment::setupWithParameters.
  virtual bool setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* host, DiagnosticErrorPtr* error) = 0;
};

}  // namespace QUAZOR_CONTRACT
