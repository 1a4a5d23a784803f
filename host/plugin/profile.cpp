#include "host/plugin/profile.h"

#include "base/text/nearest_name.h"
#include "contract/message_format.h"
#include "host/error/exit_code.h"
#include "host/plugin/diagnostic_registry.h"

#include <nlohmann/json.hpp>

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <cstdint>
#include <cstring>
#include <fstream>
#include <set>
#include <sstream>
#include <utility>

namespace quazor {

namespace {

using Json = nlohmann::ordered_json;

[[noreturn]] void refuseProfile(const std::filesystem::path& file, const std::string& what) {
  throw CommandError(ExitCode::kCannotRead, "the profile '" + file.string() + "' " + what);
}

// Parses the text, and refuses objects that hold one key twice: the parser alone would keep the last and say nothing.
Json parseJson(const std::filesystem::path& file, const std::string& text) {
  std::vector<std::set<std::string>> keys;  // of the objects that are open
  std::string repeated;
  const auto watch = [&](int /*depth*/, Json::parse_event_t event, Json& parsed) {
    if (event == Json::parse_event_t::object_start) keys.emplace_back();
    if (event == Json::parse_event_t::object_end) keys.pop_back();
    if (event == Json::parse_event_t::key && !keys.back().insert(parsed.get<std::string>()).second) {
      repeated = parsed.get<std::string>();
    }
    return true;
  };
  Json document;
  try {
    document = Json::parse(text, watch);
  } catch (const nlohmann::json::exception& exception) {
    refuseProfile(file, std::string("cannot be parsed: ") + exception.what());
  }
  if (!repeated.empty()) refuseProfile(file, "holds '" + repeated + "' twice in one object");
  return document;
}

void checkKeys(const std::filesystem::path& file, const std::string& place, const Json& object,
               const std::vector<std::string>& known) {
  if (!object.is_object()) refuseProfile(file, "is wrong at " + place + ": an object must stand there");
  for (const auto& [key, ignored] : object.items()) {
    if (std::find(known.begin(), known.end(), key) != known.end()) continue;
    refuseProfile(file, formatMessage("is wrong at %@: '%@' is not known there%@", place, key, didYouMean(key, known)));
  }
}

Value numberOf(const std::filesystem::path& file, const std::string& place, const Json& json) {
  if (json.is_number_unsigned() && json.get<std::uint64_t>() > INT64_MAX) return json.get<std::uint64_t>();
  if (json.is_number_integer()) return json.get<std::int64_t>();
  if (json.is_number_float() && std::isfinite(json.get<double>())) return json.get<double>();
  refuseProfile(file, "is wrong at " + place + ": a number must stand there");
}

OrderedMap<Value> valuesOf(const std::filesystem::path& file, const std::string& place, const Json& json) {
  if (!json.is_object()) refuseProfile(file, "is wrong at " + place + ": an object must stand there");
  OrderedMap<Value> values;
  for (const auto& [name, value] : json.items()) {
    values.set(name, numberOf(file, formatMessage("%@/%@", place, name), value));
  }
  return values;
}

const Value* findIn(const std::vector<ProfileEntry>& entries, const std::string& name, Part half,
                    std::string_view parameter) {
  const Value* found = nullptr;
  for (const ProfileEntry& entry : entries) {
    const Value* value = entry.values(half).find(parameter);
    if (value == nullptr || !matchesName(entry.name, name)) continue;
    if (entry.name == name) return value;
    found = value;
  }
  return found;
}

}  // namespace

std::string_view nameOf(Part half) { return half == Part::kExperiment ? "experiment" : "analysis"; }

const Value* Profile::find(const std::string& diagnostic, Part half, std::string_view parameter) const {
  return findIn(entries, diagnostic, half, parameter);
}

const Value* Profile::findForExperiment(const std::string& experiment, const std::vector<std::string>& usedBy,
                                        std::string_view parameter) const {
  const Value* value = findIn(experiments, experiment, Part::kExperiment, parameter);
  for (auto user = usedBy.begin(); value == nullptr && user != usedBy.end(); ++user) {
    value = find(*user, Part::kExperiment, parameter);
  }
  return value;
}

Profile readProfile(const std::filesystem::path& file) {
  std::error_code ignored;
  if (std::filesystem::is_directory(file, ignored)) refuseProfile(file, "is a directory");
  std::ifstream in(file, std::ios::binary);
  if (!in) refuseProfile(file, std::string("cannot be read: ") + std::strerror(errno));
  std::ostringstream text;
  text << in.rdbuf();
  if (in.bad()) refuseProfile(file, std::string("cannot be read: ") + std::strerror(errno));
  return parseProfile(file, text.str());
}

Profile parseProfile(const std::filesystem::path& file, const std::string& text) {
  const Json document = parseJson(file, text);
  checkKeys(file, "/", document, {"schema", "diagnostics", "experiments"});
  const auto schema = document.find("schema");
  if (schema == document.end() || *schema != 1)
    refuseProfile(file, "must say \"schema\": 1, the only form that is known");
  const auto diagnostics = document.find("diagnostics");
  if (diagnostics == document.end()) refuseProfile(file, "holds no \"diagnostics\"");
  if (!diagnostics->is_object()) refuseProfile(file, "is wrong at /diagnostics: an object must stand there");
  Profile profile{file, {}};
  for (const auto& [name, halves] : diagnostics->items()) {
    const std::string place = "/diagnostics/" + name;
    checkKeys(file, place, halves, {"experiment", "analysis"});
    ProfileEntry entry{name, {}, {}};
    if (halves.contains("experiment")) entry.experiment = valuesOf(file, place + "/experiment", halves["experiment"]);
    if (halves.contains("analysis")) entry.analysis = valuesOf(file, place + "/analysis", halves["analysis"]);
    profile.entries.push_back(std::move(entry));
  }
  const auto experiments = document.find("experiments");
  if (experiments == document.end()) return profile;
  if (!experiments->is_object()) refuseProfile(file, "is wrong at /experiments: an object must stand there");
  for (const auto& [name, values] : experiments->items()) {
    profile.experiments.push_back({name, valuesOf(file, "/experiments/" + name, values), {}});
  }
  return profile;
}

}  // namespace quazor
