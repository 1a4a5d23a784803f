// Mutations of JSON that keep it valid, so that a fuzzer reaches what lies behind the parser.
#pragma once

#include <nlohmann/json.hpp>

#include <cstddef>
#include <cstdint>
#include <optional>
#include <random>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// Changes bytes in place and returns their new number, at most `maxSize`; LLVMFuzzerMutate is one.
using ByteMutation = std::size_t (*)(std::uint8_t* data, std::size_t size, std::size_t maxSize);

// Changes values, members and elements of JSON documents. It remembers keys, texts and numbers of the documents
// that it changes, and uses them.
class JsonMutation {
 public:
  using Json = nlohmann::ordered_json;

  // Texts are changed with `mutateBytes`.
  explicit JsonMutation(ByteMutation mutateBytes) : mutateBytes_(mutateBytes) {}

  void seed(std::uint32_t seed) { random_.seed(seed); }
  bool chance(unsigned percent) { return below(100) < percent; }
  std::size_t below(std::size_t bound) { return random_() % bound; }

  // Makes one to four changes.
  void mutate(Json& document);
  // Replaces a value of the document by one of `other`.
  void cross(Json& document, const Json& other);

  // The document, unless the text is not valid JSON or is nested too deeply to be handled.
  static std::optional<Json> parsed(std::string_view text);
  // On one line; U+FFFD replaces invalid UTF-8.
  static std::string textOf(const Json& document);

 private:
  struct Node {
    Json* value;
    Json* parent;       // null for the document
    std::size_t index;  // in the parent
  };
  static std::vector<Node> nodesOf(Json& document);

  void learn(const Json& document);
  void change(Json& document);
  void changeMember(const Node& node);
  void changeElement(const Node& node);
  void wrap(Json& value);
  void changeScalar(Json& value);
  void changeNumber(Json& value);
  std::string changedText(const std::string& text);
  Json scalar();
  std::string key();

  ByteMutation mutateBytes_;
  std::mt19937 random_;
  std::vector<std::string> keys_ = {"", "a\nb", "\x1b[31m", "\u00e4"};
  std::vector<Json> scalars_;
};

// Mutates a text of JSON documents, one a line, and keeps "sequence" and "record" correct where a line has them,
// mostly.
std::string mutatedLines(JsonMutation& mutation, std::string_view text);

}  // namespace quazor
