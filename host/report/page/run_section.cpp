#include "host/report/page/run_section.h"

#include "base/text/letter_case.h"
#include "contract/message_format.h"
#include "host/model/incomplete_run.h"
#include "host/model/trials.h"
#include "host/report/experiment_report.h"
#include "host/report/page/advised_command.h"
#include "host/report/page/details.h"
#include "host/report/page/frames_section.h"
#include "host/report/page/html.h"
#include "host/report/page/queues_section.h"
#include "host/report/page/results_table.h"
#include "host/report/page/run_facts.h"
#include "host/report/rerun_command.h"
#include "host/report/run_identity.h"
#include "host/report/short_report.h"
#include "host/report/variation_report.h"
#include "host/text/shell_word.h"
#include "host/text/table.h"

#include <algorithm>
#include <map>
#include <sstream>

namespace quazor {

namespace {

constexpr std::size_t kMaxSentences = 5;  // of a diagnostic; its table has all
constexpr std::size_t kMaxAdvice = 3;

std::string idOf(std::size_t run, std::size_t record) {
  return "run" + std::to_string(run) + "-" + std::to_string(record + 1);
}

const std::vector<RecordedStream>& entryOf(const RunStreams& streams, std::size_t index) {
  static const std::vector<RecordedStream> none;
  return index < streams.size() ? streams[index] : none;
}

const std::vector<RecordedStream>& streamsOf(const ShownRun& run, std::size_t index) {
  return entryOf(run.streams, index);
}

std::string titleOf(const DiagnosticRecord& record) {
  const std::string trial = trialTextWithSeed(record);
  return htmlName(record.name) + (trial.empty() ? "" : " " + element("span class=\"soft\"", "(" + trial + ")")) + " " +
         verdictBadge(nameOf(record.verdict));
}

// An explanation with commands that fit the run, and with what the run already shows of them.
std::string proseOf(const std::string& text, const Explained& explained) {
  return htmlProse(text, [&explained](const std::string& code) {
    const std::string known = knownOfCommand(code, explained);
    return element("code", htmlText(fittedCommand(code, explained))) +
           (known.empty() ? known : " " + element("em", "(" + known + ")"));
  });
}

std::string listOf(std::string_view tag, const std::vector<std::string>& texts, const Explained& explained) {
  std::string items;
  for (const std::string& text : texts) items += element("li", proseOf(text, explained));
  return element(tag, items);
}

std::string adviceText(const Advice& advice, int level, const Explained& explained) {
  std::string html = element("p", element("strong", htmlText(advice.title)) + ". " +
                                      proseOf(advice.failing.empty() ? advice.meaning : advice.failing, explained));
  if (!advice.causes.empty()) html += heading(level, "Likely causes") + listOf("ul", advice.causes, explained);
  if (!advice.next.empty()) html += heading(level, "What to do next") + listOf("ol", advice.next, explained);
  return html;
}

// Writes the findings of a run. Thread: one at a time.
class FindingWriter {
 public:
  // The run and the options are borrowed; `number` is that of the run, `level` the heading of a finding.
  FindingWriter(const ShownRun& run, std::size_t number, int level, const PageOptions& options)
      : run_(run), number_(number), level_(level), options_(options) {}

  std::string text(const DiagnosticRecord& record, std::size_t index);

 private:
  std::string adviceOn(const DiagnosticRecord& record, const std::string& id);

  const ShownRun& run_;
  const std::size_t number_;
  const int level_;
  const PageOptions& options_;
  std::map<const Advice*, std::string> given_;  // where the page has it
};

// The explanations of what failed, each once in the page; that of the diagnostic if there is no other.
std::string FindingWriter::adviceOn(const DiagnosticRecord& record, const std::string& id) {
  if (!options_.adviceOf) return {};
  const std::vector<std::string> topics = topicsOf(record);
  std::size_t found = 0;
  std::string html;
  for (std::size_t i = 0; i < topics.size() && found < kMaxAdvice; ++i) {
    const bool isDiagnostic = i + 1 == topics.size();
    if (isDiagnostic && found > 0) break;
    const Advice* const advice = options_.adviceOf(topics[i]);
    if (advice == nullptr) continue;
    const auto [given, isNew] = given_.try_emplace(advice, id);
    if (!isNew && given->second == id) continue;
    ++found;
    if (isNew) {
      html += adviceText(*advice, level_ + 1, {run_, record});
      html +=
          element("p class=\"soft\"", "More: " + element("code", htmlText("quazor explain " + shellWord(topics[i]))));
    } else {
      html += element("p", element("strong", htmlText(advice->title)) + ": see <a href=\"#" + given->second +
                               "\">above</a> for causes and what to do next.");
    }
  }
  return html;
}

std::string errorParagraphs(const DiagnosticRecord& record) {
  std::string html;
  for (DiagnosticErrorPtr one = record.error; one != nullptr; one = one->underlyingError()) {
    html += element(
        "p", element("span class=\"soft\"", html.empty() ? "" : "caused by ") +
                 element("strong", htmlText(one->localizedDescription())) + " " +
                 element("span class=\"soft\"", htmlText(formatMessage("(%@ code %@)", one->domain(), one->code()))));
  }
  return html;
}

// What did not pass of a diagnostic, and what to do about it.
std::string FindingWriter::text(const DiagnosticRecord& record, std::size_t index) {
  const std::string id = idOf(number_, index);
  std::string what = errorParagraphs(record);
  if (record.skip) what += element("p", htmlText(textOf(*record.skip)));
  const std::vector<std::string> sentences = failureSentences(record);
  const std::size_t shown = std::min(sentences.size(), kMaxSentences);
  for (std::size_t i = 0; i < shown; ++i) what += element("p", sentences[i]);
  if (shown < sentences.size()) {
    what += element("p", "And " + std::to_string(sentences.size() - shown) + " more, in the <a href=\"#" + id +
                             "\">table of its results</a>.");
  }
  return "<article class=\"finding " + std::string(nameOf(record.verdict)) + "\" id=\"" + id + "-finding\">" +
         heading(level_, titleOf(record)) + element("p class=\"soft\"", htmlText(record.summary)) +
         camerasParagraph(record, streamsOf(run_, index)) + element("div class=\"what\"", what) +
         adviceOn(record, id + "-finding") + "</article>\n";
}

std::string findings(const ShownRun& run, std::size_t number, int level, const PageOptions& options) {
  FindingWriter writer(run, number, level + 1, options);
  std::string html;
  for (std::size_t i = 0; i < run.records.size(); ++i) {
    const DiagnosticRecord& record = run.records[i];
    if (record.verdict == Verdict::kPass || hasLaterAttempt(run.records, i)) continue;
    html += writer.text(record, i);
  }
  return html.empty() ? html : heading(level, "What did not pass, and what to do") + html;
}

std::string rowOf(const DiagnosticRecord& record, const std::string& id) {
  const std::string trial = trialTextWithSeed(record);
  std::string results = record.skip ? textOf(*record.skip) : resultCountsText(record);
  if (results.empty()) results = record.error != nullptr ? "none: ended with an error" : "none";
  return element("tr", element("th scope=\"row\"", "<a href=\"#" + id + "\">" + breakablePhrase(record.name) + "</a>" +
                                                       (trial.empty() ? "" : " (" + trial + ")")) +
                           element("td", verdictBadge(nameOf(record.verdict))) + element("td", htmlText(results)) +
                           element("td class=\"number\"", durationText(record))) +
         "\n";
}

// Wide tables scroll by themselves, also with the keyboard.
std::string scrolling(const std::string& label, const std::string& table) {
  if (table.empty()) return table;
  return "<div class=\"scroll\" tabindex=\"0\" role=\"region\" aria-label=\"" + label + "\">" + table + "</div>\n";
}

std::string overview(const ShownRun& run, std::size_t number, int level) {
  std::string rows;
  for (std::size_t i = 0; i < run.records.size(); ++i) rows += rowOf(run.records[i], idOf(number, i));
  const std::vector<PlannedDiagnostic> neverRun =
      run.hasEnded ? unrecordedDiagnosticsOf(run.began, run.records, run.interrupted).neverRun
                   : missingOf(run.began, run.records);
  for (const PlannedDiagnostic& one : neverRun) {
    rows +=
        element("tr class=\"never\"", element("th scope=\"row\"", breakablePhrase(one.name)) +
                                          "<td>never run</td><td>The run ended before this was started.</td><td></td>");
  }
  if (rows.empty()) return {};
  const std::string what = run.began.ofExperiments ? "Experiment" : "Diagnostic";
  const std::string table =
      "<table><caption>" + what + "s in the order of the run</caption><thead><tr><th scope=\"col\">" + what +
      "</th><th scope=\"col\">Verdict</th><th scope=\"col\">Results</th><th scope=\"col\">Took</th></tr></thead>\n" +
      element("tbody", rows) + "</table>\n";
  return heading(level, what + "s") + scrolling(what + "s of run " + std::to_string(number), table);
}

// Names an entry so that no other part of the page has the same label.
std::string entryText(const ShownRun& run, std::size_t number, std::size_t index) {
  return formatMessage("%@, entry %@ of run %@", htmlName(run.records[index].name), index + 1, number);
}

std::string framesOf(const ShownRun& run, std::size_t number, std::size_t index, int level, ManyFrames many) {
  const std::string frames = framesSection(streamsOf(run, index), level, many);
  return scrolling("Frames of " + entryText(run, number, index), frames);
}

std::string diagnosticSection(const ShownRun& run, std::size_t number, std::size_t index, int level,
                              const PageOptions& options, ManyFrames many) {
  const DiagnosticRecord& record = run.records[index];
  const std::string id = idOf(number, index);
  std::string body = wholeName(record.name) + element("p", htmlText(record.summary));
  body += camerasParagraph(record, streamsOf(run, index));
  body += errorParagraphs(record);
  if (record.skip) body += element("p", htmlText(textOf(*record.skip)));
  const std::string entry = entryText(run, number, index);
  body += scrolling("Results of " + entry, resultsTable(record));
  if (options.frames) body += framesOf(run, number, index, level + 1, many);
  if (options.frames && run.queues != nullptr) {
    body += scrolling("Tasks of " + entry, queuesSection(entryOf(*run.queues, index), level + 1));
  }
  body += scrolling("Counters and other data of " + entry, auxiliarySection(record, level + 1));
  body += measurementsSection(record, level + 1);
  body += scrolling("Parameters of " + entry, parametersSection(record, level + 1));
  body += scrolling("Stages of " + entry, stagesSection(record, level + 1));
  body += scrolling("Faults in " + entry, faultsSection(record, level + 1));
  body += logSection(record, level + 1, id + "-log");
  body += element("p class=\"soft\"", "Seed " + std::to_string(record.seed));
  const bool isOpen = record.verdict != Verdict::kPass || run.records.size() == 1;
  return "<section class=\"diagnostic\" id=\"" + id + "\"><details" + (isOpen ? " open" : "") + "><summary>" +
         heading(level, titleOf(record)) + "</summary>\n" + body + "</details></section>\n";
}

// The parameters of a diagnostic that the run did not reach.
std::string unreachedSection(const DiagnosticRecord& planned, std::size_t number, int level) {
  const std::string body =
      wholeName(planned.name) + element("p", "The run ended before this was started.") +
      scrolling(formatMessage("Parameters of %@, which run %@ did not reach", htmlName(planned.name), number),
                parametersSection(planned, level + 1));
  return "<section class=\"diagnostic\"><details><summary>" +
         heading(level, htmlName(planned.name) + " " + element("span class=\"soft\"", "(never run)")) + "</summary>\n" +
         body + "</details></section>\n";
}

std::string variationOf(const ShownRun& run) {
  std::ostringstream text;
  printVariation(text, run.records, false);
  return text.view().empty() ? std::string() : element("pre", htmlLines(text.view()));
}

std::string stopLine(const ShownRun& run) {
  std::string why;
  if (run.hasEnded && run.interrupted) why = interruptionText(run.began, *run.interrupted);
  if (!run.hasEnded && run.interrupted && !run.interrupted->empty()) {
    why = "it stopped while " + *run.interrupted + " was running";
  }
  if (run.hasEnded && !run.interrupted) return {};
  const bool saysItAll = run.hasEnded && run.began.analyzed.has_value();
  std::string text = saysItAll ? capitalized(why) : "The run did not come to its end";
  if (!saysItAll && !why.empty()) text += ": " + why;
  return element("p class=\"stop\"", htmlText(text) + ".") + "\n";
}

// How to run it again, and what that leaves out.
std::string rerunSection(const ShownRun& run, int level) {
  const std::string commands = rerunCommands(run);
  if (commands.empty()) return {};
  std::string text =
      "Each line that ends in a backslash goes on in the next. The values are those of this run, so no profile is "
      "read.";
  if (std::ranges::count(commands, '\n') > std::ranges::count(commands, '\\') + 1) {
    text += " A value is set for all diagnostics of a command, so those with other values have a command of their own.";
  }
  const auto warns = [](const UserLimit& limit) { return limit.severity == LimitSeverity::kWarn; };
  if (std::ranges::any_of(run.began.limits, warns)) text += " Limits that only warn are left out.";
  return heading(level, "To run it again") + element("p class=\"soft\"", text) +
         element("pre class=\"command\"", htmlLines(commands));
}

}  // namespace

PageVerdict verdictOf(const ShownRun& run) {
  const bool isWhole = run.hasEnded && !run.interrupted;
  switch (isWhole ? runVerdictOf(run.records, run.began.acceptFlaky) : Verdict::kError) {
    case Verdict::kPass: return {run.began.ofExperiments ? "DONE" : "PASS", "pass", 0};
    case Verdict::kSkip: return {"SKIP", "skip", 1};
    case Verdict::kFail: return {"FAIL", "fail", 2};
    case Verdict::kError: break;
  }
  return {"ERROR", "error", 3};
}

std::string summaryOf(const ShownRun& run) {
  const std::size_t notReached =
      run.interrupted ? unrecordedDiagnosticsOf(run.began, run.records, run.interrupted).neverRun.size() : 0;
  std::ostringstream text;
  run.began.ofExperiments ? printExperimentSummary(text, run.records, notReached)
                          : printSummary(text, run.records, notReached);
  std::string line = text.str();
  if (line.ends_with('\n')) line.pop_back();
  return line;
}

std::string runSections(const ShownRun& run, std::size_t number, int level, const PageOptions& options,
                        ManyFrames many) {
  std::string html = stopLine(run) + findings(run, number, level, options) + overview(run, number, level);
  html += variationOf(run);
  for (std::size_t i = 0; i < run.records.size(); ++i) html += diagnosticSection(run, number, i, level, options, many);
  for (const DiagnosticRecord& one : neverBegun(run.began, run.records)) html += unreachedSection(one, number, level);
  html += heading(level, "The run") + scrolling("Facts about run " + std::to_string(number), runTable(run));
  return html + rerunSection(run, level + 1);
}

}  // namespace quazor
