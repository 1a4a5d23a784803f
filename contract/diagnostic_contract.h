// The contract between the host and experiments and analyses.
//
// The host creates an experiment with its factory, asks for its description, sets it up, runs it and, if it has a
// teardown, tears it down, even after a failed run. The host then creates the analysis, asks for its description, sets
// it up if it has a setup, and passes it the experiment's result. No instance is used for a second run.
//
// Thread: the host calls an instance's operations one at a time, on one thread of its own, and each blocks until it
//   is done.
// Errors: an operation that fails returns false or null and stores an error if the caller passed a pointer for it.
//   Operations do not throw.
#pragma once

#include "contract/contract.h"
#include "contract/diagnostic_error.h"
#include "contract/results.h"
#include "contract/value.h"

#include <memory>

namespace QUAZOR_CONTRACT {

// The interface of the host that a setup receives. It has no operations yet.
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
  // Returns the result, owned by the caller, or null on failure.
  [[nodiscard]] virtual std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* error) = 0;
  // `parameters` has a number for each declared parameter that has a value, and nothing for the others: the default of
  // a QZParameterRange is not filled in. `host` may be null. The base class ignores the parameters and succeeds.
  [[nodiscard]] virtual bool setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* host,
                                                 DiagnosticErrorPtr* error);
};

// The optional last operation of an experiment, which inherits this class in addition to QZExperiment.
// Thread: the host's, as QZExperiment.
class QUAZOR_EXPORT QZTeardown {
 public:
  virtual ~QZTeardown();

  [[nodiscard]] virtual bool teardown(DiagnosticErrorPtr* error) = 0;
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
  // Returns the result, owned by the caller, or null on failure.
  [[nodiscard]] virtual std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& result,
                                                                                  DiagnosticErrorPtr* error) = 0;
};

// The optional setup of an analysis, which inherits this class in addition to QZAnalysis.
// Thread: the host's, as QZAnalysis.
class QUAZOR_EXPORT QZAnalysisSetup {
 public:
  virtual ~QZAnalysisSetup();

  // See QZExperiment::setupWithParameters.
  [[nodiscard]] virtual bool setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* host,
                                                 DiagnosticErrorPtr* error) = 0;
};

}  // namespace QUAZOR_CONTRACT
