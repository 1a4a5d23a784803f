#include "host/record/lossless_json.h"

#include "base/json/json_limits.h"
#include "base/text/hexadecimal.h"
#include "base/text/input_error.h"
#include "base/text/utf8.h"
#include "host/record/value_json.h"

#include <cmath>
#include <cstdint>
#include <limits>
#include <memory>
#include <optional>
#include <utility>

namespace quazor {

using Json = nlohmann::ordered_json;

namespace {

class DescribedObject final : public Object {
 public:
  explicit DescribedObject(std::string description) : description_(std::move(description)) {}

  std::string description() const override { return description_; }

 private:
  const std::string description_;
};

Json tagged(const char* tag, Json content) { return Json{{tag, std::move(content)}}; }

template <class T>
T contentAs(const Json& json, const char* what) {
  try {
    return json.get<T>();
  } catch (const Json::exception&) {
    throw InputError(std::string("expected a ") + what);
  }
}

std::int64_t signedFrom(const Json& json) {
  if (!json.is_number_integer()) throw InputError("expected an integer");
  if (json.is_number_unsigned() &&
      json.get<std::uint64_t>() > static_cast<std::uint64_t>(std::numeric_limits<std::int64_t>::max())) {
    throw InputError("integer too large");
  }
  return json.get<std::int64_t>();
}

std::uint64_t unsignedFrom(const Json& json) {
  if (!json.is_number_unsigned()) throw InputError("expected an unsigned integer");
  return json.get<std::uint64_t>();
}

const Json& arrayIn(const Json& json) {
  if (!json.is_array()) throw InputError("expected an array");
  return json;
}

[[noreturn]] void refuseNesting() {
  throw InputError("the value is nested more than " + std::to_string(kMaxValueLevels) + " levels deep");
}

// In all functions below, `levels` is the number of levels that may still follow.

Json nestedJson(const Value& value, int levels);

Json nestedDictionaryJson(const Dictionary& dictionary, int levels) {
  Json entries = Json::array();
  for (const auto& [key, value] : dictionary) {
    entries.push_back(Json::array({losslessText(key), nestedJson(value, levels)}));
  }
  return entries;
}

Json nestedErrorJson(const DiagnosticErrorPtr& error, int levels) {
  if (error == nullptr) return {};
  return {{"domain", losslessText(error->domain())},
          {"code", error->code()},
          {"userInfo", nestedDictionaryJson(error->userInfo(), levels)}};
}

Json nestedJson(const Value& value, int levels) {
  if (levels == 0) refuseNesting();
  switch (value.kind()) {
    case Value::Kind::kBoolean: return tagged("boolean", *value.boolean());
    case Value::Kind::kSigned: return tagged("signed", *value.signedInteger());
    case Value::Kind::kUnsigned: return tagged("unsigned", *value.unsignedInteger());
    case Value::Kind::kDouble: return tagged("double", losslessNumber(*value.doubleNumber()));
    case Value::Kind::kFloat: return tagged("float", losslessNumber(static_cast<double>(*value.floatNumber())));
    case Value::Kind::kString: return tagged("string", losslessText(*value.string()));
    case Value::Kind::kDictionary: return tagged("dictionary", nestedDictionaryJson(*value.dictionary(), levels - 1));
    case Value::Kind::kDate: return tagged("date", value.date()->time_since_epoch().count());
    case Value::Kind::kBytes: return tagged("bytes", hexadecimal(*value.bytes()));
    case Value::Kind::kError: return tagged("error", nestedErrorJson(value.error(), levels - 1));
    case Value::Kind::kObject: {
      const std::shared_ptr<Object> object = value.object();
      return tagged("object", object == nullptr ? Json() : losslessText(object->description()));
    }
    case Value::Kind::kArray: break;
  }
  Json elements = Json::array();
  for (const Value& element : *value.array()) elements.push_back(nestedJson(element, levels - 1));
  return tagged("array", std::move(elements));
}

Value nestedValueFrom(const Json& json, int levels);

Value arrayFrom(const Json& json, int levels) {
  Array elements;
  for (const Json& element : arrayIn(json)) elements.push_back(nestedValueFrom(element, levels));
  return elements;
}

Dictionary nestedDictionaryFrom(const Json& json, int levels) {
  Dictionary dictionary;
  for (const Json& entry : arrayIn(json)) {
    if (arrayIn(entry).size() != 2) throw InputError("expected an entry of a key and a value");
    dictionary.set(textFrom(entry[0]), nestedValueFrom(entry[1], levels));
  }
  return dictionary;
}

DiagnosticErrorPtr nestedErrorFrom(const Json& json, int levels) {
  if (json.is_null()) return nullptr;
  return std::make_shared<const DiagnosticError>(textFrom(memberOf(json, "domain")), signedFrom(memberOf(json, "code")),
                                                 nestedDictionaryFrom(memberOf(json, "userInfo"), levels));
}

Value nestedValueFrom(const Json& json, int levels) {
  if (levels == 0) refuseNesting();
  if (!json.is_object() || json.size() != 1) throw InputError("expected a value: an object with one key");
  const std::string& kind = json.begin().key();
  const Json& content = json.begin().value();
  if (kind == "boolean") return contentAs<bool>(content, "boolean");
  if (kind == "signed") return signedFrom(content);
  if (kind == "unsigned") return unsignedFrom(content);
  if (kind == "double") return numberFrom(content);
  if (kind == "float") return static_cast<float>(numberFrom(content));
  if (kind == "string") return textFrom(content);
  if (kind == "array") return arrayFrom(content, levels - 1);
  if (kind == "dictionary") return nestedDictionaryFrom(content, levels - 1);
  if (kind == "date") return Date(Date::duration(signedFrom(content)));
  if (kind == "bytes") {
    const std::string bytes = parseHexadecimal(contentAs<std::string>(content, "string"));
    return Bytes(bytes.begin(), bytes.end());
  }
  if (kind == "error") return nestedErrorFrom(content, levels - 1);
  if (kind != "object") throw InputError("unknown kind of value '" + kind + "'");
  if (content.is_null()) return std::shared_ptr<Object>();
  return std::make_shared<DescribedObject>(textFrom(content));
}

Json boundJson(const QZBound* bound) {
  if (bound == nullptr) return {};
  return Json::array({losslessMeasurement(bound->value()), bound->open()});
}

std::shared_ptr<const QZBound> boundFrom(const Json& json) {
  if (json.is_null()) return nullptr;
  if (arrayIn(json).size() != 2) throw InputError("expected a bound: a measurement and a boolean");
  return std::make_shared<const QZBound>(measurementFrom(json[0]), contentAs<bool>(json[1], "boolean"));
}

}  // namespace

const Json& memberOf(const Json& json, const char* key) {
  if (!json.is_object()) throw InputError("expected an object");
  const auto found = json.find(key);
  if (found == json.end()) throw InputError(std::string("\"") + key + "\" is missing");
  return *found;
}

Json losslessText(std::string_view text) {
  return !findInvalidUtf8(text) ? Json(std::string(text)) : tagged("hex", hexadecimal(text));
}

std::string textFrom(const Json& json) {
  if (json.is_object()) return parseHexadecimal(contentAs<std::string>(memberOf(json, "hex"), "string"));
  return contentAs<std::string>(json, "string");
}

Json losslessNumber(double number) { return numberJson(number); }

double numberFrom(const Json& json) {
  if (json == "nan") return std::numeric_limits<double>::quiet_NaN();
  if (json == "inf") return std::numeric_limits<double>::infinity();
  if (json == "-inf") return -std::numeric_limits<double>::infinity();
  if (!json.is_number()) throw InputError("expected a number");
  return json.get<double>();
}

Json losslessValue(const Value& value) { return nestedJson(value, kMaxValueLevels); }

Value valueFrom(const Json& json) { return nestedValueFrom(json, kMaxValueLevels); }

Json losslessDictionary(const Dictionary& dictionary) { return nestedDictionaryJson(dictionary, kMaxValueLevels); }

Dictionary dictionaryFrom(const Json& json) { return nestedDictionaryFrom(json, kMaxValueLevels); }

Json losslessError(const DiagnosticErrorPtr& error) { return nestedErrorJson(error, kMaxValueLevels); }

DiagnosticErrorPtr errorFrom(const Json& json) { return nestedErrorFrom(json, kMaxValueLevels); }

Json losslessMeasurement(const Measurement& measurement) {
  return Json::array({losslessNumber(measurement.value()), losslessText(measurement.unit().symbol())});
}

Measurement measurementFrom(const Json& json) {
  if (arrayIn(json).size() != 2) throw InputError("expected a measurement: a number and a unit");
  return {numberFrom(json[0]), QZUnit::unitWithSymbol(textFrom(json[1]))};
}

Json losslessResult(const QZMeasuredResult& result) {
  Json json = {{"name", losslessText(result.name())}, {"measurement", losslessMeasurement(result.measurement())}};
  if (const std::optional<QZLimit>& limit = result.limit()) {
    json["limit"] = {{"name", losslessText(limit->name())},
                     {"lower", boundJson(limit->lowerBound().get())},
                     {"upper", boundJson(limit->upperBound().get())}};
  }
  return json;
}

QZMeasuredResult resultFrom(const Json& json) {
  QZMeasuredResult result(textFrom(memberOf(json, "name")), measurementFrom(memberOf(json, "measurement")));
  if (const auto found = json.find("limit"); found != json.end()) {
    QZLimit limit(textFrom(memberOf(*found, "name")));
    limit.setLowerBound(boundFrom(memberOf(*found, "lower")));
    limit.setUpperBound(boundFrom(memberOf(*found, "upper")));
    result.setLimit(std::move(limit));
  }
  return result;
}

}  // namespace quazor
