// Random values for property tests, and their comparison to the bit.
#pragma once

#include "contract/diagnostic_error.h"
#include "contract/results.h"
#include "contract/value.h"

#include <cstdint>
#include <limits>
#include <random>
#include <string>

namespace quazor {

inline constexpr double kInf = std::numeric_limits<double>::infinity();
inline constexpr double kNan = std::numeric_limits<double>::quiet_NaN();

// "DOMAIN CODE MESSAGE"; empty for no error.
std::string textOf(const DiagnosticErrorPtr& error);

// One seed is one sequence of values.
class RandomValues {
 public:
  explicit RandomValues(std::uint64_t seed) : engine_(seed) {}

  std::uint64_t bits() { return engine_(); }
  std::uint64_t below(std::uint64_t bound) { return bits() % bound; }
  bool chance(unsigned percent) { return below(100) < percent; }
  // From the least to the greatest, both included.
  std::int64_t between(std::int64_t least, std::int64_t greatest);

  // Any double: often one of the special ones, and not-a-number among them.
  double number();
  // Any octets: often well-formed UTF-8, often not, sometimes none.
  std::string text();
  // A moment between the years 1678 and 2261.
  Date date();
  // Of any kind, with at most `depth` levels of values in it.
  Value value(int depth);
  Dictionary dictionary(int depth);
  DiagnosticErrorPtr error(int depth);
  Measurement measurement();
  // With a limit or without, whatever its bounds are.
  QZMeasuredResult result();

 private:
  Value leaf();
  std::shared_ptr<const QZBound> bound();

  std::mt19937_64 engine_;
};

// An object that is known by its text alone.
class NamedObject final : public Object {
 public:
  explicit NamedObject(std::string name) : name_(std::move(name)) {}

  std::string description() const override { return name_; }

 private:
  const std::string name_;
};

// Equal to the bit, but for the bits of a not-a-number; entries in the same order; errors by their content, objects by
// their description.
bool isSame(double a, double b);
bool isSame(const Value& a, const Value& b);
bool isSame(const Dictionary& a, const Dictionary& b);
bool isSame(const DiagnosticErrorPtr& a, const DiagnosticErrorPtr& b);
bool isSame(const Measurement& a, const Measurement& b);
bool isSame(const QZMeasuredResult& a, const QZMeasuredResult& b);

}  // namespace quazor
