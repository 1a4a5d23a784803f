#include "host/plugin/profile.h"

#include "host/error/exit_code.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdint>

namespace quazor {
namespace {

constexpr const char* kFile = "some.json";

std::string refusalOf(const std::string& text) {
  try {
    parseProfile(kFile, text);
  } catch (const CommandError& refusal) {
    EXPECT_EQ(refusal.code(), ExitCode::kCannotRead);
    return refusal.what();
  }
  return "accepted";
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
  struct Row {
    const char* name;
    std::string text;
    const char* problem;
  };
  const Row rows[] = {
      {"an empty file", "", "cannot be parsed"},
      {"no JSON", "duration = 3", "cannot be parsed"},
      {"JSON with something behind", withDiagnostics("{}") + "x", "cannot be parsed"},
      {"no object", "[]", "at /: an object must stand there"},
      {"no schema", R"({"diagnostics": {}})", "must say \"schema\": 1"},
      {"another schema", R"({"schema": 2, "diagnostics": {}})", "must say \"schema\": 1"},
      {"no diagnostics", R"({"schema": 1})", "holds no \"diagnostics\""},
      {"diagnostics that are no object", withDiagnostics("3"), "at /diagnostics: an object must stand there"},
      {"an unknown key", R"({"schema": 1, "diagnostic": {}})",
       "'diagnostic' is not known there; did you mean 'diagnostics'?"},
      {"an entry that is no object", withDiagnostics(R"({"A": 3})"), "at /diagnostics/A: an object must stand there"},
      {"an unknown half", withDiagnostics(R"({"A": {"experimant": {}}})"),
       "at /diagnostics/A: 'experimant' is not known there; did you mean 'experiment'?"},
      {"a half that is no object", withDiagnostics(R"({"A": {"analysis": []}})"),
       "at /diagnostics/A/analysis: an object must stand there"},
      {"a value that is text", withDiagnostics(R"({"A": {"experiment": {"x": "3"}}})"),
       "at /diagnostics/A/experiment/x: a number must stand there"},
      {"a value that is a boolean", withDiagnostics(R"({"A": {"experiment": {"x": true}}})"),
       "at /diagnostics/A/experiment/x: a number must stand there"},
      {"a value that is null", withDiagnostics(R"({"A": {"analysis": {"x": null}}})"),
       "at /diagnostics/A/analysis/x: a number must stand there"},
      {"a number beyond all numbers", withDiagnostics(R"({"A": {"experiment": {"x": 1e999}}})"), "cannot be parsed"},
      {"a parameter twice", withDiagnostics(R"({"A": {"experiment": {"x": 1, "x": 2}}})"), "holds 'x' twice"},
      {"experiments that are no object", R"({"schema": 1, "diagnostics": {}, "experiments": 3})",
       "at /experiments: an object must stand there"},
      {"an experiment that is no object", R"({"schema": 1, "diagnostics": {}, "experiments": {"E": 3}})",
       "at /experiments/E: an object must stand there"},
      {"an experiment's value that is text", R"({"schema": 1, "diagnostics": {}, "experiments": {"E": {"x": "3"}}})",
       "at /experiments/E/x: a number must stand there"},
      {"an entry twice", withDiagnostics(R"({"A": {}, "A": {}})"), "holds 'A' twice"},
  };
  for (const Row& row : rows) {
    EXPECT_THAT(refusalOf(row.text),
                testing::AllOf(testing::StartsWith("the profile 'some.json' "), testing::HasSubstr(row.problem)))
        << row.name;
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

TEST(ReadProfile, RefusesAFileThatIsNotThereAndADirectory) {
  const auto problemOf = [](const char* file) {
    try {
      readProfile(file);
    } catch (const CommandError& refusal) {
      return std::string(refusal.what());
    }
    return std::string("accepted");
  };
  EXPECT_EQ(problemOf("/nowhere/p.json"), "the profile '/nowhere/p.json' cannot be read: No such file or directory");
  EXPECT_EQ(problemOf("/"), "the profile '/' is a directory");
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
    Part half;
    const char* parameter;
    std::optional<Value> value;
  };
  const Row rows[] = {
      {"the diagnostic's own entry wins over a later pattern", "A.One", Part::kExperiment, "x", Value(1)},
      {"a pattern gives what the own entry leaves out", "A.One", Part::kExperiment, "y", Value(3)},
      {"a pattern's value", "A.Else", Part::kExperiment, "x", Value(2)},
      {"the later of two patterns wins", "A.Two", Part::kExperiment, "x", Value(5)},
      {"the earlier pattern gives what the later leaves out", "A.Two", Part::kExperiment, "y", Value(3)},
      {"the other half has its own values", "A.Two", Part::kAnalysis, "x", Value(4)},
      {"a parameter that no entry holds", "A.One", Part::kAnalysis, "y", std::nullopt},
      {"a diagnostic that no entry fits", "B.One", Part::kExperiment, "x", std::nullopt},
  };
  for (const Row& row : rows) {
    const Value* value = profile.find(row.diagnostic, row.half, row.parameter);
    EXPECT_EQ(value == nullptr ? std::nullopt : std::optional(*value), row.value) << row.name;
  }
}

}  // namespace
}  // namespace quazor
