// The answer to a question about records, in one of several formats.
#pragma once

#include "host/report/report_format.h"

#include <cstdint>
#include <optional>
#include <ostream>
#include <string>
#include <variant>
#include <vector>

namespace quazor {

// Nothing, a number or a text.
using AnswerCell = std::variant<std::monostate, std::int64_t, double, std::string>;

AnswerCell cellOf(const std::optional<double>& number);
AnswerCell countCell(std::uint64_t number);

struct AnswerTable {
  std::string name;                  // in JSON
  std::vector<std::string> columns;  // as in JSON and CSV
  std::vector<std::vector<AnswerCell>> rows{};
};

// One table, more for JSON and text, and sentences for text.
struct Answer {
  std::vector<std::string> before{};  // lines above the tables
  std::vector<AnswerTable> tables{};
  std::vector<std::string> after{};
};

// Text has all tables that have rows, CSV the first one, and JSON an object with an array of objects for each.
void printAnswer(std::ostream& out, const Answer& answer, Format format);

}  // namespace quazor
