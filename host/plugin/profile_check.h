// Checks profiles against the diagnostics and experiments that are loaded.
#pragma once

#include "host/plugin/parameters.h"
#include "host/plugin/profile.h"

#include <string>
#include <vector>

namespace quazor {

// Throws a CommandError (kCannotRead) for the first mistake in the order of the file: one of the form, an entry that
// sets a parameter that no matching diagnostic or experiment declares, a value outside the range of its parameter or,
// unless the profile may name others, an entry that matches none, also none of `others`, those of plug-ins that are not
// loaded. Skips an entry if anything that it matches was not described.
void checkProfile(const Profile& profile, const std::vector<DescribedDiagnostic>& catalogue,
                  const std::vector<Diagnostic>& others = {});

// True if an entry of the profile matches nothing in the catalogue or, with `onlyMisspelt`, if the catalogue also has a
// name that is near to the entry's.
bool namesOthers(const Profile& profile, const std::vector<DescribedDiagnostic>& catalogue, bool onlyMisspelt = false);

// The undescribed diagnostics that must be described before checkProfile can check an entry: those that match an entry
// with a parameter that no described match declares.
std::vector<Diagnostic> diagnosticsToDescribe(const Profile& profile,
                                              const std::vector<DescribedDiagnostic>& catalogue);

// A sentence for each value that an entry of the profile gives beside its limits, if a selected diagnostic that these
// limits judge runs with another one: they may not suit it.
std::vector<std::string> limitsForOtherValues(const Profile& profile, const std::vector<ResolvedDiagnostic>& selected);

}  // namespace quazor
