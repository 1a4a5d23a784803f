// What a phone expects of diagnostics that are not loaded.
#pragma once

#include "host/device/phone.h"
#include "host/run/plugin_scan.h"

#include <filesystem>
#include <functional>
#include <string>
#include <vector>

namespace quazor {

// The diagnostic or experiment of which something is expected; null if the catalogue does not have it.
const DescribedDiagnostic* diagnosticOf(const std::vector<DescribedDiagnostic>& catalogue,
                                        const ExpectedOutcome& expected);

// A phone may expect something of the diagnostics of several plug-ins, and need not be tested with all of them: removes
// what is expected of diagnostics that are not loaded, or that the phone inherits but says it cannot run. Returns a
// clause about those that the file itself names, or an empty text. Throws InputError if the file itself expects
// something of a diagnostic that it cannot run, or whose name is misspelt: near to one that is loaded or is one of
// `others`, the installed ones; or if a plug-in that failed to load may have the diagnostic.
std::string leaveOutUnloaded(ScenarioSummary& summary, const std::filesystem::path& file, const PluginScan& loaded,
                             const std::function<const PluginScan&()>& others);

}  // namespace quazor
