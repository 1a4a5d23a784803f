#include "host/report/page/run_facts.h"

#include "host/report/page/html.h"
#include "host/report/run_identity.h"
#include "host/text/timestamp.h"

#include <algorithm>
#include <filesystem>
#include <string_view>

namespace quazor {

namespace {

std::string row(std::string_view name, const std::string& text) {
  return element("tr", element("th scope=\"row\"", name) + element("td", htmlText(text))) + "\n";
}

}  // namespace

std::string shortPhone(const RunStarted& run) { return std::filesystem::path(run.phone).stem().string(); }

std::string dateText(Date date) { return timestampText(date).substr(0, 19).replace(10, 1, " "); }

std::string deviceText(const std::vector<RunStarted>& runs) {
  const std::string kind = phoneKind(runs.front());
  const bool isSame = std::ranges::all_of(runs, [&kind](const RunStarted& run) { return phoneKind(run) == kind; });
  if (!isSame) return {};
  return kind == kSimulatedPhone ? kind + ": no hardware was tested" : kind;
}

std::string runTable(const ShownRun& shown) {
  const RunStarted& run = shown.began;
  std::string rows;
  if (!shown.file.empty()) rows += row("Record", shown.file);
  if (!run.id.empty()) rows += row(run.analyzed ? "Analysis" : "Run", run.id);
  rows += row("Date", timestampText(run.date));
  if (run.analyzed) {
    rows += row("Analyzed run", run.analyzed->id);
    rows += row("Date of that run", timestampText(run.analyzed->date));
    rows += row("Machine of that run", run.analyzed->host);
  }
  rows += row("Phone", run.phone);
  rows += row("Kind of phone", phoneKind(run));
  for (const auto& [key, value] : run.tags) rows += row("Tag " + htmlText(key), value);
  rows += row("Seed", std::to_string(run.seed));
  if (!run.host.empty()) rows += row("Machine", run.host);
  rows += row("Program", "quazor " + run.program);
  rows += row("Plug-in contract", std::to_string(run.contract));
  for (const std::string& plugin : run.plugins) rows += row("Plug-in", plugin);
  if (run.attempts > 0) rows += row("Attempts, at most", std::to_string(run.attempts));
  if (run.repetitions > 0) rows += row("Repetitions", std::to_string(run.repetitions));
  return element("table", element("caption", "What was run, on what, with what") + element("tbody", rows)) + "\n";
}

}  // namespace quazor
