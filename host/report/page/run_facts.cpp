#include "host/report/page/run_facts.h"

#include "contract/message_format.h"
#include "host/report/page/html.h"
#include "host/text/shell_word.h"
#include "host/text/timestamp.h"

#include <algorithm>
#include <cstddef>
#include <filesystem>
#include <string_view>
#include <vector>

namespace quazor {

namespace {

// The values of these parameters and limits are the same without being asked for.
constexpr std::string_view kDefaultProfile = "default.json";

std::string row(std::string_view name, const std::string& text) {
  return element("tr", element("th scope=\"row\"", name) + element("td", htmlText(text))) + "\n";
}

bool isOfDefaultProfile(const std::string& source) { return source.ends_with(kDefaultProfile); }

// The words of --set for what the diagnostic does not have by default.
std::vector<std::string> settingsOf(const DiagnosticRecord& record) {
  std::vector<std::string> settings;
  for (const Part part : {Part::kExperiment, Part::kAnalysis}) {
    for (const ResolvedParameter& one : record.parameters.of(part)) {
      if (!one.value || isOfDefaultProfile(one.source)) continue;
      settings.push_back(std::string(nameOf(part)) + "." + one.name + "=" + defaultText(*one.value));
    }
  }
  return settings;
}

// True if two settings give the same parameter different values.
bool contradict(const std::vector<std::string>& settings) {
  const auto nameOfSetting = [](const std::string& one) { return one.substr(0, one.find('=')); };
  for (std::size_t i = 0; i < settings.size(); ++i) {
    for (std::size_t other = 0; other < i; ++other) {
      if (settings[i] != settings[other] && nameOfSetting(settings[i]) == nameOfSetting(settings[other])) return true;
    }
  }
  return false;
}

void addUnique(std::vector<std::string>& words, const std::vector<std::string>& more) {
  for (const std::string& word : more) {
    if (std::find(words.begin(), words.end(), word) == words.end()) words.push_back(word);
  }
}

std::string command(const RunStarted& run, const std::vector<std::string>& names,
                    const std::vector<std::string>& settings) {
  std::string text = run.ofExperiments ? "quazor experiment" : "quazor run";
  const auto add = [&text](const std::string& option, const std::string& word) {
    text += " " + (option.empty() ? "" : option + " ") + shellWord(word);
  };
  for (const std::string& name : names) add("", name);
  add("--phone", run.phone);
  add("--seed", std::to_string(run.seed));
  for (const std::string& setting : settings) add("--set", setting);
  for (const UserLimit& limit : run.limits) {
    if (limit.severity == LimitSeverity::kFail && !isOfDefaultProfile(limit.source)) {
      add("--limit", canonicalText(limit));
    }
  }
  if (run.attempts > 0) add("--attempts", std::to_string(run.attempts));
  if (run.repetitions > 0) add("--repeat", std::to_string(run.repetitions));
  if (run.acceptFlaky) text += " --accept-flaky";
  for (const auto& [key, value] : run.tags) add("--tag", formatMessage("%@=%@", key, value));
  return text + "\n";
}

}  // namespace

std::string shortPhone(const RunStarted& run) { return std::filesystem::path(run.phone).stem().string(); }

std::string dateText(Date date) { return timestampText(date).substr(0, 19).replace(10, 1, " "); }

std::string runTable(const ShownRun& shown) {
  const RunStarted& run = shown.began;
  std::string rows;
  if (!shown.file.empty()) rows += row("Record", shown.file);
  if (!run.id.empty()) rows += row(run.analyzed ? "Analysis" : "Run", run.id);
  rows += row("Date", timestampText(run.date));
  if (run.analyzed) {
    rows += row("Analyzed run", run.analyzed->id);
    rows += row("Date of that run", timestampText(run.analyzed->date));
    rows += row("Machine of that run", run.analyzed->host);
  }
  rows += row("Phone", run.phone);
  for (const auto& [key, value] : run.tags) rows += row("Tag " + htmlText(key), value);
  rows += row("Seed", std::to_string(run.seed));
  if (!run.host.empty()) rows += row("Machine", run.host);
  rows += row("Program", "quazor " + run.program);
  rows += row("Plug-in contract", std::to_string(run.contract));
  for (const std::string& plugin : run.plugins) rows += row("Plug-in", plugin);
  if (run.attempts > 0) rows += row("Attempts, at most", std::to_string(run.attempts));
  if (run.repetitions > 0) rows += row("Repetitions", std::to_string(run.repetitions));
  return element("table", element("caption", "What was run, on what, with what") + element("tbody", rows)) + "\n";
}

std::string rerunCommands(const ShownRun& shown) {
  std::vector<std::string> names;
  std::vector<std::string> settings;
  for (const DiagnosticRecord& record : shown.records) addUnique(settings, settingsOf(record));
  addUnique(names, shown.began.names);
  if (!contradict(settings)) return command(shown.began, names, settings);
  std::string commands;
  std::vector<std::string> done;
  for (const DiagnosticRecord& record : shown.records) {
    if (std::find(done.begin(), done.end(), record.name) != done.end()) continue;
    done.push_back(record.name);
    commands += command(shown.began, {record.name}, settingsOf(record));
  }
  return commands;
}

}  // namespace quazor
