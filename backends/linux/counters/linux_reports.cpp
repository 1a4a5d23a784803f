#include "backends/linux/counters/linux_reports.h"

#include "backends/counters/counter_reports.h"
#include "backends/linux/counters/counter_channels.h"
#include "backends/linux/system/linux_error.h"

#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <utility>
#include <vector>

namespace quazor {
namespace {

// A tracepoint on all processors; counts during the lifetime of this object.
class TracepointCount {
 public:
  // Returns false and the error number of the call if the tracepoint cannot be counted.
  bool open(std::uint64_t id, const std::vector<int>& processors, CounterSystem& system, int* failure) {
    for (const int processor : processors) {
      FileDescriptor counter;
      *failure = system.openTracepoint(id, processor, &counter);
      if (*failure == ENODEV) continue;  // the processor is now offline
      if (*failure != 0) return false;
      counters_.push_back(std::move(counter));
    }
    return true;
  }

  std::optional<std::uint64_t> total() const {
    if (counters_.empty()) return std::nullopt;  // counted on no processor
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

// Reads the counts of files; reads a file once for consecutive channels.
class FileReader {
 public:
  explicit FileReader(CounterSystem& system) : system_(system) {}

  // Returns false and an error if reading the file is not permitted.
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
  std::string fileOfLines_;  // empty: the last file has no lines
  std::string content_;
  int failure_ = 0;
  std::unordered_map<std::string_view, std::optional<std::uint64_t>> lines_;  // point into the content
};

class LinuxCounters final : public CounterChannels {
 public:
  LinuxCounters(std::vector<CounterChannel> channels, std::shared_ptr<CounterSystem> system)
      : all_(std::move(channels)), system_(std::move(system)) {}

  std::size_t size() const override { return all_.size(); }
  const ReportChannelDescription& description(std::size_t index) const override { return all_[index].description; }

  std::optional<CounterValues> read(const std::vector<std::size_t>& indexes, DiagnosticErrorPtr* error) override {
    const std::lock_guard lock(mutex_);
    if (!openTracepoints(indexes, error)) return std::nullopt;
    // Only reads from here on: the values must be close together in time.
    CounterValues counts(indexes.size());
    FileReader files(*system_);
    for (std::size_t i = 0; i < indexes.size(); ++i) {
      const CounterChannel& channel = all_[indexes[i]];
      if (!channel.tracepoint) {
        if (!files.read(channel, &counts[i], error)) return std::nullopt;
      } else if (const auto counter = tracepoints_.find(*channel.tracepoint); counter != tracepoints_.end()) {
        counts[i] = counter->second.total();
      }
    }
    return counts;
  }

  void refuseBaseline(DiagnosticErrorPtr* error) const override {
    failLinux(error, LinuxErrorCode::kBadValue,
              "The baseline is a snapshot of other channels; take both snapshots of one set.");
  }

 private:
  // Opens all of them, or none if one fails.
  bool openTracepoints(const std::vector<std::size_t>& indexes, DiagnosticErrorPtr* error) {
    std::optional<std::vector<int>> processors;
    std::unordered_map<std::uint64_t, TracepointCount> opened;
    for (const std::size_t index : indexes) {
      const CounterChannel& channel = all_[index];
      if (!channel.tracepoint) continue;
      if (tracepoints_.contains(*channel.tracepoint) || opened.contains(*channel.tracepoint)) continue;
      if (!processors) processors = onlineProcessors();
      TracepointCount counter;
      int failure = 0;
      if (counter.open(*channel.tracepoint, *processors, *system_, &failure)) {
        opened.emplace(*channel.tracepoint, std::move(counter));
      } else if (failure != ENOENT) {  // ENOENT: the tracepoint was removed
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

}  // namespace

std::shared_ptr<ReportFacility> makeLinuxReports(const Binding& binding) {
  return makeLinuxReports(binding, systemCounters());
}

std::shared_ptr<ReportFacility> makeLinuxReports(const Binding& binding, std::shared_ptr<CounterSystem> system) {
  Binding counters;  // only its counters are set
  counters.counterFiles = binding.counterFiles;
  counters.tracepoints = binding.tracepoints;
  return makeCounterReports([counters = std::move(counters), system = std::move(system)](
                                DiagnosticErrorPtr* error) -> std::shared_ptr<CounterChannels> {
    std::optional<std::vector<CounterChannel>> found = counterChannels(counters, *system, error);
    return found ? std::make_shared<LinuxCounters>(*std::move(found), system) : nullptr;
  });
}

}  // namespace quazor
