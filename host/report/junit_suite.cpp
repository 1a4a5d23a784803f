#include "host/report/junit_suite.h"

#include "contract/message_format.h"
#include "host/report/text_report.h"
#include "host/text/table.h"
#include "host/text/timestamp.h"
#include "host/text/xml_text.h"

#include <algorithm>
#include <cstdint>
#include <string_view>
#include <utility>

namespace quazor {

namespace {

std::string attribute(std::string_view name, std::string_view value) {
  return formatMessage(" %@=\"%@\"", name, xmlAttribute(value));
}

// Seconds with three decimals.
std::string secondsText(std::chrono::nanoseconds duration) {
  const std::int64_t milliseconds = std::chrono::duration_cast<std::chrono::milliseconds>(duration).count();
  const std::string rest = std::to_string(milliseconds % 1000);
  return std::to_string(milliseconds / 1000) + "." + std::string(3 - rest.size(), '0') + rest;
}

}  // namespace

void JUnitProperties::add(const std::string& name, const std::string& value) {
  elements_ += "<property" + attribute("name", name) + attribute("value", value) + "/>\n";
}

std::string JUnitProperties::xml(const std::string& indent) const {
  if (elements_.empty()) return {};
  std::string lines;
  for (std::string_view rest = elements_; !rest.empty();) {
    const std::size_t length = rest.find('\n') + 1;  // attribute values contain no line feed
    lines += indent + "  ";
    lines += rest.substr(0, length);
    rest.remove_prefix(length);
  }
  return indent + "<properties>\n" + lines + indent + "</properties>\n";
}

JUnitCounts& JUnitCounts::operator+=(const JUnitCounts& other) {
  tests += other.tests;
  failures += other.failures;
  errors += other.errors;
  skipped += other.skipped;
  time += other.time;
  return *this;
}

std::string junitTag(const std::string& element, const std::string& name, const JUnitCounts& counts, Date begin) {
  return "<" + element + attribute("name", name) + attribute("tests", std::to_string(counts.tests)) +
         attribute("failures", std::to_string(counts.failures)) + attribute("errors", std::to_string(counts.errors)) +
         attribute("skipped", std::to_string(counts.skipped)) + attribute("time", secondsText(counts.time)) +
         attribute("timestamp", timestampText(begin)) + ">\n";
}

// The end may precede the begin if the wall clock was set back.
JUnitSuite::JUnitSuite(std::string name, Date begin, Date end) : name_(std::move(name)), begin_(begin) {
  counts_.time = std::max<std::chrono::nanoseconds>(end - begin, std::chrono::nanoseconds::zero());
}

void JUnitSuite::addPass(const std::string& name, const JUnitProperties& properties) { addCase(name, properties, {}); }

void JUnitSuite::addFailure(const std::string& name, const JUnitProperties& properties, const std::string& message) {
  ++counts_.failures;
  addCase(name, properties, "<failure" + attribute("message", message) + attribute("type", "outside-limit") + "/>");
}

void JUnitSuite::addError(const std::string& name, const JUnitProperties& properties, const DiagnosticErrorPtr& error) {
  ++counts_.errors;
  const std::string type = formatMessage("%@:%@", error->domain(), error->code());
  addCase(name, properties,
          "<error" + attribute("message", error->localizedDescription()) + attribute("type", type) + ">" +
              xmlText(errorText(error, "")) + "</error>");
}

void JUnitSuite::addSkipped(const std::string& name, const JUnitProperties& properties, const std::string& message) {
  ++counts_.skipped;
  addCase(name, properties, "<skipped" + attribute("message", message) + "/>");
}

void JUnitSuite::addLog(const std::vector<LogLine>& lines) {
  for (const LogLine& line : lines) {
    log_ += xmlText(formatMessage("%@ %@ %@\n", timestampText(line.date), nameOf(line.level), printable(line.text)));
  }
}

std::string JUnitSuite::xml() const {
  std::string text = "  " + junitTag("testsuite", name_, counts_, begin_) + properties_.xml("    ") + cases_;
  if (!log_.empty()) text += "    <system-out>" + log_ + "</system-out>\n";
  return text + "  </testsuite>\n";
}

void JUnitSuite::addCase(const std::string& name, const JUnitProperties& properties, const std::string& outcome) {
  ++counts_.tests;
  cases_ +=
      "    <testcase" + attribute("classname", name_) + attribute("name", name) + ">\n" + properties.xml("      ");
  if (!outcome.empty()) cases_ += "      " + outcome + "\n";
  cases_ += "    </testcase>\n";
}

}  // namespace quazor
