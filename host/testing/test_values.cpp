#include "host/testing/test_values.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <limits>
#include <utility>

namespace quazor {

std::string textOf(const DiagnosticErrorPtr& error) {
  if (error == nullptr) return "";
  return error->domain() + " " + std::to_string(error->code()) + " " + error->localizedDescription();
}

namespace {

constexpr double kSpecialNumbers[] = {0.0,
                                      -0.0,
                                      1.0,
                                      -1.0,
                                      0.1,
                                      9007199254740993.0,
                                      1e308,
                                      std::numeric_limits<double>::max(),
                                      std::numeric_limits<double>::lowest(),
                                      std::numeric_limits<double>::min(),
                                      std::numeric_limits<double>::denorm_min(),
                                      std::numeric_limits<double>::infinity(),
                                      -std::numeric_limits<double>::infinity(),
                                      std::numeric_limits<double>::quiet_NaN()};

constexpr const char* kPieces[] = {
    "a",          "\n",      "\"",       "\\",           "\x01",         "\x7f",
    "\u00e4",     "\u20ac",  "\u0800",   "{}",           "\ufffd",       "\U00010000",
    "\U0010ffff", "\xff",    "\xc0\x80", "\xed\xa0\x80", "\xe0\x80\x80", "\xf4\x90\x80\x80",
    "\xe2\x82",   "\xf0\x9f"};

bool isSame(const QZBound* a, const QZBound* b) {
  if (a == nullptr || b == nullptr) return a == b;
  return isSame(a->value(), b->value()) && a->open() == b->open();
}

bool isSame(const Array& a, const Array& b) {
  return std::equal(a.begin(), a.end(), b.begin(), b.end(),
                    [](const Value& one, const Value& other) { return isSame(one, other); });
}

bool isSame(const std::shared_ptr<Object>& a, const std::shared_ptr<Object>& b) {
  if (a == nullptr || b == nullptr) return a == b;
  return a->description() == b->description();
}

}  // namespace

std::int64_t RandomValues::between(std::int64_t least, std::int64_t greatest) {
  return std::uniform_int_distribution<std::int64_t>(least, greatest)(engine_);
}

double RandomValues::number() {
  if (chance(40)) return kSpecialNumbers[below(std::size(kSpecialNumbers))];
  if (chance(30)) return static_cast<double>(between(-1000, 1000)) / 8;
  return std::bit_cast<double>(bits());
}

std::string RandomValues::text() {
  std::string text;
  for (std::uint64_t i = below(6); i > 0; --i) {
    if (chance(20)) {
      text += static_cast<char>(bits());
    } else {
      text += kPieces[below(std::size(kPieces))];
    }
  }
  return text;
}

Date RandomValues::date() {
  using namespace std::chrono;
  static constexpr auto kFirst = sys_days(year(1678) / 1 / 1).time_since_epoch();
  static constexpr auto kLast = sys_days(year(2261) / 12 / 31).time_since_epoch();
  return Date(nanoseconds(between(nanoseconds(kFirst).count(), nanoseconds(kLast).count())));
}

Value RandomValues::leaf() {
  switch (below(9)) {
    case 0: return chance(50);
    case 1: return chance(20) ? std::numeric_limits<std::int64_t>::min() : static_cast<std::int64_t>(bits());
    case 2: return chance(20) ? std::numeric_limits<std::uint64_t>::max() : bits();
    case 3: return std::bit_cast<float>(static_cast<std::uint32_t>(bits()));
    case 4: return text();
    case 5: return Date(Date::duration(static_cast<std::int64_t>(bits())));
    case 6: {
      Bytes bytes(below(5));
      std::generate(bytes.begin(), bytes.end(), [this] { return static_cast<std::uint8_t>(bits()); });
      return bytes;
    }
    case 7: return chance(20) ? std::shared_ptr<NamedObject>() : std::make_shared<NamedObject>(text());
    default: return number();
  }
}

Value RandomValues::value(int depth) {
  if (depth == 0 || chance(50)) return leaf();
  if (chance(20)) return error(depth - 1);
  if (chance(50)) return dictionary(depth);
  Array elements;
  for (std::uint64_t i = below(4); i > 0; --i) elements.push_back(value(depth - 1));
  return elements;
}

Dictionary RandomValues::dictionary(int depth) {
  Dictionary entries;
  for (std::uint64_t i = below(4); i > 0; --i) entries.set(text(), value(depth - 1));
  return entries;
}

DiagnosticErrorPtr RandomValues::error(int depth) {
  if (depth > 0 && chance(50)) return errorWithMessage(text(), 7, text(), error(depth - 1));
  const auto code = static_cast<std::int64_t>(bits());
  return std::make_shared<const DiagnosticError>(text(), code, depth > 0 ? dictionary(depth - 1) : Dictionary());
}

Measurement RandomValues::measurement() {
  const QZUnit* const units[] = {&QZDimensionlessUnit::frames(), &QZDimensionlessUnit::errors(),
                                 &QZUnit::unitWithSymbol(""), &QZUnit::unitWithSymbol("\xff")};
  return {number(), chance(90) ? *units[below(std::size(units))] : QZUnit::unitWithSymbol(text())};
}

std::shared_ptr<const QZBound> RandomValues::bound() {
  return chance(40) ? nullptr : std::make_shared<const QZBound>(measurement(), chance(50));
}

QZMeasuredResult RandomValues::result() {
  QZMeasuredResult result(text(), measurement());
  if (chance(30)) return result;
  QZLimit limit(text());
  limit.setLowerBound(bound());
  limit.setUpperBound(bound());
  result.setLimit(std::move(limit));
  return result;
}

bool isSame(double a, double b) {
  return std::bit_cast<std::uint64_t>(a) == std::bit_cast<std::uint64_t>(b) || (std::isnan(a) && std::isnan(b));
}

bool isSame(const Value& a, const Value& b) {
  if (a.kind() != b.kind()) return false;
  switch (a.kind()) {
    case Value::Kind::kDouble: return isSame(*a.doubleNumber(), *b.doubleNumber());
    case Value::Kind::kFloat:
      return isSame(static_cast<double>(*a.floatNumber()), static_cast<double>(*b.floatNumber()));
    case Value::Kind::kArray: return isSame(*a.array(), *b.array());
    case Value::Kind::kDictionary: return isSame(*a.dictionary(), *b.dictionary());
    case Value::Kind::kError: return isSame(a.error(), b.error());
    case Value::Kind::kObject: return isSame(a.object(), b.object());
    default: return a == b;
  }
}

bool isSame(const Dictionary& a, const Dictionary& b) {
  return std::equal(a.begin(), a.end(), b.begin(), b.end(), [](const auto& one, const auto& other) {
    return one.first == other.first && isSame(one.second, other.second);
  });
}

bool isSame(const DiagnosticErrorPtr& a, const DiagnosticErrorPtr& b) {
  if (a == nullptr || b == nullptr) return a == b;
  return a->domain() == b->domain() && a->code() == b->code() && isSame(a->userInfo(), b->userInfo());
}

bool isSame(const Measurement& a, const Measurement& b) {
  return isSame(a.value(), b.value()) && &a.unit() == &b.unit();
}

bool isSame(const QZMeasuredResult& a, const QZMeasuredResult& b) {
  if (a.name() != b.name() || !isSame(a.measurement(), b.measurement())) return false;
  if (a.limit().has_value() != b.limit().has_value()) return false;
  return !a.limit() || (a.limit()->name() == b.limit()->name() &&
                        isSame(a.limit()->lowerBound().get(), b.limit()->lowerBound().get()) &&
                        isSame(a.limit()->upperBound().get(), b.limit()->upperBound().get()));
}

}  // namespace quazor
