// Numbers as texts for people. The text that reads back as the number is defaultText() (contract/message_format.h).
#pragma once

#include <string>
#include <vector>

namespace quazor {

// With as many significant digits as are asked for, 1 to 17, and without zeros at the end: "1.2346" is 1.23456 with 5.
// A number that is not finite is "nan", "inf" or "-inf".
std::string significantDigits(double value, int digits);

// The value with six significant digits, or with as many more as it takes that it remains below, on or above each
// threshold, as the value is. Counts and numbers that are as short stay whole.
std::string shownNumber(double value, const std::vector<double>& thresholds = {});

}  // namespace quazor
