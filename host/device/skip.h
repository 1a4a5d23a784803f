// Why a diagnostic is not run.
#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

class JsonCursor;

// kNotReached: the run stopped before it.
enum class SkipKind { kNoSuchHardware, kNotAllowed, kNotReached };

std::string_view nameOf(SkipKind kind);  // "no-such-hardware", "not-allowed", "not-reached"

// The kind with that name, or nothing.
std::optional<SkipKind> skipKindNamed(std::string_view name);

struct Skip {
  SkipKind kind = SkipKind::kNotReached;
  std::string reason;  // a sentence
};

// "KIND: REASON".
std::string textOf(const Skip& skip);

// Skips the diagnostics or experiments with this name, or that this pattern matches.
struct SkipRule {
  std::string pattern;
  Skip skip;
};

// What the phone cannot run, from the key "absent" of a scenario or binding; empty without it. Throws InputError, like
// JsonCursor, if it is malformed. Thread: any.
std::vector<SkipRule> readAbsent(const JsonCursor& phone);

}  // namespace quazor
