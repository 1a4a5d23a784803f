#include "host/catalogue.h"

#include "host/exit_code.h"
#include "host/test_plugins/fake_diagnostic.h"
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
    catalogue_ = catalogueOf(lab_);
  }

  std::vector<std::string> select(const std::vector<std::string>& names) const {
    return namesOf(selectDiagnostics(catalogue_, names));
  }

  std::string refusalOf(const std::vector<std::string>& names) const {
    try {
      select(names);
    } catch (const Refusal& refusal) {
      EXPECT_EQ(refusal.code(), ExitCode::kUsage);
      return refusal.what();
    }
    return "accepted";
  }

  QZLab lab_;
  std::vector<Diagnostic> catalogue_;
};

TEST_F(CatalogueTest, HoldsTheDiagnosticsInTheOrderOfTheirRegistration) {
  EXPECT_THAT(namesOf(catalogue_), ElementsAre("Sync.Back", "Sync.Front", "Fault", "Sy*"));
  EXPECT_EQ(catalogue_[0].summary, "Summary.");
  EXPECT_EQ(catalogue_[0].experimentName, "Experiment");
  EXPECT_EQ(catalogue_[0].analysisName, "Analysis");
  EXPECT_NE(catalogue_[0].makeExperiment(), nullptr);
  EXPECT_NE(catalogue_[0].makeAnalysis(), nullptr);
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
    complete = platform.capture != nullptr && platform.clock != nullptr && platform.concurrency != nullptr;
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
      {"no experiment", [] { return nullptr; }, analysis, "the factory of Experiment made nothing"},
      {"no analysis", experiment, [] { return nullptr; }, "the factory of Analysis made nothing"},
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
