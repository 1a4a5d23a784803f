// Looking at a file before the dynamic linker does.
#pragma once

#include <filesystem>

namespace quazor {

// Throws InputError when `file` cannot be a shared object; what() is the end of a sentence that begins with its name.
// The dynamic linker maps what a file's headers promise and crashes the process where a truncated file has no more
// bytes, so the promises are checked here. What the linker refuses cleanly is left to it.
//
// Source of the layout: elf(5).
void validateSharedObject(const std::filesystem::path& file);

}  // namespace quazor
