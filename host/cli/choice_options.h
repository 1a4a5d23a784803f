// The options that choose which diagnostics run and how often, what is skipped, and when a run stops.
#pragma once

#include "host/device/skip.h"

#include <chrono>
#include <cstdint>
#include <string>
#include <vector>

namespace CLI {
class App;
}

namespace quazor {

// After which verdict a run stops.
enum class StopOn { kNothing, kError, kFail };

struct Choice {
  std::vector<std::string> except;    // names or patterns of what is left out
  std::vector<SkipRule> skips;        // of the command line
  std::chrono::nanoseconds settle{};  // between two diagnostics
  StopOn stopOn = StopOn::kNothing;
  bool allowSkips = false;
  std::uint64_t attempts = 1;     // of a diagnostic that ends in an error
  std::uint64_t repetitions = 1;  // of the run
  bool acceptFlaky = false;       // a pass after an error
};

// The arguments, before they are checked.
struct ChoiceTexts {
  std::vector<std::string> except;
  std::vector<std::string> skips;
  std::string settle;
  std::string stopOn;
  std::string attempts;
  std::string repetitions;
  bool allowSkips = false;
  bool acceptFlaky = false;
};

// Declares the options of a command that runs diagnostics or experiments.
void addChoiceOptions(CLI::App& command, ChoiceTexts& texts, const std::string& what);

// Declares --log-limit. logLimitOf() reads its text.
void addLogLimit(CLI::App& command, std::string& text);

// Declares --heartbeat. parseHeartbeat() reads its text.
void addHeartbeat(CLI::App& command, std::string& text);

// Declares --trace. traceOf() reads its text.
void addTrace(CLI::App& command, std::string& text);

// Throws a CommandError (kUsage) that begins with the option.
Choice choiceOf(const ChoiceTexts& texts);

}  // namespace quazor
