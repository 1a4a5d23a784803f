#include "host/command/review_rules.h"

#include "base/text/control_characters.h"
#include "base/text/letter_case.h"
#include "base/text/name_list.h"
#include "contract/message_format.h"
#include "host/text/display_width.h"
#include "host/text/table.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <cstddef>
#include <cstdio>
#include <set>
#include <utility>

namespace quazor {

namespace {

constexpr std::size_t kMaxLetters = 48;   // a table of results has room for it in 80 columns
constexpr std::size_t kMaxSummary = 160;  // two lines of a terminal
constexpr std::size_t kMaxListed = 5;     // names in one finding
constexpr std::chrono::milliseconds kMaxTime{500};
constexpr std::uint64_t kMaxBytes = 64ULL * 1024 * 1024;

bool isUpper(char unit) { return unit >= 'A' && unit <= 'Z'; }
bool isLower(char unit) { return unit >= 'a' && unit <= 'z'; }
bool isDigit(char unit) { return unit >= '0' && unit <= '9'; }
bool isWordUnit(char unit) { return isUpper(unit) || isLower(unit) || isDigit(unit); }

// Letters and digits in parts that begin with a capital and are separated by dots.
bool hasUsualForm(std::string_view name) {
  bool begins = true;
  for (const char unit : name) {
    if (begins ? !isUpper(unit) : !isWordUnit(unit) && unit != '.') return false;
    begins = unit == '.';
  }
  return !begins;
}

// What a shell, a pattern of names or an option of quazor would read as something else.
bool isMisread(char unit) {
  return std::string_view(" *?[]:=,'\"\\$`&|;<>(){}#!~/").find(unit) != std::string_view::npos;
}

std::string listed(const std::vector<std::string>& names) { return listText(names, kMaxListed); }

// Units by the symbols of the International System, and the counts that diagnostics use.
bool isKnownUnit(const std::string& symbol) {
  static const std::set<std::string_view> known = {
      "frames",  "frames/s", "errors", "events", "images", "pixels", "px",    "bytes", "B",        "kB", "MB",
      "samples", "counts",   "s",      "ms",     "us",     "µs",     "ns",    "min",   "h",        "Hz", "kHz",
      "MHz",     "GHz",      "fps",    "V",      "mV",     "uV",     "µV",    "A",     "mA",       "uA", "µA",
      "W",       "mW",       "uW",     "µW",     "Ohm",    "Ω",      "kΩ",    "F",     "nF",       "pF", "J",
      "mJ",      "K",        "°C",     "degC",   "C",      "m",      "cm",    "mm",    "um",       "µm", "nm",
      "g",       "kg",       "N",      "Pa",     "hPa",    "kPa",    "T",     "mT",    "uT",       "µT", "lux",
      "lx",      "lm",       "cd",     "dB",     "deg",    "°",      "rad",   "%",     "permille", "‰",  "ppm",
      "bit",     "bits",     "LSB",    "m/s",    "m/s2",   "m/s²",   "rad/s", "1"};
  return known.contains(symbol);
}

std::string numberText(const char* format, double number) {
  char text[32];
  std::snprintf(text, sizeof text, format, number);
  return text;
}

// More than one sentence: a full stop and a blank before a capital.
bool hasSeveralSentences(const std::string& text) {
  for (std::size_t i = 0; i + 2 < text.size(); ++i) {
    if (text[i] == '.' && text[i + 1] == ' ' && isUpper(text[i + 2])) return true;
  }
  return false;
}

void reviewUnits(const DiagnosticRecord& record, ReviewFindings& findings) {
  std::vector<std::string> without;
  std::set<std::string> unknown;
  const auto look = [&](const std::string& name, const Measurement& measurement) {
    const std::string& symbol = measurement.unit().symbol();
    if (symbol.empty()) {
      without.push_back(name);
    } else if (!isKnownUnit(symbol)) {
      unknown.insert(symbol);
    }
  };
  for (const JudgedResult& one : record.measuredResults) look(one.result.name(), one.result.measurement());
  if (record.experimentOnly) {
    for (const auto& [name, measurement] : record.measurements) look(name, measurement);
  }
  if (!without.empty()) {
    findings.push_back({Rating::kAdvice, record.name,
                        "no unit: " + listed(without) + "; counts use QZDimensionlessUnit (contract/unit.h)"});
  }
  if (!unknown.empty()) {
    findings.push_back({Rating::kAdvice, record.name,
                        "unusual unit: " + listed({unknown.begin(), unknown.end()}) +
                            "; use the symbol of an SI unit, or frames, errors or events for counts"});
  }
}

}  // namespace

std::string_view nameOf(Rating rating) {
  constexpr std::array<std::string_view, 3> kNames{"ok", "advice", "problem"};
  return kNames[static_cast<std::size_t>(rating)];
}

ReviewFindings reviewName(std::string_view kind, const std::string& name) {
  const std::string subject = "name";
  if (name.empty()) return {{Rating::kProblem, subject, formatMessage("an empty name of a %@; give it one", kind)}};
  if (hasControlCharacter(name) || std::any_of(name.begin(), name.end(), isMisread)) {
    return {{Rating::kProblem, subject,
             formatMessage("'%@' has characters that a shell or an option of quazor reads as something else; use "
                           "letters, digits and dots",
                           name)}};
  }
  ReviewFindings findings;
  if (!hasUsualForm(name)) {
    findings.push_back({Rating::kAdvice, subject,
                        formatMessage("'%@' is unlike others; use English letters and digits, in parts that begin "
                                      "with a capital and are separated by dots, as in Example%@.Front",
                                      name, kind)});
  }
  if (name.find(kind) == std::string::npos) {
    findings.push_back({Rating::kAdvice, subject,
                        formatMessage("'%@' does not say that it is a%@ %@; users see such names side by side, so "
                                      "put the word %@ into it",
                                      name, kind.starts_with('D') ? "" : "n", withSmallLetters(kind), kind)});
  }
  if (widthOf(name) > kMaxLetters) {
    findings.push_back({Rating::kAdvice, subject,
                        formatMessage("'%@' has %@ characters; more than %@ do not fit into a report of 80 columns",
                                      name, widthOf(name), kMaxLetters)});
  }
  return findings;
}

ReviewFindings reviewParameterName(const std::string& owner, const std::string& name) {
  const bool isUsual = !name.empty() && isLower(name.front()) &&
                       std::all_of(name.begin(), name.end(), [](char unit) { return isWordUnit(unit) || unit == '_'; });
  if (isUsual) return {};
  const bool isUsable =
      !name.empty() && name.find('.') == std::string::npos && std::none_of(name.begin(), name.end(), isMisread);
  return {{isUsable ? Rating::kAdvice : Rating::kProblem, owner,
           formatMessage("the parameter '%@' %@; begin with a small letter and use English letters, digits and "
                         "underscores",
                         name, isUsable ? "is unlike others" : "cannot be set with --set NAME=VALUE")}};
}

ReviewFindings reviewParameterRange(const std::string& owner, const std::string& name,
                                    const QZNumberParameter& declaration, const QZParameterRange* range) {
  const bool hasRange = range != nullptr && (range->minimum() || range->maximum());
  // An integer may be a position or a choice.
  const bool hasUnit = range != nullptr && (range->integer() || !range->unit().empty());
  const bool hasDefault = declaration.required() || (range != nullptr && range->defaultValue());
  std::string missing;
  for (const auto& [isThere, what] : {std::pair(hasRange, "range"), {hasUnit, "unit"}, {hasDefault, "default"}}) {
    if (!isThere) missing += (missing.empty() ? "no " : ", no ") + std::string(what);
  }
  if (missing.empty()) return {};
  return {{Rating::kAdvice, owner,
           formatMessage("the parameter '%@' has %@, so that 'quazor describe' cannot show it; give it with "
                         "QZParameterRanges (contract/parameter_range.h) or in explanations",
                         name, missing)}};
}

ReviewFindings reviewSummary(const std::string& subject, const std::string& summary, bool mayBeSeveral) {
  if (summary.empty()) {
    return {{Rating::kProblem, subject, "has no summary; say in one sentence what it does"}};
  }
  std::string withoutLineEnds = summary;
  std::erase(withoutLineEnds, '\n');  // these have a finding of their own
  if (hasControlCharacter(withoutLineEnds)) {
    return {{Rating::kProblem, subject, "its summary has a control character; write plain text"}};
  }
  std::vector<std::string> wrong;
  if (summary.find('\n') != std::string::npos) wrong.emplace_back("has a line end");
  if (summary.front() == ' ' || summary.back() == ' ') wrong.emplace_back("begins or ends with a space");
  if (isLower(summary.front())) wrong.emplace_back("begins with a small letter");
  const std::size_t last = summary.find_last_not_of(' ');
  if (last == std::string::npos || summary[last] != '.') wrong.emplace_back("does not end with a full stop");
  if (!mayBeSeveral && hasSeveralSentences(summary)) wrong.emplace_back("has several sentences");
  if (widthOf(summary) > kMaxSummary)
    wrong.emplace_back("is longer than " + std::to_string(kMaxSummary) + " characters");
  if (wrong.empty()) return {};
  return {{Rating::kAdvice, subject,
           formatMessage("its summary, '%@', %@; write %@", summary, listed(wrong),
                         mayBeSeveral ? "whole sentences" : "one sentence")}};
}

ReviewFindings reviewLinking(const LinkProperties& linked) {
  const std::string hardening = "hardening";
  ReviewFindings findings;
  if (linked.hasExecutableStack) {
    findings.push_back({Rating::kProblem, hardening,
                        "its stack is executable, in every process that loads it; link with -Wl,-z,noexecstack"});
  }
  if (linked.hasTextRelocations) {
    findings.push_back({Rating::kProblem, hardening, "its code is changed while it is loaded; compile with -fPIC"});
  }
  std::vector<std::string> options;
  if (!linked.bindsNow) options.emplace_back("link with -Wl,-z,now");
  if (!linked.protectsRelocations) options.emplace_back("link with -Wl,-z,relro");
  if (!linked.hasStackProtector) options.emplace_back("compile with -fstack-protector-strong");
  if (!options.empty()) {
    findings.push_back({Rating::kAdvice, hardening, listed(options) + "; quazor_add_plugin() of CMake does"});
  }
  if (findings.empty()) {
    findings.push_back(
        {Rating::kOk, hardening, "functions are bound at the start, relocations are read-only, stacks are checked"});
  }
  for (const std::string& entry : linked.runPath) {
    if (entry.starts_with('/')) {
      findings.push_back({Rating::kAdvice, "run path",
                          formatMessage("libraries are searched in '%@', which another machine may not have; a path "
                                        "that begins with $ORIGIN goes with the file",
                                        entry)});
    } else if (entry != "$ORIGIN" && !entry.starts_with("$ORIGIN/") && !entry.starts_with("${ORIGIN}")) {
      findings.push_back({Rating::kProblem, "run path",
                          formatMessage("libraries are searched in '%@', which depends on the working directory, so "
                                        "that others could put a library there; begin it with $ORIGIN",
                                        entry)});
    }
  }
  return findings;
}

ReviewFinding reviewCost(const std::string& subject, const Cost& cost) {
  const double milliseconds = std::chrono::duration<double, std::milli>(cost.time).count();
  std::string text = numberText("%.1f ms", milliseconds) + ", " +
                     numberText("%.1f MiB", static_cast<double>(cost.bytes) / (1024 * 1024));
  const bool isSlow = cost.time > kMaxTime;
  if (!isSlow && cost.bytes <= kMaxBytes) return {Rating::kOk, subject, std::move(text)};
  text += isSlow ? "; every command waits for it" : "; every process of a run needs it";
  return {Rating::kAdvice, subject, text + "; do the work in the setup or run of an experiment"};
}

ReviewFindings reviewResults(const DiagnosticRecord& record,
                             const std::function<bool(const std::string& name)>& isExplained) {
  ReviewFindings findings;
  if (record.experimentOnly) {
    findings.push_back({Rating::kOk, record.name,
                        countText(record.measurements.size(), "measurement") + ", " +
                            std::to_string(record.auxiliaryData.size()) + " of other data"});
    reviewUnits(record, findings);
    return findings;
  }
  std::vector<std::string> unexplained;
  std::size_t limited = 0;
  for (const JudgedResult& one : record.measuredResults) {
    if (one.verdict == ResultVerdict::kNone) continue;
    ++limited;
    if (!isExplained(one.result.name())) unexplained.push_back(one.result.name());
  }
  if (limited == 0) {
    findings.push_back({Rating::kProblem, record.name,
                        formatMessage("it can never fail: no limit on any of %@; give a result a limit",
                                      countText(record.measuredResults.size(), "result"))});
  } else {
    findings.push_back({Rating::kOk, record.name,
                        formatMessage("%@, %@ with %@", countText(record.measuredResults.size(), "result"), limited,
                                      limited == 1 ? "a limit" : "limits")});
  }
  reviewUnits(record, findings);
  if (!unexplained.empty()) {
    findings.push_back({Rating::kAdvice, record.name,
                        formatMessage("if %@ %@, 'quazor explain' has no answer; write explanations "
                                      "(explanations.md in share/doc/quazor)",
                                      listed(unexplained), unexplained.size() == 1 ? "fails" : "fail")});
  }
  return findings;
}

}  // namespace quazor
