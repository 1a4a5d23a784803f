// An experiment for tests that returns images of samples.
#pragma once

#include "contract/diagnostic_contract.h"

#include <cstdint>
#include <memory>

namespace quazor::fake {

// Parameters: "images" (required), the number of images; "samples", the length of their two lists, by default 48.
// Sample k of list "i" is k - 10, that of list "q" is -1000 k.
class ImageExperiment final : public QZExperiment {
 public:
  QZDescription experimentDescription() const override;
  bool setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* host, DiagnosticErrorPtr* error) override;
  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* error) override;

 private:
  std::uint64_t images_ = 0;
  std::int64_t samples_ = 0;
};

}  // namespace quazor::fake
