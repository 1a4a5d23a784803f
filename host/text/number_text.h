// Numbers as texts for people. The text that reads back as the number is defaultText() (contract/message_format.h).
#pragma once

#include <string>

namespace quazor {

// With as many significant digits as are asked for, 1 to 17, and without zeros at the end: "1.2346" is 1.23456 with 5.
// A number that is not finite is "nan", "inf" or "-inf".
std::string significantDigits(double value, int digits);

}  // namespace quazor
