// Texts of plug-ins and users, whatever their bytes, come back from a record as they were.
#include "base/json/json_line.h"
#include "contract/diagnostic_error.h"
#include "host/record/record_file.h"
#include "host/record/run_event_json.h"
#include "host/testing/test_events.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {
namespace {

using namespace std::string_literals;

const std::string kTexts[] = {
    "plain",
    "",
    "Temperatur 21 \u00b0C, Zoll \u2033, \u6e29\u5ea6, \U0001f321",
    "e\u0301 is not \u00e9",
    "line\u2028separator, paragraph\u2029separator, next\u0085line",
    "left\u200fright\u202eoverride\u202c, isolate\u2066\u2069, mark\u200e",
    "\ufeffbyte order, zero\u200bwidth, replacement \ufffd",
    "controls \x01\x1b[31m\t\r\n\b\f\x7f",
    "nothing\0behind"s,
    "quotes \" and \\ and \\u0041 and </script>",
    "invalid \xff\xfe",
    "overlong \xc0\x80, surrogate \xed\xa0\x80, beyond \xf4\x90\x80\x80",
    "cut off \xe2\x82",
    "\xe2\x82",
    "{\"hex\":\"61ff\"}",
};

// The event after it was a line of a record.
RunEvent fromLineOf(const RunEvent& event) {
  const std::string line = recordLine(event, 1);
  EXPECT_EQ(std::count(line.begin(), line.end(), '\n'), 1) << "an event is one line";
  return eventFrom(parseJsonLine(std::string_view(line).substr(0, line.size() - 1)));
}

template <class Event>
Event readBack(const Event& event) {
  return std::get<Event>(fromLineOf(event));
}

TEST(ExactTexts, OfLogLinesComeBack) {
  for (const std::string& text : kTexts) {
    const Logged logged{{{}, LogLevel::kError, text, momentAt(1)}};
    EXPECT_EQ(readBack(logged).line.text, text);
  }
}

TEST(ExactTexts, OfResultsAndMeasurementsComeBack) {
  for (const std::string& text : kTexts) {
    QZMeasuredResult result(text, Measurement(1, QZUnit::unitWithSymbol(text)));
    result.setLimit(QZLimit(text));
    const std::vector<QZMeasuredResult> results = readBack(ResultsReported{{result}}).results;
    ASSERT_EQ(results.size(), 1U);
    EXPECT_EQ(results[0].name(), text);
    EXPECT_EQ(results[0].measurement().unit().symbol(), text);
    EXPECT_EQ(results[0].limit()->name(), text);
    const auto measured = readBack(MeasurementsAdded{{{text, Measurement(1, QZUnit::unitWithSymbol("V"))}}});
    EXPECT_EQ(measured.measurements.front().first, text);
  }
}

TEST(ExactTexts, OfValuesComeBack) {
  for (const std::string& text : kTexts) {
    const AuxiliaryDataAdded added{text, Value(Dictionary{{text, Value(Array{text})}})};
    const AuxiliaryDataAdded again = readBack(added);
    EXPECT_EQ(again.key, text);
    EXPECT_EQ(again.value, added.value);
  }
}

TEST(ExactTexts, OfErrorsComeBack) {
  for (const std::string& text : kTexts) {
    const DiagnosticErrorPtr cause = errorWithMessage(text + "Cause", 2, text, nullptr);
    const Failed failed{Stage::kRun, errorWithMessage(text, 1, text, cause)};
    const DiagnosticErrorPtr error = readBack(failed).error;
    EXPECT_EQ(error->domain(), text);
    EXPECT_EQ(error->localizedDescription(), text);
    ASSERT_NE(error->underlyingError(), nullptr);
    EXPECT_EQ(error->underlyingError()->domain(), text + "Cause");
    EXPECT_EQ(error->underlyingError()->localizedDescription(), text);
  }
}

TEST(ExactTexts, OfWhatARunIsAboutComeBack) {
  for (const std::string& text : kTexts) {
    RunStarted run = runOf({text});
    run.plugins = {text};
    run.phone = text;
    run.host = text;
    run.tags = {{"key", text}};
    const RunStarted again = readBack(run);
    EXPECT_EQ(again.names, run.names);
    EXPECT_EQ(again.plugins, run.plugins);
    EXPECT_EQ(again.phone, text);
    EXPECT_EQ(again.host, text);
    EXPECT_EQ(again.tags, run.tags);
    DiagnosticStarted diagnostic = beginningOf(text);
    diagnostic.summary = text;
    diagnostic.parameters.experiment = {{text, QZNumberParameter(text, true), Value(1), text}};
    const DiagnosticStarted started = readBack(diagnostic);
    EXPECT_EQ(started.name, text);
    EXPECT_EQ(started.summary, text);
    EXPECT_EQ(started.parameters.experiment.front().name, text);
    EXPECT_EQ(started.parameters.experiment.front().declaration.summary(), text);
    EXPECT_EQ(started.parameters.experiment.front().source, text);
    EXPECT_EQ(readBack(DiagnosticSkipped{{SkipKind::kNotAllowed, text}}).skip.reason, text);
    EXPECT_EQ(readBack(RunEnded{text, momentAt(1)}).interrupted, text);
  }
}

}  // namespace
}  // namespace quazor
