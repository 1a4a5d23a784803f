// Checks a file before it is passed to the dynamic linker.
#pragma once

#include <filesystem>
#include <string>
#include <vector>

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

// How a shared object was compiled and linked, as far as the file shows it.
struct LinkProperties {
  bool bindsNow = false;             // all functions are bound while it is loaded (-z now)
  bool protectsRelocations = false;  // relocated data are read-only afterwards (-z relro)
  bool hasStackProtector = false;    // a function checks its stack (-fstack-protector)
  bool hasExecutableStack = false;
  bool hasTextRelocations = false;   // its code is changed while it is loaded
  std::vector<std::string> runPath;  // where its libraries are searched, in order
};

// The properties of a file that validateSharedObject() accepts; those of any other one are unspecified. Throws
// InputError if the file cannot be read. No code of the file runs.
LinkProperties linkPropertiesOf(const std::filesystem::path& file);

}  // namespace quazor
