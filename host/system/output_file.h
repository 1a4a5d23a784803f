// Writes reports to files.
#pragma once

#include <filesystem>
#include <string_view>

namespace quazor {

// Replaces the content of `file` by `text` atomically: writes a new file in the same directory and renames it, so that
// a reader sees either the old or the new content, and a failure leaves the old. Follows links and keeps the
// permissions and the owner of a replaced file; refuses one of another user, unless this one is root. Writes directly
// to anything that is not a regular file, such as a pipe or a device, and to what /dev/stdout and its like name.
//
// Throws a CommandError (kCannotWrite) that names the file and the reason.
void writeOutputFile(const std::filesystem::path& file, std::string_view text);

// Throws the same error as writeOutputFile() if it can be detected without writing.
void validateOutputFile(const std::filesystem::path& file);

}  // namespace quazor
