// The data exchanged between host and plug-in.
#pragma once

#include "contract/contract.h"
#include "contract/ordered_map.h"
#include "contract/unit.h"
#include "contract/value.h"

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace QUAZOR_CONTRACT {

// A parameter that takes a number.
// Thread: one at a time; any number may read while none writes.
class QZNumberParameter {
 public:
  QZNumberParameter(std::string_view summary, bool required) : summary_(summary), required_(required) {}

  const std::string& summary() const { return summary_; }
  bool required() const { return required_; }

 private:
  std::string summary_;
  bool required_;
};

// The description of an experiment or analysis: a summary and named parameters, in insertion order.
// Thread: one at a time; any number may read while none writes.
class QZDescription {
 public:
  explicit QZDescription(std::string_view summary) : summary_(summary) {}
  static QZDescription descriptionWithSummary(std::string_view summary) { return QZDescription(summary); }

  void addParameter(QZNumberParameter parameter, std::string_view name) { parameters_.set(name, std::move(parameter)); }

  const std::string& summary() const { return summary_; }
  const OrderedMap<QZNumberParameter>& parameters() const { return parameters_; }

 private:
  std::string summary_;
  OrderedMap<QZNumberParameter> parameters_;
};

// The measurements of an experiment. Initially empty; the experiment fills it and passes ownership to the host.
// Thread: one at a time; any number may read while none writes.
class QZExperimentResult {
 public:
  OrderedMap<Measurement>& measurements() { return measurements_; }
  const OrderedMap<Measurement>& measurements() const { return measurements_; }
  Dictionary& auxiliaryData() { return auxiliaryData_; }
  const Dictionary& auxiliaryData() const { return auxiliaryData_; }

 private:
  OrderedMap<Measurement> measurements_;
  Dictionary auxiliaryData_;
};

// One end of a limit. An open bound excludes its own value from the accepted range.
// Thread: any; it is immutable.
class QZBound {
 public:
  QZBound(const Measurement& value, bool open) : value_(value), open_(open) {}

  const Measurement& value() const { return value_; }
  bool open() const { return open_; }

 private:
  Measurement value_;
  bool open_;
};

// The accepted range of a measured result. A missing bound does not restrict it. Both bounds may be the same object.
// Thread: one at a time; any number may read while none writes.
class QZLimit {
 public:
  explicit QZLimit(std::string_view name) : name_(name) {}

  void setLowerBound(std::shared_ptr<const QZBound> bound) { lowerBound_ = std::move(bound); }
  void setUpperBound(std::shared_ptr<const QZBound> bound) { upperBound_ = std::move(bound); }

  const std::string& name() const { return name_; }
  // Null when not set.
  const std::shared_ptr<const QZBound>& lowerBound() const { return lowerBound_; }
  const std::shared_ptr<const QZBound>& upperBound() const { return upperBound_; }

 private:
  std::string name_;
  std::shared_ptr<const QZBound> lowerBound_;
  std::shared_ptr<const QZBound> upperBound_;
};

// A named measurement that the host compares with its limit. A result without a limit is informational.
// Thread: one at a time; any number may read while none writes.
class QZMeasuredResult {
 public:
  QZMeasuredResult(std::string_view name, const Measurement& measurement) : name_(name), measurement_(measurement) {}

  void setLimit(QZLimit limit) { limit_ = std::move(limit); }

  const std::string& name() const { return name_; }
  const Measurement& measurement() const { return measurement_; }
  const std::optional<QZLimit>& limit() const { return limit_; }

 private:
  std::string name_;
  Measurement measurement_;
  std::optional<QZLimit> limit_;
};

// The results of an analysis, in order. Initially empty.
// Thread: one at a time; any number may read while none writes.
class QZAnalysisResult {
 public:
  std::vector<QZMeasuredResult>& measuredResults() { return measuredResults_; }
  const std::vector<QZMeasuredResult>& measuredResults() const { return measuredResults_; }

 private:
  std::vector<QZMeasuredResult> measuredResults_;
};

}  // namespace QUAZOR_CONTRACT
