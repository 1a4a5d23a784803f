// The options that choose which diagnostics run, when a run stops, and how often it is repeated.
#pragma once

#include <chrono>
#include <string>
#include <vector>

namespace CLI {
class App;
}

namespace quazor {

struct Choice {
  std::vector<std::string> except;    // names or patterns of what is left out
  std::chrono::nanoseconds settle{};  // between two diagnostics
};

// The arguments, before they are checked.
struct ChoiceTexts {
  std::vector<std::string> except;
  std::string settle;
};

// Declares the options of a command that runs diagnostics or experiments.
void addChoiceOptions(CLI::App& command, ChoiceTexts& texts, const std::string& what);

// Throws a CommandError (kUsage) that begins with the option.
Choice choiceOf(const ChoiceTexts& texts);

}  // namespace quazor
