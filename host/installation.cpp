#include "host/installation.h"

#include <system_error>

namespace quazor {

namespace {

constexpr const char* kPluginFile = "camera_sensor_diagnostics.so";

bool isThere(const std::filesystem::path& path) {
  std::error_code ignored;
  return std::filesystem::exists(path, ignored);
}

}  // namespace

Installation::Installation(const std::filesystem::path& program)
    : programDirectory_(program.parent_path()),
      plugins_(programDirectory_.parent_path() / QUAZOR_PLUGIN_DIRECTORY),
      data_(programDirectory_.parent_path() / QUAZOR_DATA_DIRECTORY) {}

Installation Installation::ofThisProgram() { return Installation(std::filesystem::read_symlink("/proc/self/exe")); }

std::filesystem::path Installation::defaultPlugin() const {
  const std::filesystem::path installed = plugins_ / kPluginFile;
  const std::filesystem::path beside = programDirectory_ / kPluginFile;
  return !isThere(installed) && isThere(beside) ? beside : installed;
}

std::filesystem::path Installation::defaultProfile() const { return data_ / "profiles" / "default.json"; }

std::filesystem::path Installation::defaultScenario() const { return data_ / "scenarios" / "healthy.json"; }

std::filesystem::path Installation::scenario(const std::filesystem::path& name) const {
  if (isThere(name) || name.is_absolute()) return name;
  std::filesystem::path installed = data_ / "scenarios" / name;
  installed += ".json";
  return isThere(installed) ? installed : name;
}

}  // namespace quazor
