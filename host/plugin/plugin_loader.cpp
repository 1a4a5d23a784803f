#include "host/plugin/plugin_loader.h"

#include "base/text/input_error.h"
#include "base/text/nearest_name.h"
#include "contract/contract.h"
#include "host/error/exit_code.h"
#include "host/error/host_error.h"
#include "host/plugin/shared_object.h"

#include <dlfcn.h>
#include <sys/resource.h>

#include <algorithm>
#include <charconv>
#include <cstddef>
#include <string>
#include <system_error>

namespace quazor {

namespace {

// The way out if a file could not be mapped in a process whose memory is limited.
std::string memoryHint(const std::string& message) {
  rlimit limit{};
  const bool isForMemory = message.find("failed to map segment") != std::string::npos ||
                           message.find("annot allocate memory") != std::string::npos;
  if (!isForMemory || ::getrlimit(RLIMIT_AS, &limit) != 0 || limit.rlim_cur == RLIM_INFINITY) return {};
  return "; its process may use " + std::to_string(limit.rlim_cur >> 20U) +
         " MiB of memory; --memory raises that limit";
}

[[noreturn]] void refuseUnlinkable(const std::string& message) {
  const std::optional<int> version = contractVersionIn(message);
  if (!version || *version == QUAZOR_CONTRACT_VERSION) {
    throw InputError("cannot be loaded: " + message + memoryHint(message));
  }
  throw InputError("was built against version " + std::to_string(*version) +
                   " of the plug-in contract, but this program has version " + std::to_string(QUAZOR_CONTRACT_VERSION) +
                   "; rebuild the plug-in against this version");
}

bool isSameFile(const std::filesystem::path& a, const std::filesystem::path& b) {
  std::error_code ignored;
  return std::filesystem::equivalent(a, b, ignored);
}

std::vector<std::string> namesOf(const QZLab& lab, QZLab::Kind kind) {
  std::vector<std::string> names;
  for (const QZLab::Registration& registration : lab.registrations()) {
    if (registration.kind == kind) names.push_back(registration.name);
  }
  return names;
}

void checkPart(const QZLab& lab, const LoadedPlugin& plugin, const std::string& diagnostic, QZLab::Kind kind,
               const std::string& name) {
  if (lab.find(kind, name) != nullptr) return;
  const std::string part = kind == QZLab::Kind::kExperiment ? "experiment" : "analysis";
  refusePlugin(plugin.file, "registers the diagnostic '" + diagnostic + "' with the " + part + " '" + name +
                                "', which is not registered" + didYouMean(name, namesOf(lab, kind)));
}

std::vector<LoadedPlugin> loadEach(const std::vector<std::filesystem::path>& files,
                                   const std::function<void()>& isNext) {
  // A plug-in may change the working directory.
  const std::vector<std::filesystem::path> distinct = distinctFiles(files);
  std::vector<std::filesystem::path> absolute;
  absolute.reserve(distinct.size());
  for (const std::filesystem::path& file : distinct) absolute.push_back(std::filesystem::absolute(file));
  std::vector<LoadedPlugin> loaded;
  for (std::size_t i = 0; i < distinct.size(); ++i) {
    if (isNext) isNext();
    try {
      loadPlugin(absolute[i]);
    } catch (const InputError& problem) {
      refusePlugin(distinct[i], problem.what());
    }
    loaded.push_back({distinct[i], QZLab::defaultLab().registrations().size()});
  }
  return loaded;
}

}  // namespace

void refusePlugin(const std::filesystem::path& file, const std::string& what) {
  throw CommandError(ExitCode::kCannotRead, "the plug-in '" + file.string() + "' " + what);
}

std::vector<std::filesystem::path> distinctFiles(const std::vector<std::filesystem::path>& files) {
  std::vector<std::filesystem::path> distinct;
  for (const std::filesystem::path& file : files) {
    const bool again = std::any_of(distinct.begin(), distinct.end(),
                                   [&file](const std::filesystem::path& other) { return isSameFile(other, file); });
    if (!again) distinct.push_back(file);
  }
  return distinct;
}

void loadPlugin(const std::filesystem::path& file) {
  validateSharedObject(file);
  const QZLab& lab = QZLab::defaultLab();
  const std::size_t registered = lab.registrations().size();
  const std::size_t refused = lab.refusedNames().size();
  // An absolute path contains a slash, so the linker opens this file and does not search for it.
  const FloatingPointGuard guard;  // initializers of code that is compiled for speed change it
  if (dlopen(std::filesystem::absolute(file).c_str(), RTLD_NOW | RTLD_LOCAL) == nullptr) {
    const char* message = dlerror();
    refuseUnlinkable(message == nullptr ? "the dynamic linker gives no reason" : message);
  }
  checkNewRegistrations(lab, registered, refused);
}

void checkNewRegistrations(const QZLab& lab, std::size_t registered, std::size_t refused) {
  if (lab.refusedNames().size() > refused) {
    throw InputError("registers the name '" + lab.refusedNames()[refused] + "', which is already taken");
  }
  if (lab.registrations().size() == registered) throw InputError("registers nothing");
}

std::vector<LoadedPlugin> loadPlugins(const std::vector<std::filesystem::path>& files) {
  std::vector<LoadedPlugin> loaded = loadEach(files, nullptr);
  checkDiagnostics(QZLab::defaultLab(), loaded);
  return loaded;
}

void loadSomePlugins(const std::vector<std::filesystem::path>& files, const std::function<void()>& isNext) {
  loadEach(files, isNext);
}

void checkDiagnostics(const QZLab& lab, const std::vector<LoadedPlugin>& plugins) {
  std::size_t first = 0;
  for (const LoadedPlugin& plugin : plugins) {
    checkDiagnosticsOf(lab, first, plugin);
    first = plugin.last;
  }
}

void checkDiagnosticsOf(const QZLab& lab, std::size_t first, const LoadedPlugin& plugin) {
  for (std::size_t at = first; at < plugin.last; ++at) {
    const QZLab::Registration& one = lab.registrations()[at];
    if (one.kind != QZLab::Kind::kDiagnostic) continue;
    checkPart(lab, plugin, one.name, QZLab::Kind::kExperiment, one.experimentName);
    checkPart(lab, plugin, one.name, QZLab::Kind::kAnalysis, one.analysisName);
  }
}

std::optional<int> contractVersionIn(std::string_view linkerMessage) {
  // The mangled name of the contract's namespace: 6quazor, the length of the next name, contract_, the version.
  constexpr std::string_view kNamespace = "6quazor";
  constexpr std::string_view kContract = "contract_";
  const std::size_t found = linkerMessage.find(kNamespace);
  if (found == std::string_view::npos) return std::nullopt;
  std::string_view rest = linkerMessage.substr(found + kNamespace.size());
  std::size_t length = 0;
  const auto [lengthEnd, lengthError] = std::from_chars(rest.data(), rest.data() + rest.size(), length);
  if (lengthError != std::errc()) return std::nullopt;
  rest.remove_prefix(static_cast<std::size_t>(lengthEnd - rest.data()));
  rest = rest.substr(0, length);
  if (!rest.starts_with(kContract)) return std::nullopt;
  rest.remove_prefix(kContract.size());
  int version = 0;
  const auto [end, error] = std::from_chars(rest.data(), rest.data() + rest.size(), version);
  return error == std::errc() && end == rest.data() + rest.size() ? std::optional(version) : std::nullopt;
}

}  // namespace quazor
