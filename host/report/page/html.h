// Pieces of HTML. Texts of plug-ins, records and users reach a page through htmlText() or htmlLines() only.
#pragma once

#include <cstddef>
#include <functional>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// Escapes a text for the content of an element and for an attribute in double quotes. Control characters, marks of
// writing direction and bytes that are not UTF-8 are shown as \xNN, as in a terminal.
std::string htmlText(std::string_view text);

// The same for a text of several lines, which keeps its newlines and tabs.
std::string htmlLines(std::string_view text);

// Prose, in which `back quotes` enclose what is typed. `typed` makes its HTML; without it, it is <code>.
std::string htmlProse(std::string_view text, const std::function<std::string(const std::string& code)>& typed = {});

// <tag>content</tag>. The tag may have attributes, as in "td class=\"value\"". `content` is HTML.
std::string element(std::string_view tag, std::string_view content);

// A name of several words, which may be broken after dots and underscores and before capitals only.
std::string breakableName(std::string_view name);

// A phrase, in a heading or a cell, for a name of any length: a very long one is cut.
std::string htmlName(std::string_view name);

// The same that may be broken like breakableName().
std::string breakablePhrase(std::string_view name);

// The whole name in a paragraph of its own if htmlName() cuts it; else nothing.
std::string wholeName(std::string_view name);

// "1.5": with at most one decimal, for coordinates.
std::string coordinate(double value);

// A number with six significant digits, for what was calculated from results.
std::string roundedText(double value);

// A cell with shownNumber() (host/text/number_text.h), and the whole number as its title if it is another. The
// attributes begin with a blank.
std::string numberCell(double value, const std::vector<double>& thresholds = {}, std::string_view attributes = {});

// A heading; level 1 is that of the page.
std::string heading(int level, std::string_view content);

}  // namespace quazor
