#include "host/plugin/parameters.h"

#include "host/error/exit_code.h"
#include "host/plugin/described_for_tests.h"
#include "host/testing/test_refusals.h"
#include "tests/support/thrown_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>

namespace quazor {
namespace {

using testing::HasSubstr;

std::vector<ParameterOverride> settings(const std::vector<std::string>& texts) {
  std::vector<ParameterOverride> parsed;
  for (const std::string& text : texts) parsed.push_back(parseOverride(text));
  return parsed;
}

TEST(ParseSetting, TakesThePrefixAsTheHalf) {
  struct Row {
    const char* text;
    std::optional<Part> part;
    const char* name;
    Value value;
  };
  const Row rows[] = {
      {"duration=3", std::nullopt, "duration", 3},
      {"experiment.duration=2.5", Part::kExperiment, "duration", 2.5},
      {"analysis.frameCount=-1", Part::kAnalysis, "frameCount", -1},
      {"experiment.analysis.x=1", Part::kExperiment, "analysis.x", 1},
      {"a.b=1", std::nullopt, "a.b", 1},
      {"experimental=1", std::nullopt, "experimental", 1},
  };
  for (const Row& row : rows) {
    const ParameterOverride setting = parseOverride(row.text);
    EXPECT_EQ(setting.part, row.part) << row.text;
    EXPECT_EQ(setting.name, row.name) << row.text;
    EXPECT_EQ(setting.value, row.value) << row.text;
    EXPECT_EQ(setting.text, row.text);
  }
}

TEST(ParseSetting, RefusesOtherForms) {
  constexpr RefusedText kRows[] = {
      {"", "expected [experiment.|analysis.]NAME=VALUE"},
      {"duration", "expected [experiment.|analysis.]NAME=VALUE"},
      {"=3", "the parameter name is missing"},
      {"analysis.=3", "the parameter name is missing"},
      {"duration=", "a number is missing"},
      {"duration=3s", "'3s' is not a number"},
      {"duration=3=4", "'3=4' is not a number"},
      {"duration=nan", "'nan' is not a finite number"},
      {"duration=1e999", "'1e999' is outside the range of numbers"},
  };
  for (const auto& row : kRows) {
    EXPECT_THAT(refusalOf(ExitCode::kUsage, [&] { parseOverride(row.text); }), HasSubstr(row.problem)) << row.text;
  }
}

TEST(CheckSettings, RefusesWhatNoneOfTheDiagnosticsTakes) {
  const auto check = [](const std::vector<std::string>& texts, const std::vector<DescribedDiagnostic>& selected) {
    return refusalOf(ExitCode::kUsage, [&] { checkOverrides(settings(texts), selected); });
  };
  EXPECT_EQ(check({"duratoin=3"}, {sync()}),
            "--set 'duratoin=3': none of the selected diagnostics has a parameter 'duratoin'; "
            "did you mean 'duration'?");
  EXPECT_EQ(check({"analysis.duration=3"}, {sync()}),
            "--set 'analysis.duration=3': no analysis of the selected diagnostics has a parameter 'duration'; "
            "the experiment has it, and an analysis cannot change it");
  EXPECT_EQ(check({"duration=3", "timeout=3"}, {sync(), fault()}), "accepted");
  EXPECT_THAT(check({"duration=3"}, {fault()}), HasSubstr("has a parameter 'duration'"));
}

TEST(CheckSettings, SpeaksOfWhatIsSelected) {
  const auto check = [](const std::string& text, const std::vector<DescribedDiagnostic>& selected) {
    return refusalOf(ExitCode::kUsage, [&] { checkOverrides(settings({text}), selected); });
  };
  EXPECT_EQ(check("x=3", {imagesAlone()}), "--set 'x=3': none of the selected experiments has a parameter 'x'");
  EXPECT_EQ(check("analysis.images=3", {imagesAlone()}),
            "--set 'analysis.images=3': no analysis of the selected experiments has a parameter 'images'; "
            "the experiment has it, and an analysis cannot change it");
  EXPECT_EQ(check("x=3", {imagesAlone(), fault()}),
            "--set 'x=3': none of the selected diagnostics and experiments has a parameter 'x'");
  EXPECT_EQ(check("experiment.images=3", {imagesAlone()}), "accepted");
}

TEST(CheckSettings, SaysWhenADiagnosticsParametersAreNotKnown) {
  EXPECT_THAT(refusalOf(ExitCode::kUsage, [] { checkOverrides(settings({"x=3"}), {undescribed()}); }),
              HasSubstr("(Broken could not be described: it threw)"));
}

TEST(CheckSettings, RefusesTwoSettingsOfOneParameter) {
  const auto check = [](const std::vector<std::string>& texts) {
    return refusalOf(ExitCode::kUsage, [&] { checkOverrides(settings(texts), {fault()}); });
  };
  EXPECT_EQ(check({"timeout=3", "timeout=4"}), "--set 'timeout=3' and --set 'timeout=4' set the same parameter twice");
  EXPECT_THAT(check({"frameCount=3", "analysis.frameCount=4"}), HasSubstr("twice"));
  EXPECT_THAT(check({"experiment.frameCount=3", "experiment.frameCount=3"}), HasSubstr("twice"));
  EXPECT_EQ(check({"experiment.frameCount=3", "analysis.frameCount=4", "timeout=5"}), "accepted");
}

TEST(BindParameters, LetsASettingWinOverTheProfile) {
  const Profile profile = profileWith(R"({"Fault": {"experiment": {"frameCount": 90, "timeout": 10}}})");
  const ResolvedParameters bound = resolveParameters(fault(), {profile}, settings({"experiment.frameCount=5"}));
  ASSERT_EQ(bound.experiment.size(), 2U);
  EXPECT_EQ(bound.experiment[0].name, "frameCount");
  EXPECT_EQ(bound.experiment[0].value, Value(5));
  EXPECT_EQ(bound.experiment[0].source, "command line");
  EXPECT_EQ(bound.experiment[1].value, Value(10));
  EXPECT_EQ(bound.experiment[1].source, "profile some.json");
  ASSERT_EQ(bound.analysis.size(), 1U);
  EXPECT_EQ(bound.analysis[0].value, std::nullopt);
  EXPECT_EQ(bound.analysis[0].source, "");
}

TEST(BindParameters, TakesTheValueOfTheLastPlaceThatHasOne) {
  const std::vector<Profile> profiles = {
      parseProfile("default.json", R"({"schema": 1, "diagnostics": {"Fault": {"experiment":
        {"frameCount": 1, "timeout": 1}, "analysis": {"frameCount": 1}}}})"),
      parseProfile("mine.json", R"({"schema": 1, "diagnostics": {"*": {"experiment": {"frameCount": 2}}}})"),
      parseProfile("yours.json", R"({"schema": 1, "diagnostics": {"Fault": {"experiment": {"frameCount": 3}}}})")};
  const ParameterOverride environment = parseOverride("experiment.frameCount=4", OverridePlace::kEnvironment);
  const ParameterOverride commandLine = parseOverride("experiment.frameCount=5");
  struct Row {
    std::vector<Profile> profiles;
    std::vector<ParameterOverride> settings;
    std::optional<Value> value;
    const char* source;
  };
  const Row rows[] = {
      {{}, {}, std::nullopt, ""},
      {{profiles[0]}, {}, 1, "profile default.json"},
      {{profiles[0], profiles[1]}, {}, 2, "profile mine.json"},
      {{profiles[0], profiles[1], profiles[2]}, {}, 3, "profile yours.json"},
      {{profiles[2], profiles[1]}, {}, 2, "profile mine.json"},
      {profiles, {environment}, 4, "environment"},
      {profiles, {environment, commandLine}, 5, "command line"},
      {profiles, {commandLine, environment}, 5, "command line"},
      {{}, {environment}, 4, "environment"},
      {profiles, {commandLine}, 5, "command line"},
  };
  for (const Row& row : rows) {
    const ResolvedParameters bound = resolveParameters(fault(), row.profiles, row.settings);
    EXPECT_EQ(bound.experiment[0].value, row.value) << row.source;
    EXPECT_EQ(bound.experiment[0].source, row.source);
  }
  // A later source without a value keeps the earlier one's.
  const ResolvedParameters bound = resolveParameters(fault(), profiles, {environment, commandLine});
  EXPECT_EQ(bound.experiment[1].value, Value(1));
  EXPECT_EQ(bound.experiment[1].source, "profile default.json");
  EXPECT_EQ(bound.analysis[0].value, Value(1));
}

class SettingsOfEnvironment : public testing::Test {
 protected:
  ~SettingsOfEnvironment() override { ::unsetenv(kSettingsVariable); }

  static void set(const char* text) { ASSERT_EQ(::setenv(kSettingsVariable, text, 1), 0); }
};

TEST_F(SettingsOfEnvironment, AreSeparatedByWhiteSpace) {
  ::unsetenv(kSettingsVariable);
  EXPECT_TRUE(overridesOfEnvironment().empty());
  set(" \t ");
  EXPECT_TRUE(overridesOfEnvironment().empty());
  set("duration=3  analysis.frameCount=4\ttimeout=5\n");
  const std::vector<ParameterOverride> settings = overridesOfEnvironment();
  ASSERT_EQ(settings.size(), 3U);
  EXPECT_EQ(settings[0].name, "duration");
  EXPECT_EQ(settings[1].part, Part::kAnalysis);
  EXPECT_EQ(settings[2].value, Value(5));
  for (const ParameterOverride& setting : settings) EXPECT_EQ(setting.place, OverridePlace::kEnvironment);
}

TEST_F(SettingsOfEnvironment, AreCalledByTheirVariable) {
  set("duration");
  EXPECT_THAT(refusalOf(ExitCode::kUsage, [] { overridesOfEnvironment(); }),
              HasSubstr("QUAZOR_SET 'duration': expected [experiment."));
  set("duratoin=3");
  EXPECT_EQ(
      refusalOf(ExitCode::kUsage, [] { checkOverrides(overridesOfEnvironment(), {sync()}); }),
      "QUAZOR_SET 'duratoin=3': none of the selected diagnostics has a parameter 'duratoin'; did you mean 'duration'?");
  set("duration=3 duration=4");
  EXPECT_EQ(refusalOf(ExitCode::kUsage, [] { checkOverrides(overridesOfEnvironment(), {sync()}); }),
            "QUAZOR_SET 'duration=3' and QUAZOR_SET 'duration=4' set the same parameter twice");
}

TEST_F(SettingsOfEnvironment, MaySetWhatTheCommandLineSetsToo) {
  set("duration=3");
  std::vector<ParameterOverride> both = overridesOfEnvironment();
  both.push_back(parseOverride("duration=4"));
  EXPECT_EQ(refusalOf(ExitCode::kUsage, [&] { checkOverrides(both, {sync()}); }), "accepted");
}

TEST(BindParameters, SetsAParameterWithoutPrefixWhereverItIsDeclared) {
  const ResolvedParameters bound = resolveParameters(fault(), {}, settings({"frameCount=7"}));
  EXPECT_EQ(bound.experiment[0].value, Value(7));
  EXPECT_EQ(bound.analysis[0].value, Value(7));
  EXPECT_EQ(bound.experiment[1].value, std::nullopt);
}

TEST(BindParameters, SetsAParameterWithAPrefixOnlyThere) {
  const ResolvedParameters bound = resolveParameters(fault(), {}, settings({"analysis.frameCount=7"}));
  EXPECT_EQ(bound.experiment[0].value, std::nullopt);
  EXPECT_EQ(bound.analysis[0].value, Value(7));
}

TEST(BindParameters, GivesAnExperimentItsOwnValuesAndElseThoseOfItsDiagnostics) {
  const Profile profile = parseProfile("some.json", R"({"schema": 1,
    "diagnostics": {"Sync.*": {"experiment": {"images": 1, "timeout": 2}}, "Fault": {"experiment": {"timeout": 3}}},
    "experiments": {"Images": {"images": 4}}})");
  ResolvedParameters bound = resolveParameters(imagesAlone(), {profile}, {});
  ASSERT_EQ(bound.experiment.size(), 2U);
  EXPECT_EQ(bound.experiment[0].value, Value(4));
  EXPECT_EQ(bound.experiment[0].source, "profile some.json");
  EXPECT_EQ(bound.experiment[1].value, Value(3));
  EXPECT_TRUE(bound.analysis.empty());
  bound = resolveParameters(imagesAlone(), {profile}, settings({"experiment.images=9"}));
  EXPECT_EQ(bound.experiment[0].value, Value(9));
}

TEST(MissingParameter, IsARequiredOneWithoutAValue) {
  const auto missing = [](const DescribedDiagnostic& diagnostic, const std::vector<std::string>& texts) {
    return missingParameterOf(diagnostic, resolveParameters(diagnostic, {}, settings(texts)));
  };
  EXPECT_EQ(missing(sync(), {}),
            "Sync.Back requires the parameter experiment.duration; set it with "
            "--set experiment.duration=VALUE or in a profile");
  EXPECT_EQ(missing(imagesAlone(), {"timeout=1"}),
            "Images requires the parameter images; set it with --set images=VALUE or in a profile");
  EXPECT_THAT(missing(fault(), {"experiment.frameCount=1", "timeout=1"}), HasSubstr("analysis.frameCount"));
  EXPECT_EQ(missing(fault(), {"frameCount=1", "timeout=1"}), "");
  EXPECT_EQ(missing(relaxed(), {}), "");
}

TEST(DictionaryOf, HoldsOnlyWhatIsSet) {
  const ResolvedParameters bound = resolveParameters(fault(), {}, settings({"timeout=2"}));
  EXPECT_EQ(dictionaryOf(bound.experiment), (Dictionary{{"timeout", 2}}));
  EXPECT_TRUE(dictionaryOf(bound.analysis).empty());
}

}  // namespace
}  // namespace quazor
