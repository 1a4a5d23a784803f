// The script of a page whose plots can be zoomed.
#pragma once

#include <string_view>

namespace quazor {

// Runs at the end of a page that holds dygraphs. In each `.stream`, it reads the columns (number_column.h) and draws
// each `figure` that has a class `interval` or `offset`, over its picture, with buttons to move about. Of what is
// visible, it draws the minimum and the maximum of each of 1,000 columns.
std::string_view zoomScript();

}  // namespace quazor
