// Value: the dynamically typed value that host, plug-ins and platform services exchange.
#pragma once

#include "contract/contract.h"
#include "contract/ordered_map.h"

#include <chrono>
#include <concepts>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>
#include <variant>
#include <vector>

namespace QUAZOR_CONTRACT {

class DiagnosticError;
using DiagnosticErrorPtr = std::shared_ptr<const DiagnosticError>;

class Value;
using Array = std::vector<Value>;
using Dictionary = OrderedMap<Value>;
using Bytes = std::vector<std::uint8_t>;
// A point in wall clock time, with nanosecond resolution.
using Date = std::chrono::sys_time<std::chrono::nanoseconds>;

// What a Value can refer to without copying it: a platform object (a stream, a group) or a handler.
// Thread: as the derived class says.
class QUAZOR_EXPORT Object {
 public:
  Object() = default;
  Object(const Object&) = delete;
  Object& operator=(const Object&) = delete;
  virtual ~Object();

  // One line that identifies the object in a log.
  virtual std::string description() const = 0;
};

// The integer types a Value takes. Characters are left out: 'a' is neither a number nor a string.
template <class T>
concept ValueInteger =
    std::integral<T> && !std::same_as<T, bool> && !std::same_as<T, char> && !std::same_as<T, wchar_t> &&
    !std::same_as<T, char8_t> && !std::same_as<T, char16_t> && !std::same_as<T, char32_t>;

// A number (boolean, signed, unsigned, double, 32-bit float), a string, an array, a dictionary, a date, bytes, a
// shared reference to an Object, or an error.
//
// Behaves like a deep copy: the content never changes, so copies share it at the cost of a reference count. A number
// keeps its type. There is no null Value; "no value" is an empty std::optional or a null pointer.
// A moved-from Value may only be assigned to or destroyed. A Value of a null object or error prints (null).
// Thread: one at a time; any number may read while none assigns.
class QUAZOR_EXPORT Value {
 public:
  // In the order of the alternatives that hold them.
  enum class Kind {
    kBoolean,
    kSigned,
    kUnsigned,
    kDouble,
    kFloat,
    kString,
    kArray,
    kDictionary,
    kDate,
    kBytes,
    kObject,
    kError
  };

  template <std::same_as<bool> B>
  Value(B boolean) : data_(boolean) {}
  template <ValueInteger I>
  requires std::signed_integral<I> Value(I number) : data_(static_cast<std::int64_t>(number)) {}
  template <ValueInteger I>
  requires std::unsigned_integral<I> Value(I number) : data_(static_cast<std::uint64_t>(number)) {}
  template <std::same_as<double> D>
  Value(D number) : data_(number) {}
  template <std::same_as<float> F>
  Value(F number) : data_(number) {}
  Value(std::string text);
  Value(std::string_view text);
  Value(const char* text);
  Value(std::nullptr_t) = delete;
  Value(Array elements);
  Value(Dictionary entries);
  Value(Bytes bytes);
  Value(Date date) : data_(date) {}
  template <std::derived_from<Object> O>
  Value(std::shared_ptr<O> object) : data_(std::shared_ptr<Object>(std::move(object))) {}
  Value(DiagnosticErrorPtr error) : data_(std::move(error)) {}
  // Compiled once, in the library: in every source that holds Values they would take up to a quarter of its
  // compilation.
  Value(const Value& other);
  Value(Value&& other) noexcept;
  Value& operator=(const Value& other);
  Value& operator=(Value&& other) noexcept;
  ~Value();

  Kind kind() const { return static_cast<Kind>(data_.index()); }
  bool isNumber() const { return kind() <= Kind::kFloat; }

  // Returns the content if it has that type, else null. Valid until this Value and all its copies are destroyed or
  // assigned to.
  const bool* boolean() const { return std::get_if<bool>(&data_); }
  const std::int64_t* signedInteger() const { return std::get_if<std::int64_t>(&data_); }
  const std::uint64_t* unsignedInteger() const { return std::get_if<std::uint64_t>(&data_); }
  const double* doubleNumber() const { return std::get_if<double>(&data_); }
  const float* floatNumber() const { return std::get_if<float>(&data_); }
  const std::string* string() const { return shared<std::string>(); }
  const Array* array() const { return shared<Array>(); }
  const Dictionary* dictionary() const { return shared<Dictionary>(); }
  const Date* date() const { return std::get_if<Date>(&data_); }
  const Bytes* bytes() const { return shared<Bytes>(); }
  // The object it refers to, or null.
  std::shared_ptr<Object> object() const;
  // The error it holds, or null.
  DiagnosticErrorPtr error() const;

  // Compares type and content: 1, 1u, 1.0 and true are four different values. Dictionaries compare regardless of order,
  // objects and errors by identity.
  friend QUAZOR_EXPORT bool operator==(const Value& a, const Value& b);

 private:
  template <class T>
  const T* shared() const {
    const auto* pointer = std::get_if<std::shared_ptr<const T>>(&data_);
    return pointer == nullptr ? nullptr : pointer->get();
  }

  std::variant<bool, std::int64_t, std::uint64_t, double, float, std::shared_ptr<const std::string>,
               std::shared_ptr<const Array>, std::shared_ptr<const Dictionary>, Date, std::shared_ptr<const Bytes>,
               std::shared_ptr<Object>, DiagnosticErrorPtr>
      data_;
};

// Functions that read numbers. Null, and a value that is not a number, read as 0. Conversion of a double to an integer
// truncates toward zero and saturates at the limits of the integer; NaN becomes 0. Conversion to a narrower integer
// keeps the low bits, and signed and unsigned 64-bit integers are reinterpreted as each other.
QUAZOR_EXPORT double toDouble(const Value* value);
QUAZOR_EXPORT std::int64_t toSigned(const Value* value);
QUAZOR_EXPORT std::uint64_t toUnsigned(const Value* value);
QUAZOR_EXPORT std::int32_t toInt32(const Value* value);
QUAZOR_EXPORT std::uint16_t toUInt16(const Value* value);
// Returns true if the number is neither 0 nor NaN.
QUAZOR_EXPORT bool toBoolean(const Value* value);

// Returns the entry `key` of a dictionary; null for any other value and for null.
QUAZOR_EXPORT const Value* entryOf(const Value* value, std::string_view key);

// Returns a pointer to the content of an optional, or null, for use with the functions above.
inline const Value* pointerTo(const std::optional<Value>& value) { return value ? &*value : nullptr; }

}  // namespace QUAZOR_CONTRACT
