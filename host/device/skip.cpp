#include "host/device/skip.h"

#include "base/json/json_cursor.h"

#include <array>

namespace quazor {

namespace {

constexpr std::array kKinds{SkipKind::kNoSuchHardware, SkipKind::kNotAllowed, SkipKind::kNotReached};

Skip readSkip(const JsonCursor& cursor) {
  // A phone can say nothing about where a run stops.
  constexpr std::array<std::string_view, 2> kNames{"no-such-hardware", "not-allowed"};
  if (cursor.isString()) return {SkipKind::kNoSuchHardware, cursor.text()};
  if (!cursor.isObject()) cursor.failType("a sentence, or an object with a kind and a reason");
  cursor.allowKeys({"kind", "reason"});
  return {*skipKindNamed(cursor.at("kind").oneOf(kNames, "a kind of skip")), cursor.at("reason").text()};
}

}  // namespace

std::string_view nameOf(SkipKind kind) {
  switch (kind) {
    case SkipKind::kNoSuchHardware: return "no-such-hardware";
    case SkipKind::kNotAllowed: return "not-allowed";
    case SkipKind::kNotReached: break;
  }
  return "not-reached";
}

std::optional<SkipKind> skipKindNamed(std::string_view name) {
  for (const SkipKind kind : kKinds) {
    if (nameOf(kind) == name) return kind;
  }
  return std::nullopt;
}

std::string textOf(const Skip& skip) { return std::string(nameOf(skip.kind)) + ": " + skip.reason; }

std::vector<SkipRule> readAbsent(const JsonCursor& phone) {
  std::vector<SkipRule> rules;
  const std::optional<JsonCursor> absent = phone.find("absent");
  if (!absent) return rules;
  if (!absent->isObject())
    absent->failType("an object with the reason for each diagnostic, or pattern of them, that is skipped");
  for (const auto& [pattern, reason] : absent->entries()) {
    if (pattern.empty()) absent->fail("a name is empty; expected that of a diagnostic, or a pattern.");
    rules.push_back({pattern, readSkip(reason)});
  }
  return rules;
}

}  // namespace quazor
