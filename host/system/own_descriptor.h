// Descriptors of this process that have names in the file system.
#pragma once

#include <filesystem>
#include <optional>

namespace quazor {

// The descriptor that a path such as /dev/stdout, /dev/fd/3 or a link to one names; nothing for any other file. What is
// behind it may be a file, which must not be opened anew or replaced: others go on writing to the descriptor.
std::optional<int> ownDescriptor(std::filesystem::path file);

// A copy of the descriptor for writing. Returns -1 with errno if it is not open for writing.
int writableCopyOf(int descriptor);

}  // namespace quazor
