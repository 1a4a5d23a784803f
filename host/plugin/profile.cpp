#include "host/plugin/profile.h"

#include "base/json/json_cursor.h"
#include "base/text/input_error.h"
#include "host/plugin/diagnostic_registry.h"
#include "host/text/name_pattern.h"

#include <algorithm>
#include <cstdint>
#include <optional>
#include <system_error>
#include <utility>

namespace quazor {

namespace {

constexpr std::uint64_t kSchema = 1;

constexpr std::string_view kBase = "base";
constexpr std::string_view kDiagnostics = "diagnostics";
constexpr std::string_view kExperiments = "experiments";

OrderedMap<Value> valuesOf(const JsonCursor& object, FirstMistake& mistakes) {
  OrderedMap<Value> values;
  mistakes.of([&] {
    mistakes.inOrder(object.entries(), [&values](const auto& entry) {
      const auto& [name, value] = entry;
      if (!value.isNumber()) value.failType("a number");
      values.set(name, value.scalar());
    });
  });
  return values;
}

OrderedMap<Value> valuesIn(const JsonCursor& entry, std::string_view key, FirstMistake& mistakes) {
  const std::optional<JsonCursor> object = entry.find(key);
  return object ? valuesOf(*object, mistakes) : OrderedMap<Value>();
}

const ProfileEntry* entryIn(const std::vector<ProfileEntry>& entries, const std::string& name, Part part,
                            std::string_view parameter) {
  const ProfileEntry* found = nullptr;
  for (const ProfileEntry& entry : entries) {
    if (entry.values(part).find(parameter) == nullptr || !matchesName(entry.name, name)) continue;
    if (entry.name == name) return &entry;
    found = &entry;
  }
  return found;
}

const ProfileEntry* entryForExperiment(const Profile& profile, const std::string& experiment,
                                       const std::vector<std::string>& usedBy, std::string_view parameter) {
  const ProfileEntry* entry = entryIn(profile.experiments, experiment, Part::kExperiment, parameter);
  for (auto user = usedBy.begin(); entry == nullptr && user != usedBy.end(); ++user) {
    entry = entryIn(profile.entries, *user, Part::kExperiment, parameter);
  }
  return entry;
}

const Value* valueIn(const ProfileEntry* entry, Part part, std::string_view parameter) {
  return entry == nullptr ? nullptr : entry->values(part).find(parameter);
}

// The limit without its name and severity.
UserLimit limitIn(const JsonCursor& cursor) {
  const std::string text = cursor.text();
  UserLimit limit;
  try {
    limit = parseUserLimit(text);
  } catch (const InputError& problem) {
    cursor.fail(std::string("is not a limit: ") + problem.what() + ".");
  }
  if (!limit.diagnostic.empty())
    cursor.fail("names a diagnostic, but a limit of a profile belongs to the diagnostics of its entry.");
  return limit;
}

void addLimit(const std::string& diagnostic, const JsonCursor& entry, Profile& profile) {
  FirstMistake& mistakes = profile.mistakes;
  UserLimit limit;
  mistakes.of([&] { entry.allowKeys({"limit", "name", "severity"}); });
  mistakes.of([&] { limit = limitIn(entry.at("limit")); });
  mistakes.of([&] {
    if (const std::optional<JsonCursor> name = entry.find("name")) limit.name = name->text();
  });
  mistakes.of([&] {
    constexpr std::string_view kNames[] = {"fail", "warn"};
    const std::optional<JsonCursor> severity = entry.find("severity");
    if (severity) limit.severity = *limitSeverityNamed(severity->oneOf(kNames, "a severity"));
  });
  limit.diagnostic = diagnostic;
  limit.source = profile.source();
  limit.onlyIfSelected = true;
  profile.limits.push_back(std::move(limit));
}

void addEntry(const std::string& name, const JsonCursor& entry, Profile& profile) {
  FirstMistake& mistakes = profile.mistakes;
  mistakes.of([&] { entry.allowKeys({"experiment", "analysis", "limits"}); });
  mistakes.of([&] {
    profile.entries.push_back({name, valuesIn(entry, "experiment", mistakes), valuesIn(entry, "analysis", mistakes)});
    const std::optional<JsonCursor> limits = entry.find("limits");
    if (!limits) return;
    mistakes.inOrder(limits->elements(), [&](const JsonCursor& one) { addLimit(name, one, profile); });
  });
}

// Reads all that has the right form, and notes the first mistake.
Profile profileOf(const std::filesystem::path& file, JsonDocument json) {
  Profile profile{file, {}};
  profile.document = std::make_shared<const JsonDocument>(std::move(json));
  FirstMistake& mistakes = profile.mistakes;
  const JsonCursor document(*profile.document);
  mistakes.of([&] { document.allowKeys({"schema", kBase, kDiagnostics, kExperiments}); });
  mistakes.of([&] { document.at("schema").integer(kSchema, kSchema); });
  mistakes.of([&] {
    if (const std::optional<JsonCursor> base = document.find(kBase)) profile.base = base->text();
  });
  mistakes.of([&] {
    mistakes.inOrder(document.at(kDiagnostics).entries(),
                     [&profile](const auto& entry) { addEntry(entry.first, entry.second, profile); });
  });
  mistakes.of([&] {
    const std::optional<JsonCursor> experiments = document.find(kExperiments);
    if (!experiments) return;
    mistakes.inOrder(experiments->entries(), [&](const auto& entry) {
      profile.experiments.push_back({entry.first, valuesOf(entry.second, mistakes), {}, true});
    });
  });
  return profile;
}

Profile withoutMistakes(Profile profile) {
  profile.mistakes.throwIfAny();
  return profile;
}

// Empty if the profile has no base. `read` are the files of the profile and of those that are based on it.
std::filesystem::path fileOfBase(const Profile& profile, const std::vector<std::filesystem::path>& read,
                                 const ProfileSource& source) {
  if (profile.base.empty()) return {};
  const auto fail = [&profile](const std::string& sentence) {
    profile.document->fail(std::string(kBase), inQuotes(profile.base) + sentence, std::string(kBase));
  };
  std::error_code ignored;
  std::filesystem::path beside = (profile.file.parent_path() / profile.base).lexically_normal();
  if (!std::filesystem::is_regular_file(beside, ignored)) {
    std::filesystem::path named = source(profile.base, read);
    if (named.empty()) fail(" is neither a file nor the name of another profile; 'quazor doctor' lists the profiles.");
    return named;
  }
  for (const std::filesystem::path& one : read) {
    if (!std::filesystem::equivalent(one, beside, ignored)) continue;
    fail(" is itself based on this file; profiles must not be based on each other in a circle.");
  }
  return beside;
}

}  // namespace

std::string_view nameOf(Part part) { return part == Part::kExperiment ? "experiment" : "analysis"; }

const ProfileEntry* Profile::entryFor(const Diagnostic& diagnostic, Part part, std::string_view parameter) const {
  return diagnostic.experimentOnly ? entryForExperiment(*this, diagnostic.name, diagnostic.usedBy, parameter)
                                   : entryIn(entries, diagnostic.name, part, parameter);
}

const Value* Profile::find(const std::string& diagnostic, Part part, std::string_view parameter) const {
  return valueIn(entryIn(entries, diagnostic, part, parameter), part, parameter);
}

const Value* Profile::findForExperiment(const std::string& experiment, const std::vector<std::string>& usedBy,
                                        std::string_view parameter) const {
  return valueIn(entryForExperiment(*this, experiment, usedBy, parameter), Part::kExperiment, parameter);
}

std::string Profile::source() const { return kind + " " + (showsPath ? file : file.filename()).string(); }

std::string Profile::pathOf(const ProfileEntry& entry) {
  return jsonPath(std::string(entry.ofExperiment ? kExperiments : kDiagnostics), entry.name);
}

std::string Profile::pathOf(const ProfileEntry& entry, Part part, std::string_view parameter) {
  const std::string path = pathOf(entry);
  return jsonPath(entry.ofExperiment ? path : jsonPath(path, nameOf(part)), parameter);
}

Profile readProfileToCheck(const std::filesystem::path& file) { return profileOf(file, JsonDocument::read(file)); }

std::vector<Profile> readProfileAndBases(const std::filesystem::path& file, const ProfileSource& source) {
  std::vector<Profile> profiles;
  std::vector<std::filesystem::path> read;
  for (std::filesystem::path next = file; !next.empty();) {
    read.push_back(next);
    profiles.push_back(readProfileToCheck(next));
    next = fileOfBase(profiles.back(), read, source);
  }
  std::reverse(profiles.begin(), profiles.end());
  return profiles;
}

std::vector<UserLimit> limitsOf(const std::vector<Profile>& profiles) {
  std::vector<UserLimit> limits;
  for (const Profile& one : profiles) {
    for (const UserLimit& limit : one.limits) limits.emplace_back(limit).source = one.source();
  }
  return limits;
}

Profile parseProfile(const std::filesystem::path& file, const std::string& text) {
  return withoutMistakes(profileOf(file, JsonDocument(text, file.string())));
}

}  // namespace quazor
