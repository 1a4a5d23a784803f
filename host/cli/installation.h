// Where the program finds the plug-in, scenarios and profile it was installed with.
#pragma once

#include <filesystem>
#include <string>
#include <vector>

namespace quazor {

// An installation, found from the program's own place: PREFIX/bin/quazor. A build tree has the same layout.
// Thread: one at a time; any number may read while none writes.
class Installation {
 public:
  explicit Installation(const std::filesystem::path& program);

  // The installation of the running program.
  static Installation ofThisProgram();

  // The plug-in that is loaded when none is named: the installed one or, where there is none, that beside the program.
  std::filesystem::path defaultPlugin() const;
  // All plug-ins in the place of the one above, by name.
  std::vector<std::filesystem::path> allPlugins() const;
  std::filesystem::path defaultProfile() const;
  std::filesystem::path defaultScenario() const;
  std::filesystem::path explanations() const;  // the directory of the explanations
  // The file that `--phone` means by `name`: a file of that path if there is one, else the installed scenario of that
  // name ("camera_sync/start_refused") if there is one, else the path as it stands.
  std::filesystem::path scenario(const std::filesystem::path& name) const;
  // All installed scenarios, by the names that scenario() knows, in their order.
  std::vector<std::string> scenarioNames() const;
  // The same of the bindings that `--phone linux:NAME` means.
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
