#include "backends/counters/counter_reports.h"

#include <numeric>
#include <utility>

namespace quazor {
namespace {

using Indexes = std::vector<std::size_t>;

// The result of one call of FindCounters. Two results are different, even if the backend finds the same channels.
struct FoundCounters {
  std::shared_ptr<CounterChannels> channels;
};

// Channels from one result, shared by a set and its snapshots.
struct Selection {
  std::shared_ptr<const FoundCounters> found;
  Indexes indexes;

  const ReportChannelDescription& description(std::size_t index) const { return found->channels->description(index); }
  bool isOfTheSameChannels(const Selection& other) const {
    return this == &other || (found == other.found && indexes == other.indexes);
  }
};

Value difference(std::uint64_t later, std::uint64_t earlier) {
  const std::uint64_t step = later - earlier;
  const bool isFall = later < earlier && earlier - later <= std::uint64_t{1} << 63U;
  return isFall ? Value(static_cast<std::int64_t>(step)) : Value(step);
}

class CounterSnapshot final : public ReportSnapshot {
 public:
  // `count` returns the count of the sample at a position.
  template <class Count>
  CounterSnapshot(std::shared_ptr<const Selection> selection, Count&& count) : selection_(std::move(selection)) {
    samples_.reserve(selection_->indexes.size());
    for (std::size_t i = 0; i < selection_->indexes.size(); ++i) {
      // The description's pointer keeps the channels alive, which own it.
      samples_.emplace_back(
          ReportChannel({selection_->found->channels, &selection_->description(selection_->indexes[i])}, count(i)));
    }
  }

  const std::vector<ReportSample>& samples() const override { return samples_; }

  std::shared_ptr<const ReportSnapshot> snapshotWithBaseline(const ReportSnapshot& baseline,
                                                             DiagnosticErrorPtr* error) const override {
    const auto* const earlier = dynamic_cast<const CounterSnapshot*>(&baseline);
    if (earlier == nullptr || !selection_->isOfTheSameChannels(*earlier->selection_)) {
      selection_->found->channels->refuseBaseline(error);
      return nullptr;
    }
    return std::make_shared<CounterSnapshot>(selection_, [&](std::size_t i) -> std::optional<Value> {
      const std::optional<Value>& after = samples_[i].channel().count();
      const std::optional<Value>& before = earlier->samples_[i].channel().count();
      if (!after || !before) return std::nullopt;
      return difference(toUnsigned(&*after), toUnsigned(&*before));
    });
  }

 private:
  const std::shared_ptr<const Selection> selection_;
  std::vector<ReportSample> samples_;
};

class CounterSet final : public ReportChannelSet {
 public:
  explicit CounterSet(Selection selection) : selection_(std::make_shared<const Selection>(std::move(selection))) {}

  std::shared_ptr<const ReportChannelSet> reportByFilteringChannels(const Predicate& keep) const override {
    Selection kept{selection_->found, {}};
    for (const std::size_t index : selection_->indexes) {
      if (keep(selection_->description(index))) kept.indexes.push_back(index);
    }
    return std::make_shared<CounterSet>(std::move(kept));
  }

  std::shared_ptr<const ReportSnapshot> snapshot(DiagnosticErrorPtr* error) const override {
    const std::optional<CounterValues> values = selection_->found->channels->read(selection_->indexes, error);
    if (!values) return nullptr;
    return std::make_shared<CounterSnapshot>(selection_, [&](std::size_t i) {
      const std::optional<std::uint64_t>& value = (*values)[i];
      return value ? std::optional<Value>(*value) : std::nullopt;
    });
  }

 private:
  const std::shared_ptr<const Selection> selection_;
};

class CounterReports final : public ReportFacility {
 public:
  explicit CounterReports(FindCounters find) : find_(std::move(find)) {}

  std::shared_ptr<const ReportChannelSet> reportWithOnlySimpleChannels(DiagnosticErrorPtr* error) override {
    std::shared_ptr<CounterChannels> channels = find_(error);
    if (channels == nullptr) return nullptr;
    Selection all{nullptr, Indexes(channels->size())};
    std::iota(all.indexes.begin(), all.indexes.end(), std::size_t{0});
    all.found = std::make_shared<const FoundCounters>(FoundCounters{std::move(channels)});
    return std::make_shared<CounterSet>(std::move(all));
  }

 private:
  const FindCounters find_;
};

}  // namespace

std::shared_ptr<ReportFacility> makeCounterReports(FindCounters find) {
  return std::make_shared<CounterReports>(std::move(find));
}

}  // namespace quazor
