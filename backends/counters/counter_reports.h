// The report facility that all backends share: sets, filters, snapshots and differences over a backend's counters.
#pragma once

#include "platform/report_facility.h"

#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <vector>

namespace quazor {

using CounterValues = std::vector<std::optional<std::uint64_t>>;

// The channels that a backend found in one search, and access to their values.
//
// Thread: any, several at once.
class CounterChannels {
 public:
  CounterChannels() = default;
  CounterChannels(const CounterChannels&) = delete;
  CounterChannels& operator=(const CounterChannels&) = delete;
  virtual ~CounterChannels() = default;

  virtual std::size_t size() const = 0;
  // The reference stays valid and the description unchanged for the lifetime of this object.
  virtual const ReportChannelDescription& description(std::size_t index) const = 0;
  // Returns the current values of the channels with these indexes, in the order of the indexes and sampled as close
  // together as possible; an element without a value is a channel that has none or was removed. Returns nothing and an
  // error if the values cannot be read.
  virtual std::optional<CounterValues> read(const std::vector<std::size_t>& indexes, DiagnosticErrorPtr* error) = 0;
  // Stores the backend's error for a baseline that is a snapshot of other channels.
  virtual void refuseBaseline(DiagnosticErrorPtr* error) const = 0;
};

// Finds the channels; returns null and an error if the search fails. Thread: any, several at once.
using FindCounters = std::function<std::shared_ptr<CounterChannels>(DiagnosticErrorPtr* error)>;

// Calls `find` in every call of reportWithOnlySimpleChannels(); channels are ordered by index.
//
// Counts are unsigned. Both snapshots of a difference must come from the same such call. A difference is exact, and
// negative if the count fell, so a counter that the driver reset does not appear as a huge number of events. Only a
// fall by more than 2^63 is taken for an overflow of the counter and gives a positive difference. A channel without a
// count in one of the two snapshots has no difference.
//
// Thread: any.
std::shared_ptr<ReportFacility> makeCounterReports(FindCounters find);

}  // namespace quazor
