// The options of 'quazor records'.
#pragma once

#include "host/store/filter.h"

#include <filesystem>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace CLI {
class App;
}

namespace quazor {

enum class RecordsAction {
  kImport,
  kList,
  kShow,
  kYield,
  kFailures,
  kFlaky,
  kDrift,
  kCapability,
  kGauge,
  kMark,
  kCheck
};

// In the order of the enumerators.
inline constexpr std::string_view kRecordsActions[] = {"import", "list",       "show",  "yield", "failures", "flaky",
                                                       "drift",  "capability", "gauge", "mark",  "check"};

// The arguments, before they are checked.
struct RecordsCommandTexts {
  std::string action;
  std::vector<std::string> operands;
  std::optional<std::string> store;
  std::optional<std::string> since;
  std::optional<std::string> until;
  std::optional<std::string> station;
  std::optional<std::string> serial;
  std::optional<std::string> diagnostic;
  std::optional<std::string> result;
  std::optional<std::string> note;
  std::optional<std::string> by;
  bool repaired = false;
};

// What the command is asked for.
struct RecordsRequest {
  RecordsAction action = RecordsAction::kImport;
  std::filesystem::path store;
  std::vector<std::filesystem::path> records;  // to import
  std::string run;                             // to show
  std::string note;                            // of a repair
  std::string by;                              // the tag by which a yield is grouped
  Filter filter;
};

// Declares the command, with its format in `format`.
CLI::App& declareRecordsCommand(CLI::App& app, RecordsCommandTexts& texts, std::string& format);
// The texts that the command line may have marked.
std::vector<std::string*> textsOf(RecordsCommandTexts& texts);

// Throws a CommandError (kUsage) that begins with what is wrong.
RecordsRequest recordsRequestOf(const RecordsCommandTexts& texts);

// Declares --store of a command that runs. storeOf() reads its text.
void addStore(CLI::App& command, std::string& text);
// Empty if no store was asked for. Throws a CommandError (kUsage) without a record to import.
std::filesystem::path storeOf(const std::string& text, const std::filesystem::path& record);

}  // namespace quazor
