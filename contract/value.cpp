#include "contract/value.h"

#include "contract/flat_destruction.h"

#include <cmath>
#include <limits>
#include <memory>
#include <utility>

namespace QUAZOR_CONTRACT {

namespace {

// The content of a Value, which ends without recursion.
template <class Content>
struct Holder {
  explicit Holder(Content&& taken) : content(std::move(taken)) {}
  Holder(const Holder&) = delete;
  Holder& operator=(const Holder&) = delete;
  ~Holder() { destroyFlat(std::move(content)); }

  Content content;
};

template <class Content>
std::shared_ptr<const Content> held(Content&& content) {
  auto holder = std::make_shared<Holder<Content>>(std::forward<Content>(content));
  const Content* const place = &holder->content;
  return {std::move(holder), place};
}

}  // namespace

Object::~Object() = default;

Value::Value(std::string text) : data_(std::make_shared<const std::string>(std::move(text))) {}
Value::Value(std::string_view text) : Value(std::string(text)) {}
Value::Value(const char* text) : Value(std::string(text)) {}
Value::Value(Array elements) : data_(held(std::move(elements))) {}
Value::Value(Dictionary entries) : data_(held(std::move(entries))) {}
Value::Value(Bytes bytes) : data_(std::make_shared<const Bytes>(std::move(bytes))) {}
Value::Value(const Value& other) = default;
Value::Value(Value&& other) noexcept = default;
Value& Value::operator=(const Value& other) = default;
Value& Value::operator=(Value&& other) noexcept = default;
Value::~Value() = default;

std::shared_ptr<Object> Value::object() const {
  const auto* pointer = std::get_if<std::shared_ptr<Object>>(&data_);
  return pointer == nullptr ? nullptr : *pointer;
}

DiagnosticErrorPtr Value::error() const {
  const auto* pointer = std::get_if<DiagnosticErrorPtr>(&data_);
  return pointer == nullptr ? nullptr : *pointer;
}

bool operator==(const Value& a, const Value& b) {
  if (a.kind() != b.kind()) return false;
  switch (a.kind()) {
    case Value::Kind::kString: return *a.string() == *b.string();
    case Value::Kind::kArray: return *a.array() == *b.array();
    case Value::Kind::kDictionary: return *a.dictionary() == *b.dictionary();
    case Value::Kind::kBytes: return *a.bytes() == *b.bytes();
    default: return a.data_ == b.data_;
  }
}

namespace {

template <class Integer>
Integer truncated(double number) {
  if (std::isnan(number)) return 0;
  // The limits as doubles: the lower one is exact, the upper one may be rounded up and out of range.
  constexpr auto lowest = static_cast<double>(std::numeric_limits<Integer>::min());
  constexpr auto highest = static_cast<double>(std::numeric_limits<Integer>::max());
  if (number <= lowest) return std::numeric_limits<Integer>::min();
  if (number >= highest) return std::numeric_limits<Integer>::max();
  return static_cast<Integer>(number);
}

template <class Integer>
Integer toInteger(const Value* value) {
  if (value == nullptr) return 0;
  switch (value->kind()) {
    case Value::Kind::kBoolean: return *value->boolean() ? 1 : 0;
    case Value::Kind::kSigned: return static_cast<Integer>(*value->signedInteger());
    case Value::Kind::kUnsigned: return static_cast<Integer>(*value->unsignedInteger());
    case Value::Kind::kDouble: return truncated<Integer>(*value->doubleNumber());
    case Value::Kind::kFloat: return truncated<Integer>(static_cast<double>(*value->floatNumber()));
    default: return 0;
  }
}

}  // namespace

double toDouble(const Value* value) {
  if (value == nullptr) return 0;
  switch (value->kind()) {
    case Value::Kind::kBoolean: return *value->boolean() ? 1 : 0;
    case Value::Kind::kSigned: return static_cast<double>(*value->signedInteger());
    case Value::Kind::kUnsigned: return static_cast<double>(*value->unsignedInteger());
    case Value::Kind::kDouble: return *value->doubleNumber();
    case Value::Kind::kFloat: return static_cast<double>(*value->floatNumber());
    default: return 0;
  }
}

std::int64_t toSigned(const Value* value) { return toInteger<std::int64_t>(value); }
std::uint64_t toUnsigned(const Value* value) { return toInteger<std::uint64_t>(value); }
std::int32_t toInt32(const Value* value) { return toInteger<std::int32_t>(value); }
std::uint16_t toUInt16(const Value* value) { return toInteger<std::uint16_t>(value); }

bool toBoolean(const Value* value) {
  const double number = toDouble(value);
  return number != 0 && !std::isnan(number);
}

const Value* entryOf(const Value* value, std::string_view key) {
  const Dictionary* entries = value == nullptr ? nullptr : value->dictionary();
  return entries == nullptr ? nullptr : entries->find(key);
}

}  // namespace QUAZOR_CONTRACT
