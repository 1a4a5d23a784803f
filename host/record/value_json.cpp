#include "host/record/value_json.h"

#include "contract/message_format.h"

#include <charconv>
#include <cmath>

namespace quazor {

using Json = nlohmann::ordered_json;

namespace {

// The double with the same shortest decimal form as the 32-bit float: 36.6, not 36.599998474121094.
Json floatJson(float number) {
  if (!std::isfinite(number)) return numberJson(static_cast<double>(number));
  const std::string text = defaultText(number);
  double same = 0;
  std::from_chars(text.data(), text.data() + text.size(), same);
  return same;
}

Json arrayJson(const Array& elements) {
  Json json = Json::array();
  for (const Value& element : elements) json.push_back(valueJson(element));
  return json;
}

}  // namespace

Json numberJson(double number) {
  if (std::isnan(number)) return "nan";
  if (std::isinf(number)) return number > 0 ? "inf" : "-inf";
  return number;
}

Json secondsJson(std::chrono::nanoseconds duration) { return std::chrono::duration<double>(duration).count(); }

Json valueJson(const Value& value) {
  switch (value.kind()) {
    case Value::Kind::kBoolean: return *value.boolean();
    case Value::Kind::kSigned: return *value.signedInteger();
    case Value::Kind::kUnsigned: return *value.unsignedInteger();
    case Value::Kind::kDouble: return numberJson(*value.doubleNumber());
    case Value::Kind::kFloat: return floatJson(*value.floatNumber());
    case Value::Kind::kString: return *value.string();
    case Value::Kind::kArray: return arrayJson(*value.array());
    case Value::Kind::kDictionary: return dictionaryJson(*value.dictionary());
    case Value::Kind::kDate:
    case Value::Kind::kBytes:
    case Value::Kind::kObject:
    case Value::Kind::kError: break;
  }
  return defaultText(value);
}

Json dictionaryJson(const Dictionary& dictionary) { return objectJson(dictionary, valueJson); }

Json errorJson(const DiagnosticErrorPtr& error) {
  return error == nullptr ? Json() : dictionaryJson(error->dictionaryRepresentation());
}

std::string documentText(const Json& document) {
  return document.dump(2, ' ', false, Json::error_handler_t::replace) + "\n";
}

}  // namespace quazor
