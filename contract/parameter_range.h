// The numbers that a parameter accepts, for experiments and analyses that say it.
#pragma once

#include "contract/contract.h"
#include "contract/ordered_map.h"

#include <optional>
#include <string>
#include <string_view>

namespace QUAZOR_CONTRACT {

// What a parameter accepts, for its users. Without a bound every number is in the range.
//
// A range that no number fits, a bound or a default that is not finite, a default outside the range, and a unit that is
// not one line of UTF-8 are errors of the plug-in.
// Thread: one at a time; any number may read while none writes.
class QZParameterRange {
 public:
  // An end of the range. An open one excludes its own value.
  struct End {
    double value = 0;
    bool open = false;
  };

  void setMinimum(double value, bool open = false) { minimum_ = {value, open}; }
  void setMaximum(double value, bool open = false) { maximum_ = {value, open}; }
  // Only numbers without a fraction.
  void setInteger() { integer_ = true; }
  void setUnit(std::string_view symbol) { unit_ = symbol; }
  // The value that is used if the parameter is not set; the host shows it, but does not set it. A required parameter
  // has none.
  void setDefault(double value) { default_ = value; }

  const std::optional<End>& minimum() const { return minimum_; }
  const std::optional<End>& maximum() const { return maximum_; }
  bool integer() const { return integer_; }
  // Empty if not set.
  const std::string& unit() const { return unit_; }
  const std::optional<double>& defaultValue() const { return default_; }

 private:
  std::optional<End> minimum_;
  std::optional<End> maximum_;
  bool integer_ = false;
  std::string unit_;
  std::optional<double> default_;
};

// An optional operation of an experiment or analysis, which inherits this class in addition to its own. The host
// refuses a value outside the range before it makes a phone. Setup must check its parameters all the same: not every
// host asks.
//
// Thread: the host's, as QZExperiment.
class QUAZOR_EXPORT QZParameterRanges {
 public:
  virtual ~QZParameterRanges();

  // The ranges by the names of declared parameters. A parameter without one accepts every number.
  virtual OrderedMap<QZParameterRange> parameterRanges() const = 0;
};

}  // namespace QUAZOR_CONTRACT
