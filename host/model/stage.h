// The stages of a diagnostic's run.
#pragma once

#include <optional>
#include <string_view>

namespace quazor {

// In the order in which they take place. kLoad is the loading of plug-ins, kDescribe the making of the experiment and
// the asking for its description, kAnalyse all that is done with the analysis.
enum class Stage { kLoad, kDescribe, kSetup, kRun, kTeardown, kAnalyse };

inline constexpr Stage kStages[] = {Stage::kLoad, Stage::kDescribe, Stage::kSetup,
                                    Stage::kRun,  Stage::kTeardown, Stage::kAnalyse};

std::string_view nameOf(Stage stage);  // "load", "describe", "setup", "run", "teardown", "analyse"

// The stage of that name.
std::optional<Stage> stageNamed(std::string_view name);

}  // namespace quazor
