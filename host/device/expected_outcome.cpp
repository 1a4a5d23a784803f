#include "host/device/expected_outcome.h"

#include "base/json/json_cursor.h"

#include <array>
#include <limits>
#include <string_view>
#include <utility>

namespace quazor {

namespace {

constexpr std::uint64_t kMaxImages = 1'000'000'000;

// Returns nothing if the entry is missing or null.
std::optional<ExpectedError> readExpectedError(const JsonCursor& outcome, std::string_view key) {
  const std::optional<JsonCursor> error = outcome.find(key);
  if (!error || error->isNull()) return std::nullopt;
  error->allowKeys({"domain", "code", "message"});
  return ExpectedError{error->at("domain").text(), error->at("code").integer(), error->at("message").text()};
}

// The error that an entry says, which may be "none" for one that fails without an error of its own. Without an error,
// the entry means any.
std::optional<ExpectedError> readErrorOrNone(const JsonCursor& outcome, bool& mayBeAny) {
  constexpr std::array<std::string_view, 1> kNone{"none"};
  const std::optional<JsonCursor> error = outcome.find("error");
  mayBeAny = !error || error->isNull();
  if (mayBeAny || !error->isString()) return readExpectedError(outcome, "error");
  error->oneOf(kNone, "an error, which otherwise is an object");
  return std::nullopt;
}

void readExperimentRun(const JsonCursor& cursor, ExpectedOutcome& outcome) {
  outcome.name = cursor.at("experiment").text();
  outcome.experimentOnly = true;
  if (const auto parameters = cursor.find("parameters")) {
    constexpr double kMaximum = std::numeric_limits<double>::max();
    for (const auto& [name, value] : parameters->entries()) {
      outcome.parameters.set(name, value.number(-kMaximum, kMaximum));
    }
  }
  if (const auto images = cursor.find("images")) outcome.images = images->integer(0, kMaxImages);
  if (outcome.verdict == "fail") {
    cursor.fail("an experiment that runs on its own is not judged; it can only pass or end in an error.");
  }
  if (outcome.images && !outcome.mustPass()) cursor.fail("only the verdict \"pass\" can have images.");
}

ExpectedOutcome readOutcome(const std::string& name, const JsonCursor& cursor) {
  constexpr std::array<std::string_view, 3> kVerdicts{"pass", "fail", "error"};
  cursor.allowKeys({"experiment", "parameters", "verdict", "error", "underlying", "failedResults", "images"});
  ExpectedOutcome outcome;
  outcome.name = name;
  outcome.key = name;
  outcome.verdict = cursor.at("verdict").oneOf(kVerdicts, "a verdict");
  outcome.error = readErrorOrNone(cursor, outcome.mayBeAnyError);
  outcome.mayBeAnyError = outcome.mayBeAnyError && outcome.verdict == "error";
  outcome.underlying = readExpectedError(cursor, "underlying");
  if (outcome.error && outcome.verdict != "error") cursor.fail("only the verdict \"error\" can have an error.");
  if (outcome.underlying && !outcome.error) cursor.fail("an underlying error requires an \"error\".");
  if (const auto results = cursor.find("failedResults")) {
    if (outcome.verdict != "fail") results->fail("only the verdict \"fail\" can have failed results.");
    for (const JsonCursor& result : results->elements()) outcome.failedResults.push_back(result.text());
  }
  if (cursor.find("experiment")) {
    readExperimentRun(cursor, outcome);
    return outcome;
  }
  if (cursor.find("parameters")) cursor.fail("only the run of an experiment can have parameters; add \"experiment\".");
  if (cursor.find("images")) cursor.fail("only the run of an experiment can have images; add \"experiment\".");
  return outcome;
}

}  // namespace

std::vector<ExpectedOutcome> readExpectedOutcomes(const JsonCursor& scenario) {
  std::vector<ExpectedOutcome> outcomes;
  const std::optional<JsonCursor> expect = scenario.find("expect");
  if (!expect) return outcomes;
  for (const auto& [name, outcome] : expect->entries()) outcomes.push_back(readOutcome(name, outcome));
  return outcomes;
}

namespace {

// The entry of the outcome in the document of a file without its base; nothing if it has none.
std::optional<JsonCursor> entryOf(const JsonDocument& document, const ExpectedOutcome& expected) {
  const std::optional<JsonCursor> expect = JsonCursor(document).find("expect");
  return expect ? expect->find(expected.key) : std::nullopt;
}

}  // namespace

bool isNamedIn(const std::filesystem::path& file, const ExpectedOutcome& expected) {
  const JsonDocument document = JsonDocument::read(file);
  return entryOf(document, expected).has_value();
}

void failIfNamedIn(const std::filesystem::path& file, const ExpectedOutcome& expected, const std::string& sentence) {
  const JsonDocument document = JsonDocument::read(file);
  if (const std::optional<JsonCursor> entry = entryOf(document, expected)) entry->fail(sentence);
}

}  // namespace quazor
