// Profiles: files with values for the parameters of diagnostics.
//
//   {
//     "schema": 1,
//     "diagnostics": {"CameraSyncDiagnostic.*": {"experiment": {"duration": 3}, "analysis": {}}},
//     "experiments": {"NimbeImageExperiment": {"images": 5}}
//   }
//
// An entry's name is a diagnostic's or an experiment's, or a pattern (*, ?, [...]) for several. "experiments" may be
// left out; its values are for experiments that run on their own.
#pragma once

#include "contract/ordered_map.h"
#include "contract/value.h"

#include <filesystem>
#include <string>
#include <vector>

namespace quazor {

// The two halves of a diagnostic, each with parameters of its own.
enum class Part { kExperiment, kAnalysis };

std::string_view nameOf(Part half);  // "experiment", "analysis"

struct ProfileEntry {
  std::string name;
  OrderedMap<Value> experiment;
  OrderedMap<Value> analysis;

  const OrderedMap<Value>& values(Part half) const { return half == Part::kExperiment ? experiment : analysis; }
};

struct Profile {
  std::filesystem::path file;
  std::vector<ProfileEntry> entries;        // of diagnostics, in the order of the file
  std::vector<ProfileEntry> experiments{};  // in the order of the file; their analysis is empty
  std::string kind = "profile";             // what the file is, for people
  bool mayNameOthers = false;               // an entry may be of a diagnostic that no loaded plug-in has

  // The value for a parameter, or null. The entry with the diagnostic's own name wins over patterns, and of two
  // patterns the later one; an entry that does not hold the parameter leaves it to the others.
  const Value* find(const std::string& diagnostic, Part half, std::string_view parameter) const;
  // The same for a parameter of an experiment that runs on its own. What its entries do not hold comes from the first
  // of the diagnostics `usedBy` that has a value for it.
  const Value* findForExperiment(const std::string& experiment, const std::vector<std::string>& usedBy,
                                 std::string_view parameter) const;
};

// Reads a profile of at most 16 MiB. Throws InputError that names the file, the line and the place when it cannot be
// read or is not exactly of the form above.
Profile readProfile(const std::filesystem::path& file);

// As readProfile, from the file's text.
Profile parseProfile(const std::filesystem::path& file, const std::string& text);

}  // namespace quazor
