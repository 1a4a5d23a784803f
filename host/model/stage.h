// The stages of a diagnostic's run.
#pragma once

#include <optional>
#include <string_view>

namespace quazor {

// In the order in which they take place. kLoad is the loading of plug-ins, kDescribe the making of the experiment and
// the asking for its description, kAnalyze all that is done with the analysis.
enum class Stage { kLoad, kDescribe, kSetup, kRun, kTeardown, kAnalyze };

inline constexpr Stage kStages[] = {Stage::kLoad, Stage::kDescribe, Stage::kSetup,
                                    Stage::kRun,  Stage::kTeardown, Stage::kAnalyze};

std::string_view nameOf(Stage stage);  // "load", "describe", "setup", "run", "teardown", "analyze"

// The stage of that name; also kAnalyze for "analyse", its name in earlier records and command lines.
std::optional<Stage> stageNamed(std::string_view name);

}  // namespace quazor
