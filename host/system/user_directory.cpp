#include "host/system/user_directory.h"

#include <cstdlib>
#include <sstream>
#include <string>

namespace quazor {

namespace {

std::filesystem::path directoryIn(const char* variable) {
  const char* const value = std::getenv(variable);
  return value != nullptr && *value == '/' ? value : "";
}

}  // namespace

std::filesystem::path userDirectory(const char* variable, const char* below) {
  std::filesystem::path directory = directoryIn(variable);
  if (directory.empty()) {
    directory = directoryIn("HOME");
    if (directory.empty()) return {};
    directory /= below;
  }
  return directory / "quazor";
}

std::vector<std::filesystem::path> sharedDataDirectories() {
  const char* const value = std::getenv("XDG_DATA_DIRS");
  std::istringstream list(value != nullptr && *value != '\0' ? value : "/usr/local/share:/usr/share");
  std::vector<std::filesystem::path> directories;
  for (std::string one; std::getline(list, one, ':');) {
    if (one.starts_with('/')) directories.emplace_back(one);
  }
  return directories;
}

}  // namespace quazor
