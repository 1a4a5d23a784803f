#include "host/report/rerun_command.h"

#include "contract/message_format.h"
#include "host/device/phone.h"
#include "host/model/incomplete_run.h"
#include "host/model/limit_check.h"
#include "host/text/shell_word.h"

#include <algorithm>

namespace quazor {

namespace {

// Diagnostics that one command can run, by the first record of each.
using Group = std::vector<const DiagnosticRecord*>;

// True if the settings of one diagnostic leave the parameters of the other as they were.
bool haveSameValues(const DiagnosticRecord& one, const DiagnosticRecord& other) {
  if (one.seed != other.seed) return false;
  return std::ranges::all_of(kParts, [&](Part part) {
    return std::ranges::all_of(one.parameters.of(part), [&](const ResolvedParameter& parameter) {
      return std::ranges::all_of(other.parameters.of(part), [&parameter](const ResolvedParameter& same) {
        return same.name != parameter.name || same.value == parameter.value;
      });
    });
  });
}

// `neverBegun` are the diagnostics that the run did not reach, which outlive the groups.
std::vector<Group> groupsOf(const ShownRun& run, const std::vector<DiagnosticRecord>& neverBegun) {
  std::vector<Group> groups;
  for (const std::string& name : run.began.names) {
    const auto recorded = std::ranges::find(run.records, name, &DiagnosticRecord::name);
    const auto never = std::ranges::find(neverBegun, name, &DiagnosticRecord::name);
    if (recorded == run.records.end() && never == neverBegun.end()) continue;
    const DiagnosticRecord* const record = recorded == run.records.end() ? &*never : &*recorded;
    if (record->errorStage == Stage::kLoad) continue;
    const auto group = std::ranges::find_if(groups, [&](const Group& one) {
      return std::ranges::all_of(one, [&](const DiagnosticRecord* each) { return haveSameValues(*each, *record); });
    });
    if (group == groups.end()) {
      groups.push_back({record});
    } else {
      group->push_back(record);
    }
  }
  return groups;
}

bool isMeantFor(const UserLimit& limit, const Group& group) {
  return std::ranges::any_of(group, [&limit](const DiagnosticRecord* one) { return appliesTo(limit, one->name); });
}

// True if the command of the group reports something else about itself with the limit than without it, and nothing
// that the run did not report.
bool belongsTo(const UserLimit& limit, const Group& group, const ShownRun& run) {
  if (!isMeantFor(limit, group)) return false;
  std::vector<DiagnosticRecord> records;
  for (const DiagnosticRecord* const one : group) {
    const bool hasBegun = std::ranges::find(run.records, one->name, &DiagnosticRecord::name) != run.records.end();
    if (!hasBegun && appliesTo(limit, one->name)) return true;  // it would have been judged by it
    records.push_back(*one);
  }
  return limitsWithoutResult({limit}, records).empty() || !limitsWithoutResult({limit}, run.records).empty();
}

std::string commandOf(const Group& group, bool isOnlyOne, const ShownRun& run) {
  const RunStarted& began = run.began;
  std::vector<std::string> names;
  std::vector<std::string> more;
  const auto add = [&more](const std::string& part) {
    if (std::ranges::find(more, part) == more.end()) more.push_back(part);
  };
  for (const DiagnosticRecord* const one : group) {
    names.push_back(one->name);
    for (const std::string& part : settingParts(one->parameters)) add(part);
    if (one->skip && one->skip->kind == SkipKind::kNotAllowed) {
      add(optionPart("--skip", one->name + "=" + one->skip->reason));
    }
  }
  for (const UserLimit& limit : began.limits) {
    const bool counts = limit.severity == LimitSeverity::kFail;
    const bool isOfCommandLine = isOnlyOne && !limit.onlyIfSelected;
    if (counts && (isOfCommandLine || belongsTo(limit, group, run))) add(optionPart("--limit", canonicalText(limit)));
  }
  if (began.attempts > 0) add(optionPart("--attempts", std::to_string(began.attempts)));
  if (began.repetitions > 0) add(optionPart("--repeat", std::to_string(began.repetitions)));
  if (began.acceptFlaky) add("--accept-flaky");
  if (began.tracesTasks) add("--trace queues");
  for (const auto& [key, value] : began.tags) add(optionPart("--tag", formatMessage("%@=%@", key, value)));
  std::string command;
  for (const std::string& part : commandParts(began, names, group.front()->seed)) {
    command += (command.empty() ? "" : " \\\n  ") + part;
  }
  for (const std::string& part : more) command += " \\\n  " + part;
  return command + "\n";
}

}  // namespace

std::string optionPart(const std::string& option, const std::string& argument) {
  return option + " " + shellWord(argument);
}

std::vector<std::string> commandParts(const RunStarted& run, const std::vector<std::string>& names,
                                      std::uint64_t seed) {
  std::vector<std::string> parts = {run.ofExperiments ? "quazor experiment" : "quazor run"};
  for (const std::string& name : names) parts.front() += " " + shellWord(name);
  for (const std::string& plugin : run.plugins) parts.push_back(optionPart("--plugin", plugin));
  if (!run.phone.empty()) parts.push_back(optionPart("--phone", run.phone));
  if (!bindingNamed(run.phone)) parts.push_back("--seed " + std::to_string(seed));  // no effect on a real phone
  parts.emplace_back("--profile none");
  return parts;
}

std::vector<std::string> settingParts(const ResolvedParameters& parameters) {
  std::vector<std::string> parts;
  for (const Part part : kParts) {
    for (const ResolvedParameter& one : parameters.of(part)) {
      if (one.value)
        parts.push_back(optionPart("--set", formatMessage("%@.%@=%@", nameOf(part), one.name, *one.value)));
    }
  }
  return parts;
}

std::string rerunCommands(const ShownRun& run) {
  const std::vector<DiagnosticRecord> never = neverBegun(run.began, run.records);
  const std::vector<Group> groups = groupsOf(run, never);
  std::string commands;
  for (const Group& group : groups) commands += commandOf(group, groups.size() == 1, run);
  return commands;
}

}  // namespace quazor
