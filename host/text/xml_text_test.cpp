#include "host/text/xml_text.h"

#include <gtest/gtest.h>

#include <string_view>

namespace quazor {
namespace {

#define REPLACED "\xEF\xBF\xBD"

struct Row {
  const char* name;
  std::string_view text;
  std::string_view xml;
};

TEST(XmlText, EscapesWhatMarksUp) {
  EXPECT_EQ(xmlText(""), "");
  EXPECT_EQ(xmlText("it's <a b=\"c\"> & ]]>"), "it's &lt;a b=&quot;c&quot;&gt; &amp; ]]&gt;");
}

TEST(XmlText, KeepsTabsAndLineEnds) {
  EXPECT_EQ(xmlText("a\tb\nc\rd"), "a\tb\nc&#13;d");
  EXPECT_EQ(xmlAttribute("a\tb\nc\rd"), "a&#9;b&#10;c&#13;d");
}

TEST(XmlText, KeepsWellFormedCharactersThatXmlAllows) {
  constexpr Row kRows[] = {
      {"two bytes, the first", "\xC2\x80", "\xC2\x80"},
      {"two bytes, the last", "\xDF\xBF", "\xDF\xBF"},
      {"three bytes, the first", "\xE0\xA0\x80", "\xE0\xA0\x80"},
      {"before the surrogates", "\xED\x9F\xBF", "\xED\x9F\xBF"},
      {"behind the surrogates", "\xEE\x80\x80", "\xEE\x80\x80"},
      {"U+FFFD", REPLACED, REPLACED},
      {"four bytes, the first", "\xF0\x90\x80\x80", "\xF0\x90\x80\x80"},
      {"the last of all", "\xF4\x8F\xBF\xBF", "\xF4\x8F\xBF\xBF"},
      {"delete", "\x7F", "\x7F"},
  };
  for (const Row& row : kRows) EXPECT_EQ(xmlText(row.text), row.xml) << row.name;
}

TEST(XmlText, ReplacesWhatXmlDoesNotAllow) {
  constexpr Row kRows[] = {
      {"zero", std::string_view("a\0b", 3), "a" REPLACED "b"},
      {"a control character", "\x1F", REPLACED},
      {"U+FFFE", "\xEF\xBF\xBE", REPLACED},
      {"U+FFFF", "\xEF\xBF\xBF", REPLACED},
  };
  for (const Row& row : kRows) {
    EXPECT_EQ(xmlText(row.text), row.xml) << row.name;
    EXPECT_EQ(xmlAttribute(row.text), row.xml) << row.name;
  }
}

TEST(XmlText, ReplacesEachSequenceThatBeginsNoCharacter) {
  constexpr Row kRows[] = {
      {"a byte that continues", "\x80x", REPLACED "x"},
      {"overlong, two bytes", "\xC1\xBF", REPLACED REPLACED},
      {"overlong, three bytes", "\xE0\x9F\xBF", REPLACED REPLACED REPLACED},
      {"overlong, four bytes", "\xF0\x8F\xBF\xBF", REPLACED REPLACED REPLACED REPLACED},
      {"a surrogate", "\xED\xA0\x80", REPLACED REPLACED REPLACED},
      {"beyond the last", "\xF4\x90\x80\x80", REPLACED REPLACED REPLACED REPLACED},
      {"no lead byte", "\xF5", REPLACED},
      {"cut off after two of three", "\xE2\x82", REPLACED},
      {"cut off after three of four", "\xF0\x9F\x93<", REPLACED "&lt;"},
      {"cut off by another character", "\xE2\x82\xC3\xA9", REPLACED "\xC3\xA9"},
  };
  for (const Row& row : kRows) EXPECT_EQ(xmlText(row.text), row.xml) << row.name;
}

}  // namespace
}  // namespace quazor
