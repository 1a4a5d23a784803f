// Numbers of a record, rounded for people.
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// The value with six significant digits, or with as many more as it takes that it remains below, on or above each
// threshold, as the value is. Counts and numbers that are as short stay whole.
std::string shownNumber(double value, const std::vector<double>& thresholds = {});

// A cell with that text, and the whole number as its title if it is another. The attributes begin with a blank.
std::string numberCell(double value, const std::vector<double>& thresholds = {}, std::string_view attributes = {});

}  // namespace quazor
