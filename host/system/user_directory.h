// The directories of a user's files and of data that programs share (XDG base directories).
#pragma once

#include <filesystem>
#include <vector>

namespace quazor {

// The directory `quazor` of the user's files of one kind: in the directory that the environment variable names, or else
// in `below` of the home directory, for example userDirectory("XDG_STATE_HOME", ".local/state"). Empty if the
// environment has neither. A relative path counts as none, as the XDG rules require.
std::filesystem::path userDirectory(const char* variable, const char* below);

// The directories of the data of all installed programs, those that count more first: XDG_DATA_DIRS, or else
// /usr/local/share and /usr/share. Relative paths in it count as none.
std::vector<std::filesystem::path> sharedDataDirectories();

}  // namespace quazor
