// Checks of options that fit each other or not.
#pragma once

#include "host/cli/command_line.h"

#include <filesystem>
#include <string>

namespace CLI {
class App;
}

namespace quazor {

// All throw a CommandError (kUsage).

// CLI11 accepts an empty option value; quazor does not.
void refuseEmpty(const CLI::App& command, const char* option);

// --seed and --realtime have no effect on a real machine, so they are rejected there.
void checkPhone(const CLI::App& command, const std::filesystem::path& phone);

// Exactly one of names, --all and --only failed must be present.
void checkNames(const Options& options, const std::string& what);

}  // namespace quazor
