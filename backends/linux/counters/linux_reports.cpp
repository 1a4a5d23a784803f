#include "backends/linux/counters/linux_reports.h"

#include "backends/linux/counters/counter_channels.h"
#include "backends/linux/system/linux_error.h"

#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <mutex>
#include <numeric>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <utility>
#include <vector>

namespace quazor {
namespace {

// A tracepoint on all processors; it counts as long as it is there.
class TracepointCount {
 public:
  // False, and the call's error number, when it cannot be counted.
  bool open(std::uint64_t id, const std::vector<int>& processors, CounterSystem& system, int* failure) {
    for (const int processor : processors) {
      FileDescriptor counter;
      *failure = system.openTracepoint(id, processor, &counter);
      if (*failure == ENODEV) continue;  // the processor is off now
      if (*failure != 0) return false;
      counters_.push_back(std::move(counter));
    }
    return true;
  }

  std::optional<std::uint64_t> total() const {
    if (counters_.empty()) return std::nullopt;  // no processor counts it
    std::uint64_t total = 0;
    for (const FileDescriptor& counter : counters_) {
      std::uint64_t count = 0;
      if (::read(counter.get(), &count, sizeof count) != static_cast<ssize_t>(sizeof count)) return std::nullopt;
      total += count;
    }
    return total;
  }

 private:
  std::vector<FileDescriptor> counters_;
};

// The counts of one file; asked for the channels of the same file one after the other, it reads it once.
class FileReader {
 public:
  explicit FileReader(CounterSystem& system) : system_(system) {}

  // False, and an error, when the file may not be read.
  bool read(const CounterChannel& channel, std::optional<std::uint64_t>* count, DiagnosticErrorPtr* error) {
    const bool isKeyed = !channel.key.empty();
    if (!isKeyed || channel.file != fileOfLines_) {
      fileOfLines_ = isKeyed ? channel.file : std::string();
      lines_.clear();
      failure_ = system_.read(channel.file, &content_);
      if (failure_ == 0 && isKeyed) readLines();
    }
    if (isNoAccess(failure_)) {
      failSystemCall(error, "open", channel.file, failure_);
      return false;
    }
    if (failure_ != 0) return true;
    if (!isKeyed) {
      *count = countIn(content_);
    } else if (const auto line = lines_.find(channel.key); line != lines_.end()) {
      *count = line->second;
    }
    return true;
  }

 private:
  void readLines() {
    std::string_view text = content_;
    while (const std::optional<KeyedLine> line = takeKeyedLine(&text)) lines_.emplace(line->key, line->count);
  }

  CounterSystem& system_;
  std::string fileOfLines_;  // empty: what was read last has no lines
  std::string content_;
  int failure_ = 0;
  std::unordered_map<std::string_view, std::optional<std::uint64_t>> lines_;  // of the content
};

using Chosen = std::vector<std::size_t>;  // indexes of channels

// What sets and snapshots share: the channels, and the tracepoints that are counted.
class Channels {
 public:
  Channels(std::vector<CounterChannel> channels, std::shared_ptr<CounterSystem> system)
      : all_(std::move(channels)), system_(std::move(system)) {}

  std::size_t size() const { return all_.size(); }
  const ReportChannelDescription& description(std::size_t index) const { return all_[index].description; }

  // The counts of the chosen channels, or nothing and an error.
  std::optional<std::vector<std::optional<std::uint64_t>>> counts(const Chosen& chosen, DiagnosticErrorPtr* error) {
    const std::lock_guard lock(mutex_);
    if (!openTracepoints(chosen, error)) return std::nullopt;
    // Nothing but reading from here on, so that the values are close together.
    std::vector<std::optional<std::uint64_t>> counts(chosen.size());
    FileReader files(*system_);
    for (std::size_t i = 0; i < chosen.size(); ++i) {
      const CounterChannel& channel = all_[chosen[i]];
      if (!channel.tracepoint) {
        if (!files.read(channel, &counts[i], error)) return std::nullopt;
      } else if (const auto counter = tracepoints_.find(*channel.tracepoint); counter != tracepoints_.end()) {
        counts[i] = counter->second.total();
      }
    }
    return counts;
  }

 private:
  // All of them, or none: one that fails lets go of what was opened with it.
  bool openTracepoints(const Chosen& chosen, DiagnosticErrorPtr* error) {
    std::optional<std::vector<int>> processors;
    std::unordered_map<std::uint64_t, TracepointCount> opened;
    for (const std::size_t index : chosen) {
      const CounterChannel& channel = all_[index];
      if (!channel.tracepoint) continue;
      if (tracepoints_.contains(*channel.tracepoint) || opened.contains(*channel.tracepoint)) continue;
      if (!processors) processors = onlineProcessors();
      TracepointCount counter;
      int failure = 0;
      if (counter.open(*channel.tracepoint, *processors, *system_, &failure)) {
        opened.emplace(*channel.tracepoint, std::move(counter));
      } else if (failure != ENOENT) {  // which is of a tracepoint that has gone
        failSystemCall(error, "perf_event_open", "the tracepoint " + channel.file, failure);
        return false;
      }
    }
    tracepoints_.merge(opened);
    return true;
  }

  std::vector<int> onlineProcessors() {
    std::string list;
    std::vector<int> processors;
    if (system_->read("/sys/devices/system/cpu/online", &list) == 0) processors = processorsIn(list);
    return processors.empty() ? std::vector<int>{0} : processors;
  }

  const std::vector<CounterChannel> all_;
  const std::shared_ptr<CounterSystem> system_;
  std::mutex mutex_;
  std::unordered_map<std::uint64_t, TracepointCount> tracepoints_;  // by ID; guarded by mutex_
};

// The difference of two unsigned counts; a small step down is a negative one.
Value difference(std::uint64_t later, std::uint64_t earlier) {
  const std::uint64_t step = later - earlier;
  const bool isDown = later < earlier && earlier - later <= std::uint64_t{1} << 63;
  return isDown ? Value(static_cast<std::int64_t>(step)) : Value(step);
}

class Snapshot final : public ReportSnapshot {
 public:
  Snapshot(std::shared_ptr<const Channels> channels, std::shared_ptr<const Chosen> chosen,
           std::vector<ReportSample> samples)
      : channels_(std::move(channels)), chosen_(std::move(chosen)), samples_(std::move(samples)) {}

  const std::vector<ReportSample>& samples() const override { return samples_; }

  std::shared_ptr<const ReportSnapshot> snapshotWithBaseline(const ReportSnapshot& baseline,
                                                             DiagnosticErrorPtr* error) const override {
    const auto* const earlier = dynamic_cast<const Snapshot*>(&baseline);
    const bool sameChannels = earlier != nullptr && earlier->channels_ == channels_ &&
                              (earlier->chosen_ == chosen_ || *earlier->chosen_ == *chosen_);
    if (!sameChannels) {
      failLinux(error, LinuxErrorCode::kBadValue,
                "The baseline is a snapshot of other channels; take both snapshots of one set.");
      return nullptr;
    }
    std::vector<ReportSample> samples;
    samples.reserve(samples_.size());
    for (std::size_t i = 0; i < samples_.size(); ++i) {
      const std::optional<Value>& after = samples_[i].channel().count();
      const std::optional<Value>& before = earlier->samples_[i].channel().count();
      std::optional<Value> count;
      if (after && before) count = difference(toUnsigned(&*after), toUnsigned(&*before));
      samples.emplace_back(ReportChannel(descriptionOf((*chosen_)[i]), std::move(count)));
    }
    return std::make_shared<Snapshot>(channels_, chosen_, std::move(samples));
  }

  // All descriptions are kept by what keeps one of them.
  std::shared_ptr<const ReportChannelDescription> descriptionOf(std::size_t index) const {
    return {channels_, &channels_->description(index)};
  }

 private:
  const std::shared_ptr<const Channels> channels_;
  const std::shared_ptr<const Chosen> chosen_;
  const std::vector<ReportSample> samples_;
};

class Set final : public ReportChannelSet {
 public:
  Set(std::shared_ptr<Channels> channels, Chosen chosen)
      : channels_(std::move(channels)), chosen_(std::make_shared<const Chosen>(std::move(chosen))) {}

  std::shared_ptr<const ReportChannelSet> reportByFilteringChannels(const Predicate& keep) const override {
    Chosen kept;
    for (const std::size_t index : *chosen_) {
      if (keep(channels_->description(index))) kept.push_back(index);
    }
    return std::make_shared<Set>(channels_, std::move(kept));
  }

  std::shared_ptr<const ReportSnapshot> snapshot(DiagnosticErrorPtr* error) const override {
    std::optional<std::vector<std::optional<std::uint64_t>>> counts = channels_->counts(*chosen_, error);
    if (!counts) return nullptr;
    std::vector<ReportSample> samples;
    samples.reserve(chosen_->size());
    for (std::size_t i = 0; i < chosen_->size(); ++i) {
      const std::optional<std::uint64_t>& count = (*counts)[i];
      samples.emplace_back(ReportChannel({channels_, &channels_->description((*chosen_)[i])},
                                         count ? std::optional<Value>(*count) : std::nullopt));
    }
    return std::make_shared<Snapshot>(channels_, chosen_, std::move(samples));
  }

 private:
  const std::shared_ptr<Channels> channels_;
  const std::shared_ptr<const Chosen> chosen_;
};

class LinuxReports final : public ReportFacility {
 public:
  LinuxReports(const Binding& binding, std::shared_ptr<CounterSystem> system) : system_(std::move(system)) {
    counters_.counterFiles = binding.counterFiles;
    counters_.tracepoints = binding.tracepoints;
  }

  std::shared_ptr<const ReportChannelSet> reportWithOnlySimpleChannels(DiagnosticErrorPtr* error) override {
    std::optional<std::vector<CounterChannel>> found = counterChannels(counters_, *system_, error);
    if (!found) return nullptr;
    Chosen everything(found->size());
    std::iota(everything.begin(), everything.end(), std::size_t{0});
    return std::make_shared<Set>(std::make_shared<Channels>(*std::move(found), system_), std::move(everything));
  }

 private:
  Binding counters_;  // nothing else of the binding
  const std::shared_ptr<CounterSystem> system_;
};

}  // namespace

std::shared_ptr<ReportFacility> makeLinuxReports(const Binding& binding) {
  return makeLinuxReports(binding, systemCounters());
}

std::shared_ptr<ReportFacility> makeLinuxReports(const Binding& binding, std::shared_ptr<CounterSystem> system) {
  return std::make_shared<LinuxReports>(binding, std::move(system));
}

}  // namespace quazor
