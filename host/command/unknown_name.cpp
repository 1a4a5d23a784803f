#include "host/command/unknown_name.h"

#include "contract/message_format.h"
#include "host/command/selection.h"
#include "host/run/plugin_scan.h"
#include "host/system/child_process.h"
#include "host/text/name_pattern.h"

#include <algorithm>
#include <iterator>
#include <optional>

namespace quazor {

namespace {

bool fits(const std::string& name, const Diagnostic& one) { return matchesName(name, one.name); }

void refuseNameOfUnloaded(const std::string& name, const Options& options, const Installation& installation) {
  // With --in-process, plug-ins may have started threads, so that no process can be made.
  if (!options.plugins.empty() || options.inProcess) return;
  for (const DescribedDiagnostic& described : scanOfOthers(options, installation).catalogue) {
    const Diagnostic& one = described.diagnostic;
    if (!fits(name, one) || one.plugins.empty()) continue;
    const bool runs = options.command == Command::kRun || options.command == Command::kExperiment;
    const std::string_view command =
        runs ? (one.experimentOnly ? "experiment" : "run") : kCommandNames[static_cast<std::size_t>(options.command)];
    const std::string plugin = one.plugins.front().stem().string();
    throw CommandError(
        ExitCode::kUsage,
        formatMessage("%@ is %@ of the plug-in %@, which is loaded only when it is named; use 'quazor %@ "
                      "%@ --plugin %@'",
                      one.name, one.experimentOnly ? "an experiment" : "a diagnostic", plugin, command, one.name,
                      plugin));
  }
}

}  // namespace

PluginScan scanOfOthers(const Options& options, const Installation& installation, WatchedSignals* signals) {
  IsolationOptions isolation = isolationOf(options, installation);
  const std::vector<std::filesystem::path> loaded = isolation.plugins;
  isolation.plugins = installation.allPlugins();
  isolation.unasked = true;
  std::erase_if(isolation.plugins, [&loaded](const std::filesystem::path& one) {
    return std::find(loaded.begin(), loaded.end(), one) != loaded.end();
  });
  if (isolation.plugins.empty()) return {};
  std::optional<WatchedSignals> own;
  if (signals == nullptr) signals = &own.emplace();
  return scanPlugins(isolation, *signals, [](const std::vector<Diagnostic>&) { return std::vector<Diagnostic>(); });
}

void refusePhoneAsName(const std::string& name, const Installation& installation) {
  const std::vector<std::string> phones = installation.scenarioNames();
  if (std::find(phones.begin(), phones.end(), name) == phones.end()) return;
  throw CommandError(ExitCode::kUsage,
                     formatMessage("'%@' is a simulated phone; run diagnostics on it with 'quazor run "
                                   "--all --phone %@'",
                                   name, name));
}

void refuseGroupOfPhones(const std::string& name, ExitCode code, const std::string& about,
                         const Installation& installation) {
  const std::string group = name + "/";
  const std::vector<std::string> phones = installation.scenarioNames();
  if (std::none_of(phones.begin(), phones.end(), [&group](const std::string& one) { return one.starts_with(group); }))
    return;
  throw CommandError(
      code, formatMessage("%@: this is a group of phones; to see them: quazor phone list '%@*'", about, group));
}

void refuseUnknownName(const std::vector<Diagnostic>& catalogue, const Options& options,
                       const Installation& installation, const CommandError& refusal) {
  const auto name = std::find_if(options.names.begin(), options.names.end(), [&catalogue](const std::string& one) {
    return std::none_of(catalogue.begin(), catalogue.end(),
                        [&one](const Diagnostic& other) { return fits(one, other); });
  });
  if (name == options.names.end()) return;
  refuseNameOfUnloaded(*name, options, installation);
  refusePhoneAsName(*name, installation);
  const std::string text = refusal.what();
  if (text.ends_with("?")) return;  // it has a suggestion
  throw CommandError(ExitCode::kUsage, text +
                                           "; 'quazor list' shows what is available, and '--plugin FILE' loads a "
                                           "plug-in that is not installed");
}

}  // namespace quazor
