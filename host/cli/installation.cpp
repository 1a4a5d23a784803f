#include "host/cli/installation.h"

#include "base/text/nearest_name.h"
#include "host/error/exit_code.h"
#include "host/plugin/shared_object.h"
#include "host/system/user_directory.h"

#include <algorithm>
#include <cstdlib>
#include <map>
#include <set>
#include <system_error>
#include <utility>

namespace quazor {

namespace {

namespace fs = std::filesystem;

constexpr const char* kShippedPlugin = "camera_sensor_diagnostics.so";

bool isThere(const fs::path& path) {
  std::error_code ignored;
  return fs::exists(path, ignored);
}

// True for all but folders: what a user gives may also be a pipe.
bool isFile(const fs::path& path) {
  std::error_code ignored;
  return isThere(path) && !fs::is_directory(path, ignored);
}

std::vector<fs::path> foldersIn(const std::string& path) {
  std::vector<fs::path> folders;
  if (path.empty()) return folders;
  for (std::size_t first = 0; first <= path.size();) {
    const std::size_t last = std::min(path.find(':', first), path.size());
    const std::string folder = path.substr(first, last - first);
    if (!folder.starts_with('/')) {
      throw CommandError(
          ExitCode::kUsage,
          std::string(kPluginPathVariable) + " '" + path +
              "': " + (folder.empty() ? std::string("an entry is empty") : "the entry '" + folder + "' is relative") +
              "; it lists absolute folders, separated by colons");
    }
    if (!isThere(folder)) {
      throw CommandError(ExitCode::kCannotRead,
                         std::string(kPluginPathVariable) + ": the folder '" + folder + "' does not exist");
    }
    folders.emplace_back(folder);
    first = last + 1;
  }
  return folders;
}

// The plug-ins in one folder, sorted by name.
std::vector<fs::path> pluginsIn(const fs::path& folder) {
  std::vector<fs::path> plugins;
  std::error_code error;
  std::error_code ignored;
  for (fs::directory_iterator at(folder, error); !error && at != fs::directory_iterator(); at.increment(error)) {
    const fs::path& file = at->path();
    const bool isNamedSo = file.extension() == ".so" && !file.filename().string().starts_with("lib");
    if (isNamedSo && !at->is_directory(ignored)) plugins.push_back(file);
  }
  if (error && error != std::errc::no_such_file_or_directory) {
    throw CommandError(ExitCode::kCannotRead,
                       "the folder of plug-ins '" + folder.string() + "' cannot be read: " + error.message());
  }
  std::sort(plugins.begin(), plugins.end());
  return plugins;
}

}  // namespace

UserFolders UserFolders::ofEnvironment() {
  const char* const path = std::getenv(kPluginPathVariable);
  return {userDirectory("XDG_DATA_HOME", ".local/share"), path == nullptr ? "" : path};
}

Installation::Installation(const fs::path& program, UserFolders user)
    : programDirectory_(program.parent_path()),
      plugins_(programDirectory_.parent_path() / QUAZOR_PLUGIN_DIRECTORY),
      data_(programDirectory_.parent_path() / QUAZOR_DATA_DIRECTORY),
      user_(std::move(user)) {}

Installation Installation::ofThisProgram() {
  return Installation(fs::read_symlink("/proc/self/exe"), UserFolders::ofEnvironment());
}

fs::path Installation::shippedPlugin() const {
  const fs::path installed = plugins_ / kShippedPlugin;
  const fs::path beside = programDirectory_ / kShippedPlugin;
  return !isThere(installed) && isThere(beside) ? beside : installed;
}

std::vector<fs::path> Installation::shippedPlugins() const { return pluginsIn(shippedPlugin().parent_path()); }

std::vector<fs::path> Installation::pluginFolders() const {
  std::vector<fs::path> folders = foldersIn(user_.pluginPath);
  if (!user_.data.empty()) folders.push_back(user_.data / "plugins");
  folders.push_back(shippedPlugin().parent_path());
  return folders;
}

std::vector<fs::path> Installation::allPlugins() const {
  std::set<fs::path> names;
  std::vector<fs::path> all;
  for (const fs::path& folder : pluginFolders()) {
    std::vector<fs::path> plugins = pluginsIn(folder);
    std::erase_if(plugins, [&names](const fs::path& one) { return !names.insert(one.filename()).second; });
    all.insert(all.begin(), plugins.begin(), plugins.end());
  }
  return all;
}

std::vector<HiddenPlugin> Installation::hiddenPlugins() const {
  std::map<fs::path, fs::path> loaded;  // by file name
  std::vector<HiddenPlugin> hidden;
  for (const fs::path& folder : pluginFolders()) {
    for (const fs::path& one : pluginsIn(folder)) {
      const auto [by, isFirst] = loaded.emplace(one.filename(), one);
      std::error_code ignored;
      if (!isFirst && !fs::equivalent(by->second, one, ignored)) hidden.push_back({one, by->second});
    }
  }
  return hidden;
}

std::vector<fs::path> Installation::defaultPlugins() const {
  std::vector<fs::path> plugins = allPlugins();
  std::erase_if(plugins, isLoadedOnlyWhenNamed);
  return plugins;
}

fs::path Installation::plugin(const fs::path& name) const {
  if (name.has_parent_path() || isFile(name)) return name;
  std::vector<std::string> known;
  for (const fs::path& one : allPlugins()) {
    if (one.filename() == name || one.stem() == name) return one;
    known.push_back(one.stem().string());
  }
  throw CommandError(ExitCode::kCannotRead, "the plug-in '" + name.string() +
                                                "' does not exist, neither as a file nor in a folder of plug-ins" +
                                                didYouMeanOf(name.stem().string(), "the plug-ins there", known));
}

fs::path Installation::pluginTemplate() const { return data_ / "plugin_template"; }

fs::path Installation::defaultProfile() const {
  const fs::path named = namedProfile("default");
  return named.empty() ? data_ / "profiles" / "default.json" : named;
}

fs::path Installation::profile(const fs::path& name) const { return dataFile("profiles", name); }

fs::path Installation::namedProfile(const std::string& name) const { return namedFile("profiles", name); }

std::function<fs::path(const std::string& name, const std::vector<fs::path>& others)> Installation::profileSource()
    const {
  return [this](const std::string& name, const std::vector<fs::path>& others) -> fs::path {
    for (const fs::path& folder : dataFolders("profiles")) {
      fs::path file = folder / (name + ".json");
      const bool isOther = std::any_of(others.begin(), others.end(), [&file](const fs::path& other) {
        std::error_code ignored;
        return fs::equivalent(file, other, ignored);
      });
      if (isFile(file) && !isOther) return file;
    }
    return {};
  };
}

bool Installation::isInstalledProfile(const fs::path& file) const {
  std::error_code ignored;
  return fs::equivalent(file.parent_path(), data_ / "profiles", ignored);
}

std::vector<std::string> Installation::profileNames() const { return dataNames("profiles"); }

fs::path Installation::defaultScenario() const { return data_ / "scenarios" / "healthy.json"; }

std::vector<fs::path> Installation::explanations() const {
  std::vector<fs::path> folders = dataFolders("explanations");
  if (folders.size() > 1 && !isThere(folders.front())) folders.erase(folders.begin());
  return folders;
}

fs::path Installation::scenario(const fs::path& name) const { return dataFile("scenarios", name); }

std::function<fs::path(const fs::path& name)> Installation::scenarioSource() const {
  return [this](const fs::path& name) { return namedFile("scenarios", name); };
}

std::vector<std::string> Installation::scenarioNames() const { return dataNames("scenarios"); }

fs::path Installation::binding(const fs::path& name) const { return dataFile("bindings", name); }

std::vector<std::string> Installation::bindingNames() const { return dataNames("bindings"); }

std::vector<fs::path> Installation::dataFolders(const char* kind) const {
  std::vector<fs::path> folders;
  if (!user_.data.empty()) folders.push_back(user_.data / kind);
  folders.push_back(data_ / kind);
  return folders;
}

// Empty if there is none.
fs::path Installation::namedFile(const char* kind, const fs::path& name) const {
  for (const fs::path& folder : dataFolders(kind)) {
    fs::path file = folder / name;
    file += ".json";
    if (isFile(file)) return file;
  }
  return {};
}

fs::path Installation::dataFile(const char* kind, const fs::path& name) const {
  if (isFile(name) || name.is_absolute()) return name;
  fs::path named = namedFile(kind, name);
  if (!named.empty()) return named;
  if (isThere(name)) return name;  // a folder, as its reader will say
  const fs::path bare = name.extension() == ".json" ? fs::path(name).replace_extension() : name;
  const std::string suggestion = didYouMeanPath(bare.string(), dataNames(kind));
  if (suggestion.empty()) return name;
  throw CommandError(ExitCode::kCannotRead, name.string() + ": the file does not exist" + suggestion);
}

std::vector<std::string> Installation::dataNames(const char* kind) const {
  std::set<std::string> names;
  std::error_code ignored;
  for (const fs::path& folder : dataFolders(kind)) {
    for (const auto& entry : fs::recursive_directory_iterator(folder, ignored)) {
      fs::path name = fs::relative(entry.path(), folder, ignored);
      if (!isFile(entry.path()) || name.extension() != ".json" || name.stem().extension() == ".schema") continue;
      names.insert(name.replace_extension().string());
    }
  }
  return {names.begin(), names.end()};
}

}  // namespace quazor
