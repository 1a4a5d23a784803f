#include "host/report/page/comparison.h"

#include "contract/message_format.h"
#include "host/model/trials.h"
#include "host/report/page/document.h"
#include "host/report/page/frames_section.h"
#include "host/report/page/html.h"
#include "host/report/page/run_facts.h"
#include "host/report/record_difference.h"
#include "host/text/table.h"

#include <algorithm>
#include <cstddef>
#include <optional>
#include <vector>

namespace quazor {

namespace {

// A value of one of the runs, or that it lacks what the other has.
std::string valueCell(const std::optional<std::string>& value) {
  if (!value) return "<td><em>not there</em></td>";
  return element("td class=\"line\"", value->empty() ? "there" : htmlText(*value));
}

std::string differenceTable(const std::vector<Difference>& differences) {
  std::string rows;
  for (const Difference& one : differences) {
    std::string what = one.what.empty() ? "the diagnostic" : one.what;
    if (what.ends_with(',')) what.pop_back();
    rows += element("tr", element("th scope=\"row\"", htmlName(one.name)) + element("td", htmlText(what)) +
                              valueCell(one.before) + valueCell(one.after));
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
