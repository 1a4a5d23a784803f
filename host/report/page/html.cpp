#include "host/report/page/html.h"

#include "host/text/display_width.h"
#include "host/text/number_text.h"
#include "host/text/table.h"
#include "host/text/xml_text.h"

#include <charconv>

namespace quazor {

namespace {

constexpr std::size_t kMaxNameWidth = 160;  // columns

}  // namespace

std::string htmlText(std::string_view text) { return xmlAttribute(printable(text)); }

std::string htmlLines(std::string_view text) { return xmlText(printableLines(text)); }

std::string htmlProse(std::string_view text, const std::function<std::string(const std::string& code)>& typed) {
  std::string html;
  while (true) {
    const std::size_t begin = text.find('`');
    const std::size_t end = begin == std::string_view::npos ? begin : text.find('`', begin + 1);
    if (end == std::string_view::npos) return html + htmlText(text);
    html += htmlText(text.substr(0, begin));
    const std::string code(text.substr(begin + 1, end - begin - 1));
    html += typed ? typed(code) : element("code", htmlText(code));
    text.remove_prefix(end + 1);
  }
}

std::string element(std::string_view tag, std::string_view content) {
  std::string html = "<";
  html += tag;
  html += '>';
  html += content;
  html += "</";
  html += tag.substr(0, tag.find(' '));
  html += '>';
  return html;
}

std::string breakableName(std::string_view name) {
  const std::string shown = printable(name);
  const auto isUpper = [](char unit) { return unit >= 'A' && unit <= 'Z'; };
  const auto isLower = [](char unit) { return unit >= 'a' && unit <= 'z'; };
  std::string html;
  std::size_t begin = 0;
  for (std::size_t i = 1; i < shown.size(); ++i) {
    const bool isAfterMark = shown[i - 1] == '.' || shown[i - 1] == '_';
    if (!isAfterMark && !(isLower(shown[i - 1]) && isUpper(shown[i]))) continue;
    html += xmlAttribute(shown.substr(begin, i - begin)) + "<wbr>";
    begin = i;
  }
  return html + xmlAttribute(shown.substr(begin));
}

std::string breakablePhrase(std::string_view name) { return breakableName(shortened(printable(name), kMaxNameWidth)); }

std::string htmlName(std::string_view name) { return xmlAttribute(shortened(printable(name), kMaxNameWidth)); }

std::string wholeName(std::string_view name) {
  const std::string shown = printable(name);
  if (widthOf(shown) <= kMaxNameWidth) return {};
  return element("p class=\"whole\"", "Whole name: " + xmlAttribute(shown));
}

std::string coordinate(double value) {
  char digits[512];  // enough for the largest number
  const auto [end, ignored] = std::to_chars(std::begin(digits), std::end(digits), value, std::chars_format::fixed, 1);
  std::string text(digits, end);
  if (text.ends_with(".0")) text.erase(text.size() - 2);
  return text == "-0" ? "0" : text;
}

std::string roundedText(double value) { return significantDigits(value, 6); }

std::string numberCell(double value, const std::vector<double>& thresholds, std::string_view attributes) {
  const std::string shown = shownNumber(value, thresholds);
  const std::string whole = defaultText(value);
  std::string tag = "td class=\"number\"" + std::string(attributes);
  if (shown != whole) tag += " title=\"" + whole + "\"";
  return element(tag, shown);
}

std::string heading(int level, std::string_view content) { return element("h" + std::to_string(level), content); }

}  // namespace quazor
