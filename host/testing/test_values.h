// Random values for property tests, and their bitwise comparison.
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

// "DOMAIN CODE MESSAGE"; empty if there is no error.
std::string textOf(const DiagnosticErrorPtr& error);

// Equal seeds generate equal values.
class RandomValues {
 public:
  explicit RandomValues(std::uint64_t seed) : engine_(seed) {}

  std::uint64_t bits() { return engine_(); }
  std::uint64_t below(std::uint64_t bound) { return bits() % bound; }
  bool chance(unsigned percent) { return below(100) < percent; }
  // A number from `least` to `greatest`, inclusive.
  std::int64_t between(std::int64_t least, std::int64_t greatest);

  // Any double; special values, including not-a-number, are frequent.
  double number();
  // Any bytes: often valid UTF-8, often invalid, sometimes none.
  std::string text();
  // A time between the years 1678 and 2261.
  Date date();
  // A value of any kind, with at most `depth` levels of nesting.
  Value value(int depth);
  Dictionary dictionary(int depth);
  DiagnosticErrorPtr error(int depth);
  Measurement measurement();
  // With or without a limit; the bounds are arbitrary.
  QZMeasuredResult result();

 private:
  Value leaf();
  std::shared_ptr<const QZBound> bound();

  std::mt19937_64 engine_;
};

// An object that is identified by its text.
class NamedObject final : public Object {
 public:
  explicit NamedObject(std::string name) : name_(std::move(name)) {}

  std::string description() const override { return name_; }

 private:
  const std::string name_;
};

// Bitwise equality, except that all not-a-numbers are equal. Dictionaries must have the same order of entries; errors
// are compared by content, objects by description.
bool isSame(double a, double b);
bool isSame(const Value& a, const Value& b);
bool isSame(const Dictionary& a, const Dictionary& b);
bool isSame(const DiagnosticErrorPtr& a, const DiagnosticErrorPtr& b);
bool isSame(const Measurement& a, const Measurement& b);
bool isSame(const QZMeasuredResult& a, const QZMeasuredResult& b);

}  // namespace quazor
