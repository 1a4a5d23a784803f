#include "host/command/records/answer.h"

#include "contract/message_format.h"
#include "host/record/value_json.h"
#include "host/report/csv_report.h"
#include "host/text/number_text.h"
#include "host/text/table.h"

#include <nlohmann/json.hpp>

#include <algorithm>
#include <cmath>
#include <cstdio>

namespace quazor {

namespace {

using Json = nlohmann::ordered_json;

constexpr int kShownDigits = 5;

struct ToJson {
  Json operator()(std::monostate) const { return nullptr; }
  Json operator()(std::int64_t number) const { return number; }
  Json operator()(double number) const { return numberJson(number); }
  Json operator()(const std::string& text) const { return text; }
};

struct ToCsv {
  std::string operator()(std::monostate) const { return {}; }
  std::string operator()(std::int64_t number) const { return std::to_string(number); }
  std::string operator()(double number) const { return defaultText(number); }
  std::string operator()(const std::string& text) const { return csvField(textCell(text)); }
};

struct ToText {
  std::string operator()(std::monostate) const { return {}; }
  std::string operator()(std::int64_t number) const { return std::to_string(number); }
  std::string operator()(double number) const { return significantDigits(number, kShownDigits); }
  std::string operator()(const std::string& text) const { return printable(text); }
};

void printCsv(std::ostream& out, const AnswerTable& table) {
  const auto line = [&out](const auto& cells, const auto& text) {
    std::string separator;
    for (const auto& cell : cells) out << std::exchange(separator, ",") << text(cell);
    out << "\r\n";
  };
  line(table.columns, csvField);
  for (const auto& row : table.rows) line(row, [](const AnswerCell& cell) { return std::visit(ToCsv(), cell); });
}

void printJson(std::ostream& out, const Answer& answer) {
  Json document = Json::object();
  for (const AnswerTable& table : answer.tables) {
    Json& rows = document[table.name] = Json::array();
    for (const auto& row : table.rows) {
      Json object = Json::object();
      for (std::size_t i = 0; i < row.size(); ++i) object[table.columns[i]] = std::visit(ToJson(), row[i]);
      rows.push_back(std::move(object));
    }
  }
  out << documentText(document);
}

// Numbers to the right, as far as a column has no text.
std::vector<Table::Align> alignmentsOf(const AnswerTable& table) {
  std::vector<Table::Align> alignments;
  for (std::size_t i = 0; i < table.columns.size(); ++i) {
    const bool isText = std::any_of(table.rows.begin(), table.rows.end(),
                                    [i](const auto& row) { return std::holds_alternative<std::string>(row[i]); });
    alignments.push_back(isText ? Table::Align::kLeft : Table::Align::kRight);
  }
  return alignments;
}

void printTable(std::ostream& out, const AnswerTable& table) {
  Table shown(alignmentsOf(table));
  std::vector<std::string> names = table.columns;
  for (std::string& name : names) std::replace(name.begin(), name.end(), '_', ' ');
  shown.addHeader(names);
  for (const auto& row : table.rows) {
    std::vector<std::string> cells;
    cells.reserve(row.size());
    for (const AnswerCell& cell : row) cells.push_back(std::visit(ToText(), cell));
    shown.addRow(std::move(cells));
  }
  shown.print(out, "");
}

}  // namespace

AnswerCell cellOf(const std::optional<double>& number) { return number ? AnswerCell(*number) : AnswerCell(); }

AnswerCell countCell(std::uint64_t number) { return static_cast<std::int64_t>(number); }

void printAnswer(std::ostream& out, const Answer& answer, Format format) {
  if (format == Format::kJson) return printJson(out, answer);
  if (format == Format::kCsv) return printCsv(out, answer.tables.front());
  bool isFirst = true;
  const auto separate = [&] {
    if (!std::exchange(isFirst, false)) out << '\n';
  };
  if (!answer.before.empty()) separate();
  for (const std::string& line : answer.before) printWrapped(out, line, "", "");
  for (const AnswerTable& table : answer.tables) {
    if (table.rows.empty()) continue;
    separate();
    printTable(out, table);
  }
  if (!answer.after.empty()) separate();
  for (const std::string& line : answer.after) printWrapped(out, line, "", "");
}

}  // namespace quazor
