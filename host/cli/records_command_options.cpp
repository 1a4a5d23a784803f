#include "host/cli/records_command_options.h"

#include "host/error/exit_code.h"
#include "host/store/schema.h"
#include "host/text/timestamp.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <iterator>

namespace quazor {

namespace {

constexpr const char* kUsualStore = "true";  // what CLI11 takes for --store without a file

enum Option {
  kDays = 1,
  kStation = 2,
  kSerial = 4,
  kDiagnostic = 8,
  kResult = 16,
  kRepair = 32,
  kOperands = 64,
  kBy = 128
};
constexpr int kOfRuns = kDays | kStation | kSerial;
constexpr int kOfResults = kOfRuns | kDiagnostic | kResult;

// What each action takes, in the order of the enumerators.
constexpr int kTaken[] = {kOperands,  kOfRuns,    kOperands,  kOfRuns | kBy,     kOfResults, kOfResults,
                          kOfResults, kOfResults, kOfResults, kSerial | kRepair, 0};

void require(bool isRight, const std::string& problem) {
  if (!isRight) throw CommandError(ExitCode::kUsage, problem);
}

void requireDay(const char* option, const std::optional<std::string>& day) {
  const bool isDay = !day || (day->size() == 10 && parseTimestamp(*day + "T00:00:00.000000000Z"));
  require(isDay, std::string(option) + " '" + day.value_or("") + "' is no day, such as 2026-11-21");
}

std::filesystem::path orUsual(const std::string& file) {
  if (!file.empty()) return file;
  std::filesystem::path usual = usualStore();
  require(!usual.empty(), "--store FILE is required: neither XDG_DATA_HOME nor HOME says where the store is");
  return usual;
}

// Refuses what the action does not take.
void checkTaken(const RecordsCommandTexts& texts, int taken) {
  const struct {
    int option;
    bool isGiven;
    const char* name;
  } options[] = {{kDays, texts.since.has_value(), "--since"},
                 {kDays, texts.until.has_value(), "--until"},
                 {kStation, texts.station.has_value(), "--station"},
                 {kSerial, texts.serial.has_value(), "--serial"},
                 {kDiagnostic, texts.diagnostic.has_value(), "--diagnostic"},
                 {kResult, texts.result.has_value(), "--result"},
                 {kRepair, texts.repaired, "--repaired"},
                 {kRepair, texts.note.has_value(), "--note"},
                 {kBy, texts.by.has_value(), "--by"}};
  const std::string action = "'quazor records " + texts.action + "'";
  for (const auto& one : options) {
    require(!one.isGiven || (taken & one.option) != 0, std::string(one.name) + " does not apply to " + action);
  }
  if ((taken & kOperands) == 0 && !texts.operands.empty()) {
    require(false, "'" + texts.operands.front() + "': " + action + " takes no file");
  }
}

}  // namespace

CLI::App& declareRecordsCommand(CLI::App& app, RecordsCommandTexts& texts, std::string& format) {
  CLI::App& command = *app.add_subcommand("records", "Ask about many records: yield, failures, flaky phones, drift");
  const std::vector<std::string> actions(std::begin(kRecordsActions), std::end(kRecordsActions));
  command
      .add_option(
          "ACTION", texts.action,
          "import: take records into the store; list, show: its runs; yield: by station or another tag, in the first "
          "run of each phone; failures: what fails most; flaky: phones with both verdicts; drift: results over the "
          "days; "
          "capability: Cpk and Ppk; gauge: repeatability and reproducibility; mark: that a phone was repaired; "
          "check: whether the store is right")
      ->type_name("")
      ->required()
      ->check(CLI::IsMember(actions));
  command
      .add_option("RECORD", texts.operands, "import: the records, or folders of them; show: the number or ID of a run")
      ->type_name("");
  const auto add = [&command](const char* name, std::optional<std::string>& text, const char* what, const char* form) {
    command.add_option(name, text, what)->type_name(form);
  };
  add("--store", texts.store, "The store; default quazor/records.sqlite in XDG_DATA_HOME or ~/.local/share", "FILE");
  add("--since", texts.since, "Only runs since that day, in UTC", "DAY");
  add("--until", texts.until, "Only runs until that day, in UTC", "DAY");
  add("--station", texts.station, "Only runs with the tag station=NAME", "NAME");
  add("--serial", texts.serial, "Only runs with the tag serial=NUMBER; mark: the phone", "NUMBER");
  add("--diagnostic", texts.diagnostic, "Only results of this diagnostic; a pattern for several", "NAME");
  add("--result", texts.result, "Only results of this name; a pattern for several", "NAME");
  command.add_flag("--repaired", texts.repaired, "mark: the phone was repaired now, so that it is not flaky");
  add("--note", texts.note, "mark: what was done", "TEXT");
  add("--by", texts.by, "yield: by the value of this tag, such as lot; default station", "TAG");
  command.add_option("--format", format, "Report format: text, json, csv")
      ->type_name("FORMAT")
      ->check(CLI::IsMember({"text", "json", "csv"}));
  return command;
}

std::vector<std::string*> textsOf(RecordsCommandTexts& texts) {
  std::vector<std::string*> all;
  for (std::string& one : texts.operands) all.push_back(&one);
  for (std::optional<std::string>* one : {&texts.store, &texts.since, &texts.until, &texts.station, &texts.serial,
                                          &texts.diagnostic, &texts.result, &texts.note, &texts.by}) {
    if (*one) all.push_back(&**one);
  }
  return all;
}

RecordsRequest recordsRequestOf(const RecordsCommandTexts& texts) {
  RecordsRequest request;
  const auto found = std::find(std::begin(kRecordsActions), std::end(kRecordsActions), texts.action);
  request.action = static_cast<RecordsAction>(found - std::begin(kRecordsActions));
  checkTaken(texts, kTaken[found - std::begin(kRecordsActions)]);
  requireDay("--since", texts.since);
  requireDay("--until", texts.until);
  require(!texts.since || !texts.until || *texts.since <= *texts.until, "--until is before --since");
  require(!texts.store || !texts.store->empty(), "--store is empty");
  for (const auto& [name, text] : {std::pair("--diagnostic", &texts.diagnostic), std::pair("--result", &texts.result),
                                   std::pair("--by", &texts.by)}) {
    require(!*text || !(*text)->empty(), std::string(name) + " is empty");
  }
  if (request.action == RecordsAction::kImport) {
    require(!texts.operands.empty(), "'quazor records import' takes records, or folders of them");
    require(std::find(texts.operands.begin(), texts.operands.end(), "") == texts.operands.end(), "RECORD is empty");
    request.records.assign(texts.operands.begin(), texts.operands.end());
  }
  if (request.action == RecordsAction::kShow) {
    require(texts.operands.size() == 1 && !texts.operands.front().empty(),
            "'quazor records show' takes the number of one run in the store, or the beginning of its ID");
    request.run = texts.operands.front();
  }
  if (request.action == RecordsAction::kMark) {
    require(texts.serial && !texts.serial->empty(), "'quazor records mark' requires --serial");
    require(texts.repaired, "'quazor records mark' requires --repaired");
  }
  require(request.action != RecordsAction::kGauge || texts.result,
          "'quazor records gauge' requires --result: the study is of one result");
  request.store = orUsual(texts.store.value_or(""));
  request.note = texts.note.value_or("");
  request.by = texts.by.value_or("station");
  request.filter = {texts.since.value_or(""),      texts.until.value_or(""), texts.station, texts.serial,
                    texts.diagnostic.value_or(""), texts.result.value_or("")};
  return request;
}

void addStore(CLI::App& command, std::string& text) {
  command.add_flag("--store", text,
                   "Take the record of the run into the store of 'quazor records', too, or with --store=FILE into "
                   "another one");
}

std::filesystem::path storeOf(const std::string& text, const std::filesystem::path& record) {
  if (text.empty()) return {};
  require(!record.empty(), "--store requires --record: the store is made of records");
  return orUsual(text == kUsualStore ? "" : text);
}

}  // namespace quazor
