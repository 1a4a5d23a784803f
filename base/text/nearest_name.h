// Finding what was meant by a name that does not exist.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// The least number of characters to insert, delete, replace or swap with their neighbour that turns one text into the
// other (optimal string alignment), in bytes.
std::size_t editDistance(std::string_view a, std::string_view b);

// The candidate nearest to `name`, the first one of equals; nothing when even that one is too far away to be meant,
// which is more than a third of the longer name's length.
std::optional<std::string> nearestName(std::string_view name, const std::vector<std::string>& candidates);

// "; did you mean 'NAME'?" or, where nothing is near, an empty text: the end of a refusal's sentence.
std::string didYouMean(std::string_view name, const std::vector<std::string>& candidates);

}  // namespace quazor
