#include "base/text/nearest_name.h"

#include "base/text/letter_case.h"
#include "base/text/name_list.h"

#include <algorithm>
#include <iterator>

namespace quazor {

std::size_t editDistance(std::string_view a, std::string_view b) {
  // Three rows of the table of distances between the prefixes of the texts.
  std::vector<std::size_t> beforeLast(b.size() + 1);
  std::vector<std::size_t> last(b.size() + 1);
  std::vector<std::size_t> row(b.size() + 1);
  for (std::size_t j = 0; j <= b.size(); ++j) row[j] = j;
  for (std::size_t i = 1; i <= a.size(); ++i) {
    beforeLast.swap(last);
    last.swap(row);
    row[0] = i;
    for (std::size_t j = 1; j <= b.size(); ++j) {
      const std::size_t replaced = last[j - 1] + (a[i - 1] == b[j - 1] ? 0 : 1);
      row[j] = std::min({last[j] + 1, row[j - 1] + 1, replaced});
      const bool swapped = i > 1 && j > 1 && a[i - 1] == b[j - 2] && a[i - 2] == b[j - 1];
      if (swapped) row[j] = std::min(row[j], beforeLast[j - 2] + 1);
    }
  }
  return row[b.size()];
}

std::optional<std::string> nearestName(std::string_view name, const std::vector<std::string>& candidates) {
  const std::string* nearest = nullptr;
  std::size_t least = 0;
  for (const std::string& candidate : candidates) {
    const std::size_t distance = editDistance(name, candidate);
    if (distance * 3 > std::max(name.size(), candidate.size())) continue;
    if (nearest != nullptr && distance >= least) continue;
    nearest = &candidate;
    least = distance;
  }
  return nearest == nullptr ? std::nullopt : std::optional(*nearest);
}

std::string didYouMean(std::string_view name, const std::vector<std::string>& candidates) {
  const std::optional<std::string> nearest = nearestName(name, candidates);
  return nearest ? "; did you mean '" + *nearest + "'?" : std::string();
}

std::string didYouMeanOf(std::string_view name, std::string_view what, const std::vector<std::string>& candidates) {
  std::string suggestion = didYouMean(name, candidates);
  const std::string all = suggestion.empty() ? std::string(what) : capitalized(what);
  suggestion += suggestion.empty() ? "; " : " ";
  return suggestion + all + " are " + (candidates.empty() ? "none" : listText(candidates));
}

std::string didYouMeanOrPattern(std::string_view name, const std::vector<std::string>& candidates) {
  std::vector<std::string> longer;
  std::copy_if(candidates.begin(), candidates.end(), std::back_inserter(longer),
               [name](const std::string& one) { return !name.empty() && one.starts_with(name); });
  if (longer.empty()) return didYouMean(name, candidates);
  return "; did you mean '" + (longer.size() == 1 ? longer.front() : std::string(name) + "*") + "'?";
}

std::string didYouMeanPath(std::string_view name, const std::vector<std::string>& candidates) {
  std::vector<std::string> lastParts;
  std::string same;
  for (const std::string& candidate : candidates) {
    lastParts.push_back(candidate.substr(candidate.rfind('/') + 1));
    if (lastParts.back() == name) same += (same.empty() ? "'" : " or '") + candidate + "'";
  }
  if (!same.empty()) return "; did you mean " + same + "?";
  const bool hasFolder = name.find('/') != std::string_view::npos;
  const std::optional<std::string> nearest = hasFolder ? std::nullopt : nearestName(name, lastParts);
  return nearest ? didYouMeanPath(*nearest, candidates) : didYouMean(name, candidates);
}

}  // namespace quazor
