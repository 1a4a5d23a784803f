#include "tests/attacks/results.h"

#include "contract/diagnostic_error.h"
#include "contract/unit.h"
#include "tests/attacks/ways.h"

#include <unistd.h>

#include <cstdint>
#include <cstdlib>
#include <limits>
#include <optional>
#include <utility>

namespace quazor::attacks {

namespace {

using Numbers = std::numeric_limits<double>;

const QZUnit& unit() { return QZDimensionlessUnit::events(); }

struct Bound {
  double value;
  bool isOpen = false;
};

struct Number {
  const char* kind;
  double value;
  std::optional<Bound> lower;
  std::optional<Bound> upper;
};

constexpr Bound kZero{0};

const Number kNumbers[] = {
    {"nanUnlimited", Numbers::quiet_NaN(), std::nullopt, std::nullopt},
    {"infinityUnlimited", Numbers::infinity(), std::nullopt, std::nullopt},
    {"negativeNan", -Numbers::quiet_NaN(), kZero, std::nullopt},
    {"signallingNan", Numbers::signaling_NaN(), kZero, std::nullopt},
    {"negativeInfinity", -Numbers::infinity(), std::nullopt, kZero},
    {"negativeZero", -0.0, kZero, kZero},
    {"denormal", Numbers::denorm_min(), Bound{0, true}, std::nullopt},
    {"denormalOutside", -Numbers::denorm_min(), kZero, std::nullopt},
    {"largest", Numbers::max(), kZero, Bound{Numbers::max()}},
    {"nextAfterBound", 1.0 + Numbers::epsilon(), std::nullopt, Bound{1}},
    {"onOpenBound", 0, Bound{0, true}, std::nullopt},
    {"nanBound", 1, Bound{Numbers::quiet_NaN()}, std::nullopt},
    {"infiniteBound", 1, Bound{-Numbers::infinity()}, std::nullopt},
    {"crossedBounds", 1, Bound{2}, Bound{0}},
    {"openPoint", 1, Bound{1, true}, Bound{1, true}},
    {"halfOpenPoint", 1, Bound{1}, Bound{1, true}},
    {"nothingBetween", 1, Bound{1, true}, Bound{1.0 + Numbers::epsilon(), true}},
};

DiagnosticErrorPtr chain(int length) {
  DiagnosticErrorPtr error;
  for (int i = 0; i < length; ++i) error = errorWithMessage("Chain", i, "link", error);
  return error;
}

Value deep(int levels) {
  Value value("the innermost");
  for (int i = 0; i < levels; ++i) value = Array{std::move(value)};
  return value;
}

DiagnosticErrorPtr errorWithInfo(std::string_view key, Value value) {
  Dictionary info;
  info.set(key, std::move(value));
  return std::make_shared<DiagnosticError>("Info", 1, std::move(info));
}

}  // namespace

void findNumber(std::string_view kind, QZAnalysisResult& result) {
  QZMeasuredResult found("Answer", Measurement(42, unit()));
  QZLimit limit("AnswerLimit");
  if (kind == "otherUnit") {
    limit.setLowerBound(std::make_shared<QZBound>(Measurement(0, QZUnit::unitWithSymbol("parsec")), false));
  }
  bool isKnown = kind == "otherUnit" || kind == "emptyLimit" || kind == "sameNameTwice" || kind.empty();
  for (const Number& one : kNumbers) {
    if (kind != one.kind) continue;
    isKnown = true;
    found = QZMeasuredResult("Answer", Measurement(one.value, unit()));
    if (!one.lower && !one.upper) {
      result.measuredResults().push_back(std::move(found));
      return;
    }
    if (one.lower) {
      limit.setLowerBound(std::make_shared<QZBound>(Measurement(one.lower->value, unit()), one.lower->isOpen));
    }
    if (one.upper) {
      limit.setUpperBound(std::make_shared<QZBound>(Measurement(one.upper->value, unit()), one.upper->isOpen));
    }
  }
  if (!isKnown) ::_exit(99);  // the tests expect no such end
  found.setLimit(std::move(limit));
  result.measuredResults().push_back(found);
  if (kind == "sameNameTwice") result.measuredResults().push_back(std::move(found));
}

DiagnosticErrorPtr errorToGive(std::string_view kind) {
  if (kind == "noDomain") return errorWithMessage("", 0, "", nullptr);
  if (kind == "smallestCode") return errorWithMessage("Domain", INT64_MIN, "smallest", nullptr);
  if (kind == "largestCode") return errorWithMessage("Domain", INT64_MAX, "largest", nullptr);
  if (kind == "longChain") return chain(20'000);
  if (kind == "deepInfo") return errorWithInfo("deep", deep(20'000));
  if (kind == "wideInfo") {
    Dictionary info;
    for (int i = 0; i < 20'000; ++i) info.set(std::to_string(i), i);
    return std::make_shared<DiagnosticError>("Info", 1, std::move(info));
  }
  if (kind == "numberForMessage") return errorWithInfo(localizedDescriptionKey, 7);
  if (kind == "textForCause") return errorWithInfo(underlyingErrorKey, "a text");
  if (kind == "oddKey") return errorWithInfo(oddText("bytes"), oddText("bytes"));
  if (kind == "largeMessage") return errorWithMessage("Domain", 1, std::string(1U << 22U, 'x'), nullptr);
  if (kind == "tooLarge") return errorWithMessage("Domain", 1, std::string(70U << 20U, 'x'), nullptr);
  return nullptr;
}

void measureText(std::string_view surface, std::string_view kind, QZExperimentResult& result) {
  const std::string text = oddText(kind);
  if (surface == "measurement") result.measurements().set(text, Measurement(1, unit()));
  if (surface == "unit") result.measurements().set("Odd", Measurement(1, QZUnit::unitWithSymbol(text)));
  if (surface == "data") result.auxiliaryData().set(text, text);
}

void findText(std::string_view surface, std::string_view kind, QZAnalysisResult& result) {
  const std::string text = oddText(kind);
  const QZUnit& used = surface == "unit" ? QZUnit::unitWithSymbol(text) : unit();
  QZMeasuredResult found(surface == "result" ? text : "Answer", Measurement(42, used));
  QZLimit limit(surface == "limit" ? text : "AnswerLimit");
  limit.setLowerBound(std::make_shared<QZBound>(Measurement(0, used), false));
  found.setLimit(std::move(limit));
  result.measuredResults().push_back(std::move(found));
}

std::string oddText(std::string_view kind) {
  using namespace std::string_literals;
  if (kind == "empty") return "";
  if (kind == "path") return "../../etc/passwd";
  if (kind == "control") return "a\r\nb\tc\x1b[2J\x07\x7f\xC2\x9b";
  if (kind == "nul") return "a\0b"s;
  if (kind == "direction") return "a\u202Eb\u2066c\u200Fd";
  if (kind == "bytes") return "\xFF\xC3(\xF0\x9F\x98";
  if (kind == "surrogate") return "\xED\xA0\x80\xC0\xAF\xF5\x80\x80\x80";
  if (kind == "markup") return "<a href=\"&amp;]]>'\\u0000{}%s%n</testcase>";
  if (kind == "formula") return "=cmd|' /C calc'!A0";
  if (kind == "long") return std::string(1U << 20U, 'n');
  return "--help";
}

std::string stateFile(std::string_view name) {
  const char* const folder = std::getenv("QUAZOR_ATTACK_STATE");
  return std::string(folder == nullptr ? "/tmp" : folder) + "/" + std::string(name);
}

}  // namespace quazor::attacks
