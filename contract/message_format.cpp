#include "contract/message_format.h"

#include "contract/diagnostic_error.h"

#include <charconv>
#include <chrono>
#include <cstring>
#include <limits>

namespace QUAZOR_CONTRACT {

namespace {

template <class Number>
void appendShortest(std::string& out, Number number) {
  char digits[32];  // 20 for a 64-bit integer, 24 for a double
  const auto end = std::to_chars(digits, digits + sizeof digits, number).ptr;
  out.append(digits, end);
}

void appendFixed(std::string& out, double number) {
  // Room for a sign, the integer digits of the largest double, the point and six digits.
  char digits[std::numeric_limits<double>::max_exponent10 + 10];
  const auto end = std::to_chars(digits, digits + sizeof digits, number, std::chars_format::fixed, 6).ptr;
  out.append(digits, end);
}

void appendPadded(std::string& out, unsigned number, unsigned width) {
  const std::string digits = std::to_string(number);
  if (digits.size() < width) out.append(width - digits.size(), '0');
  out += digits;
}

void appendDate(std::string& out, Date date) {
  const auto second = std::chrono::floor<std::chrono::seconds>(date);
  const auto day = std::chrono::floor<std::chrono::days>(second);
  const std::chrono::year_month_day calendar(day);
  const std::chrono::hh_mm_ss clock(second - day);
  // 64-bit nanoseconds cover the years 1677 to 2262: four digits, no sign.
  appendPadded(out, static_cast<unsigned>(static_cast<int>(calendar.year())), 4);
  out += '-';
  appendPadded(out, static_cast<unsigned>(calendar.month()), 2);
  out += '-';
  appendPadded(out, static_cast<unsigned>(calendar.day()), 2);
  out += ' ';
  appendPadded(out, static_cast<unsigned>(clock.hours().count()), 2);
  out += ':';
  appendPadded(out, static_cast<unsigned>(clock.minutes().count()), 2);
  out += ':';
  appendPadded(out, static_cast<unsigned>(clock.seconds().count()), 2);
  out += " +0000";
}

void appendBytes(std::string& out, const Bytes& bytes) {
  constexpr char digits[] = "0123456789abcdef";
  for (const std::uint8_t byte : bytes) {
    out += digits[byte >> 4U];
    out += digits[byte & 0x0FU];
  }
}

void appendValue(std::string& out, const Value& value);

template <class List>
void appendList(std::string& out, const List& elements) {
  out += '(';
  const char* separator = "";
  for (const auto& element : elements) {
    out += separator;
    appendDefaultText(out, MessageArgument(element));
    separator = ", ";
  }
  out += ')';
}

void appendDictionary(std::string& out, const Dictionary& entries) {
  out += '{';
  const char* separator = "";
  for (const auto& [key, value] : entries) {
    out += separator;
    out += key;
    out += " = ";
    appendValue(out, value);
    separator = "; ";
  }
  out += '}';
}

void appendError(std::string& out, const DiagnosticError& error) {
  out += error.domain();
  out += " code ";
  appendShortest(out, error.code());
  out += ": ";
  out += error.localizedDescription();
}

void appendValue(std::string& out, const Value& value) {
  switch (value.kind()) {
    case Value::Kind::kBoolean: out += *value.boolean() ? '1' : '0'; break;
    case Value::Kind::kSigned: appendShortest(out, *value.signedInteger()); break;
    case Value::Kind::kUnsigned: appendShortest(out, *value.unsignedInteger()); break;
    case Value::Kind::kDouble: appendShortest(out, *value.doubleNumber()); break;
    case Value::Kind::kFloat: appendShortest(out, *value.floatNumber()); break;
    case Value::Kind::kString: out += *value.string(); break;
    case Value::Kind::kArray: appendList(out, *value.array()); break;
    case Value::Kind::kDictionary: appendDictionary(out, *value.dictionary()); break;
    case Value::Kind::kDate: appendDate(out, *value.date()); break;
    case Value::Kind::kBytes: appendBytes(out, *value.bytes()); break;
    case Value::Kind::kObject: appendDefaultText(out, value.object()); break;
    case Value::Kind::kError: appendDefaultText(out, value.error()); break;
  }
}

}  // namespace

void appendDefaultText(std::string& out, const MessageArgument& argument) {
  switch (argument.type()) {
    case MessageArgument::Type::kNull: out += "(null)"; break;
    case MessageArgument::Type::kBoolean: out += argument.boolean() ? '1' : '0'; break;
    case MessageArgument::Type::kSigned: appendShortest(out, argument.signedInteger()); break;
    case MessageArgument::Type::kUnsigned: appendShortest(out, argument.unsignedInteger()); break;
    case MessageArgument::Type::kDouble: appendShortest(out, argument.number()); break;
    case MessageArgument::Type::kFloat: appendShortest(out, argument.narrowNumber()); break;
    case MessageArgument::Type::kText: out += argument.text(); break;
    case MessageArgument::Type::kValue: appendValue(out, argument.as<Value>()); break;
    case MessageArgument::Type::kArray: appendList(out, argument.as<Array>()); break;
    case MessageArgument::Type::kDictionary: appendDictionary(out, argument.as<Dictionary>()); break;
    case MessageArgument::Type::kDate: appendDate(out, argument.as<Date>()); break;
    case MessageArgument::Type::kBytes: appendBytes(out, argument.as<Bytes>()); break;
    case MessageArgument::Type::kStrings: appendList(out, argument.as<std::vector<std::string>>()); break;
    case MessageArgument::Type::kObject: out += argument.as<Object>().description(); break;
    case MessageArgument::Type::kError: appendError(out, argument.as<DiagnosticError>()); break;
  }
}

void appendMessage(std::string& out, std::string_view format, const MessageArgument* arguments) {
  const char* at = format.data();
  const char* const end = at + format.size();
  while (at != end) {
    const auto* percent = static_cast<const char*>(std::memchr(at, '%', static_cast<std::size_t>(end - at)));
    if (percent == nullptr) {
      out.append(at, end);
      return;
    }
    out.append(at, percent);
    switch (percent[1]) {
      case '%':
        out += '%';
        at = percent + 2;
        break;
      case 'l':
        if (percent[2] == 'u') {
          appendShortest(out, arguments->unsignedInteger());
        } else {
          appendFixed(out, arguments->type() == MessageArgument::Type::kFloat
                               ? static_cast<double>(arguments->narrowNumber())
                               : arguments->number());
        }
        ++arguments;
        at = percent + 3;
        break;
      default:  // "%@" and "%d": the default text of an integer is its decimal form
        appendDefaultText(out, *arguments);
        ++arguments;
        at = percent + 2;
        break;
    }
  }
}

}  // namespace QUAZOR_CONTRACT
