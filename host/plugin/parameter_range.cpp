#include "host/plugin/parameter_range.h"

#include "base/text/control_characters.h"
#include "base/text/input_error.h"
#include "base/text/nearest_name.h"
#include "base/text/utf8.h"
#include "contract/message_format.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <optional>
#include <string_view>
#include <vector>

namespace quazor {

namespace {

using Json = nlohmann::ordered_json;
using End = QZParameterRange::End;

constexpr double kInfinity = std::numeric_limits<double>::infinity();

// Holds every integer of 64 bits and every double exactly.
using Exact = long double;
static_assert(std::numeric_limits<Exact>::digits >= 64);

bool isWithin(const QZParameterRange& range, Exact number) {
  const std::optional<End>& minimum = range.minimum();
  const std::optional<End>& maximum = range.maximum();
  if (minimum && !(minimum->open ? number > minimum->value : number >= minimum->value)) return false;
  if (maximum && !(maximum->open ? number < maximum->value : number <= maximum->value)) return false;
  return !range.integer() || std::trunc(number) == number;
}

std::optional<Exact> exactNumber(const Value& value) {
  if (const std::int64_t* const number = value.signedInteger()) return static_cast<Exact>(*number);
  if (const std::uint64_t* const number = value.unsignedInteger()) return static_cast<Exact>(*number);
  return value.isNumber() ? std::optional<Exact>(toDouble(&value)) : std::nullopt;
}

void requireFinite(const std::optional<double>& number, std::string_view what) {
  if (number && !std::isfinite(*number)) {
    throw InputError(formatMessage("its %@ is %@, but must be a finite number", what, *number));
  }
}

std::optional<double> valueOf(const std::optional<End>& end) { return end ? std::optional(end->value) : std::nullopt; }

// The number of the range that is nearest to its minimum, with the range's own steps.
double smallestOf(const QZParameterRange& range) {
  const End& minimum = *range.minimum();
  if (!range.integer()) return minimum.open ? std::nextafter(minimum.value, kInfinity) : minimum.value;
  const double whole = std::ceil(minimum.value);
  return minimum.open && whole == minimum.value ? std::max(whole + 1, std::nextafter(whole, kInfinity)) : whole;
}

void validateUnit(const std::string& unit) {
  if (findInvalidUtf8(unit) || hasControlCharacter(unit)) {
    throw InputError("its unit is not one line of UTF-8");
  }
}

}  // namespace

void validateRange(const QZParameterRange& range) {
  requireFinite(valueOf(range.minimum()), "minimum");
  requireFinite(valueOf(range.maximum()), "maximum");
  requireFinite(range.defaultValue(), "default");
  if (range.minimum() && range.maximum() && !isWithin(range, smallestOf(range))) {
    throw InputError(formatMessage("no number is %@", rangeText(range)));
  }
  if (range.defaultValue() && !isWithin(range, *range.defaultValue())) {
    throw InputError(formatMessage("its default %@ is not %@", *range.defaultValue(), rangeText(range)));
  }
  validateUnit(range.unit());
}

void validateRanges(const OrderedMap<QZParameterRange>& ranges, const QZDescription& description) {
  for (const auto& [name, range] : ranges) {
    const QZNumberParameter* const parameter = description.parameters().find(name);
    if (parameter == nullptr) {
      std::vector<std::string> names;
      for (const auto& [known, ignored] : description.parameters()) names.push_back(known);
      throw InputError("the range of '" + name + "', which is not one of its parameters" + didYouMean(name, names));
    }
    const std::string what = "the range of '" + name + "': ";
    try {
      validateRange(range);
    } catch (const InputError& problem) {
      throw InputError(what + problem.what());
    }
    if (range.defaultValue() && parameter->required()) {
      throw InputError(what + "the parameter is required and can have no default");
    }
  }
}

bool accepts(const QZParameterRange& range, const Value& value) {
  const std::optional<Exact> number = exactNumber(value);
  return number && !std::isnan(*number) && isWithin(range, *number);
}

std::string rangeText(const QZParameterRange& range) {
  const std::optional<End>& minimum = range.minimum();
  const std::optional<End>& maximum = range.maximum();
  std::string text = range.integer() ? "an integer" : "";
  std::string_view before = text.empty() ? "" : " ";
  if (minimum) {
    text += formatMessage("%@%@ %@", before, minimum->open ? ">" : ">=", minimum->value);
    before = " and ";
  }
  if (maximum) text += formatMessage("%@%@ %@", before, maximum->open ? "<" : "<=", maximum->value);
  if (text.empty()) text = "a number";
  if (range.unit().empty()) return text;
  return text + (minimum || maximum ? " " : " of ") + range.unit();
}

Json rangeJson(const QZParameterRange& range) {
  Json json = Json::object();
  if (const auto& minimum = range.minimum()) json[minimum->open ? "exclusiveMinimum" : "minimum"] = minimum->value;
  if (const auto& maximum = range.maximum()) json[maximum->open ? "exclusiveMaximum" : "maximum"] = maximum->value;
  if (range.integer()) json["integer"] = true;
  if (!range.unit().empty()) json["unit"] = range.unit();
  if (range.defaultValue()) json["default"] = *range.defaultValue();
  return json;
}

QZParameterRange rangeFrom(const JsonCursor& object) {
  const auto numberAt = [&object](std::string_view key) -> std::optional<double> {
    const std::optional<JsonCursor> entry = object.find(key);
    if (!entry) return std::nullopt;
    if (!entry->isNumber()) entry->failType("a number");
    const Value number = entry->scalar();
    return toDouble(&number);
  };
  object.allowKeys({"minimum", "exclusiveMinimum", "maximum", "exclusiveMaximum", "integer", "unit", "default"});
  QZParameterRange range;
  for (const bool open : {false, true}) {
    const std::string_view minimum = open ? "exclusiveMinimum" : "minimum";
    const std::string_view maximum = open ? "exclusiveMaximum" : "maximum";
    if (open && range.minimum() && object.find(minimum)) object.fail("has two minimums; remove one.");
    if (open && range.maximum() && object.find(maximum)) object.fail("has two maximums; remove one.");
    if (const std::optional<double> number = numberAt(minimum)) range.setMinimum(*number, open);
    if (const std::optional<double> number = numberAt(maximum)) range.setMaximum(*number, open);
  }
  if (const std::optional<JsonCursor> integer = object.find("integer"); integer && integer->boolean()) {
    range.setInteger();
  }
  if (const std::optional<JsonCursor> unit = object.find("unit")) range.setUnit(unit->text());
  if (const std::optional<double> number = numberAt("default")) range.setDefault(*number);
  try {
    validateRange(range);
  } catch (const InputError& problem) {
    object.fail(std::string("is not a range: ") + problem.what() + ".");
  }
  return range;
}

}  // namespace quazor
