// Arbitrary JSON as a file of explanations: parsing gives explanations that are found by what they explain, or a
// sentence.
#include "host/command/explanations.h"
#include "tests/fuzz/fuzzing.h"

#include <algorithm>
#include <optional>
#include <string>
#include <vector>

namespace quazor {
namespace {

void requireText(const std::string& text) {
  requireLine(text);
  require(text.front() != ' ' && text.back() != ' ', "a text has no space around it");
}

void requireLines(const std::vector<std::string>& lines) {
  for (const std::string& line : lines) requireText(line);
}

void requireForm(const Explanation& one) {
  requireText(one.title);
  requireText(one.meaning);
  requireLines(one.causes);
  requireLines(one.next);
  require(!one.causes.empty() && !one.next.empty(), "an explanation has causes and steps");
  require(one.isError() == one.names.empty(), "an explanation is of an error or of names");
  require(one.isError() == one.kind.empty(), "a name has a kind");
  require((one.kind == "result") == !one.from.empty(), "a result comes from somewhere");
  requireLines(one.names);
  requireLines(one.symbols);
  for (const ExplainedMessage& message : one.messages) {
    requireText(message.text);
    requireLines(message.from);
  }
}

// A name may look like a number or a key of an error, which are looked up first.
void requireFound(const std::vector<Explanation>& all, const Explanation& one, const std::string& asked) {
  const auto found = accepted([&] { return findExplanations(all, asked); });
  const bool isKey = asked.find(':') != std::string::npos || asked.find_first_of("0123456789") != std::string::npos;
  require((found && std::ranges::find(*found, &one) != found->end()) || (!one.isError() && isKey),
          "an explanation is found by what it explains");
}

}  // namespace
}  // namespace quazor

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace quazor;
  const auto explanations =
      acceptedDocument([&] { return parseExplanations("explanations.json", std::string(asText(data, size))); });
  if (!explanations) return 0;
  for (const Explanation& one : *explanations) {
    requireForm(one);
    if (one.isError()) requireFound(*explanations, one, keyOf(one.domain, one.code));
    for (const std::string& name : one.names) requireFound(*explanations, one, name);
  }
  if (explanations->empty()) return 0;
  // Any text may be asked for. Once, because looking for a similar name takes long.
  accepted([&] { return findExplanations(*explanations, explanations->back().title); });
  accepted([&] { return findExplanations(*explanations, explanations->back().domain); });
  return 0;
}
