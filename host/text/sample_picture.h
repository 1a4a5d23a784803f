// Small pictures of samples for a terminal.
#pragma once

#include <string>
#include <vector>

namespace quazor {

// A bar for each sample, from the lowest sample, whose bar is the shortest, to the highest, whose bar fills all rows: a
// column a sample, four lines or fewer from top to bottom, without blanks at their ends. Samples that are not finite
// have no bar. With `blocks` the lines are UTF-8 text of block elements, eight steps a line; else ASCII, a half line
// (.) or a whole one (:).
std::vector<std::string> pictureOf(const std::vector<double>& samples, bool blocks);

}  // namespace quazor
