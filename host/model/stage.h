// The stages of a diagnostic's run.
#pragma once

#include <optional>
#include <string_view>

namespace quazor {

// In execution order. kLoad loads the plug-ins, kDescribe creates the experiment and asks for its description, and
// kAnalyze includes all operations of the analysis.
enum class Stage { kLoad, kDescribe, kSetup, kRun, kTeardown, kAnalyze };

inline constexpr Stage kStages[] = {Stage::kLoad, Stage::kDescribe, Stage::kSetup,
                                    Stage::kRun,  Stage::kTeardown, Stage::kAnalyze};

std::string_view nameOf(Stage stage);  // "load", "describe", "setup", "run", "teardown", "analyze"

// The stage with that name, or nothing. "analyse" is kAnalyze: earlier records and command lines have it.
std::optional<Stage> stageNamed(std::string_view name);

}  // namespace quazor
