#include "host/report/page/details.h"

#include "host/report/page/html.h"
#include "host/text/number_text.h"
#include "host/text/table.h"
#include "host/text/timestamp.h"

#include <algorithm>
#include <chrono>
#include <cmath>
#include <cstddef>
#include <optional>
#include <string_view>
#include <vector>

namespace quazor {

namespace {

using std::chrono::nanoseconds;

constexpr const char* kNotSet = "not set (the diagnostic's own default)";

// How long a stage took, by both clocks.
struct StageLength {
  Stage stage;
  std::optional<nanoseconds> byPhone;
  std::optional<nanoseconds> byWall;

  // The phone's clock counts, if it was running.
  nanoseconds shown() const { return std::max(byPhone ? *byPhone : byWall.value_or(nanoseconds(0)), nanoseconds(0)); }
};

std::optional<nanoseconds> phoneTimeOf(const StageDurations& durations, Stage stage) {
  switch (stage) {
    case Stage::kSetup: return durations.setup;
    case Stage::kRun: return durations.run;
    case Stage::kTeardown: return durations.teardown;
    case Stage::kAnalyze: return durations.analysis;
    case Stage::kLoad:
    case Stage::kDescribe: break;
  }
  return std::nullopt;
}

std::vector<StageLength> lengthsOf(const DiagnosticRecord& record) {
  std::vector<StageLength> lengths;
  for (const StagePeriod& period : record.stages) {
    StageLength length{period.stage, phoneTimeOf(record.durations, period.stage), std::nullopt};
    if (period.end) length.byWall = *period.end - period.begin;
    lengths.push_back(length);
  }
  return lengths;
}

double secondsOf(nanoseconds time) { return std::chrono::duration<double>(time).count(); }

// Three digits are enough to see what took long.
std::string lengthText(std::optional<nanoseconds> time) {
  if (!time) return "\xE2\x80\x93";
  const double seconds = secondsOf(*time);
  return seconds == 0 || std::abs(seconds) >= 1 ? roundedText(std::round(seconds * 1e3) / 1e3) + " s"
                                                : significantDigits(seconds * 1e3, 3) + " ms";
}

std::string parameterRows(Part part, const std::vector<ResolvedParameter>& parameters) {
  std::string rows;
  for (const ResolvedParameter& one : parameters) {
    rows +=
        element("tr", element("th scope=\"row\"", breakableName(one.name)) + element("td", std::string(nameOf(part))) +
                          element("td class=\"number\"", one.value ? htmlText(defaultText(*one.value)) : kNotSet) +
                          element("td", htmlText(one.source)) + element("td", htmlText(one.declaration.summary()))) +
        "\n";
  }
  return rows;
}

std::string tableOf(const std::string& caption, const std::vector<std::string>& columns, const std::string& rows) {
  std::string head;
  for (const std::string& column : columns) head += element("th scope=\"col\"", column);
  return element("table",
                 element("caption", caption) + element("thead", element("tr", head)) + "\n" + element("tbody", rows)) +
         "\n";
}

// The element is one of each line's level.
std::string lineOf(const LogLine& line) {
  const std::string level(nameOf(line.level));
  return element("tr class=\"" + level + "\"",
                 element("td class=\"number\"", roundedText(secondsOf(line.time)) + " s") + element("td", level) +
                     element("td class=\"line\"", htmlLines(line.text))) +
         "\n";
}

std::string filterOf(const std::string& id) {
  std::string html = "<fieldset class=\"filter\"><legend>Lines to show</legend>";
  const auto add = [&](const char* value, const char* text, const char* more) {
    html +=
        "<label><input type=\"radio\" name=\"" + id + "\" class=\"" + value + "\"" + more + "> " + text + "</label> ";
  };
  add("all", "all", " checked");
  add("some", "without debug", "");
  add("errors", "errors", "");
  return html + "</fieldset>";
}

}  // namespace

std::string durationText(const DiagnosticRecord& record) {
  nanoseconds total{};
  for (const StageLength& one : lengthsOf(record)) total += one.shown();
  return record.stages.empty() ? "\xE2\x80\x93" : roundedText(std::round(secondsOf(total) * 1e3) / 1e3) + " s";
}

std::string stagesSection(const DiagnosticRecord& record, int level) {
  const std::vector<StageLength> lengths = lengthsOf(record);
  if (lengths.empty()) return {};
  std::string rows;
  for (const StageLength& one : lengths) {
    rows += element("tr", element("th scope=\"row\"", std::string(nameOf(one.stage))) +
                              element("td class=\"number\"", lengthText(one.byPhone)) +
                              element("td class=\"number\"", one.byWall ? lengthText(one.byWall) : "did not end"));
  }
  return heading(level, "Stages") + tableOf("Stages and how long they took",
                                            {"Stage", "By the phone's clock", "By the clock of the machine"}, rows);
}

std::string parametersSection(const DiagnosticRecord& record, int level) {
  std::string rows;
  for (const Part part : {Part::kExperiment, Part::kAnalysis}) rows += parameterRows(part, record.parameters.of(part));
  if (rows.empty()) return {};
  return heading(level, "Parameters") + tableOf("Parameters and where their values came from",
                                                {"Parameter", "Of the", "Value", "From", "Meaning"}, rows);
}

std::string measurementsSection(const DiagnosticRecord& record, int level) {
  std::string rows;
  for (const auto& [name, measurement] : record.measurements) {
    rows += element("tr", element("th scope=\"row\"", breakableName(name)) + numberCell(measurement.value()) +
                              element("td", htmlText(measurement.unit().symbol()))) +
            "\n";
  }
  if (rows.empty()) return {};
  return "<details><summary>" + heading(level, "Measurements") + "</summary>" +
         tableOf("Measurements of the experiment", {"Measurement", "Value", "Unit"}, rows) + "</details>\n";
}

std::string logSection(const DiagnosticRecord& record, int level, const std::string& id) {
  if (record.log.empty()) return {};
  std::string rows;
  for (const LogLine& line : record.log) rows += lineOf(line);
  const bool isOfOneLevel = std::all_of(record.log.begin(), record.log.end(), [&record](const LogLine& line) {
    return line.level == record.log.front().level;
  });
  return heading(level, "Log") + "<div class=\"log\">" + (isOfOneLevel ? "" : filterOf(id)) +
         tableOf(countText(record.log.size(), "line") + ", by the phone's clock", {"Time", "Level", "Text"}, rows) +
         "</div>\n";
}

std::string faultsSection(const DiagnosticRecord& record, int level) {
  std::string rows;
  for (const DeclaredFault& one : record.faults) {
    const std::string fault = one.fault.dump(-1, ' ', false, nlohmann::ordered_json::error_handler_t::replace);
    rows += element("tr", element("td", htmlText(fault)) + element("td class=\"number\"", std::to_string(one.fired)));
  }
  if (rows.empty()) return {};
  return heading(level, "Faults of the simulated phone") +
         tableOf("Faults and how often they occurred", {"Fault", "Times"}, rows);
}

}  // namespace quazor
