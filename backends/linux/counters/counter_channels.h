// The report channels that a binding's counters make, and what each is read from.
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
  std::string file;                         // a file with one number or of lines "KEY NUMBER"; a tracepoint's ID
  std::string key;                          // empty: the file is one number
  std::optional<std::uint64_t> tracepoint;  // the ID, for a channel that is one
};

// Where tracefs is, and where else it may be (Documentation/trace/ftrace.rst).
inline constexpr std::string_view kTracingPlaces[] = {"/sys/kernel/tracing", "/sys/kernel/debug/tracing"};

// All channels that there are now, in the binding's order; those of one entry are sorted by path, and those of one file
// follow each other. What is known to be no counter is left out. Linear in the channels, but for the sorting within a
// directory. Nothing, and an error, when something may not be looked at.
std::optional<std::vector<CounterChannel>> counterChannels(const Binding& binding, CounterSystem& system,
                                                           DiagnosticErrorPtr* error);

// The number in a text that holds nothing else but spaces and line ends around it; nothing for other texts, and for
// numbers below 0 and of more than 64 bits.
std::optional<std::uint64_t> countIn(std::string_view text);

// Takes the next line "KEY NUMBER" from the beginning of `text`: its key, and its count where it is one. Lines without
// a key are passed over. Nothing at the end of the text.
struct KeyedLine {
  std::string_view key;
  std::optional<std::uint64_t> count;
};
std::optional<KeyedLine> takeKeyedLine(std::string_view* text);

// The processors in a list like "0-3,8", as /sys/devices/system/cpu/online has it; those that can be understood.
std::vector<int> processorsIn(std::string_view list);

}  // namespace quazor
