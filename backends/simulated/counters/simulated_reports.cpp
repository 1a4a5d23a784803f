#include "backends/simulated/counters/simulated_reports.h"

#include "backends/simulated/capture/growth.h"
#include "backends/simulated/scenario/report_operations.h"

#include <chrono>
#include <mutex>
#include <numeric>
#include <optional>
#include <string>
#include <utility>

namespace quazor {
namespace {

std::string nothing() { return {}; }

}  // namespace

// What sets and snapshots share: the channels and the way to the phone.
class SimulatedReportFacility::Channels {
 public:
  struct Channel {
    std::shared_ptr<const ReportChannelDescription> description;
    std::optional<std::uint64_t> count;
    std::uint64_t growth = 0;
    std::vector<ReportStep> steps;

    std::optional<Value> countAfter(std::chrono::nanoseconds streamed) const {
      if (!count) return std::nullopt;
      std::uint64_t total = *count + grownBy(growth, streamed);
      for (const ReportStep& step : steps) {
        if (step.at <= streamed) total += step.by;
      }
      return Value(total);
    }
  };

  Channels(const std::vector<ReportChannelConfig>& traits, std::shared_ptr<CaptureHardware> phone,
           std::shared_ptr<CallInterceptor> interceptor)
      : calls(std::move(interceptor)), hardware_(std::move(phone)) {
    // The descriptions of all channels lie in one place, which every pointer to one of them keeps.
    const auto descriptions = std::make_shared<std::vector<ReportChannelDescription>>();
    descriptions->reserve(traits.size());
    all.reserve(traits.size());
    for (const ReportChannelConfig& channel : traits) {
      descriptions->push_back({channel.group, channel.subGroup, channel.name});
      all.push_back({std::shared_ptr<const ReportChannelDescription>(descriptions, &descriptions->back()),
                     channel.count, channel.growth, channel.steps});
    }
  }

  std::chrono::nanoseconds streamed() const {
    const std::lock_guard lock(hardware_->mutex);
    return hardware_->streamedTime();
  }

  std::vector<Channel> all;
  const std::shared_ptr<CallInterceptor> calls;

 private:
  const std::shared_ptr<CaptureHardware> hardware_;
};

class SimulatedReportFacility::Snapshot final : public ReportSnapshot {
 public:
  // `chosen` are the indexes of the channels that the samples are of.
  Snapshot(std::shared_ptr<const Channels> channels, std::shared_ptr<const std::vector<std::size_t>> chosen,
           std::vector<ReportSample> samples)
      : channels_(std::move(channels)), chosen_(std::move(chosen)), samples_(std::move(samples)) {}

  const std::vector<ReportSample>& samples() const override { return samples_; }

  std::shared_ptr<const ReportSnapshot> snapshotWithBaseline(const ReportSnapshot& baseline,
                                                             DiagnosticErrorPtr* error) const override {
    return channels_->calls->perform({report_operation::kDelta, {}, {}}, error, nothing,
                                     [&] { return delta(dynamic_cast<const Snapshot*>(&baseline), error); });
  }

 private:
  std::shared_ptr<const ReportSnapshot> delta(const Snapshot* baseline, DiagnosticErrorPtr* error) const {
    const bool sameChannels = baseline != nullptr && baseline->channels_ == channels_ &&
                              (baseline->chosen_ == chosen_ || *baseline->chosen_ == *chosen_);
    if (!sameChannels) {
      fail(error, SimulatedReportErrorDomain, static_cast<std::int64_t>(ReportErrorCode::kForeignBaseline), nullptr,
           "The baseline is a snapshot of other channels; take both snapshots of one set.");
      return nullptr;
    }
    std::vector<ReportSample> samples;
    samples.reserve(samples_.size());
    for (std::size_t i = 0; i < samples_.size(); ++i) {
      const std::optional<Value>& later = samples_[i].channel().count();
      const std::optional<Value>& earlier = baseline->samples_[i].channel().count();
      std::optional<Value> count;
      if (later && earlier) count = Value(toUnsigned(&*later) - toUnsigned(&*earlier));
      samples.emplace_back(ReportChannel(channels_->all[(*chosen_)[i]].description, std::move(count)));
    }
    return std::make_shared<Snapshot>(channels_, chosen_, std::move(samples));
  }

  const std::shared_ptr<const Channels> channels_;
  const std::shared_ptr<const std::vector<std::size_t>> chosen_;
  const std::vector<ReportSample> samples_;
};

class SimulatedReportFacility::Set final : public ReportChannelSet {
 public:
  Set(std::shared_ptr<const Channels> channels, std::vector<std::size_t> chosen)
      : channels_(std::move(channels)), chosen_(std::make_shared<const std::vector<std::size_t>>(std::move(chosen))) {}

  std::shared_ptr<const ReportChannelSet> reportByFilteringChannels(const Predicate& keep) const override {
    std::vector<std::size_t> kept;
    for (const std::size_t index : *chosen_) {
      if (keep(*channels_->all[index].description)) kept.push_back(index);
    }
    channels_->calls->report(
        {report_operation::kFilter, {}, {}}, [&] { return std::to_string(kept.size()); }, true);
    return std::make_shared<Set>(channels_, std::move(kept));
  }

  std::shared_ptr<const ReportSnapshot> snapshot(DiagnosticErrorPtr* error) const override {
    return channels_->calls->perform({report_operation::kSnapshot, {}, {}}, error, nothing,
                                     [&]() -> std::shared_ptr<const ReportSnapshot> {
                                       return std::make_shared<Snapshot>(channels_, chosen_, sample());
                                     });
  }

 private:
  std::vector<ReportSample> sample() const {
    const std::chrono::nanoseconds streamed = channels_->streamed();
    std::vector<ReportSample> samples;
    samples.reserve(chosen_->size());
    for (const std::size_t index : *chosen_) {
      const Channels::Channel& channel = channels_->all[index];
      samples.emplace_back(ReportChannel(channel.description, channel.countAfter(streamed)));
    }
    return samples;
  }

  const std::shared_ptr<const Channels> channels_;
  const std::shared_ptr<const std::vector<std::size_t>> chosen_;
};

SimulatedReportFacility::SimulatedReportFacility(const std::vector<ReportChannelConfig>& channels,
                                                 std::shared_ptr<CaptureHardware> hardware,
                                                 std::shared_ptr<CallInterceptor> calls)
    : channels_(std::make_shared<const Channels>(channels, std::move(hardware), std::move(calls))) {}

std::shared_ptr<const ReportChannelSet> SimulatedReportFacility::reportWithOnlySimpleChannels(
    DiagnosticErrorPtr* error) {
  return channels_->calls->perform({report_operation::kSimpleChannels, {}, {}}, error, nothing,
                                   [&]() -> std::shared_ptr<const ReportChannelSet> {
                                     std::vector<std::size_t> everything(channels_->all.size());
                                     std::iota(everything.begin(), everything.end(), std::size_t{0});
                                     return std::make_shared<Set>(channels_, std::move(everything));
                                   });
}

}  // namespace quazor
