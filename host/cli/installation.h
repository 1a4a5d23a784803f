// Where the program finds plug-ins, scenarios, bindings, profiles and explanations.
#pragma once

#include <filesystem>
#include <functional>
#include <string>
#include <vector>

namespace quazor {

// What a user adds to an installation.
struct UserFolders {
  std::filesystem::path data;  // the user's own plug-ins, scenarios and so on; empty: none
  std::string pluginPath;      // more folders with plug-ins, separated by colons; empty: none

  // $XDG_DATA_HOME/quazor and QUAZOR_PLUGIN_PATH.
  static UserFolders ofEnvironment();
};

// The environment variable with more folders of plug-ins.
inline constexpr const char* kPluginPathVariable = "QUAZOR_PLUGIN_PATH";

// A plug-in that is not loaded because another one in an earlier folder has its file name.
struct HiddenPlugin {
  std::filesystem::path file;
  std::filesystem::path by;
};

// An installation, found relative to the program: PREFIX/bin/quazor. A build tree has the same layout.
//
// Plug-ins are searched in the folders of QUAZOR_PLUGIN_PATH, in the user's folder and in the installed one, in this
// order, and data in the user's folder and in the installed one. A file hides one of the same name in a later folder; a
// folder hides nothing, wherever it is.
// Folders that do not exist are skipped, except those that QUAZOR_PLUGIN_PATH names.
//
// Thread: one at a time; any number may read while none writes.
class Installation {
 public:
  explicit Installation(const std::filesystem::path& program, UserFolders user = {});

  // The installation of the running program.
  static Installation ofThisProgram();

  // The shipped plug-in: the installed one or, if there is none, the one next to the program.
  std::filesystem::path shippedPlugin() const;
  // The plug-ins beside that one, sorted by name.
  std::vector<std::filesystem::path> shippedPlugins() const;
  // All plug-ins in the folders above: the installed ones first, those of a folder sorted by name. Throws a
  // CommandError for a folder that cannot be read (kCannotRead), and for an entry of QUAZOR_PLUGIN_PATH that is empty
  // or relative (kUsage).
  std::vector<std::filesystem::path> allPlugins() const;
  // Those that allPlugins() leaves out.
  std::vector<HiddenPlugin> hiddenPlugins() const;
  // Those that are loaded if the user names none. Throws like allPlugins().
  std::vector<std::filesystem::path> defaultPlugins() const;
  // Resolves the argument of `--plugin`: returns `name` if it is a path or a file, else the plug-in NAME or NAME.so in
  // the folders above. Throws a CommandError (kCannotRead), which lists what there is, if there is none; and like
  // allPlugins().
  std::filesystem::path plugin(const std::filesystem::path& name) const;
  // The folder of the project that `quazor new` copies.
  std::filesystem::path pluginTemplate() const;
  // The profile `default` in the folders above; that of the installation if there is none, to be told that it is
  // missing.
  std::filesystem::path defaultProfile() const;
  // Resolves the argument of `--profile` or `--parameters` like scenario(), among the profiles.
  std::filesystem::path profile(const std::filesystem::path& name) const;
  // The profile of that name in the folders above; empty if there is none.
  std::filesystem::path namedProfile(const std::string& name) const;
  // The profile of that name in the folders above, but none of those others, so that a profile can be based on the
  // installed one that it hides; empty if there is none. The function refers to this object.
  std::function<std::filesystem::path(const std::string& name, const std::vector<std::filesystem::path>& others)>
  profileSource() const;
  std::vector<std::string> profileNames() const;
  // True for a profile in the folder of the installation, which serves every user of the machine.
  bool isInstalledProfile(const std::filesystem::path& file) const;
  std::filesystem::path defaultScenario() const;
  // The folders with explanations, those of the user first.
  std::vector<std::filesystem::path> explanations() const;
  // Resolves the argument of `--phone`: returns `name` if that file, which is no folder, exists, else the scenario of
  // that name (for example "camera_sync/start_refused_on_first") in the folders above if there is one, else `name`
  // unchanged. Throws a CommandError (kCannotRead) instead, which suggests them, if there are scenarios with similar
  // names.
  std::filesystem::path scenario(const std::filesystem::path& name) const;
  // The file of a scenario that another one is based on by its name: in the folders above; empty if there is none. The
  // function refers to this object.
  std::function<std::filesystem::path(const std::filesystem::path& name)> scenarioSource() const;
  // The names of all scenarios in these folders, sorted, as scenario() accepts them.
  std::vector<std::string> scenarioNames() const;
  // Resolves the NAME of `--phone linux:NAME` in the same way, among the bindings.
  std::filesystem::path binding(const std::filesystem::path& name) const;
  std::vector<std::string> bindingNames() const;

 private:
  std::vector<std::filesystem::path> pluginFolders() const;
  std::vector<std::filesystem::path> dataFolders(const char* kind) const;
  std::filesystem::path namedFile(const char* kind, const std::filesystem::path& name) const;
  std::filesystem::path dataFile(const char* kind, const std::filesystem::path& name) const;
  std::vector<std::string> dataNames(const char* kind) const;

  std::filesystem::path programDirectory_;
  std::filesystem::path plugins_;
  std::filesystem::path data_;
  UserFolders user_;
};

}  // namespace quazor
