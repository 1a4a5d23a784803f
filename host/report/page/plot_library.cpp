#include "host/report/page/plot_library.h"

#include "base/text/letter_case.h"

#include <fstream>
#include <iterator>
#include <system_error>

namespace quazor {

namespace {

std::string contentOf(const std::filesystem::path& path) {
  std::error_code ignored;
  if (!std::filesystem::is_regular_file(path, ignored)) return {};
  std::ifstream file(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), {}};
}

// A browser would end a script or a style there.
bool canBeEmbedded(const std::string& text) {
  const std::string small = withSmallLetters(text);
  const auto has = [&small](const char* part) { return small.find(part) != std::string::npos; };
  return !text.empty() && !has("</script") && !has("</style") && !has("<!--");
}

}  // namespace

std::optional<PlotLibrary> plotLibraryIn(const std::vector<std::filesystem::path>& dataFolders) {
  for (const std::filesystem::path& folder : dataFolders) {
    const std::filesystem::path place = folder / "javascript" / "dygraphs";
    PlotLibrary library{contentOf(place / "dygraph.min.js"), contentOf(place / "dygraph.min.css"),
                        contentOf(folder / "doc" / "libjs-dygraphs" / "copyright")};
    if (canBeEmbedded(library.script) && canBeEmbedded(library.style) && !library.licence.empty()) return library;
  }
  return std::nullopt;
}

}  // namespace quazor
