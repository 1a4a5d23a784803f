// Values of options that have a form of their own.
#pragma once

#include "contract/ordered_map.h"
#include "host/limits/user_limit.h"

#include <string>
#include <vector>

namespace quazor {

// The environment variable with tags, separated by white space.
inline constexpr const char* kTagsVariable = "QUAZOR_TAGS";

// The limit of `--limit TEXT`. Throws a CommandError (kUsage) if the text is not a limit.
UserLimit limitOfCommandLine(const std::string& text);

// The tags of the environment and of `--tag KEY=VALUE`, which replace those of the environment. Throws a CommandError
// (kUsage) for a text without that form, with an empty key or value, a key twice in one source, control characters,
// invalid UTF-8 or more than 256 bytes.
OrderedMap<std::string> tagsOf(const std::vector<std::string>& texts);

}  // namespace quazor
