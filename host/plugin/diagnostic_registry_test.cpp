#include "host/plugin/diagnostic_registry.h"

#include "host/error/exit_code.h"
#include "host/testing/plugins/fake_diagnostic.h"
#include "host/testing/test_refusals.h"
#include "platform/platform.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>

namespace quazor {
namespace {

using testing::ElementsAre;

class CatalogueTest : public testing::Test {
 protected:
  CatalogueTest() {
    lab_.addAnalysisWithName("Analysis", [] { return std::make_shared<fake::FakeAnalysis>(); });
    lab_.addExperimentWithName("Experiment", [] { return std::make_shared<fake::FakeExperiment>(); });
    for (const char* name : {"Sync.Back", "Sync.Front", "Fault", "Sy*"}) {
      lab_.addDiagnosticWithName(name, "Summary.", "Experiment", "Analysis");
    }
    lab_.addExperimentWithName("Image.Alone", [] { return std::make_shared<fake::FakeExperiment>(); });
    catalogue_ = catalogueOf(lab_);
  }

  std::vector<std::string> select(const std::vector<std::string>& names, Wanted wanted = Wanted::kDiagnostics) const {
    return namesOf(selectDiagnostics(catalogue_, wanted, names));
  }

  std::string refusalOf(const std::vector<std::string>& names, Wanted wanted = Wanted::kDiagnostics) const {
    return quazor::refusalOf(ExitCode::kUsage, [&] { select(names, wanted); });
  }

  QZLab lab_;
  std::vector<Diagnostic> catalogue_;
};

TEST_F(CatalogueTest, HoldsDiagnosticsAndThenExperimentsInTheOrderOfTheirRegistration) {
  EXPECT_THAT(namesOf(catalogue_), ElementsAre("Sync.Back", "Sync.Front", "Fault", "Sy*", "Experiment", "Image.Alone"));
  EXPECT_EQ(catalogue_[0].summary, "Summary.");
  EXPECT_EQ(catalogue_[0].experimentName, "Experiment");
  EXPECT_EQ(catalogue_[0].analysisName, "Analysis");
  EXPECT_NE(catalogue_[0].makeExperiment(), nullptr);
  EXPECT_NE(catalogue_[0].makeAnalysis(), nullptr);
}

TEST_F(CatalogueTest, KnowsOfAnExperimentWhichDiagnosticsHaveIt) {
  EXPECT_FALSE(catalogue_[3].experimentOnly);
  const Diagnostic& used = catalogue_[4];
  EXPECT_TRUE(used.experimentOnly);
  EXPECT_EQ(used.experimentName, "Experiment");
  EXPECT_EQ(used.analysisName, "");
  EXPECT_NE(used.makeExperiment(), nullptr);
  EXPECT_THAT(used.usedBy, ElementsAre("Sync.Back", "Sync.Front", "Fault", "Sy*"));
  EXPECT_TRUE(catalogue_[5].experimentOnly);
  EXPECT_THAT(catalogue_[5].usedBy, ElementsAre());
}

TEST_F(CatalogueTest, LeavesOutADiagnosticOfWhichAHalfIsNotRegistered) {
  const std::size_t before = catalogue_.size();
  lab_.addDiagnosticWithName("No.Experiment", "", "Nothing", "Analysis");
  lab_.addDiagnosticWithName("No.Analysis", "", "Experiment", "Nothing");
  EXPECT_EQ(catalogueOf(lab_).size(), before);
}

TEST_F(CatalogueTest, DescribesOnlyWhatIsWanted) {
  const DiagnosticDescription wanted = describeIfWanted(catalogue_[5], {catalogue_[5]});
  EXPECT_TRUE(wanted.isAsked);
  EXPECT_EQ(wanted.experiment.summary(), "Measures what it is told to.");
  const DiagnosticDescription unwanted = describeIfWanted(catalogue_[5], {catalogue_[4]});
  EXPECT_FALSE(unwanted.isAsked);
  EXPECT_EQ(unwanted.experiment.summary(), "");
}

TEST_F(CatalogueTest, GivesAllThatIsWanted) {
  EXPECT_THAT(namesOf(allOf(catalogue_, Wanted::kDiagnostics)), ElementsAre("Sync.Back", "Sync.Front", "Fault", "Sy*"));
  EXPECT_THAT(namesOf(allOf(catalogue_, Wanted::kExperiments)), ElementsAre("Experiment", "Image.Alone"));
  EXPECT_THAT(namesOf(allOf(catalogue_, Wanted::kDescribable)),
              ElementsAre("Sync.Back", "Sync.Front", "Fault", "Sy*", "Image.Alone"));
}

TEST_F(CatalogueTest, SelectsExperimentsWhereTheyAreWanted) {
  EXPECT_THAT(select({"*"}, Wanted::kExperiments), ElementsAre("Experiment", "Image.Alone"));
  EXPECT_THAT(select({"Image.Alone", "Experiment"}, Wanted::kExperiments), ElementsAre("Image.Alone", "Experiment"));
}

TEST_F(CatalogueTest, SelectsForADescriptionWhatDiagnosticsHaveOnlyWhenItIsMeant) {
  EXPECT_THAT(select({"*"}, Wanted::kDescribable),
              ElementsAre("Sync.Back", "Sync.Front", "Fault", "Sy*", "Image.Alone"));
  EXPECT_THAT(select({"Experiment"}, Wanted::kDescribable), ElementsAre("Experiment"));
  EXPECT_THAT(select({"Exp*", "Fault"}, Wanted::kDescribable), ElementsAre("Experiment", "Fault"));
}

TEST_F(CatalogueTest, TakesADiagnosticAndAnExperimentOfOneNameForTwo) {
  lab_.addExperimentWithName("Fault", [] { return nullptr; });
  catalogue_ = catalogueOf(lab_);
  EXPECT_THAT(select({"Fault"}, Wanted::kDescribable), ElementsAre("Fault", "Fault"));
  EXPECT_FALSE(selectDiagnostics(catalogue_, Wanted::kDiagnostics, {"Fault"})[0].experimentOnly);
  EXPECT_TRUE(selectDiagnostics(catalogue_, Wanted::kExperiments, {"Fault"})[0].experimentOnly);
}

TEST_F(CatalogueTest, NamesTheCommandForWhatIsNotWantedHere) {
  EXPECT_EQ(refusalOf({"Image.Alone"}),
            "'Image.Alone' is an experiment and has no limits; run it with 'quazor experiment Image.Alone'");
  EXPECT_EQ(refusalOf({"Im*"}),
            "no diagnostic matches 'Im*', but Image.Alone is an experiment and has no limits; run it with "
            "'quazor experiment Image.Alone'");
  EXPECT_EQ(refusalOf({"Sync.Back"}, Wanted::kExperiments),
            "'Sync.Back' is a diagnostic; run it with 'quazor run Sync.Back', or only its experiment with 'quazor "
            "experiment Experiment'");
}

TEST_F(CatalogueTest, RefusesANameInTheWordsOfWhatIsWanted) {
  EXPECT_EQ(refusalOf({"Experimnet"}, Wanted::kExperiments),
            "there is no experiment 'Experimnet'; did you mean 'Experiment'?");
  EXPECT_EQ(refusalOf({"X*"}, Wanted::kExperiments), "no experiment matches 'X*'");
  EXPECT_EQ(refusalOf({"Experimnet"}, Wanted::kDescribable),
            "there is no diagnostic or experiment 'Experimnet'; did you mean 'Experiment'?");
  EXPECT_EQ(refusalOf({"X*"}, Wanted::kDescribable), "no diagnostic or experiment matches 'X*'");
}

TEST_F(CatalogueTest, DescribesAnExperimentWithoutAnAnalysis) {
  const DiagnosticDescription description = describeDiagnostic(catalogue_[5]);
  EXPECT_EQ(description.error, nullptr);
  EXPECT_EQ(description.experiment.summary(), "Measures what it is told to.");
  EXPECT_TRUE(description.analysis.parameters().empty());
}

TEST_F(CatalogueTest, SelectsInTheOrderOfTheNames) {
  EXPECT_THAT(select({"Fault", "Sync.Back"}), ElementsAre("Fault", "Sync.Back"));
}

TEST_F(CatalogueTest, SelectsNothingTwice) {
  EXPECT_THAT(select({"Sync.Front", "Sync.*", "Sync.Front"}), ElementsAre("Sync.Front", "Sync.Back"));
}

TEST_F(CatalogueTest, ExpandsPatterns) {
  EXPECT_THAT(select({"*"}), ElementsAre("Sync.Back", "Sync.Front", "Fault", "Sy*"));
  EXPECT_THAT(select({"Sync.?ront"}), ElementsAre("Sync.Front"));
  EXPECT_THAT(select({"Sync.[BX]ack"}), ElementsAre("Sync.Back"));
  EXPECT_THAT(select({"[!S]*"}), ElementsAre("Fault"));
}

TEST_F(CatalogueTest, TakesANameThatLooksLikeAPatternAsTheName) { EXPECT_THAT(select({"Sy*"}), ElementsAre("Sy*")); }

TEST_F(CatalogueTest, RefusesANameWithTheNearestRightOne) {
  EXPECT_EQ(refusalOf({"Sync.Bakc"}), "there is no diagnostic 'Sync.Bakc'; did you mean 'Sync.Back'?");
  EXPECT_EQ(refusalOf({"Fault", "Something"}), "there is no diagnostic 'Something'");
}

TEST_F(CatalogueTest, RefusesAPatternThatMatchesNothing) {
  EXPECT_EQ(refusalOf({"Sync.*", "X*"}), "no diagnostic matches 'X*'");
}

TEST_F(CatalogueTest, DescribesBothHalves) {
  const DiagnosticDescription description = describeDiagnostic(catalogue_[0]);
  EXPECT_EQ(description.error, nullptr);
  EXPECT_EQ(description.experiment.summary(), "Measures what it is told to.");
  EXPECT_TRUE(description.experiment.parameters().contains("duration"));
  EXPECT_TRUE(description.analysis.parameters().contains("minimum"));
}

TEST_F(CatalogueTest, GivesADescribedExperimentAPlatform) {
  Diagnostic diagnostic = catalogue_[0];
  bool complete = false;
  diagnostic.makeExperiment = [&complete] {
    const Platform& platform = installedPlatform();
    complete = platform.capture != nullptr && platform.clock != nullptr && platform.concurrency != nullptr &&
               platform.reports != nullptr && platform.hid != nullptr && platform.framebuffer != nullptr &&
               platform.runLoops != nullptr;
    return std::make_shared<fake::FakeExperiment>();
  };
  describeDiagnostic(diagnostic);
  EXPECT_TRUE(complete);
}

TEST_F(CatalogueTest, TellsWhyADiagnosticCannotBeDescribed) {
  struct Row {
    const char* name;
    QZExperimentFactory makeExperiment;
    QZAnalysisFactory makeAnalysis;
    const char* problem;
  };
  const QZExperimentFactory experiment = catalogue_[0].makeExperiment;
  const QZAnalysisFactory analysis = catalogue_[0].makeAnalysis;
  const Row rows[] = {
      {"no experiment", [] { return nullptr; }, analysis, "the factory of Experiment returned no object"},
      {"no analysis", experiment, [] { return nullptr; }, "the factory of Analysis returned no object"},
      {"an experiment's factory that throws", []() -> std::shared_ptr<QZExperiment> { throw std::runtime_error("no"); },
       analysis, "describing Experiment threw an exception: no"},
      {"an analysis' factory that throws", experiment, []() -> std::shared_ptr<QZAnalysis> { throw 42; },
       "describing Analysis threw something that is not a standard exception"},
      {"an empty factory", nullptr, analysis, "describing Experiment threw an exception: bad_function_call"},
  };
  for (const Row& row : rows) {
    Diagnostic diagnostic = catalogue_[0];
    diagnostic.makeExperiment = row.makeExperiment;
    diagnostic.makeAnalysis = row.makeAnalysis;
    const DiagnosticDescription description = describeDiagnostic(diagnostic);
    ASSERT_NE(description.error, nullptr) << row.name;
    EXPECT_EQ(description.error->localizedDescription(), row.problem) << row.name;
  }
}

}  // namespace
}  // namespace quazor
