// The kernel's report channels: counters that drivers publish in named groups and subgroups.
//
// Thread: every call is synchronous on the caller's thread and may block on the kernel; sets and snapshots are
//   immutable, and any thread may read them.
// Ownership: objects are shared, and each keeps the objects that it depends on alive.
// Errors: a call that fails returns null and stores the facility's error if the caller passed a pointer and the
//   facility has an error to give. Calls do not throw.
// Cost: filtering, sampling and subtracting are linear in the number of channels; sets may have a million channels.
#pragma once

#include "contract/contract.h"
#include "contract/diagnostic_error.h"
#include "contract/value.h"

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace QUAZOR_CONTRACT {

// The identity of a channel. Names are exact and case-sensitive; `name` is the channel's display name.
struct ReportChannelDescription {
  std::string groupName;
  std::string subGroupName;
  std::string name;
};

// One channel of a set, with its value as a simple counter at the moment of a snapshot.
// Thread: one at a time; any number may read while none writes.
class ReportChannel {
 public:
  ReportChannel(std::shared_ptr<const ReportChannelDescription> description, std::optional<Value> count)
      : description_(std::move(description)), count_(std::move(count)) {}

  const ReportChannelDescription& channelDescription() const { return *description_; }
  // A number, or nothing if the channel has no simple count.
  const std::optional<Value>& count() const { return count_; }

 private:
  std::shared_ptr<const ReportChannelDescription> description_;
  std::optional<Value> count_;
};

// One entry of a snapshot.
// Thread: one at a time; any number may read while none writes.
class ReportSample {
 public:
  explicit ReportSample(ReportChannel channel) : channel_(std::move(channel)) {}

  const ReportChannel& channel() const { return channel_; }

 private:
  ReportChannel channel_;
};

// The values of every channel of a set at one moment, or their differences between two.
// Thread: any; it is immutable.
class QUAZOR_EXPORT ReportSnapshot {
 public:
  ReportSnapshot() = default;
  ReportSnapshot(const ReportSnapshot&) = delete;
  ReportSnapshot& operator=(const ReportSnapshot&) = delete;
  virtual ~ReportSnapshot();

  // One sample per channel, in the facility's order.
  virtual const std::vector<ReportSample>& samples() const = 0;
  // Returns, for every channel, its value here minus its value in `baseline`, an earlier snapshot of the same set:
  // negative when the counter fell.
  [[nodiscard]] virtual std::shared_ptr<const ReportSnapshot> snapshotWithBaseline(const ReportSnapshot& baseline,
                                                                                   DiagnosticErrorPtr* error) const = 0;
};

// A subscription to a set of channels.
// Thread: any; it is immutable.
class QUAZOR_EXPORT ReportChannelSet {
 public:
  using Predicate = std::function<bool(const ReportChannelDescription&)>;

  ReportChannelSet() = default;
  ReportChannelSet(const ReportChannelSet&) = delete;
  ReportChannelSet& operator=(const ReportChannelSet&) = delete;
  virtual ~ReportChannelSet();

  // Returns a new set of the channels for which `keep` returns true. Never null; this set does not change.
  virtual std::shared_ptr<const ReportChannelSet> reportByFilteringChannels(const Predicate& keep) const = 0;
  // Returns the current values, or null.
  [[nodiscard]] virtual std::shared_ptr<const ReportSnapshot> snapshot(DiagnosticErrorPtr* error) const = 0;
};

// Thread: any.
class QUAZOR_EXPORT ReportFacility {
 public:
  ReportFacility() = default;
  ReportFacility(const ReportFacility&) = delete;
  ReportFacility& operator=(const ReportFacility&) = delete;
  virtual ~ReportFacility();

  // All channels of the system that are a single counter, or null.
  [[nodiscard]] virtual std::shared_ptr<const ReportChannelSet> reportWithOnlySimpleChannels(
      DiagnosticErrorPtr* error) = 0;
};

}  // namespace QUAZOR_CONTRACT
