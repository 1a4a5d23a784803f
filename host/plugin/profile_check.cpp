#include "host/plugin/profile_check.h"

#include "base/json/json_cursor.h"
#include "base/text/nearest_name.h"
#include "contract/message_format.h"
#include "host/error/exit_code.h"
#include "host/text/name_pattern.h"

#include <algorithm>
#include <iterator>
#include <optional>
#include <string>
#include <string_view>

namespace quazor {

namespace {

bool isAmong(const std::vector<std::string>& names, const std::string& name) {
  return std::find(names.begin(), names.end(), name) != names.end();
}

// "; did you mean ...?" or "; expected one of ...", the end of a sentence about an unknown name.
std::string suggestionFor(const std::string& name, const std::vector<std::string>& names) {
  std::vector<std::string_view> known;
  for (const std::string& one : names) {
    if (std::find(known.begin(), known.end(), one) == known.end()) known.push_back(one);
  }
  return suggestion(name, known);
}

// Throws the sentence about a path of the profile, as a mistake of its file if it has one.
[[noreturn]] void fail(const Profile& profile, const std::string& path, const std::string& sentence) {
  if (profile.document != nullptr) profile.document->fail(path, sentence, path);
  throw CommandError(ExitCode::kCannotRead,
                     "the " + profile.kind + " '" + profile.file.string() + "': " + sentenceAbout(path, sentence));
}

void checkParameters(const Profile& profile, const ProfileEntry& entry, Part part,
                     const std::vector<DescribedDiagnostic>& matched) {
  const std::vector<std::string> names = declaredNames(matched, part);
  for (const auto& [name, ignored] : entry.values(part)) {
    if (isAmong(names, name)) continue;
    fail(profile, Profile::pathOf(entry, part, name),
         "no " + std::string(nameOf(part)) + " of " + inQuotes(entry.name) + " has this parameter" +
             suggestionFor(name, names));
  }
}

bool matches(const ProfileEntry& entry, const Diagnostic& one) {
  return one.experimentOnly == entry.ofExperiment && matchesName(entry.name, one.name);
}

// The diagnostics or experiments that the entry matches.
std::vector<DescribedDiagnostic> matchesOf(const ProfileEntry& entry,
                                           const std::vector<DescribedDiagnostic>& catalogue) {
  std::vector<DescribedDiagnostic> matched;
  std::copy_if(catalogue.begin(), catalogue.end(), std::back_inserter(matched),
               [&entry](const DescribedDiagnostic& one) { return matches(entry, one.diagnostic); });
  return matched;
}

// The names of the diagnostics or, for an entry of an experiment, of the experiments.
std::vector<std::string> namesLike(const ProfileEntry& entry, const std::vector<DescribedDiagnostic>& catalogue) {
  std::vector<std::string> names;
  for (const DescribedDiagnostic& one : catalogue) {
    if (one.diagnostic.experimentOnly == entry.ofExperiment) names.push_back(one.diagnostic.name);
  }
  return names;
}

[[noreturn]] void failUnmatched(const Profile& profile, const ProfileEntry& entry,
                                const std::vector<DescribedDiagnostic>& catalogue,
                                const std::vector<Diagnostic>& others) {
  std::vector<std::string> names = namesLike(entry, catalogue);
  for (const Diagnostic& one : others) {
    if (one.experimentOnly == entry.ofExperiment) names.push_back(one.name);
  }
  const std::string noun = entry.ofExperiment ? "experiment" : "diagnostic";
  fail(profile, Profile::pathOf(entry),
       "no " + noun + (isPattern(entry.name) ? " matches this pattern" : " has this name") +
           suggestionFor(entry.name, names));
}

void checkEntry(const Profile& profile, const ProfileEntry& entry, const std::vector<DescribedDiagnostic>& catalogue,
                const std::vector<Diagnostic>& others, FirstMistake& mistakes) {
  const std::vector<DescribedDiagnostic> matched = matchesOf(entry, catalogue);
  const bool isOfOthers =
      std::any_of(others.begin(), others.end(), [&entry](const Diagnostic& one) { return matches(entry, one); });
  if (matched.empty() && !isOfOthers && !profile.mayNameOthers) failUnmatched(profile, entry, catalogue, others);
  const bool allDescribed = std::all_of(matched.begin(), matched.end(), [](const DescribedDiagnostic& one) {
    return one.description.isAsked && one.description.error == nullptr;
  });
  if (matched.empty() || !allDescribed) return;
  for (const Part part : kParts) mistakes.of([&] { checkParameters(profile, entry, part, matched); });
}

// Checks the values that the profile gives to a diagnostic or experiment. A value that another entry overrides does not
// count.
void checkRanges(const Profile& profile, const DescribedDiagnostic& diagnostic, FirstMistake& mistakes) {
  for (const Part part : kParts) {
    for (const auto& [name, ignored] : diagnostic.ranges(part)) {
      const ProfileEntry* const entry = profile.entryFor(diagnostic.diagnostic, part, name);
      if (entry == nullptr) continue;
      const std::optional<std::string> problem = rangeProblem(diagnostic, part, name, *entry->values(part).find(name));
      if (!problem) continue;
      const std::string path = Profile::pathOf(*entry, part, name);
      mistakes.of([&] { fail(profile, path, *problem + ", for " + diagnostic.diagnostic.name + "."); });
    }
  }
}

// True if one of the diagnostics declares each parameter that the entry sets.
bool declareAll(const std::vector<DescribedDiagnostic>& diagnostics, const ProfileEntry& entry) {
  for (const Part part : kParts) {
    const std::vector<std::string> names = declaredNames(diagnostics, part);
    for (const auto& [name, ignored] : entry.values(part)) {
      if (!isAmong(names, name)) return false;
    }
  }
  return true;
}

// Adds the undescribed matches if the described ones do not declare every parameter of the entry.
void addDiagnosticsToDescribe(const ProfileEntry& entry, const std::vector<DescribedDiagnostic>& catalogue,
                              std::vector<Diagnostic>& undescribed) {
  const std::vector<DescribedDiagnostic> matched = matchesOf(entry, catalogue);
  std::vector<DescribedDiagnostic> asked;
  std::copy_if(matched.begin(), matched.end(), std::back_inserter(asked),
               [](const DescribedDiagnostic& one) { return one.description.isAsked; });
  const auto couldNot = [](const DescribedDiagnostic& one) { return one.description.error != nullptr; };
  // An entry that matches nothing selected does not matter. checkProfile skips an entry with a failed description.
  if (asked.empty() || std::any_of(asked.begin(), asked.end(), couldNot) || declareAll(asked, entry)) return;
  for (const DescribedDiagnostic& one : matched) {
    if (!one.description.isAsked && !contains(undescribed, one.diagnostic)) undescribed.push_back(one.diagnostic);
  }
}

}  // namespace

void checkProfile(const Profile& profile, const std::vector<DescribedDiagnostic>& catalogue,
                  const std::vector<Diagnostic>& others) {
  FirstMistake mistakes = profile.mistakes;
  const auto check = [&](const ProfileEntry& entry) { checkEntry(profile, entry, catalogue, others, mistakes); };
  mistakes.inOrder(profile.entries, check);
  mistakes.inOrder(profile.experiments, check);
  for (const DescribedDiagnostic& one : catalogue) checkRanges(profile, one, mistakes);
  try {
    mistakes.throwIfAny();
  } catch (const DocumentError& first) {
    throw CommandError(ExitCode::kCannotRead, first.what());
  }
}

bool namesOthers(const Profile& profile, const std::vector<DescribedDiagnostic>& catalogue, bool onlyMisspelt) {
  const auto isOfOthers = [&](const ProfileEntry& entry) {
    return matchesOf(entry, catalogue).empty() &&
           (!onlyMisspelt || nearestName(entry.name, namesLike(entry, catalogue)).has_value());
  };
  return std::any_of(profile.entries.begin(), profile.entries.end(), isOfOthers) ||
         std::any_of(profile.experiments.begin(), profile.experiments.end(), isOfOthers);
}

std::vector<Diagnostic> diagnosticsToDescribe(const Profile& profile,
                                              const std::vector<DescribedDiagnostic>& catalogue) {
  std::vector<Diagnostic> undescribed;
  for (const ProfileEntry& entry : profile.entries) addDiagnosticsToDescribe(entry, catalogue, undescribed);
  for (const ProfileEntry& entry : profile.experiments) addDiagnosticsToDescribe(entry, catalogue, undescribed);
  return undescribed;
}

std::vector<std::string> limitsForOtherValues(const Profile& profile, const std::vector<ResolvedDiagnostic>& selected) {
  std::vector<std::string> sentences;
  const auto compare = [&](const ProfileEntry& entry, Part part, const ResolvedParameter& now) {
    const Value* const meant = entry.values(part).find(now.name);
    if (meant == nullptr || !now.value || defaultText(*meant) == defaultText(*now.value)) return;
    std::string sentence =
        formatMessage("the limits of the %@ %@ for %@ are made for %@=%@, but it is %@ (%@)", profile.kind,
                      profile.file.filename().string(), entry.name, now.name, *meant, *now.value, now.source);
    if (!isAmong(sentences, sentence)) sentences.push_back(std::move(sentence));
  };
  for (const ProfileEntry& entry : profile.entries) {
    const bool hasLimits = std::any_of(profile.limits.begin(), profile.limits.end(),
                                       [&entry](const UserLimit& one) { return one.diagnostic == entry.name; });
    if (!hasLimits) continue;
    for (const ResolvedDiagnostic& one : selected) {
      const Diagnostic& diagnostic = one.described.diagnostic;
      if (diagnostic.experimentOnly || !matchesName(entry.name, diagnostic.name)) continue;
      for (const ResolvedParameter& now : one.parameters.experiment) compare(entry, Part::kExperiment, now);
      for (const ResolvedParameter& now : one.parameters.analysis) compare(entry, Part::kAnalysis, now);
    }
  }
  return sentences;
}

}  // namespace quazor
