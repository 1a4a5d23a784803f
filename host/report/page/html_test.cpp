#include "host/report/page/html.h"

#include <gtest/gtest.h>

namespace quazor {
namespace {

TEST(HtmlText, CanBeNeitherMarkupNorAnotherText) {
  EXPECT_EQ(htmlText("</script><script>alert(1)</script>"), "&lt;/script&gt;&lt;script&gt;alert(1)&lt;/script&gt;");
  EXPECT_EQ(htmlText("\" onerror=\"x' & y"), "&quot; onerror=&quot;x' &amp; y");
  EXPECT_EQ(htmlText("a\xE2\x80\xAE"
                     "b\xE2\x81\xA6"),
            "a\\xe2\\x80\\xaeb\\xe2\\x81\\xa6");
  EXPECT_EQ(htmlText(std::string_view("\0\x1B[31m\n\x7F\xC2\x9B\xFF", 11)), "\\x00\\x1b[31m\\x0a\\x7f\\x9b\\xff");
  EXPECT_EQ(htmlText("\xEF\xBF\xBE\xC3\xA9"), "\xEF\xBF\xBD\xC3\xA9");
}

TEST(HtmlText, KeepsTheLinesOfALog) { EXPECT_EQ(htmlLines("a\n\t<b>\r"), "a\n\t&lt;b&gt;\\x0d"); }

TEST(HtmlText, ShowsWhatIsTypedInProse) {
  EXPECT_EQ(htmlProse("Type `quazor <x>` or `help`."), "Type <code>quazor &lt;x&gt;</code> or <code>help</code>.");
  EXPECT_EQ(htmlProse("one ` alone"), "one ` alone");
}

TEST(HtmlName, CutsAVeryLongName) {
  const std::string name(100'000, 'a');
  EXPECT_EQ(htmlName(name), std::string(157, 'a') + "...");
  EXPECT_NE(wholeName(name).find(name), std::string::npos);
  EXPECT_EQ(htmlName("<short>"), "&lt;short&gt;");
  EXPECT_EQ(wholeName("<short>"), "");
}

TEST(BreakableName, IsBrokenBetweenItsWords) {
  EXPECT_EQ(breakableName("BackTele.FrameOffset"), "Back<wbr>Tele.<wbr>Frame<wbr>Offset");
  EXPECT_EQ(breakableName("Number INT_FAULT_<b>"), "Number INT_<wbr>FAULT_<wbr>&lt;b&gt;");
  EXPECT_EQ(breakableName("I2CErrorCount"), "I2CError<wbr>Count");
  EXPECT_EQ(breakableName(""), "");
}

TEST(Element, ClosesATagWithAttributes) {
  EXPECT_EQ(element("td class=\"number\"", "1"), "<td class=\"number\">1</td>");
}

TEST(Coordinate, HasAtMostOneDecimal) {
  EXPECT_EQ(coordinate(12.34), "12.3");
  EXPECT_EQ(coordinate(12), "12");
  EXPECT_EQ(coordinate(-0.01), "0");
}

TEST(NumberCell, HasTheWholeNumberAsTitle) {
  EXPECT_EQ(numberCell(33.333334), "<td class=\"number\" title=\"33.333334\">33.3333</td>");
  EXPECT_EQ(numberCell(3, {}, " rowspan=\"2\""), "<td class=\"number\" rowspan=\"2\">3</td>");
}

}  // namespace
}  // namespace quazor
