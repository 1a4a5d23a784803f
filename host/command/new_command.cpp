#include "host/command/commands.h"

#include "base/text/input_error.h"
#include "base/text/letter_case.h"
#include "contract/message_format.h"
#include "host/command/selection.h"
#include "host/error/exit_code.h"
#include "host/system/output_file.h"
#include "host/text/shell_word.h"

#include <sys/stat.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <iterator>
#include <sstream>
#include <string>
#include <string_view>
#include <system_error>
#include <utility>
#include <vector>

namespace quazor {

namespace {

namespace fs = std::filesystem;

// The names in the template, which the new project replaces by its own.
constexpr std::string_view kTemplateName = "event_count";
constexpr std::string_view kTemplateClass = "EventCount";

constexpr std::size_t kMaxName = 64;

struct TemplateFile {
  fs::path name;  // below the project's folder
  std::string text;
};

[[noreturn]] void refuseName(const std::string& name, const std::string& why) {
  throw CommandError(ExitCode::kUsage, "'" + name + "' cannot be the name of a plug-in: " + why);
}

void checkName(const std::string& name) {
  const auto isLower = [](char unit) { return unit >= 'a' && unit <= 'z'; };
  const auto isAllowed = [isLower](char unit) { return isLower(unit) || unit == '_' || (unit >= '0' && unit <= '9'); };
  if (name.empty() || !isLower(name.front()) || !std::all_of(name.begin(), name.end(), isAllowed)) {
    refuseName(name, "it must begin with a letter from a to z, and have only such letters, digits and underscores");
  }
  if (name.size() > kMaxName) refuseName(name, "it is longer than " + std::to_string(kMaxName) + " letters");
  if (name.starts_with("lib")) refuseName(name, "a file that begins with 'lib' is a library, not a plug-in");
  // CMake needs these names itself.
  constexpr std::array<std::string_view, 6> kTargets{"all", "clean", "help", "install", "package", "test"};
  if (std::find(kTargets.begin(), kTargets.end(), name) != kTargets.end()) {
    refuseName(name, "CMake has a target of that name");
  }
}

// "my_plugin" -> "MyPlugin"
std::string classNameOf(const std::string& name) {
  std::string words;
  bool begins = true;
  for (const char unit : name) {
    const std::string letter(1, unit);
    if (unit != '_') words += begins ? capitalized(letter) : letter;
    begins = unit == '_';
  }
  return words;
}

std::string replaced(std::string text, std::string_view from, const std::string& to) {
  for (std::size_t at = text.find(from); at != std::string::npos; at = text.find(from, at + to.size())) {
    text.replace(at, from.size(), to);
  }
  return text;
}

std::string adapted(const std::string& text, const std::string& name) {
  return replaced(replaced(text, kTemplateName, name), kTemplateClass, classNameOf(name));
}

// An installed plug-in of that file name would be hidden or hide the new one, and two plug-ins with one name of a
// diagnostic, an experiment or an analysis cannot be loaded together.
void checkIsNew(const std::string& name, const Options& options, const Installation& installation) {
  IsolationOptions isolation = isolationOf(options, installation);
  isolation.plugins = installation.allPlugins();
  isolation.unasked = true;  // one that cannot be loaded has no names
  for (const fs::path& one : isolation.plugins) {
    if (one.stem() == name) refuseName(name, "the plug-in '" + one.string() + "' has it; choose another one");
  }
  if (isolation.plugins.empty()) return;
  WatchedSignals signals;
  const PluginScan scan =
      scanPlugins(isolation, signals, [](const std::vector<Diagnostic>&) { return std::vector<Diagnostic>(); });
  if (signals.requestsToEnd() > 0) throw CommandError(ExitCode::kInterrupted, "interrupted; nothing was made");
  const std::string words = classNameOf(name);
  for (const DescribedDiagnostic& described : scan.catalogue) {
    const Diagnostic& one = described.diagnostic;
    for (const auto& [taken, kind] : {std::pair(one.name, one.experimentOnly ? "Experiment" : "Diagnostic"),
                                      std::pair(one.analysisName, "Analysis")}) {
      if (taken != words + kind) continue;
      const std::string plugin = one.plugins.empty() ? std::string() : one.plugins.front().string();
      refuseName(name, formatMessage("it would register '%@', as '%@' does, and the two could not be loaded together; "
                                     "choose another one",
                                     taken, plugin));
    }
  }
}

// The files of the template with the names of the project.
std::vector<TemplateFile> projectFiles(const fs::path& folder, const std::string& name) {
  std::vector<TemplateFile> files;
  std::error_code error;
  for (fs::recursive_directory_iterator at(folder, error); !error && at != fs::recursive_directory_iterator();
       at.increment(error)) {
    if (!at->is_regular_file()) continue;
    std::ostringstream content;
    content << std::ifstream(at->path(), std::ios::binary).rdbuf();
    const fs::path inside = at->path().lexically_relative(folder);
    if (inside.begin()->string().starts_with("build")) continue;
    files.push_back({adapted(inside.string(), name), adapted(content.str(), name)});
  }
  if (error || files.empty()) {
    throw CommandError(ExitCode::kCannotRead,
                       "the template '" + folder.string() + "' cannot be read; the package libquazor-dev contains it");
  }
  std::sort(files.begin(), files.end(), [](const auto& a, const auto& b) { return a.name < b.name; });
  return files;
}

[[noreturn]] void refuseFolder(const fs::path& folder, const std::string& why) {
  throw CommandError(ExitCode::kCannotWrite, "the project '" + folder.string() + "' cannot be made: " + why);
}

// A folder in which the project is made, so that `target` gets all of it or nothing.
// Thread: one at a time.
class NewFolder {
 public:
  // It is beside `target`, or in it if that is a folder: the current one cannot be replaced, and the one above it may
  // be another user's.
  explicit NewFolder(fs::path target) : target_(std::move(target)), isThere_(fs::exists(target_)) {
    const fs::path parent = isThere_ ? target_ : target_.parent_path();
    std::string name = (parent / ("." + target_.filename().string() + "-XXXXXX")).string();
    if (::mkdtemp(name.data()) == nullptr) refuseFolder(target_, std::strerror(errno));
    path_ = name;
    ::chmod(path_.c_str(), 0755);
  }
  NewFolder(const NewFolder&) = delete;
  NewFolder& operator=(const NewFolder&) = delete;
  ~NewFolder() {
    std::error_code ignored;
    if (!path_.empty()) fs::remove_all(path_, ignored);
  }

  void write(const TemplateFile& file) const {
    std::error_code error;
    fs::create_directories((path_ / file.name).parent_path(), error);
    writeOutputFile(path_ / file.name, file.text);
  }

  // Gives the folder its name, or moves what it holds into the folder of that name.
  void keep() {
    if (!isThere_) {
      move(path_, target_);
      path_.clear();
      return;
    }
    for (const fs::directory_entry& one : fs::directory_iterator(path_)) {
      move(one.path(), target_ / one.path().filename());
    }
  }

 private:
  void move(const fs::path& from, const fs::path& to) const {
    std::error_code error;
    fs::rename(from, to, error);
    if (error) refuseFolder(target_, error.message());
  }

  fs::path target_;
  bool isThere_;
  fs::path path_;  // empty once it has the name of the target
};

}  // namespace

ExitCode newCommand(const Options& options, const Installation& installation, Console& console) {
  const std::string& given = options.names.front();
  fs::path folder = fs::absolute(given).lexically_normal();
  if (!folder.has_filename()) folder = folder.parent_path();  // after a slash at the end
  const std::string name = folder.filename().string();
  checkName(name);
  std::error_code error;
  const bool isThere = fs::exists(fs::symlink_status(folder, error));
  if (isThere && !fs::is_directory(folder, error)) refuseFolder(given, "there is a file of that name");
  if (isThere && !fs::is_empty(folder, error)) refuseFolder(given, "the folder is not empty");
  checkIsNew(name, options, installation);
  const std::vector<TemplateFile> files = projectFiles(installation.pluginTemplate(), name);
  NewFolder made(folder);
  for (const TemplateFile& file : files) made.write(file);
  made.keep();
  std::string list;
  for (const TemplateFile& file : files)
    list += "  " + (fs::path(given) / file.name).lexically_normal().string() + "\n";
  const std::string enter = folder == fs::current_path(error) ? "" : "  cd " + shellWord(given) + "\n";
  console.out << "Made the plug-in " << name << " with the diagnostic " << classNameOf(name) << "Diagnostic:\n"
              << list << "\nBuild and test it, and install it for yourself:\n"
              << enter
              << "  cmake -B build && cmake --build build && ctest --test-dir build\n  cmake --install build\n";
  return ExitCode::kAllPassed;
}

}  // namespace quazor
