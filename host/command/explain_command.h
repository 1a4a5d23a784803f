// `quazor explain`: what an error or a name means, likely causes, and what to do next.
#pragma once

#include <filesystem>
#include <ostream>
#include <string>
#include <vector>

namespace quazor {

// Writes the explanations of what `asked` names (see findExplanations), each once, in the order in which they are asked
// for; all of them, as text only their titles, when nothing is asked for. `directory` is where the explanations are.
// As text for people, in lines of at most 80 columns, or as one JSON document (docs/json_output.md). Throws a
// CommandError before anything is written: kUsage for what has no explanation, kCannotRead for explanations that cannot
// be read.
void explain(const std::vector<std::string>& asked, const std::filesystem::path& directory, bool json,
             std::ostream& out);

}  // namespace quazor
