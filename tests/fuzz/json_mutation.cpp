#include "tests/fuzz/json_mutation.h"

#include "base/json/json_limits.h"
#include "tests/fuzz/fuzzing.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstring>
#include <iterator>
#include <limits>
#include <optional>
#include <utility>

namespace quazor {
namespace {

using Json = nlohmann::ordered_json;

// Enough to remember every key of the formats, and few enough to choose the same one again.
constexpr std::size_t kMaxKeys = 300;
constexpr std::size_t kMaxScalars = 500;

// The first change of a deep document must not exhaust the stack, because writing JSON is recursive.
constexpr std::size_t kMaxLevels = kMaxLineLevels + 100;

// The greatest number of containers that are open at the same place. Brackets in texts count, too.
std::size_t levelsOf(std::string_view text) {
  std::size_t levels = 0;
  std::size_t most = 0;
  for (const char character : text) {
    if (character == '[' || character == '{') most = std::max(most, ++levels);
    if ((character == ']' || character == '}') && levels > 0) --levels;
  }
  return most;
}

// Values at the edges of types and limits.
const std::vector<Json>& interesting() {
  static const std::vector<Json> values = {
      nullptr,
      true,
      false,
      0,
      1,
      -1,
      31,
      32,
      255,
      256,
      65535,
      65536,
      std::numeric_limits<std::int32_t>::max(),
      std::numeric_limits<std::int32_t>::min(),
      std::int64_t{std::numeric_limits<std::int32_t>::max()} + 1,
      std::numeric_limits<std::int64_t>::max(),
      std::numeric_limits<std::int64_t>::min(),
      std::uint64_t{1} << 63U,
      std::numeric_limits<std::uint64_t>::max(),
      0.0,
      -0.0,
      0.5,
      1e-320,
      1e300,
      -1e300,
      std::numeric_limits<double>::max(),
      3.5e38,
      "",
      "nan",
      "inf",
      "-inf",
      "a\nb",
      "\x1b[2J",
      "*",
      "[a-",
      "{name}",
      "..",
      "/",
      "2026-11-21T01:08:00.123456789Z",
      "1678-01-01T00:00:00.000000000Z",
      "2261-12-31T23:59:59.999999999Z",
      std::string(300, 'x'),
      Json::array(),
      Json::object(),
      Json{{"hex", "ff00"}},
  };
  return values;
}

Json& childAt(Json& container, std::size_t index) {
  return *std::next(container.begin(), static_cast<std::ptrdiff_t>(index));
}

// The object with the entry at `index` under another key, at the same place unless the key exists already.
void rename(Json& object, std::size_t index, const std::string& key) {
  Json renamed = Json::object();
  std::size_t at = 0;
  for (auto& [name, value] : object.items()) renamed[at++ == index ? key : name] = value;
  object = std::move(renamed);
}

void swapMembers(Json& object, std::size_t one, std::size_t other) {
  std::vector<std::pair<std::string, Json>> members;
  for (auto& [name, value] : object.items()) members.emplace_back(name, value);
  std::swap(members[one], members[other]);
  object = Json::object();
  for (auto& [name, value] : members) object[name] = std::move(value);
}

}  // namespace

std::optional<Json> JsonMutation::parsed(std::string_view text) {
  if (levelsOf(text) > kMaxLevels) return std::nullopt;
  Json document = Json::parse(text, nullptr, false);
  if (document.is_discarded()) return std::nullopt;
  return document;
}

std::string JsonMutation::textOf(const Json& document) {
  return document.dump(-1, ' ', false, Json::error_handler_t::replace);
}

std::vector<JsonMutation::Node> JsonMutation::nodesOf(Json& document) {
  std::vector<Node> nodes = {{&document, nullptr, 0}};
  for (std::size_t i = 0; i < nodes.size(); ++i) {
    Json* const parent = nodes[i].value;
    if (!parent->is_structured()) continue;
    std::size_t index = 0;
    for (Json& child : *parent) nodes.push_back({&child, parent, index++});
  }
  return nodes;
}

void JsonMutation::learn(const Json& document) {
  std::vector<const Json*> open = {&document};
  while (!open.empty()) {
    const Json& value = *open.back();
    open.pop_back();
    if (value.is_object()) {
      for (const auto& [name, ignored] : value.items()) {
        if (keys_.size() < kMaxKeys && std::ranges::find(keys_, name) == keys_.end()) keys_.push_back(name);
      }
    }
    if (value.is_structured()) {
      for (const Json& child : value) open.push_back(&child);
    } else if (scalars_.size() < kMaxScalars && std::ranges::find(scalars_, value) == scalars_.end()) {
      scalars_.push_back(value);
    }
  }
}

Json JsonMutation::scalar() {
  const bool known = !scalars_.empty() && chance(50);
  const std::vector<Json>& choices = known ? scalars_ : interesting();
  return choices[below(choices.size())];
}

std::string JsonMutation::key() { return keys_[below(keys_.size())]; }

std::string JsonMutation::changedText(const std::string& text) {
  std::array<std::uint8_t, 256> bytes{};
  const std::size_t size = std::min(text.size(), bytes.size());
  std::memcpy(bytes.data(), text.data(), size);
  const std::size_t changed = mutateBytes_(bytes.data(), size, bytes.size());
  return std::string(asText(bytes.data(), changed));
}

void JsonMutation::changeNumber(Json& value) {
  const double number = value.get<double>();
  switch (below(5)) {
    case 0: value = number + 1; break;
    case 1: value = -number; break;
    case 2: value = number * 2; break;
    default:
      if (value.is_number_unsigned()) {
        const auto whole = value.get<std::uint64_t>();
        value = chance(50) ? whole + 1 : whole - 1;  // wraps around
      } else {
        value = std::nextafter(number, chance(50) ? 0.0 : std::numeric_limits<double>::infinity());
      }
  }
  if (value.is_number_float() && !std::isfinite(value.get<double>())) value = number;
}

void JsonMutation::changeScalar(Json& value) {
  if (value.is_string() && chance(60)) {
    value = changedText(value.get<std::string>());
  } else if (value.is_number() && chance(60)) {
    changeNumber(value);
  } else {
    value = scalar();
  }
}

// Rarely so often that the value exceeds a limit of nesting.
void JsonMutation::wrap(Json& value) {
  const std::size_t times = chance(5) ? below(600) : 1;
  const std::string name = key();
  const bool asArray = chance(50);
  for (std::size_t i = 0; i < times; ++i) {
    Json outer = asArray ? Json::array({std::move(value)}) : Json{{name, std::move(value)}};
    value = std::move(outer);
  }
}

void JsonMutation::changeMember(const Node& node) {
  Json& object = *node.parent;
  switch (below(4)) {
    case 0: object.erase(std::next(object.begin(), static_cast<std::ptrdiff_t>(node.index))); break;
    case 1: object[key()] = Json(*node.value); break;
    case 2: rename(object, node.index, chance(80) ? key() : changedText(key())); break;
    default: swapMembers(object, node.index, below(object.size())); break;
  }
}

void JsonMutation::changeElement(const Node& node) {
  Json& array = *node.parent;
  switch (below(4)) {
    case 0: array.erase(node.index); break;
    case 1: array.push_back(Json(*node.value)); break;
    case 2: std::swap(array[node.index], array[below(array.size())]); break;
    default: array.insert(array.end(), chance(5) ? 300 : 2, Json(*node.value)); break;
  }
}

void JsonMutation::change(Json& document) {
  std::vector<Node> nodes = nodesOf(document);
  const Node node = nodes[below(nodes.size())];
  const std::size_t choice = below(10);
  if (choice < 4 && !node.value->is_structured()) {
    changeScalar(*node.value);
  } else if (choice < 7 && node.parent != nullptr) {
    node.parent->is_object() ? changeMember(node) : changeElement(node);
  } else if (choice == 7) {
    const Json copy = *nodes[below(nodes.size())].value;
    *node.value = copy;
  } else if (choice == 8) {
    if (node.value->is_structured() && !node.value->empty() && chance(50)) {
      Json child = childAt(*node.value, below(node.value->size()));
      *node.value = std::move(child);
    } else {
      wrap(*node.value);
    }
  } else {
    *node.value = scalar();
  }
}

void JsonMutation::mutate(Json& document) {
  if (chance(10)) learn(document);
  for (std::size_t i = below(4) + 1; i > 0; --i) change(document);
}

void JsonMutation::cross(Json& document, const Json& other) {
  if (chance(10)) learn(other);
  Json source = other;
  const std::vector<Node> from = nodesOf(source);
  std::vector<Node> to = nodesOf(document);
  *to[below(to.size())].value = *from[below(from.size())].value;
}

std::string mutatedLines(JsonMutation& mutation, std::string_view text) {
  std::vector<std::string> lines = linesOf(text);
  if (lines.empty()) lines.emplace_back("{}");
  const std::size_t at = mutation.below(lines.size());
  const std::size_t other = mutation.below(lines.size());
  switch (mutation.below(12)) {
    case 0: lines.erase(lines.begin() + static_cast<std::ptrdiff_t>(at)); break;
    case 1: lines.insert(lines.begin() + static_cast<std::ptrdiff_t>(at), std::string(lines[other])); break;
    case 2: std::swap(lines[at], lines[other]); break;
    case 3: lines.resize(at + 1); break;
    default:
      if (std::optional<Json> document = JsonMutation::parsed(lines[at])) {
        const std::optional<Json> source = mutation.chance(15) ? JsonMutation::parsed(lines[other]) : std::nullopt;
        source ? mutation.cross(*document, *source) : mutation.mutate(*document);
        lines[at] = JsonMutation::textOf(*document);
      }
  }
  const bool renumber = mutation.chance(95);
  std::string mutated;
  for (std::size_t i = 0; i < lines.size(); ++i) {
    std::optional<Json> document = JsonMutation::parsed(lines[i]);
    if (renumber && document && document->is_object() && document->contains("sequence")) {
      (*document)["sequence"] = i;
      if (i == 0) (*document)["record"] = 1;
      lines[i] = JsonMutation::textOf(*document);
    }
    mutated += lines[i] + "\n";
  }
  return mutated;
}

}  // namespace quazor
