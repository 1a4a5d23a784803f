#include "tests/misbehaving/misbehaviour.h"

#include "contract/diagnostic_contract.h"
#include "contract/lab.h"
#include "contract/log_channel.h"

#include <unistd.h>

#include <cstdint>
#include <memory>
#include <string>
#include <utility>

namespace quazor::misbehaving {

namespace {

constexpr std::string_view kAnswer = "Answer";
constexpr double kDefaultAnswer = 42;

void act(void (*what)()) {
  if (what != nullptr) what();
}

class Experiment final : public QZExperiment, public QZTeardown {
 public:
  Experiment(std::string name, const Misbehaviour& misbehaviour)
      : name_(std::move(name)), misbehaviour_(misbehaviour) {}
  ~Experiment() override {
    if (hasRun_) act(misbehaviour_.inDestructor);
  }

  QZDescription experimentDescription() const override {
    act(misbehaviour_.inDescription);
    return QZDescription("Misbehaves.");
  }

  bool setupWithParameters(const Dictionary& /*parameters*/, QZDiagnosticHost* /*host*/,
                           DiagnosticErrorPtr* /*error*/) override {
    logDefault("%@ begins", name_);
    act(misbehaviour_.inSetup);
    return true;
  }

  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* /*error*/) override {
    hasRun_ = true;
    act(misbehaviour_.inRun);
    auto result = std::make_unique<QZExperimentResult>();
    if (misbehaviour_.measure != nullptr) {
      misbehaviour_.measure(*result);
    } else {
      result->measurements().set(kAnswer, Measurement(kDefaultAnswer, QZDimensionlessUnit::events()));
    }
    return result;
  }

  bool teardown(DiagnosticErrorPtr* /*error*/) override {
    act(misbehaviour_.inTeardown);
    return true;
  }

 private:
  const std::string name_;
  const Misbehaviour misbehaviour_;
  bool hasRun_ = false;
};

class Analysis final : public QZAnalysis {
 public:
  explicit Analysis(const Misbehaviour& misbehaviour) : misbehaviour_(misbehaviour) {}

  QZDescription analysisDescription() const override { return QZDescription("Misbehaves."); }

  std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& measured,
                                                            DiagnosticErrorPtr* /*error*/) override {
    act(misbehaviour_.inAnalysis);
    auto result = std::make_unique<QZAnalysisResult>();
    if (misbehaviour_.find != nullptr) {
      misbehaviour_.find(*result);
      return result;
    }
    const Measurement* const answer = measured.measurements().find(kAnswer);
    QZMeasuredResult found(kAnswer, answer == nullptr ? Measurement(0, QZDimensionlessUnit::events()) : *answer);
    QZLimit limit("AnswerLimit");
    limit.setLowerBound(std::make_shared<QZBound>(Measurement(kDefaultAnswer, QZDimensionlessUnit::events()), false));
    found.setLimit(std::move(limit));
    result->measuredResults().push_back(std::move(found));
    return result;
  }

 private:
  const Misbehaviour misbehaviour_;
};

}  // namespace

void addDiagnostic(std::string_view name, const Misbehaviour& misbehaviour) {
  QZLab& lab = QZLab::defaultLab();
  const std::string text(name);
  lab.addExperimentWithName(text + "Experiment",
                            [text, misbehaviour] { return std::make_shared<Experiment>(text, misbehaviour); });
  lab.addAnalysisWithName(text + "Analysis", [misbehaviour] { return std::make_shared<Analysis>(misbehaviour); });
  lab.addDiagnosticWithName(text, "Misbehaves.", text + "Experiment", text + "Analysis");
}

void sleepForEver() {
  for (;;) ::pause();
}

void crash() {
  // Hides the address from the compiler.
  volatile std::uintptr_t nowhere = 8;
  *reinterpret_cast<volatile int*>(nowhere) = 1;
}

}  // namespace quazor::misbehaving
