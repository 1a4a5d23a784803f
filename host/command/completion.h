// Shell completion of command lines.
#pragma once

#include "host/cli/installation.h"

#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// The hidden command that the completion scripts use to request candidates: quazor __complete WORD...
inline constexpr std::string_view kCompletionRequest = "__complete";

// The completion script for the shell ("bash" or "zsh").
std::string completionScript(std::string_view shell);

// The candidates for the last word, which may be empty; none where any file name is allowed. `words` excludes the
// program's name. Candidates that cannot be determined because a plug-in cannot be loaded are omitted.
std::vector<std::string> completionsOf(const std::vector<std::string>& words, const Installation& installation);

}  // namespace quazor
