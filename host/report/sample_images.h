// Finds images of samples in auxiliary data by their shape: dictionaries that contain lists of numbers.
#pragma once

#include "contract/value.h"

#include <vector>

namespace quazor {

// True for a non-empty list of numbers.
bool isSamples(const Value& value);

// True for a dictionary with samples in at least one entry.
bool isImage(const Value& value);

// The images in an entry of auxiliary data: the entry itself, or the elements of a list that contains only images.
// Empty if it is neither. The pointers are valid as long as `value` is.
std::vector<const Dictionary*> imagesIn(const Value& value);

}  // namespace quazor
