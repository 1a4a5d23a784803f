// How pages of runs are written.
#pragma once

#include "host/cli/installation.h"
#include "host/report/report_format.h"

#include <functional>
#include <string>

namespace quazor {

// Writes the page of one run, with the explanations of the installation.
std::function<std::string(const ShownRun& run)> pageWriter(const Installation& installation);

}  // namespace quazor
