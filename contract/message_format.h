// Builds error messages, log lines and CSV lines from printf-style formats with the additional placeholder "%@".
//
//   %@   any value's default text; an absent value reads (null)
//   %lu  an unsigned integer, in decimal
//   %lf  a double or float, fixed point, six digits after the point
//   %d   a signed integer of at most 32 bits, in decimal
//   %%   a percent sign
//
// The compiler checks a format against its arguments. Inserted text is never interpreted as a format, and the locale
// has no effect.
//
// Default texts: integers in decimal; booleans 1 and 0; floating point the shortest form that reads back to the same
// number (36.6, 0.5, 3); strings as they are; arrays (a, b); dictionaries {k = v; k2 = v2}; dates in UTC as
// 2026-11-21 01:08:00 +0000; bytes in hexadecimal; objects their description; errors DOMAIN code N: message.
#pragma once

#include "contract/contract.h"
#include "contract/value.h"

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <type_traits>
#include <vector>

namespace QUAZOR_CONTRACT {

// One argument of a message: a number, or a pointer to the object to insert. Does not own it; valid for one call.
// Thread: one at a time.
class MessageArgument {
 public:
  enum class Type : std::uint8_t {
    kNull,
    kBoolean,
    kSigned,
    kUnsigned,
    kDouble,
    kFloat,
    kText,
    kValue,
    kArray,
    kDictionary,
    kDate,
    kBytes,
    kStrings,
    kObject,
    kError
  };

  template <std::same_as<bool> B>
  MessageArgument(const B& boolean) : type_(Type::kBoolean) {
    content_.unsignedInteger = boolean ? 1U : 0U;
  }
  template <ValueInteger I>
  MessageArgument(const I& number) {
    if constexpr (std::is_signed_v<I>) {
      type_ = Type::kSigned;
      content_.signedInteger = number;
    } else {
      type_ = Type::kUnsigned;
      content_.unsignedInteger = number;
    }
  }
  MessageArgument(const double& number) : type_(Type::kDouble) { content_.number = number; }
  MessageArgument(const float& number) : type_(Type::kFloat) { content_.narrowNumber = number; }
  MessageArgument(const char* const& text) {
    if (text != nullptr) *this = MessageArgument(std::string_view(text));
  }
  MessageArgument(const std::string& text) : MessageArgument(std::string_view(text)) {}
  MessageArgument(const std::string_view& text) : type_(Type::kText), size_(text.size()) {
    content_.pointer = text.data();
  }
  MessageArgument(const Value& value) : MessageArgument(&value, Type::kValue) {}
  MessageArgument(const Value* const& value) : MessageArgument(value, Type::kValue) {}
  MessageArgument(const std::optional<Value>& value) : MessageArgument(pointerTo(value), Type::kValue) {}
  MessageArgument(const Array& elements) : MessageArgument(&elements, Type::kArray) {}
  MessageArgument(const Dictionary& entries) : MessageArgument(&entries, Type::kDictionary) {}
  MessageArgument(const Date& date) : MessageArgument(&date, Type::kDate) {}
  MessageArgument(const Bytes& bytes) : MessageArgument(&bytes, Type::kBytes) {}
  MessageArgument(const std::vector<std::string>& texts) : MessageArgument(&texts, Type::kStrings) {}
  MessageArgument(const DiagnosticErrorPtr& error) : MessageArgument(error.get(), Type::kError) {}
  template <std::derived_from<Object> O>
  MessageArgument(const std::shared_ptr<O>& object)
      : MessageArgument(static_cast<const Object*>(object.get()), Type::kObject) {}

  Type type() const { return type_; }
  bool boolean() const { return content_.unsignedInteger != 0; }
  std::int64_t signedInteger() const { return content_.signedInteger; }
  std::uint64_t unsignedInteger() const { return content_.unsignedInteger; }
  double number() const { return content_.number; }
  float narrowNumber() const { return content_.narrowNumber; }
  std::string_view text() const { return {static_cast<const char*>(content_.pointer), size_}; }
  template <class T>
  const T& as() const {
    return *static_cast<const T*>(content_.pointer);
  }

 private:
  MessageArgument(const void* pointer, Type type) : type_(pointer == nullptr ? Type::kNull : type) {
    content_.pointer = pointer;
  }

  union Content {
    std::int64_t signedInteger;
    std::uint64_t unsignedInteger;
    double number;
    float narrowNumber;
    const void* pointer;
  };

  Type type_ = Type::kNull;
  Content content_{};
  std::size_t size_ = 0;  // of a text
};

// The placeholders that an argument type matches. Every printable type matches "%@".
template <class T>
concept FitsUnsignedPlaceholder = ValueInteger<T> && std::unsigned_integral<T>;
template <class T>
concept FitsFloatingPlaceholder = std::same_as<T, double> || std::same_as<T, float>;
template <class T>
concept FitsSignedPlaceholder = ValueInteger<T> && std::signed_integral<T> &&(sizeof(T) <= sizeof(int));

// The defect of a format, given its argument types.
enum class FormatFault { kNone, kUnknownPlaceholder, kTooFewArguments, kTooManyArguments, kArgumentOfWrongType };

template <class... Arguments>
constexpr FormatFault checkFormat(std::string_view format) {
  constexpr std::size_t count = sizeof...(Arguments);
  constexpr std::array<bool, count + 1> fitsUnsigned{FitsUnsignedPlaceholder<Arguments>..., false};
  constexpr std::array<bool, count + 1> fitsFloating{FitsFloatingPlaceholder<Arguments>..., false};
  constexpr std::array<bool, count + 1> fitsSigned{FitsSignedPlaceholder<Arguments>..., false};
  std::size_t used = 0;
  for (std::size_t at = 0; at < format.size(); ++at) {
    if (format[at] != '%') continue;
    const std::string_view rest = format.substr(at + 1);
    if (rest.starts_with('%')) {
      ++at;
      continue;
    }
    const std::array<bool, count + 1>* fits = nullptr;
    if (rest.starts_with("lu")) fits = &fitsUnsigned;
    if (rest.starts_with("lf")) fits = &fitsFloating;
    if (rest.starts_with("d")) fits = &fitsSigned;
    if (fits == nullptr && !rest.starts_with("@")) return FormatFault::kUnknownPlaceholder;
    if (used == count) return FormatFault::kTooFewArguments;
    if (fits != nullptr && !(*fits)[used]) return FormatFault::kArgumentOfWrongType;
    ++used;
  }
  return used == count ? FormatFault::kNone : FormatFault::kTooManyArguments;
}

// Never defined: calling one of these stops the compilation, and the compiler prints its name.
void theFormatHasAPlaceholderThatIsNotKnown();
void theFormatHasMorePlaceholdersThanArguments();
void theFormatHasFewerPlaceholdersThanArguments();
void anArgumentDoesNotFitItsPlaceholder();

// A format that has been checked against the types of its arguments. Only string literals convert to it.
// Thread: any.
template <class... Arguments>
class CheckedFormat {
 public:
  consteval CheckedFormat(const char* text) : text_(text) {
    switch (checkFormat<Arguments...>(text_)) {
      case FormatFault::kNone: break;
      case FormatFault::kUnknownPlaceholder: theFormatHasAPlaceholderThatIsNotKnown(); break;
      case FormatFault::kTooFewArguments: theFormatHasMorePlaceholdersThanArguments(); break;
      case FormatFault::kTooManyArguments: theFormatHasFewerPlaceholdersThanArguments(); break;
      case FormatFault::kArgumentOfWrongType: anArgumentDoesNotFitItsPlaceholder(); break;
    }
  }

  std::string_view text() const { return text_; }

 private:
  std::string_view text_;
};
template <class... Arguments>
using MessageFormat = CheckedFormat<std::type_identity_t<Arguments>...>;

// Appends the formatted message to `out`. There must be one argument per placeholder; use formatMessage, which checks
// the format.
QUAZOR_EXPORT void appendMessage(std::string& out, std::string_view format, const MessageArgument* arguments);

// Returns the formatted message.
template <class... Arguments>
std::string formatMessage(MessageFormat<Arguments...> format, const Arguments&... arguments) {
  std::string message;
  if constexpr (sizeof...(Arguments) == 0) {
    appendMessage(message, format.text(), nullptr);
  } else {
    const MessageArgument list[] = {MessageArgument(arguments)...};
    appendMessage(message, format.text(), list);
  }
  return message;
}

// Appends an argument's default text, as "%@" inserts it.
QUAZOR_EXPORT void appendDefaultText(std::string& out, const MessageArgument& argument);

// An argument's default text.
inline std::string defaultText(const MessageArgument& argument) {
  std::string text;
  appendDefaultText(text, argument);
  return text;
}

}  // namespace QUAZOR_CONTRACT
