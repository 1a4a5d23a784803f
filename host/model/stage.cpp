#include "host/model/stage.h"

namespace quazor {

std::string_view nameOf(Stage stage) {
  switch (stage) {
    case Stage::kLoad: return "load";
    case Stage::kDescribe: return "describe";
    case Stage::kSetup: return "setup";
    case Stage::kRun: return "run";
    case Stage::kTeardown: return "teardown";
    case Stage::kAnalyse: break;
  }
  return "analyse";
}

std::optional<Stage> stageNamed(std::string_view name) {
  for (const Stage stage : kStages) {
    if (nameOf(stage) == name) return stage;
  }
  return std::nullopt;
}

}  // namespace quazor
