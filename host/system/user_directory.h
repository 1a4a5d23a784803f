// The directories in which a user's files are kept (XDG base directories).
#pragma once

#include <filesystem>

namespace quazor {

// The directory `quazor` of the user's files of one kind: in the directory that the environment variable names, or else
// in `below` of the home directory, for example userDirectory("XDG_STATE_HOME", ".local/state"). Empty if the
// environment has neither. A relative path counts as none, as the XDG rules require.
std::filesystem::path userDirectory(const char* variable, const char* below);

}  // namespace quazor
