// The picture of a value and its limit.
#pragma once

#include "contract/results.h"

#include <optional>
#include <string>

namespace quazor {

// An SVG bar with the allowed range and a mark at the value; empty without bounds, if one of the numbers is not finite,
// or if there is nothing to see: only one value is allowed, or the value is on the only bound.
std::string limitBar(double value, const std::optional<QZLimit>& limit, bool passed);

// By how much the value is outside: "4 below the limit", "0.5 above the limit", "on the limit, which is excluded";
// empty if it is inside, or if that cannot be said.
std::string deviationText(double value, const std::optional<QZLimit>& limit);

}  // namespace quazor
