#include "contract/lab.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace quazor {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class IdleExperiment final : public QZExperiment {
 public:
  QZDescription experimentDescription() const override { return QZDescription("Does nothing."); }
  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* /*error*/) override {
    return std::make_unique<QZExperimentResult>();
  }
};

class IdleAnalysis final : public QZAnalysis {
 public:
  QZDescription analysisDescription() const override { return QZDescription("Finds nothing."); }
  std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& /*result*/,
                                                            DiagnosticErrorPtr* /*error*/) override {
    return std::make_unique<QZAnalysisResult>();
  }
};

std::shared_ptr<QZExperiment> makeExperiment() { return std::make_shared<IdleExperiment>(); }
std::shared_ptr<QZAnalysis> makeAnalysis() { return std::make_shared<IdleAnalysis>(); }

std::vector<std::string> namesIn(const QZLab& lab) {
  std::vector<std::string> names;
  for (const QZLab::Registration& registration : lab.registrations()) names.push_back(registration.name);
  return names;
}

TEST(LabTest, IsMadeEmpty) {
  const QZLab lab;
  EXPECT_THAT(lab.registrations(), IsEmpty());
  EXPECT_THAT(lab.refusedNames(), IsEmpty());
  EXPECT_EQ(lab.find(QZLab::Kind::kExperiment, ""), nullptr);
}

TEST(LabTest, TheDefaultLabIsOneObject) { EXPECT_EQ(&QZLab::defaultLab(), &QZLab::defaultLab()); }

TEST(LabTest, KeepsRegistrationsInTheirOrderAcrossKinds) {
  QZLab lab;
  lab.addExperimentWithName("Lamp", makeExperiment);
  lab.addDiagnosticWithName("Zeta", "Checks the lamp.", "Lamp", "Hinge");
  lab.addAnalysisWithName("Hinge", makeAnalysis);
  lab.addExperimentWithName("Buzzer", makeExperiment);
  EXPECT_THAT(namesIn(lab), ElementsAre("Lamp", "Zeta", "Hinge", "Buzzer"));
  EXPECT_THAT(lab.refusedNames(), IsEmpty());
}

TEST(LabTest, ARegistrationHoldsWhatItsKindHasAndNothingElse) {
  QZLab lab;
  lab.addExperimentWithName("E", makeExperiment);
  lab.addAnalysisWithName("A", makeAnalysis);
  lab.addDiagnosticWithName("D", "Checks the lamp.", "E", "A");

  const QZLab::Registration& experiment = lab.registrations()[0];
  EXPECT_EQ(experiment.kind, QZLab::Kind::kExperiment);
  EXPECT_TRUE(experiment.makeExperiment);
  EXPECT_FALSE(experiment.makeAnalysis);
  EXPECT_EQ(experiment.summary + experiment.experimentName + experiment.analysisName, "");

  const QZLab::Registration& analysis = lab.registrations()[1];
  EXPECT_EQ(analysis.kind, QZLab::Kind::kAnalysis);
  EXPECT_TRUE(analysis.makeAnalysis);
  EXPECT_FALSE(analysis.makeExperiment);
  EXPECT_EQ(analysis.summary + analysis.experimentName + analysis.analysisName, "");

  const QZLab::Registration& diagnostic = lab.registrations()[2];
  EXPECT_EQ(diagnostic.kind, QZLab::Kind::kDiagnostic);
  EXPECT_EQ(diagnostic.summary, "Checks the lamp.");
  EXPECT_EQ(diagnostic.experimentName, "E");
  EXPECT_EQ(diagnostic.analysisName, "A");
  EXPECT_FALSE(diagnostic.makeExperiment);
  EXPECT_FALSE(diagnostic.makeAnalysis);
}

TEST(LabTest, FindsByKindAndName) {
  QZLab lab;
  lab.addExperimentWithName("Lamp", makeExperiment);
  lab.addAnalysisWithName("Lamp", makeAnalysis);
  lab.addDiagnosticWithName("Lamp", "Checks the lamp.", "Lamp", "Lamp");
  EXPECT_THAT(lab.refusedNames(), IsEmpty());
  EXPECT_EQ(lab.find(QZLab::Kind::kExperiment, "Lamp"), &lab.registrations()[0]);
  EXPECT_EQ(lab.find(QZLab::Kind::kAnalysis, "Lamp"), &lab.registrations()[1]);
  EXPECT_EQ(lab.find(QZLab::Kind::kDiagnostic, "Lamp"), &lab.registrations()[2]);
  EXPECT_EQ(lab.find(QZLab::Kind::kExperiment, "lamp"), nullptr);
}

TEST(LabTest, ATakenNameIsRefusedAndTheFirstRegistrationStays) {
  QZLab lab;
  int firstCalls = 0;
  lab.addExperimentWithName("Lamp", [&] {
    ++firstCalls;
    return makeExperiment();
  });
  lab.addExperimentWithName("Lamp", makeExperiment);
  lab.addDiagnosticWithName("Lamp", "First.", "Lamp", "Lamp");
  lab.addDiagnosticWithName("Lamp", "Second.", "Lamp", "Lamp");
  lab.addAnalysisWithName("Hinge", makeAnalysis);
  lab.addAnalysisWithName("Hinge", makeAnalysis);
  EXPECT_THAT(namesIn(lab), ElementsAre("Lamp", "Lamp", "Hinge"));
  EXPECT_THAT(lab.refusedNames(), ElementsAre("Lamp", "Lamp", "Hinge"));
  EXPECT_EQ(lab.find(QZLab::Kind::kDiagnostic, "Lamp")->summary, "First.");
  lab.find(QZLab::Kind::kExperiment, "Lamp")->makeExperiment();
  EXPECT_EQ(firstCalls, 1);
}

TEST(LabTest, EveryFactoryCallMakesANewInstance) {
  QZLab lab;
  lab.addExperimentWithName("Lamp", makeExperiment);
  lab.addAnalysisWithName("Lamp", makeAnalysis);
  const auto& registrations = lab.registrations();
  const auto firstExperiment = registrations[0].makeExperiment();
  const auto firstAnalysis = registrations[1].makeAnalysis();
  EXPECT_NE(firstExperiment, nullptr);
  EXPECT_NE(firstAnalysis, nullptr);
  EXPECT_NE(firstExperiment, registrations[0].makeExperiment());
  EXPECT_NE(firstAnalysis, registrations[1].makeAnalysis());
}

TEST(DiagnosticContractTest, AnExperimentWithoutASetupOfItsOwnTakesAnythingAndSucceeds) {
  IdleExperiment experiment;
  QZDiagnosticHost host;
  DiagnosticErrorPtr error;
  EXPECT_TRUE(experiment.setupWithParameters(Dictionary{{"unknown", 1}}, &host, &error));
  EXPECT_EQ(error, nullptr);
  EXPECT_TRUE(experiment.setupWithParameters({}, nullptr, nullptr));
}

class ExperimentWithTeardown final : public QZExperiment, public QZTeardown {
 public:
  QZDescription experimentDescription() const override { return QZDescription("Tears down."); }
  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* /*error*/) override { return nullptr; }
  bool teardown(DiagnosticErrorPtr* /*error*/) override { return true; }
};

class AnalysisWithSetup final : public QZAnalysis, public QZAnalysisSetup {
 public:
  QZDescription analysisDescription() const override { return QZDescription("Has a setup."); }
  std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& /*result*/,
                                                            DiagnosticErrorPtr* /*error*/) override {
    return nullptr;
  }
  bool setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* /*host*/,
                           DiagnosticErrorPtr* /*error*/) override {
    return !parameters.empty();
  }
};

TEST(DiagnosticContractTest, TheHostCanTellWhichOptionalOperationsThereAre) {
  const std::shared_ptr<QZExperiment> plain = std::make_shared<IdleExperiment>();
  const std::shared_ptr<QZExperiment> withTeardown = std::make_shared<ExperimentWithTeardown>();
  EXPECT_EQ(dynamic_cast<QZTeardown*>(plain.get()), nullptr);
  auto* const teardown = dynamic_cast<QZTeardown*>(withTeardown.get());
  ASSERT_NE(teardown, nullptr);
  EXPECT_TRUE(teardown->teardown(nullptr));

  const std::shared_ptr<QZAnalysis> plainAnalysis = std::make_shared<IdleAnalysis>();
  const std::shared_ptr<QZAnalysis> withSetup = std::make_shared<AnalysisWithSetup>();
  EXPECT_EQ(dynamic_cast<QZAnalysisSetup*>(plainAnalysis.get()), nullptr);
  auto* const setup = dynamic_cast<QZAnalysisSetup*>(withSetup.get());
  ASSERT_NE(setup, nullptr);
  EXPECT_TRUE(setup->setupWithParameters(Dictionary{{"frameCount", 1}}, nullptr, nullptr));
  EXPECT_FALSE(setup->setupWithParameters({}, nullptr, nullptr));
}

}  // namespace
}  // namespace quazor
