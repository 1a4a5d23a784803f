// Judges a plug-in as a reviewer would: what it registers, what it costs, and how it behaves on simulated phones.
#pragma once

#include "host/cli/command_line.h"
#include "host/cli/installation.h"
#include "host/command/review_rules.h"
#include "host/system/watched_signals.h"

#include <filesystem>

namespace quazor {

// Loads, describes and runs the plug-in in processes of its own, with the parameters of the options. What it does there
// is a finding, as is a file that is no plug-in; code of a file that others may change does not run. Throws a
// CommandError for options that do not fit the plug-in, for a profile or phone of the installation that cannot be read,
// and on an interrupt.
ReviewFindings reviewPlugin(const std::filesystem::path& plugin, const Options& options,
                            const Installation& installation, WatchedSignals& signals);

}  // namespace quazor
