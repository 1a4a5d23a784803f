// Examples and exit codes for the help.
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// The examples and exit codes of the program.
std::string helpFooter();

// Those of the command with that name.
std::string helpFooter(std::string_view command);

// Throws a CommandError (kUsage) with a suggestion, which CLI11 lacks, if the first argument is an unknown command.
void refuseUnknownCommand(const std::vector<std::string>& arguments);

// The arguments of the program, in which the word "help" and the name of a command are that command's --help. Throws a
// CommandError (kUsage) if more follows.
std::vector<std::string> withHelpAsOption(const std::vector<std::string>& arguments);

// The command line, "quazor run --help", that says what arguments like these can be. There must be one.
std::string helpCommandFor(const std::vector<std::string>& arguments);

}  // namespace quazor
