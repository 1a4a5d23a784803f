// Diagnostics with excessive results and logs.
#include "tests/misbehaving/misbehaviour.h"

#include "contract/diagnostic_contract.h"
#include "contract/lab.h"
#include "contract/log_channel.h"
#include "contract/message_format.h"

#include <cstdint>
#include <limits>
#include <memory>
#include <string>
#include <string_view>
#include <thread>
#include <utility>

namespace quazor::misbehaving {

namespace {

using namespace std::string_literals;

constexpr std::string_view kCount = "count";

const QZUnit& unit() { return QZDimensionlessUnit::events(); }

void findWithLimit(QZAnalysisResult& result, std::string_view name, double value) {
  QZMeasuredResult found(name, Measurement(value, unit()));
  QZLimit limit("AnswerLimit");
  limit.setLowerBound(std::make_shared<QZBound>(Measurement(0, unit()), false));
  found.setLimit(std::move(limit));
  result.measuredResults().push_back(std::move(found));
}

void measureOdd(QZExperimentResult& result) {
  result.measurements().set("", Measurement(-0.0, QZUnit::unitWithSymbol("")));
  result.measurements().set("\xFF\n\0\x1b[2J"s,
                            Measurement(std::numeric_limits<double>::denorm_min(), QZUnit::unitWithSymbol("\xC3")));
  result.auxiliaryData().set("nothing", std::shared_ptr<Object>());
}

void findOdd(QZAnalysisResult& result) { findWithLimit(result, "\xFF\n\0\x1b[2J"s, 1); }

void logOdd() {
  logError("%@", "two\nlines, a \0 and \xFF\x1b[2J"s);
  logError("%@", std::string(1 << 20, 'x'));
}

void logForEver() {
  for (;;) logDefault("and on");
}

// Its threads log after everything has ended.
void logOnThreads() {
  for (int i = 0; i < 4; ++i) std::thread(logForEver).detach();
}

// Experiments with a parameter "count" for the number of items, by default a million. Their result has the measurement
// "Count".
class ExperimentOfMany : public QZExperiment {
 public:
  QZDescription experimentDescription() const override {
    QZDescription description("Makes much of something.");
    description.addParameter(QZNumberParameter("How many.", false), kCount);
    return description;
  }

  bool setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* /*host*/,
                           DiagnosticErrorPtr* /*error*/) override {
    const Value* const count = parameters.find(kCount);
    if (count != nullptr) count_ = toUnsigned(count);
    return true;
  }

  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* /*error*/) override {
    auto result = std::make_unique<QZExperimentResult>();
    result->measurements().set(kCount, Measurement(static_cast<double>(count_), unit()));
    make(count_, *result);
    return result;
  }

 private:
  virtual void make(std::uint64_t count, QZExperimentResult& result) = 0;

  std::uint64_t count_ = 1'000'000;
};

class LogFlood final : public ExperimentOfMany {
  void make(std::uint64_t count, QZExperimentResult& /*result*/) override {
    for (std::uint64_t i = 0; i < count; ++i) logDefault("line %@", i);
  }
};

class ManyMeasurements final : public ExperimentOfMany {
  void make(std::uint64_t count, QZExperimentResult& result) override {
    for (std::uint64_t i = 0; i < count; ++i) {
      result.measurements().set(formatMessage("number %@", i), Measurement(static_cast<double>(i), unit()));
    }
  }
};

// A value with a nesting depth of "count".
class DeepValue final : public ExperimentOfMany {
  void make(std::uint64_t count, QZExperimentResult& result) override {
    Value value("the innermost");
    for (std::uint64_t i = 0; i < count; ++i) value = Array{std::move(value)};
    result.auxiliaryData().set("deep", std::move(value));
  }
};

class ManyResults final : public ExperimentOfMany {
  void make(std::uint64_t /*count*/, QZExperimentResult& /*result*/) override {}
};

// Returns one result, or "Count" results.
class AnalysisOfMany final : public QZAnalysis {
 public:
  explicit AnalysisOfMany(bool findsMany) : findsMany_(findsMany) {}

  QZDescription analysisDescription() const override { return QZDescription("Ensures nothing that could be wrong."); }

  std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& measured,
                                                            DiagnosticErrorPtr* /*error*/) override {
    auto result = std::make_unique<QZAnalysisResult>();
    const double count = findsMany_ ? measured.measurements().find(kCount)->value() : 1;
    for (double i = 0; i < count; ++i) findWithLimit(*result, "Number", i);
    return result;
  }

 private:
  const bool findsMany_;
};

template <class Experiment>
void addDiagnosticOfMany(const std::string& name, bool findsMany = false) {
  QZLab& lab = QZLab::defaultLab();
  lab.addExperimentWithName(name + "Experiment", [] { return std::make_shared<Experiment>(); });
  lab.addAnalysisWithName(name + "Analysis", [findsMany] { return std::make_shared<AnalysisOfMany>(findsMany); });
  lab.addDiagnosticWithName(name, "Makes much of something.", name + "Experiment", name + "Analysis");
}

}  // namespace

void addResults() {
  addDiagnosticOfMany<LogFlood>("LogFlood");
  addDiagnosticOfMany<ManyMeasurements>("ManyMeasurements");
  addDiagnosticOfMany<ManyResults>("ManyResults", true);
  addDiagnosticOfMany<DeepValue>("DeepValue");
  addDiagnostic("OddTexts", {.inRun = logOdd, .measure = measureOdd, .find = findOdd});
  addDiagnostic("NotANumber", {.find = [](QZAnalysisResult& result) {
                  findWithLimit(result, "Answer", std::numeric_limits<double>::quiet_NaN());
                }});
  addDiagnostic("Infinite", {.find = [](QZAnalysisResult& result) {
                  findWithLimit(result, "Answer", std::numeric_limits<double>::infinity());
                }});
  addDiagnostic("EmptyResult", {.measure = [](QZExperimentResult&) {}, .find = [](QZAnalysisResult&) {}});
  addDiagnostic("LogAfterTheEnd", {.inRun = logOnThreads});
  addDiagnostic("LogWhileHanging", {.inRun = logOnThreads, .inDestructor = sleepForEver});
}

}  // namespace quazor::misbehaving
