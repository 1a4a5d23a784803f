// The report channels of a binding's counters, and their sources.
#pragma once

#include "backends/linux/binding/binding.h"
#include "backends/linux/counters/counter_system.h"
#include "contract/diagnostic_error.h"
#include "platform/report_facility.h"

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

struct CounterChannel {
  ReportChannelDescription description;
  std::string file;                         // a file with one number or with lines "KEY NUMBER"; a tracepoint's ID
  std::string key;                          // empty: the file is one number
  std::optional<std::uint64_t> tracepoint;  // the ID, if the channel is a tracepoint
};

// The mount points of tracefs (Documentation/trace/ftrace.rst).
inline constexpr std::string_view kTracingPlaces[] = {"/sys/kernel/tracing", "/sys/kernel/debug/tracing"};

// All existing channels, in the binding's order. Those of one entry are sorted by path, and those of one file are
// consecutive. Omits values that are known not to be counters. Takes linear time, apart from the sorting within a
// directory. Returns nothing and an error if a permission is missing.
std::optional<std::vector<CounterChannel>> counterChannels(const Binding& binding, CounterSystem& system,
                                                           DiagnosticErrorPtr* error);

// The number in a text that otherwise contains only spaces and line ends; nothing for other texts, negative numbers and
// numbers of more than 64 bits.
std::optional<std::uint64_t> countIn(std::string_view text);

// Removes the next line "KEY NUMBER" from the beginning of `text` and returns its key, and its count if it is valid.
// Skips lines without a key. Returns nothing at the end of the text.
struct KeyedLine {
  std::string_view key;
  std::optional<std::uint64_t> count;
};
std::optional<KeyedLine> takeKeyedLine(std::string_view* text);

// The processors in a list like "0-3,8", the format of /sys/devices/system/cpu/online. Skips invalid items.
std::vector<int> processorsIn(std::string_view list);

}  // namespace quazor
