#include "host/system/user_directory.h"

#include <cstdlib>

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

}  // namespace quazor
