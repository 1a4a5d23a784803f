// A plug-in whose diagnostics attack. The environment variable QUAZOR_ATTACKS names them: STAGE.WAY, separated by
// spaces. A file of the name load-WAY.so attacks while it is loaded.
#include "contract/diagnostic_contract.h"
#include "contract/diagnostic_error.h"
#include "contract/lab.h"
#include "contract/log_channel.h"
#include "tests/attacks/results.h"
#include "tests/attacks/ways.h"

#include <dlfcn.h>
#include <fcntl.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <memory>
#include <sstream>
#include <string>
#include <string_view>
#include <thread>

namespace quazor::attacks {

namespace {

void perform(std::string_view name) {
  if (name.starts_with("signal")) {
    endBySignal(std::atoi(name.substr(6).data()));
    return;
  }
  for (const auto& ways : {endings(), exceptions(), intrusions(), disturbances()}) {
    for (const Way& way : ways) {
      if (way.name == name) return way.act();
    }
  }
  ::_exit(99);  // the tests expect no such end
}

// One attack: what to do, and when.
struct Attack {
  std::string stage;
  std::string way;

  std::string name() const { return stage + "." + way; }
  void at(std::string_view now) const {
    if (now == stage) perform(way);
  }
  // The stage "SURFACE-text" puts the odd text WAY on the surface.
  std::string surface() const { return stage.ends_with("-text") ? stage.substr(0, stage.size() - 5) : ""; }
};

class Experiment final : public QZExperiment, public QZTeardown {
 public:
  explicit Experiment(Attack attack) : attack_(std::move(attack)) { attack_.at("factory"); }
  ~Experiment() override {
    if (hasRun_) attack_.at("destructor");
  }

  QZDescription experimentDescription() const override {
    attack_.at("describe");
    // The second process is that of the run.
    if (attack_.stage == "describeAgain" &&
        ::open(stateFile(attack_.name()).c_str(), O_CREAT | O_EXCL | O_CLOEXEC, 0600) < 0) {
      perform(attack_.way);
    }
    return QZDescription("Attacks.");
  }

  bool setupWithParameters(const Dictionary& /*parameters*/, QZDiagnosticHost* /*host*/,
                           DiagnosticErrorPtr* /*error*/) override {
    attack_.at("setup");
    return true;
  }

  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* error) override {
    hasRun_ = true;
    attack_.at("run");
    if (attack_.stage == "thread") std::thread([this] { perform(attack_.way); }).join();
    if (attack_.stage == "error") {
      *error = errorToGive(attack_.way);
      return nullptr;
    }
    if (attack_.surface() == "log") logDefault("%@", oddText(attack_.way));
    if (attack_.surface() == "error") {
      *error = errorWithMessage(oddText(attack_.way), 1, oddText(attack_.way), nullptr);
      return nullptr;
    }
    auto result = std::make_unique<QZExperimentResult>();
    result->measurements().set("Answer", Measurement(42, QZDimensionlessUnit::events()));
    measureText(attack_.surface(), attack_.way, *result);
    return result;
  }

  bool teardown(DiagnosticErrorPtr* /*error*/) override {
    attack_.at("teardown");
    return true;
  }

 private:
  const Attack attack_;
  bool hasRun_ = false;
};

class Analysis final : public QZAnalysis {
 public:
  explicit Analysis(Attack attack) : attack_(std::move(attack)) { attack_.at("analysisFactory"); }
  ~Analysis() override {
    if (hasAnalyzed_) attack_.at("analysisDestructor");
  }

  QZDescription analysisDescription() const override { return QZDescription("Attacks."); }

  std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& /*measured*/,
                                                            DiagnosticErrorPtr* /*error*/) override {
    hasAnalyzed_ = true;
    attack_.at("analyze");
    auto result = std::make_unique<QZAnalysisResult>();
    if (attack_.stage == "find") {
      findNumber(attack_.way, *result);
    } else {
      findText(attack_.surface(), attack_.way, *result);
    }
    return result;
  }

 private:
  const Attack attack_;
  bool hasAnalyzed_ = false;
};

void add(const Attack& attack) {
  QZLab& lab = QZLab::defaultLab();
  std::string name = attack.name();
  std::string summary = "Attacks.";
  if (attack.stage == "name-text") name = "name:" + oddText(attack.way);
  if (attack.stage == "summary-text") summary = oddText(attack.way);
  lab.addExperimentWithName(name + "Experiment", [attack] { return std::make_shared<Experiment>(attack); });
  lab.addAnalysisWithName(name + "Analysis", [attack] { return std::make_shared<Analysis>(attack); });
  lab.addDiagnosticWithName(name, summary, name + "Experiment", name + "Analysis");
}

[[gnu::constructor]] void registerAll() {
  Dl_info self{};
  static const char kHere = 0;
  if (::dladdr(&kHere, &self) != 0) {
    const std::string file = std::filesystem::path(self.dli_fname).stem();
    if (file.starts_with("load-")) {
      add({"load", file.substr(5)});
      perform(file.substr(5));
      return;
    }
  }
  const char* const attacks = std::getenv("QUAZOR_ATTACKS");
  std::istringstream words(attacks == nullptr ? "" : attacks);
  for (std::string word; words >> word;) {
    const std::size_t dot = word.find('.');
    add({word.substr(0, dot), word.substr(dot + 1)});
  }
}

}  // namespace

}  // namespace quazor::attacks
