// Profiles: files with values for the parameters of diagnostics.
//
//   {
//     "schema": 1,
//     "base": "default",
//     "diagnostics": {
//       "CameraSyncDiagnostic.*": {
//         "experiment": {"duration": 3},
//         "analysis": {},
//         "limits": [{"limit": "*.Total >= 90", "name": "no frame is lost", "severity": "warn"}]
//       }
//     },
//     "experiments": {"NimbeImageExperiment": {"images": 5}}
//   }
//
// The name of an entry is that of a diagnostic or an experiment, or a pattern (*, ?, [...]) for several. "experiments"
// is optional; its values apply to experiments that run on their own. "base" is optional, too: another profile, whose
// values and limits count besides, and whose values count less. A limit (host/limits/user_limit.h) does not name
// its diagnostic; its name and its severity, "fail" by default, are optional.
#pragma once

#include "base/json/json_document.h"
#include "contract/ordered_map.h"
#include "contract/value.h"
#include "host/limits/user_limit.h"

#include <filesystem>
#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace quazor {

struct Diagnostic;

// The two parts of a diagnostic, each with its own parameters.
enum class Part { kExperiment, kAnalysis };
inline constexpr Part kParts[] = {Part::kExperiment, Part::kAnalysis};

std::string_view nameOf(Part part);  // "experiment", "analysis"

struct ProfileEntry {
  std::string name;
  OrderedMap<Value> experiment;
  OrderedMap<Value> analysis;
  bool ofExperiment = false;  // for an experiment that runs on its own

  const OrderedMap<Value>& values(Part part) const { return part == Part::kExperiment ? experiment : analysis; }
};

struct Profile {
  std::filesystem::path file;
  std::vector<ProfileEntry> entries;        // of diagnostics, in the order of the file
  std::vector<ProfileEntry> experiments{};  // in the order of the file; without values for an analysis
  std::string kind = "profile";             // a user-readable name of the kind of file
  std::vector<UserLimit> limits{};          // in the order of the file
  std::string base{};                       // as the file has it; empty: none
  bool mayNameOthers = false;               // an entry may name a diagnostic that no plug-in has
  // The text of the file, for the lines of mistakes; null for values that do not come from a profile.
  std::shared_ptr<const JsonDocument> document{};
  FirstMistake mistakes{};  // of the form, if they were not thrown

  // The path of an entry in the document, or of the value of one of its parameters.
  static std::string pathOf(const ProfileEntry& entry);
  static std::string pathOf(const ProfileEntry& entry, Part part, std::string_view parameter);

  // The entry with the value of a parameter for that diagnostic or experiment, with the rules of find() and
  // findForExperiment(), or null.
  const ProfileEntry* entryFor(const Diagnostic& diagnostic, Part part, std::string_view parameter) const;

  // The value for a parameter, or null. The entry with the exact name of the diagnostic takes precedence over patterns,
  // and a later pattern over an earlier one. An entry without the parameter is skipped.
  const Value* find(const std::string& diagnostic, Part part, std::string_view parameter) const;
  // Like find(), for a parameter of an experiment that runs on its own. If no entry for experiments has the parameter,
  // the value is that of the first diagnostic in `usedBy` that has one.
  const Value* findForExperiment(const std::string& experiment, const std::vector<std::string>& usedBy,
                                 std::string_view parameter) const;
};

// Reads a profile of at most 16 MiB. Throws InputError with the file and the line if it cannot be read. Keeps mistakes
// of the form in Profile::mistakes, so that checkProfile() can throw the one that comes first in the file. What is
// wrong is left out of the profile.
Profile readProfileToCheck(const std::filesystem::path& file);

// Finds the file of a profile that others are based on by its name, but none of those files; empty if there is none.
using ProfileSource =
    std::function<std::filesystem::path(const std::string& name, const std::vector<std::filesystem::path>& others)>;

// Like readProfileToCheck(), of the profile and of those that it is based on, each after its own base. A base is a file
// relative to the profile's own or, if there is none, what `source` finds. Throws InputError for a base that does not
// exist or is based on the profile itself.
std::vector<Profile> readProfileAndBases(const std::filesystem::path& file, const ProfileSource& source);

// The limits of these profiles, in their order.
std::vector<UserLimit> limitsOf(const std::vector<Profile>& profiles);

// The profile in the text of the file, without its base. Throws InputError with the file, the line and the place if it
// does not have the form above.
Profile parseProfile(const std::filesystem::path& file, const std::string& text);

}  // namespace quazor
