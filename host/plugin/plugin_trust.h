// Checks who could change a plug-in before it is loaded: its code does whatever the user may do.
#pragma once

#include <sys/types.h>

#include <filesystem>
#include <vector>

namespace quazor {

// The users who could change quazor itself anyway: root, the user, and the owner of the program.
std::vector<uid_t> trustedOwners();

// Throws InputError if somebody else than these users may change what `file` leads to: the file, a folder above it or,
// where the path goes through symbolic links, a link or a folder above it. what() is the end of a sentence that begins
// with the file's name; it names the place and, if possible, the command that mends it.
//
// A place is refused if it belongs to another user, or if its group or everybody may write to it. Folders with the
// sticky bit, such as /tmp, may be written by everybody: nobody may replace another's file there. Access control lists
// are not read. A file that does not exist is left to the function that opens it.
void validateTrust(const std::filesystem::path& file, const std::vector<uid_t>& owners);

// Throws a CommandError (kCannotRead) for the first plug-in that others than trustedOwners() may change.
void requireTrustedPlugins(const std::vector<std::filesystem::path>& files);

}  // namespace quazor
