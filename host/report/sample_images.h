// Images of samples in auxiliary data, told by the shape of the data alone: a dictionary that holds lists of numbers.
#pragma once

#include "contract/value.h"

#include <vector>

namespace quazor {

// True for a list of numbers that is not empty.
bool isSamples(const Value& value);

// True for a dictionary with samples in at least one entry.
bool isImage(const Value& value);

// The images that an entry of auxiliary data is: itself, or the elements of a list of nothing but images. Empty when it
// is neither. The pointers are valid as long as `value` is.
std::vector<const Dictionary*> imagesIn(const Value& value);

}  // namespace quazor
