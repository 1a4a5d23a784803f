// Where the program finds the plug-in, scenarios and profile it was installed with.
#pragma once

#include <filesystem>
#include <string>
#include <vector>

namespace quazor {

// An installation, found relative to the program: PREFIX/bin/quazor. A build tree has the same layout.
// Thread: one at a time; any number may read while none writes.
class Installation {
 public:
  explicit Installation(const std::filesystem::path& program);

  // The installation of the running program.
  static Installation ofThisProgram();

  // The plug-in that is loaded by default: the installed one or, if there is none, the one next to the program.
  std::filesystem::path defaultPlugin() const;
  // All plug-ins in the directory of defaultPlugin(), sorted by name.
  std::vector<std::filesystem::path> allPlugins() const;
  std::filesystem::path defaultProfile() const;
  // Resolves the argument of `--profile` like scenario(), among the installed profiles.
  std::filesystem::path profile(const std::filesystem::path& name) const;
  std::filesystem::path defaultScenario() const;
  std::filesystem::path explanations() const;  // the directory of the explanations
  // Resolves the argument of `--phone`: returns `name` if that file exists, else the installed scenario of that name
  // (for example "camera_sync/start_refused") if there is one, else `name` unchanged.
  std::filesystem::path scenario(const std::filesystem::path& name) const;
  // The names of all installed scenarios, sorted, as scenario() accepts them.
  std::vector<std::string> scenarioNames() const;
  // Resolves the NAME of `--phone linux:NAME` in the same way, among the installed bindings.
  std::filesystem::path binding(const std::filesystem::path& name) const;
  std::vector<std::string> bindingNames() const;

 private:
  std::filesystem::path dataFile(const char* folder, const std::filesystem::path& name) const;
  std::vector<std::string> dataNames(const char* folder) const;

  std::filesystem::path programDirectory_;
  std::filesystem::path plugins_;
  std::filesystem::path data_;
};

}  // namespace quazor
