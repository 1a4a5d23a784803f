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

// The channels that a backend found when it was asked, and the way to their values.
//
// Thread: any, several at once.
class CounterChannels {
 public:
  CounterChannels() = default;
  CounterChannels(const CounterChannels&) = delete;
  CounterChannels& operator=(const CounterChannels&) = delete;
  virtual ~CounterChannels() = default;

  virtual std::size_t size() const = 0;
  // Valid, and the same, for as long as this object lives.
  virtual const ReportChannelDescription& description(std::size_t index) const = 0;
  // The values now of the channels with these indexes, in the order of the indexes and as close together as possible;
  // no value for a channel that has none or is gone. Nothing, and an error, when they cannot be read.
  virtual std::optional<CounterValues> read(const std::vector<std::size_t>& indexes, DiagnosticErrorPtr* error) = 0;
  // Stores the backend's error for a baseline that is a snapshot of other channels.
  virtual void refuseBaseline(DiagnosticErrorPtr* error) const = 0;
};

// Finds the channels; null, and an error, when they cannot be looked for. Thread: any, several at once.
using FindCounters = std::function<std::shared_ptr<CounterChannels>(DiagnosticErrorPtr* error)>;

// Asks `find` at every call of reportWithOnlySimpleChannels(); the channels come in the order of their indexes.
//
// Counts are unsigned. A difference is taken between snapshots of the same channels of one such call. It is exact, and
// negative for a count that fell: a driver that reset its counter is seen as what it is, and not as a huge number of
// events. Only a fall by more than 2^63 is that of a counter which went round its end, and its difference positive. A
// channel without a count in one of the two snapshots has no difference.
//
// Thread: any.
std::shared_ptr<ReportFacility> makeCounterReports(FindCounters find);

}  // namespace quazor
