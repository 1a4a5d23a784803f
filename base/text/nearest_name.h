// Suggests an existing name for an unknown one.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// The minimum number of byte insertions, deletions, replacements and swaps of neighbours that turn one text into the
// other (optimal string alignment).
std::size_t editDistance(std::string_view a, std::string_view b);

// The candidate nearest to `name`, the first one of several; nothing if the distance is more than a third of the length
// of the longer name.
std::optional<std::string> nearestName(std::string_view name, const std::vector<std::string>& candidates);

// "; did you mean 'NAME'?", or an empty text if no candidate is near: the end of an error message.
std::string didYouMean(std::string_view name, const std::vector<std::string>& candidates);

// Like didYouMean(), followed by all candidates: "; did you mean 'B'? The commands are A, B", or "; the commands are
// A, B". `what` begins with a small letter, as in "the commands".
std::string didYouMeanOf(std::string_view name, std::string_view what, const std::vector<std::string>& candidates);

// Like didYouMean(), but the beginning of one candidate stands for that, and the beginning of several for the pattern
// NAME* that fits them.
std::string didYouMeanOrPattern(std::string_view name, const std::vector<std::string>& candidates);

// Like didYouMean(), for candidates in folders, such as "camera_sync/start_refused": a name without its folder stands
// for all candidates with that last part, and a misspelt one for those with the nearest last part.
std::string didYouMeanPath(std::string_view name, const std::vector<std::string>& candidates);

}  // namespace quazor
