#include "host/report/page/page.h"

#include "base/text/base64.h"
#include "base/text/sha256.h"
#include "host/error/host_error.h"
#include "host/report/page/plot.h"
#include "host/testing/test_records.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>

namespace quazor {
namespace {

using testing::HasSubstr;
using testing::Not;

// A run to show.
struct SampleRun {
  RunStarted began = startedRun();
  std::vector<DiagnosticRecord> records;
  RunStreams streams{};

  explicit SampleRun(std::vector<DiagnosticRecord> all) : records(std::move(all)) {
    for (const DiagnosticRecord& record : records) began.names.push_back(record.name);
  }
  ShownRun shown() const { return {began, records, streams}; }
  std::string page(const PageOptions& options = {}) const { return reportPage({shown()}, options); }
};

std::size_t countOf(const std::string& text, const std::string& part) {
  std::size_t count = 0;
  for (std::size_t at = text.find(part); at != std::string::npos; at = text.find(part, at + 1)) ++count;
  return count;
}

TEST(ReportPage, SaysTheVerdictFirst) {
  const std::string page = SampleRun({recordOf("A", Verdict::kPass), recordOf("B", Verdict::kFail)}).page();
  EXPECT_THAT(
      page,
      HasSubstr(
          "<body>\n<header class=\"fail\"><div><h1><span class=\"word\">FAIL</span> <span class=\"device\">simulated "
          "phone: no hardware was tested</span><span class=\"sentence\">2 diagnostics: 1 passed, 1 "
          "failed, 0 ended in an error</span></h1>"));
  EXPECT_THAT(page, HasSubstr("<title>FAIL: phone</title>"));
}

TEST(ReportPage, SaysWhatFailedAndByHowMuch) {
  const std::string page = SampleRun({recordOf("B", Verdict::kFail)}).page();
  EXPECT_THAT(page,
              HasSubstr("<strong>Count</strong> is <strong>89 frames</strong>, <strong>1 below the limit</strong> "
                        "(Enough: &gt;= 90)."));
}

TEST(ReportPage, SaysWhatToDo) {
  const Advice advice{"Frames were lost", "Meaning.", "Some are missing.", {"A loose plug"}, {"Run `quazor doctor`."}};
  PageOptions options;
  std::vector<std::string> asked;
  options.adviceOf = [&](const std::string& topic) {
    asked.push_back(topic);
    return topic == "Count" ? &advice : nullptr;
  };
  const std::string page = SampleRun({recordOf("A", Verdict::kFail), recordOf("B", Verdict::kFail)}).page(options);
  EXPECT_THAT(page, HasSubstr("<strong>Frames were lost</strong>. Some are missing."));
  EXPECT_THAT(page, HasSubstr("<li>A loose plug</li>"));
  EXPECT_THAT(page, HasSubstr("<li>Run <code>quazor doctor</code>.</li>"));
  EXPECT_THAT(page, HasSubstr("<code>quazor explain Count</code>"));
  // The second time it is named only.
  EXPECT_EQ(countOf(page, "<li>A loose plug</li>"), 1U);
  EXPECT_THAT(page, HasSubstr("<strong>Frames were lost</strong>: see <a href=\"#run1-1-finding\">above</a>"));
  EXPECT_THAT(asked, testing::Contains("Count"));
}

TEST(ReportPage, HasScriptsOnlyForMoreFramesThanAPictureShows) {
  PageOptions options;
  options.library = PlotLibrary{"draw()", "chart{}", "free <for all>"};
  SampleRun run({recordOf("A", Verdict::kPass)});
  run.streams = {{{"wide", std::vector<TracedFrame>(kMaxPlotPoints), 0}}};
  EXPECT_THAT(run.page(options), Not(HasSubstr("<script")));
  run.streams[0][0].frames.push_back({0, 0, 0, {}});
  const std::string page = run.page(options);
  EXPECT_THAT(page, HasSubstr("<script>draw()</script>"));
  EXPECT_THAT(page, HasSubstr("; script-src 'sha256-" + base64(sha256("draw()")) + "' 'sha256-"));
  EXPECT_THAT(page, HasSubstr("<style>chart{}</style>"));
  EXPECT_THAT(page, HasSubstr("free &lt;for all&gt;"));
  EXPECT_THAT(page, HasSubstr("its only scripts draw the plots"));
  const auto isWithoutScripts = [](const std::string& text) {
    return text.find("<script") == std::string::npos && text.find("script-src") == std::string::npos &&
           text.find("runs no script") != std::string::npos;
  };
  EXPECT_TRUE(isWithoutScripts(run.page()));
  EXPECT_TRUE(isWithoutScripts(reportPage({run.shown(), run.shown()}, options)));
  options.frames = false;
  EXPECT_TRUE(isWithoutScripts(run.page(options)));
}

TEST(ReportPage, SaysWhatTheRunAlreadyShows) {
  const Advice advice{"Title", "", "Failing.", {}, {"Run `quazor run B`, then `quazor run NAME`."}};
  PageOptions options;
  options.adviceOf = [&](const std::string&) { return &advice; };
  EXPECT_THAT(
      SampleRun({recordOf("A", Verdict::kFail), recordOf("B", Verdict::kPass)}).page(options),
      HasSubstr("<li>Run <code>quazor run B --phone phone.json</code> <em>(already run here: passed)</em>, then "
                "<code>quazor run A --phone phone.json</code>.</li>"));
}

TEST(ReportPage, HasEveryPartOfADiagnostic) {
  SampleRun run({recordOf("A", Verdict::kError)});
  run.records[0].stages = {{Stage::kRun, Date(), Date() + std::chrono::seconds(1)}, {Stage::kTeardown, Date(), {}}};
  run.streams = {{{"wide", {{0, 0, 0, {}}, {1, 33'000'000, 33'000'000, {}}}, 0}}};
  const std::string page = run.page();
  for (const char* part : {"Domain code -1", "it failed", "caused by ", "the cause", "<th scope=\"row\">Count</th>",
                           "command line", "not set (the diagnostic's own default)", "<th scope=\"row\">Raw</th>",
                           "<th scope=\"row\">bytes</th>", "a line", "CaptureStream.start", "Seed 7", "Stream wide",
                           "did not end", "p.so", "phone.json", "quazor run A \\\n  --plugin p.so"}) {
    EXPECT_THAT(page, HasSubstr(part)) << part;
  }
}

TEST(ReportPage, SaysOnceWhatTheVerdictsMean) {
  const SampleRun bad({recordOf("A", Verdict::kFail), recordOf("B", Verdict::kFail)});
  const SampleRun broken({recordOf("A", Verdict::kError)});
  const std::string page = reportPage({bad.shown(), broken.shown()}, {});
  EXPECT_EQ(countOf(page, "FAIL: a result"), 1U);
  EXPECT_EQ(countOf(page, "ERROR: the diagnostic"), 1U);
  EXPECT_THAT(bad.page(), Not(HasSubstr("ERROR: the diagnostic")));
  EXPECT_THAT(SampleRun({recordOf("A", Verdict::kPass)}).page(), Not(HasSubstr("FAIL")));
}

TEST(ReportPage, SaysWhyThereAreNoResults) {
  SampleRun run({recordOf("A", Verdict::kError)});
  run.records[0].measuredResults.clear();
  EXPECT_THAT(run.page(), HasSubstr("<td>none: ended with an error</td>"));
}

TEST(ReportPage, CanLeaveOutFrames) {
  SampleRun run({recordOf("A", Verdict::kPass)});
  run.streams = {{{"wide", {{0, 0, 0, {}}, {1, 33'000'000, 33'000'000, {}}}, 0}}};
  PageOptions options;
  options.frames = false;
  EXPECT_THAT(run.page(options), Not(HasSubstr("Stream wide")));
}

TEST(ReportPage, SaysThatARunDidNotComeToItsEnd) {
  SampleRun run({recordOf("A", Verdict::kPass)});
  run.began.names.push_back("Never");
  ShownRun shown = run.shown();
  shown.hasEnded = false;
  shown.interrupted = "A";
  const std::string page = reportPage({shown}, {});
  EXPECT_THAT(page,
              HasSubstr("<p class=\"stop\">The run did not come to its end: it stopped while A was running.</p>"));
  EXPECT_THAT(page, HasSubstr("<span class=\"word\">ERROR</span>"));
  EXPECT_THAT(page, HasSubstr("<th scope=\"row\">Never</th><td>never run</td>"));
  EXPECT_THAT(page, Not(HasSubstr("(never run)</span>")));
  run.began.planned = {{"Never", recordOf("Never", Verdict::kPass).parameters}};
  const std::string planned = reportPage({shown}, {});
  const std::string section = planned.substr(planned.find("<h2>Never <span class=\"soft\">(never run)</span>"));
  EXPECT_THAT(section.substr(0, section.find("</section>")), HasSubstr("<th scope=\"row\">duration</th>"));
  shown.hasEnded = true;
  shown.interrupted = "";
  EXPECT_THAT(reportPage({shown}, {}),
              HasSubstr("The run did not come to its end: interrupted while no diagnostic was running."));
  EXPECT_THAT(run.page(), Not(HasSubstr("class=\"stop\"")));
}

TEST(ReportPage, SaysWhetherAnAnalysisOrTheRecordedRunDidNotComeToItsEnd) {
  SampleRun run({recordOf("A", Verdict::kPass)});
  run.began.analyzed = AnalyzedRun{};
  ShownRun shown = run.shown();
  shown.interrupted = "A";
  EXPECT_THAT(reportPage({shown}, {}), HasSubstr("<p class=\"stop\">The recorded run did not come to its end: it "
                                                 "stopped while A was running.</p>"));
  shown.hasEnded = false;
  EXPECT_THAT(reportPage({shown}, {}),
              HasSubstr("<p class=\"stop\">The run did not come to its end: it stopped while A was running.</p>"));
}

TEST(ReportPage, OfSeveralRunsHasATableFirst) {
  const SampleRun good({recordOf("A", Verdict::kPass)});
  const SampleRun bad({recordOf("A", Verdict::kFail)});
  ShownRun second = bad.shown();
  second.file = "bad.jsonl";
  const std::string page = reportPage({good.shown(), second}, {});
  EXPECT_THAT(page, HasSubstr("<span class=\"sentence\">2 runs: 1 passed, 1 did not</span></h1>"));
  EXPECT_LT(page.find("The runs of this page"), page.find("<section id=\"run1\""));
  EXPECT_THAT(page, HasSubstr("<td>bad.jsonl</td>"));
  EXPECT_THAT(page, HasSubstr("id=\"run2-1\""));
}

TEST(ReportPage, NamesItsOwnStyleAlone) {
  const std::string page = SampleRun({recordOf("A", Verdict::kPass)}).page();
  const std::size_t begin = page.find("<style>") + 7;
  const std::string style = page.substr(begin, page.find("</style>") - begin);
  EXPECT_THAT(page, HasSubstr("content=\"default-src 'none'; style-src 'sha256-" + base64(sha256(style)) + "';"));
  EXPECT_THAT(page, Not(HasSubstr("style=\"")));  // the policy would refuse it
}

// Every text in a record is that of somebody else.
TEST(ReportPage, RunsNothingOfARecord) {
  constexpr const char* kEvil = "</style></script><script>alert(1)</script><img src=x onerror=\"y\">\xE2\x80\xAE";
  const std::string evil = kEvil;
  DiagnosticRecord record = recordOf(evil, Verdict::kError);
  record.summary = evil;
  record.error = errorWithMessage(evil, 1, evil, nullptr);
  record.log.push_back({{}, LogLevel::kDefault, evil});
  record.parameters.experiment.push_back({evil, QZNumberParameter(evil, false), Value(evil), evil});
  record.measurements.set(evil, Measurement(1, QZUnit::unitWithSymbol(evil)));
  record.auxiliaryData.set(evil, evil);
  record.auxiliaryData.set(evil + "2", Dictionary{{evil, Dictionary{{evil, evil}}}});
  record.auxiliaryData.set(evil + "3", Dictionary{{evil, Array{1, 2}}, {evil + "4", evil}});
  record.faults.push_back({{{evil, evil}}, 1});
  QZMeasuredResult result(evil, Measurement(std::numeric_limits<double>::quiet_NaN(), QZUnit::unitWithSymbol(evil)));
  result.setLimit(QZLimit(evil));
  record.measuredResults.push_back(judgeResult(result));
  SampleRun run({record});
  run.began.phone = run.began.host = run.began.program = run.began.id = evil;
  run.began.plugins = {evil};
  run.began.names.push_back(evil + "5");
  run.began.tags.set(evil, evil);
  run.streams = {{{evil, {{0, 0, 0, {}}, {1, 33'000'000, 33'000'000, {}}}, 0}}};
  ShownRun shown = run.shown();
  shown.file = evil;
  shown.interrupted = evil;
  const Advice advice{evil, evil, evil, {evil}, {evil}};
  PageOptions options;
  options.adviceOf = [&advice](const std::string&) { return &advice; };
  const std::string page = reportPage({shown, shown}, options);
  EXPECT_THAT(page, Not(HasSubstr("<script")));
  EXPECT_THAT(page, Not(HasSubstr("<img")));
  EXPECT_THAT(page, Not(HasSubstr("\xE2\x80\xAE")));
  EXPECT_EQ(countOf(page, "</style>"), 1U);
}

TEST(ReportPage, TakesANameOfAnyLength) {
  const std::string name(100'000, 'x');
  const SampleRun run({recordOf(name, Verdict::kFail)});
  const std::string page = run.page();
  EXPECT_THAT(page, HasSubstr("Whole name: " + name));
  EXPECT_LT(page.size(), 500'000U);
}

TEST(ReportPage, SaysWhatKindOfPhoneItWas) {
  SampleRun run({recordOf("A", Verdict::kPass)});
  run.began.phone = "linux:board.json";
  EXPECT_THAT(run.page(), HasSubstr("PASS</span> <span class=\"device\">Linux binding</span>"));
  const SampleRun other({recordOf("A", Verdict::kPass)});
  const std::string both = reportPage({run.shown(), other.shown()}, {});
  EXPECT_THAT(both, Not(HasSubstr("class=\"device\"")));
  EXPECT_THAT(both, HasSubstr("board<small>Linux binding</small>"));
  EXPECT_THAT(both, HasSubstr("phone<small>simulated phone</small>"));
}

// Counters use no frames, and some diagnostics have the device count them.
TEST(ReportPage, SaysNothingOfFramesThatNobodyAskedFor) {
  SampleRun run({recordOf("A", Verdict::kPass)});
  run.began.traced = true;
  run.streams = {{}};
  EXPECT_THAT(run.page(), Not(HasSubstr("No frame")));
}

}  // namespace
}  // namespace quazor
