#include "host/report/page/results_table.h"

#include "contract/message_format.h"
#include "host/model/limit_check.h"
#include "host/report/page/html.h"
#include "host/report/page/limit_bar.h"
#include "host/report/text_report.h"
#include "host/text/number_text.h"

#include <algorithm>
#include <cstddef>
#include <iterator>
#include <string_view>
#include <variant>

namespace quazor {

namespace {

std::string signOf(std::string_view verdict) {
  if (verdict == "pass") return "\xE2\x9C\x93";
  if (verdict == "fail") return "\xE2\x9C\x97";
  return verdict == "skip" ? "\xE2\x80\x93" : "!";
}

// One limit of a result. A result without a limit has one row, too.
struct Row {
  std::string limit;   // as text
  std::string source;  // of a limit of the user; empty for the plug-in's
  bool onlyWarns = false;
  std::optional<QZLimit> bounds;
  std::string_view verdict;
};

// A result with all its limits.
struct Group {
  const QZMeasuredResult& result;
  std::vector<Row> rows;
  std::vector<double> thresholds;  // of all its limits
  bool isWhole = false;            // the value is not rounded
};

// True if a limit of the user compares the result with another one. Both are shown whole, so that they can be compared.
bool isCompared(const QZMeasuredResult& result, const std::vector<LimitCheck>& checks) {
  return std::ranges::any_of(checks, [&result](const LimitCheck& check) {
    const auto* const relation = std::get_if<RelationCondition>(&check.limit.condition);
    return relation != nullptr && (relation->other == result.name() || check.result.name() == result.name());
  });
}

// The limits of the user stand alone if the plug-in has none.
Group groupOf(const DiagnosticRecord& record, std::size_t index, const std::vector<LimitCheck>& checks) {
  const JudgedResult& one = record.measuredResults[index];
  Group group{one.result, {}, {}, isCompared(one.result, checks)};
  const std::vector<LimitCheck> own = checksOfResult(checks, index);
  if (one.result.limit() || own.empty()) {
    group.rows.push_back({limitText(one.result.limit()), {}, false, one.result.limit(), nameOf(one.verdict)});
  }
  addBounds(one.result.limit(), group.thresholds);
  for (const LimitCheck& check : own) {
    group.rows.push_back(
        {nameAndCondition(check.limit), check.limit.source, !check.counts(), boundsOf(check), check.verdictName()});
    addBounds(boundsOf(check), group.thresholds);
  }
  return group;
}

// What needs attention has the lowest rank.
int rankOf(std::string_view verdict) {
  constexpr std::string_view kOrder[] = {"fail", "error", "skip", "warn", "pass", "none"};
  return static_cast<int>(std::ranges::find(kOrder, verdict) - std::begin(kOrder));
}

int rankOf(const Group& group) {
  int rank = rankOf("none");
  for (const Row& row : group.rows) rank = std::min(rank, rankOf(row.verdict));
  return rank;
}

// The columns that a table has because something is in them.
struct Columns {
  bool source = false;
  bool bar = false;
};

std::string barOf(const Row& row, double value) {
  const bool isOutside = row.verdict == "fail" || row.verdict == "warn";
  return isOutside || row.verdict == "pass" ? limitBar(value, row.bounds, !isOutside) : std::string();
}

std::string sourceCell(const Row& row) {
  if (row.source.empty()) return element("td class=\"soft\"", row.verdict == "none" ? "" : "the plug-in");
  return element("td", htmlText(row.source) + (row.onlyWarns ? element("small", "only warns") : ""));
}

// The name, the value and the unit stand once for all limits of the result.
std::string rowsOf(const Group& group, Columns columns) {
  const Measurement& measurement = group.result.measurement();
  const std::size_t count = group.rows.size();
  const std::string span = count > 1 ? " rowspan=\"" + std::to_string(count) + "\"" : "";
  std::string cells = element("th scope=\"row\"" + span, breakableName(group.result.name()));
  cells += group.isWhole ? element("td class=\"number\"" + span, defaultText(measurement.value()))
                         : numberCell(measurement.value(), group.thresholds, span);
  cells += element("td" + span, htmlText(measurement.unit().symbol()));
  std::string html;
  for (const Row& row : group.rows) {
    const bool isOutside = row.verdict == "fail" || row.verdict == "warn";
    const std::string deviation = isOutside ? deviationText(measurement.value(), row.bounds) : std::string();
    cells += element("td", verdictBadge(row.verdict) + (deviation.empty() ? "" : element("small", deviation)));
    cells += element("td", htmlText(row.limit));
    if (columns.source) cells += sourceCell(row);
    if (columns.bar) cells += element("td", barOf(row, measurement.value()));
    html += element(isOutside || row.verdict == "error" ? "tr class=\"bad\"" : "tr", cells) + "\n";
    cells.clear();
  }
  return html;
}

std::string sentence(const Group& group, const std::optional<QZLimit>& bounds, const std::string& limit) {
  const Measurement& measurement = group.result.measurement();
  const std::string deviation = deviationText(measurement.value(), bounds);
  const double number = measurement.value();
  const std::string value = group.isWhole ? defaultText(number) : shownNumber(number, group.thresholds);
  std::string text = element("strong", htmlText(group.result.name())) + " is ";
  text += element("strong", htmlText(value + " " + measurement.unit().symbol()));
  text += deviation.empty() ? ", outside the limit" : ", " + element("strong", deviation);
  return text + " (" + htmlText(limit) + ").";
}

std::string problemSentence(const QZMeasuredResult& result, const std::string& problem) {
  return element("strong", htmlText(result.name())) + " cannot be judged: " + htmlText(problem) + ".";
}

}  // namespace

std::string verdictBadge(std::string_view verdict) {
  if (verdict == "none") return element("span class=\"none\"", "\xE2\x80\x93");
  const std::string word(verdict);
  return element("span class=\"badge " + word + "\"",
                 element("span aria-hidden=\"true\"", signOf(verdict)) + "\xC2\xA0" + word);
}

std::string resultsTable(const DiagnosticRecord& record) {
  if (record.measuredResults.empty()) return {};
  const std::vector<LimitCheck> checks = limitChecksOf(record);
  std::vector<Group> groups;
  Columns columns{!checks.empty(), false};
  for (std::size_t i = 0; i < record.measuredResults.size(); ++i) {
    const Group& group = groups.emplace_back(groupOf(record, i, checks));
    const double value = group.result.measurement().value();
    const auto hasBar = [value](const Row& row) { return !barOf(row, value).empty(); };
    columns.bar = columns.bar || std::ranges::any_of(group.rows, hasBar);
  }
  std::vector<const Group*> ordered;
  for (const Group& group : groups) ordered.push_back(&group);
  std::ranges::stable_sort(ordered, {}, [](const Group* group) { return rankOf(*group); });
  std::string rows;
  for (const Group* const group : ordered) rows += rowsOf(*group, columns);
  return "<table class=\"results\"><caption>Results and their limits</caption><thead><tr><th scope=\"col\">Result</th>"
         "<th scope=\"col\" class=\"number\">Value</th><th scope=\"col\">Unit</th><th scope=\"col\">Verdict</th>"
         "<th scope=\"col\">Limit</th>" +
         std::string(columns.source ? "<th scope=\"col\">Limit from</th>" : "") +
         (columns.bar ? "<th scope=\"col\">In the limit</th>" : "") + "</tr></thead>\n<tbody>\n" + rows +
         "</tbody></table>\n";
}

std::vector<std::string> failureSentences(const DiagnosticRecord& record) {
  const std::vector<LimitCheck> checks = limitChecksOf(record);
  std::vector<std::string> sentences;
  for (std::size_t i = 0; i < record.measuredResults.size(); ++i) {
    const JudgedResult& one = record.measuredResults[i];
    const Group group = groupOf(record, i, checks);
    if (one.verdict == ResultVerdict::kFail) {
      sentences.push_back(sentence(group, one.result.limit(), limitText(one.result.limit())));
    } else if (one.verdict == ResultVerdict::kError) {
      sentences.push_back(problemSentence(one.result, one.problem));
    }
    const bool isInOwnLimit = one.result.limit() && one.verdict == ResultVerdict::kPass;
    const std::string inOwnLimit =
        isInOwnLimit ? " The plug-in's own limit is met (" + htmlText(limitText(one.result.limit())) + ")." : "";
    for (const LimitCheck& check : checksOfResult(checks, i)) {
      if (check.passed || check.skipped || !check.counts()) continue;
      sentences.push_back(check.problem.empty() ? sentence(group, boundsOf(check), labelOf(check.limit)) + inOwnLimit
                                                : problemSentence(check.result, check.problem));
    }
  }
  return sentences;
}

}  // namespace quazor
