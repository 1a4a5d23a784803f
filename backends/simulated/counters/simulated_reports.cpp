#include "backends/simulated/counters/simulated_reports.h"

#include "backends/counters/counter_reports.h"
#include "backends/simulated/capture/growth.h"
#include "backends/simulated/errors/report_error.h"

#include <chrono>
#include <cstdint>
#include <mutex>
#include <optional>
#include <utility>

namespace quazor {
namespace {

class SimulatedCounters final : public CounterChannels {
 public:
  SimulatedCounters(std::vector<ReportChannelConfig> channels, std::shared_ptr<CaptureHardware> hardware)
      : channels_(std::move(channels)), hardware_(std::move(hardware)) {
    descriptions_.reserve(channels_.size());
    for (const ReportChannelConfig& channel : channels_) {
      descriptions_.push_back({channel.group, channel.subGroup, channel.name});
    }
  }

  std::size_t size() const override { return channels_.size(); }
  const ReportChannelDescription& description(std::size_t index) const override { return descriptions_[index]; }

  std::optional<CounterValues> read(const std::vector<std::size_t>& indexes, DiagnosticErrorPtr* /*error*/) override {
    const std::chrono::nanoseconds streamed = streamedTime();
    CounterValues values;
    values.reserve(indexes.size());
    for (const std::size_t index : indexes) values.push_back(countAfter(streamed, channels_[index]));
    return values;
  }

  void refuseBaseline(DiagnosticErrorPtr* error) const override {
    fail(error, SimulatedReportErrorDomain, static_cast<std::int64_t>(ReportErrorCode::kForeignBaseline), nullptr,
         "The baseline is a snapshot of other channels; take both snapshots of one set.");
  }

 private:
  std::chrono::nanoseconds streamedTime() const {
    const std::lock_guard lock(hardware_->mutex);
    return hardware_->streamedTime();
  }

  static std::optional<std::uint64_t> countAfter(std::chrono::nanoseconds streamed,
                                                 const ReportChannelConfig& channel) {
    if (!channel.count) return std::nullopt;
    std::uint64_t total = *channel.count + grownBy(channel.growth, streamed);
    for (const ReportStep& step : channel.steps) {
      if (step.at <= streamed) total += step.by;
    }
    return total;
  }

  const std::vector<ReportChannelConfig> channels_;
  std::vector<ReportChannelDescription> descriptions_;
  const std::shared_ptr<CaptureHardware> hardware_;
};

}  // namespace

std::shared_ptr<ReportFacility> makeSimulatedReports(std::vector<ReportChannelConfig> channels,
                                                     std::shared_ptr<CaptureHardware> hardware) {
  return makeCounterReports([counters = std::make_shared<SimulatedCounters>(std::move(channels), std::move(hardware))](
                                DiagnosticErrorPtr* /*error*/) { return counters; });
}

}  // namespace quazor
