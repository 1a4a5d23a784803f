// `run --only failed`: repeats the diagnostics that did not pass.
#pragma once

#include "host/cli/command_line.h"
#include "host/cli/installation.h"

#include <ostream>

namespace quazor {

// Completes the options of `run --only failed` from the record given by --of, or from that of the previous run: the
// names of the diagnostics that did not pass; the recorded parameters, with lower priority than all that are given now;
// and the phone, the plug-ins and the seeds unless they are given; and the tags, of which those given now win. The
// names are empty if everything passed. Throws a CommandError: kCannotRead if there is no such record, if a plug-in
// could not be loaded in that run, or if the record is not the user's own of the previous run and names a plug-in that
// is not installed; kUsage for a seed or real time if that run's phone was not simulated.
Options optionsToRunAgain(Options options, const Installation& installation);

// Names on `err` the diagnostics whose parameters the record lacks, because that run ended before they began. They may
// pass with others.
void tellUnrecorded(const Options& options, std::ostream& err);

}  // namespace quazor
