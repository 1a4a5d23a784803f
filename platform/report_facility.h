// The kernel's report channels: counters that drivers publish in named groups and subgroups.
//
// Thread: every call is synchronous on the caller's thread and may block while the kernel is asked; sets and snapshots
//   are immutable, and any thread may read them.
// Ownership: objects are shared, and each keeps what it needs of those it came from.
// Errors: a call that fails returns null and then stores the facility's own error where the caller gave a place for
//   one; it may have none to give. Nothing is thrown.
// Cost: filtering, sampling and subtracting are linear in the channels of the set; sets of a million channels occur.
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

// Which channel it is. Names are exact and case-sensitive; `name` is the channel's display name.
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
  // A number; nothing when the channel has no simple count.
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
  // For every channel its count here minus that in `baseline`, an earlier snapshot of the set: negative for a fall.
  virtual std::shared_ptr<const ReportSnapshot> snapshotWithBaseline(const ReportSnapshot& baseline,
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

  // A new set of the channels that `keep` returns true for; this one is left as it is. Never null.
  virtual std::shared_ptr<const ReportChannelSet> reportByFilteringChannels(const Predicate& keep) const = 0;
  // The values now, or null.
  virtual std::shared_ptr<const ReportSnapshot> snapshot(DiagnosticErrorPtr* error) const = 0;
};

// Thread: any.
class QUAZOR_EXPORT ReportFacility {
 public:
  ReportFacility() = default;
  ReportFacility(const ReportFacility&) = delete;
  ReportFacility& operator=(const ReportFacility&) = delete;
  virtual ~ReportFacility();

  // All channels of the system that are a single counter, or null.
  virtual std::shared_ptr<const ReportChannelSet> reportWithOnlySimpleChannels(DiagnosticErrorPtr* error) = 0;
};

}  // namespace QUAZOR_CONTRACT
