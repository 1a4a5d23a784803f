#include "host/report/experiment_report.h"

#include "contract/message_format.h"
#include "host/model/variation.h"
#include "host/report/sample_images.h"
#include "host/report/variation_report.h"
#include "host/text/display_width.h"
#include "host/text/sample_picture.h"
#include "host/text/table.h"
#include "host/text/terminal.h"

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <string>
#include <string_view>

namespace quazor {

namespace {

// Fewer samples are easier to read as numbers; more do not fit.
constexpr std::size_t kMinDrawn = 8;
constexpr std::size_t kMaxDrawn = 64;

// "min 1, max 9": the least and the greatest finite sample, unrounded.
std::string rangeOf(const Array& samples) {
  const Value* lowest = nullptr;
  const Value* highest = nullptr;
  for (const Value& sample : samples) {
    const double number = toDouble(&sample);
    if (!std::isfinite(number)) continue;
    if (lowest == nullptr || number < toDouble(lowest)) lowest = &sample;
    if (highest == nullptr || number > toDouble(highest)) highest = &sample;
  }
  if (lowest == nullptr) return "none finite";
  return formatMessage("min %@, max %@", *lowest, *highest);
}

// Prints `first` and then the items, separated by commas. Breaks lines between items.
void printItems(std::ostream& out, const std::string& first, const std::vector<std::string>& items,
                const std::string& indent) {
  const std::size_t columns = std::min(kWidestText, columnsOf(out));
  std::string line = indent + first;
  for (std::size_t i = 0; i < items.size(); ++i) {
    const std::string item = i + 1 < items.size() ? items[i] + "," : items[i];
    if (widthOf(line) + 1 + widthOf(item) > columns) {
      out << line << '\n';
      line = indent;
      line += "  ";
      line += item;
    } else {
      line += " " + item;
    }
  }
  out << line << '\n';
}

class AuxiliaryPrinter {
 public:
  AuxiliaryPrinter(std::ostream& out, bool blocks) : out_(out), blocks_(blocks) {}

  void printEntry(const std::string& name, const Value& value, const std::string& indent) const {
    if (const std::vector<const Dictionary*> images = imagesIn(value); !images.empty()) {
      for (std::size_t i = 0; i < images.size(); ++i) {
        if (i > 0) out_ << '\n';
        printImage(value.array() == nullptr ? name : numbered(name, i, images.size()), *images[i], indent);
      }
    } else if (value.dictionary() != nullptr && !value.dictionary()->empty()) {
      out_ << indent << name << ":\n";
      for (const auto& [key, entry] : *value.dictionary()) printEntry(printable(key), entry, indent + "  ");
    } else if (isSamples(value) && value.array()->size() >= kMinDrawn) {
      printSamples(name, *value.array(), indent);
    } else if (isNested(value)) {
      const Array& elements = *value.array();
      for (std::size_t i = 0; i < elements.size(); ++i) {
        printEntry(numbered(name, i, elements.size()), elements[i], indent);
      }
    } else {
      out_ << indent << name << ": " << printable(defaultText(value)) << '\n';
    }
  }

 private:
  static std::string numbered(const std::string& name, std::size_t at, std::size_t count) {
    return formatMessage("%@ %@ of %@", name, at + 1, count);
  }

  static bool isContainer(const Value& value) { return value.array() != nullptr || value.dictionary() != nullptr; }

  static bool isNested(const Value& value) {
    return value.array() != nullptr && std::any_of(value.array()->begin(), value.array()->end(), isContainer);
  }

  void printImage(const std::string& name, const Dictionary& image, const std::string& indent) const {
    std::vector<std::string> items;
    for (const auto& [key, value] : image) {
      if (!isContainer(value)) items.push_back(printable(key) + " " + printable(defaultText(value)));
    }
    printItems(out_, name + ":", items, indent);
    for (const auto& [key, value] : image) {
      if (isContainer(value)) printEntry(printable(key), value, indent + "  ");
    }
  }

  void printSamples(const std::string& name, const Array& samples, const std::string& indent) const {
    out_ << indent << name << ": " << samples.size() << " samples, " << rangeOf(samples) << '\n';
    if (samples.size() > kMaxDrawn || samples.size() + indent.size() > columnsOf(out_)) return;
    std::vector<double> numbers;
    numbers.reserve(samples.size());
    for (const Value& sample : samples) numbers.push_back(toDouble(&sample));
    for (const std::string& line : pictureOf(numbers, blocks_)) out_ << indent << line << '\n';
  }

  std::ostream& out_;
  const bool blocks_;
};

void printMeasurements(std::ostream& out, const OrderedMap<Measurement>& measurements) {
  using Align = Table::Align;
  Table table({Align::kLeft, Align::kRight, Align::kLeft});
  table.addHeader({"Measurement", "Value", "Unit"});
  for (const auto& [name, measurement] : measurements) {
    table.addRow({printable(name), defaultText(measurement.value()), printable(measurement.unit().symbol())});
  }
  table.print(out, "  ");
}

}  // namespace

void printAuxiliaryData(std::ostream& out, const Dictionary& data, bool blocks) {
  const AuxiliaryPrinter printer(out, blocks);
  for (const auto& [name, value] : data) printer.printEntry(printable(name), value, "  ");
}

void printExperiment(std::ostream& out, const DiagnosticRecord& record, TextStyle style) {
  out << printable(record.name) << '\n' << indentedLines(record.summary, "  ");
  if (!record.measurements.empty()) {
    out << '\n';
    printMeasurements(out, record.measurements);
  }
  if (!record.auxiliaryData.empty()) {
    out << '\n';
    printAuxiliaryData(out, record.auxiliaryData, style.blocks);
  }
  out << "\n  " << verdictText(record, style.colour) << '\n';
  if (const std::string trial = trialTextWithSeed(record); !trial.empty()) out << "    " << trial << '\n';
  if (record.verdict == Verdict::kError) out << errorText(record.error, "    ");
  if (record.skip) out << "    " << printable(textOf(*record.skip)) << '\n';
  out << '\n';
}

void printExperimentSummary(std::ostream& out, const std::vector<DiagnosticRecord>& records, std::size_t notReached) {
  const VerdictCounts counts = verdictCountsOf(records);
  const bool isRepeated =
      std::any_of(records.begin(), records.end(), [](const DiagnosticRecord& one) { return one.trial.repetition > 0; });
  out << countText(counts.all(), isRepeated ? "run" : "experiment") << ": " << counts.passed << " returned a result, "
      << counts.errors << " ended in an error";
  if (counts.skipped > 0) out << ", " << counts.skipped << " skipped";
  if (counts.flaky > 0) out << ", " << counts.flaky << " flaky";
  if (notReached > 0) out << ", " << notReached << " not reached";
  out << '\n';
}

}  // namespace quazor
