// A plug-in with one diagnostic that passes and reports its environment, which must not depend on earlier runs.
#include "contract/diagnostic_contract.h"
#include "contract/lab.h"
#include "contract/log_channel.h"

#include <dirent.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>
#include <utility>

namespace quazor::misbehaving {

namespace {

// The lines of proc(5), /proc/self/status, that begin with Sig or Threads, except for pending signals.
std::string processStatus() {
  std::ifstream file("/proc/self/status");
  std::string text;
  for (std::string line; std::getline(file, line);) {
    const bool wanted = line.starts_with("SigBlk") || line.starts_with("SigIgn") || line.starts_with("SigCgt");
    if (wanted || line.starts_with("Threads")) text += line + " ";
  }
  return text;
}

std::string openDescriptors() {
  std::string text;
  for (int descriptor = 0; descriptor < 1024; ++descriptor) {
    struct stat status {};
    if (::fstat(descriptor, &status) == 0) text += std::to_string(descriptor) + " ";
  }
  return text;
}

std::uint64_t limitOf(int resource) {
  rlimit limit{};
  ::getrlimit(static_cast<__rlimit_resource>(resource), &limit);
  return limit.rlim_cur;
}

std::uint64_t currentUmask() {
  const mode_t mask = ::umask(0);
  ::umask(mask);
  return mask;
}

class Experiment final : public QZExperiment {
 public:
  QZDescription experimentDescription() const override { return QZDescription("Tells its surroundings."); }

  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* /*error*/) override {
    logDefault("the well-behaved one runs");
    auto result = std::make_unique<QZExperimentResult>();
    result->measurements().set("Answer", Measurement(42, QZDimensionlessUnit::events()));
    Dictionary& told = result->auxiliaryData();
    told.set("directory", std::filesystem::current_path().string());
    told.set("umask", currentUmask());
    told.set("memory", limitOf(RLIMIT_AS));
    told.set("stack", limitOf(RLIMIT_STACK));
    told.set("descriptors", openDescriptors());
    told.set("status", processStatus());
    told.set("leads its group", ::getpgrp() == ::getpid());
    told.set("misbehaved", std::getenv("MISBEHAVED") != nullptr);
    return result;
  }
};

class Analysis final : public QZAnalysis {
 public:
  QZDescription analysisDescription() const override { return QZDescription("Passes."); }

  std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& measured,
                                                            DiagnosticErrorPtr* /*error*/) override {
    QZMeasuredResult found("Answer", *measured.measurements().find("Answer"));
    QZLimit limit("AnswerLimit");
    limit.setLowerBound(std::make_shared<QZBound>(found.measurement(), false));
    found.setLimit(std::move(limit));
    auto result = std::make_unique<QZAnalysisResult>();
    result->measuredResults().push_back(std::move(found));
    return result;
  }
};

[[gnu::constructor]] void registerAll() {
  QZLab& lab = QZLab::defaultLab();
  lab.addExperimentWithName("WellBehavedExperiment", [] { return std::make_shared<Experiment>(); });
  lab.addAnalysisWithName("WellBehavedAnalysis", [] { return std::make_shared<Analysis>(); });
  lab.addDiagnosticWithName("WellBehaved", "Tells its surroundings.", "WellBehavedExperiment", "WellBehavedAnalysis");
}

}  // namespace

}  // namespace quazor::misbehaving
