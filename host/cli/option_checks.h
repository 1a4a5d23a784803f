// Checks of options that fit each other or not.
#pragma once

#include "host/cli/command_line.h"

#include <filesystem>
#include <ostream>
#include <string>
#include <vector>

namespace CLI {
class App;
}

namespace quazor {

// All but warnOfSuffixes() and unknownOptionIn() throw a CommandError (kUsage).

// CLI11 accepts an empty option value; quazor does not.
void refuseEmpty(const CLI::App& command, const char* option);

// --seed and --realtime have no effect on a real machine, so they are rejected there.
void checkPhone(const CLI::App& command, const std::filesystem::path& phone);

// Warns of each report whose file has the suffix of another format. `phone probe` writes JSON in any case.
void warnOfSuffixes(const Options& options, std::ostream& err);

// Exactly one of names, --all and --only failed must be present.
void checkNames(const Options& options, const std::string& what);

// "unknown option '--profil'; did you mean '--profile'?" for the first option that the command does not have; empty if
// it has them all. CLI11 may count an unknown option's value as a record or a name, and then complains of that.
std::string unknownOptionIn(const std::vector<std::string>& arguments);

}  // namespace quazor
