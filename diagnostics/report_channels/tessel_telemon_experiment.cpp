#include "diagnostics/report_channels/tessel_telemon_experiment.h"

#include "diagnostics/report_channels/channel_filters.h"

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

namespace quazor {

namespace {

constexpr std::int64_t kReportFailure = 100;

}  // namespace

QZTesselTelemonExperiment::QZTesselTelemonExperiment(Platform platform) : _platform(std::move(platform)) {}

QZDescription QZTesselTelemonExperiment::experimentDescription() const {
  return QZDescription("Check for any Tessel Telemons.");
}

std::unique_ptr<QZExperimentResult> QZTesselTelemonExperiment::run(DiagnosticErrorPtr* error) {
  auto result = std::make_unique<QZExperimentResult>();
  DiagnosticErrorPtr underlying;
  const std::shared_ptr<const ReportChannelSet> channels = _platform.reports->reportWithOnlySimpleChannels(&underlying);
  if (channels == nullptr) {
    fail(error, QZTelemonErrorDomain, kReportFailure, underlying, "Could not get simple channels.");
    return nullptr;
  }
  DiagnosticErrorPtr snapshotError;
  const std::shared_ptr<const ReportSnapshot> snapshot =
      channels->reportByFilteringChannels(isInPresenceReport)->snapshot(&snapshotError);
  if (snapshot == nullptr) {
    fail(error, QZTelemonErrorDomain, kReportFailure, snapshotError, "Could not sample the report.");
    return nullptr;
  }
  const std::vector<ReportSample>& samples = snapshot->samples();
  for (const ReportSample& sample : samples) {
    if (sample.channel().count()) continue;
    fail(error, QZTelemonErrorDomain, kReportFailure, nullptr, "Could not get the count of %@.",
         sample.channel().channelDescription().name);
    return nullptr;
  }
  result->measurements().setAll(
      samples,
      [](const ReportSample& sample) -> const std::string& { return sample.channel().channelDescription().name; },
      [](const ReportSample& sample) {
        return Measurement(toDouble(&*sample.channel().count()), QZDimensionlessUnit::events());
      });
  return result;
}

}  // namespace quazor
