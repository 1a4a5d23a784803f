#include "host/report/page/details.h"

#include "host/report/page/html.h"
#include "host/report/page/plot.h"
#include "host/report/sample_images.h"
#include "host/text/table.h"

#include <algorithm>
#include <cstddef>
#include <map>
#include <optional>
#include <vector>

namespace quazor {

namespace {

constexpr std::size_t kMaxImages = 200;  // of an entry; all of them are in the record

bool isScalar(const Value& value) { return value.array() == nullptr && value.dictionary() == nullptr; }

// True for a dictionary whose entries are dictionaries of single values, such as the counters of several cameras.
bool isTable(const Value& value) {
  const Dictionary* const rows = value.dictionary();
  return rows != nullptr && !rows->empty() && std::all_of(rows->begin(), rows->end(), [](const auto& row) {
           const Dictionary* const cells = row.second.dictionary();
           return cells != nullptr &&
                  std::all_of(cells->begin(), cells->end(), [](const auto& cell) { return isScalar(cell.second); });
         });
}

std::string cellOf(const Value& value) {
  if (const double* const number = value.doubleNumber()) return numberCell(*number);
  return element("td class=\"number\"", htmlText(defaultText(value)));
}

std::string tableOf(const std::string& name, const Dictionary& rows) {
  std::vector<std::string> columns;
  for (const auto& [ignored, row] : rows) {
    for (const auto& [column, value] : *row.dictionary()) {
      if (std::find(columns.begin(), columns.end(), column) == columns.end()) columns.push_back(column);
    }
  }
  std::string head = element("th scope=\"col\"", "Of");
  for (const std::string& column : columns) head += element("th scope=\"col\" class=\"number\"", breakableName(column));
  std::string body;
  for (const auto& [rowName, row] : rows) {
    std::string cells = element("th scope=\"row\"", breakableName(rowName));
    for (const std::string& column : columns) {
      const Value* const value = row.dictionary()->find(column);
      cells += value == nullptr ? "<td></td>" : cellOf(*value);
    }
    body += element("tr", cells);
  }
  return element("table",
                 element("caption", htmlName(name)) + element("thead", element("tr", head)) + element("tbody", body)) +
         "\n";
}

std::vector<double> samplesOf(const Value& value) {
  std::vector<double> samples;
  for (const Value& one : *value.array()) samples.push_back(toDouble(&one));
  return samples;
}

// The curves of an image, with the names of their entries and its other values.
std::string imageOf(const Dictionary& image, std::size_t number) {
  std::vector<std::vector<double>> curves;
  std::string names;
  std::string others;
  for (const auto& [name, value] : image) {
    std::string& text = isSamples(value) ? names : others;
    text += (text.empty() ? "" : ", ") + name;
    if (isSamples(value)) {
      curves.push_back(samplesOf(value));
    } else {
      text += " " + defaultText(value);
    }
  }
  const std::string title = "Image " + std::to_string(number);
  return element("figure class=\"image\"",
                 samplesSvg(title + ": " + names, curves) +
                     element("figcaption", title + ": " + htmlText(names + (others.empty() ? "" : "; " + others))));
}

std::string imagesOf(const std::string& name, const std::vector<const Dictionary*>& images, int level) {
  std::string html = heading(level, htmlName(name)) + "<div class=\"images\">";
  const std::size_t shown = std::min(images.size(), kMaxImages);
  for (std::size_t i = 0; i < shown; ++i) html += imageOf(*images[i], i + 1);
  html += "</div>\n";
  if (shown == images.size()) return html;
  return html + element("p", countText(images.size() - shown, "more image") + ": see the record.");
}

}  // namespace

std::string auxiliarySection(const DiagnosticRecord& record, int level) {
  std::string tables;
  std::string others;
  for (const auto& [name, value] : record.auxiliaryData) {
    if (const std::vector<const Dictionary*> images = imagesIn(value); !images.empty()) {
      tables += imagesOf(name, images, level + 1);
    } else if (isTable(value)) {
      tables += tableOf(name, *value.dictionary());
    } else {
      others += element("tr", element("th scope=\"row\"", breakableName(name)) +
                                  element("td class=\"line\"", htmlText(defaultText(value))));
    }
  }
  if (!others.empty()) {
    tables += element("table", element("caption", "Other data of the experiment") +
                                   "<thead><tr><th scope=\"col\">Name</th><th scope=\"col\">Value</th></tr></thead>" +
                                   element("tbody", others));
  }
  return tables.empty() ? tables : heading(level, "Counters and other data") + tables;
}

}  // namespace quazor
