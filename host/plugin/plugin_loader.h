// Loads plug-ins into the process.
#pragma once

#include "contract/lab.h"

#include <cstddef>
#include <filesystem>
#include <functional>
#include <optional>
#include <string_view>
#include <vector>

namespace quazor {

// A plug-in that was loaded.
struct LoadedPlugin {
  std::filesystem::path file;
  std::size_t last;  // the position after its last registration, among the lab's
};

// Loads the plug-ins in order; each registers with the process-wide lab. A file that is listed twice is loaded once.
// Plug-ins stay loaded until the process ends, because the lab holds their factories. Returns the loaded plug-ins.
//
// Throws a CommandError (kCannotRead) if a file cannot be loaded, was built against another version of the contract,
// registers nothing or a name already in use, or if a diagnostic names an experiment or analysis that is still not
// registered after all plug-ins have been loaded. `isNext`, if not empty, is called with each file before it is loaded.
std::vector<LoadedPlugin> loadPlugins(const std::vector<std::filesystem::path>& files,
                                      const std::function<void(const std::filesystem::path& file)>& isNext = nullptr);

// Like loadPlugins, but for a subset of the plug-ins: a diagnostic may name something that none of them registers.
void loadSomePlugins(const std::vector<std::filesystem::path>& files);

// The contract version of the missing symbol in a dynamic linker's message; nothing if the message has another cause.
std::optional<int> contractVersionIn(std::string_view linkerMessage);

}  // namespace quazor
