// JUnitSuite: one test suite in JUnit XML.
#pragma once

#include "contract/diagnostic_error.h"
#include "contract/value.h"
#include "host/model/run_log.h"

#include <chrono>
#include <cstddef>
#include <string>
#include <vector>

namespace quazor {

// Names and values, in insertion order.
// Thread: one at a time.
class JUnitProperties {
 public:
  void add(const std::string& name, const std::string& value);

  // The XML element with each line indented by `indent`; empty if there are no properties.
  std::string xml(const std::string& indent) const;

 private:
  std::string elements_;
};

// Thread: one at a time.
struct JUnitCounts {
  std::size_t tests = 0;
  std::size_t failures = 0;
  std::size_t errors = 0;
  std::size_t skipped = 0;
  std::chrono::nanoseconds time{};

  JUnitCounts& operator+=(const JUnitCounts& other);
};

// `<ELEMENT name="..." tests="..." ...>`: the start tag of one suite or of all suites.
std::string junitTag(const std::string& element, const std::string& name, const JUnitCounts& counts, Date begin);

// Thread: one at a time.
class JUnitSuite {
 public:
  JUnitSuite(std::string name, Date begin, Date end);

  JUnitProperties& properties() { return properties_; }

  void addPass(const std::string& name, const JUnitProperties& properties);
  void addFailure(const std::string& name, const JUnitProperties& properties, const std::string& message);
  // Includes the underlying errors, one per line.
  void addError(const std::string& name, const JUnitProperties& properties, const DiagnosticErrorPtr& error);
  void addSkipped(const std::string& name, const JUnitProperties& properties, const std::string& message);
  void addLog(const std::vector<LogLine>& lines);

  const JUnitCounts& counts() const { return counts_; }
  std::string xml() const;

 private:
  // `outcome` is an XML element; empty for a pass.
  void addCase(const std::string& name, const JUnitProperties& properties, const std::string& outcome);

  std::string name_;
  Date begin_;
  JUnitCounts counts_;
  JUnitProperties properties_;
  std::string cases_;  // elements
  std::string log_;    // lines, as XML
};

}  // namespace quazor
