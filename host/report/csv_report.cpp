#include "host/report/csv_report.h"

#include "contract/message_format.h"
#include "host/model/limit_check.h"
#include "host/report/sample_images.h"
#include "host/report/text_report.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <map>
#include <set>
#include <utility>

namespace quazor {

namespace {

// Groups of columns, from left to right. Within a group, columns are sorted by name.
enum class Group { kExperiment, kTrial, kImage, kOfImage, kSample, kSamples, kMeasurement, kValue, kUnit };
using Column = std::pair<Group, std::string>;
using Row = std::map<Column, std::string>;

std::string cellOf(const Value& value) { return value.isNumber() ? defaultText(value) : textCell(defaultText(value)); }

Column experimentColumn() { return {Group::kExperiment, "experiment"}; }
Column measurementColumn() { return {Group::kMeasurement, "measurement"}; }
Column valueColumn() { return {Group::kValue, "value"}; }
Column unitColumn() { return {Group::kUnit, "unit"}; }

template <class Visit>
void visitImage(const Row& base, const Dictionary& image, Visit&& visit) {
  Row row = base;
  std::size_t count = 0;
  for (const auto& [name, value] : image) {
    if (isSamples(value)) {
      count = std::max(count, value.array()->size());
    } else {
      row[{Group::kOfImage, name}] = cellOf(value);
    }
  }
  for (std::size_t sample = 0; sample < count; ++sample) {
    row[{Group::kSample, "sample"}] = std::to_string(sample);
    for (const auto& [name, value] : image) {
      if (!isSamples(value)) continue;
      const Array& samples = *value.array();
      row[{Group::kSamples, name}] = sample < samples.size() ? defaultText(samples[sample]) : std::string();
    }
    visit(row);
  }
}

// The cells of every row of the experiment.
Row rowOf(const DiagnosticRecord& record) {
  Row row{{experimentColumn(), textCell(record.name)}};
  if (record.trial.attempt > 0) row[{Group::kTrial, "attempt"}] = std::to_string(record.trial.attempt);
  if (record.trial.repetition > 0) row[{Group::kTrial, "repetition"}] = std::to_string(record.trial.repetition);
  return row;
}

// Calls `visitRow` for each row, with the record that it is of.
template <class Visit>
void visitRows(const std::vector<DiagnosticRecord>& records, Visit&& visitRow) {
  for (const DiagnosticRecord& record : records) {
    const auto visit = [&](const Row& one) { visitRow(one, record); };
    Row row = rowOf(record);
    std::size_t number = 0;
    for (const auto& [ignored, value] : record.auxiliaryData) {
      for (const Dictionary* const image : imagesIn(value)) {
        row[{Group::kImage, "image"}] = std::to_string(++number);
        visitImage(row, *image, visit);
      }
    }
    for (const auto& [name, measurement] : record.measurements) {
      Row ofMeasurement = rowOf(record);
      ofMeasurement[measurementColumn()] = textCell(name);
      ofMeasurement[valueColumn()] = defaultText(measurement.value());
      ofMeasurement[unitColumn()] = textCell(measurement.unit().symbol());
      visit(ofMeasurement);
    }
  }
}

void appendLine(std::string& csv, const std::vector<std::string_view>& fields) {
  std::string_view separator;
  for (const std::string_view field : fields) {
    csv += separator;
    csv += csvField(field);
    separator = ",";
  }
  csv += '\n';
}

const std::vector<std::string_view> kDiagnosticColumns = {
    "diagnostic", "verdict",   "result",   "value",         "unit",       "limit",       "lower",     "lowerOpen",
    "upper",      "upperOpen", "severity", "resultVerdict", "errorStage", "errorDomain", "errorCode", "errorMessage"};

// Appends the name of the limit and the four cells of its bounds.
void addLimit(std::vector<std::string>& cells, const std::optional<QZLimit>& limit) {
  cells.push_back(limit ? textCell(limit->name()) : std::string());
  for (const auto which : {&QZLimit::lowerBound, &QZLimit::upperBound}) {
    const QZBound* const bound = limit ? ((*limit).*which)().get() : nullptr;
    cells.push_back(bound == nullptr ? std::string() : defaultText(bound->value().value()));
    cells.push_back(bound == nullptr ? std::string() : defaultText(bound->open()));
  }
}

bool hasAttempts(const std::vector<DiagnosticRecord>& records) {
  return std::any_of(records.begin(), records.end(), [](const DiagnosticRecord& one) { return one.trial.attempt > 0; });
}

bool hasRepetitions(const std::vector<DiagnosticRecord>& records) {
  return std::any_of(records.begin(), records.end(),
                     [](const DiagnosticRecord& one) { return one.trial.repetition > 0; });
}

// Empty for 0.
std::string countCell(std::uint64_t count) { return count == 0 ? std::string() : std::to_string(count); }

bool hasSkips(const std::vector<DiagnosticRecord>& records) {
  return std::any_of(records.begin(), records.end(), [](const DiagnosticRecord& one) { return one.skip.has_value(); });
}

// Appends one line. `cells` are those of a result; empty if the diagnostic has none.
void appendDiagnosticLine(std::string& csv, const DiagnosticRecord& record, const std::vector<std::string>& ofResult,
                          const std::vector<std::string>& more) {
  std::vector<std::string> cells{textCell(record.name), std::string(nameOf(record.verdict))};
  cells.insert(cells.end(), ofResult.begin(), ofResult.end());
  cells.resize(kDiagnosticColumns.size() - 4);
  if (const DiagnosticErrorPtr& error = record.error; error != nullptr) {
    cells.emplace_back(errorStageText(record));
    cells.insert(cells.end(),
                 {textCell(error->domain()), std::to_string(error->code()), textCell(error->localizedDescription())});
  }
  cells.resize(kDiagnosticColumns.size());
  cells.insert(cells.end(), more.begin(), more.end());
  appendLine(csv, {cells.begin(), cells.end()});
}

std::vector<std::string> cellsOf(const QZMeasuredResult& result, const std::optional<QZLimit>& limit,
                                 std::string_view severity, std::string_view verdict) {
  const Measurement& measurement = result.measurement();
  std::vector<std::string> cells = {textCell(result.name()), defaultText(measurement.value()),
                                    textCell(measurement.unit().symbol())};
  addLimit(cells, limit);
  cells.emplace_back(severity);
  cells.emplace_back(verdict);
  return cells;
}

// A user-defined limit. A relation has no bounds.
std::vector<std::string> cellsOf(const LimitCheck& check) {
  return cellsOf(check.result, boundsOf(check).value_or(QZLimit(labelOf(check.limit))), nameOf(check.limit.severity),
                 check.verdictName());
}

}  // namespace

std::string textCell(std::string_view text) {
  const std::size_t first = text.find_first_not_of('\'');
  const bool looksLikeFormula =
      first != std::string_view::npos && std::string_view("=+-@\t\r").find(text[first]) != std::string_view::npos;
  return (looksLikeFormula ? "'" : "") + std::string(text);
}

std::string csvField(std::string_view text) {
  if (text.find_first_of(",\"\r\n") == std::string_view::npos) return std::string(text);
  std::string field = "\"";
  for (const char unit : text) {
    if (unit == '"') field += '"';
    field += unit;
  }
  return field + "\"";
}

std::string experimentCsv(const std::vector<DiagnosticRecord>& records, std::vector<std::uint64_t>* seeds) {
  std::set<Column> columns;
  visitRows(records, [&columns](const Row& row, const DiagnosticRecord& /*record*/) {
    for (const auto& [column, ignored] : row) columns.insert(column);
  });
  if (columns.empty()) columns = {experimentColumn(), measurementColumn(), valueColumn(), unitColumn()};
  std::string csv;
  std::vector<std::string> header;
  header.reserve(columns.size());
  for (const Column& column : columns) header.push_back(textCell(column.second));
  appendLine(csv, {header.begin(), header.end()});
  std::vector<std::string_view> fields;
  fields.reserve(columns.size());
  visitRows(records, [&](const Row& row, const DiagnosticRecord& record) {
    if (seeds != nullptr) seeds->push_back(record.seed);
    fields.clear();
    for (const Column& column : columns) {
      const auto cell = row.find(column);
      fields.push_back(cell == row.end() ? std::string_view() : std::string_view(cell->second));
    }
    appendLine(csv, fields);
  });
  return csv;
}

std::string diagnosticCsv(const std::vector<DiagnosticRecord>& records, std::vector<std::uint64_t>* seeds) {
  std::string csv;
  std::vector<std::string_view> columns = kDiagnosticColumns;
  const bool withSkips = hasSkips(records);
  if (withSkips) columns.insert(columns.end(), {"skipKind", "skipReason"});
  const bool withAttempts = hasAttempts(records);
  const bool withRepetitions = hasRepetitions(records);
  if (withAttempts) columns.emplace_back("attempt");
  if (withRepetitions) columns.emplace_back("repetition");
  appendLine(csv, columns);
  for (const DiagnosticRecord& record : records) {
    std::vector<std::string> more(withSkips ? 2 : 0);
    if (record.skip) more = {std::string(nameOf(record.skip->kind)), textCell(record.skip->reason)};
    if (withAttempts) more.push_back(countCell(record.trial.attempt));
    if (withRepetitions) more.push_back(countCell(record.trial.repetition));
    const auto append = [&](const std::vector<std::string>& ofResult) {
      appendDiagnosticLine(csv, record, ofResult, more);
      if (seeds != nullptr) seeds->push_back(record.seed);
    };
    const std::vector<LimitCheck> checks = limitChecksOf(record);
    for (std::size_t i = 0; i < record.measuredResults.size(); ++i) {
      const auto& [result, verdict, ignored] = record.measuredResults[i];
      append(cellsOf(result, result.limit(), {}, nameOf(verdict)));
      for (const LimitCheck& check : checksOfResult(checks, i)) append(cellsOf(check));
    }
    if (record.measuredResults.empty()) append({});
  }
  return csv;
}

}  // namespace quazor
