// Which run a page shows: the facts about it, and how to do it again.
#pragma once

#include "host/report/report_format.h"

#include <string>

namespace quazor {

// The name of the phone's file, without its folder.
std::string shortPhone(const RunStarted& run);

// "2026-11-21 01:08:00", in UTC.
std::string dateText(Date date);

// A table of what identifies the run: ID, dates, phone, tags, seed, machine, program, plug-ins.
std::string runTable(const ShownRun& run);

// The commands, one a line, that run the same diagnostics with the same parameters, limits, phone and seed. There is
// one unless diagnostics have different values for parameters of the same name.
std::string rerunCommands(const ShownRun& run);

}  // namespace quazor
