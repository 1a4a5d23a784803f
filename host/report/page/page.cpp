#include "host/report/page/page.h"

#include "contract/message_format.h"
#include "host/model/trials.h"
#include "host/report/page/document.h"
#include "host/report/page/frames_section.h"
#include "host/report/page/html.h"
#include "host/report/page/results_table.h"
#include "host/report/page/run_facts.h"
#include "host/report/page/run_section.h"
#include "host/report/run_identity.h"
#include "host/text/table.h"

#include <algorithm>
#include <cstddef>

namespace quazor {

namespace {

std::string factsOf(const RunStarted& run) {
  std::string facts = "Phone " + htmlName(shortPhone(run));
  for (const auto& [key, value] : run.tags) facts += " \xC2\xB7 " + htmlName(key) + " " + htmlName(value);
  facts += " \xC2\xB7 " + dateText(run.date) + " UTC";
  if (!run.host.empty()) facts += " \xC2\xB7 machine " + htmlName(run.host);
  return facts;
}

// The table of a page with several runs.
std::string runsTable(const std::vector<ShownRun>& runs) {
  std::string rows;
  for (std::size_t i = 0; i < runs.size(); ++i) {
    const RunStarted& run = runs[i].began;
    const PageVerdict verdict = verdictOf(runs[i]);
    std::string tags;
    for (const auto& [key, value] : run.tags)
      tags += (tags.empty() ? "" : ", ") + htmlName(key) + "=" + htmlName(value);
    rows += element("tr", element("th scope=\"row\"", "<a href=\"#run" + std::to_string(i + 1) + "\">Run " +
                                                          std::to_string(i + 1) + "</a>") +
                              element("td", verdictBadge(verdict.kind)) + element("td", htmlText(summaryOf(runs[i]))) +
                              element("td", htmlName(shortPhone(run)) + element("small", phoneKind(run))) +
                              element("td", tags) + element("td", dateText(run.date)) +
                              element("td", htmlName(run.host)) + element("td", htmlText(runs[i].file))) +
            "\n";
  }
  return "<table class=\"runs\"><caption>The runs of this page</caption><thead><tr><th scope=\"col\">Run</th>"
         "<th scope=\"col\">Verdict</th><th scope=\"col\">Diagnostics</th><th scope=\"col\">Phone</th>"
         "<th scope=\"col\">Tags</th><th scope=\"col\">Date (UTC)</th><th scope=\"col\">Machine</th>"
         "<th scope=\"col\">Record</th></tr></thead>\n" +
         element("tbody", rows) + "</table>\n";
}

// What the verdicts mean that need attention, if one of the runs has one.
std::string verdictsText(const std::vector<ShownRun>& runs) {
  const auto has = [&runs](Verdict verdict) {
    return std::ranges::any_of(runs, [verdict](const ShownRun& run) {
      return std::ranges::find(run.records, verdict, &DiagnosticRecord::verdict) != run.records.end();
    });
  };
  std::string text;
  if (has(Verdict::kFail)) text += " FAIL: a result was measured and is outside a limit.";
  if (has(Verdict::kError))
    text += " ERROR: the diagnostic could not measure or judge, so it says neither good nor bad.";
  if (has(Verdict::kSkip)) text += " SKIP: the diagnostic was not run.";
  return text.empty() ? text : element("p class=\"soft\"", text.substr(1)) + "\n";
}

std::string pageOfOne(const ShownRun& run, const PageOptions& options) {
  const PageVerdict verdict = verdictOf(run);
  const bool hasMany = options.frames && std::ranges::any_of(run.streams, hasManyFrames);
  const PlotLibrary* const library = hasMany && options.library ? &*options.library : nullptr;
  const ManyFrames many = library == nullptr ? ManyFrames::kNoLibrary : ManyFrames::kZoomed;
  return document(
      verdict.word + ": " + htmlName(shortPhone(run.began)),
      bannerOf(verdict.kind, verdict.word, deviceText({run.began}), htmlText(summaryOf(run)), factsOf(run.began)) +
          element("main", "\n" + verdictsText({run}) + runSections(run, 1, 2, options, many)) + "\n" +
          footerOf(run.began, library),
      library);
}

std::string pageOfMany(const std::vector<ShownRun>& runs, const PageOptions& options) {
  std::size_t passed = 0;
  PageVerdict worst = verdictOf(runs.front());
  std::string sections;
  std::vector<RunStarted> began;
  began.reserve(runs.size());
  for (const ShownRun& run : runs) began.push_back(run.began);
  for (std::size_t i = 0; i < runs.size(); ++i) {
    const PageVerdict verdict = verdictOf(runs[i]);
    passed += verdict.kind == "pass" ? 1 : 0;
    if (verdict.rank > worst.rank) worst = verdict;
    const std::string number = std::to_string(i + 1);
    sections += formatMessage(
        "<section id=\"run%@\" aria-labelledby=\"run%@title\">\n<h2 id=\"run%@title\">Run %@: %@ "
        "%@</h2>\n%@</section>\n",
        i + 1, i + 1, i + 1, i + 1, htmlName(shortPhone(runs[i].began)), verdictBadge(verdict.kind),
        runSections(runs[i], i + 1, 3, options, ManyFrames::kPictures));
  }
  const std::string sentence = countText(runs.size(), "run") + ": " + std::to_string(passed) + " passed, " +
                               std::to_string(runs.size() - passed) + " did not";
  return document(
      worst.word + ": " + countText(runs.size(), "run"),
      bannerOf(worst.kind, worst.word, deviceText(began), sentence, "The verdict is that of the worst run.") +
          element("main", "\n" + verdictsText(runs) +
                              "<h2>Runs</h2>\n<div class=\"scroll\" tabindex=\"0\" role=\"region\" "
                              "aria-label=\"Table of runs\">" +
                              runsTable(runs) + "</div>\n" + sections) +
          "\n" + footerOf(runs.front().began));
}

}  // namespace

std::string reportPage(const std::vector<ShownRun>& runs, const PageOptions& options) {
  return runs.size() == 1 ? pageOfOne(runs.front(), options) : pageOfMany(runs, options);
}

}  // namespace quazor
