// MetadataNumber: a number of a frame's metadata, or none, in as few bytes as it needs.
#pragma once

#include "contract/value.h"

#include <cstdint>
#include <optional>
#include <variant>

namespace quazor {

// Holds a number of any kind that a Value can be, and gives it back as that kind. A Value that is no number counts as
// none. Copies and goes like a plain integer, which a Value does not.
// Thread: one at a time; any number may read while none writes.
class MetadataNumber {
 public:
  // Nothing is copied but the number itself: a frame has many, and a million frames a second may come.
  void assign(const Value& value) {
    switch (value.kind()) {
      case Value::Kind::kBoolean: number_ = *value.boolean(); break;
      case Value::Kind::kSigned: number_ = *value.signedInteger(); break;
      case Value::Kind::kUnsigned: number_ = *value.unsignedInteger(); break;
      case Value::Kind::kDouble: number_ = *value.doubleNumber(); break;
      case Value::Kind::kFloat: number_ = *value.floatNumber(); break;
      default: number_ = std::monostate{}; break;
    }
  }
  void reset() { number_ = std::monostate{}; }

  std::optional<Value> value() const {
    return std::visit([](auto number) { return valueOf(number); }, number_);
  }

 private:
  static std::optional<Value> valueOf(std::monostate) { return std::nullopt; }
  template <class N>
  static std::optional<Value> valueOf(N number) {
    return Value(number);
  }

  std::variant<std::monostate, bool, std::int64_t, std::uint64_t, double, float> number_;
};

}  // namespace quazor
