#include "backends/linux/display/display_connectors.h"

#include <algorithm>
#include <fstream>
#include <system_error>
#include <tuple>

namespace quazor {
namespace {

std::string lineOf(const std::filesystem::path& file) {
  std::string line;
  std::getline(std::ifstream(file), line);
  return line;
}

}  // namespace

std::vector<DisplayConnector> displayConnectors(const std::filesystem::path& sysfs) {
  std::vector<DisplayConnector> connectors;
  std::error_code failure;
  // An error while listing ends the list.
  for (std::filesystem::directory_iterator at(sysfs / "class/drm", failure); !failure && at != end(at);
       at.increment(failure)) {
    const std::filesystem::path& path = at->path();
    // The directory also contains the cards ("card0") and the render nodes ("renderD128").
    const std::string name = path.filename();
    const std::size_t dash = name.find('-');
    if (!name.starts_with("card") || dash == std::string::npos) continue;
    connectors.push_back({name.substr(0, dash), name.substr(dash + 1), lineOf(path / "status"),
                          lineOf(path / "enabled"), lineOf(path / "dpms")});
  }
  std::ranges::sort(connectors, {}, [](const DisplayConnector& one) { return std::tie(one.card, one.name); });
  return connectors;
}

}  // namespace quazor
