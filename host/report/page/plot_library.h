// The library that draws plots which can be zoomed: dygraphs, as Debian's package libjs-dygraphs installs it. A page
// has it inside, so that it needs no network.
#pragma once

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

struct PlotLibrary {
  std::string script;
  std::string style;
  std::string licence;  // its text, which has to go with every copy
};

// The library in `javascript/dygraphs` of the first of the folders that has it, with the licence in
// `doc/libjs-dygraphs/copyright`; nothing if none has both. What could not stand in a page (an end of a script or of a
// style) counts as none.
std::optional<PlotLibrary> plotLibraryIn(const std::vector<std::filesystem::path>& dataFolders);

}  // namespace quazor
