#include "host/plugin/profile.h"

#include "base/json/json_cursor.h"
#include "base/text/input_error.h"
#include "host/plugin/diagnostic_registry.h"

#include <cstdint>
#include <optional>
#include <utility>

namespace quazor {

namespace {

constexpr std::uint64_t kSchema = 1;

OrderedMap<Value> valuesOf(const JsonCursor& object) {
  OrderedMap<Value> values;
  for (const auto& [name, value] : object.entries()) {
    if (!value.isNumber()) value.failType("a number");
    values.set(name, value.scalar());
  }
  return values;
}

OrderedMap<Value> valuesIn(const JsonCursor& entry, std::string_view key) {
  const std::optional<JsonCursor> object = entry.find(key);
  return object ? valuesOf(*object) : OrderedMap<Value>();
}

const Value* findIn(const std::vector<ProfileEntry>& entries, const std::string& name, Part part,
                    std::string_view parameter) {
  const Value* found = nullptr;
  for (const ProfileEntry& entry : entries) {
    const Value* value = entry.values(part).find(parameter);
    if (value == nullptr || !matchesName(entry.name, name)) continue;
    if (entry.name == name) return value;
    found = value;
  }
  return found;
}

UserLimit limitOf(const JsonCursor& entry, const std::string& diagnostic, const std::filesystem::path& file) {
  entry.allowKeys({"limit", "name", "severity"});
  const JsonCursor text = entry.at("limit");
  UserLimit limit;
  try {
    limit = parseUserLimit(text.text());
  } catch (const InputError& problem) {
    text.fail(std::string("is not a limit: ") + problem.what() + ".");
  }
  if (!limit.diagnostic.empty())
    text.fail("names a diagnostic, but a limit of a profile belongs to the diagnostics of its entry.");
  limit.diagnostic = diagnostic;
  if (const std::optional<JsonCursor> name = entry.find("name")) limit.name = name->text();
  if (const std::optional<JsonCursor> severity = entry.find("severity")) {
    constexpr std::string_view kNames[] = {"fail", "warn"};
    limit.severity = *limitSeverityNamed(severity->oneOf(kNames, "a severity"));
  }
  limit.source = "profile " + file.filename().string();
  limit.onlyIfSelected = true;
  return limit;
}

Profile profileOf(const std::filesystem::path& file, const JsonDocument& json) {
  const JsonCursor document(json);
  document.allowKeys({"schema", "diagnostics", "experiments"});
  document.at("schema").integer(kSchema, kSchema);
  Profile profile{file, {}};
  for (const auto& [name, entry] : document.at("diagnostics").entries()) {
    entry.allowKeys({"experiment", "analysis", "limits"});
    profile.entries.push_back({name, valuesIn(entry, "experiment"), valuesIn(entry, "analysis")});
    if (const std::optional<JsonCursor> limits = entry.find("limits")) {
      for (const JsonCursor& one : limits->elements()) profile.limits.push_back(limitOf(one, name, file));
    }
  }
  if (const std::optional<JsonCursor> experiments = document.find("experiments")) {
    for (const auto& [name, values] : experiments->entries()) {
      profile.experiments.push_back({name, valuesOf(values), {}});
    }
  }
  return profile;
}

}  // namespace

std::string_view nameOf(Part part) { return part == Part::kExperiment ? "experiment" : "analysis"; }

const Value* Profile::find(const std::string& diagnostic, Part part, std::string_view parameter) const {
  return findIn(entries, diagnostic, part, parameter);
}

const Value* Profile::findForExperiment(const std::string& experiment, const std::vector<std::string>& usedBy,
                                        std::string_view parameter) const {
  const Value* value = findIn(experiments, experiment, Part::kExperiment, parameter);
  for (auto user = usedBy.begin(); value == nullptr && user != usedBy.end(); ++user) {
    value = find(*user, Part::kExperiment, parameter);
  }
  return value;
}

Profile readProfile(const std::filesystem::path& file) { return profileOf(file, JsonDocument::read(file)); }

Profile parseProfile(const std::filesystem::path& file, const std::string& text) {
  return profileOf(file, JsonDocument(text, file.string()));
}

}  // namespace quazor
