#include "tests/sweeps/frames_told.h"

#include <nlohmann/json.hpp>

#include <charconv>
#include <cmath>
#include <optional>
#include <sstream>
#include <stdexcept>
#include <string_view>
#include <system_error>

namespace quazor {

namespace {

using Json = nlohmann::json;

void require(bool isSo, const std::string& what) {
  if (!isSo) throw std::out_of_range(what);
}

// The first entry is a value, each other one a difference to the value before; a null is passed over.
std::vector<std::optional<std::int64_t>> valuesOf(const Json& column) {
  std::vector<std::optional<std::int64_t>> values;
  std::int64_t last = 0;
  for (const Json& entry : column) {
    if (entry.is_null()) {
      values.emplace_back();
    } else {
      values.emplace_back(last += entry.get<std::int64_t>());
    }
  }
  return values;
}

// What follows the first `word` in the text, up to `end`; nothing if it is not there.
std::optional<std::string_view> between(std::string_view text, std::string_view word, std::string_view end) {
  const std::size_t at = text.find(word);
  if (at == std::string_view::npos) return std::nullopt;
  text.remove_prefix(at + word.size());
  return text.substr(0, text.find(end));
}

std::vector<double> numbersIn(std::string_view text) {
  std::vector<double> numbers;
  while (!text.empty()) {
    double number = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    if (error == std::errc() && std::isfinite(number)) numbers.push_back(number);
    text.remove_prefix(error == std::errc() ? static_cast<std::size_t>(end - text.data()) : 1);
  }
  return numbers;
}

void readRow(std::string_view row, ShownStream& shown) {
  std::vector<std::string_view> cells;
  for (std::size_t at = row.find("<td"); at != std::string_view::npos; at = row.find("<td", at + 1)) {
    const std::size_t begin = row.find('>', at) + 1;
    cells.push_back(row.substr(begin, row.find("</td>", begin) - begin));
  }
  shown.frames = static_cast<std::size_t>(numbersIn(cells.at(0)).at(0));
  shown.missing = static_cast<std::uint64_t>(numbersIn(cells.at(1)).at(0));
  shown.lost = static_cast<std::uint64_t>(numbersIn(cells.at(2)).at(0));
  shown.interval = numbersIn(cells.at(3));
  if (shown.interval.size() == 1) shown.interval.resize(3, shown.interval.front());
}

void readSentence(std::string_view sentence, ShownStream& shown) {
  require(numbersIn(sentence).at(0) == static_cast<double>(shown.frames), "the sentence counts other frames");
  if (const auto captured = between(sentence, "captured from ", ", at a median")) shown.captured = numbersIn(*captured);
  if (const auto gaps = between(sentence, " missing, at ", ".")) {
    const std::string_view before = sentence.substr(0, sentence.find(" frame number"));
    require(numbersIn(before).back() == static_cast<double>(shown.missing), "the sentence misses other frames");
    shown.gaps = static_cast<std::size_t>(numbersIn(*gaps).at(0));
    const std::vector<double> first = numbersIn(between(sentence, "the first after frame ", " s.").value());
    shown.gapAfter = static_cast<std::int64_t>(first.at(0));
    shown.gapAt = first.at(1);
  } else {
    require(between(sentence, "No frame number is missing.", "").has_value(), "nothing is said of missing frames");
  }
}

void readPlot(std::string_view plot, ShownStream& shown) {
  const std::vector<double> numbers = numbersIn(between(plot, "<path class=\"curve\" d=\"", "\"").value());
  for (std::size_t i = 0; i < numbers.size(); i += 2) shown.curve.emplace_back(numbers[i], numbers.at(i + 1));
  for (const char* const label : {R"(x="70" y="134">)", R"(x="710" y="134">)"}) {
    shown.times.push_back(numbersIn(between(plot, label, "<").value()).at(0));
  }
  constexpr std::string_view kHeight = R"(class="end" x="64" y=")";
  while (const auto label = between(plot, kHeight, "</text>")) {
    shown.heights.push_back(numbersIn(between(*label, ">", " ms").value()).at(0));
    plot.remove_prefix(plot.find(kHeight) + kHeight.size());
  }
}

}  // namespace

std::map<std::string, std::vector<TracedFrame>> framesInColumns(const std::string& record) {
  std::map<std::string, std::vector<TracedFrame>> streams;
  std::istringstream lines(record);
  for (std::string line; std::getline(lines, line);) {
    const Json event = Json::parse(line);
    if (event.at("event") != "frames") continue;
    require(event.at("step") == 1 && !event.contains("lost"), "not every frame is told");
    const Json& columns = event.at("columns");
    const auto number = valuesOf(columns.at("number"));
    const auto captured = valuesOf(columns.at("captured"));
    const auto delivered = valuesOf(columns.at("delivered"));
    const auto returned = valuesOf(columns.at("returned"));
    require(captured.size() == number.size() && delivered.size() == number.size() && returned.size() == number.size(),
            "columns of different length");
    std::vector<TracedFrame>& frames = streams[event.at("stream")];
    for (std::size_t i = 0; i < number.size(); ++i) {
      frames.push_back({number[i].value(), captured[i].value(), delivered[i].value(), returned[i]});
    }
  }
  return streams;
}

ShownStream streamOnPage(const std::string& page, const std::string& stream) {
  ShownStream shown;
  const std::string_view table = between(page, "<caption>Frames by stream;", "</table>").value_or("");
  const auto row = between(table, "<th scope=\"row\">" + stream + "</th>", "</tr>");
  const auto section = between(page, ">Stream " + stream + "</h4><p>", ">Stream ");
  require(row && section, "the page does not tell of " + stream);
  readRow(*row, shown);
  readSentence(section->substr(0, section->find("</p>")), shown);
  const auto plot = between(*section, "aria-label=\"Interval between the frames of " + stream + "\"", "</svg>");
  if (plot) readPlot(*plot, shown);
  return shown;
}

}  // namespace quazor
