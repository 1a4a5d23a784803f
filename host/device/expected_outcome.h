// ExpectedOutcome: the outcome that a run on the phone of a scenario should have, from the scenario's key "expect".
#pragma once

#include "contract/ordered_map.h"

#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

class JsonCursor;

// The members of an error that are compared.
struct ExpectedError {
  std::string domain;
  std::int64_t code = 0;
  std::string message;
};

struct ExpectedOutcome {
  std::string name;             // of the diagnostic, or of the experiment on its own
  bool experimentOnly = false;  // if so, `parameters` is the complete list of its parameters
  OrderedMap<double> parameters;
  std::string verdict;                      // "pass", "fail" or "error"
  std::optional<ExpectedError> error;       // nothing: no error, apart from the host's own, or any
  std::optional<ExpectedError> underlying;  // nothing: not compared
  std::vector<std::string> failedResults;
  std::optional<std::uint64_t> images;  // the number of images in the auxiliary data; nothing: not compared
  std::string key;                      // of its entry in "expect"; not `name` if it is a run of an experiment
  bool mayBeAnyError = false;           // the verdict is "error", and the entry does not say which

  // False if the run should find a fault of the phone.
  bool mustPass() const { return verdict == "pass"; }
};

// The expected outcomes of a scenario, in order; empty without the key "expect". Throws InputError, like JsonCursor, if
// an outcome is malformed or contradictory. Thread: any.
std::vector<ExpectedOutcome> readExpectedOutcomes(const JsonCursor& scenario);

// True if the file itself has the entry of this outcome, false if the scenario only inherited it from its base.
// Thread: any.
bool isNamedIn(const std::filesystem::path& file, const ExpectedOutcome& expected);

// Throws InputError, "FILE:LINE: expect.KEY: SENTENCE", if isNamedIn(). Thread: any.
void failIfNamedIn(const std::filesystem::path& file, const ExpectedOutcome& expected, const std::string& sentence);

}  // namespace quazor
