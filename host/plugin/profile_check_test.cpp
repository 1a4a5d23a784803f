#include "host/plugin/profile_check.h"

#include "host/error/exit_code.h"
#include "host/plugin/described_for_tests.h"
#include "host/testing/test_directory.h"
#include "host/testing/test_refusals.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace quazor {
namespace {

using testing::HasSubstr;

TEST(CheckProfile, ChecksTheEntriesOfExperimentsAgainstExperiments) {
  const auto check = [](const std::string& experiments, bool allMustExist) {
    Profile profile =
        parseProfile("some.json", R"({"schema": 1, "diagnostics": {}, "experiments": )" + experiments + "}");
    profile.mayNameOthers = !allMustExist;
    return refusalOf(ExitCode::kCannotRead, [&] { checkProfile(profile, {sync(), imagesAlone()}); });
  };
  EXPECT_EQ(check(R"({"Im*": {"images": 5}})", true), "accepted");
  EXPECT_EQ(check(R"({"Images": {"image": 5}})", false),
            "some.json:1: experiments.Images.image: no experiment of \"Images\" has this parameter; did you mean "
            "\"images\"?");
  EXPECT_EQ(check(R"({"Image": {"images": 5}})", true),
            "some.json:1: experiments.Image: no experiment has this name; did you mean \"Images\"?");
  EXPECT_EQ(check(R"({"Sync.Back": {"duration": 5}})", true),
            "some.json:1: experiments.Sync.Back: no experiment has this name; expected one of \"Images\".");
  EXPECT_EQ(check(R"({"Sync.Back": {"duration": 5}})", false), "accepted");
}

// Checks a text as a command does: its mistakes of the form are told together with those of its names.
std::string toldFirst(const std::string& text) {
  const TestDirectory directory;
  const std::filesystem::path file = directory.write("p.json", text);
  const std::string told = refusalOf(ExitCode::kCannotRead, [&] {
    checkProfile(readProfileToCheck(file), {sync(), imagesAlone()});
  });
  return told.starts_with(file.string()) ? told.substr(file.string().size() + 1) : told;
}

TEST(CheckProfile, TellsTheMistakeThatComesFirstInTheFile) {
  struct Row {
    const char* name;
    const char* text;
    const char* told;
  };
  constexpr Row kRows[] = {
      {"an experiment before a diagnostic",
       R"({"schema": 1,
"experiments": {"Image": {"images": 5}},
"diagnostics": {"Bakc": {"experiment": {"x": 3}}}})",
       R"(2: experiments.Image: no experiment has this name; did you mean "Images"?)"},
      {"a diagnostic before an experiment",
       R"({"schema": 1,
"diagnostics": {"Bakc": {"experiment": {"x": 3}}},
"experiments": {"Image": {"images": 5}}})",
       R"(2: diagnostics.Bakc: no diagnostic has this name; expected one of "Sync.Back".)"},
      {"both on one line", R"({"experiments": {"Image": {"images": 5}}, "diagnostics": {"Bakc": {}}, "schema": 1})",
       R"(1: experiments.Image: no experiment has this name; did you mean "Images"?)"},
      {"an unknown parameter before a mistake of the form",
       R"({"schema": 1, "diagnostics": {
"Sync.Back": {"experiment": {
"duraton": 3,
"duration": "3"}}}})",
       R"(3: diagnostics.Sync.Back.experiment.duraton: no experiment of "Sync.Back" has this parameter; did you mean )"
       R"("duration"?)"},
      {"a mistake of the form before an unknown parameter",
       R"({"schema": 1, "diagnostics": {
"Sync.Back": {"experiment": {
"duration": "3",
"duraton": 3}}}})",
       R"(3: diagnostics.Sync.Back.experiment.duration: must be a number, not "3".)"},
      {"an analysis before an experiment",
       R"({"schema": 1, "diagnostics": {"Sync.Back": {
"analysis": {"gain": 1},
"experiment": {"gain": 1}}}})",
       R"(2: diagnostics.Sync.Back.analysis.gain: no analysis of "Sync.Back" has this parameter.)"},
      {"an unknown entry before an unknown key",
       R"({"schema": 1, "diagnostics": {"Bakc": {}},
"experimnts": {}})",
       R"(1: diagnostics.Bakc: no diagnostic has this name; expected one of "Sync.Back".)"},
      {"an unknown key before an unknown entry",
       R"({"schema": 1, "experimnts": {},
"diagnostics": {"Bakc": {}}})",
       R"(1: the document: unknown key "experimnts"; did you mean "experiments"?)"},
      {"a limit before a severity before a parameter",
       R"({"schema": 1, "diagnostics": {"Sync.Back": {
"limits": [{
"severity": "wran",
"limit": "Total >"}],
"experiment": {"gain": 1}}}})",
       R"(3: diagnostics.Sync.Back.limits[0].severity: "wran" is not a severity; did you mean "warn"?)"},
      {"another schema behind an unknown entry",
       R"({"diagnostics": {"Bakc": {}},
"schema": 2})",
       R"(1: diagnostics.Bakc: no diagnostic has this name; expected one of "Sync.Back".)"},
      {"a missing key, told last",
       R"({"diagnostics": {
"Bakc": {}}})",
       R"(2: diagnostics.Bakc: no diagnostic has this name; expected one of "Sync.Back".)"},
  };
  for (const Row& row : kRows) EXPECT_EQ(toldFirst(row.text), row.told) << row.name;
}

TEST(CheckProfile, KeepsWhatIsRightOfAFileWithAMistake) {
  const TestDirectory directory;
  const Profile profile = readProfileToCheck(
      directory.write("p.json", R"({"schema": 1, "diagnostics": {"A": {"experiment": {"x": 1, "y": "2"}}}})"));
  EXPECT_NE(profile.find("A", Part::kExperiment, "x"), nullptr);
  EXPECT_EQ(profile.find("A", Part::kExperiment, "y"), nullptr);
}

TEST(CheckProfile, NamesTheRecordOfValuesThatDoNotComeFromAProfile) {
  Profile profile{"run.jsonl", {{"Sync.Back", OrderedMap<Value>(), OrderedMap<Value>()}}};
  profile.kind = "record";
  profile.entries[0].experiment.set("duraton", 3);
  EXPECT_EQ(refusalOf(ExitCode::kCannotRead, [&] { checkProfile(profile, {sync()}); }),
            "the record 'run.jsonl': diagnostics.Sync.Back.experiment.duraton: no experiment of \"Sync.Back\" has this "
            "parameter; did you mean \"duration\"?");
}

TEST(CheckProfile, RefusesAParameterThatNoDiagnosticOfTheEntryTakes) {
  const auto check = [](const std::string& diagnostics) {
    return refusalOf(ExitCode::kCannotRead, [&] {
      checkProfile(profileWith(diagnostics), {sync(), fault(), undescribed()});
    });
  };
  EXPECT_EQ(check(R"({"Sync.*": {"experiment": {"duraton": 3}}})"),
            "dir/some.json:1: diagnostics.Sync.*.experiment.duraton: no experiment of \"Sync.*\" has this parameter; "
            "did you mean \"duration\"?");
  EXPECT_THAT(check(R"({"Sync.*": {"analysis": {"duration": 3}}})"),
              HasSubstr("no analysis of \"Sync.*\" has this parameter."));
  EXPECT_EQ(check(R"({"[SF]*": {"experiment": {"duration": 3, "timeout": 4}}})"), "accepted");
  EXPECT_EQ(check(R"({"B*": {"experiment": {"anything": 3}}})"), "accepted");
}

TEST(CheckProfile, PassesOverAnEntryForSomethingThatWasNotDescribed) {
  DescribedDiagnostic other = diagnosticWith("Sync.Front", {}, {});
  other.description.isAsked = false;
  const auto check = [&other](const std::string& diagnostics) {
    return refusalOf(ExitCode::kCannotRead, [&] { checkProfile(profileWith(diagnostics), {sync(), other}); });
  };
  EXPECT_EQ(check(R"({"Sync.*": {"experiment": {"gain": 3}}})"), "accepted");
  EXPECT_EQ(check(R"({"Sync.Front": {"experiment": {"gain": 3}}})"), "accepted");
  EXPECT_THAT(
      check(R"({"Sync.Back": {"experiment": {"gain": 3}}})"),
      HasSubstr("experiment.gain: no experiment of \"Sync.Back\" has this parameter; expected one of \"duration\"."));
}

TEST(DiagnosticsToDescribe, MightDeclareAParameterThatNothingDescribedDeclares) {
  DescribedDiagnostic other = diagnosticWith("Sync.Front", {}, {});
  other.description.isAsked = false;
  DescribedDiagnostic alone = imagesAlone();
  DescribedDiagnostic otherAlone = imagesAlone();
  otherAlone.diagnostic.name = "Images.More";
  otherAlone.description = {};
  otherAlone.description.isAsked = false;
  const std::vector<DescribedDiagnostic> catalogue = {sync(), other, undescribed(), alone, otherAlone};
  struct Row {
    const char* name;
    const char* diagnostics;
    const char* experiments;
    std::vector<std::string> expected;
  };
  const Row rows[] = {
      {"a parameter that is declared", R"({"Sync.*": {"experiment": {"duration": 3}}})", "{}", {}},
      {"one that is not", R"({"Sync.*": {"experiment": {"gain": 3}}})", "{}", {"Sync.Front"}},
      {"one of the other part", R"({"Sync.*": {"analysis": {"duration": 3}}})", "{}", {"Sync.Front"}},
      {"two such entries",
       R"({"Sync.*": {"experiment": {"gain": 3}}, "S*": {"experiment": {"gain": 3}}})",
       "{}",
       {"Sync.Front"}},
      {"an entry for nothing that is asked", R"({"Sync.Front": {"experiment": {"gain": 3}}})", "{}", {}},
      {"an entry for all, of which one cannot be described", R"({"*": {"experiment": {"gain": 3}}})", "{}", {}},
      {"an experiment's parameter", "{}", R"({"Images*": {"gain": 3}})", {"Images.More"}},
      {"an experiment's parameter that is declared", "{}", R"({"Images*": {"images": 3}})", {}},
  };
  for (const Row& row : rows) {
    const Profile profile =
        parseProfile("some.json", std::string(R"({"schema": 1, "diagnostics": )") + row.diagnostics +
                                      R"(, "experiments": )" + row.experiments + "}");
    EXPECT_EQ(namesOf(diagnosticsToDescribe(profile, catalogue)), row.expected) << row.name;
  }
}

TEST(CheckProfile, RefusesAnEntryThatFitsNoDiagnosticOnlyWhenAllMustExist) {
  Profile profile = profileWith(R"({"Sync.Bakc": {"experiment": {"duration": 3}}})");
  EXPECT_EQ(refusalOf(ExitCode::kCannotRead, [&] { checkProfile(profile, {sync()}); }),
            "dir/some.json:1: diagnostics.Sync.Bakc: no diagnostic has this name; did you mean \"Sync.Back\"?");
  Diagnostic other;
  other.name = "Other";
  EXPECT_EQ(refusalOf(ExitCode::kCannotRead, [&] { checkProfile(profileWith(R"({"Othre": {}})"), {sync()}, {other}); }),
            "dir/some.json:1: diagnostics.Othre: no diagnostic has this name; did you mean \"Other\"?");
  other.name = "Sync.Bakc";
  EXPECT_EQ(refusalOf(ExitCode::kCannotRead, [&] { checkProfile(profile, {sync()}, {other}); }), "accepted");
  other.experimentOnly = true;
  EXPECT_NE(refusalOf(ExitCode::kCannotRead, [&] { checkProfile(profile, {sync()}, {other}); }), "accepted");
  profile.mayNameOthers = true;
  EXPECT_EQ(refusalOf(ExitCode::kCannotRead, [&] { checkProfile(profile, {sync()}); }), "accepted");
}

}  // namespace
}  // namespace quazor
