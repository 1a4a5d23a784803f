// Which run a page shows: the facts about it.
#pragma once

#include "host/report/report_format.h"

#include <string>
#include <vector>

namespace quazor {

// The name of the phone's file, without its folder.
std::string shortPhone(const RunStarted& run);

// "2026-11-21 01:08:00", in UTC.
std::string dateText(Date date);

// What kind of phone the runs were on, if it is the same of all: "simulated phone: no hardware was tested"; else empty.
std::string deviceText(const std::vector<RunStarted>& runs);

// A table of what identifies the run: ID, dates, phone, tags, seed, machine, program, plug-ins.
std::string runTable(const ShownRun& run);

}  // namespace quazor
