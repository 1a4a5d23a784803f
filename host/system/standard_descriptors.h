// Keeps the files of quazor apart from its standard input, output and error.
#pragma once

namespace quazor {

// Opens those of the descriptors 0 to 2 that the program was started without. Otherwise the next file that it opens
// gets their numbers, and a report is written into it. The new descriptors refuse reads or writes like closed ones, so
// a report that nobody receives stays an error. To be called before any file is opened.
//
// Throws std::system_error if one of them cannot be opened.
void openStandardDescriptors();

}  // namespace quazor
