// Checks a file before it is passed to the dynamic linker.
#pragma once

#include <filesystem>

namespace quazor {

// Throws InputError if `file` is not a shared object; what() is the end of a sentence that begins with the file's name.
// The dynamic linker trusts the sizes in a file's headers and crashes the process on a truncated file, so this function
// checks them. It also refuses a file of another architecture, of which the linker says that it does not exist. All
// other checks are left to the linker.
//
// The layout is described in elf(5).
void validateSharedObject(const std::filesystem::path& file);

// True if the file has the note of QUAZOR_LOADED_ONLY_WHEN_NAMED (contract/loading.h). False for every other file, also
// for one that validateSharedObject() refuses. No code of the file runs.
bool isLoadedOnlyWhenNamed(const std::filesystem::path& file);

}  // namespace quazor
