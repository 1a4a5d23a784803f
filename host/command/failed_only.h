// What is run again: that which did not pass, as it was run.
#pragma once

#include "host/cli/command_line.h"

namespace quazor {

// The options of `run --only failed` with what that means: the names of what did not pass in the record of --of or in
// that of the last run; its parameters, below all that are given now; and its phone and its plug-ins where none are
// given. No names: everything passed. Throws a CommandError (kCannotRead) where there is no such record, and for one
// with a plug-in that could not be loaded; one (kUsage) for a seed or real time where that run's phone was no simulated
// one.
Options optionsToRunAgain(Options options);

}  // namespace quazor
