// Completion of command lines in shells.
#pragma once

#include "host/cli/installation.h"

#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// A shell's word with which the shells' scripts ask for candidates: quazor __complete WORD...
inline constexpr std::string_view kCompletionRequest = "__complete";

// The script that teaches the shell ("bash" or "zsh") to complete quazor's command lines.
std::string completionScript(std::string_view shell);

// What the last of the words, which may be empty, can be completed to; none where any file may stand. `words` are
// without the program's name. What cannot be found out, because a plug-in cannot be loaded, is left out.
std::vector<std::string> completionsOf(const std::vector<std::string>& words, const Installation& installation);

}  // namespace quazor
