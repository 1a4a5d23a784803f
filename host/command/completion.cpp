#include "host/command/completion.h"

#include "host/cli/command_line.h"
#include "host/command/selection.h"
#include "host/device/phone.h"

#include <algorithm>
#include <optional>
#include <set>
#include <utility>

namespace quazor {

namespace {

constexpr std::string_view kBash = R"(# Completion of quazor for bash; bash-completion finds it by its name.
_quazor() {
  local IFS=$'\n'
  COMPREPLY=($(quazor __complete "${COMP_WORDS[@]:1:COMP_CWORD}" 2>/dev/null))
  [[ ${#COMPREPLY[@]} -eq 1 && ${COMPREPLY[0]} == *[=:] ]] && compopt -o nospace
}
complete -o default -o bashdefault -F _quazor quazor
)";

constexpr std::string_view kZsh = R"(#compdef quazor
# Completion of quazor for zsh.
_quazor() {
  local -a candidates
  candidates=("${(@f)$(quazor __complete "${(@)words[2,CURRENT]}" 2>/dev/null)}")
  if [[ -n "${candidates[*]}" ]]; then
    compadd -a candidates
  else
    _files
  fi
}
compdef _quazor quazor
)";

class Completer {
 public:
  Completer(const std::vector<std::string>& words, const Installation& installation)
      : words_(words), installation_(installation), options_(optionsOfCommand(words.front())) {}

  std::vector<std::string> all() const {
    const std::string& last = words_.back();
    const std::string& before = words_[words_.size() - 2];
    for (const OptionSummary& option : options_) {
      if (option.takesValue && before == option.name) return valuesOf(option.name);
    }
    if (last.starts_with('-')) {
      std::vector<std::string> names;
      for (const OptionSummary& option : options_) names.push_back(option.name);
      return names;
    }
    return operands();
  }

 private:
  std::vector<std::string> valuesOf(const std::string& option) const {
    if (option == "--format") return formatNames();
    if (option == "--output") {
      std::vector<std::string> names = formatNames();
      for (std::string& name : names) name += ":";
      return names;
    }
    if (option == "--log-level") return {"error", "default", "debug"};
    if (option == "--only") return {"failed"};
    if (option == "--trace") return {"off", "frames", "frames=all", "queues"};
    if (option == "--log-limit" || option == "--memory") return {"none"};
    if (option == "--phone") return phones();
    if (option == "--profile" || option == "--parameters") return profiles(option == "--profile");
    if (option == "--plugin") return plugins();
    if (option == "--deadline") {
      std::vector<std::string> stages;
      for (const Stage stage : kStages) stages.push_back(std::string(nameOf(stage)) + "=");
      return stages;
    }
    if (option == "--stop-on") return {"fail", "error"};
    if (option == "--except") return operands();
    return option == "--set" ? parameters() : std::vector<std::string>();
  }

  std::vector<std::string> plugins() const {
    std::vector<std::string> names;
    try {
      for (const std::filesystem::path& file : installation_.allPlugins()) names.push_back(file.stem().string());
    } catch (const InputError&) {  // a folder cannot be read; the command itself says so
    }
    return names;
  }

  std::vector<std::string> profiles(bool orNone) const {
    std::vector<std::string> names = installation_.profileNames();
    if (orNone) names.emplace_back("none");
    return names;
  }

  std::vector<std::string> phones() const {
    std::vector<std::string> names = installation_.scenarioNames();
    for (const std::string& name : installation_.bindingNames()) names.push_back(std::string(kLinuxPrefix) + name);
    return names;
  }

  std::vector<std::string> operands() const {
    const std::string& command = words_.front();
    if (command == kHelpWord) return {std::begin(kCommandNames), std::end(kCommandNames)};
    if (command == "selftest") return installation_.scenarioNames();
    if (command == "completion") return {"bash", "zsh"};
    if (command == "records" && words_.size() == 2) return {std::begin(kRecordsActions), std::end(kRecordsActions)};
    if (command == "phone" && words_.size() == 2) return {"list", "probe"};
    if (command == "phone") return words_[1] == "list" ? installation_.scenarioNames() : std::vector<std::string>();
    std::vector<std::string> names;
    if (command != "run" && command != "describe" && command != "experiment" && command != "explain" &&
        command != "list") {
      return names;
    }
    for (const DescribedDiagnostic& one : catalogue(false)) {
      const bool experimentOnly = one.diagnostic.experimentOnly;
      if ((command == "run" && experimentOnly) || (command == "experiment" && !experimentOnly)) continue;
      names.push_back(one.diagnostic.name);
    }
    return names;
  }

  // The parameters of the diagnostics that are named on the command line, or of all diagnostics.
  std::vector<std::string> parameters() const {
    std::set<std::string> names;
    for (const DescribedDiagnostic& one : catalogue(true)) {
      for (const auto& [name, ignored] : one.description.experiment.parameters()) names.insert(name + "=");
      for (const auto& [name, ignored] : one.description.analysis.parameters()) names.insert(name + "=");
    }
    return {names.begin(), names.end()};
  }

  std::vector<DescribedDiagnostic> catalogue(bool described) const {
    Options options;
    try {
      for (std::size_t i = 1; i + 1 < words_.size(); ++i) {
        if (words_[i] == "--plugin") options.plugins.push_back(installation_.plugin(words_[i + 1]));
      }
      std::vector<DescribedDiagnostic> all =
          scanOf(options, installation_, [described](const std::vector<Diagnostic>& everything) {
            return described ? everything : std::vector<Diagnostic>();
          }).catalogue;
      std::vector<DescribedDiagnostic> named;
      std::copy_if(all.begin(), all.end(), std::back_inserter(named), [this](const DescribedDiagnostic& one) {
        return std::find(words_.begin(), words_.end() - 1, one.diagnostic.name) != words_.end() - 1;
      });
      return described && !named.empty() ? named : all;
    } catch (const InputError&) {
      return {};
    }
  }

  const std::vector<std::string>& words_;
  const Installation& installation_;
  const std::vector<OptionSummary> options_;
};

}  // namespace

std::string completionScript(std::string_view shell) { return std::string(shell == "zsh" ? kZsh : kBash); }

std::vector<std::string> completionsOf(const std::vector<std::string>& words, const Installation& installation) {
  std::vector<std::string> candidates;
  if (words.size() < 2) {
    candidates.assign(std::begin(kCommandNames), std::end(kCommandNames));
    candidates.insert(candidates.end(), {kHelpWord, "--help", "--version"});
  } else {
    candidates = Completer(words, installation).all();
  }
  const std::string prefix = words.empty() ? std::string() : words.back();
  std::erase_if(candidates, [&prefix](const std::string& one) { return !one.starts_with(prefix); });
  return candidates;
}

}  // namespace quazor
