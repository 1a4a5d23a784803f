#include "host/report/page/results_table.h"

#include "contract/message_format.h"
#include "host/model/limit_check.h"
#include "host/report/page/html.h"
#include "host/report/page/limit_bar.h"
#include "host/report/text_report.h"

#include <cstddef>
#include <string_view>

namespace quazor {

namespace {

std::string signOf(std::string_view verdict) {
  if (verdict == "pass") return "\xE2\x9C\x93";
  if (verdict == "fail") return "\xE2\x9C\x97";
  return verdict == "skip" ? "\xE2\x80\x93" : "!";
}

struct Row {
  const QZMeasuredResult& result;
  std::string limit;  // as text
  std::optional<QZLimit> bounds;
  std::string_view severity;  // of a limit of the user; empty for the plug-in's
  std::string_view verdict;
};

std::string rowOf(const Row& row, bool showsSeverity) {
  const Measurement& measurement = row.result.measurement();
  const bool isOutside = row.verdict == "fail" || row.verdict == "warn";
  const bool isJudged = isOutside || row.verdict == "pass";
  const std::string deviation = isOutside ? deviationText(measurement.value(), row.bounds) : std::string();
  std::string cells = element("th scope=\"row\"", htmlText(row.result.name()));
  cells += element("td class=\"number\"", htmlText(defaultText(measurement.value())));
  cells += element("td", htmlText(measurement.unit().symbol()));
  cells += element("td", htmlText(row.limit));
  if (showsSeverity) cells += element("td", row.severity.empty() ? "\xE2\x80\x93" : row.severity);
  cells += element("td", isJudged ? limitBar(measurement.value(), row.bounds, !isOutside) : std::string());
  cells += element("td", verdictBadge(row.verdict) + (deviation.empty() ? "" : element("small", deviation)));
  return element(isOutside || row.verdict == "error" ? "tr class=\"bad\"" : "tr", cells) + "\n";
}

std::string sentence(const QZMeasuredResult& result, const std::optional<QZLimit>& bounds, const std::string& limit) {
  const Measurement& measurement = result.measurement();
  const std::string deviation = deviationText(measurement.value(), bounds);
  std::string text = element("strong", htmlText(result.name())) + " is ";
  text += element("strong", htmlText(formatMessage("%@ %@", measurement.value(), measurement.unit().symbol())));
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
  const bool showsSeverity = !checks.empty();
  std::string rows;
  for (std::size_t i = 0; i < record.measuredResults.size(); ++i) {
    const JudgedResult& one = record.measuredResults[i];
    rows +=
        rowOf({one.result, limitText(one.result.limit()), one.result.limit(), {}, nameOf(one.verdict)}, showsSeverity);
    for (const LimitCheck& check : checksOfResult(checks, i)) {
      rows += rowOf(
          {check.result, labelOf(check.limit), boundsOf(check), nameOf(check.limit.severity), check.verdictName()},
          showsSeverity);
    }
  }
  return "<table class=\"results\"><caption>Results and their limits</caption><thead><tr><th scope=\"col\">Result</th>"
         "<th scope=\"col\">Value</th><th scope=\"col\">Unit</th><th scope=\"col\">Limit</th>" +
         (showsSeverity ? element("th scope=\"col\"", "Severity") : "") +
         "<th scope=\"col\">In the limit</th><th scope=\"col\">Verdict</th></tr></thead>\n<tbody>\n" + rows +
         "</tbody></table>\n";
}

std::vector<std::string> failureSentences(const DiagnosticRecord& record) {
  const std::vector<LimitCheck> checks = limitChecksOf(record);
  std::vector<std::string> sentences;
  for (std::size_t i = 0; i < record.measuredResults.size(); ++i) {
    const JudgedResult& one = record.measuredResults[i];
    if (one.verdict == ResultVerdict::kFail) {
      sentences.push_back(sentence(one.result, one.result.limit(), limitText(one.result.limit())));
    } else if (one.verdict == ResultVerdict::kError) {
      sentences.push_back(problemSentence(one.result, one.problem));
    }
    for (const LimitCheck& check : checksOfResult(checks, i)) {
      if (check.passed || check.skipped || !check.counts()) continue;
      sentences.push_back(check.problem.empty() ? sentence(check.result, boundsOf(check), labelOf(check.limit))
                                                : problemSentence(check.result, check.problem));
    }
  }
  return sentences;
}

}  // namespace quazor
