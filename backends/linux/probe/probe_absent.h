// The diagnostics that a probed machine cannot run.
#pragma once

#include <nlohmann/json.hpp>

namespace quazor {

// The entry "absent" for a binding that the probe has written: the installed diagnostics that need a part which it does
// not bind, by name, each with the reason, which is perhaps that cameras were `forbidden` to this user. Any thread.
nlohmann::ordered_json absentDiagnostics(const nlohmann::ordered_json& binding, bool forbidden);

}  // namespace quazor
