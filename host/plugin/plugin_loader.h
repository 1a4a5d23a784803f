// Loading plug-ins into the process.
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

// Loads the plug-ins in order; each registers with the process-wide lab. A file that is named twice is loaded once.
// Plug-ins stay loaded until the process ends, as the lab holds their factories. Returns those that were loaded.
//
// Throws a CommandError (kCannotRead) when a file cannot be loaded, was built against another version of the contract,
// registers nothing or a name that is taken, or when a diagnostic names an experiment or analysis that, after all
// plug-ins have been loaded, nobody has registered. `isNext`, unless it is empty, is told of each file before it is
// loaded.
std::vector<LoadedPlugin> loadPlugins(const std::vector<std::filesystem::path>& files,
                                      const std::function<void(const std::filesystem::path& file)>& isNext = nullptr);

// As loadPlugins, of some of the plug-ins that belong together: a diagnostic may name what none of them registers.
void loadSomePlugins(const std::vector<std::filesystem::path>& files);

// The contract version of the symbol that a dynamic linker's message complains of; nothing when it is about something
// else.
std::optional<int> contractVersionIn(std::string_view linkerMessage);

}  // namespace quazor
