#include "host/testing/plugins/fake_diagnostic.h"

#include "contract/log_channel.h"

#include <cmath>
#include <stdexcept>
#include <utility>

namespace quazor::fake {

namespace {

constexpr std::string_view kDomain = "FakeDomain";

Behaviour behaviourOf(const Dictionary& parameters) {
  return static_cast<Behaviour>(toInt32(parameters.find("behaviour")));
}

// Sets an error of the test domain and returns false.
bool failWith(DiagnosticErrorPtr* error, std::int64_t code, std::string_view message) {
  fail(error, kDomain, code, nullptr, "%@", message);
  return false;
}

}  // namespace

QZDescription FakeExperiment::experimentDescription() const {
  QZDescription description("Measures what it is told to.");
  description.addParameter(QZNumberParameter("How long it takes, in seconds.", true), "duration");
  description.addParameter(QZNumberParameter("What it measures.", false), "measured");
  description.addParameter(QZNumberParameter("What goes wrong.", false), "behaviour");
  return description;
}

bool FakeExperiment::setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* /*host*/,
                                         DiagnosticErrorPtr* error) {
  behaviour_ = behaviourOf(parameters);
  duration_ = toDouble(parameters.find("duration"));
  measured_ = toDouble(parameters.find("measured"));
  if (behaviour_ == Behaviour::kSetupFails) return failWith(error, 1, "setup failed");
  if (behaviour_ == Behaviour::kSetupFailsWithoutError) return false;
  if (behaviour_ == Behaviour::kSetupThrows) throw std::runtime_error("setup threw");
  if (behaviour_ == Behaviour::kSetupThrowsAnInteger) throw 42;
  return true;
}

std::unique_ptr<QZExperimentResult> FakeExperiment::run(DiagnosticErrorPtr* error) {
  logError("an error line");
  logDefault("a default line of %@", measured_);
  installedPlatform().clock->sleep(nanosecondsFromSeconds(duration_));
  logDebug("a debug line");
  if (behaviour_ == Behaviour::kRunFails || behaviour_ == Behaviour::kRunAndTeardownFail) {
    fail(error, kDomain, 2, makeError("DeepDomain", -3, "the cause"), "run failed");
    return nullptr;
  }
  if (behaviour_ == Behaviour::kRunFailsWithoutError) return nullptr;
  if (behaviour_ == Behaviour::kRunThrows) throw std::runtime_error("run threw");
  if (behaviour_ == Behaviour::kRunThrowsAnInteger) throw 42;
  if (behaviour_ == Behaviour::kRunSucceedsWithError) failWith(error, 3, "an error that is none");
  auto result = std::make_unique<QZExperimentResult>();
  const double value = behaviour_ == Behaviour::kNotANumber ? std::nan("") : measured_;
  result->measurements().set("Count", Measurement(value, QZDimensionlessUnit::frames()));
  result->auxiliaryData().set("bytes", Bytes{0x00, 0xA5});
  result->auxiliaryData().set("list", Array{-1, 18446744073709551615U, 36.6F, 0.1, true, "text"});
  return result;
}

bool FakeExperiment::teardown(DiagnosticErrorPtr* error) {
  logDefault("teardown");
  if (behaviour_ == Behaviour::kTeardownFails) return failWith(error, 4, "teardown failed");
  if (behaviour_ == Behaviour::kRunAndTeardownFail) return failWith(error, 4, "teardown failed");
  if (behaviour_ == Behaviour::kTeardownThrows) throw std::runtime_error("teardown threw");
  return true;
}

QZDescription FakeAnalysis::analysisDescription() const {
  QZDescription description("Compares the count with a minimum.\nIt has a second line.");
  description.addParameter(QZNumberParameter("The least that is enough.", false), "minimum");
  description.addParameter(QZNumberParameter("What goes wrong.", false), "behaviour");
  return description;
}

bool FakeAnalysis::setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* /*host*/,
                                       DiagnosticErrorPtr* error) {
  behaviour_ = behaviourOf(parameters);
  minimum_ = toDouble(parameters.find("minimum"));
  if (behaviour_ == Behaviour::kAnalysisSetupFails) return failWith(error, 5, "analysis setup failed");
  if (behaviour_ == Behaviour::kAnalysisSetupThrows) throw std::runtime_error("analysis setup threw");
  return true;
}

std::unique_ptr<QZAnalysisResult> FakeAnalysis::analyzeExperimentResult(const QZExperimentResult& result,
                                                                        DiagnosticErrorPtr* error) {
  if (behaviour_ == Behaviour::kAnalyzingFailsWithoutError) return nullptr;
  if (behaviour_ == Behaviour::kAnalyzingThrows) throw std::runtime_error("analyzing threw");
  if (behaviour_ == Behaviour::kAnalyzingFails) {
    failWith(error, 6, "analyzing failed");
    return nullptr;
  }
  auto analyzed = std::make_unique<QZAnalysisResult>();
  if (behaviour_ == Behaviour::kNothingMeasured) return analyzed;
  const bool wrongUnit = behaviour_ == Behaviour::kBoundInAnotherUnit;
  const QZUnit& unit = wrongUnit ? QZDimensionlessUnit::errors() : QZDimensionlessUnit::frames();
  const Measurement& count = *result.measurements().find("Count");
  QZLimit limit("Enough");
  limit.setLowerBound(std::make_shared<const QZBound>(Measurement(minimum_, unit), false));
  analyzed->measuredResults().emplace_back("Count", count).setLimit(std::move(limit));
  analyzed->measuredResults().emplace_back("Echo", count);
  return analyzed;
}

}  // namespace quazor::fake
