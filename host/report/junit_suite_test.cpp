#include "host/report/junit_suite.h"

#include <gtest/gtest.h>

#include <chrono>

namespace quazor {
namespace {

using namespace std::chrono_literals;

constexpr Date kBegin{};

TEST(JUnitProperties, AreAnElementOfNamesAndValues) {
  JUnitProperties properties;
  EXPECT_EQ(properties.xml("  "), "");
  properties.add("a", "1 < 2\n");
  properties.add("b", "");
  EXPECT_EQ(properties.xml("  "),
            "  <properties>\n"
            "    <property name=\"a\" value=\"1 &lt; 2&#10;\"/>\n"
            "    <property name=\"b\" value=\"\"/>\n"
            "  </properties>\n");
}

TEST(JUnitCounts, AddUp) {
  JUnitCounts counts{1, 2, 3, 4, 5ms};
  counts += {10, 20, 30, 40, 50ms};
  EXPECT_EQ(junitTag("testsuites", "N", counts, kBegin),
            "<testsuites name=\"N\" tests=\"11\" failures=\"22\" errors=\"33\" skipped=\"44\" time=\"0.055\" "
            "timestamp=\"1970-01-01T00:00:00.000000000Z\">\n");
}

TEST(JUnitSuite, HoldsTestCasesOfEveryKind) {
  JUnitSuite suite("S \"1\"", kBegin, kBegin + 61s + 7ms);
  suite.properties().add("seed", "7");
  JUnitProperties properties;
  properties.add("value", "3");
  suite.addPass("good", properties);
  suite.addFailure("bad", properties, "too few");
  suite.addError("broken", {}, errorWithMessage("D", -1, "it\nbroke", errorWithMessage("C", 2, "<deep>", nullptr)));
  suite.addSkipped("never", {}, "not run");
  suite.addLog({{0ns, LogLevel::kError, "a\n]]>", kBegin + 1s}, {0ns, LogLevel::kDebug, "", kBegin + 2s}});
  EXPECT_EQ(
      suite.xml(),
      R"(  <testsuite name="S &quot;1&quot;" tests="4" failures="1" errors="1" skipped="1" time="61.007" timestamp="1970-01-01T00:00:00.000000000Z">
    <properties>
      <property name="seed" value="7"/>
    </properties>
    <testcase classname="S &quot;1&quot;" name="good">
      <properties>
        <property name="value" value="3"/>
      </properties>
    </testcase>
    <testcase classname="S &quot;1&quot;" name="bad">
      <properties>
        <property name="value" value="3"/>
      </properties>
      <failure message="too few" type="outside-limit"/>
    </testcase>
    <testcase classname="S &quot;1&quot;" name="broken">
      <error message="it&#10;broke" type="D:-1">D code -1: it\x0abroke
caused by C code 2: &lt;deep&gt;
</error>
    </testcase>
    <testcase classname="S &quot;1&quot;" name="never">
      <skipped message="not run"/>
    </testcase>
    <system-out>1970-01-01T00:00:01.000000000Z error a\x0a]]&gt;
1970-01-01T00:00:02.000000000Z debug 
</system-out>
  </testsuite>
)");
}

TEST(JUnitSuite, MayBeEmpty) {
  const JUnitSuite suite("S", kBegin, kBegin);
  EXPECT_EQ(suite.counts().tests, 0U);
  EXPECT_EQ(suite.xml(),
            "  <testsuite name=\"S\" tests=\"0\" failures=\"0\" errors=\"0\" skipped=\"0\" time=\"0.000\" "
            "timestamp=\"1970-01-01T00:00:00.000000000Z\">\n  </testsuite>\n");
}

TEST(JUnitSuite, TookNoTimeWhenTheClockWasSetBack) {
  EXPECT_EQ(JUnitSuite("S", kBegin, kBegin - 1s).counts().time, 0ns);
  EXPECT_EQ(JUnitSuite("S", kBegin, kBegin + 1s).counts().time, 1s);
}

}  // namespace
}  // namespace quazor
