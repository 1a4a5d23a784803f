#include "host/report/run_identity.h"

#include "contract/message_format.h"
#include "host/device/phone.h"
#include "host/model/incomplete_run.h"
#include "host/report/csv_report.h"
#include "host/text/table.h"
#include "host/text/timestamp.h"

#include <string_view>
#include <utility>

namespace quazor {

using Json = nlohmann::ordered_json;

namespace {

constexpr std::string_view kSeedColumn = "seed";

// The cell of the seed is left to the line.
std::vector<std::pair<std::string, std::string>> columnsOf(const RunStarted& run) {
  std::string plugins;
  std::string_view separator;
  for (const std::string& plugin : run.plugins) {
    plugins += separator;
    plugins += plugin;
    separator = "; ";
  }
  std::vector<std::pair<std::string, std::string>> columns = {{"run", run.id},
                                                              {"date", timestampText(run.date)},
                                                              {"host", textCell(run.host)},
                                                              {"program", textCell(run.program)},
                                                              {"contract", std::to_string(run.contract)},
                                                              {"plugins", textCell(plugins)},
                                                              {"phone", textCell(run.phone)},
                                                              {std::string(kSeedColumn), {}}};
  if (run.analyzed) {
    columns.emplace_back("analyzedRun", run.analyzed->id);
    columns.emplace_back("analyzedDate", timestampText(run.analyzed->date));
    columns.emplace_back("analyzedHost", textCell(run.analyzed->host));
  }
  for (const auto& [key, value] : run.tags) columns.emplace_back("tag." + key, textCell(value));
  return columns;
}

}  // namespace

Json runJson(const RunStarted& run) {
  Json tags = Json::object();
  for (const auto& [key, value] : run.tags) tags[key] = value;
  Json json = {{"id", run.id},
               {"date", timestampText(run.date)},
               {"host", run.host},
               {"program", run.program},
               {"contract", run.contract},
               {"plugins", run.plugins},
               {"phone", run.phone},
               {"seed", run.seed},
               {"tags", std::move(tags)}};
  if (run.analyzed) {
    json["analyzed"] = {
        {"id", run.analyzed->id}, {"date", timestampText(run.analyzed->date)}, {"host", run.analyzed->host}};
  }
  if (run.attempts > 0) json["attempts"] = run.attempts;
  if (run.repetitions > 0) json["repetitions"] = run.repetitions;
  if (run.acceptFlaky) json["acceptFlaky"] = true;
  return json;
}

void printRun(std::ostream& out, const RunStarted& run) {
  if (run.id.empty()) return;
  const auto lineOf = [](std::string_view what, const std::string& id, Date date, const std::string& host) {
    return formatMessage("%@%@%@, on %@", what, id.empty() ? "" : id + ", ", timestampText(date),
                         host.empty() ? "an unknown machine" : printable(host));
  };
  if (run.analyzed) {
    out << lineOf("Analysis ", run.id, run.date, run.host) << '\n'
        << lineOf("of run   ", run.analyzed->id, run.analyzed->date, run.analyzed->host) << '\n';
  } else {
    out << lineOf("Run   ", run.id, run.date, run.host) << '\n';
  }
  out << (run.analyzed ? "Phone    " : "Phone ") << printable(run.phone) << ", seed " << run.seed;
  for (const auto& [key, value] : run.tags) out << ", " << printable(key) << '=' << printable(value);
  out << "\n\n";
}

std::string interruptionText(const RunStarted& run, const std::string& interrupted) {
  return (run.analyzed ? "the recorded run did not come to its end: it stopped while " : "interrupted while ") +
         printable(nameOfRunning(run, interrupted)) + " was running";
}

std::string withRunColumns(const std::string& csv, const RunStarted& run, const std::vector<std::uint64_t>& seeds) {
  std::string header;
  std::string beforeSeed;
  std::string afterSeed;
  bool isAfter = false;
  for (const auto& [name, value] : columnsOf(run)) {
    header += "," + csvField(name);
    (isAfter ? afterSeed : beforeSeed) += "," + csvField(value);
    if (name == kSeedColumn) isAfter = true;
  }
  std::string table;
  bool quoted = false;
  bool isHeader = true;
  auto seed = seeds.begin();
  for (const char unit : csv) {
    if (unit == '"') quoted = !quoted;
    if (unit == '\n' && !quoted) {
      if (std::exchange(isHeader, false)) {
        table += header;
      } else {
        table += beforeSeed;
        table += std::to_string(*seed++);
        table += afterSeed;
      }
    }
    table += unit;
  }
  return table;
}

std::string phoneKind(const RunStarted& run) {
  if (run.phone.empty()) return "unknown phone";
  return bindingNamed(run.phone) ? "Linux binding" : std::string(kSimulatedPhone);
}

std::string serialNumberOf(const RunStarted& run) {
  const std::string* const serial = run.tags.find("serial");
  return serial == nullptr ? std::string() : *serial;
}

}  // namespace quazor
