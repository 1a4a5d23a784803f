// Measurements and their units.
#pragma once

#include "contract/contract.h"

#include <string>
#include <string_view>

namespace QUAZOR_CONTRACT {

// A unit, identified by its symbol. A process has one object per symbol, never destroyed, so units compare by address.
// Thread: any.
class QUAZOR_EXPORT QZUnit {
 public:
  QZUnit(const QZUnit&) = delete;
  QZUnit& operator=(const QZUnit&) = delete;

  // Returns the unit with this symbol, created on first use. Any thread.
  static const QZUnit& unitWithSymbol(std::string_view symbol);

  const std::string& symbol() const { return symbol_; }

 private:
  explicit QZUnit(std::string_view symbol) : symbol_(symbol) {}

  std::string symbol_;
};

// The shared units of counts.
// Thread: any.
class QUAZOR_EXPORT QZDimensionlessUnit {
 public:
  static const QZUnit& frames();
  static const QZUnit& errors();
  static const QZUnit& events();
};

// A value in a unit.
// Thread: one at a time; any number may read while none writes.
class Measurement {
 public:
  Measurement(double value, const QZUnit& unit) : value_(value), unit_(&unit) {}

  double value() const { return value_; }
  const QZUnit& unit() const { return *unit_; }

  friend bool operator==(const Measurement& a, const Measurement& b) {
    return a.value_ == b.value_ && a.unit_ == b.unit_;
  }

 private:
  double value_;
  const QZUnit* unit_;
};

}  // namespace QUAZOR_CONTRACT
