#include "host/command/expectations.h"

#include "base/text/input_error.h"
#include "base/text/name_list.h"
#include "base/text/nearest_name.h"
#include "contract/message_format.h"
#include "host/command/selection.h"

#include <algorithm>
#include <optional>

namespace quazor {

namespace {

// "; did you mean ...?" if the name is near to another one.
std::string nearestIn(const PluginScan& loaded, const PluginScan& others, const ExpectedOutcome& expected) {
  std::vector<std::string> names;
  for (const PluginScan* scan : {&loaded, &others}) {
    for (const DescribedDiagnostic& one : scan->catalogue) {
      if (one.diagnostic.experimentOnly == expected.experimentOnly) names.push_back(one.diagnostic.name);
    }
  }
  return didYouMean(expected.name, names);
}

}  // namespace

const DescribedDiagnostic* diagnosticOf(const std::vector<DescribedDiagnostic>& catalogue,
                                        const ExpectedOutcome& expected) {
  const auto found = std::find_if(catalogue.begin(), catalogue.end(), [&expected](const DescribedDiagnostic& one) {
    return one.diagnostic.name == expected.name && one.diagnostic.experimentOnly == expected.experimentOnly;
  });
  return found == catalogue.end() ? nullptr : &*found;
}

std::string leaveOutUnloaded(ScenarioSummary& summary, const std::filesystem::path& file, const PluginScan& loaded,
                             const std::function<const PluginScan&()>& others) {
  std::vector<std::string> unloaded;
  std::erase_if(summary.expected, [&](const ExpectedOutcome& one) {
    if (const std::optional<Skip> skip = skipOf(one.name, summary.absent)) {
      failIfNamedIn(file, one,
                    one.name + " is not run, because \"absent\" says: " + skip->reason + " Remove one of the two.");
      return true;
    }
    if (diagnosticOf(loaded.catalogue, one) != nullptr) return false;
    const std::string problem = "no loaded plug-in has " + one.name;
    if (!loaded.failed.empty()) {
      throw InputError(file.string() + ": " + problem + ", and " + loaded.failed.front().file.string() +
                       " failed to load.");
    }
    if (!isNamedIn(file, one)) return true;
    if (diagnosticOf(others().catalogue, one) == nullptr) {
      const std::string nearest = nearestIn(loaded, others(), one);
      if (!nearest.empty()) failIfNamedIn(file, one, problem + nearest);
    }
    unloaded.push_back(one.name);
    return true;
  });
  if (unloaded.empty()) return {};
  return formatMessage("what it expects of %@ is not compared, because no loaded plug-in has %@", listText(unloaded),
                       unloaded.size() == 1 ? "it" : "them");
}

}  // namespace quazor
