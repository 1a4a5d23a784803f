// Values of options that have a form of their own.
#pragma once

#include "contract/log_channel.h"
#include "contract/ordered_map.h"
#include "host/limits/user_limit.h"
#include "host/run/frame_teller.h"
#include "host/run/log_limit.h"

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// The environment variable with tags, separated by white space.
inline constexpr const char* kTagsVariable = "QUAZOR_TAGS";

// The number of an option. Throws a CommandError (kUsage), which begins with the option, if the text is not an integer
// from `least` to `most`.
std::uint64_t parseWhole(const char* option, const std::string& text, std::uint64_t least, std::uint64_t most);

// The limit of `--memory` in bytes; nothing for "none". The default limit if the text is empty. Throws like parseWhole.
std::optional<std::uint64_t> memoryOf(const std::string& text);

// The limit of `--log-limit LINES[,MEBIBYTES]|none`; the default limit if the text is empty. Throws like parseWhole.
LogLimit logLimitOf(const std::string& text);

// The setting of `--trace off|frames[=N|=all]|queues`. Throws like parseWhole.
TraceSetting traceOf(const std::string& text);

// The level of that name; nothing if there is none.
std::optional<LogLevel> logLevelOf(const std::string& text);

// The limits of `--limit TEXT`. Throws a CommandError (kUsage) if a text is not a limit, or the same one as another.
std::vector<UserLimit> limitsOfCommandLine(const std::vector<std::string>& texts);

// The tags of the environment and of `--tag KEY=VALUE`, which replace those of the environment. Throws a CommandError
// (kUsage) for a text without that form, with an empty key or value, a key twice in one source, control characters,
// invalid UTF-8 or more than 256 bytes. Without the environment, only those of `--tag`.
OrderedMap<std::string> tagsOf(const std::vector<std::string>& texts, bool withEnvironment = true);

}  // namespace quazor
