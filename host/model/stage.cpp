#include "host/model/stage.h"

namespace quazor {

namespace {

constexpr std::string_view kFormerAnalyzeName = "analyse";

}  // namespace

std::string_view nameOf(Stage stage) {
  switch (stage) {
    case Stage::kLoad: return "load";
    case Stage::kDescribe: return "describe";
    case Stage::kSetup: return "setup";
    case Stage::kRun: return "run";
    case Stage::kTeardown: return "teardown";
    case Stage::kAnalyze: break;
  }
  return "analyze";
}

std::optional<Stage> stageNamed(std::string_view name) {
  if (name == kFormerAnalyzeName) return Stage::kAnalyze;
  for (const Stage stage : kStages) {
    if (nameOf(stage) == name) return stage;
  }
  return std::nullopt;
}

}  // namespace quazor
