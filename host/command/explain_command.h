// `quazor explain`: the meaning of an error or a name, its likely causes and the next steps.
#pragma once

#include <filesystem>
#include <ostream>
#include <string>
#include <vector>

namespace quazor {

// Prints the explanations that `asked` selects (see findExplanations), each once, in the order of `asked`. If `asked`
// is empty, prints all; as text only their titles. `directories` contain the explanations. The output is text of at
// most 80 columns or one JSON document (docs/json_output.md). Before any output, throws a CommandError: kUsage if
// something has no explanation, kCannotRead if the explanations cannot be read.
void explain(const std::vector<std::string>& asked, const std::vector<std::filesystem::path>& directories, bool json,
             std::ostream& out);

}  // namespace quazor
