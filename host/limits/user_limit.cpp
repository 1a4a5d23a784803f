#include "host/limits/user_limit.h"

#include "base/text/input_error.h"
#include "base/text/letter_case.h"
#include "contract/message_format.h"
#include "host/text/name_pattern.h"
#include "host/text/parameter_number.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <cstddef>
#include <utility>

namespace quazor {

namespace {

constexpr std::string_view kBlanks = " \t";
constexpr std::string_view kTolerance = "+-";
constexpr std::string_view kToleranceSign = "\xc2\xb1";  // means the same
constexpr std::string_view kWrongTolerance = "+/-";
// Longer operators precede their prefixes.
constexpr std::array kOperators = {
    std::pair{std::string_view("<="), LimitOperator::kLessOrEqual},
    std::pair{std::string_view(">="), LimitOperator::kGreaterOrEqual},
    std::pair{std::string_view("=="), LimitOperator::kEqual},
    std::pair{std::string_view("<"), LimitOperator::kLess},
    std::pair{std::string_view(">"), LimitOperator::kGreater},
};

std::string_view trimmed(std::string_view text) {
  const std::size_t begin = text.find_first_not_of(kBlanks);
  if (begin == std::string_view::npos) return {};
  return text.substr(begin, text.find_last_not_of(kBlanks) - begin + 1);
}

// True if an unquoted text is a number and not a name.
bool looksLikeNumber(std::string_view text) {
  return !text.empty() && std::string_view("+-.0123456789").find(text.front()) != std::string_view::npos;
}

// True for "nan", "inf" and "infinity", which an unquoted text means as numbers.
bool looksLikeNonFinite(std::string_view text) {
  const std::string small = withSmallLetters(text);
  return small == "nan" || small == "inf" || small == "infinity";
}

bool isReserved(char unit) { return std::string_view("<>=!:\"+").find(unit) != std::string_view::npos; }

// True if a tolerance begins there, rightly written or not.
bool beginsTolerance(std::string_view text) {
  return text.starts_with(kTolerance) || text.starts_with(kToleranceSign) || text.starts_with(kWrongTolerance);
}

// True if an unquoted unit goes on at that place.
bool isOfUnit(std::string_view text, std::size_t at) {
  return (kBlanks.find(text[at]) == std::string_view::npos) && (text[at] == '+' || !isReserved(text[at])) &&
         !beginsTolerance(text.substr(at));
}

// Reads the number at the beginning of the text, and removes it with what separates it from the next.
std::optional<double> takeBound(std::string_view& text) {
  constexpr std::string_view kSeparators = " \t,;";
  const std::size_t length = std::min({text.find_first_of(kSeparators), text.find(".."), text.size()});
  const std::string_view bound = text.substr(0, length);
  text.remove_prefix(length);
  text.remove_prefix(std::min(text.find_first_not_of(kSeparators), text.size()));
  if (text.starts_with("..")) text.remove_prefix(2);
  text = trimmed(text);
  try {
    const Value number = parseNumber(bound);
    return toDouble(&number);
  } catch (const InputError&) {
    return std::nullopt;
  }
}

// How an interval without brackets is written, for example "in [80, 90]" for "A in 80..90"; empty for another text.
std::string intervalMeantBy(std::string_view text) {
  const std::size_t word = text.rfind(" in ");
  if (word == std::string_view::npos) return {};
  std::string_view bounds = trimmed(text.substr(word + 4));
  if (!looksLikeNumber(bounds)) return {};
  const std::optional<double> lower = takeBound(bounds);
  const std::optional<double> upper = takeBound(bounds);
  return lower && upper && lower < upper ? formatMessage("in [%@, %@]", *lower, *upper) : "in [LOWER, UPPER]";
}

// Reads a limit from left to right.
class Reader {
 public:
  explicit Reader(std::string_view text) : text_(text), rest_(text) {}

  UserLimit limit() {
    UserLimit limit;
    limit.result = name("the name of a result");
    if (take(":")) {
      limit.diagnostic = std::exchange(limit.result, {});
      limit.result = name("the name of a result");
    }
    if (takeWord("in")) {
      limit.condition = interval();
    } else {
      const LimitOperator comparison = operatorHere();
      skipBlanks();
      if (looksLikeNumber(rest_)) {
        limit.condition = comparisonWithNumber(comparison);
      } else {
        RelationCondition relation{comparison, otherResult()};
        relation.tolerance = tolerance(comparison);
        limit.condition = std::move(relation);
      }
    }
    skipBlanks();
    if (!rest_.empty()) throw InputError(formatMessage("unexpected text '%@' at the end", rest_));
    return limit;
  }

 private:
  void skipBlanks() { rest_.remove_prefix(std::min(rest_.find_first_not_of(kBlanks), rest_.size())); }

  bool take(std::string_view token) {
    skipBlanks();
    if (!rest_.starts_with(token)) return false;
    rest_.remove_prefix(token.size());
    return true;
  }

  // Takes the word if an interval follows: a result may have a name that begins with it.
  bool takeWord(std::string_view word) {
    skipBlanks();
    if (!isInterval(rest_)) return false;
    rest_.remove_prefix(word.size());
    return true;
  }

  static bool isInterval(std::string_view text) {
    if (!text.starts_with("in")) return false;
    const std::string_view after = trimmed(text.substr(2));
    return after.starts_with('[') || after.starts_with('(');
  }

  std::string quotedName() {
    std::string name;
    rest_.remove_prefix(1);
    for (;;) {
      if (rest_.empty()) throw InputError("a quotation mark is missing");
      const char unit = rest_.front();
      rest_.remove_prefix(1);
      if (unit == '"') return name;
      if (unit == '\\' && !rest_.empty() && (rest_.front() == '"' || rest_.front() == '\\')) {
        name += rest_.front();
        rest_.remove_prefix(1);
      } else {
        name += unit;
      }
    }
  }

  // An unquoted name may contain blanks. It ends before an operator, an interval, a colon or a tolerance.
  std::string name(const char* what) {
    skipBlanks();
    std::string name;
    if (rest_.starts_with('"')) {
      name = quotedName();
    } else {
      std::size_t length = 0;
      while (length < rest_.size() && !isReserved(rest_[length]) && !beginsTolerance(rest_.substr(length)) &&
             !(length > 0 && kBlanks.find(rest_[length - 1]) != std::string_view::npos &&
               isInterval(rest_.substr(length)))) {
        ++length;
      }
      name = trimmed(rest_.substr(0, length));
      rest_.remove_prefix(length);
    }
    if (name.empty()) throw InputError(formatMessage("%@ is missing", what));
    return name;
  }

  // The right side of a relation, which is one result.
  std::string otherResult() {
    skipBlanks();
    const bool isQuoted = rest_.starts_with('"');
    std::string other = name("a number or the name of a result");
    if (isQuoted) return other;
    if (looksLikeNonFinite(other)) {
      throw InputError(
          formatMessage("'%@' is not a finite number; a result of this name is written in double quotes", other));
    }
    if (isPattern(other)) {
      throw InputError(formatMessage(
          "the limit compares with one result, so '%@' cannot be a pattern; a result of this name is written in double "
          "quotes",
          other));
    }
    return other;
  }

  LimitOperator operatorHere() {
    for (const auto& [token, comparison] : kOperators) {
      if (take(token)) return comparison;
    }
    if (const std::string meant = intervalMeantBy(text_); !meant.empty()) {
      throw InputError("an interval is written in brackets: " + meant);
    }
    const std::string found = rest_.empty() ? "the end" : formatMessage("'%@'", rest_);
    throw InputError(
        formatMessage("expected <, <=, >, >=, == or 'in [LOWER, UPPER]' after the name of the result, not %@", found));
  }

  double number() {
    skipBlanks();
    const std::size_t length = std::min({rest_.find_first_of(" \t,])"), rest_.find(kTolerance),
                                         rest_.find(kToleranceSign), rest_.find(kWrongTolerance), rest_.size()});
    const std::string_view text = rest_.substr(0, length);
    rest_.remove_prefix(length);
    const Value number = parseNumber(text.size() > 1 && text.front() == '+' && text[1] != '-' ? text.substr(1) : text);
    return toDouble(&number);
  }

  std::optional<std::string> unit() {
    skipBlanks();
    if (rest_.starts_with('"')) return quotedName();
    std::size_t length = 0;
    while (length < rest_.size() && isOfUnit(rest_, length)) ++length;
    const std::string unit(rest_.substr(0, length));
    rest_.remove_prefix(length);
    return unit.empty() ? std::nullopt : std::optional(unit);
  }

  double tolerance(LimitOperator comparison) {
    if (take(kWrongTolerance)) throw InputError("a tolerance is written +-, not +/-");
    if (!take(kTolerance) && !take(kToleranceSign)) return 0;
    if (comparison != LimitOperator::kEqual) throw InputError("a tolerance needs the operator ==");
    const double tolerance = number();
    if (tolerance < 0) throw InputError("the tolerance is negative");
    return tolerance;
  }

  NumberCondition comparisonWithNumber(LimitOperator comparison) {
    NumberCondition condition{comparison, number()};
    condition.unit = unit();
    skipBlanks();
    if (!beginsTolerance(rest_)) return condition;
    condition.tolerance = tolerance(comparison);
    const std::optional<std::string> ofTolerance = unit();
    if (condition.unit && ofTolerance && condition.unit != ofTolerance) {
      throw InputError(
          formatMessage("the number is in '%@' but its tolerance is in '%@'", *condition.unit, *ofTolerance));
    }
    if (ofTolerance) condition.unit = ofTolerance;
    return condition;
  }

  IntervalCondition interval() {
    IntervalCondition condition;
    condition.lowerOpen = take("(");
    if (!condition.lowerOpen) take("[");
    condition.lower = number();
    if (!take(",")) throw InputError("a comma is missing between the two bounds");
    condition.upper = number();
    condition.upperOpen = take(")");
    if (!condition.upperOpen && !take("]")) throw InputError("a bracket is missing after the upper bound");
    const bool oneNumber = condition.lower == condition.upper && !condition.lowerOpen && !condition.upperOpen;
    if (condition.lower >= condition.upper && !oneNumber) {
      throw InputError(formatMessage("no number lies between %@ and %@", condition.lower, condition.upper));
    }
    condition.unit = unit();
    return condition;
  }

  const std::string_view text_;
  std::string_view rest_;
};

std::string quotedText(const std::string& text) {
  std::string quoted = "\"";
  for (const char unit : text) {
    if (unit == '"' || unit == '\\') quoted += '\\';
    quoted += unit;
  }
  return quoted + "\"";
}

// Quotes a name that would be read differently without quotation marks. `isLeft` is true where no number may stand, and
// a pattern may.
std::string nameText(const std::string& name, bool isLeft) {
  const bool plain = !name.empty() && trimmed(name) == name && std::none_of(name.begin(), name.end(), isReserved) &&
                     name.find(kToleranceSign) == std::string::npos && name.find(" in") == std::string::npos &&
                     name.find("\tin") == std::string::npos &&
                     (isLeft || (!looksLikeNumber(name) && !looksLikeNonFinite(name) && !isPattern(name)));
  return plain ? name : quotedText(name);
}

std::string unitText(const std::optional<std::string>& unit) {
  if (!unit) return {};
  bool plain = !unit->empty();
  for (std::size_t i = 0; i < unit->size(); ++i) plain = plain && isOfUnit(*unit, i);
  return " " + (plain ? *unit : quotedText(*unit));
}

std::string toleranceText(double tolerance) {
  return tolerance == 0 ? std::string() : formatMessage(" +- %@", tolerance);
}

std::string textOf(const NumberCondition& condition) {
  return formatMessage("%@ %@%@%@", textOf(condition.comparison), condition.number, unitText(condition.unit),
                       toleranceText(condition.tolerance));
}

std::string textOf(const RelationCondition& condition) {
  return formatMessage("%@ %@%@", textOf(condition.comparison), nameText(condition.other, false),
                       toleranceText(condition.tolerance));
}

std::string textOf(const IntervalCondition& condition) {
  return formatMessage("in %@%@, %@%@%@", condition.lowerOpen ? "(" : "[", condition.lower, condition.upper,
                       condition.upperOpen ? ")" : "]", unitText(condition.unit));
}

}  // namespace

std::string_view textOf(LimitOperator comparison) {
  return std::find_if(kOperators.begin(), kOperators.end(), [&](const auto& one) { return one.second == comparison; })
      ->first;
}

std::string_view nameOf(LimitSeverity severity) { return severity == LimitSeverity::kFail ? "fail" : "warn"; }

std::optional<LimitSeverity> limitSeverityNamed(std::string_view name) {
  for (const LimitSeverity one : {LimitSeverity::kFail, LimitSeverity::kWarn}) {
    if (nameOf(one) == name) return one;
  }
  return std::nullopt;
}

UserLimit parseUserLimit(std::string_view text) { return Reader(text).limit(); }

std::string canonicalText(const UserLimit& limit) {
  const std::string diagnostic = limit.diagnostic.empty() ? std::string() : nameText(limit.diagnostic, true) + ":";
  return diagnostic + nameText(limit.result, true) + " " + conditionText(limit);
}

std::string nameAndCondition(const UserLimit& limit) {
  const std::string name = limit.name.empty() ? std::string() : limit.name + ": ";
  return name + nameText(limit.result, true) + " " + conditionText(limit);
}

std::string labelOf(const UserLimit& limit) { return nameAndCondition(limit) + " (" + limit.source + ")"; }

std::string conditionText(const UserLimit& limit) {
  return std::visit([](const auto& condition) { return textOf(condition); }, limit.condition);
}

}  // namespace quazor
