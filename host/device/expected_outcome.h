// ExpectedOutcome: what a run on the phone of a scenario file should end in, as the file's key "expect" says.
#pragma once

#include "contract/ordered_map.h"

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

class JsonCursor;

// The parts of an error that an outcome is expected to have.
struct ExpectedError {
  std::string domain;
  std::int64_t code = 0;
  std::string message;
};

struct ExpectedOutcome {
  std::string name;             // of the diagnostic, or of the experiment that is run alone
  bool experimentOnly = false;  // then `parameters` are all that it is set up with
  OrderedMap<double> parameters;
  std::string verdict;                      // "pass", "fail" or "error"
  std::optional<ExpectedError> error;       // nothing: none, but for the host's own words
  std::optional<ExpectedError> underlying;  // nothing: not looked at
  std::vector<std::string> failedResults;
  std::optional<std::uint64_t> images;  // how many the auxiliary data holds; nothing: not looked at
};

// The outcomes in a scenario's document, in their order; none where it has no key "expect". Throws InputError, as
// JsonCursor does, for an outcome that is malformed or contradicts itself. Any thread.
std::vector<ExpectedOutcome> readExpectedOutcomes(const JsonCursor& scenario);

}  // namespace quazor
