#include "host/report/page/advised_command.h"

#include "host/text/shell_word.h"

#include <algorithm>
#include <sstream>
#include <string_view>
#include <vector>

namespace quazor {

namespace {

constexpr std::string_view kProfile = "--profile";

std::vector<std::string> wordsOf(const std::string& command) {
  std::istringstream text(command);
  std::vector<std::string> words;
  for (std::string word; text >> word;) words.push_back(word);
  return words;
}

bool runsSomething(const std::vector<std::string>& words) {
  return words.size() > 2 && words[0] == "quazor" && (words[1] == "run" || words[1] == "experiment");
}

// True if the run has a value or a limit of the profile of that name.
bool usesProfile(const ShownRun& run, const std::string& name) {
  const std::string source = "profile " + name + ".json";
  if (std::ranges::find(run.began.limits, source, &UserLimit::source) != run.began.limits.end()) return true;
  return std::ranges::any_of(run.records, [&source](const DiagnosticRecord& record) {
    return std::ranges::any_of(kParts, [&](Part part) {
      return std::ranges::find(record.parameters.of(part), source, &ResolvedParameter::source) !=
             record.parameters.of(part).end();
    });
  });
}

std::string_view outcomeOf(Verdict verdict) {
  switch (verdict) {
    case Verdict::kPass: return "passed";
    case Verdict::kFail: return "failed";
    case Verdict::kError: return "ended in an error";
    case Verdict::kSkip: break;
  }
  return {};
}

}  // namespace

std::string fittedCommand(const std::string& command, const Explained& explained) {
  std::vector<std::string> words = wordsOf(command);
  if (!runsSomething(words)) return command;
  const DiagnosticRecord& record = explained.record;
  const bool isOfExperiment = words[1] == "experiment" && !record.experimentName.empty();
  const std::string name = shellWord(isOfExperiment ? record.experimentName : record.name);
  std::ranges::replace(words, std::string("NAME"), name);
  if (!explained.run.began.phone.empty() && std::ranges::find(words, "--phone") == words.end()) {
    words.insert(words.end(), {"--phone", shellWord(explained.run.began.phone)});
  }
  std::string fitted;
  for (const std::string& word : words) fitted += (fitted.empty() ? "" : " ") + word;
  return fitted;
}

std::string knownOfCommand(const std::string& command, const Explained& explained) {
  const ShownRun& run = explained.run;
  std::vector<std::string> words = wordsOf(command);
  const auto profile = std::ranges::find(words, kProfile);
  if (profile != words.end()) {
    if (words.end() - profile < 2 || !usesProfile(run, profile[1])) return {};
    words.erase(profile, profile + 2);
    if (words.empty()) return "used in this run";
  }
  // With more options, it would be another run.
  if (!runsSomething(words) || words.size() != 3 || words[1] != "run" || words[2] == explained.record.name) return {};
  std::string_view outcome;
  for (const DiagnosticRecord& one : run.records) {
    if (one.name == words[2]) outcome = outcomeOf(one.verdict);
  }
  return outcome.empty() ? std::string() : "already run here: " + std::string(outcome);
}

}  // namespace quazor
