// MetadataNumber: an optional number from a frame's metadata, stored compactly.
#pragma once

#include "contract/value.h"

#include <cstdint>
#include <optional>
#include <variant>

namespace quazor {

// Stores a number of any numeric type of Value and returns it with that type. A Value that is not a number is stored as
// no number. Trivial to copy and destroy, unlike a Value.
// Thread: one at a time; any number may read while none writes.
class MetadataNumber {
 public:
  // Copies only the number, because a frame has many and up to a million frames may arrive per second.
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
