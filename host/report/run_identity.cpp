#include "host/report/run_identity.h"

#include "host/report/csv_report.h"
#include "host/text/timestamp.h"

#include <string_view>
#include <utility>

namespace quazor {

using Json = nlohmann::ordered_json;

namespace {

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
                                                              {"seed", std::to_string(run.seed)}};
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
  if (run.attempts > 0) json["attempts"] = run.attempts;
  if (run.repetitions > 0) json["repetitions"] = run.repetitions;
  if (run.acceptFlaky) json["acceptFlaky"] = true;
  return json;
}

std::string withRunColumns(const std::string& csv, const RunStarted& run) {
  std::string header;
  std::string cells;
  for (const auto& [name, value] : columnsOf(run)) {
    header += "," + csvField(name);
    cells += "," + csvField(value);
  }
  std::string table;
  bool quoted = false;
  const std::string* addition = &header;
  for (const char unit : csv) {
    if (unit == '"') quoted = !quoted;
    if (unit == '\n' && !quoted) table += *std::exchange(addition, &cells);
    table += unit;
  }
  return table;
}

std::string serialNumberOf(const RunStarted& run) {
  const std::string* const serial = run.tags.find("serial");
  return serial == nullptr ? std::string() : *serial;
}

}  // namespace quazor
