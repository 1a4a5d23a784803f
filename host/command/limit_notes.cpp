#include "host/command/limit_notes.h"

#include "base/text/nearest_name.h"
#include "contract/message_format.h"
#include "host/command/explanations.h"
#include "host/model/limit_check.h"
#include "host/text/name_pattern.h"

#include <algorithm>
#include <optional>

namespace quazor {

namespace {

bool isOnOneOf(const UserLimit& limit, const std::vector<std::string>& diagnostics) {
  return std::any_of(diagnostics.begin(), diagnostics.end(),
                     [&limit](const std::string& one) { return appliesTo(limit, one); });
}

// The explained results of the diagnostics for which the limit is meant; nothing if one of them has none.
std::vector<std::string> resultsFor(const UserLimit& limit, const std::vector<std::string>& diagnostics,
                                    const std::vector<Explanation>& explanations) {
  std::vector<std::string> results;
  for (const std::string& diagnostic : diagnostics) {
    if (!appliesTo(limit, diagnostic)) continue;
    const std::vector<std::string> more = explainedResults(explanations, diagnostic);
    if (more.empty()) return {};
    results.insert(results.end(), more.begin(), more.end());
  }
  return results;
}

// What the explanations do not name, with the nearest that they do; empty if they name all that the limit is about.
std::string unexplainedIn(const UserLimit& limit, const std::vector<std::string>& results) {
  const std::string of = " of " + (limit.diagnostic.empty() ? "the selected diagnostics" : limit.diagnostic);
  const bool isKnown = std::any_of(results.begin(), results.end(),
                                   [&limit](const std::string& one) { return matchesName(limit.result, one); });
  if (!isKnown) return "'" + limit.result + "'" + of + didYouMeanResult(limit.result, results);
  const auto* const relation = std::get_if<RelationCondition>(&limit.condition);
  if (relation == nullptr || std::find(results.begin(), results.end(), relation->other) != results.end()) return {};
  return "'" + relation->other + "'" + of + didYouMean(relation->other, results);
}

}  // namespace

std::vector<std::string> limitsOfUnselected(const std::vector<UserLimit>& limits,
                                            const std::vector<std::string>& selected) {
  std::vector<std::string> sentences;
  for (const UserLimit& limit : limits) {
    if (limit.onlyIfSelected || isOnOneOf(limit, selected)) continue;
    sentences.push_back(formatMessage("the limit '%@' (%@) will be compared with nothing: %@", canonicalText(limit),
                                      limit.source, unselectedText(limit, selected)));
  }
  return sentences;
}

std::vector<std::string> limitsOnUnexplained(const std::vector<UserLimit>& limits,
                                             const std::vector<std::string>& diagnostics,
                                             const std::vector<std::filesystem::path>& directories) {
  std::vector<std::string> sentences;
  if (limits.empty()) return sentences;
  const std::vector<Explanation> explanations = explanationsIfReadable(directories);
  for (const UserLimit& limit : limits) {
    const std::vector<std::string> results = resultsFor(limit, diagnostics, explanations);
    const std::string unexplained = results.empty() ? std::string() : unexplainedIn(limit, results);
    if (unexplained.empty()) continue;
    sentences.push_back(
        formatMessage("the limit '%@' (%@) may be compared with nothing: the explanations name no result %@",
                      canonicalText(limit), limit.source, unexplained));
  }
  return sentences;
}

}  // namespace quazor
