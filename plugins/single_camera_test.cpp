// The registrations of the plug-in, and a run of its diagnostic on the healthy phone.
#include "backends/simulated/simulated_phone.h"
#include "contract/lab.h"
#include "contract/parameter_range.h"
#include "platform/platform.h"
#include "tests/support/shipped_scenario.h"

#include <dlfcn.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <memory>

namespace quazor {
namespace {

TEST(SingleCameraPlugin, RegistersItsDiagnostic) {
  const QZLab& lab = QZLab::defaultLab();
  ASSERT_TRUE(lab.registrations().empty());
  // Stays loaded, because the lab keeps its factories.
  ASSERT_NE(dlopen(SINGLE_CAMERA_PLUGIN, RTLD_NOW | RTLD_LOCAL), nullptr) << dlerror();
  EXPECT_EQ(lab.registrations().size(), 3U);
  EXPECT_TRUE(lab.refusedNames().empty());
  const QZLab::Registration* const diagnostic = lab.find(QZLab::Kind::kDiagnostic, "SingleCameraDiagnostic");
  ASSERT_NE(diagnostic, nullptr);
  EXPECT_EQ(diagnostic->summary, "Stream one camera and ensure it delivers every frame on time.");
  EXPECT_EQ(diagnostic->experimentName, "SingleCameraExperiment");
  EXPECT_EQ(diagnostic->analysisName, "SingleCameraAnalysis");

  const SimulatedPhone phone(shippedScenario("healthy"), PhoneTime::kVirtual, 0);
  const Platform before = installedPlatform();
  installPlatform(phone.platform());
  const auto experiment = lab.find(QZLab::Kind::kExperiment, "SingleCameraExperiment")->makeExperiment();
  const auto analysis = lab.find(QZLab::Kind::kAnalysis, "SingleCameraAnalysis")->makeAnalysis();
  installPlatform(before);
  EXPECT_EQ(experiment->experimentDescription().parameters().size(), 4U);
  EXPECT_EQ(analysis->analysisDescription().parameters().size(), 6U);
  const auto* const asked = dynamic_cast<const QZParameterRanges*>(experiment.get());
  const auto* const limits = dynamic_cast<const QZParameterRanges*>(analysis.get());
  ASSERT_TRUE(asked != nullptr && limits != nullptr);
  EXPECT_EQ(asked->parameterRanges().find("duration")->minimum()->value, 1);
  EXPECT_TRUE(asked->parameterRanges().find("frameRate")->minimum()->open);
  EXPECT_TRUE(asked->parameterRanges().find("camera")->integer());
  EXPECT_EQ(limits->parameterRanges().find("maximumJitter")->defaultValue(), 5);
  const auto measured = experiment->run(nullptr);
  ASSERT_NE(measured, nullptr);
  const auto analyzed = analysis->analyzeExperimentResult(*measured, nullptr);
  ASSERT_NE(analyzed, nullptr);
  const auto hasLimit = [](const QZMeasuredResult& result) { return result.limit().has_value(); };
  EXPECT_EQ(std::ranges::count_if(analyzed->measuredResults(), hasLimit), 13);
}

}  // namespace
}  // namespace quazor
