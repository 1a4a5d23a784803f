#include "host/plugin/profile.h"

#include "base/text/input_error.h"
#include "tests/support/thrown_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdint>

namespace quazor {
namespace {

constexpr const char* kFile = "some.json";

std::string refusalOf(const std::string& text) {
  return thrownText<InputError>([&] { parseProfile(kFile, text); }, "accepted");
}

std::string withDiagnostics(const std::string& diagnostics) {
  return R"({"schema": 1, "diagnostics": )" + diagnostics + "}";
}

TEST(ParseProfile, KeepsTheKindsOfNumbers) {
  const Profile profile = parseProfile(
      kFile,
      withDiagnostics(R"({"A": {"experiment": {"i": 3, "n": -3, "u": 18446744073709551615, "d": 2.5, "e": 1e2}}})"));
  ASSERT_EQ(profile.entries.size(), 1U);
  const OrderedMap<Value>& values = profile.entries[0].experiment;
  EXPECT_EQ(*values.find("i"), Value(3));
  EXPECT_EQ(*values.find("n"), Value(-3));
  EXPECT_EQ(*values.find("u"), Value(UINT64_MAX));
  EXPECT_EQ(*values.find("d"), Value(2.5));
  EXPECT_EQ(*values.find("e"), Value(100.0));
}

TEST(ParseProfile, TakesEntriesWithoutHalvesAndNoEntriesAtAll) {
  EXPECT_TRUE(parseProfile(kFile, withDiagnostics("{}")).entries.empty());
  const Profile profile = parseProfile(kFile, withDiagnostics(R"({"A": {}})"));
  ASSERT_EQ(profile.entries.size(), 1U);
  EXPECT_TRUE(profile.entries[0].experiment.empty());
  EXPECT_TRUE(profile.entries[0].analysis.empty());
}

TEST(ParseProfile, RefusesWhatIsNotExactlyOfTheForm) {
  const NamedRefusal rows[] = {
      {"an empty file", "", "1: not valid JSON: "},
      {"no JSON", "duration = 3", "1: not valid JSON: "},
      {"JSON with something behind", withDiagnostics("{}") + "x", "1: not valid JSON: "},
      {"no object", "[]", "1: the document: must be an object, not an array."},
      {"no schema", R"({"diagnostics": {}})", "1: the document: the key \"schema\" is missing."},
      {"another schema", "{\"diagnostics\": {},\n\"schema\": 2}", "2: schema: must be 1, not 2."},
      {"no diagnostics", R"({"schema": 1})", "1: the document: the key \"diagnostics\" is missing."},
      {"diagnostics that are no object", withDiagnostics("3"), "1: diagnostics: must be an object, not 3."},
      {"an unknown key", R"({"schema": 1, "diagnostic": {}})",
       "1: the document: unknown key \"diagnostic\"; did you mean \"diagnostics\"?"},
      {"an entry that is no object", withDiagnostics(R"({"A": 3})"), "1: diagnostics.A: must be an object, not 3."},
      {"an unknown part", withDiagnostics(R"({"A": {"experimant": {}}})"),
       "1: diagnostics.A: unknown key \"experimant\"; did you mean \"experiment\"?"},
      {"a part that is no object", withDiagnostics(R"({"A": {"analysis": []}})"),
       "1: diagnostics.A.analysis: must be an object, not an array."},
      {"a value that is text", withDiagnostics(R"({"A": {"experiment": {"x": "3"}}})"),
       "1: diagnostics.A.experiment.x: must be a number, not \"3\"."},
      {"a value that is a boolean", withDiagnostics(R"({"A": {"experiment": {"x": true}}})"),
       "1: diagnostics.A.experiment.x: must be a number, not true."},
      {"a value that is null", withDiagnostics(R"({"A": {"analysis": {"x": null}}})"),
       "1: diagnostics.A.analysis.x: must be a number, not null."},
      {"a number beyond all numbers", withDiagnostics(R"({"A": {"experiment": {"x": 1e999}}})"),
       "1: diagnostics.A.experiment.x: the number is too large for a double."},
      {"a parameter twice", withDiagnostics(R"({"A": {"experiment": {"x": 1, "x": 2}}})"),
       "1: diagnostics.A.experiment: the key \"x\" is duplicated; remove one."},
      {"experiments that are no object", R"({"schema": 1, "diagnostics": {}, "experiments": 3})",
       "1: experiments: must be an object, not 3."},
      {"an experiment that is no object", R"({"schema": 1, "diagnostics": {}, "experiments": {"E": 3}})",
       "1: experiments.E: must be an object, not 3."},
      {"an experiment's value that is text", R"({"schema": 1, "diagnostics": {}, "experiments": {"E": {"x": "3"}}})",
       "1: experiments.E.x: must be a number, not \"3\"."},
      {"an entry twice", withDiagnostics(R"({"A": {}, "A": {}})"),
       "1: diagnostics: the key \"A\" is duplicated; remove one."},
  };
  for (const auto& row : rows) {
    EXPECT_THAT(refusalOf(row.text), testing::StartsWith(std::string("some.json:") + row.problem)) << row.name;
  }
}

TEST(ParseProfile, TakesOneKeyInSeveralObjects) {
  EXPECT_EQ(refusalOf(withDiagnostics(R"({"A": {"experiment": {"x": 1}, "analysis": {"x": 2}}, "B": {}})")),
            "accepted");
}

TEST(Profile, FindsTheValueForAnExperiment) {
  const Profile profile = parseProfile(kFile, R"({
    "schema": 1,
    "diagnostics": {"A": {"experiment": {"z": 6}, "analysis": {"w": 9}}, "B": {"experiment": {"x": 7, "z": 8}}},
    "experiments": {"E.One": {"x": 1}, "E.*": {"x": 2, "y": 3}}
  })");
  struct Row {
    const char* name;
    const char* experiment;
    std::vector<std::string> usedBy;
    const char* parameter;
    std::optional<Value> value;
  };
  const Row rows[] = {
      {"its own entry wins over a later pattern and its diagnostics", "E.One", {"B"}, "x", Value(1)},
      {"a pattern wins over its diagnostics", "E.Two", {"B"}, "x", Value(2)},
      {"a pattern gives what the own entry leaves out", "E.One", {}, "y", Value(3)},
      {"a diagnostic gives what no entry holds", "E.One", {"A", "B"}, "z", Value(6)},
      {"the first of its diagnostics that has it", "F", {"A", "B"}, "x", Value(7)},
      {"an analysis' value is not the experiment's", "E.One", {"A", "B"}, "w", std::nullopt},
      {"another diagnostic's value is not its own", "E.One", {}, "z", std::nullopt},
  };
  for (const Row& row : rows) {
    const Value* value = profile.findForExperiment(row.experiment, row.usedBy, row.parameter);
    EXPECT_EQ(value == nullptr ? std::nullopt : std::optional(*value), row.value) << row.name;
  }
  EXPECT_EQ(profile.find("E.One", Part::kExperiment, "x"), nullptr);
}

TEST(ReadProfile, RefusesWhatIsNotAFileOfAProfilesSize) {
  const auto problemOf = [](const char* file) { return thrownText<InputError>([&] { readProfileToCheck(file); }); };
  EXPECT_EQ(problemOf("/nowhere/p.json"), "/nowhere/p.json: the file does not exist.");
  EXPECT_EQ(problemOf("/"), "/: this is a directory, not a file.");
  EXPECT_EQ(problemOf("/dev/zero"), "/dev/zero: the file is larger than 16 MiB.");
}

TEST(Profile, FindsTheValueOfTheEntryThatWins) {
  const Profile profile = parseProfile(kFile, withDiagnostics(R"({
    "A.One": {"experiment": {"x": 1}},
    "A.*":   {"experiment": {"x": 2, "y": 3}, "analysis": {"x": 4}},
    "*.T*":  {"experiment": {"x": 5}}
  })"));
  struct Row {
    const char* name;
    const char* diagnostic;
    Part part;
    const char* parameter;
    std::optional<Value> value;
  };
  const Row rows[] = {
      {"the diagnostic's own entry wins over a later pattern", "A.One", Part::kExperiment, "x", Value(1)},
      {"a pattern gives what the own entry leaves out", "A.One", Part::kExperiment, "y", Value(3)},
      {"a pattern's value", "A.Else", Part::kExperiment, "x", Value(2)},
      {"the later of two patterns wins", "A.Two", Part::kExperiment, "x", Value(5)},
      {"the earlier pattern gives what the later leaves out", "A.Two", Part::kExperiment, "y", Value(3)},
      {"the other part has its own values", "A.Two", Part::kAnalysis, "x", Value(4)},
      {"a parameter that no entry holds", "A.One", Part::kAnalysis, "y", std::nullopt},
      {"a diagnostic that no entry fits", "B.One", Part::kExperiment, "x", std::nullopt},
  };
  for (const Row& row : rows) {
    const Value* value = profile.find(row.diagnostic, row.part, row.parameter);
    EXPECT_EQ(value == nullptr ? std::nullopt : std::optional(*value), row.value) << row.name;
  }
}

}  // namespace
}  // namespace quazor
