// User-defined limits on measured results.
//
//   [DIAGNOSTIC:]RESULT OP NUMBER [UNIT] [+- TOLERANCE [UNIT]]
//   [DIAGNOSTIC:]RESULT OP OTHER_RESULT [+- TOLERANCE]
//   [DIAGNOSTIC:]RESULT in [LOWER, UPPER] [UNIT]
//
// OP is <, <=, >, >= or ==; a tolerance needs ==. The sign ± is read as +-. Two units must agree. An interval is open
// at a parenthesis. DIAGNOSTIC and RESULT may be patterns (*, ?, [...]). A name in double quotes may contain any
// character; \" and \\ stand for " and \.
#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <variant>

namespace quazor {

enum class LimitOperator { kLess, kLessOrEqual, kGreater, kGreaterOrEqual, kEqual };

std::string_view textOf(LimitOperator comparison);  // "<", "<=", ">", ">=", "=="

// Compares a result with a number. Without a unit, the number has the result's.
struct NumberCondition {
  LimitOperator comparison = LimitOperator::kEqual;
  double number = 0;
  double tolerance = 0;
  std::optional<std::string> unit{};

  friend bool operator==(const NumberCondition&, const NumberCondition&) = default;
};

// Compares a result with another result of the same diagnostic.
struct RelationCondition {
  LimitOperator comparison = LimitOperator::kEqual;
  std::string other;
  double tolerance = 0;

  friend bool operator==(const RelationCondition&, const RelationCondition&) = default;
};

// Requires a result between two numbers.
struct IntervalCondition {
  double lower = 0;
  double upper = 0;
  bool lowerOpen = false;
  bool upperOpen = false;
  std::optional<std::string> unit{};

  friend bool operator==(const IntervalCondition&, const IntervalCondition&) = default;
};

// A failed limit makes the diagnostic fail, or is only reported.
enum class LimitSeverity { kFail, kWarn };

std::string_view nameOf(LimitSeverity severity);  // "fail", "warn"
std::optional<LimitSeverity> limitSeverityNamed(std::string_view name);

// A limit with its origin.
struct UserLimit {
  std::string diagnostic;  // a name or pattern; empty: every diagnostic
  std::string result;      // a name or pattern
  std::variant<NumberCondition, RelationCondition, IntervalCondition> condition;
  std::string name{};  // given by the profile; may be empty
  LimitSeverity severity = LimitSeverity::kFail;
  std::string source{};         // user-readable: "command line" or the file
  bool onlyIfSelected = false;  // ignored in runs that select no matching diagnostic, because it is from a profile

  friend bool operator==(const UserLimit&, const UserLimit&) = default;
};

// Parses a text of the form above, without name, severity and source. Throws InputError with a clause that says what is
// wrong.
UserLimit parseUserLimit(std::string_view text);

// The canonical text, which parses to the same limit.
std::string canonicalText(const UserLimit& limit);

// The canonical text without the diagnostic and the result, for example ">= 90 frames".
std::string conditionText(const UserLimit& limit);

// The name, if there is one, and the canonical text without the diagnostic.
std::string nameAndCondition(const UserLimit& limit);

// The same with the source: for the report of a diagnostic.
std::string labelOf(const UserLimit& limit);

}  // namespace quazor
