#include "host/cli/installation.h"

#include <algorithm>
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

std::vector<std::filesystem::path> Installation::allPlugins() const {
  std::vector<std::filesystem::path> plugins;
  std::error_code ignored;
  for (const auto& entry : std::filesystem::directory_iterator(defaultPlugin().parent_path(), ignored)) {
    if (entry.path().extension() == ".so" && !entry.path().filename().string().starts_with("lib")) {
      plugins.push_back(entry.path());
    }
  }
  std::sort(plugins.begin(), plugins.end());
  return plugins;
}

std::filesystem::path Installation::defaultProfile() const { return data_ / "profiles" / "default.json"; }

std::filesystem::path Installation::profile(const std::filesystem::path& name) const {
  return dataFile("profiles", name);
}

std::filesystem::path Installation::defaultScenario() const { return data_ / "scenarios" / "healthy.json"; }

std::filesystem::path Installation::explanations() const { return data_ / "explanations"; }

std::filesystem::path Installation::scenario(const std::filesystem::path& name) const {
  return dataFile("scenarios", name);
}

std::vector<std::string> Installation::scenarioNames() const { return dataNames("scenarios"); }

std::filesystem::path Installation::binding(const std::filesystem::path& name) const {
  return dataFile("bindings", name);
}

std::vector<std::string> Installation::bindingNames() const { return dataNames("bindings"); }

std::filesystem::path Installation::dataFile(const char* folder, const std::filesystem::path& name) const {
  if (isThere(name) || name.is_absolute()) return name;
  std::filesystem::path installed = data_ / folder / name;
  installed += ".json";
  return isThere(installed) ? installed : name;
}

std::vector<std::string> Installation::dataNames(const char* folder) const {
  const std::filesystem::path directory = data_ / folder;
  std::vector<std::string> names;
  std::error_code ignored;
  for (const auto& entry : std::filesystem::recursive_directory_iterator(directory, ignored)) {
    std::filesystem::path name = std::filesystem::relative(entry.path(), directory, ignored);
    if (name.extension() != ".json" || name.stem().extension() == ".schema") continue;
    names.push_back(name.replace_extension().string());
  }
  std::sort(names.begin(), names.end());
  return names;
}

}  // namespace quazor
