// Looking at a file before the dynamic linker does.
#pragma once

#include <filesystem>
#include <string>

namespace quazor {

// Why `file` cannot be a shared object, as the end of a sentence that begins with its name; empty when it looks like
// one. The dynamic linker maps what a file's headers promise and crashes the process where a truncated file has no more
// bytes, so the promises are checked here. What the linker refuses cleanly is left to it.
//
// Source of the layout: elf(5).
std::string problemOfSharedObject(const std::filesystem::path& file);

}  // namespace quazor
