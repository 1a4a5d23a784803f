// QZTesselTelemonExperiment: samples the event channels of the depth camera module once.
#pragma once

#include "contract/diagnostic_contract.h"
#include "platform/platform.h"

#include <memory>

namespace quazor {

// The result contains one measurement per channel: its count, in events, under the channel's name. If two channels have
// the same name, the later one applies. Without channels the result is empty.
// Thread: the host's, as QZExperiment.
class QZTesselTelemonExperiment final : public QZExperiment {
 public:
  explicit QZTesselTelemonExperiment(Platform platform = installedPlatform());

  QZDescription experimentDescription() const override;
  // Fails with QZTelemonErrorDomain code 100.
  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* error) override;

 private:
  Platform _platform;
};

}  // namespace quazor
