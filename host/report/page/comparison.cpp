#include "host/report/page/comparison.h"

#include "contract/message_format.h"
#include "host/model/trials.h"
#include "host/report/page/document.h"
#include "host/report/page/frames_section.h"
#include "host/report/page/html.h"
#include "host/report/page/run_facts.h"
#include "host/report/record_difference.h"
#include "host/text/number_text.h"
#include "host/text/table.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <cstddef>
#include <optional>
#include <string_view>
#include <system_error>
#include <vector>

namespace quazor {

namespace {

constexpr double kLeastAccuracy = 100;  // of a difference, compared with its error

// The number at the beginning of "29.97 frames/s", and what follows it.
struct LeadingNumber {
  double number = 0;
  std::string rest;
};

std::optional<LeadingNumber> leadingNumber(const std::optional<std::string>& text) {
  if (!text) return std::nullopt;
  LeadingNumber found;
  const char* const end = text->data() + text->size();
  const auto [rest, problem] = std::from_chars(text->data(), end, found.number);
  if (problem != std::errc() || (rest != end && *rest != ' ')) return std::nullopt;
  found.rest.assign(rest, end);
  return found;
}

// All numbers in the text; those of limits are among them.
std::vector<double> numbersIn(std::string_view text) {
  std::vector<double> numbers;
  while (!text.empty()) {
    double number = 0;
    const auto [rest, problem] = std::from_chars(text.data(), text.data() + text.size(), number);
    if (problem == std::errc()) numbers.push_back(number);
    text.remove_prefix(std::max<std::size_t>(static_cast<std::size_t>(rest - text.data()), 1));
  }
  return numbers;
}

// A value of one of the runs, or that it lacks what the other has. A rounded number is accurate to a hundredth of the
// difference, and stays on its side of the limits that follow it.
std::string valueCell(const std::optional<std::string>& value, const std::optional<std::string>& other) {
  if (!value) return "<td><em>not there</em></td>";
  if (value->empty()) return "<td class=\"line\">there</td>";
  const std::optional<LeadingNumber> number = leadingNumber(value);
  const std::optional<LeadingNumber> otherNumber = leadingNumber(other);
  if (!number || !otherNumber) return element("td class=\"line\"", htmlText(*value));
  std::vector<double> thresholds = numbersIn(number->rest);
  const double error = std::abs(number->number - otherNumber->number) / kLeastAccuracy;
  thresholds.insert(thresholds.end(), {number->number - error, number->number + error});
  const std::string shown = shownNumber(number->number, thresholds) + number->rest;
  const std::string title = shown == *value ? std::string() : " title=\"" + htmlText(*value) + "\"";
  return element("td class=\"line\"" + title, htmlText(shown));
}

std::string differenceTable(const std::vector<Difference>& differences) {
  std::string rows;
  for (const Difference& one : differences) {
    std::string what = one.what.empty() ? "the diagnostic" : one.what;
    if (what.ends_with(',')) what.pop_back();
    rows += element("tr", element("th scope=\"row\"", htmlName(one.name)) + element("td", htmlText(what)) +
                              valueCell(one.before, one.after) + valueCell(one.after, one.before));
    rows += "\n";
  }
  return "<div class=\"scroll\" tabindex=\"0\" role=\"region\" aria-label=\"Differences\"><table><caption>What differs "
         "between the two runs</caption><thead><tr><th scope=\"col\">Diagnostic</th><th scope=\"col\">What</th>"
         "<th scope=\"col\">First</th><th scope=\"col\">Second</th></tr></thead>\n" +
         element("tbody", rows) + "</table></div>\n";
}

std::string runRow(const char* which, const ComparedRecord& record) {
  const RunStarted& run = record.run.began;
  return element("tr", element("th scope=\"row\"", which) + element("td", htmlText(record.file)) +
                           element("td", htmlName(shortPhone(run))) + element("td", dateText(run.date)) +
                           element("td", htmlText(run.host)) + element("td", std::to_string(run.seed)) +
                           element("td", record.run.ended ? "yes" : "no"));
}

std::string entryName(const DiagnosticRecord& record) { return record.name + trialSuffix(record); }

// The streams of the entry with that name; null if there are none.
const std::vector<RecordedStream>* streamsOf(const RecordedRun& run, const std::string& name) {
  for (std::size_t i = 0; i < run.streams.size(); ++i) {
    if (entryName(run.records[i]) == name) return &run.streams[i];
  }
  return nullptr;
}

std::string plots(const RecordedRun& before, const RecordedRun& after) {
  std::string html;
  for (std::size_t i = 0; i < before.streams.size(); ++i) {
    const std::string name = entryName(before.records[i]);
    const std::vector<RecordedStream>* const others = streamsOf(after, name);
    if (others == nullptr) continue;
    for (const RecordedStream& stream : before.streams[i]) {
      const auto other = std::find_if(others->begin(), others->end(),
                                      [&stream](const RecordedStream& one) { return one.name == stream.name; });
      if (other == others->end()) continue;
      html += heading(3, formatMessage("%@: stream %@", htmlName(name), htmlName(stream.name)));
      html += comparedIntervals(stream, *other);
    }
  }
  return html.empty() ? html : heading(2, "Frames of both runs") + html;
}

}  // namespace

std::string comparisonPage(const ComparedRecord& before, const ComparedRecord& after, bool frames) {
  const std::vector<Difference> differences = listedDifferences(before.run, after.run);
  const bool isSame = differences.empty();
  const std::string sentence =
      isSame ? "The records do not differ" : "The records differ in " + countText(differences.size(), "place");
  std::string body =
      bannerOf(isSame ? "pass" : "skip", isSame ? "SAME" : "DIFFERENT", deviceText({before.run.began, after.run.began}),
               sentence, htmlName(before.file) + " and " + htmlName(after.file));
  body +=
      "<main>\n<h2>The runs</h2>\n<div class=\"scroll\" tabindex=\"0\" role=\"region\" aria-label=\"Runs\">"
      "<table class=\"runs\"><caption>The two runs</caption><thead><tr><th scope=\"col\">Run</th>"
      "<th scope=\"col\">Record</th><th scope=\"col\">Phone</th><th scope=\"col\">Date (UTC)</th>"
      "<th scope=\"col\">Machine</th><th scope=\"col\">Seed</th><th scope=\"col\">Came to its end</th></tr></thead>" +
      element("tbody", runRow("First", before) + runRow("Second", after)) + "</table></div>\n";
  if (!isSame) body += heading(2, "Differences") + differenceTable(differences);
  if (frames) body += plots(before.run, after.run);
  return document(isSame ? "Same" : "Different", body + "</main>\n" + footerOf(after.run.began));
}

}  // namespace quazor
