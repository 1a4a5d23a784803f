// Small pictures of samples for a terminal.
#pragma once

#include <string>
#include <vector>

namespace quazor {

// A bar chart with one column per sample and at most four lines, top to bottom, without trailing blanks. The lowest
// sample has the shortest bar and the highest has a full column; samples that are not finite have none. With `blocks`
// the lines are UTF-8 block elements with eight steps per line, otherwise ASCII with half (.) and full (:) lines.
std::vector<std::string> pictureOf(const std::vector<double>& samples, bool blocks);

}  // namespace quazor
